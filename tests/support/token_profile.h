/** Profiles with tokens, and the server type that keeps them, without any service behind. */
#ifndef ZYROVFS_TESTS_TOKEN_PROFILE_H
#define ZYROVFS_TESTS_TOKEN_PROFILE_H

#include <memory>
#include <string>

#include "server/server_factory.h"
#include "support/profiles.h"
#include "support/seams.h"
#include "zyrovfs/error.h"
#include "zyrovfs/server.h"

namespace token_profile {

using ZYROVFS::Server::ServerBase;
using ZYROVFS::Server::VFS_CONFIG_MODE;

inline std::string Enciphered(const std::string& plain) {
    char out[4096] = "";
    EXPECT_NE(0, ZYROVFS::Server::SzEncrypt(plain.c_str(), out, sizeof out));
    return out;
}

inline std::string Deciphered(const std::string& cipher) {
    char out[4096] = "";
    EXPECT_NE(0, ZYROVFS::Server::SzDecrypt(cipher.c_str(), out, sizeof out));
    return out;
}

/** Keeps whatever the profile holds, its tokens enciphered. */
class TokenServer : public ServerBase {
  public:
    bool Load(unsigned uid, VFS_CONFIG_MODE mode, Json::Value conf, bool decrypt, bool) override {
        if (decrypt) {
            DecryptCredentials(uid, mode, conf);
        }
        conf_ = conf;
        return true;
    }
    bool GetServerID(std::string& id) override {
        id = conf_["protocol"].asString() + "://" + conf_["email"].asString();
        return true;
    }
    bool CreateJsonObj(unsigned, VFS_CONFIG_MODE, Json::Value& out, bool encrypt) override {
        out = conf_;
        for (const char* key : {"access_token", "refresh_token"}) {
            if (encrypt && conf_.isMember(key)) {
                out[key] = Enciphered(conf_[key].asString());
            }
        }
        return true;
    }
    bool DecryptCredentials(unsigned, VFS_CONFIG_MODE, Json::Value& conf) override {
        for (const char* key : {"access_token", "refresh_token"}) {
            if (conf.isMember(key)) {
                conf[key] = Deciphered(conf[key].asString());
            }
        }
        return true;
    }
    bool RemoveCredentials(unsigned, VFS_CONFIG_MODE, Json::Value&) override { return true; }
    bool DeletePostProcess(unsigned, VFS_CONFIG_MODE) override { return true; }
    bool DumpToStruct(unsigned, VFS_CONFIG_MODE, ZYROVFS::Server::_tag_VFS_CONFIG_INFO_&) override {
        return true;
    }
    bool IsUpdateNeedsRemount(unsigned, VFS_CONFIG_MODE, const Json::Value&) override {
        return false;
    }
    bool Mount(unsigned, VFS_CONFIG_MODE, const Json::Value&, bool) override { return true; }
    bool Unmount(unsigned, VFS_CONFIG_MODE) override { return true; }

  private:
    Json::Value conf_;
};

/** ServerMgr gives out TokenServers while this lives. */
class Scope {
  public:
    Scope() {
        ZYROVFS::Server::server_factory = [](const std::string&) {
            return std::unique_ptr<ServerBase>(new TokenServer);
        };
    }
    Scope(const Scope&) = delete;
    Scope& operator=(const Scope&) = delete;
    ~Scope() { ZYROVFS::Server::server_factory = ZYROVFS::Server::NewServer; }
};

inline constexpr const char* kId = "box://amy@example.com";
inline constexpr long long kNow = 1700000000;
// Whatever log line has this text has a secret.
inline constexpr const char* kCanary = "CANARY";

/** A profile in plain text as a driver gets it. */
inline Json::Value Plain(const std::string& expire_time) {
    Json::Value profile;
    profile["protocol"] = "box";
    profile["email"] = "amy@example.com";
    profile["alias"] = "mine";
    profile["client_id"] = "client";
    profile["path"] = "/tmp";
    profile["account_info"] = "{\"id\":\"1\"}";
    profile["access_token"] = "old-CANARY-access";
    profile["refresh_token"] = "old-CANARY-refresh";
    profile["expire_time"] = expire_time;
    return profile;
}

/** The same as it stands in a file. */
inline void Store(VFS_CONFIG_MODE mode, Json::Value profile) {
    for (const char* key : {"access_token", "refresh_token"}) {
        profile[key] = Enciphered(profile[key].asString());
    }
    Json::Value servers;
    servers[kId] = profile;
    profiles::Put(mode, servers);
}

/** The stored profile with its tokens in plain text. */
inline Json::Value Stored(VFS_CONFIG_MODE mode) {
    Json::Value profile = profiles::Stored(mode)[kId];
    for (const char* key : {"access_token", "refresh_token"}) {
        if (profile.isMember(key)) {
            profile[key] = Deciphered(profile[key].asString());
        }
    }
    return profile;
}

/** The clock stands, and an expired profile is stored in both files. */
class TokenTest : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        seams::SetTime(kNow);
        for (const VFS_CONFIG_MODE mode :
             {profiles::VFS_CONFIG_CONNECT, profiles::VFS_CONFIG_SERVER}) {
            Store(mode, Plain(Ago(3600)));
        }
    }
    void TearDown() override { EXPECT_FALSE(seams::LoggedPart(kCanary)) << seams::LogDump(); }

    /** Text of the time so many seconds ago. */
    static std::string Ago(long long seconds) { return std::to_string(kNow - seconds); }

    static Json::Value Driven(const std::string& expire_time) {
        Json::Value profile = Plain(expire_time);
        profile["server_id"] = kId;
        return profile;
    }

    Scope scope_;
};

}  // namespace token_profile

#endif
