#include "cloud/request.h"

#include <unistd.h>

#include <utility>

#include "cloud/guard.h"
#include "core/json.h"
#include "core/loggable_url.h"
#include "http/api_handler.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

constexpr int kMostAnswers = 6;
constexpr const char* kBadAnswer = "Failed to parse response to json format, %s";

}  // namespace

Request::Request(PublicCloud& cloud, const FrameRules& rules, SourceLine at)
    : cloud_(cloud), rules_(rules), at_(at) {}

Request& Request::To(const std::string& method, const std::string& url) {
    method_ = method;
    url_ = url;
    return *this;
}

Request& Request::Unescaped() {
    escape_ = false;
    return *this;
}

Request& Request::Header(const std::string& name, const Json::Value& value) {
    headers_[name] = value;
    return *this;
}

Request& Request::Query(const Json::Value& fields) {
    query_ = fields;
    return *this;
}

Request& Request::Body(const Json::Value& body) {
    Header("Content-Type", "application/json");
    Header("Content-Length", static_cast<Json::UInt64>(json::toString(body).size()));
    return RawBody(body);
}

Request& Request::RawBody(const Json::Value& body) {
    body_ = body;
    has_body_ = true;
    return *this;
}

Request& Request::Retries(int count) {
    retries_ = count;
    return *this;
}

Request& Request::FailOnError() {
    fail_on_error_ = true;
    return *this;
}

Request& Request::Unless(__tag_vfs_err_ code, std::function<bool()> way_out) {
    spared_ = code;
    way_out_ = std::move(way_out);
    return *this;
}

Request& Request::BadAnswer(const char* text) {
    bad_answer_ = text;
    return *this;
}

bool Request::Prepare(XferData* xfer) {
    if (rules_.renews_token && !cloud_.RefreshToken(false)) {
        cloud_.SetError(VFS_ERR_UNAUTHORIZED, "");
        return false;
    }
    APIHandler* api = cloud_.GetAPIHandler();
    if (api != nullptr && Start(*api, xfer) && Describe(*api)) {
        return true;
    }
    cloud_.SetError(VFS_ERR_CLOUD_FAILED, "");
    return false;
}

bool Request::Start(APIHandler& api, XferData* xfer) {
    if (fail_on_error_) {
        // In force from the next Init on, so it cannot wait.
        api.SetReturnOnError(true);
    }
    return api.Init() && api.AllowOnlyHttp() && (xfer == nullptr || cloud_.InitXferData(xfer));
}

bool Request::Describe(APIHandler& api) {
    headers_["Authorization"] = cloud_.Bearer();
    if (rules_.content_type != nullptr && !headers_.isMember("Content-Type")) {
        headers_["Content-Type"] = rules_.content_type;
    }
    if (rules_.pretty_off) {
        query_["pretty"] = false;
    }
    if (!api.AddHeader(headers_) || (!query_.empty() && !api.AddGetParam(query_)) ||
        (has_body_ && !api.AddPostRawParam(body_))) {
        return false;
    }
    if (!method_.empty()) {
        api.SetReqMethod(method_);
    }
    api.SetURL(url_, escape_);
    return true;
}

bool Request::Process() {
    APIHandler* api = cloud_.GetAPIHandler();
    if (rules_.renews_token ? cloud_.DoAPIRequest(retries_) : api->Process(retries_)) {
        return true;
    }
    cloud_.SetError(api->GetError());
    return false;
}

bool Request::Refused() {
    if (way_out_ && cloud_.GetErrorCode() == spared_) {
        if (!way_out_()) {
            return false;
        }
        // What was got round is no failure of the whole. That an item was gone stays for callers to
        // read.
        stays_ = spared_ == VFS_ERR_NOT_FOUND;
        return true;
    }
    LOG_ERROR_AT(at_, "Failed to process curl %s, err:%s", LoggableUrl(url_).c_str(),
                 json::toString(cloud_.GetError()).c_str());
    return false;
}

template <typename Steps>
bool Request::Conclude(Steps steps) {
    const Json::Value before = cloud_.GetError();
    stays_ = false;
    const bool done = Barrier(cloud_, steps, at_);
    return stays_ ? done : ZYROCloud::Conclude(cloud_, done, before);
}

bool Request::Send() {
    return Conclude([this] { return Prepare() && (Process() || Refused()); });
}

bool Request::Send(Json::Value& answer) {
    return Conclude([&] {
        return Prepare() && (rules_.repeats_bad_answer ? AskForAnswer(answer) : TakeAnswer(answer));
    });
}

bool Request::TakeAnswer(Json::Value& answer) {
    if (!Process()) {
        return Refused();
    }
    const std::string text = cloud_.GetAPIHandler()->GetResponse();
    if (json::fromString(answer, text)) {
        return true;
    }
    cloud_.SetError(VFS_ERR_CLOUD_FAILED, "");
    LOG_ERROR_AT(at_, bad_answer_ != nullptr ? bad_answer_ : kBadAnswer, text.c_str());
    return false;
}

bool Request::AskForAnswer(Json::Value& answer) {
    for (size_t asked = 1; asked <= kMostAnswers; ++asked) {
        if (!Process()) {
            return Refused();
        }
        const std::string text = cloud_.GetAPIHandler()->GetResponse();
        if (json::fromString(answer, text)) {
            return true;
        }
        LOG_ERROR_AT(at_, "Failed to parse response to json format, %s, retry: %zd", text.c_str(),
                     static_cast<ssize_t>(asked));
        sleep(1);
    }
    // The answers came: what the record says of an earlier failure stays.
    LOG_ERROR_AT(at_, "Reach max retry times");
    return false;
}

}  // namespace ZYROCloud
