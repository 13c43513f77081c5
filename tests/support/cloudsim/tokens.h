/** Clients, access tokens and one-time refresh tokens of one service. Any thread may call. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_TOKENS_H
#define ZYROVFS_TESTS_CLOUDSIM_TOKENS_H

#include <atomic>
#include <functional>
#include <map>
#include <mutex>
#include <string>
#include <unordered_map>

#include "support/cloudsim/account.h"

namespace cloudsim {

class TokenStore {
  public:
    explicit TokenStore(std::function<int64_t()> now) : now_(std::move(now)) {}

    void AddClient(const std::string& id, const std::string& secret);
    bool IsClient(const std::string& id, const std::string& secret) const;
    std::string FirstClient() const;

    Tokens Issue(Account& account, const std::string& client, int64_t life);
    Tokens Last(const Account& account) const;

    /** Null when the token is unknown, expired or withdrawn. */
    Account* Owner(const std::string& access_token) const;
    /** Known, but its life is over, or it was withdrawn. */
    bool IsExpired(const std::string& access_token) const;
    void Expire(const std::string& access_token);
    void ExpireAll(const Account& account);
    void RevokeAll(const Account& account);

    /** False when the token isn't good for this client (any more). */
    bool Refresh(const std::string& refresh_token, const std::string& client, Tokens& tokens);

    std::atomic<int64_t> life{3600};
    std::atomic<bool> rotate{true};

  private:
    struct Grant {
        Account* account;
        std::string client;
        int64_t expires;
    };
    using Grants = std::unordered_map<std::string, Grant>;
    static void Drop(Grants& grants, const Account& account);
    Tokens Make(Account& account, const std::string& client, int64_t token_life);

    const std::function<int64_t()> now_;
    mutable std::mutex mutex_;
    std::map<std::string, std::string> clients_;
    std::string first_client_;
    Grants access_, refresh_;
    std::map<const Account*, Tokens> last_;
};

}  // namespace cloudsim

#endif
