/** Base of the drivers that speak to a service with OAuth tokens. */
#ifndef ZYROVFS_CLOUD_PUBLIC_CLOUD_H
#define ZYROVFS_CLOUD_PUBLIC_CLOUD_H

#include <json/value.h>

#include <string>
#include <vector>

#include "core/source_line.h"
#include "zyrovfs/cloud.h"
#include "zyrovfs/server.h"

namespace ZYROCloud {

struct TokenInfo {
    std::string access_token;
    std::string refresh_token;
    std::string expire_time;  ///< decimal epoch seconds; empty: the token does not expire
};

class PublicCloud : public Cloud {
  public:
    PublicCloud() = default;
    /** Takes tokens, ids and account from a profile. The driver's constructor calls its Init(). */
    PublicCloud(unsigned int uid, const Json::Value& profile);

    /** Asks the service for the account and writes it into both profiles. VFS_ERR_PROFILE_UPDATE.
     */
    virtual bool UpdateAccountInfo();
    /** Sends the handler's request; a refused token is renewed, and the request repeated once. */
    virtual bool DoAPIRequest(int retries);
    /** Describes the service's request for a new token on `handler`. */
    virtual bool SetRefreshTokenParam(APIHandler* handler) = 0;

    /** 1 valid, 0 expired, -1 the clock failed. */
    int IsAccessTokenValid();
    /** Renews an expired token, or any token with `force`, and writes it into both profiles. Only
     * one process of the user renews at a time. */
    bool RefreshToken(bool force);
    bool UpdateProfileConfig(ZYROVFS::Server::VFS_CONFIG_MODE mode, const Json::Value& fields);

    /** Value of the header "Authorization". */
    std::string Bearer() const { return "Bearer " + token_.access_token; }
    const std::string& ClientId() const { return client_id_; }
    const TokenInfo& Token() const { return token_; }
    /** Tells that the token comes from a caller and is in no profile yet: what the profiles have is
     * then the token before it, unless it ends later. */
    void TokenIsGiven() { token_is_given_ = true; }

  protected:
    /** UpdateAccountInfo with the query of a service. */
    bool UpdateAccountInfoWith(const Json::Value& params,
                               ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

    TokenInfo token_;
    std::string client_id_;
    Json::Value account_info_;

  private:
    void TakeTokenOfOthers();
    bool IsNewer(const TokenInfo& stored, bool ours_is_stored) const;
    bool AskForToken();
    bool TakeToken(const std::string& text);

    std::vector<std::string> replaced_;  ///< access tokens that this driver has renewed
    bool token_is_given_ = false;
};

}  // namespace ZYROCloud

#endif
