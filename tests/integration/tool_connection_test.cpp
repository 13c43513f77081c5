// The command line tool with real servers and the user's real daemons: connections from their
// making to the clean-up, and what it says when a server is not to be trusted.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <json/reader.h>

#include <filesystem>
#include <sstream>

#include "support/locations.h"
#include "support/machine.h"

namespace {

using machine::Must;
using machine::Outcome;
using testing::AllOf;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

const std::string kTool = BuildDir() + "/tools/zyrovfs/zyrovfs";
constexpr unsigned kAmy = 4001;
const std::string kFtp = "ftp://remo@127.0.0.1:2121";
const std::string kTree = "/var/tmp/user/4001/gvfs/";

Outcome Zyrovfs(const std::string& arguments) {
    return machine::Run(kTool + " " + arguments);
}

Json::Value AsJson(const std::string& arguments) {
    const Outcome outcome = machine::Run(kTool + " " + arguments + " --json 2>/dev/null");
    std::istringstream text(outcome.output);
    Json::Value value;
    std::string errors;
    EXPECT_TRUE(Json::parseFromStream(Json::CharReaderBuilder(), text, &value, &errors))
        << outcome.output;
    return value;
}

class RemoteSide : public testing::Environment {
    void SetUp() override {
        machine::AddUser("amy", kAmy);
        machine::Remote("start first-secret");
        std::ofstream("/tmp/password") << "first-secret\n";
        std::ofstream("/tmp/wrong") << "other-secret\n";
    }
};
const auto* const kRemoteSide = testing::AddGlobalTestEnvironment(new RemoteSide);

std::string Describe(const std::string& protocol, const std::string& host, int port,
                     const std::string& password_file = "/tmp/password") {
    return "--uid 4001 --protocol " + protocol + " --hostname " + host + " --port " +
           std::to_string(port) + " --account remo --password-file " + password_file;
}

/** The fuse daemon hears of an unmount a moment after the command has ended. */
bool GoesAway(const std::string& path) {
    for (int tries = 0; tries < 100; ++tries) {
        if (!std::filesystem::exists(path)) {
            return true;
        }
        usleep(50000);
    }
    return false;
}

TEST(ToolConnection, FromASavedProfileToTheCleanUp) {
    ASSERT_EQ(Zyrovfs("profile add --alias NAS " + Describe("ftp", "127.0.0.1", 2121)).status, 0);

    const Outcome added = Zyrovfs("connection add " + kFtp + " --uid 4001");
    ASSERT_EQ(added.status, 0) << added.output;
    EXPECT_THAT(added.output, StartsWith("Connected " + kFtp + " at " + kTree));
    EXPECT_THAT(Zyrovfs("connection list --uid 4001").output,
                AllOf(HasSubstr(kFtp), HasSubstr("NAS"), HasSubstr("yes\n")));
    const std::string folder = AsJson("connection show " + kFtp + " --uid 4001")["path"].asString();
    EXPECT_THAT(machine::RunAs("amy", "cat '" + folder + "/hello.txt'").output,
                HasSubstr("hello from the remote side"));

    const Outcome path = Zyrovfs("path " + kFtp + "/docs/inner.txt --uid 4001");
    EXPECT_EQ(path.output, folder + "/docs/inner.txt\n");
    EXPECT_EQ(AsJson("path " + kFtp + " --uid 4001")["path"], folder);

    EXPECT_EQ(Zyrovfs("connection disconnect " + kFtp + " --uid 4001").output,
              "Disconnected " + kFtp + ".\n");
    EXPECT_TRUE(GoesAway(folder));
    EXPECT_EQ(AsJson("connection list --uid 4001")["connections"][0]["connect_status"], 0);
    EXPECT_EQ(Zyrovfs("connection connect " + kFtp + " --uid 4001").output,
              "Connected " + kFtp + ".\n");
    EXPECT_EQ(Zyrovfs("connection set " + kFtp + " --alias Other --uid 4001").status, 0);
    EXPECT_EQ(AsJson("connection show " + kFtp + " --uid 4001")["alias"], "Other");
    EXPECT_EQ(Zyrovfs("connection delete " + kFtp + " --uid 4001").output,
              "Deleted " + kFtp + ".\n");
    EXPECT_TRUE(GoesAway(folder));

    EXPECT_EQ(Zyrovfs("user clean --user amy --profiles").status, 0);
    EXPECT_FALSE(std::filesystem::exists("/usr/zyro/etc/zyrovfs/4001"));
    EXPECT_FALSE(std::filesystem::exists("/var/tmp/zyrovfs/4001"));
}

TEST(ToolConnection, AServerCanBeConnectedWithoutASavedProfile) {
    const Json::Value added =
        AsJson("connection add --path srv/remote/docs " + Describe("sftp", "127.0.0.1", 2222));
    EXPECT_EQ(added["id"], "sftp://remo@127.0.0.1:2222");
    const Json::Value& connection = added["connection"];
    EXPECT_FALSE(connection.isMember("password"));
    EXPECT_THAT(
        machine::RunAs("amy", "cat '" + connection["path"].asString() + "/inner.txt'").output,
        HasSubstr("second level"));
    EXPECT_EQ(AsJson("profile list --uid 4001")["total"], 0);
}

TEST(ToolConnection, AWrongPasswordIsNamed) {
    const Outcome outcome =
        Zyrovfs("connection add " + Describe("ftp", "127.0.0.1", 2121, "/tmp/wrong"));
    EXPECT_EQ(outcome.status, 1);
    EXPECT_THAT(outcome.output, AllOf(HasSubstr("VFS_ERR_WRONG_"), Not(HasSubstr("--accept")),
                                      Not(HasSubstr("other-secret"))));
}

TEST(ToolConnection, AnUntrustedCertificateIsShownWithTheOptionThatAcceptsIt) {
    // The certificate is for "localhost".
    const std::string add = "connection add " + Describe("davs", "127.0.0.1", 8443);
    const Outcome outcome = Zyrovfs(add);
    EXPECT_EQ(outcome.status, 1);
    EXPECT_THAT(outcome.output,
                AllOf(HasSubstr("VFS_ERR_CERT_UNTRUSTED (24)"), HasSubstr("Issued to: localhost"),
                      HasSubstr("Issued by: Test CA"), HasSubstr("Valid until: 20"),
                      HasSubstr("repeat the command with --accept")));
    const Json::Value error = AsJson(add)["error"];
    EXPECT_EQ(error["code"], 24);
    EXPECT_EQ(error["detail"]["subject"], "localhost");
    EXPECT_TRUE(error["detail"]["expDate"].isIntegral());
}

TEST(ToolConnection, ConnectingWhatIsNotRecordedFails) {
    for (const char* command : {"connect", "disconnect", "show"}) {
        const Outcome outcome =
            Zyrovfs(std::string("connection ") + command + " ftp://nowhere --uid 4001");
        EXPECT_EQ(outcome.status, 1);
        EXPECT_THAT(outcome.output, HasSubstr("VFS_ERR_CONFIG_NOT_FOUND (17)")) << command;
    }
    EXPECT_EQ(Zyrovfs("connection add ftp://nowhere --uid 4001").status, 1);
}

TEST(ToolConnection, APathThatCannotBeFoundFails) {
    for (const char* uri : {"ftp://remo@127.0.0.1:9", "nonsense://"}) {
        const Outcome outcome = Zyrovfs(std::string("path ") + uri + " --uid 4001");
        EXPECT_EQ(outcome.status, 1) << uri;
        EXPECT_THAT(outcome.output, StartsWith("zyrovfs: ")) << uri;
    }
}

}  // namespace
