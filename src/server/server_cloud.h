/** Connections to a public cloud: an account known by OAuth tokens. */
#ifndef ZYROVFS_SERVER_SERVER_CLOUD_H
#define ZYROVFS_SERVER_SERVER_CLOUD_H

#include <string>
#include <vector>

#include "core/source_line.h"
#include "server/server_base.h"
#include "zyrovfs/cloud.h"

namespace ZYROVFS::Server {

/** What one service's accounts differ in. */
struct CloudAccountRules {
    ZYROCloud::_tag_cloud_type type;
    const char* scheme;  ///< in front of the e-mail in the server id
    /** Beside "protocol", "alias", "client_id" and "access_token": "refresh_token" and the token's
     * end, as "expire_time" or "expires_in". */
    bool expiring;
    bool expires_in_first;  ///< which of the two counts when both are given
    const char* fields;     ///< query for the account document; null asks without
    /** Member that the answer must have; null needs none. */
    const char* needed;
    /** The account document is this member of the answer, or the whole answer when null. */
    const char* document;
    std::vector<const char*> email;      ///< members that lead to the e-mail
    SourceLine at = SourceLine::Here();  ///< what log lines name
};

/** The common part of the cloud types; each adds how its account is learnt. */
class CloudServer : public ServerBase {
  public:
    bool Load(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value conf, bool decrypt,
              bool online) override = 0;
    bool GetServerID(std::string& id) override = 0;
    /** VFS_ERR_UNKNOWN, VFS_ERR_INVALID_SERVER; VFS_ERR_FAILED when the mount has no local path. */
    bool CreateJsonObj(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& out,
                       bool encrypt) override;
    /** VFS_ERR_FAILED; the access token goes first, and its failure leaves the other as it was. */
    bool DecryptCredentials(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& conf) override;
    bool RemoveCredentials(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value& conf) override;
    bool DeletePostProcess(unsigned int uid, VFS_CONFIG_MODE mode) override;
    bool DumpToStruct(unsigned int uid, VFS_CONFIG_MODE mode, _tag_VFS_CONFIG_INFO_& info) override;
    /** Never: the backend renews its tokens by itself. */
    bool IsUpdateNeedsRemount(unsigned int uid, VFS_CONFIG_MODE mode,
                              const Json::Value& changes) override;
    /** The tokens travel to the backend as one JSON document in the mount's password. */
    bool Mount(unsigned int uid, VFS_CONFIG_MODE mode, const Json::Value& conf,
               bool force) override;
    bool Unmount(unsigned int uid, VFS_CONFIG_MODE mode) override;

    bool IsConfigValid(Json::Value& conf);
    /** The e-mail up to its last at sign. */
    bool GetAccountName(std::string& name);
    /** The same as the server id. */
    bool GetURI(std::string& uri);

  protected:
    /** Load by a service's rules. VFS_ERR_BAD_PARAM, or the code that asking the service left. */
    bool LoadBy(const CloudAccountRules& rules, unsigned int uid, VFS_CONFIG_MODE mode,
                Json::Value& conf, bool decrypt, bool online);

    std::string access_token_;
    std::string refresh_token_;
    std::string expire_time_;  ///< decimal epoch seconds
    std::string alias_;
    std::string email_;
    std::string account_info_;  ///< the service's account document as JSON text

  private:
    bool AskService(const CloudAccountRules& rules, unsigned int uid, Json::Value& conf);
    void TakeProfile(const CloudAccountRules& rules, const Json::Value& conf);
};

/** A cloud type that is told from the others by `Type::Rules()` alone. */
template <typename Type>
class CloudAccount : public CloudServer {
  public:
    bool Load(unsigned int uid, VFS_CONFIG_MODE mode, Json::Value conf, bool decrypt,
              bool online) override {
        return LoadBy(Type::Rules(), uid, mode, conf, decrypt, online);
    }
    /** Before the e-mail is known, the bare scheme. */
    bool GetServerID(std::string& id) override {
        id = Type::Rules().scheme + email_;
        return true;
    }
};

}  // namespace ZYROVFS::Server

#endif
