/** What every simulated service has: accounts, clients, tokens, clock, faults, journal, an address.
 */
#ifndef ZYROVFS_TESTS_CLOUDSIM_SERVICE_H
#define ZYROVFS_TESTS_CLOUDSIM_SERVICE_H

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "support/cloudsim/account.h"
#include "support/cloudsim/fault.h"
#include "support/cloudsim/journal.h"

namespace cloudsim {

struct ServerOptions {
    /** PEM texts of a server; empty: plain HTTP. tls::Make(tls::CertSpec{...}) makes them. */
    std::string certificate, key;
    int port = 0;  ///< 0: any that is free
    size_t journal_body_limit = 64 * 1024;
    bool journal_hashes = true;  ///< SHA-1 of request bodies; a benchmark may do without
    bool keep_journal = true;
    std::string journal_file;  ///< one JSON document a line, written when a request is finished
    Storage storage;
    bool hash_uploads = true;  ///< without: the SHA-1 of uploaded files is computed when asked for
};

/**
 * A service on a loopback port, from construction to destruction, with threads of its own. A test
 * may call everything here from its thread while requests are under way.
 */
class Service {
  public:
    virtual ~Service();

    int Port() const;

    /** A client of the token endpoint. Without any, "client" with the secret "secret" is known. */
    void AddClient(const std::string& id, const std::string& secret);
    /** `name` is made of the e-mail when empty. */
    Account& AddAccount(const std::string& email, const std::string& name = "");

    void AddFault(const Fault& fault);
    /** Text of every fault that was not used as often as declared: "GET /x status=503: 1 of 2". */
    std::vector<std::string> UnusedFaults() const;
    void ClearFaults();

    const class Journal& Journal() const;
    class Journal& Journal();

    /** The service's clock runs ahead by so much more: tokens expire without waiting. */
    void AdvanceClock(int64_t seconds);
    /** Life of the access tokens that the token endpoint gives. 3600 unless set. */
    void SetTokenLife(int64_t seconds);
    /** False: a refresh token stays good and no new one is given. True unless set. */
    void SetRotation(bool rotate);
};

}  // namespace cloudsim

#endif
