/** Tokens that the service refuses, or that are too old to be shown to it. */
#include "support/driver_suite.h"
#include "support/seams.h"
#include "support/token_profile.h"

namespace driver_suite {
namespace {

/** An upload whose token is refused has rules of its own. */
bool IsAlike(Op op) {
    return op != Op::kUpload;
}

}  // namespace

TEST_P(DriverToken, RefusedOnceIsRenewedAndTheOperationMade) {
    for (const Op op : kAllOps) {
        if (!IsAlike(op)) {
            continue;
        }
        Restore();
        amy.ExpireAccessTokens();
        EXPECT_EQ(Run(op), can.renews_tokens) << op << seams::LogDump();
        EXPECT_EQ(Count(Op::kToken), can.renews_tokens ? 1U : 0U) << op << sim.Journal().Text();
        if (!can.renews_tokens) {
            EXPECT_EQ(Code(), VFS_ERR_UNAUTHORIZED) << op;
        }
    }
}

TEST_P(DriverToken, RefusedTwiceIsAFailure) {
    for (const Op op : kAllOps) {
        if (!IsAlike(op)) {
            continue;
        }
        Restore();
        Add(On(op).Times(can.renews_tokens ? 2 : 1).ExpireToken());
        EXPECT_FALSE(Run(op)) << op;
        EXPECT_EQ(Code(), VFS_ERR_UNAUTHORIZED) << op << seams::LogDump();
        EXPECT_EQ(Count(Op::kToken), can.renews_tokens ? 1U : 0U) << op << sim.Journal().Text();
    }
}

TEST_P(DriverToken, RefusedInAnUploadAndTheNextUploadWorks) {
    Add(On(Op::kUpload).ExpireToken());
    EXPECT_EQ(Run(Op::kUpload), can.upload_survives_refusal) << seams::LogDump();
    if (!can.upload_survives_refusal) {
        EXPECT_EQ(Code(), VFS_ERR_UNAUTHORIZED);
        EXPECT_FALSE(amy.Exists("/up.txt"));
    }
    EXPECT_EQ(Count(Op::kToken) > 0, can.renews_tokens) << sim.Journal().Text();
    if (!can.renews_tokens) {
        Renew();
    }
    EXPECT_TRUE(Upload("again", "/again.txt")) << seams::LogDump();
    EXPECT_EQ(TextOf("/again.txt"), "again");
}

TEST_P(DriverToken, TooOldIsRenewedBeforeTheOperation) {
    for (const Op op : kAllOps) {
        Restore();
        Renew("1000");
        EXPECT_TRUE(Run(op)) << op << seams::LogDump();
        const auto all = sim.Journal().All();
        ASSERT_FALSE(all.empty());
        EXPECT_EQ(Count(Op::kToken), can.renews_tokens ? 1U : 0U) << op << sim.Journal().Text();
        for (const auto& entry : all) {
            EXPECT_NE(entry.status, 401) << op << sim.Journal().Text();
        }
    }
}

TEST_P(DriverToken, RenewedStandsInBothProfiles) {
    amy.ExpireAccessTokens();
    EXPECT_EQ(Run(Op::kInfo), can.renews_tokens) << seams::LogDump();
    const cloudsim::Tokens last = amy.LastTokens();
    EXPECT_EQ(last.access_token != granted.access_token, can.renews_tokens);
    if (!can.renews_tokens) {
        return;
    }
    for (const auto mode : {profiles::VFS_CONFIG_CONNECT, profiles::VFS_CONFIG_SERVER}) {
        const Json::Value profile = profiles::Stored(mode)[server_id];
        for (const auto& [key, text] : {std::pair("access_token", last.access_token),
                                        std::pair("refresh_token", last.refresh_token)}) {
            EXPECT_TRUE(token_profile::Deciphered(profile[key].asString()) == text) << mode << key;
        }
    }
}

TEST_P(DriverToken, ThatCannotBeRenewedIsAFailureAndTheProfileStays) {
    for (const Op op : kAllOps) {
        Restore();
        const Json::Value before = profiles::Stored(profiles::VFS_CONFIG_SERVER)[server_id];
        amy.ExpireAccessTokens();
        amy.RevokeRefreshTokens();
        EXPECT_FALSE(Run(op)) << op;
        EXPECT_EQ(Code(), op == Op::kUpload ? can.upload_without_token : VFS_ERR_UNAUTHORIZED)
            << op << seams::LogDump();
        EXPECT_EQ(profiles::Stored(profiles::VFS_CONFIG_SERVER)[server_id], before) << op;
    }
}

}  // namespace driver_suite
