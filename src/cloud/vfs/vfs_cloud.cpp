#include "cloud/vfs/vfs_cloud.h"

#include <curl/curl.h>
#include <strings.h>

#include <cstring>
#include <memory>
#include <new>

#include "cloud/attempt.h"
#include "cloud/fuse_attr.h"
#include "cloud/guard.h"
#include "core/handle.h"
#include "core/json.h"
#include "core/log.h"
#include "http/api_handler.h"
#include "zyrovfs/server.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

constexpr int kUploadRetries = 3;
constexpr size_t kDescriptionLength = 32;
/** What the mount's root says of a server that refuses extended passive mode. */
constexpr int kNoExtendedPassive = 2;

using UniqueCommands = std::unique_ptr<curl_slist, FreeWith<curl_slist_free_all>>;

bool StartsWith(const std::string& text, const char* start) {
    return strncasecmp(text.c_str(), start, strlen(start)) == 0;
}

/** What the profile is expected to hold as text; anything else counts as missing. */
std::string TextIn(const Json::Value& config, const char* key, const char* otherwise) {
    const Json::Value value = config.isObject() ? config.get(key, otherwise) : Json::Value();
    return value.isString() ? value.asString() : otherwise;
}

bool Missing(const char* what, SourceLine at = SourceLine::Here()) {
    LOG_ERROR_AT(at, "VFSCloud not implement %s", what);
    return false;
}

}  // namespace

VFSCloud::VFSCloud() {
    VFSCloud::Init();
}

VFSCloud::VFSCloud(unsigned int owner, const Json::Value& config)
    : Cloud(owner, TextIn(config, "server_id", "test")),
      account_(TextIn(config, "account", "")),
      password_(TextIn(config, "password", "")),
      code_page_(TextIn(config, "codepage", "")),
      protocol_(TextIn(config, "protocol", "")) {
    VFSCloud::Init();
}

bool VFSCloud::Init() {
    return SetAPIErrorHandler(api);
}

bool VFSCloud::SetAPIErrorHandler(APIHandler* handler) {
    if (handler == nullptr) {
        return false;
    }
    if (StartsWith(protocol_, "dav")) {
        return handler->SetErrorHandler(new (std::nothrow) DavErrorHandler);
    }
    return handler->SetErrorHandler(new (std::nothrow) FTPErrorHandler);
}

_tag_cloud_type VFSCloud::GetCloudType() {
    return CLOUD_TYPE_VFS;
}

bool VFSCloud::GetMetaDataByURI(const std::string& uri, Json::Value& out, const std::string&) {
    return Guard(*this, [&] {
        std::string user;
        std::string url;
        if (!Server::GetUserAndURI(uri.c_str(), user, url)) {
            LOG_ERROR("Failed to get username and uri from %s", uri.c_str());
            return false;
        }
        out["url"] = url;
        return true;
    });
}

bool VFSCloud::isSetFTPEPSV(const std::string&) {
    std::string folder;
    std::string text;
    if (!GetFullPathByURI(server_id, folder) ||
        !fuse_attr::ReadDescription(folder + "/", kDescriptionLength, text)) {
        return true;
    }
    return strtol(text.c_str(), nullptr, 10) != kNoExtendedPassive;
}

/** A local step that failed. */
bool VFSCloud::Check(bool step) {
    if (!step) {
        SetError(VFS_ERR_CLOUD_FAILED, "");
    }
    return step;
}

bool VFSCloud::SetUpFTP(const std::string& url, curl_slist** commands) {
    if (!StartsWith(url, "ftp://") && !StartsWith(url, "ftps://")) {
        return true;
    }
    if (code_page_ == "UTF-8") {
        // The star: a server that does not know the command has always spoken UTF-8.
        *commands = curl_slist_append(nullptr, "*OPTS UTF8 ON");
        if (!Check(*commands != nullptr && api->SetCodePage(code_page_, commands))) {
            return false;
        }
    }
    if (!isSetFTPEPSV(url)) {
        api->SetFTPEPSV(false);
    }
    api->SetFTPCWD(true);
    return true;
}

/** What both directions begin with. */
bool VFSCloud::Prepare(XferData& xfer, const std::string& url, const Json::Value* range,
                       curl_slist** commands) {
    if (!Check(api != nullptr && api->Init() && InitXferData(&xfer)) ||
        !Check(api->SetUserPwOpt(account_, password_))) {
        return false;
    }
    if (range != nullptr) {
        SetRange(*this, *range);
    }
    api->SetVFSURL(url);  // tells nothing: a URL that could not be set shows when it is asked for
    return SetUpFTP(url, commands);
}

bool VFSCloud::UploadProcess(XferData* xfer, const Json::Value& meta) {
    if (xfer == nullptr) {
        return false;
    }
    return Guard(*this, [&] {
        const std::string url = meta.get("url", "").asString();
        curl_slist* list = nullptr;
        const bool prepared = Prepare(*xfer, url, nullptr, &list);
        const UniqueCommands commands(list);
        if (!prepared) {
            return false;
        }
        LetCurlRewind(*this, *xfer);
        api->SetUploadOpt(true);
        if (StartsWith(url, "dav")) {
            const Json::Int64 total = meta.get("total_bytes", -1).asInt64();
            if (total >= 1) {
                api->SetUploadSize(total);
            }
        }
        if (api->Process(kUploadRetries)) {
            return true;
        }
        SetError(api->GetError());
        LOG_ERROR("Failed to process curl %s, err:%s", url.c_str(), json::toString(error).c_str());
        return false;
    });
}

bool VFSCloud::DownloadProcess(XferData* xfer, const Json::Value& meta) {
    return Guard(*this, [&] {
        const std::string url = meta.get("url", "").asString();
        if (xfer == nullptr || xfer->context == nullptr) {
            return false;
        }
        curl_slist* list = nullptr;
        const bool prepared = Prepare(*xfer, url, &meta, &list);
        const UniqueCommands commands(list);
        if (!prepared) {
            return false;
        }
        AttemptPlan plan;
        plan.send = [this] { return api->Process(0); };
        plan.judge = [this, xfer](__tag_vfs_err_) { return JudgeDownload(*this, *xfer->context); };
        plan.copy = CopyError::kAtEnd;
        plan.retry = "Retry Download";
        plan.refused = kRequestFailed;
        plan.exhausted = kRequestFailed;
        plan.what = &url;
        return RunAttempts(*this, plan);
    });
}

bool VFSCloud::GetAccountInfo(const Json::Value&, Json::Value&) {
    return Missing("get account info");
}

bool VFSCloud::GetFileInfo(const std::string&, const Json::Value&, Json::Value&) {
    return Missing("get file info");
}

bool VFSCloud::ListFolder(const std::string&, const Json::Value&, Json::Value&) {
    return Missing("list operation");
}

bool VFSCloud::CreateFolder(const std::string&, const std::string&, const Json::Value&) {
    return Missing("create folder operation");
}

bool VFSCloud::Delete(const std::string&) {
    return Missing("delete operation");
}

bool VFSCloud::Rename(const std::string&, const std::string&) {
    return Missing("rename operation");
}

bool VFSCloud::Copy(const std::string&, const std::string&) {
    return Missing("copy operation");
}

bool VFSCloud::Move(const std::string&, const std::string&) {
    return Missing("move operation");
}

}  // namespace ZYROCloud
