#include "core/no_throw.h"
#include "server/mount_file.h"
#include "zyrovfs/protocol.h"

namespace ZYROVFS::Protocol {

bool GetProtocol(const char* protocol, Json::Value& out) {
    if (protocol == nullptr) {
        return Fail(VFS_ERR_FAILED);
    }
    return NoThrow(VFS_ERR_FAILED, [&] {
        MountFile file;
        if (!file.Init()) {
            return false;
        }
        out = Json::Value(Json::objectValue);
        if (!file.ReadProtocol(protocol)) {
            return false;
        }
        out = ToJson(file.Record());
        return true;
    });
}

}  // namespace ZYROVFS::Protocol
