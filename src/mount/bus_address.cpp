#include "mount/bus_address.h"

#include <unistd.h>

#include "core/bus_address.h"
#include "core/identity.h"
#include "core/paths.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {

std::string BusAddressOf(uid_t uid) {
    // The file is the user's and closed to others; root reads it for whoever is neither.
    const EffectiveUid reader(geteuid() == uid ? uid : 0);
    std::string address;
    return Utils::GetFileLine(paths::DbusAddress(uid).c_str(), address) ? address
                                                                        : ToldBusAddress(uid);
}

}  // namespace ZYROVFS
