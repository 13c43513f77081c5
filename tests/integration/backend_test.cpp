// The example for authors of backends, before all four clouds: a C program and the shipped library.
#include <gio/gio.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/machine_clouds.h"

namespace {

using machine::Outcome;
using machine_clouds::Place;
using machine_clouds::TheClouds;
using testing::HasSubstr;

const std::string kExample = BuildDir() + "/tests/integration/backend_example";
const auto* const kClouds = testing::AddGlobalTestEnvironment(&TheClouds());

/** The credentials as a mount hands them to the backend, in /tmp/credentials. */
void SignIn(const Place& place) {
    const cloudsim::Tokens tokens = place.account->IssueTokens();
    Json::Value credentials;
    credentials["access_token"] = tokens.access_token;
    credentials["refresh_token"] = tokens.refresh_token;
    credentials["expire_time"] = std::to_string(time(nullptr) + 3600);
    credentials["client_id"] = "client";
    credentials["account_info"] = R"({"id":")" + place.account->Id() + "\"}";
    std::ofstream("/tmp/credentials") << cloudsim::OneLine(credentials);
}

/** What the program says; the content that it read is in /tmp/content. */
Outcome Play(const Place& place, const std::string& name) {
    return machine::Run("ZYROVFS_UID=4001 " + kExample + " " + place.protocol + " " + place.Id() +
                        " '" + name + "' </tmp/credentials >/tmp/content");
}

std::string Content(size_t size) {
    std::string bytes(size, '\0');
    unsigned state = 11;
    for (char& byte : bytes) {
        state = state * 1103515245 + 12345;
        byte = static_cast<char>(state >> 16);
    }
    return bytes;
}

TEST(BackendExample, ListsReadsRenamesAndDeletesAtEachCloud) {
    const std::string bytes = Content(200000);
    for (Place& place : TheClouds().places) {
        SCOPED_TRACE(place.protocol);
        place.account->AddPath("/a letter.bin", bytes);
        place.account->AddPath("/docs/b.txt", "b");
        SignIn(place);
        const Outcome said = Play(place, "a letter.bin");
        EXPECT_EQ(said.status, 0) << said.output;
        EXPECT_THAT(said.output, HasSubstr("  a letter.bin\n"));
        EXPECT_THAT(said.output, HasSubstr("  docs/\n"));
        EXPECT_THAT(said.output, HasSubstr("read 200000 bytes\n"));
        EXPECT_THAT(said.output, HasSubstr("  renamed a letter.bin\n"));
        EXPECT_TRUE(machine::Read("/tmp/content") == bytes);
        EXPECT_FALSE(place.account->Exists("/a letter.bin"));
        EXPECT_FALSE(place.account->Exists("/renamed a letter.bin"));
        EXPECT_EQ(place.Bytes("/docs/b.txt"), "b");
    }
}

TEST(BackendExample, ReadsAnEmptyFileToItsEnd) {
    for (Place& place : TheClouds().places) {
        SCOPED_TRACE(place.protocol);
        place.account->AddPath("/empty", "");
        SignIn(place);
        const Outcome said = Play(place, "empty");
        EXPECT_EQ(said.status, 0) << said.output;
        EXPECT_THAT(said.output, HasSubstr("read 0 bytes\n"));
    }
}

TEST(BackendExample, SaysWhichStepFailed) {
    for (Place& place : TheClouds().places) {
        SCOPED_TRACE(place.protocol);
        SignIn(place);
        const Outcome missing = Play(place, "none");
        EXPECT_EQ(missing.status, 1);
        EXPECT_THAT(missing.output, HasSubstr("none: not there\n"));
        place.account->ExpireAccessTokens();
        place.account->RevokeRefreshTokens();
        const Outcome refused = Play(place, "none");
        EXPECT_EQ(refused.status, 1);
        EXPECT_THAT(refused.output,
                    HasSubstr("check the account: failed, GIO error " +
                              std::to_string(G_IO_ERROR_CONNECTION_REFUSED) + "\n"));
    }
}

TEST(BackendExample, TellsHowItIsCalled) {
    EXPECT_EQ(machine::Run(kExample + " </dev/null").status, 2);
    EXPECT_EQ(machine::Run(kExample + " ftp id name </dev/null").status, 2);
}

}  // namespace
