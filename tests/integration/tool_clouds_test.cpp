// The tool with accounts at four clouds: profiles from tokens, copies from each to each, what an
// account is told, and what is said when its owner took the grant back.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <json/reader.h>
#include <json/value.h>

#include <fstream>
#include <sstream>

#include "support/machine_clouds.h"

namespace {

using machine::Must;
using machine::Outcome;
using machine_clouds::Clouds;
using machine_clouds::kMiB;
using machine_clouds::kTool;
using machine_clouds::Place;
using machine_clouds::TheClouds;
using testing::AllOf;
using testing::HasSubstr;

Outcome ForAmy(const std::string& arguments) {
    return machine::Run(kTool + " " + arguments + " --user amy");
}

const auto* const kClouds = testing::AddGlobalTestEnvironment(&TheClouds());

std::string Pattern(size_t size, unsigned state) {
    std::string bytes(size, '\0');
    for (char& byte : bytes) {
        state = state * 1103515245 + 12345;
        byte = static_cast<char>(state >> 16);
    }
    return bytes;
}

TEST(ToolClouds, AFileGoesFromEachCloudToEachOther) {
    unsigned seed = 1;
    for (Place& from : TheClouds().places) {
        for (Place& to : TheClouds().places) {
            if (&from == &to) {
                continue;
            }
            const std::string name = "/to " + to.protocol + " & ü.bin";
            const std::string bytes = Pattern(100000 + seed, seed);
            ++seed;
            from.account->AddPath(name, bytes);
            from.tree->Refresh();
            const Outcome copy =
                ForAmy("cp '" + from.Id() + name + "' '" + to.Id() + "/" + from.protocol + ".bin'");
            EXPECT_EQ(copy.status, 0) << copy.output;
            EXPECT_TRUE(to.Bytes("/" + from.protocol + ".bin") == bytes)
                << from.protocol << " to " << to.protocol;
        }
    }
}

TEST(ToolClouds, AFileBeyondOneRequestGoesUpToEachCloudAndComesBack) {
    const std::string bytes = Pattern(33 * kMiB, 5);
    std::ofstream("/home/amy/large.bin", std::ios::binary) << bytes;
    Must("chown amy:100 /home/amy/large.bin");
    for (Place& place : TheClouds().places) {
        SCOPED_TRACE(place.protocol);
        const Outcome up = ForAmy("cp /home/amy/large.bin " + place.Id() + "/large.bin");
        EXPECT_EQ(up.status, 0) << up.output;
        EXPECT_TRUE(place.Bytes("/large.bin") == bytes);
        place.tree->Refresh();
        const Outcome down = ForAmy("cp " + place.Id() + "/large.bin /home/amy/back.bin");
        EXPECT_EQ(down.status, 0) << down.output;
        EXPECT_TRUE(machine::Read("/home/amy/back.bin") == bytes);
        place.account->Remove(place.account->Find("/large.bin"));
    }
}

TEST(ToolClouds, AnAccountIsShownWithItsNameAndSpace) {
    for (Place& place : TheClouds().places) {
        SCOPED_TRACE(place.protocol);
        const Outcome shown = ForAmy("account " + place.Id());
        EXPECT_EQ(shown.status, 0) << shown.output;
        EXPECT_THAT(shown.output,
                    AllOf(HasSubstr("Name:   Amy\n"), HasSubstr("E-mail: amy@example.com\n"),
                          HasSubstr(" of 50.0 MiB used\n")));
        Json::Value account;
        std::istringstream text(ForAmy("account --json " + place.Id()).output);
        text >> account;
        EXPECT_EQ(account["email"], "amy@example.com");
        EXPECT_EQ(account["total"].asUInt64(), 50 * kMiB);
        EXPECT_EQ(account["used"].asUInt64(), place.account->Used());
    }
}

TEST(ToolClouds, AnAccountThatIsNotThereIsToldInWords) {
    const Outcome shown = ForAmy("account google://zoe@example.com");
    EXPECT_EQ(shown.status, 1);
    EXPECT_THAT(shown.output, HasSubstr("neither a connection nor a profile"));
    EXPECT_EQ(ForAmy("account nonsense").status, 2);
}

TEST(ToolClouds, WhenAGrantWasTakenBackTheWayOutIsTold) {
    for (Place& place : TheClouds().places) {
        SCOPED_TRACE(place.protocol);
        place.account->ExpireAccessTokens();
        place.account->RevokeRefreshTokens();
        const Outcome refused = ForAmy("account " + place.Id());
        EXPECT_EQ(refused.status, 1);
        EXPECT_THAT(refused.output, HasSubstr("zyrovfs login")) << refused.output;
        Clouds::SignIn(place);
        const Outcome saved =
            ForAmy("profile set " + place.Id() +
                   " --access-token-file /tmp/access --refresh-token-file /tmp/refresh "
                   "--expires-in 3600");
        EXPECT_EQ(saved.status, 0) << saved.output;
        Clouds::RecordConnections();
        const Outcome again = ForAmy("account " + place.Id());
        EXPECT_EQ(again.status, 0) << again.output;
    }
}

}  // namespace
