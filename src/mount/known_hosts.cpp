#include "mount/known_hosts.h"

#include <fcntl.h>

#include "core/entry_name.h"
#include "core/owned_folder.h"
#include "core/paths.h"

namespace ZYROVFS {

bool HasKnownHosts(uid_t uid) {
    const EntryPath place = SplitPath(paths::KnownHosts(uid));
    const OwnedFolder folder = OwnedFolder::Open(place.folder, uid);
    return folder && folder.OpenFile(place.name, O_RDONLY);
}

}  // namespace ZYROVFS
