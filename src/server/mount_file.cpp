#include "server/mount_file.h"

#include <zosplatform/file.h>

#include <cstdlib>
#include <cstring>

#include "core/error_cell.h"
#include "core/log.h"
#include "core/paths.h"

namespace ZYROVFS::Protocol {
namespace {

constexpr unsigned int kHashSize = 1024;
constexpr const char* kSection = "Mount";
constexpr const char* kSuffix = ".mount";

}  // namespace

bool MountFile::Init(SourceLine at) {
    hash_.reset(YLIBCSzHashAlloc(kHashSize));
    if (!hash_) {
        LOG_ERROR_AT(at, "YLIBCSzHashAlloc(%u) failed " PLATFORM_ERROR_FORMAT, kHashSize,
                     ZYROERR_ARGS);
        return Fail(VFS_ERR_OUT_OF_MEMORY, at);
    }
    return true;
}

bool MountFile::Read(const std::string& path, SourceLine at) {
    // The platform may put a larger hash in the place of the one it was given.
    PYLIBCSZHASH hash = hash_.release();
    const int keys = YLIBCFileGetSection(path.c_str(), kSection, &hash);
    hash_.reset(hash);
    if (keys == -1) {
        LOG_ERROR_AT(at, "YLIBCFileGetSection failed: %s, " ZYROERR_FORMAT, path.c_str(),
                     ZYROERR_ARGS);
        return Fail(VFS_ERR_FAILED, at);
    }
    return true;
}

bool MountFile::ReadProtocol(const char* protocol, SourceLine at) {
    const std::string path = std::string(paths::kCatalogueDir) + "/" + protocol + kSuffix;
    // The name comes from profiles: with a slash it would be a file outside of the catalogue.
    if (std::strchr(protocol, '/') != nullptr) {
        YLIBCErrSetEx(ZOS_ERR_NOT_FOUND, at.file, at.line);
        LOG_ERROR_AT(at, "YLIBCFileGetSection failed: %s, " ZYROERR_FORMAT, path.c_str(),
                     ZYROERR_ARGS);
        return Fail(VFS_ERR_FAILED, at);
    }
    return Read(path, at);
}

const char* MountFile::Get(const char* key, const char* absent) const {
    const char* value = YLIBCSzHashGetValue(hash_.get(), key);
    return value == nullptr ? absent : value;
}

_tag_VFS_PROTOCOL_INFO_ MountFile::Record() const {
    return {Get("Protocol", ""), Get("Name", ""), Get("Actions", ""), Get("EnableCurl", "false"),
            static_cast<unsigned int>(std::strtol(Get("DefaultPort", "80"), nullptr, 10))};
}

Json::Value ToJson(const _tag_VFS_PROTOCOL_INFO_& info) {
    Json::Value value(Json::objectValue);
    value["protocol"] = info.protocol;
    value["name"] = info.name;
    value["api"] = info.api;
    value["enable_curl"] = info.enable_curl;
    return value;
}

}  // namespace ZYROVFS::Protocol
