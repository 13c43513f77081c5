#include <zosplatform/file.h>

#include <algorithm>
#include <vector>

#include "core/no_throw.h"
#include "core/paths.h"
#include "server/config_document.h"
#include "server/mount_file.h"
#include "zyrovfs/protocol.h"
#include "zyrovfs/server.h"

namespace ZYROVFS::Protocol {
namespace {

constexpr unsigned int kListSize = 1024;
constexpr const char* kSuffix = ".mount";

using Info = _tag_VFS_PROTOCOL_INFO_;
using NameList = std::unique_ptr<_tag_YLIBCSZLIST_, FreeWith<YLIBCSzListFree>>;

bool ProtocolCompare(const Info& a, const Info& b) {
    return YLIBCUnicodeUTF8StrCaseCmp(a.name.c_str(), b.name.c_str()) < 0;
}

bool EnumFiles(NameList& names) {
    PYLIBCSZLIST list = names.release();
    const int count = YLIBCFileEnumDir(paths::kCatalogueDir, YLIBC_ENUM_SUFFIX, kSuffix, &list);
    names.reset(list);
    if (count < 0) {
        LOG_ERROR("YLIBCFileEnumDir failed: %s, " ZYROERR_FORMAT, paths::kCatalogueDir,
                  ZYROERR_ARGS);
        return Fail(VFS_ERR_FAILED);
    }
    return true;
}

/** One file that cannot be read loses the whole list: a partial one would pass for complete. */
bool ReadFiles(const NameList& names, MountFile& file, std::vector<Info>& records) {
    for (int i = 0; const char* name = YLIBCSzListGet(names.get(), i); ++i) {
        if (!file.Read(std::string(paths::kCatalogueDir) + "/" + name)) {
            return false;
        }
        records.push_back(file.Record());
    }
    return true;
}

bool List(Json::Value& out) {
    NameList names(YLIBCSzListAlloc(kListSize));
    if (!names) {
        LOG_ERROR("YLIBCSzListAlloc(%u) failed " PLATFORM_ERROR_FORMAT, kListSize, ZYROERR_ARGS);
        return Fail(VFS_ERR_OUT_OF_MEMORY);
    }
    MountFile file;
    if (!file.Init()) {
        return false;
    }
    out = Json::Value(Json::arrayValue);
    if (YLIBCFileCheckDir(paths::kCatalogueDir) == 0) {
        return true;
    }
    std::vector<Info> records;
    if (!EnumFiles(names) || !ReadFiles(names, file, records)) {
        return false;
    }
    std::stable_sort(records.begin(), records.end(), ProtocolCompare);
    for (const Info& record : records) {
        Json::Value element = ToJson(record);
        element["default_port"] = record.default_port;
        out.append(std::move(element));
    }
    return true;
}

bool HasServer(const Json::Value& servers, const char* protocol) {
    return std::any_of(servers.begin(), servers.end(), [&](const Json::Value& profile) {
        return Server::HasText(profile, "protocol", protocol);
    });
}

}  // namespace

bool ListProtocol(Json::Value& out) {
    return NoThrow(VFS_ERR_FAILED, [&] { return List(out); });
}

bool ListProtocolByUID(unsigned int uid, Json::Value& out) {
    return NoThrow(VFS_ERR_FAILED, [&] {
        if (!ListProtocol(out)) {
            LOG_ERROR("ListProtocol failed, " ZYROERR_FORMAT, ZYROERR_ARGS);
            return false;
        }
        Json::Value document;
        if (!Server::CfgAccess(uid, Server::VFS_CONFIG_SERVER, Server::VFS_CONFIG_READ, document)) {
            LOG_ERROR("LoadVFSServerCfg failed: %d, " ZYROERR_FORMAT, static_cast<int>(uid),
                      ZYROERR_ARGS);
            return Fail(VFS_ERR_CONFIG_READ);
        }
        const Json::Value& servers = Server::ServersOf(document);
        for (Json::Value& element : out) {
            // Links that others share are there to be opened without any saved server.
            const std::string protocol = element["protocol"].asString();
            element["has_server"] = protocol == "sharing" || HasServer(servers, protocol.c_str());
        }
        return true;
    });
}

}  // namespace ZYROVFS::Protocol
