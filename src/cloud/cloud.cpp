#include "zyrovfs/cloud.h"

#include <strings.h>
#include <sys/stat.h>
#include <zosplatform/ea.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <iterator>
#include <new>

#include "cloud/handler.h"
#include "core/log.h"
#include "zyrovfs/utils.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

constexpr unsigned int kNobody = 0xffffffff;
constexpr size_t kLongestName = 255;
constexpr size_t kLongestPath = 4096;

/** What desktops leave in every folder that they show. */
constexpr const char* kSkipped[] = {"desktop.ini", "thumbs.db", ".ds_store", "icon\r"};

/** Names that the shell of the box, or its own working folder, would trip over. */
constexpr const char* kHidden[] = {"\"", "'", ".ZyrotechWorkingDirectory"};

}  // namespace

APIHandler* NewHandler() noexcept try {
    return new (std::nothrow) APIHandler(LiveShare());
} catch (const std::bad_alloc&) {
    // A member of the handler found no memory.
    return nullptr;
}

Cloud::Cloud() : Cloud(kNobody, "") {}

Cloud::Cloud(unsigned int owner, const std::string& id)
    : uid(owner), server_id(id), api(NewHandler()), error(Json::objectValue) {}

Cloud::~Cloud() {
    delete api;
}

bool Cloud::GetMetaDataByURI(const std::string& uri, Json::Value& meta, const std::string&) {
    if (!meta.isNull() && !meta.isObject()) {
        SetError(VFS_ERR_CLOUD_FAILED, "");
        return false;
    }
    meta["url"] = uri;
    return true;
}

bool Cloud::GetFileSize(const std::string& uri, long long* size) {
    std::string path;
    if (size == nullptr) {
        return false;
    }
    if (!GetFullPathByURI(uri, path)) {
        LOG_ERROR("Failed to get full path from %s", uri.c_str());
        return false;
    }
    struct stat info {};
    if (stat(path.c_str(), &info) != 0) {
        const bool missing = errno == ENOENT || errno == ENOTDIR;
        LOG_ERROR("Failed to stat %s, %m", path.c_str());
        SetError(missing ? VFS_ERR_NOT_FOUND : VFS_ERR_CLOUD_FAILED, "");
        return false;
    }
    *size = info.st_size;
    return true;
}

bool Cloud::IsSkipMVCPFile(const std::string& path) {
    const char* name = basename(path.c_str());
    return std::any_of(std::begin(kSkipped), std::end(kSkipped),
                       [name](const char* skipped) { return strcasecmp(name, skipped) == 0; });
}

bool Cloud::CanFileUpload(unsigned long long) {
    return true;
}

bool Cloud::GetFullPathByURI(const std::string& uri, std::string& out) {
    return ZYROVFS::Utils::GetFullPathByConfig(uri.c_str(), out);
}

std::string Cloud::GetSharePathByServerPath(const std::string& path) {
    return server_id + path;
}

bool Cloud::GetFullPathByServerPath(const std::string& path, std::string& out) {
    return GetFullPathByURI(GetSharePathByServerPath(path), out);
}

std::string Cloud::GetServerPathBySharePath(const std::string& uri) {
    const size_t at = uri.find(server_id);
    return at == std::string::npos ? "" : uri.substr(at + server_id.size());
}

bool Cloud::IsHiddenFilePath(const std::string& path, const std::string& name) {
    return ZYROEAIsHiddenFile(name.c_str()) != 0 ||
           std::find(std::begin(kHidden), std::end(kHidden), name) != std::end(kHidden) ||
           name.size() > kLongestName || name.find('/') != std::string::npos ||
           path.size() > kLongestPath;
}

void Cloud::SetError(const Json::Value& record) {
    error = record;
}

void Cloud::SetError(__tag_vfs_err_ code, const std::string& msg) {
    if (!error.isObject()) {
        error = Json::Value(Json::objectValue);
    }
    error["code"] = static_cast<int>(code);
    error["msg"] = msg;
}

Json::Value Cloud::GetError() const {
    return error;
}

__tag_vfs_err_ Cloud::GetErrorCode() const {
    const Json::Value code = error.isObject() ? error["code"] : Json::Value();
    return code.isInt() ? static_cast<__tag_vfs_err_>(code.asInt()) : VFS_ERR_NONE;
}

bool Cloud::IsNeedRetry() {
    return api != nullptr && api->IsNeedRetry();
}

unsigned int Cloud::GetRetrySleepTime() {
    return api == nullptr ? 0 : api->GetRetrySleepTime();
}

APIHandler* Cloud::GetAPIHandler() {
    return api;
}

std::string Cloud::GetServerID() const {
    return server_id;
}

}  // namespace ZYROCloud
