/** How an answer is changed by a fault, and how it goes out. */
#include <gnutls/gnutls.h>
#include <poll.h>
#include <sys/socket.h>

#include <algorithm>
#include <cerrno>
#include <vector>

#include "support/cloudsim/exchange.h"

namespace cloudsim {
namespace {

constexpr size_t kPiece = 128 * 1024;

struct Destroy {
    void operator()(MHD_Response* response) const { MHD_destroy_response(response); }
};
using Response = std::unique_ptr<MHD_Response, Destroy>;

void Drop(Headers& headers, const std::string& name) {
    headers.erase(std::remove_if(headers.begin(), headers.end(),
                                 [&](auto& header) { return SameText(header.first, name); }),
                  headers.end());
}

/** What libmicrohttpd refuses to send, we write ourselves. */
bool IsPlain(const std::string& text) {
    return !text.empty() && text.find_first_of("\t\r\n") == std::string::npos &&
           text.find('\0') == std::string::npos;
}

ssize_t WriteSome(MHD_Connection* connection, int fd, const char* data, size_t size) {
    const auto* info = MHD_get_connection_info(connection, MHD_CONNECTION_INFO_GNUTLS_SESSION);
    if (info == nullptr || info->tls_session == nullptr) {
        const ssize_t wrote = send(fd, data, size, MSG_NOSIGNAL);
        return wrote < 0 && (errno == EAGAIN || errno == EINTR) ? 0 : wrote;
    }
    const ssize_t wrote =
        gnutls_record_send(static_cast<gnutls_session_t>(info->tls_session), data, size);
    return wrote == GNUTLS_E_AGAIN || wrote == GNUTLS_E_INTERRUPTED ? 0 : wrote;
}

}  // namespace

bool WriteTo(MHD_Connection* connection, const char* data, size_t size) {
    const int fd =
        MHD_get_connection_info(connection, MHD_CONNECTION_INFO_CONNECTION_FD)->connect_fd;
    size_t done = 0;
    while (done < size) {
        const ssize_t wrote = WriteSome(connection, fd, data + done, size - done);
        if (wrote < 0) {
            return false;
        }
        done += static_cast<size_t>(wrote);
        pollfd ready = {fd, POLLOUT, 0};
        if (wrote == 0 && poll(&ready, 1, 30000) <= 0) {
            return false;
        }
    }
    return true;
}

void Exchange::ApplyToReply() {
    const Fault& fault = **fault_;
    if (fault.status != 0) {
        reply_.status = fault.status;
    }
    if (fault.body) {
        reply_.SetBody(*fault.body);
    }
    for (const auto& [name, value] : fault.headers) {
        reply_.With(name, value);
    }
    cut_at_ = reply_.length;
    if (fault.range != RangeFault::kNone && reply_.status == 206) {
        ApplyRange();
    }
    if (fault.cut_answer) {
        cut_at_ = std::min(reply_.length, *fault.cut_answer);
    }
}

void Exchange::ApplyRange() {
    const uint64_t size = reply_.content->Size();
    switch ((*fault_)->range) {
        case RangeFault::kIgnore:
            reply_.status = 200;
            reply_.offset = 0;
            reply_.length = size;
            Drop(reply_.headers, "Content-Range");
            break;
        case RangeFault::kWrongStart: {
            const uint64_t last = reply_.offset + reply_.length - 1;
            reply_.offset = reply_.offset == 0 ? std::min<uint64_t>(1, last) : reply_.offset / 2;
            reply_.length = last - reply_.offset + 1;
            Drop(reply_.headers, "Content-Range");
            reply_.With("Content-Range", "bytes " + std::to_string(reply_.offset) + "-" +
                                             std::to_string(last) + "/" + std::to_string(size));
            break;
        }
        default:
            cut_at_ = reply_.length / 2;
            cut_effect_ = Effect::kRange;
            return;
    }
    cut_at_ = reply_.length;
    Happens(Effect::kRange);
}

bool Exchange::NeedsRawAnswer() const {
    const bool odd_headers =
        std::any_of(reply_.headers.begin(), reply_.headers.end(),
                    [](auto& header) { return !IsPlain(header.first) || !IsPlain(header.second); });
    const bool odd_status = reply_.status < 200 || reply_.status > 599 ||
                            ((reply_.status == 204 || reply_.status == 304) && reply_.length > 0);
    return odd_headers || odd_status ||
           (fault_ != nullptr && ((*fault_)->raw || !(*fault_)->header_lines.empty()));
}

bool Exchange::Queue() {
    Response response;
    if (reply_.length == 0) {
        response.reset(MHD_create_response_from_buffer(0, nullptr, MHD_RESPMEM_PERSISTENT));
    } else {
        auto* self = new std::shared_ptr<Exchange>(shared_from_this());
        response.reset(MHD_create_response_from_callback(
            reply_.length, kPiece, ReadForServer, self,
            [](void* context) { delete static_cast<std::shared_ptr<Exchange>*>(context); }));
    }
    for (const auto& [name, value] : reply_.headers) {
        MHD_add_response_header(response.get(), name.c_str(), value.c_str());
    }
    return MHD_queue_response(connection_, static_cast<unsigned>(reply_.status), response.get()) ==
           MHD_YES;
}

ssize_t Exchange::ReadForServer(void* self, uint64_t position, char* to, size_t size) {
    const ssize_t got = (*static_cast<std::shared_ptr<Exchange>*>(self))->Read(position, to, size);
    return got > 0
               ? got
               : (got == 0 ? MHD_CONTENT_READER_END_OF_STREAM : MHD_CONTENT_READER_END_WITH_ERROR);
}

std::string Exchange::RawHead() const {
    const char* phrase = MHD_get_reason_phrase_for(static_cast<unsigned>(reply_.status));
    std::string head = "HTTP/1.1 " + std::to_string(reply_.status) + " " +
                       (phrase == nullptr ? "Unknown" : phrase) + "\r\n";
    for (const std::string& line : fault_ ? (*fault_)->header_lines : std::vector<std::string>()) {
        head += line + "\r\n";
    }
    for (const auto& [name, value] : reply_.headers) {
        head.append(name).append(": ").append(value).append("\r\n");
    }
    return head + "Content-Length: " + std::to_string(reply_.length) +
           "\r\nConnection: close\r\n\r\n";
}

/** The connection is closed behind it. */
bool Exchange::WriteRaw() {
    if (fault_ != nullptr && (*fault_)->raw) {
        WriteTo(connection_, (*fault_)->raw->data(), (*fault_)->raw->size());
        return Break(Effect::kAnswer);
    }
    const std::string head = RawHead();
    std::vector<char> piece(kPiece);
    ssize_t got = WriteTo(connection_, head.data(), head.size()) && reply_.length > 0 ? 1 : 0;
    uint64_t position = 0;
    while (got > 0 && (got = Read(position, piece.data(), piece.size())) > 0) {
        position += static_cast<uint64_t>(got);
        if (!WriteTo(connection_, piece.data(), static_cast<size_t>(got))) {
            break;
        }
    }
    return false;
}

}  // namespace cloudsim
