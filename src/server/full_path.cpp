#include <gio/gio.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <memory>

#include "core/fd_io.h"
#include "core/handle.h"
#include "core/log.h"
#include "core/no_throw.h"
#include "mount/glib_handle.h"
#include "mount/helper.h"
#include "mount/run_as_user.h"
#include "mount/server_uri.h"
#include "server/helper_program.h"
#include "server/location_id.h"
#include "zyrovfs/global.h"
#include "zyrovfs/server.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS::Utils {
namespace {

/** The parent takes an answer in pieces of this size and keeps the last one. */
constexpr size_t kPiece = 8201;

/**
 * Set while a connection is made on demand, in this process and in the helpers that it starts
 * meanwhile. Making a connection looks its path up again; without this mark a location to which
 * GIO gives no path would be connected on demand in ever more helpers.
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
 * In the helper. A lookup that finds nothing answers with nothing, and a helper that could not
 * become the user ends with 1.
 */
void AskGioJob(const Json::Value& request) {
    if (!BecomeUserInHelper(UserOf(request))) {
        EndHelper(1);
    }
    std::string full;
    EndHelper(AskGio(request["uri"].asCString(), full) && !WriteAll(STDOUT_FILENO, full) ? 1 : 0);
}

bool LookUp(const Json::Value& request) {
    const std::string id = request["id"].asString();
    const std::string remote = request["remote"].asString();
    const std::string behind = remote.empty() ? "" : "/" + remote;
    const std::string uri = id + behind;
    std::string full;
    if (!AskGio((ReadableUri(id) + behind).c_str(), full) &&
        !GetFullPathByConfig(uri.c_str(), full)) {
        LOG_ERROR("Failed to get full path, %s", uri.c_str());
        return false;
    }
    return WriteAll(STDOUT_FILENO, remote.empty() ? full : full + "\n" + remote);
}

void LookUpJob(const Json::Value& request) {
    if (!BecomeUserInHelper(UserOf(request))) {
        EndHelper(1);
    }
    connecting_on_demand = request["connecting"].asBool();
    NoThrow(VFS_ERR_FAILED, [&] { return LookUp(request); });
    EndHelper(0);
}

/**
 * A process whose every id is the user's, such as a backend, asks by itself. With root's identity
 * behind it, it could not speak to the user's bus.
 */
bool IsWhollyTheUser() {
    uid_t real = 0;
    uid_t effective = 0;
    uid_t saved = 0;
    return getresuid(&real, &effective, &saved) == 0 && real == GetActorUID() &&
           effective == real && saved == real;
}

bool AskGioAsUser(const char* uri, std::string& full) {
    if (IsWhollyTheUser()) {
        return AskGio(uri, full);
    }
    Json::Value request(Json::objectValue);
    request["uri"] = uri;
    const SigchldGuard collectable;
    const HelperRun run = RunAsUser(kAskGioJob.name, GetActorUID(), request, ReadLastPiece);
    if (run.Result() != 0 || run.report.empty()) {
        return false;
    }
    full = run.report;
    return true;
}

bool LookUpInHelper(unsigned int uid, const std::string& id, const std::string& remote,
                    std::string& uriOut, std::string& fullOut) {
    Json::Value request(Json::objectValue);
    request["id"] = id;
    request["remote"] = remote;
    request["connecting"] = connecting_on_demand;
    const SigchldGuard collectable;
    const HelperRun run = RunAsUser(kLookUpJob.name, uid, request, ReadLastPiece);
    if (run.how != HelperRun::kEnded) {
        return false;
    }
    SplitAnswer(run.report, uriOut, fullOut);
    return run.Result() == 0;
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
                   [&] { return AskGioAsUser(uri, full) || GetFullPathByConfig(uri, full); });
}

bool GetFullPath(unsigned int uid, const char* serverId, const char* path, const char* codepage,
                 std::string& uriOut, std::string& fullOut) {
    if (serverId == nullptr) {
        LOG_ERROR("Wrong parameters");
        return false;
    }
    return NoThrow(VFS_ERR_FAILED, [&] {
        const std::string remote = ToCodepage(path, codepage);
        return LookUpInHelper(uid, serverId, remote, uriOut, fullOut);
    });
}

}  // namespace ZYROVFS::Utils

namespace ZYROVFS {

const HelperJob kAskGioJob = {"ask-gio", Utils::AskGioJob};
const HelperJob kLookUpJob = {"look-up", Utils::LookUpJob};

}  // namespace ZYROVFS
