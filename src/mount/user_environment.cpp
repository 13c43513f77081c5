#include "mount/user_environment.h"

#include <array>
#include <cstdlib>

#include "core/paths.h"
#include "mount/bus_address.h"

namespace ZYROVFS {

std::vector<std::string> UserEnvironment(uid_t uid) {
    // A proxy's names are those of the platform's resolver, which answers backends that ask.
    constexpr std::array kKept = {
        "LANG",        "LC_ALL",      "LC_CTYPE",  "LC_MESSAGES", "TZ",
        "http_proxy",  "https_proxy", "ftp_proxy", "all_proxy",   "no_proxy",
        "HTTPS_PROXY", "FTP_PROXY",   "ALL_PROXY", "NO_PROXY",
    };
    std::vector<std::string> environment = {
        "PATH=/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin",
        "ZYROVFS_UID=" + std::to_string(uid),
        "XDG_RUNTIME_DIR=" + paths::RuntimeDir(uid),
    };
    const std::string bus = BusAddressOf(uid);
    if (!bus.empty()) {
        environment.push_back("DBUS_SESSION_BUS_ADDRESS=" + bus);
    }
    for (const char* name : kKept) {
        if (const char* value = getenv(name)) {
            environment.push_back(std::string(name) + "=" + value);
        }
    }
    return environment;
}

}  // namespace ZYROVFS
