#include "cloud/pkce.h"

#include <gmock/gmock.h>

#include <set>

namespace ZYROCloud {
namespace {

using testing::MatchesRegex;

// The pair of RFC 7636, appendix B.
TEST(Pkce, TheChallengeIsTheVerifiersDigest) {
    EXPECT_EQ("E9Melhoa2OwvFrEMTJguCHaoeK1t8URWbuGJSstw-cM",
              ChallengeOf("dBjftJeZ4CVP-mB92K27uhbUJU1p1r_wW1gFWFOEjXk"));
}

TEST(Pkce, VerifiersDifferAndNeedNoEscape) {
    std::set<std::string> seen;
    for (int i = 0; i < 100; ++i) {
        const std::string verifier = RandomVerifier();
        EXPECT_EQ(43U, verifier.size());
        EXPECT_THAT(verifier, MatchesRegex("[A-Za-z0-9_-]+"));
        EXPECT_TRUE(seen.insert(verifier).second);
    }
}

}  // namespace
}  // namespace ZYROCloud
