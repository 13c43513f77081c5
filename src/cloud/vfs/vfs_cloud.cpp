#include "cloud/vfs/vfs_cloud.h"

#include <curl/curl.h>
#include <strings.h>

#include <cstring>
#include <memory>
#include <new>

#include "cloud/attempt.h"
#include "cloud/fuse_attr.h"
#include "cloud/guard.h"
#include "cloud/profile_member.h"
#include "cloud/upload_body.h"
#include "core/handle.h"
#include "core/json.h"
#include "http/api_handler.h"
#include "zyrovfs/server.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

constexpr int kUploadRetries = 3;
constexpr const char* kUtf8 = "UTF-8";
constexpr const char* kAnonymous = "anonymous";
/** A refusal of what stands behind an asterisk is ignored. */
constexpr const char* kUtf8Command = "*OPTS UTF8 ON";
constexpr size_t kDescriptionSize = 32;
/** What the mounted tree says of a server that stumbles over extended passive mode. */
constexpr int64_t kNoExtendedPassive = 2;

bool StartsWithCaseless(const std::string& text, const char* start) {
    return strncasecmp(text.c_str(), start, strlen(start)) == 0;
}

bool IsDav(const std::string& text) {
    return StartsWithCaseless(text, "dav");
}

}  // namespace

VFSCloud::VFSCloud() {
    VFSCloud::Init();
}

VFSCloud::VFSCloud(unsigned int owner, const Json::Value& config)
    : Cloud(owner, ProfileMember(config, "server_id", "test")),
      account_(ProfileMember(config, "account")),
      password_(ProfileMember(config, "password")),
      code_page_(ProfileMember(config, "codepage")),
      protocol_(ProfileMember(config, "protocol")) {
    VFSCloud::Init();
}

bool VFSCloud::Init() {
    // NOLINTNEXTLINE(clang-analyzer-optin.cplusplus.VirtualCall): no part is missing here
    return SetAPIErrorHandler(api);
}

bool VFSCloud::SetAPIErrorHandler(APIHandler* handler) {
    if (handler == nullptr) {
        return false;
    }
    ErrorHandler* errors = IsDav(protocol_)
                               ? static_cast<ErrorHandler*>(new (std::nothrow) DavErrorHandler)
                               : new (std::nothrow) FTPErrorHandler;
    return errors != nullptr && handler->SetErrorHandler(errors);
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
        if (api != nullptr) {
            const Login login = LogInAs();
            api->ExpectVFSURL(url, login.user, login.password);
        }
        return true;
    });
}

// Everything but contents goes through the mount.

bool VFSCloud::GetAccountInfo(const Json::Value&, Json::Value&) {
    LOG_ERROR("VFSCloud not implement get account info");
    return false;
}

bool VFSCloud::GetFileInfo(const std::string&, const Json::Value&, Json::Value&) {
    LOG_ERROR("VFSCloud not implement get file info");
    return false;
}

bool VFSCloud::ListFolder(const std::string&, const Json::Value&, Json::Value&) {
    LOG_ERROR("VFSCloud not implement list operation");
    return false;
}

bool VFSCloud::CreateFolder(const std::string&, const std::string&, const Json::Value&) {
    LOG_ERROR("VFSCloud not implement create folder operation");
    return false;
}

bool VFSCloud::Delete(const std::string&) {
    LOG_ERROR("VFSCloud not implement delete operation");
    return false;
}

bool VFSCloud::Rename(const std::string&, const std::string&) {
    LOG_ERROR("VFSCloud not implement rename operation");
    return false;
}

bool VFSCloud::Copy(const std::string&, const std::string&) {
    LOG_ERROR("VFSCloud not implement copy operation");
    return false;
}

bool VFSCloud::Move(const std::string&, const std::string&) {
    LOG_ERROR("VFSCloud not implement move operation");
    return false;
}

// --- contents ---------------------------------------------------------------------------------

bool VFSCloud::FailLocally() {
    SetError(VFS_ERR_CLOUD_FAILED, "");
    return false;
}

bool VFSCloud::isSetFTPEPSV(const std::string&) {
    std::string path;
    std::string text;
    int64_t description = 0;
    return !(GetFullPathByURI(GetServerID(), path) &&
             fuse_attr::ReadDescription(path + "/", kDescriptionSize, text) &&
             json::toInt64(Json::Value(text), description) && description == kNoExtendedPassive);
}

/** libcurl knows how a guest logs in at an FTP server; an empty user is none that a server knows.
 */
VFSCloud::Login VFSCloud::LogInAs() const {
    const bool guest = password_.empty() && (account_.empty() || account_ == kAnonymous);
    return guest && StartsWithCaseless(protocol_, "ftp") ? Login() : Login{account_, password_};
}

bool VFSCloud::Prepare(XferData* xfer) {
    const Login login = LogInAs();
    const bool ready = api != nullptr && api->Init() && InitXferData(xfer) &&
                       api->SetUserPwOpt(login.user, login.password);
    return ready || FailLocally();
}

bool VFSCloud::SetUpFTP(const std::string& url, curl_slist** commands) {
    if (!StartsWithCaseless(url, "ftp://") && !StartsWithCaseless(url, "ftps://")) {
        return true;
    }
    if (code_page_ == kUtf8) {
        *commands = curl_slist_append(nullptr, kUtf8Command);
        if (*commands == nullptr || !api->SetCodePage(code_page_, commands)) {
            return FailLocally();
        }
    }
    if (!isSetFTPEPSV(url)) {
        api->SetFTPEPSV(false);
    }
    api->SetFTPCWD(true);
    return true;
}

bool VFSCloud::UploadProcess(XferData* xfer, const Json::Value& meta) {
    return Guard(*this, [&] {
        if (xfer == nullptr) {
            return false;
        }
        const std::string url = meta.get("url", "").asString();
        curl_slist* commands = nullptr;
        const ScopeExit free_commands([&commands] { curl_slist_free_all(commands); });
        if (!Prepare(xfer)) {
            return false;
        }
        UploadBody body(*xfer);
        body.GiveTo(*api);
        api->SetVFSURL(url);
        if (!SetUpFTP(url, &commands)) {
            return false;
        }
        api->SetUploadOpt(true);
        const UploadSize size(meta);
        if (IsDav(url) && size.known && size.total >= 1) {
            api->SetUploadSize(static_cast<long long>(size.total));
        }
        return Send(url);
    });
}

bool VFSCloud::Send(const std::string& url) {
    if (api->Process(kUploadRetries)) {
        return true;
    }
    SetError(api->GetError());
    LOG_ERROR(kRequestFailed, url.c_str(), json::toString(GetError()).c_str());
    return false;
}

bool VFSCloud::DownloadProcess(XferData* xfer, const Json::Value& meta) {
    return Guard(*this, [&] {
        const std::string url = meta.get("url", "").asString();
        curl_slist* commands = nullptr;
        const ScopeExit free_commands([&commands] { curl_slist_free_all(commands); });
        if (xfer == nullptr || !Prepare(xfer)) {
            return false;
        }
        if (!SetRange(*this, meta)) {
            return FailLocally();
        }
        api->SetVFSURL(url);
        return SetUpFTP(url, &commands) && Receive(xfer, url);
    });
}

bool VFSCloud::Receive(XferData* xfer, const std::string& url) {
    AttemptPlan plan = DownloadPlan(*this, *xfer, url);
    plan.send = [this] { return api->Process(0); };
    plan.copy = CopyError::kAtEnd;
    return RunAttempts(*this, plan);
}

}  // namespace ZYROCloud
