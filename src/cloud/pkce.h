/** Proof Key for Code Exchange (RFC 7636): who began a login is who may end it. */
#ifndef ZYROVFS_CLOUD_PKCE_H
#define ZYROVFS_CLOUD_PKCE_H

#include <string>

namespace ZYROCloud {

/** 43 characters that nobody can foretell and that need no escape in an address; "" without a
 * source of random numbers. */
std::string RandomVerifier();

/** What is sent first, with the method S256; "" on failure. */
std::string ChallengeOf(const std::string& verifier);

}  // namespace ZYROCloud

#endif
