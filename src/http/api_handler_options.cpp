#include <sys/socket.h>
#include <zosplatform/device.h>

#include <variant>

#include "core/log.h"
#include "core/paths.h"
#include "http/api_handler.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

constexpr long kLowSpeedLimit = 16;  // bytes per second
constexpr long kLowSpeedTime = 270;
constexpr long kConnectTime = 90;
constexpr long kKeepAliveTime = 30;
constexpr long kDnsCacheTime = 269;
constexpr long kMostRedirects = 30;
constexpr long kRootsTime = 300;
constexpr char kNoDirectory[] = "/dev/null/";

// Measured over loopback into a file: a quarter less of the processor than libcurl's own 16 KiB,
// and a twelfth less than 128 KiB; more gives nothing.
constexpr long kReceiveBuffer = 512 * 1024;
// A read function may put 128 KiB at once into this buffer, whatever room it was told, and framing
// stands in front of them: libcurl's own 64 KiB would be written over. It costs a third less of the
// processor than those, too, and more gives nothing.
constexpr long kUploadBuffer = 256 * 1024;

/** Every method but the one for old Internet Explorers. */
constexpr long kAuthMethods = 0xffffffef;

struct Option {
    CURLoption option;
    std::variant<long, const void*> value;
    const char* what;  ///< for the log
};

template <typename Function>
const void* Pointer(Function* function) {
    return reinterpret_cast<const void*>(function);
}

CURLcode Set(CURL* curl, const Option& row) {
    return std::visit([&](auto value) { return curl_easy_setopt(curl, row.option, value); },
                      row.value);
}

/** Programs that this process starts, daemons among them, must not hold its connections open. */
curl_socket_t OpenSocket(void*, curlsocktype, curl_sockaddr* address) noexcept {
    return socket(address->family, address->socktype | SOCK_CLOEXEC, address->protocol);
}

/** A line that the parser refuses by exception is left out, and the transfer goes on. */
size_t KeepHeader(char* line, size_t size, size_t count, void* headers) noexcept {
    try {
        APIHandler::WriteHeaderToJsonValue(line, size, count, static_cast<Json::Value*>(headers));
    } catch (const std::exception&) {
        return size * count;
    }
    return size * count;
}

}  // namespace

bool APIHandler::Taken(CURLcode code, const char* what, SourceLine at) {
    if (code != CURLE_OK) {
        LOG_ERROR_AT(at, "Failed to set %s, return value=%d, err=%s", what, static_cast<int>(code),
                     curl_easy_strerror(code));
    }
    return code == CURLE_OK;
}

bool APIHandler::Accept(CURLcode code, const char* what, SourceLine at) {
    if (Taken(code, what, at)) {
        return true;
    }
    ParseCurlError(code);
    return false;
}

bool APIHandler::SetBasicOpt() {
    char agent[512];
    if (YLIBDsinfoUserAgentGet("fileharbor", agent, sizeof agent) != 0) {
        LOG_ERROR("Failed to get UserAgent " PLATFORM_ERROR_FORMAT, ZYROERR_ARGS);
        ParseCurlError(CURLE_FAILED_INIT);
        return false;
    }
    const Option options[] = {
        {CURLOPT_USERAGENT, agent, "time-out"},
        {CURLOPT_LOW_SPEED_LIMIT, kLowSpeedLimit, "time-out"},
        {CURLOPT_LOW_SPEED_TIME, kLowSpeedTime, "time-out"},
        {CURLOPT_CONNECTTIMEOUT, kConnectTime, "time-out"},
        {CURLOPT_TCP_KEEPALIVE, 1L, "keepalive"},
        {CURLOPT_TCP_KEEPINTVL, kKeepAliveTime, "keepalive"},
        {CURLOPT_TCP_KEEPIDLE, kKeepAliveTime, "keepalive"},
        {CURLOPT_SSL_VERIFYPEER, 1L, "ssl verify peer"},
        {CURLOPT_SSL_VERIFYHOST, 2L, "ssl verify host"},
        // A file where a directory is meant; libcurl finds the same bundle as its own default.
        {CURLOPT_CAPATH, paths::kCaBundle, "ca path"},
        {CURLOPT_HEADERFUNCTION, Pointer(KeepHeader), "header function"},
        {CURLOPT_HEADERDATA, &response_header_, "header data"},
        {CURLOPT_WRITEFUNCTION, Pointer(WriteToStrBuf), "write function"},
        {CURLOPT_WRITEDATA, &response_, "write data"},
        {CURLOPT_SHARE, wanted_.share, "share"},
        {CURLOPT_FAILONERROR, return_on_error_ ? 1L : 0L, "fail on error"},
        {CURLOPT_FOLLOWLOCATION, 1L, "follow location"},
        {CURLOPT_DNS_CACHE_TIMEOUT, kDnsCacheTime, "dns cache timeout"},
        // libcurl before 8.3 would follow a server in circles for ever, and anywhere.
        {CURLOPT_MAXREDIRS, kMostRedirects, "redirects"},
        {CURLOPT_REDIR_PROTOCOLS_STR, "http,https", "redirect protocols"},
        // The names of headers are compared as they come, and HTTP/2 has them in lower case.
        {CURLOPT_HTTP_VERSION, static_cast<long>(CURL_HTTP_VERSION_1_1), "http version"},
        {CURLOPT_UPLOAD_BUFFERSIZE, kUploadBuffer, "upload buffer"},
        // Handles work in several threads at once, and signals belong to the whole process.
        {CURLOPT_NOSIGNAL, 1L, "signals"},
        {CURLOPT_OPENSOCKETFUNCTION, Pointer(OpenSocket), "socket function"},
    };
    for (const Option& row : options) {
        const bool absent = row.option == CURLOPT_SHARE && share_ == nullptr;
        if (!absent && !Accept(Set(curl_, row), row.what)) {
            return false;
        }
    }
    // Refused, and as large as before, behind a transfer that ended before it had a connection.
    curl_easy_setopt(curl_, CURLOPT_BUFFERSIZE, kReceiveBuffer);
    return true;
}

/**
 * What libcurl may use again. It compares what it knows of; users, pins and what stands in the
 * files behind them it does not.
 */
bool APIHandler::ChooseConnections() {
    if (HandlePool::Instance().IsInherited(loan_)) {
        LOG_ERROR("The connections are those of another process");
        return false;
    }
    loan_.mixed = loan_.mixed || (loan_.used && loan_.key != wanted_);
    loan_.key = wanted_;
    loan_.used = true;
    loan_.own_sessions = loan_.own_sessions || wanted_.share == nullptr;
    const bool sessions = !wanted_.IsPinned() && !(loan_.mixed && loan_.own_sessions);
    // libcurl keeps parsed roots, but not if there is a directory, too, and in the one that is set
    // it finds nothing. Directories are among what it compares, so one that cannot be keeps a
    // redirect of this request off the connections of others.
    const std::string label = loan_.mixed ? kNoDirectory + handle_key::Label(wanted_) : "";
    const Option options[] = {
        {CURLOPT_CAPATH, loan_.mixed ? label.c_str() : nullptr, "ca path"},
        {CURLOPT_FRESH_CONNECT, loan_.mixed ? 1L : 0L, "fresh connect"},
        {CURLOPT_CA_CACHE_TIMEOUT, kRootsTime, "roots"},
        {CURLOPT_SSL_SESSIONID_CACHE, sessions ? 1L : 0L, "sessions"},
    };
    for (const Option& row : options) {
        if (!Taken(Set(curl_, row), row.what)) {
            return false;
        }
    }
    return true;
}

bool APIHandler::SetWriteFunAndData(CurlCallback function, void* data) {
    sink_.function = function != nullptr ? function : sink_.function;
    sink_.data = data != nullptr ? data : sink_.data;
    return (function == nullptr ||
            Accept(curl_easy_setopt(curl_, CURLOPT_WRITEFUNCTION, function), "write function")) &&
           (data == nullptr ||
            Accept(curl_easy_setopt(curl_, CURLOPT_WRITEDATA, data), "write data"));
}

bool APIHandler::KeepRefusal() {
    if (sink_.function == nullptr) {
        return false;
    }
    keeps_refusal_ = true;
    return Accept(curl_easy_setopt(curl_, CURLOPT_FAILONERROR, 0L), "fail on error") &&
           Accept(curl_easy_setopt(curl_, CURLOPT_WRITEFUNCTION, &WriteOrKeepRefusal),
                  "write function") &&
           Accept(curl_easy_setopt(curl_, CURLOPT_WRITEDATA, this), "write data");
}

bool APIHandler::SetReadFunAndData(CurlCallback function, void* data) {
    body_is_read_ = body_is_read_ || function != nullptr;
    return (function == nullptr ||
            Accept(curl_easy_setopt(curl_, CURLOPT_READFUNCTION, function), "read function")) &&
           (data == nullptr ||
            Accept(curl_easy_setopt(curl_, CURLOPT_READDATA, data), "read data"));
}

bool APIHandler::SetHeaderFunAndData(CurlCallback function, void* data) {
    return (function == nullptr ||
            Accept(curl_easy_setopt(curl_, CURLOPT_HEADERFUNCTION, function), "header function")) &&
           (data == nullptr ||
            Accept(curl_easy_setopt(curl_, CURLOPT_HEADERDATA, data), "header data"));
}

bool APIHandler::SetSeekFunAndData(SeekCallback function, void* data) {
    if (function != nullptr) {
        seek_function_ = function;
    }
    if (data != nullptr) {
        seek_data_ = data;
    }
    return (function == nullptr ||
            Accept(curl_easy_setopt(curl_, CURLOPT_SEEKFUNCTION, function), "seek function")) &&
           (data == nullptr ||
            Accept(curl_easy_setopt(curl_, CURLOPT_SEEKDATA, data), "seek data"));
}

int APIHandler::WatchMovement(void* opaque, curl_off_t /*to_receive*/, curl_off_t received,
                              curl_off_t /*to_send*/, curl_off_t sent) {
    // Where bytes move, the functions that take and give them ask.
    constexpr std::chrono::milliseconds kSilence(500);
    auto& movement = *static_cast<Movement*>(opaque);
    const auto now = std::chrono::steady_clock::now();
    if (movement.bytes != received + sent) {
        movement.bytes = received + sent;
        movement.since = now;
        return 0;
    }
    if (now - movement.since < kSilence) {
        return 0;
    }
    movement.since = now;
    return movement.is_stop_asked() ? 1 : 0;
}

bool APIHandler::SetStopCheck(bool (*is_stop_asked)()) {
    movement_ = {is_stop_asked, 0, std::chrono::steady_clock::now()};
    return Accept(curl_easy_setopt(curl_, CURLOPT_XFERINFODATA, &movement_), "progress data") &&
           Accept(curl_easy_setopt(curl_, CURLOPT_XFERINFOFUNCTION, WatchMovement),
                  "progress function") &&
           Accept(curl_easy_setopt(curl_, CURLOPT_NOPROGRESS, 0L), "progress");
}

bool APIHandler::AllowOnlyHttp() {
    return Accept(curl_easy_setopt(curl_, CURLOPT_PROTOCOLS_STR, "http,https"), "protocols");
}

void APIHandler::ForgetSeek() {
    seek_function_ = nullptr;
    seek_data_ = nullptr;
    curl_easy_setopt(curl_, CURLOPT_SEEKFUNCTION, nullptr);
    curl_easy_setopt(curl_, CURLOPT_SEEKDATA, nullptr);
}

bool APIHandler::SetUploadOpt(bool mute) {
    body_is_read_ = true;
    const void* sink = mute ? Pointer(MutedWriteCallback) : Pointer(WriteToStrBuf);
    return Accept(curl_easy_setopt(curl_, CURLOPT_UPLOAD, 1L), "upload") &&
           Accept(Set(curl_, {CURLOPT_WRITEFUNCTION, sink, ""}), "write function");
}

bool APIHandler::SetUploadSize(long long size) {
    return Accept(curl_easy_setopt(curl_, CURLOPT_INFILESIZE_LARGE, static_cast<curl_off_t>(size)),
                  "upload size");
}

bool APIHandler::SetUserPwOpt(const std::string& user, const std::string& password) {
    wanted_.credentials = handle_key::Credentials(user, password);
    // An empty user would be sent as one.
    const bool guest = user.empty() && password.empty();
    const char* const name = guest ? nullptr : user.c_str();
    const char* const secret = guest ? nullptr : password.c_str();
    return Accept(curl_easy_setopt(curl_, CURLOPT_HTTPAUTH, kAuthMethods), "http auth") &&
           Accept(curl_easy_setopt(curl_, CURLOPT_USERNAME, name), "user name") &&
           Accept(curl_easy_setopt(curl_, CURLOPT_PASSWORD, secret), "password");
}

bool APIHandler::SetCodePage(const std::string&, curl_slist** commands) {
    return commands == nullptr || *commands == nullptr ||
           Accept(curl_easy_setopt(curl_, CURLOPT_QUOTE, *commands), "code page");
}

bool APIHandler::SetFTPEPSV(bool on) {
    return Accept(curl_easy_setopt(curl_, CURLOPT_FTP_USE_EPSV, on ? 1L : 0L), "ftp epsv");
}

bool APIHandler::SetFTPCWD(bool single) {
    const long method = single ? CURLFTPMETHOD_SINGLECWD : CURLFTPMETHOD_MULTICWD;
    return Accept(curl_easy_setopt(curl_, CURLOPT_FTP_FILEMETHOD, method), "ftp cwd");
}

bool APIHandler::SetRange(const std::string& range) {
    return range.empty() || Accept(curl_easy_setopt(curl_, CURLOPT_RANGE, range.c_str()), "range");
}

bool APIHandler::SetNoBody(bool on) {
    return Accept(curl_easy_setopt(curl_, CURLOPT_NOBODY, on ? 1L : 0L), "no body");
}

bool APIHandler::SetShareCurlHandler(void* share) {
    if (GetCurlHandler() == nullptr || share == nullptr) {
        LOG_ERROR("curl handler or share handler is null");
        return false;
    }
    share_ = share;
    if (loan_.own_sessions) {
        TakeHandle(handle_key::ForServices(share_));
    }
    return true;
}

}  // namespace ZYROCloud
