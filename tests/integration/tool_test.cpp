// The command line tool as people and scripts use it: profiles end to end, what it prints, what it
// keeps to itself, and its exit statuses. Live connections stand in tool_connection_test.cpp.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <json/reader.h>
#include <pty.h>

#include <algorithm>
#include <filesystem>

#include "support/locations.h"
#include "support/machine.h"

namespace {

using machine::Must;
using machine::Outcome;
using testing::AllOf;
using testing::HasSubstr;
using testing::Not;

const std::string kTool = BuildDir() + "/tools/zyrovfs/zyrovfs";
constexpr unsigned kAmy = 4001;
const std::string kId = "ftp://amy@nas.example:2121";

/** machine::Run, whose name tests have for their own. */
Outcome Shell(const std::string& command) {
    return machine::Run(command);
}

Outcome Zyrovfs(const std::string& arguments) {
    return Shell(kTool + " " + arguments);
}

/** Standard output alone, as JSON; null when it is none. */
Json::Value AsJson(const std::string& arguments) {
    const Outcome outcome = Shell(kTool + " " + arguments + " --json 2>/dev/null");
    Json::CharReaderBuilder builder;
    Json::CharReaderBuilder::strictMode(&builder.settings_);
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    const char* text = outcome.output.data();
    Json::Value value;
    std::string errors;
    EXPECT_TRUE(reader->parse(text, text + outcome.output.size(), &value, &errors))
        << errors << "\n"
        << outcome.output;
    return value;
}

void Write(const std::string& path, const std::string& text) {
    std::ofstream(path, std::ios::binary) << text;
}

std::string Stored() {
    return machine::Read("/usr/zyro/etc/zyrovfs/4001/servers.conf");
}

class Users : public testing::Environment {
    void SetUp() override { machine::AddUser("amy", kAmy); }
};
const auto* const kUsers = testing::AddGlobalTestEnvironment(new Users);

class Tool : public testing::Test {
  protected:
    void SetUp() override { std::filesystem::remove_all("/usr/zyro/etc/zyrovfs/4001"); }

    Outcome AddProfile(const std::string& more = "") {
        return Shell("printf 's3cret\\n' | " + kTool +
                     " profile add --uid 4001 --protocol ftp --hostname nas.example --port 2121 "
                     "--account amy --password-stdin " +
                     more);
    }
};

// --- the command line -------------------------------------------------------------------------

TEST_F(Tool, WrongUseEndsWithStatus2AndSaysSo) {
    const char* lines[] = {
        "",
        "bogus",
        "profile",
        "profile bogus --uid 1",
        "profile list",
        "profile list --uid",
        "profile list --uid amy",
        "profile list --uid -1",
        "profile list --uid 4294967296",
        "profile list --uid 4001 --user amy",
        "profile list --uid 4001 --sort colour",
        "profile list --uid 4001 --limit many",
        "profile list --uid 4001 surplus",
        "profile show --uid 4001",
        "profile add --uid 4001",
        "profile add --uid 4001 --port x",
        "profile set x --uid 4001",
        "profile set x --uid 4001 --path /srv",
        "profile add --uid 4001 --protocol ftp --hostname h --password-stdin --password-file /x",
        "profile add --uid 4001 --protocol ftp --hostname h --ask-password --password-stdin",
        "connection add --uid 4001",
        "connection add ftp://h --uid 4001 --hostname h",
        "connection connect --uid 4001",
        "path --uid 4001",
        "path hello.txt --uid 4001",
        "path '' --uid 4001",
        "path :// --uid 4001",
        "path ./a://b --uid 4001",
        "user clean",
        "host",
        "host install --build",
    };
    for (const char* line : lines) {
        const Outcome outcome = Zyrovfs(line);
        EXPECT_EQ(outcome.status, 2) << line << "\n" << outcome.output;
        EXPECT_THAT(outcome.output, HasSubstr("Run with --help")) << line;
    }
}

TEST_F(Tool, NoCommandTakesAPasswordOnItsLine) {
    for (const char* command : {"profile add", "profile set x", "connection add",
                                "connection set x", "connection connect x"}) {
        const std::string line = std::string(command) + " --uid 4001 --password s3cret";
        EXPECT_EQ(Zyrovfs(line).status, 2) << line;
    }
}

TEST_F(Tool, EveryCommandHasHelp) {
    for (const char* command : {"",
                                "protocol",
                                "protocol list",
                                "profile",
                                "profile add",
                                "profile list",
                                "profile show",
                                "profile set",
                                "profile delete",
                                "connection",
                                "connection add",
                                "connection list",
                                "connection show",
                                "connection connect",
                                "connection disconnect",
                                "connection set",
                                "connection delete",
                                "path",
                                "user",
                                "user clean",
                                "host",
                                "host install",
                                "host remove",
                                "host check"}) {
        const Outcome outcome = Zyrovfs(std::string(command) + " --help");
        EXPECT_EQ(outcome.status, 0) << command;
        EXPECT_THAT(outcome.output, HasSubstr("Usage: ")) << command;
    }
    EXPECT_THAT(Zyrovfs("--version").output, HasSubstr("zyrovfs 6."));
}

TEST_F(Tool, OnlyRootActsForAUser) {
    const Outcome outcome = machine::RunAs("amy", kTool + " profile list --uid 4001");
    EXPECT_EQ(outcome.status, 1);
    EXPECT_THAT(outcome.output, HasSubstr("Only root can act for a user."));
    EXPECT_EQ(machine::RunAs("amy", kTool + " protocol list").status, 0);
}

TEST_F(Tool, AUserCanBeNamed) {
    ASSERT_EQ(AddProfile().status, 0);
    EXPECT_EQ(AsJson("profile list --user amy")["total"], 1);
    const Outcome outcome = Zyrovfs("profile list --user nobody-here");
    EXPECT_EQ(outcome.status, 1);
    EXPECT_THAT(outcome.output, HasSubstr("There is no user nobody-here."));
}

// --- the catalogue ----------------------------------------------------------------------------

TEST_F(Tool, ProtocolListShowsTheCatalogue) {
    const Json::Value list = AsJson("protocol list");
    ASSERT_EQ(list.size(), 11u);
    EXPECT_FALSE(list[0].isMember("has_server"));
    EXPECT_THAT(Zyrovfs("protocol list").output,
                AllOf(HasSubstr("PROTOCOL  NAME"), HasSubstr("sftp      SFTP")));
}

TEST_F(Tool, ProtocolListForAUserTellsWhichAreInUse) {
    ASSERT_EQ(AddProfile().status, 0);
    for (const Json::Value& protocol : AsJson("protocol list --uid 4001")) {
        const std::string name = protocol["protocol"].asString();
        EXPECT_EQ(protocol["has_server"].asBool(), name == "ftp" || name == "sharing") << name;
    }
}

// --- a profile's life -------------------------------------------------------------------------

TEST_F(Tool, AProfileIsAddedListedShownChangedAndDeleted) {
    EXPECT_EQ(AddProfile("--alias 'My NAS'").output, "Saved " + kId + ".\n");
    const Outcome list = Zyrovfs("profile list --uid 4001");
    EXPECT_THAT(list.output, AllOf(HasSubstr(kId), HasSubstr("My NAS"), HasSubstr("no\n")));
    const Outcome show = Zyrovfs("profile show " + kId + " --uid 4001");
    EXPECT_EQ(show.status, 0);
    EXPECT_THAT(show.output, HasSubstr("alias           My NAS\n"));
    EXPECT_EQ(Zyrovfs("profile set " + kId + " --uid 4001 --alias Renamed").output,
              "Changed " + kId + ".\n");
    EXPECT_EQ(AsJson("profile show " + kId + " --uid 4001")["alias"], "Renamed");
    EXPECT_EQ(Zyrovfs("profile delete " + kId + " --uid 4001").output, "Deleted " + kId + ".\n");
    EXPECT_EQ(Zyrovfs("profile list --uid 4001").output, "There are no profiles to show.\n");
}

TEST_F(Tool, ChangingTheHostTellsTheNewId) {
    ASSERT_EQ(AddProfile().status, 0);
    const std::string now = "ftp://amy@other.example:2121";
    EXPECT_EQ(Zyrovfs("profile set " + kId + " --uid 4001 --hostname other.example").output,
              "Changed " + kId + ". Its id is now " + now + ".\n");
    EXPECT_EQ(AsJson("profile set " + now + " --uid 4001 --hostname nas.example")["id"], kId);
}

TEST_F(Tool, DeletingWhatIsNotThereSucceedsAndSaysSo) {
    const Outcome outcome = Zyrovfs("profile delete ftp://nowhere --uid 4001");
    EXPECT_EQ(outcome.status, 0);
    EXPECT_EQ(outcome.output, "There was no profile ftp://nowhere.\n");
}

TEST_F(Tool, LeftOutKeysGetPlainValues) {
    const Json::Value added =
        AsJson("profile add --uid 4001 --protocol sftp --hostname nas.example");
    EXPECT_EQ(added["id"], "sftp://nas.example:22");
    EXPECT_EQ(added["profile"]["alias"], "nas.example");
    EXPECT_EQ(added["profile"]["account"], "");
    EXPECT_EQ(added["profile"]["port"], 22);
    EXPECT_EQ(added["profile"]["codepage"], "UTF-8");
}

TEST_F(Tool, ASharedLinkNeedsNothingButItsAddress) {
    const Json::Value added =
        AsJson("profile add --uid 4001 --protocol sharing --email amy@mail.example");
    EXPECT_EQ(added["id"], "sharing://amy@mail.example");
    EXPECT_EQ(added["profile"]["alias"], "amy@mail.example");
}

TEST_F(Tool, ListingsAreSortedAndPaged) {
    for (const char* host : {"b.example", "a.example", "c.example"}) {
        Must(kTool + " profile add --uid 4001 --protocol ftp --hostname " + host);
    }
    const Json::Value page =
        AsJson("profile list --uid 4001 --sort hostname --descending --offset 1 --limit 1");
    EXPECT_EQ(page["total"], 3);
    ASSERT_EQ(page["profiles"].size(), 1u);
    EXPECT_EQ(page["profiles"][0]["hostname"], "b.example");
    EXPECT_EQ(AsJson("profile list --uid 4001 --protocol dav")["total"], 0);
}

TEST_F(Tool, AFileCanGiveAProfileAndOptionsOverruleIt) {
    Write("/tmp/profile.json", R"({"protocol": "ftp", "hostname": "nas.example", "port": 1,
                                   "password": "s3cret", "account": "amy"})");
    EXPECT_EQ(AsJson("profile add --uid 4001 --from /tmp/profile.json --port 2121")["id"], kId);
    EXPECT_EQ(AsJson("profile show " + kId + " --uid 4001 --with-credentials")["password"],
              "s3cret");
    Write("/tmp/change.json", R"({"alias": "piped"})");
    EXPECT_EQ(AsJson("profile set " + kId + " --uid 4001 --from - </tmp/change.json")["id"], kId);
    EXPECT_EQ(AsJson("profile show " + kId + " --uid 4001")["alias"], "piped");
}

TEST_F(Tool, WhatIsNoProfileIsRefused) {
    std::string deep(200000, '[');
    for (const std::string& text : {std::string("{"), std::string("[]"), std::string("null"),
                                    std::string("\0\1\2", 3), std::string(), deep}) {
        Write("/tmp/bad.json", text);
        const Outcome outcome = Zyrovfs("profile add --uid 4001 --from /tmp/bad.json");
        EXPECT_EQ(outcome.status, 1) << outcome.output;
        EXPECT_THAT(outcome.output, HasSubstr("zyrovfs: "));
    }
    Write("/tmp/bad.json", R"({"protocol": {"a": 1}, "hostname": [2], "port": "x"})");
    EXPECT_EQ(Zyrovfs("profile add --uid 4001 --from /tmp/bad.json").status, 1);
    EXPECT_EQ(Zyrovfs("profile add --uid 4001 --from /nowhere").status, 1);
    EXPECT_EQ(AsJson("profile list --uid 4001")["total"], 0);
}

// --- credentials ------------------------------------------------------------------------------

TEST_F(Tool, ThePasswordIsShownOnlyWhenAskedFor) {
    const Outcome added = AddProfile("--json");
    EXPECT_THAT(added.output, Not(HasSubstr("password")));
    EXPECT_THAT(Stored(), Not(HasSubstr("s3cret")));
    for (const char* form : {"", " --json"}) {
        const std::string show = "profile show " + kId + " --uid 4001" + form;
        EXPECT_THAT(Zyrovfs(show).output, Not(HasSubstr("password")));
        EXPECT_THAT(Zyrovfs(show + " --with-credentials").output, HasSubstr("s3cret"));
        EXPECT_THAT(Zyrovfs(std::string("profile list --uid 4001") + form).output,
                    Not(HasSubstr("s3cret")));
    }
}

TEST_F(Tool, APasswordFileLosesOneNewlineAndNothingElse) {
    for (const char* text : {" blank in front", "no newline", "\xc3\xa4 end \r", ""}) {
        Write("/tmp/password", std::string(text) + "\n");
        Zyrovfs("profile delete " + kId + " --uid 4001");
        Must(kTool +
             " profile add --uid 4001 --protocol ftp --hostname nas.example --port 2121 "
             "--account amy --password-file /tmp/password");
        EXPECT_EQ(AsJson("profile show " + kId + " --uid 4001 --with-credentials")["password"],
                  text);
    }
}

TEST_F(Tool, APasswordThatIsNotOneLineIsRefused) {
    for (const std::string& text : {std::string("two\nlines\n"), std::string("nul\0here", 8)}) {
        Write("/tmp/password", text);
        const Outcome outcome = Zyrovfs(
            "profile add --uid 4001 --protocol ftp --hostname h --password-file "
            "/tmp/password");
        EXPECT_EQ(outcome.status, 1);
        EXPECT_THAT(outcome.output, HasSubstr("is not one line of text."));
    }
    EXPECT_THAT(Zyrovfs("profile add --uid 4001 --protocol ftp --hostname h "
                        "--password-file /nowhere")
                    .output,
                HasSubstr("No such file"));
}

/** Runs the tool on a terminal of its own and types `keys` once it has asked. */
Outcome OnTerminal(const std::string& arguments, const std::string& keys) {
    int terminal = -1;
    const pid_t pid = forkpty(&terminal, nullptr, nullptr, nullptr);
    if (pid == 0) {
        execl("/bin/sh", "sh", "-c", ("exec " + kTool + " " + arguments).c_str(), nullptr);
        _exit(127);
    }
    std::string output;
    char buffer[1024];
    bool typed = false;
    ssize_t count = 0;
    while ((count = read(terminal, buffer, sizeof buffer)) > 0) {
        output.append(buffer, static_cast<size_t>(count));
        if (!typed && output.find("Password: ") != std::string::npos) {
            typed = write(terminal, keys.data(), keys.size()) > 0;
        }
    }
    int status = 0;
    waitpid(pid, &status, 0);
    close(terminal);
    return {WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status), output};
}

TEST_F(Tool, ThePromptDoesNotShowWhatIsTyped) {
    const Outcome outcome = OnTerminal(
        "profile add --uid 4001 --protocol ftp --hostname nas.example --port 2121 --account amy",
        "typed-s3cret\n");
    EXPECT_EQ(outcome.status, 0) << outcome.output;
    EXPECT_THAT(outcome.output, AllOf(HasSubstr("Saved " + kId), Not(HasSubstr("typed-s3cret"))));
    EXPECT_EQ(AsJson("profile show " + kId + " --uid 4001 --with-credentials")["password"],
              "typed-s3cret");
}

TEST_F(Tool, AnInterruptedPromptSavesNothing) {
    const Outcome outcome = OnTerminal(
        "profile add --uid 4001 --protocol ftp --hostname nas.example --account amy", "half\x03");
    EXPECT_EQ(outcome.status, -SIGINT) << outcome.output;
    EXPECT_EQ(AsJson("profile list --uid 4001")["total"], 0);
}

TEST_F(Tool, WithoutATerminalThePromptFailsInsteadOfHanging) {
    const Outcome outcome = Shell("setsid " + kTool +
                                  " profile add --uid 4001 --protocol ftp --hostname h "
                                  "--ask-password </dev/null");
    EXPECT_EQ(outcome.status, 1);
    EXPECT_THAT(outcome.output, HasSubstr("There is no terminal to ask for the password"));
}

// --- what is printed --------------------------------------------------------------------------

TEST_F(Tool, AFailureTellsNameNumberAndMeaning) {
    ASSERT_EQ(AddProfile().status, 0);
    const Outcome again = AddProfile();
    EXPECT_EQ(again.status, 1);
    EXPECT_THAT(again.output, HasSubstr("VFS_ERR_SERVER_EXISTS (14): A profile of this server"));
    const Outcome missing = Zyrovfs("profile show ftp://nowhere --uid 4001");
    EXPECT_THAT(missing.output, HasSubstr("VFS_ERR_CONFIG_NOT_FOUND (17)"));
}

TEST_F(Tool, AFailureInJsonIsAnObjectWithError) {
    const Json::Value error = AsJson("profile show ftp://nowhere --uid 4001")["error"];
    EXPECT_EQ(error["name"], "VFS_ERR_CONFIG_NOT_FOUND");
    EXPECT_EQ(error["code"], 17);
    EXPECT_NE(error["meaning"], "");
    EXPECT_EQ(Zyrovfs("profile show ftp://nowhere --uid 4001 --json").status, 1);
}

TEST_F(Tool, AProfileThatLacksAKeyIsABadParameter) {
    EXPECT_THAT(Zyrovfs("profile add --uid 4001 --protocol nonesuch --hostname h").output,
                HasSubstr("VFS_ERR_BAD_PARAM (2)"));
}

bool IsHarmless(char c) {
    return c == '\n' || (c >= 0x20 && c < 0x7f);
}

TEST_F(Tool, ControlCharactersFromAProfileDoNotReachTheTerminal) {
    // An escape sequence, a C1 control, a mark that turns the direction, and a bell.
    Write("/tmp/profile.json",
          "{\"protocol\": \"ftp\", \"hostname\": \"nas.example\", \"port\": 2121, "
          "\"account\": \"amy\", \"alias\": \"a\\u001b[2Jb\\u009bc\\u202ed\\u0007\"}");
    ASSERT_EQ(Zyrovfs("profile add --uid 4001 --from /tmp/profile.json").status, 0);
    for (const std::string command : {"profile list", "profile list --json"}) {
        const std::string output = Zyrovfs(command + " --uid 4001").output;
        EXPECT_THAT(output, HasSubstr("nas.example"));
        EXPECT_TRUE(std::all_of(output.begin(), output.end(), IsHarmless)) << output;
    }
    EXPECT_THAT(Zyrovfs("profile list --uid 4001").output,
                HasSubstr("a\\x1b[2Jb\\u{009b}c\\u{202e}d\\x07"));
}

TEST_F(Tool, ControlCharactersOfTheCommandLineAreNotEchoed) {
    const std::string output = Zyrovfs("profile show 'ftp://\x1b[2Jx\xff' --uid 4001").output;
    EXPECT_THAT(output, HasSubstr("\\x1b[2Jx\\xff"));
    EXPECT_TRUE(std::all_of(output.begin(), output.end(), IsHarmless)) << output;
}

TEST_F(Tool, OrdinaryTextOfAnyLanguageIsLeftAsItIs) {
    ASSERT_EQ(AddProfile("--alias 'Büro 东京'").status, 0);
    EXPECT_THAT(Zyrovfs("profile list --uid 4001").output, HasSubstr("Büro 东京"));
}

TEST_F(Tool, AResultThatCannotBeWrittenIsAFailure) {
    const Outcome outcome = Zyrovfs("profile list --uid 4001 --json 2>&1 >/dev/full");
    EXPECT_EQ(outcome.status, 1);
    EXPECT_EQ(outcome.output, "zyrovfs: Writing the result failed.\n");
}

TEST_F(Tool, AListingThatCannotBeReadFails) {
    ASSERT_EQ(AddProfile().status, 0);
    Write("/usr/zyro/etc/zyrovfs/4001/servers.conf", "{ broken");
    const Outcome outcome = Zyrovfs("profile list --uid 4001");
    EXPECT_EQ(outcome.status, 1);
    EXPECT_THAT(outcome.output, HasSubstr("VFS_ERR_CONFIG_READ (15)"));
}

}  // namespace
