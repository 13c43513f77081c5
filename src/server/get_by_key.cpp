#include "core/no_throw.h"
#include "server/mount_file.h"
#include "zyrovfs/protocol.h"

namespace ZYROVFS::Protocol {

bool GetByKey(const char* protocol, const char* key, std::string& value) {
    if (protocol == nullptr || key == nullptr) {
        return Fail(VFS_ERR_FAILED);
    }
    return NoThrow(VFS_ERR_FAILED, [&] {
        MountFile file;
        if (!file.Init() || !file.ReadProtocol(protocol)) {
            return false;
        }
        value = file.Get(key, "");
        return true;
    });
}

}  // namespace ZYROVFS::Protocol
