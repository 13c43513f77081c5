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

/** What binds a code to its login. */
struct CodeLogin {
    std::string client;
    std::string redirect_uri;
    /** The challenge for IssueCode, "" without one; the verifier for Exchange. */
    std::string proof;
};

class TokenStore {
  public:
    explicit TokenStore(std::function<int64_t()> now) : now_(std::move(now)) {}

    void AddClient(const std::string& id, const std::string& secret);
    bool IsClientId(const std::string& id) const;
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

    /** A code for whoever ends the login that `login` began. */
    std::string IssueCode(Account& account, const CodeLogin& login);
    /** False when the code is unknown, used, too old, or another login's; it is gone then, too. */
    bool Exchange(const std::string& code, const CodeLogin& login, Tokens& tokens);

    std::atomic<int64_t> life{3600};
    std::atomic<bool> rotate{true};

  private:
    struct Grant {
        Account* account;
        std::string client;
        int64_t expires;
    };
    struct Code {
        Account* account;
        CodeLogin login;
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
    std::map<std::string, Code> codes_;
};

}  // namespace cloudsim

#endif
