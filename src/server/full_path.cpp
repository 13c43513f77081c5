#include <fcntl.h>
#include <gio/gio.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <memory>

#include "core/fd_io.h"
#include "core/handle.h"
#include "core/identity.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "mount/fork_as_user.h"
#include "mount/glib_handle.h"
#include "mount/server_uri.h"
#include "server/location_id.h"
#include "zyrovfs/global.h"
#include "zyrovfs/server.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS::Utils {
namespace {

/** The parent takes an answer in pieces of this size and keeps the last one. */
constexpr size_t kPiece = 8201;

/**
 * Set while a connection is made on demand, in this process and in the children that it forks
 * meanwhile. Making a connection looks its path up again; without this mark a location to which
 * GIO gives no path would be connected on demand in ever deeper children.
 */
bool connecting_on_demand = false;

bool Connect(std::string& id) {
    if (connecting_on_demand) {
        return false;
    }
    connecting_on_demand = true;
    const ScopeExit done([] { connecting_on_demand = false; });
    Json::Value out;
    return Server::Add(GetActorUID(), Server::VFS_CONFIG_CONNECT, id, Json::Value(), false, out);
}

/** The connection's local path, if it is recorded with one. */
bool RecordedPath(const char* uri, std::string& id, std::string& rest, std::string& path) {
    Json::Value record;
    if (!Server::FindConnection(uri, id, rest, record) || !record.isMember("path")) {
        return false;
    }
    path = record["path"].asString();
    return true;
}

/** What is left of an answer that came in several pieces: the last one. */
std::string ReadLastPiece(int fd) {
    char buffer[kPiece];
    size_t last = 0;
    for (;;) {
        const ssize_t n = read(fd, buffer, sizeof buffer);
        if (n > 0) {
            last = static_cast<size_t>(n);
        } else if (n == 0 || errno != EINTR) {
            return std::string(buffer, strnlen(buffer, last));
        }
    }
}

void SplitAnswer(const std::string& answer, std::string& uriOut, std::string& fullOut) {
    const size_t newline = answer.find('\n');
    fullOut = answer.substr(0, newline);
    if (newline != std::string::npos) {
        uriOut = answer.substr(newline + 1);
    }
}

std::string ToCodepage(const char* path, const char* codepage) {
    std::string remote = path == nullptr ? "" : path;
    if (codepage != nullptr && *codepage != '\0' && strcmp(codepage, "UTF-8") != 0) {
        const std::string utf8 = remote;
        ConvString(remote, utf8.c_str(), "UTF-8", codepage);
    }
    return remote;
}

bool AskGio(const char* uri, std::string& full) {
    const UniqueObject<GFile> file(g_file_new_for_commandline_arg(ReadableUri(uri).c_str()));
    const UniqueGText path(file ? g_file_get_path(file.get()) : nullptr);
    if (!path) {
        return false;
    }
    full = path.get();
    return true;
}

/**
 * AskGio in a process of its own. GIO's bus connection works only in the process that made it: a
 * child that had asked GIO itself could no longer connect on demand, since the mount child that it
 * forks would wait on a connection whose thread is not there. 0, also when GIO tells no path and
 * `full` stays empty; another number when the process could not be run to its end.
 */
int AskGioApart(const char* uri, std::string& full) {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) != 0) {
        LOG_ERROR("Failed to create pipe");
        return -1;
    }
    UniqueFd in(ends[0]);
    UniqueFd out(ends[1]);
    const pid_t child = fork();
    if (child == 0) {
        NoThrow(VFS_ERR_FAILED, [&] { return AskGio(uri, full) && WriteAll(out.Get(), full); });
        _exit(0);
    }
    out.Reset();
    if (child < 0) {
        LOG_ERROR("Failed to fork, %m");
        return -1;
    }
    full = ReadLastPiece(in.Get());
    return WaitForChild(child).Result();
}

/** A process that acts for somebody else may be about to fork a mount child, which must not inherit
 * GIO's connection. A backend, which is the user, has threads and must not fork for a question. */
bool AskGioSafely(const char* uri, std::string& full) {
    if (geteuid() == GetActorUID()) {
        return AskGio(uri, full);
    }
    std::string answer;
    if (AskGioApart(uri, answer) != 0 || answer.empty()) {
        return false;
    }
    full = answer;
    return true;
}

/**
 * The child. It writes its answer past the C library's buffer, which may hold output of the parent,
 * and ends without the parent's exit handlers. A lookup that finds nothing answers with nothing.
 */
[[noreturn]] void LookUpAndExit(int pipe_end, unsigned int uid, const std::string& id,
                                const std::string& remote) {
    if (pipe_end != STDOUT_FILENO && dup2(pipe_end, STDOUT_FILENO) < 0) {
        _exit(1);
    }
    const EffectiveUid root(0);
    if (!BecomeUserForGood(uid)) {
        _exit(1);
    }
    NoThrow(VFS_ERR_FAILED, [&] {
        const std::string behind = remote.empty() ? "" : "/" + remote;
        const std::string uri = id + behind;
        std::string full;
        if (AskGioApart((ReadableUri(id) + behind).c_str(), full) != 0) {
            _exit(1);
        }
        if (full.empty() && !GetFullPathByConfig(uri.c_str(), full)) {
            LOG_ERROR("Failed to get full path, %s", uri.c_str());
            return false;
        }
        const std::string answer = remote.empty() ? full : full + "\n" + remote;
        return WriteAll(STDOUT_FILENO, answer);
    });
    _exit(0);
}

bool LookUpInChild(unsigned int uid, const std::string& id, const std::string& remote,
                   std::string& uriOut, std::string& fullOut) {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) != 0) {
        LOG_ERROR("Failed to create pipe");
        return false;
    }
    UniqueFd in(ends[0]);
    UniqueFd out(ends[1]);
    const pid_t child = fork();
    if (child == 0) {
        in.Reset();
        LookUpAndExit(out.Get(), uid, id, remote);
    }
    out.Reset();
    if (child < 0) {
        LOG_ERROR("Failed to fork, %m");
        return false;
    }
    const std::string answer = ReadLastPiece(in.Get());
    const int status = WaitForChild(child).Result();
    SplitAnswer(answer, uriOut, fullOut);
    return status == 0;
}

}  // namespace

bool GetPasswordByConfig(const char* uri, std::string& out) {
    return NoThrow(VFS_ERR_BAD_PARAM, [&] {
        std::string base;
        std::string rest;
        if (!GetURIParts(uri, base, rest)) {
            LOG_ERROR("Failed to get base uri, %s", uri == nullptr ? "(null)" : uri);
            return false;
        }
        Json::Value record;
        if (!Server::FindConnection(uri, base, rest, record)) {
            LOG_ERROR("Wrong parameters, %s, %s, %u", uri, base.c_str(), GetActorUID());
            return false;
        }
        out = record.get("password", "").asString();
        return true;
    });
}

bool GetFullPathByConfig(const char* uri, std::string& base, std::string& rest, std::string& full) {
    return NoThrow(VFS_ERR_BAD_PARAM, [&] {
        if (!GetURIParts(uri, base, rest)) {
            return false;
        }
        std::string path;
        if (!RecordedPath(uri, base, rest, path)) {
            if (!Connect(base)) {
                LOG_ERROR("Failed to add connection from server ID: %s", base.c_str());
                return false;
            }
            if (!RecordedPath(uri, base, rest, path)) {
                LOG_ERROR("Wrong parameters, %s, %s, %u", uri, base.c_str(), GetActorUID());
                return false;
            }
        }
        full = path + rest;
        return true;
    });
}

bool GetFullPathByConfig(const char* uri, std::string& full) {
    std::string base;
    std::string rest;
    return GetFullPathByConfig(uri, base, rest, full);
}

bool GetFullPath(const char* uri, std::string& full) {
    if (uri == nullptr) {
        LOG_ERROR("Wrong parameters");
        return false;
    }
    return NoThrow(VFS_ERR_FAILED,
                   [&] { return AskGioSafely(uri, full) || GetFullPathByConfig(uri, full); });
}

bool GetFullPath(unsigned int uid, const char* serverId, const char* path, const char* codepage,
                 std::string& uriOut, std::string& fullOut) {
    if (serverId == nullptr) {
        LOG_ERROR("Wrong parameters");
        return false;
    }
    return NoThrow(VFS_ERR_FAILED, [&] {
        const SigchldGuard collectable;
        const std::string remote = ToCodepage(path, codepage);
        return LookUpInChild(uid, serverId, remote, uriOut, fullOut);
    });
}

}  // namespace ZYROVFS::Utils
