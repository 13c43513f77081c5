/** The page on which a person lets a client into an account, and what comes of it. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_CONSENT_H
#define ZYROVFS_TESTS_CLOUDSIM_CONSENT_H

#include <string>
#include <vector>

#include "support/cloudsim/http.h"
#include "support/cloudsim/tokens.h"

namespace cloudsim {

/** A login as the page's address describes it. */
struct ConsentRequest {
    explicit ConsentRequest(const Request& request);

    std::string client, redirect_uri, state, response_type, challenge, method, scope;

    /** Why no browser is sent anywhere; "" when all is well. */
    std::string Problem(const TokenStore& tokens) const;
    /** The address to which the browser goes, with these parameters and the state. */
    std::string Back(const Headers& parameters) const;
};

/** The page: a choice of accounts, and two buttons that post "account" and "decision", which is
 * "allow" or "deny". */
Reply ConsentPage(const ConsentRequest& request, const std::vector<std::string>& accounts);

}  // namespace cloudsim

#endif
