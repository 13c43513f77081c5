#include "support/cloudsim/onedrive_bits.h"

#include <algorithm>
#include <map>

#include "support/cloudsim/onedrive_json.h"

namespace cloudsim {
namespace {

constexpr const char* kProtocol = "7df0354d-249b-430f-820d-3d2a9bef4931";

/** Codes of errors as the header BITS-Error has them. */
constexpr const char* kInvalid = "0x80070057";
constexpr const char* kDenied = "0x80070005";
constexpr const char* kNotFound = "0x80070002";
constexpr const char* kNoSession = "0x8020001F";
constexpr const char* kTooLarge = "0x80200020";
constexpr const char* kDiskFull = "0x80070112";

/** [MC-BUP] calls the header BITS-Error, the reference of the protocol BITS-Error-Code. */
Reply BitsError(int status, const std::string& code) {
    return Reply(status)
        .With("BITS-Packet-Type", "Ack")
        .With("BITS-Error", code)
        .With("BITS-Error-Code", code)
        .With("BITS-Error-Context", "0x5");
}

[[noreturn]] void Refuse(int status, const std::string& code) {
    throw onedrive::Failure{BitsError(status, code)};
}

/** "{XXXXXXXX-XXXX-XXXX-XXXX-XXXXXXXXXXXX}" */
std::string MakeGuid() {
    static const char kDigits[] = "0123456789ABCDEF";
    std::string guid = "{";
    for (const char c : RandomText(32)) {
        guid += kDigits[static_cast<unsigned char>(c) % 16];
        if (guid.size() == 9 || guid.size() == 14 || guid.size() == 19 || guid.size() == 24) {
            guid += '-';
        }
    }
    return guid + "}";
}

bool SamePath(const std::vector<std::string>& a, const std::vector<std::string>& b) {
    return std::equal(
        a.begin(), a.end(), b.begin(), b.end(),
        [](const std::string& x, const std::string& y) { return FoldCase(x) == FoldCase(y); });
}

}  // namespace

/**
 * Storage knows files by their path below the user's folder, /users/0xCID/LiveFolders/PATH, or by
 * the folder they lie in, /items/CID!NNN/NAME.
 */
std::unique_ptr<Handler> OneDrive::BeginStorage(Request& request) {
    std::vector<std::string> path = request.Segments();
    const bool by_folder = path.size() == 3 && path[0] == "items";
    const bool by_path = path.size() >= 4 && path[0] == "users" && SameText(path[2], "LiveFolders");
    if (!by_folder && !by_path) {
        return Ready(BitsError(404, kNotFound));
    }
    const std::string method =
        request.method == "POST" ? request.Header("X-Http-Method-Override") : request.method;
    if (method != "BITS_POST") {
        return Ready(Reply(405).With("Allow", "BITS_POST"));
    }
    Account* account = Authorize(request);
    if (account == nullptr) {
        return Ready(Reply(401).With("WWW-Authenticate", "Bearer realm=\"storage\""));
    }
    const std::string cid = account->Id();
    const std::string host = request.host.substr(0, request.host.find('.'));
    const bool other = SameText(host.substr(0, 4), "cid-") && !SameText(host, "cid-" + cid);
    if ((by_path && !SameText(path[1], "0x" + cid)) || other) {
        return Ready(BitsError(403, kDenied));
    }
    const std::string folder = by_folder ? path[1] : "";
    path.erase(path.begin(), path.begin() + (by_folder ? 2 : 3));
    return std::make_unique<OneDriveBits>(*this, request, *account, folder, std::move(path));
}

size_t OneDrive::UploadSessions() const {
    const std::lock_guard<std::mutex> lock(mutex_);
    return sessions_.size();
}

void OneDrive::DropUploadSessions() {
    const std::lock_guard<std::mutex> lock(mutex_);
    sessions_.clear();
}

OneDriveBits::OneDriveBits(OneDrive& drive, const Request& request, Account& account,
                           std::string folder, std::vector<std::string> path)
    : drive_(drive),
      request_(request),
      account_(account),
      folder_(std::move(folder)),
      path_(std::move(path)) {}

void OneDriveBits::Data(const char* data, size_t size) {
    const uint64_t limit = drive_.drive_options_.fragment_limit;
    if (fragment_.empty()) {
        const auto length = ParseNumber(request_.Header("Content-Length"));
        fragment_.reserve(std::min(length.value_or(0), limit));
    }
    received_ += size;
    if (received_ <= limit) {
        fragment_.append(data, size);
    }
}

Reply OneDriveBits::Finish() {
    static const std::map<std::string, Packet> packets = {{"create-session", &OneDriveBits::Create},
                                                          {"fragment", &OneDriveBits::Fragment},
                                                          {"close-session", &OneDriveBits::Close},
                                                          {"cancel-session", &OneDriveBits::Cancel},
                                                          {"ping", &OneDriveBits::Ping}};
    const auto packet = packets.find(FoldCase(request_.Header("BITS-Packet-Type")));
    const bool bare =
        drive_.drive_options_.strict_bits && request_.Header("Content-Length").empty();
    if (packet == packets.end() || bare) {
        return BitsError(400, kInvalid);
    }
    const std::lock_guard<std::mutex> lock(drive_.mutex_);
    try {
        return (this->*packet->second)();
    } catch (const onedrive::Failure& failure) {
        return failure.reply;
    }
}

Reply OneDriveBits::Acknowledge(int status) const {
    return Reply(status).With("BITS-Packet-Type", "Ack");
}

/** A list of GUIDs between blanks or commas; this service knows one. */
bool OneDriveBits::SpeaksOurProtocol() const {
    const std::string given = FoldCase(request_.Header("BITS-Supported-Protocols"));
    const std::string wanted =
        drive_.drive_options_.strict_bits ? std::string("{") + kProtocol + "}" : kProtocol;
    return given.find(wanted) != std::string::npos;
}

Node& OneDriveBits::Parent() {
    const std::string top = onedrive::ResourceId(drive_.tree_.Root(account_));
    Node* node = folder_.empty() || SameText(folder_, top)
                     ? &drive_.tree_.Root(account_)
                     : drive_.tree_.Find(account_, "folder." + account_.Id() + "." + folder_);
    for (size_t i = 0; node != nullptr && i + 1 < path_.size(); i++) {
        node = drive_.tree_.Child(*node, path_[i]);
    }
    if (node == nullptr || !node->folder) {
        Refuse(404, kNotFound);
    }
    return *node;
}

Node* OneDriveBits::Target(const Node& parent) {
    Node* target = drive_.tree_.Child(parent, path_.back());
    if (target != nullptr && target->folder) {
        Refuse(400, kInvalid);
    }
    return target;
}

Reply OneDriveBits::Create() {
    if (!SpeaksOurProtocol()) {
        return BitsError(400, kInvalid);
    }
    drive_.CheckName(path_.back());
    const Node* old = Target(Parent());
    const std::string id = MakeGuid();
    Session& session = drive_.sessions_[id];
    session.account = &account_;
    session.folder = folder_;
    session.path = path_;
    session.replaced = old == nullptr ? 0 : old->Size();
    session.sink = drive_.NewSink();
    // The protocol says 200, the service's description of it 201.
    return Acknowledge(drive_.drive_options_.strict_bits ? 200 : 201)
        .With("BITS-Protocol", std::string("{") + kProtocol + "}")
        .With("BITS-Session-Id", id)
        .With("Accept-Encoding", "Identity");
}

OneDriveBits::Session& OneDriveBits::Known() {
    const auto session = drive_.sessions_.find(SessionId());
    if (session == drive_.sessions_.end() || session->second.account != &account_) {
        Refuse(500, kNoSession);
    }
    return session->second;
}

/** "bytes FIRST-LAST/TOTAL" */
OneDriveBits::Range OneDriveBits::ParseRange() const {
    const std::string text = request_.Header("Content-Range");
    const size_t dash = text.find('-'), slash = text.find('/');
    if (!SameText(text.substr(0, 6), "bytes ") || dash == std::string::npos ||
        slash == std::string::npos || slash < dash) {
        Refuse(400, kInvalid);
    }
    const auto first = ParseNumber(text.substr(6, dash - 6));
    const auto last = ParseNumber(text.substr(dash + 1, slash - dash - 1));
    const auto total = ParseNumber(text.substr(slash + 1));
    if (!first || !last || !total || *last < *first || *total <= *last) {
        Refuse(400, kInvalid);
    }
    return {*first, *last, *total};
}

void OneDriveBits::CheckRange(const Session& session, const Range& range) const {
    const auto told = ParseNumber(request_.Header("Content-Length"));
    const uint64_t wanted = range.last - range.first + 1, length = told.value_or(received_);
    if ((session.total != 0 && session.total != range.total) || length != wanted) {
        Refuse(400, kInvalid);
    }
    if (wanted > drive_.drive_options_.fragment_limit || range.total > account_.MaxUpload()) {
        Refuse(500, kTooLarge);
    }
    if (drive_.tree_.Used(account_) - session.replaced + range.total > account_.Quota()) {
        Refuse(500, kDiskFull);
    }
}

Reply OneDriveBits::Fragment() {
    Session& session = Known();
    const Range range = ParseRange();
    CheckRange(session, range);
    const bool strict = drive_.drive_options_.strict_bits;
    if (range.first > session.next || (strict && range.first != session.next)) {
        return Acknowledge(416)
            .With("BITS-Session-Id", SessionId())
            .With("BITS-Received-Content-Range", std::to_string(session.next));
    }
    return Take(session, range);
}

/** What is already there isn't written again. */
Reply OneDriveBits::Take(Session& session, const Range& range) {
    session.total = range.total;
    const uint64_t known = std::min<uint64_t>(session.next - range.first, fragment_.size());
    if (!session.sink->Write(fragment_.data() + known, fragment_.size() - known)) {
        Refuse(500, kDiskFull);
    }
    session.next += fragment_.size() - known;
    return Acknowledge()
        .With("BITS-Session-Id", SessionId())
        .With("BITS-Received-Content-Range", std::to_string(session.next));
}

/** The file appears, whole, when its session is closed; what was closed too early is lost. */
Reply OneDriveBits::Close() {
    Session& session = Known();
    if (session.folder != folder_ || !SamePath(session.path, path_)) {
        return BitsError(400, kInvalid);
    }
    if (session.next != session.total) {
        drive_.sessions_.erase(SessionId());
        return BitsError(400, kInvalid);
    }
    Node& parent = Parent();
    Node* target = Target(parent);
    const std::string id = SessionId();
    ContentPtr content = session.sink->Finish();
    drive_.sessions_.erase(id);
    if (content == nullptr) {
        return BitsError(500, kDiskFull);
    }
    if (target == nullptr) {
        target = &drive_.tree_.AddFile(parent, path_.back(), std::move(content));
    } else {
        drive_.tree_.SetContent(*target, std::move(content));
    }
    return Acknowledge()
        .With("BITS-Session-Id", id)
        .With("X-Resource-Id", onedrive::ResourceId(*target));
}

Reply OneDriveBits::Cancel() {
    Known();
    drive_.sessions_.erase(SessionId());
    return Acknowledge().With("BITS-Session-Id", SessionId());
}

/** Every answer with 200 names the session, if there is one. */
Reply OneDriveBits::Ping() {
    return SessionId().empty() ? Acknowledge() : Acknowledge().With("BITS-Session-Id", SessionId());
}

}  // namespace cloudsim
