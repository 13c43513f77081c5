#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>

#include "core/error_cell.h"
#include "core/handle.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "core/paths.h"
#include "mount/daemon.h"
#include "mount/glib_handle.h"
#include "zyrovfs/global.h"
#include "zyrovfs/utils.h"
#include "zyrovfs/vfs.h"

namespace ZYROVFS {
namespace {

using UniqueStrv = std::unique_ptr<char*, FreeWith<g_strfreev>>;
using UniqueChannel = std::unique_ptr<GIOChannel, FreeWith<g_io_channel_unref>>;

constexpr const char* kBusAddress = "DBUS_SESSION_BUS_ADDRESS";
constexpr int kLastInheritedFd = 1023;

/** How long a bus that lives may keep its address to itself, beyond the fixed wait. */
constexpr auto kAddressPatience = std::chrono::seconds(10);

struct BusChild {
    int address_fd;
    uid_t uid;
};

void SetUpBus(gpointer data) {
    const auto* child = static_cast<const BusChild*>(data);
    PointStdioAtNull();
    for (int fd = STDERR_FILENO + 1; fd <= kLastInheritedFd; ++fd) {
        if (fd != child->address_fd) {
            close(fd);
        }
    }
    fcntl(child->address_fd, F_SETFD, 0);
    BecomeDaemonOf(child->uid);
}

/** A gvfsd that dies is activated again by the bus and would then bring up a fuse daemon of its
 * own, at the place of ours. */
UniqueStrv BusEnvironment() {
    return UniqueStrv(g_environ_setenv(g_get_environ(), "GVFS_DISABLE_FUSE", "1", TRUE));
}

/** The pid of a bus that prints its address to `address_fd`; 0 on failure. */
GPid SpawnBus(int address_fd, uid_t uid) {
    const std::string command = std::string(paths::kDbusDaemon) +
                                " --session --print-address=" + std::to_string(address_fd);
    char** words = nullptr;
    GError* error = nullptr;
    GPid pid = 0;
    g_shell_parse_argv(command.c_str(), nullptr, &words, &error);
    const UniqueStrv argv(words);
    BusChild child{address_fd, uid};
    if (error == nullptr) {
        g_spawn_async(nullptr, argv.get(), BusEnvironment().get(), G_SPAWN_LEAVE_DESCRIPTORS_OPEN,
                      SetUpBus, &child, &pid, &error);
    }
    const UniqueError failure(error);
    return failure == nullptr ? pid : 0;
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
std::string RunBus(uid_t uid, GPid& pid) {
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
    GPid pid = 0;
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
    return WritePid(kDbusDaemon, uid, pid) && setenv(kBusAddress, address.c_str(), 1) == 0;
}

bool ReadAddressFile(const std::string& path, std::string& address) {
    if (!Utils::LockMnt(false)) {
        return false;
    }
    const MountLockRelease release;
    return Utils::GetFileLine(path.c_str(), address);
}

/** A process that did not start the bus learns its address from the file. */
bool TakeAddress() {
    if (getenv(kBusAddress) != nullptr) {
        return true;
    }
    const std::string path = paths::DbusAddress(GetActorUID());
    std::string address;
    if (!ReadAddressFile(path, address) || setenv(kBusAddress, address.c_str(), 1) != 0) {
        LOG_ERROR("Can't find file, %s", path.c_str());
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
