#include "support/cloudsim/exchange.h"

#include <sys/socket.h>

#include <algorithm>
#include <cstdio>
#include <exception>

namespace cloudsim {
namespace {

using std::chrono::duration;
using std::chrono::steady_clock;

Server::Time After(Server::Time begin, double seconds) {
    return begin + std::chrono::duration_cast<steady_clock::duration>(duration<double>(seconds));
}

int SocketOf(MHD_Connection* connection) {
    return MHD_get_connection_info(connection, MHD_CONNECTION_INFO_CONNECTION_FD)->connect_fd;
}

MHD_Result AddHeader(void* headers, MHD_ValueKind, const char* key, size_t key_size,
                     const char* value, size_t value_size) {
    static_cast<Headers*>(headers)->emplace_back(
        std::string(key, key_size), value == nullptr ? "" : std::string(value, value_size));
    return MHD_YES;
}

std::string WithoutPort(const std::string& host) {
    const size_t colon = host.rfind(':');
    return host.substr(0,
                       host.find(']', colon == std::string::npos ? 0 : colon) == std::string::npos
                           ? colon
                           : std::string::npos);
}

}  // namespace

bool Exchange::Start(MHD_Connection* connection, const char* method, const char* version) {
    connection_ = connection;
    kept_ = static_cast<Connection*>(
        MHD_get_connection_info(connection, MHD_CONNECTION_INFO_SOCKET_CONTEXT)->socket_context);
    if (kept_->dead) {
        return false;
    }
    began_ = steady_clock::now();
    ReadRequest(method, version);
    const std::string role = server_.hooks.role(request_);
    fault_ = server_.faults.Take(request_.method, request_.target, role);
    if (fault_ != nullptr && (*fault_)->expire_token && !request_.BearerToken().empty()) {
        server_.hooks.expire_token(request_);
        Happens(Effect::kToken);
    }
    handler_ = server_.hooks.begin(request_);
    JournalEntry entry;
    entry.connection = kept_->number;
    entry.method = request_.method;
    entry.target = request_.target;
    entry.version = request_.version;
    entry.headers = request_.headers;
    entry.account = request_.account;
    entry_ = server_.journal.Begin(std::move(entry));
    return fault_ == nullptr || ApplyBeginning();
}

void Exchange::ReadRequest(const char* method, const char* version) {
    request_.method = method;
    request_.version = version;
    const size_t mark = request_.target.find('?');
    request_.path = request_.target.substr(0, mark);
    if (mark != std::string::npos) {
        request_.query = ParseForm(request_.target.substr(mark + 1));
    }
    MHD_get_connection_values_n(connection_, MHD_HEADER_KIND, AddHeader, &request_.headers);
    request_.host = WithoutPort(request_.Header("Host"));
}

bool Exchange::ApplyBeginning() {
    const Fault& fault = **fault_;
    if (fault.close == cloudsim::Break::kBeforeBody) {
        return Break(Effect::kClose);
    }
    if (fault.without_effect || fault.close == cloudsim::Break::kAfterBody) {
        Reply reply(fault.status == 0 ? 200 : fault.status);
        const std::string body = fault.body.value_or("");
        const bool json = !body.empty() && (body[0] == '{' || body[0] == '[');
        if (!body.empty() && FindHeader(fault.headers, "Content-Type").empty()) {
            reply.With("Content-Type", json ? "application/json" : "text/plain");
        }
        handler_ = Ready(std::move(reply));
    }
    return true;
}

bool Exchange::Data(const char* data, size_t size) {
    const Fault* fault = fault_ == nullptr ? nullptr : &**fault_;
    uint64_t wanted = size;
    if (fault != nullptr && fault->cut_upload) {
        wanted =
            std::min<uint64_t>(size, *fault->cut_upload - std::min(received_, *fault->cut_upload));
    }
    if (server_.options.journal_hashes) {
        sum_.Add(data, wanted);
    }
    const size_t limit = server_.options.journal_body_limit;
    body_.append(data, std::min<uint64_t>(wanted, limit - std::min(limit, body_.size())));
    Pass(data, wanted);
    received_ += wanted;
    if (wanted < size || (fault != nullptr && fault->cut_upload == received_)) {
        return Break(Effect::kCutUpload);
    }
    if (fault != nullptr) {
        PauseAt(fault->pause_upload, received_, Effect::kPauseUpload);
    }
    if (fault != nullptr && fault->upload_rate != 0) {
        Happens(Effect::kUploadRate);
        server_.SleepUntil(After(
            began_, static_cast<double>(received_) / static_cast<double>(fault->upload_rate)));
    }
    return true;
}

void Exchange::Pass(const char* data, size_t size) {
    uint64_t passed = size;
    if (fault_ != nullptr && (*fault_)->short_upload) {
        const uint64_t most = *(*fault_)->short_upload;
        passed = std::min<uint64_t>(size, most - std::min(received_, most));
    }
    if (passed > 0) {
        handler_->Data(data, passed);
    }
    if (passed < size) {
        Happens(Effect::kShortUpload);
    }
}

bool Exchange::Answer() {
    SumBody();
    if (fault_ != nullptr && (*fault_)->delay > 0) {
        Happens(Effect::kDelay);
        server_.SleepUntil(After(steady_clock::now(), (*fault_)->delay));
    }
    if (fault_ != nullptr && (*fault_)->close == cloudsim::Break::kAfterBody) {
        return Break(Effect::kClose);
    }
    reply_ = MakeReply();
    if (fault_ != nullptr && (*fault_)->close == cloudsim::Break::kAfterEffect) {
        return Break(Effect::kClose);
    }
    cut_at_ = reply_.length;
    if (fault_ != nullptr) {
        ApplyToReply();
    }
    server_.journal.Change(*entry_, [&](JournalEntry& entry) { entry.status = reply_.status; });
    if (fault_ != nullptr) {
        kept_->dead = (*fault_)->close_after_answer;
        Happens(Effect::kAnswer);
    }
    answer_began_ = steady_clock::now();
    return NeedsRawAnswer() ? WriteRaw() : Queue();
}

void Exchange::PauseAt(const std::optional<uint64_t>& place, uint64_t done, Effect effect) {
    if (place && !paused_ && done >= *place) {
        paused_ = true;
        Happens(effect);
        server_.SleepUntil(After(steady_clock::now(), (*fault_)->pause));
    }
}

void Exchange::SumBody() {
    if (summed_) {
        return;
    }
    summed_ = true;
    const std::string sum =
        received_ != 0 && server_.options.journal_hashes ? sum_.Hex() : std::string();
    server_.journal.Change(*entry_, [&](JournalEntry& entry) {
        entry.body = std::move(body_);
        entry.body_size = received_;
        entry.body_sha1 = sum;
    });
}

Reply Exchange::MakeReply() {
    try {
        return handler_->Finish();
    } catch (const std::exception& error) {
        fprintf(stderr, "cloudsim: %s %s: %s\n", request_.method.c_str(), request_.target.c_str(),
                error.what());
        return {500, std::string("cloudsim: ") + error.what(), "text/plain"};
    }
}

void Exchange::End() {
    if (entry_ == nullptr) {
        return;
    }
    handler_.reset();
    SumBody();
    server_.journal.Change(*entry_, [&](JournalEntry& entry) { entry.answer_size = sent_; });
    server_.journal.Finish(*entry_);
    if (fault_ != nullptr && (*fault_)->close_after_answer) {
        shutdown(SocketOf(connection_), SHUT_RDWR);
    }
}

bool Exchange::Break(Effect effect) {
    SumBody();
    Happens(effect);
    if ((*fault_)->reset) {
        Reset();
    }
    return false;
}

/** A stream socket that is told to forget its peer tells the peer so with a reset. */
void Exchange::Reset() {
    sockaddr nobody{};
    nobody.sa_family = AF_UNSPEC;
    (void)connect(SocketOf(connection_), &nobody, sizeof nobody);
}

void Exchange::Happens(Effect effect) {
    if (fault_ != nullptr) {
        fault_->Happens(effect);
    }
}

ssize_t Exchange::Read(uint64_t position, char* to, size_t size) {
    if (position >= cut_at_) {
        if (cut_at_ == reply_.length) {
            return 0;
        }
        Break(cut_effect_);
        return -1;
    }
    size = std::min<uint64_t>(size, cut_at_ - position);
    if (fault_ != nullptr && (*fault_)->pause_answer) {
        PauseAt((*fault_)->pause_answer, position, Effect::kPause);
        size = paused_ ? size : std::min<uint64_t>(size, *(*fault_)->pause_answer - position);
    }
    const uint64_t rate = fault_ == nullptr ? 0 : (*fault_)->answer_rate;
    if (rate != 0) {
        Happens(Effect::kRate);
        size = std::min<uint64_t>(size, std::max<uint64_t>(1, rate / 20));
        server_.SleepUntil(
            After(answer_began_, static_cast<double>(position + size) / static_cast<double>(rate)));
    }
    const int64_t got = reply_.content->Read(reply_.offset + position, to, size);
    sent_ += got > 0 ? static_cast<uint64_t>(got) : 0;
    return got > 0 ? static_cast<ssize_t>(got) : -1;
}

}  // namespace cloudsim
