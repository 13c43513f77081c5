#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>

#include "core/bus_address.h"
#include "core/error_cell.h"
#include "core/handle.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "core/paths.h"
#include "mount/bus_address.h"
#include "mount/daemon.h"
#include "mount/glib_handle.h"
#include "mount/program.h"
#include "mount/user_environment.h"
#include "zyrovfs/global.h"
#include "zyrovfs/utils.h"
#include "zyrovfs/vfs.h"

namespace ZYROVFS {
namespace {

using UniqueChannel = std::unique_ptr<GIOChannel, FreeWith<g_io_channel_unref>>;

/** How long a bus that lives may keep its address to itself, beyond the fixed wait. */
constexpr auto kAddressPatience = std::chrono::seconds(10);

/** A gvfsd that dies is activated again by the bus and would then bring up a fuse daemon of its
 * own, at the place of ours. The address of a bus before is nothing to the new one. */
std::vector<std::string> BusEnvironment(uid_t uid) {
    std::vector<std::string> environment = UserEnvironment(uid);
    const auto is_address = [](const std::string& entry) {
        return entry.rfind("DBUS_SESSION_BUS_ADDRESS=", 0) == 0;
    };
    environment.erase(std::remove_if(environment.begin(), environment.end(), is_address),
                      environment.end());
    environment.emplace_back("GVFS_DISABLE_FUSE=1");
    return environment;
}

/** The pid of a bus that prints its address to `address_fd`; 0 on failure. */
pid_t SpawnBus(int address_fd, uid_t uid) {
    const Program bus{{paths::kDbusDaemon, "--session", "--print-address=3"},
                      BusEnvironment(uid),
                      {-1, -1, -1, address_fd}};
    return std::max(StartDaemon(bus, uid), 0);
}

bool WaitReadable(int fd, std::chrono::steady_clock::time_point end) {
    const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(
        end - std::chrono::steady_clock::now());
    GPollFD poll{fd, G_IO_IN | G_IO_HUP, 0};
    return g_poll(&poll, 1, std::max(0, static_cast<int>(left.count()))) > 0;
}

/** First line, without its end; empty when the writers are gone or say nothing. */
std::string ReadAddress(int fd) {
    const UniqueChannel channel(g_io_channel_unix_new(fd));
    g_io_channel_set_flags(channel.get(), G_IO_FLAG_NONBLOCK, nullptr);
    const auto end = std::chrono::steady_clock::now() + kAddressPatience;
    for (;;) {
        char* line = nullptr;
        gsize terminator = 0;
        const GIOStatus status =
            g_io_channel_read_line(channel.get(), &line, nullptr, &terminator, nullptr);
        const UniqueCString owner(line);
        if (status != G_IO_STATUS_AGAIN) {
            return line == nullptr ? std::string() : std::string(line, terminator);
        }
        if (!WaitReadable(fd, end)) {
            return std::string();
        }
    }
}

/** Starts a bus; its address, empty on failure. */
std::string RunBus(uid_t uid, pid_t& pid) {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) != 0) {
        LOG_ERROR("Failed to create pipe, %m");
        return std::string();
    }
    const UniqueFd address(ends[0]);
    UniqueFd printer(ends[1]);
    pid = SpawnBus(printer.Get(), uid);
    // A bus that died has to be seen as the end of the pipe, so ours must not keep it open.
    printer.Reset();
    std::string line;
    if (pid != 0) {
        sleep(3);
        line = ReadAddress(address.Get());
    }
    if (line.empty()) {
        LOG_ERROR("Error launching D-Bus");
    }
    return line;
}

bool Launch(uid_t uid) {
    pid_t pid = 0;
    const std::string address = RunBus(uid, pid);
    if (address.empty()) {
        LOG_ERROR("Failed to run dbus, uid=%u", uid);
        return false;
    }
    const std::string path = paths::DbusAddress(uid);
    if (!Utils::CreateFile(path.c_str(), address.c_str())) {
        LOG_ERROR("Failed to create %s, %m", path.c_str());
        return false;
    }
    return WritePid(kDbusDaemon, uid, pid) && SetBusAddress(uid, address);
}

/** A process that did not start the bus learns its address from the file. One that merely stands in
 * the environment may be somebody else's bus. */
bool TakeAddress() {
    const uid_t uid = GetActorUID();
    std::string address;
    if (Utils::LockMnt(false)) {
        const MountLockRelease release;
        address = BusAddressOf(uid);
    }
    if (address.empty() || !SetBusAddress(uid, address)) {
        LOG_ERROR("Can't find file, %s", paths::DbusAddress(uid).c_str());
        return Fail(VFS_ERR_DBUS_ADDRESS);
    }
    return true;
}

}  // namespace

bool DBUS::IsAlive(int pid) {
    return IsDaemonAlive(kDbusDaemon, pid);
}

bool DBUS::CheckDaemonDied() {
    return NoThrow(VFS_ERR_FAILED, [] { return ZYROVFS::CheckDaemonDied(kDbusDaemon); });
}

bool DBUS::DoKill() {
    return NoThrow(VFS_ERR_FAILED, [] {
        int pid = 0;
        return ReadPid(kDbusDaemon, pid) &&
               Utils::KillProc(pid, kDbusDaemon.process, GetActorUID(), true);
    });
}

bool DBUS::Init() {
    // Also where no lock was taken: a caller that holds the lock around a healthy chain loses it
    // here, and the releases that follow find nothing to do.
    const MountLockRelease release;
    return NoThrow(VFS_ERR_FAILED,
                   [] { return StartIfDead(kDbusDaemon, Launch) && TakeAddress(); });
}

}  // namespace ZYROVFS
