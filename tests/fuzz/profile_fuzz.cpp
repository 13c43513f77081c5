// Profile documents of any bytes through the store, the server types and the listing: whatever
// stands in a file, no operation crashes, and reading never changes the file.
#include <sys/stat.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>

#include "core/json.h"
#include "core/paths.h"
#include "zyrovfs/error.h"
#include "zyrovfs/server.h"

using namespace ZYROVFS;
using namespace ZYROVFS::Server;

namespace {

constexpr unsigned kUser = 65501;

void Check(bool holds) {
    if (!holds) {
        abort();
    }
}

std::string PathOf(VFS_CONFIG_MODE mode) {
    std::string path;
    Check(CfgGetPath(kUser, mode, path));
    return path;
}

void Put(const std::string& path, const uint8_t* data, size_t size) {
    FILE* file = fopen(path.c_str(), "wb");
    Check(file != nullptr);
    Check(size == 0 || fwrite(data, 1, size, file) == size);
    Check(fclose(file) == 0);
}

off_t SizeOf(const std::string& path) {
    struct stat info {};
    Check(stat(path.c_str(), &info) == 0);
    return info.st_size;
}

void Look(VFS_CONFIG_MODE mode) {
    Json::Value out;
    CfgGetByKey(kUser, mode, "protocol", "ftp", out);
    CfgIsFull(kUser, mode, "ftp");
    if (List(kUser, mode, nullptr, mode == VFS_CONFIG_CONNECT ? "port" : "alias", false, 1, 5,
             out)) {
        Check(out["total"].isIntegral());
        Check(out[mode == VFS_CONFIG_CONNECT ? "connections" : "profiles"].isArray());
    }
}

/** Reads and changes each saved profile; a change that is taken leaves a document that reads. */
void Change() {
    Json::Value doc;
    if (!CfgAccess(kUser, VFS_CONFIG_SERVER, VFS_CONFIG_READ, doc) || !doc.isObject() ||
        !doc["servers"].isObject()) {
        return;
    }
    Json::Value changes, out;
    changes["alias"] = "changed";
    for (std::string id : doc["servers"].getMemberNames()) {
        Get(kUser, VFS_CONFIG_SERVER, id.c_str(), true, false, out);
        if (Set(kUser, VFS_CONFIG_SERVER, id, changes, false)) {
            Check(CfgGetByID(kUser, VFS_CONFIG_SERVER, id.c_str(), out));
        }
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static const std::string files[] = {PathOf(VFS_CONFIG_SERVER), PathOf(VFS_CONFIG_CONNECT)};
    for (const VFS_CONFIG_MODE mode : {VFS_CONFIG_SERVER, VFS_CONFIG_CONNECT}) {
        Put(files[mode], data, size);
    }
    for (const VFS_CONFIG_MODE mode : {VFS_CONFIG_SERVER, VFS_CONFIG_CONNECT}) {
        Look(mode);
        Check(SizeOf(files[mode]) == static_cast<off_t>(size));
    }
    Change();
    return 0;
}
