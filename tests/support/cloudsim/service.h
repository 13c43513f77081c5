/** What every simulated service has: accounts, clients, tokens, clock, faults, journal, an address.
 */
#ifndef ZYROVFS_TESTS_CLOUDSIM_SERVICE_H
#define ZYROVFS_TESTS_CLOUDSIM_SERVICE_H

#include <atomic>
#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "support/cloudsim/account.h"
#include "support/cloudsim/fault.h"
#include "support/cloudsim/fault_plan.h"
#include "support/cloudsim/http.h"
#include "support/cloudsim/journal.h"
#include "support/cloudsim/server.h"
#include "support/cloudsim/tokens.h"
#include "support/cloudsim/tree.h"

namespace cloudsim {

/**
 * A service on a loopback port, from construction to destruction, with threads of its own. A test
 * may call everything here from its thread while requests are under way.
 */
class Service {
  public:
    virtual ~Service();

    int Port() const { return server_->Port(); }
    bool Secure() const { return !options_.certificate.empty(); }
    /** "https://NAME:PORT", without a port that goes without saying. */
    std::string Address(const std::string& name) const;

    /** A client of the token endpoint. Without any, "client" with the secret "secret" is known. */
    void AddClient(const std::string& id, const std::string& secret);
    /** `name` is made of the e-mail when empty. */
    Account& AddAccount(const std::string& email, const std::string& name = "");

    void AddFault(const Fault& fault) { faults_.Add(fault); }
    /** Text of every fault that was not used as often as declared: "GET /x status=503: 1 of 2". */
    std::vector<std::string> UnusedFaults() const { return faults_.Unused(); }
    void ClearFaults() { faults_.Clear(); }

    const class Journal& Journal() const { return journal_; }
    class Journal& Journal() {
        return journal_;
    }

    /** Attributes that a backend which had mounted the account would serve for an item. */
    virtual std::map<std::string, std::string> Attributes(const Account& account, const Item& item);

    /** The service's clock runs ahead by so much more: tokens expire without waiting. */
    void AdvanceClock(int64_t seconds) { ahead_ += seconds; }
    int64_t Now() const;
    /** Life of the access tokens that the token endpoint gives. 3600 unless set. */
    void SetTokenLife(int64_t seconds) { tokens_.life = seconds; }
    /** False: a refresh token stays good and no new one is given. True unless set. */
    void SetRotation(bool rotate) { tokens_.rotate = rotate; }

  protected:
    friend class Account;

    Service(const ServerOptions& options, const TreeRules& rules);
    /** To be called when the derived class is ready to answer. */
    void Start();
    /** To be called before the derived class goes. */
    void Stop() { server_.reset(); }

    virtual std::unique_ptr<Handler> Begin(Request& request) = 0;
    virtual std::string Role(const Request& request) const = 0;
    /** Id of the account that is the `index`th to be added. */
    virtual std::string AccountId(size_t index) const;
    std::unique_ptr<Sink> NewSink() const;
    /** The page on which a person logs in: asked for by GET, answered by POST. */
    std::unique_ptr<Handler> Consent(const Request& request);
    /** The end of such a login at the token endpoint. */
    bool TakeCode(const Request& form, const std::string& client, Tokens& tokens) {
        return tokens_.Exchange(form.Query("code"),
                                {client, form.Query("redirect_uri"), form.Query("code_verifier")},
                                tokens);
    }

    const ServerOptions options_;
    std::atomic<int64_t> ahead_{0};
    class Journal journal_;
    FaultPlan faults_;
    TokenStore tokens_;
    mutable std::mutex mutex_;  ///< guards what follows
    Tree tree_;
    std::vector<std::unique_ptr<Account>> accounts_;

  private:
    std::unique_ptr<Server> server_;
};

}  // namespace cloudsim

#endif
