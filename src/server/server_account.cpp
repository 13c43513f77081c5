#include "server/server_account.h"

#include "core/error_cell.h"
#include "core/log.h"
#include "mount/init_global.h"
#include "zyrovfs/global.h"
#include "zyrovfs/server.h"
#include "zyrovfs/utils.h"
#include "zyrovfs/vfs.h"

namespace ZYROVFS::Server {

bool UnmountServer(unsigned int uid, const std::string& id, const char* uri_path) {
    InitGlobal(uid, false);
    VFS vfs;
    return vfs.Init(nullptr, nullptr, id.c_str(), uri_path, nullptr, Json::Value(Json::objectValue),
                    false) &&
           vfs.UnMount();
}

bool FindLocalPath(unsigned int uid, const std::string& id, const std::string& uri_path,
                   const std::string& codepage, std::string& remote, std::string& local,
                   SourceLine at) {
    // The lookup tells by an empty answer that it found nothing; its result only says that the
    // child which looked has ended well.
    if (Utils::GetFullPath(uid, id.c_str(), uri_path.c_str(), codepage.c_str(), remote, local) &&
        !local.empty()) {
        return true;
    }
    LOG_ERROR_AT(at, "Failed to get the path by %s, uid %u", id.c_str(), uid);
    return Fail(VFS_ERR_FAILED, at);
}

bool WriteSecret(const char* key, const std::string& plain, bool encrypt, Json::Value& out,
                 SourceLine at) {
    if (!encrypt) {
        out[key] = plain;
        return true;
    }
    char cipher[4096];
    if (!SzEncrypt(plain.c_str(), cipher, sizeof cipher)) {
        LOG_ERROR_AT(at, "SzEncrypt failed, " ZYROERR_FORMAT, ZYROERR_ARGS);
        return Fail(VFS_ERR_UNKNOWN, at);
    }
    out[key] = cipher;
    return true;
}

bool DecipherSecret(const char* key, Json::Value& conf, SourceLine at) {
    char plain[4097];
    if (!SzDecrypt(conf[key].asCString(), plain, sizeof plain)) {
        LOG_ERROR_AT(at, "SzDecrypt failed, " ZYROERR_FORMAT, ZYROERR_ARGS);
        return Fail(VFS_ERR_FAILED, at);
    }
    conf[key] = plain;
    return true;
}

std::string AccountNameOf(const std::string& email) {
    return email.substr(0, email.rfind('@'));
}

bool MountAccount(unsigned int uid, const std::string& email, const std::string& secret,
                  const std::string& id, const Json::Value& conf, bool force) {
    const std::string name = AccountNameOf(email);
    InitForMount(uid);
    VFS vfs;
    return vfs.Init(name.c_str(), secret.c_str(), id.c_str(), "", "", conf, force) && vfs.Mount();
}

bool WriteAccountPath(unsigned int uid, const std::string& id, const std::string& known,
                      Json::Value& out, SourceLine at) {
    std::string local = known;
    std::string remote;
    if (local.empty() && !FindLocalPath(uid, id, "", "", remote, local, at)) {
        return false;
    }
    out["path"] = local;
    return true;
}

void DumpAccount(const std::string& protocol, const std::string& uri, const std::string& alias,
                 const std::string& email, int connect_status, _tag_VFS_CONFIG_INFO_& info) {
    info.protocol = protocol;
    info.port = 0;
    info.hostname = uri;
    info.uri = uri;
    info.alias = alias;
    info.account = email;
    info.codepage.clear();
    info.uri_path.clear();
    info.connect_status = connect_status;
}

}  // namespace ZYROVFS::Server
