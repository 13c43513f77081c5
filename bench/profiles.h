/** Profiles for benchmarks: FTP servers as a user would have saved them, and a cloud's connection.
 */
#ifndef ZYROVFS_BENCH_PROFILES_H
#define ZYROVFS_BENCH_PROFILES_H

#include <sys/stat.h>

#include <fstream>
#include <string>

#include "zyrovfs/server.h"

namespace bench {

inline constexpr unsigned kUid = 4001;

inline std::string Id(int number) {
    return "ftp://amy@nas" + std::to_string(number) + ".example";
}

inline std::string Enciphered(const std::string& password) {
    char buffer[4096];
    return ZYROVFS::Server::SzEncrypt(password.c_str(), buffer, sizeof buffer) != 0 ? buffer : "";
}

inline Json::Value Profile(int number, const std::string& password) {
    Json::Value profile;
    profile["protocol"] = "ftp";
    profile["hostname"] = "nas" + std::to_string(number) + ".example";
    profile["port"] = 21;
    profile["alias"] = "Server number " + std::to_string(number);
    profile["account"] = "amy";
    profile["password"] = password;
    profile["codepage"] = "UTF-8";
    profile["uri_path"] = "share/documents";
    profile["path"] = "";
    profile["max_connection"] = 0;
    return profile;
}

/** Replaces the user's saved profiles by `count` of them. */
inline void Fill(int count) {
    using namespace ZYROVFS::Server;
    const std::string password = Enciphered("correct horse battery staple");
    Json::Value document;
    document["servers"] = Json::objectValue;
    for (int i = 0; i < count; ++i) {
        document["servers"][Id(i)] = Profile(i, password);
    }
    CfgAccess(kUid, VFS_CONFIG_SERVER, VFS_CONFIG_WRITE, document);
}

/** Stores the user's one connection, to a cloud. Its mount is not looked up. */
inline bool StoreCloud(const std::string& id, const std::string& protocol,
                       const std::string& token) {
    using namespace ZYROVFS::Server;
    Json::Value document;
    Json::Value& profile = document["servers"][id];
    profile["protocol"] = protocol;
    profile["alias"] = profile["email"] = "amy@example.com";
    profile["client_id"] = "client";
    profile["account_info"] = "{\"id\":\"1\"}";
    profile["path"] = "/tmp";
    profile["expire_time"] = "4000000000";
    profile["access_token"] = Enciphered(token);
    profile["refresh_token"] = Enciphered("refresh");
    return CfgAccess(kUid, VFS_CONFIG_CONNECT, VFS_CONFIG_WRITE, document);
}

}  // namespace bench

#endif
