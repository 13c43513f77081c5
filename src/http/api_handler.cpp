#include "http/api_handler.h"

#include <strings.h>
#include <unistd.h>

#include <algorithm>
#include <climits>
#include <cstring>
#include <utility>

#include "core/json.h"
#include "core/log.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

constexpr char kHeaders[] = "header_param";
constexpr char kQuery[] = "get_param";
constexpr char kRawBody[] = "post_raw_param";
constexpr char kFormBody[] = "post_param";

using UniqueCurlText = std::unique_ptr<char, FreeWith<curl_free>>;

/** "100 Continue" says that a body may be sent. A connection that breaks behind it has brought no
 * answer, and a status below 400 would make a success of that. */
bool IsInterim(CURL* curl, long status) {
    constexpr long kFirstAnswer = 200;
    const char* scheme = nullptr;
    return status < kFirstAnswer && curl_easy_getinfo(curl, CURLINFO_SCHEME, &scheme) == CURLE_OK &&
           scheme != nullptr && strncasecmp(scheme, "http", strlen("http")) == 0;
}

}  // namespace

APIHandler::APIHandler(CURLSH* share)
    : curl_(nullptr),
      request_(Json::objectValue),
      response_header_(Json::objectValue),
      share_(share) {}

APIHandler::~APIHandler() {
    HandlePool::Instance().GiveBack(std::move(loan_));
    delete error_handler_;
}

/** Sessions of its own stay so: a share would push them out. */
HandleKey APIHandler::ServiceKey() const {
    return handle_key::ForServices(loan_.own_sessions ? nullptr : share_);
}

void APIHandler::TakeHandle(HandleKey key) {
    HandlePool& pool = HandlePool::Instance();
    wanted_ = key;
    curl_ = nullptr;
    cert_data_ = nullptr;
    pool.GiveBack(std::exchange(loan_, HandleLoan()));
    loan_ = pool.Borrow(std::move(key));
    curl_ = loan_.curl;
}

CURL* APIHandler::GetCurlHandler() {
    if (LacksHandle()) {
        TakeHandle(handle_key::ForServices(share_));
    }
    return curl_;
}

bool APIHandler::Init() {
    // What a request may use is looked up once.
    if (LacksHandle()) {
        TakeHandle(handle_key::ForServices(share_));
    } else {
        wanted_ = ServiceKey();
    }
    Reset();
    return SetBasicOpt();
}

void APIHandler::Reset() {
    if (curl_ != nullptr) {
        curl_easy_reset(curl_);
    }
    form_data_ = nullptr;
    form_file_ = FormFile();
    sink_ = Sink();
    keeps_refusal_ = false;
    seek_function_ = nullptr;
    seek_data_ = nullptr;
    body_is_read_ = false;
    request_ = Json::Value(Json::objectValue);
    ResetRespString();
    ResetRespHeader();
}

bool APIHandler::SetMember(const char* key, const Json::Value& object) {
    if (!object.isObject()) {
        return false;
    }
    request_[key] = object;
    return true;
}

bool APIHandler::AddMember(const char* key, const std::string& name, const Json::Value& value) {
    if (name.empty()) {
        return false;
    }
    request_[key][name] = value;
    return true;
}

bool APIHandler::AddHeader(const Json::Value& headers) {
    return SetMember(kHeaders, headers);
}

bool APIHandler::AddGetParam(const Json::Value& params) {
    return SetMember(kQuery, params);
}

bool APIHandler::AddPostRawParam(const Json::Value& params) {
    if (params.isNull()) {
        request_[kRawBody] = params;
        return true;
    }
    return SetMember(kRawBody, params);
}

bool APIHandler::AddPostParam(const Json::Value& params) {
    return SetMember(kFormBody, params);
}

bool APIHandler::AddHeader(const std::string& name, const std::string& value) {
    return !value.empty() && AddMember(kHeaders, name, value);
}

bool APIHandler::AddGetParam(const std::string& name, const std::string& value) {
    return !value.empty() && AddMember(kQuery, name, value);
}

bool APIHandler::AddGetParam(const std::string& name, const char* value) {
    return value != nullptr && AddGetParam(name, std::string(value));
}

bool APIHandler::AddGetParam(const std::string& name, bool value) {
    return AddMember(kQuery, name, value);
}

bool APIHandler::AddPostParam(const std::string& name, const std::string& value) {
    return !value.empty() && AddMember(kFormBody, name, value);
}

bool APIHandler::SetReqMethod(const std::string& method) {
    if (method.empty()) {
        return false;
    }
    request_["method"] = method;
    return true;
}

bool APIHandler::SetFormUploadData(FormUploadData* form) {
    form_data_ = form;
    return true;
}

bool APIHandler::SetReturnOnError(bool return_on_error) {
    return_on_error_ = return_on_error;
    return true;
}

bool APIHandler::SetErrorHandler(ErrorHandler* handler) {
    if (handler != error_handler_) {
        delete error_handler_;
        error_handler_ = handler;
    }
    return true;
}

Json::Value APIHandler::GetError() const {
    return error_handler_ == nullptr ? Json::Value() : error_handler_->GetError();
}

bool APIHandler::IsNeedRetry() {
    return error_handler_ != nullptr && error_handler_->IsNeedRetry();
}

unsigned int APIHandler::GetRetrySleepTime() {
    return error_handler_ == nullptr ? 0 : error_handler_->GetRetrySleepTime();
}

void APIHandler::ResetRespString() {
    response_.clear();
}

void APIHandler::ResetRespHeader() {
    response_header_ = Json::Value(Json::objectValue);
}

bool APIHandler::ParseCurlError(CURLcode code) {
    long status = 0;
    const CURLcode info = curl_easy_getinfo(curl_, CURLINFO_RESPONSE_CODE, &status);
    if (info != CURLE_OK) {
        LOG_ERROR("Failed to get curl response info, url=%s, code=%d, err=%s", ShownUrl().c_str(),
                  static_cast<int>(info), curl_easy_strerror(info));
        status = 0;
        code = info;
    }
    if (code != CURLE_OK && IsInterim(curl_, status)) {
        status = 0;
    }
    if (code != CURLE_OK) {
        LOG_ERROR("Failed to perform curl, curl code=%d, resp:%d err=%s", static_cast<int>(code),
                  static_cast<int>(status), curl_easy_strerror(code));
    }
    if (error_handler_ == nullptr) {
        return false;
    }
    Json::Value record(Json::objectValue);
    record["curl_code"] = static_cast<int>(code);
    record["response_code"] = static_cast<int>(status);
    record["msg"] = response_;
    return error_handler_->ParseError(record, return_on_error_);
}

std::string APIHandler::EscapeURLString(const std::string& text) {
    const UniqueCurlText escaped(curl_easy_escape(curl_, text.c_str(), 0));
    return escaped == nullptr ? "" : escaped.get();
}

std::string APIHandler::BuildParamString(const Json::Value& params) {
    std::string text;
    for (const std::string& name : params.getMemberNames()) {
        text += name + "=" + EscapeURLString(params[name].asString()) + "&";
    }
    if (!text.empty()) {
        text.pop_back();
    }
    return text;
}

bool APIHandler::BuildHeaderParam(curl_slist** list) {
    const Json::Value& headers = request_[kHeaders];
    if (headers.isNull()) {
        return true;
    }
    for (const std::string& name : headers.getMemberNames()) {
        const Json::Value& value = headers[name];
        const std::string line =
            name + ": " + (value.isObject() ? json::toAscii(value) : value.asString());
        if (line.find_first_of("\r\n") != std::string::npos) {
            return false;  // would end the header and begin another one
        }
        curl_slist* longer = curl_slist_append(*list, line.c_str());
        if (longer == nullptr) {
            return false;
        }
        *list = longer;
    }
    return true;
}

bool APIHandler::SetHeaders(curl_slist** list) {
    if (!request_.isMember(kHeaders)) {
        return true;
    }
    if (!BuildHeaderParam(list)) {
        LOG_ERROR("Failed to build the headers");
        return false;
    }
    return Taken(curl_easy_setopt(curl_, CURLOPT_HTTPHEADER, *list), "headers");
}

bool APIHandler::SetBody() {
    std::string body;
    if (request_.isMember(kFormBody)) {
        body = BuildParamString(request_[kFormBody]);
    } else if (request_.isMember(kRawBody)) {
        body = json::toString(request_[kRawBody]);
    } else {
        return true;
    }
    return Taken(curl_easy_setopt(curl_, CURLOPT_POST, 1L), "post") &&
           Taken(curl_easy_setopt(curl_, CURLOPT_COPYPOSTFIELDS, body.c_str()), "post fields");
}

bool APIHandler::SetMethod() {
    const std::string method = request_.get("method", "").asString();
    if (method.empty()) {
        return true;
    }
    const CURLcode code = curl_easy_setopt(curl_, CURLOPT_CUSTOMREQUEST, method.c_str());
    if (code != CURLE_OK) {
        LOG_ERROR("Failed to set custom method, code=%d, err=%s", static_cast<int>(code),
                  curl_easy_strerror(code));
    }
    return code == CURLE_OK;
}

bool APIHandler::SetUp(curl_slist** headers, curl_mime** form) {
    return SetHeaders(headers) && SetTarget() && SetBody() && SetMethod() && SetForm(form) &&
           ChooseConnections();
}

bool APIHandler::Process(int retries) {
    curl_slist* header_list = nullptr;
    curl_mime* mime = nullptr;
    bool success = false;
    try {
        const int attempts = std::clamp(retries, 0, INT_MAX - 1) + 1;
        success = SetUp(&header_list, &mime) && Perform(attempts);
    } catch (const std::exception& e) {
        LOG_ERROR("Failed to set up the request, %s", e.what());
    }
    // The handle keeps the pointers; what it may be asked next must not find them.
    curl_easy_setopt(curl_, CURLOPT_HTTPHEADER, nullptr);
    curl_slist_free_all(header_list);
    curl_mime_free(mime);
    return success;
}

/**
 * A kept connection may be dead without anyone knowing. When libcurl learns that while it reads, it
 * takes another connection by itself; when it learns it while it sends, this does.
 */
CURLcode APIHandler::Transfer() {
    ResetRespString();
    ResetRespHeader();
    const CURLcode code = curl_easy_perform(curl_);
    if (code != CURLE_SEND_ERROR || !CanSendAgain()) {
        return Refused(code);
    }
    ResetRespString();
    ResetRespHeader();
    return Refused(curl_easy_perform(curl_));
}

/** Whether an old connection broke before any answer, and the body is back at its start. */
bool APIHandler::CanSendAgain() {
    long status = 0;
    long fresh_connections = 1;
    curl_easy_getinfo(curl_, CURLINFO_RESPONSE_CODE, &status);
    curl_easy_getinfo(curl_, CURLINFO_NUM_CONNECTS, &fresh_connections);
    if (status != 0 || fresh_connections != 0) {
        return false;
    }
    if (!body_is_read_ && form_data_ == nullptr) {
        return true;  // libcurl has the body itself
    }
    return seek_function_ != nullptr &&
           (form_data_ != nullptr ||  // libcurl takes a form from its start by itself
            seek_function_(seek_data_, 0, SEEK_SET) == CURL_SEEKFUNC_OK);
}

bool APIHandler::Perform(int attempts) {
    Taken(curl_easy_setopt(curl_, CURLOPT_IPRESOLVE, static_cast<long>(CURL_IPRESOLVE_WHATEVER)),
          "address family");
    for (int failed = 0;;) {
        const CURLcode code = Transfer();
        if (ParseCurlError(code)) {
            return true;
        }
        if (!IsNeedRetry()) {
            return false;
        }
        AdaptTo(code, failed);
        ++failed;
        LOG_ERROR("Retry times: %d/%d, err: %d, url: %s", failed, attempts, static_cast<int>(code),
                  ShownUrl().c_str());
        sleep(std::min(GetRetrySleepTime(), longest_sleep_));
        if (failed == attempts || !CanStartOver()) {
            return false;
        }
    }
}

/** The next attempt sends the whole body, or none is made. */
bool APIHandler::CanStartOver() {
    return seek_function_ == nullptr || form_data_ != nullptr ||
           seek_function_(seek_data_, 0, SEEK_SET) == CURL_SEEKFUNC_OK;
}

/** Another way to the server, for the attempts to come. */
void APIHandler::AdaptTo(CURLcode code, int failed) {
    constexpr int kPatience = 2;
    const bool unresolved =
        code == CURLE_COULDNT_RESOLVE_PROXY || code == CURLE_COULDNT_RESOLVE_HOST;
    CURLcode set = CURLE_OK;
    if (unresolved && failed == kPatience) {
        set = curl_easy_setopt(curl_, CURLOPT_IPRESOLVE, static_cast<long>(CURL_IPRESOLVE_V4));
    } else if (code == CURLE_FTP_WEIRD_PASV_REPLY) {
        set = curl_easy_setopt(curl_, CURLOPT_FTPPORT, "-");
    }
    if (set != CURLE_OK) {
        LOG_ERROR("Failed to set return value=%d, err=%s", static_cast<int>(set),
                  curl_easy_strerror(set));
    }
}

}  // namespace ZYROCloud
