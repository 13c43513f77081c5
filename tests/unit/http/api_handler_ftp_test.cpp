// FTP dialogues: what the handler asks for, and what refusals of a server become.
#include <sys/types.h>

#include <cstring>

#include "unit/http/http_fixture.h"

namespace ZYROCloud {
namespace {

using wire::ReadLine;
using wire::Script;
using wire::Send;

/** Answers each command with the next of these lines, after the greeting. */
Script Dialogue(const std::vector<std::string>& replies) {
    Script script = {Send("220 ready\r\n")};
    for (const std::string& reply : replies) {
        script.push_back(ReadLine());
        script.push_back(Send(reply + "\r\n"));
    }
    return script;
}

/** User, password, working folder. */
const std::vector<std::string> kLogin = {"331 password?", "230 in", "257 \"/\" here"};

std::vector<std::string> LoggedInAnd(const std::vector<std::string>& replies) {
    std::vector<std::string> all = kLogin;
    all.insert(all.end(), replies.begin(), replies.end());
    return all;
}

std::string Passive(const wire::WireServer& data) {
    return "229 Entering (|||" + std::to_string(data.Port()) + "|)";
}

TEST(Ftp, AWrongPasswordIsPermissionDenied) {
    const wire::WireServer server({Dialogue({"331 password?", "530 no"})});
    Conversation<FTPErrorHandler> talk;
    talk.api.SetUserPwOpt("amy", "wrong");
    EXPECT_FALSE(talk.Get(server.Url("/file", "ftp"), 6));
    EXPECT_EQ(talk.Curl(), 67);
    EXPECT_EQ(talk.Code(), VFS_ERR_PERMISSION_DENIED);
    EXPECT_EQ(server.ReceivedText(), "USER amy\r\nPASS wrong\r\n");
}

TEST(Ftp, AFolderThatIsRefusedGoesByItsReply) {
    const wire::WireServer server({Dialogue(LoggedInAnd({"550 no such folder"}))});
    Conversation<FTPErrorHandler> talk;
    EXPECT_FALSE(talk.Get(server.Url("/a/file", "ftp"), 6));
    EXPECT_EQ(talk.Curl(), 9);
    EXPECT_EQ(talk.Code(), VFS_ERR_NOT_FOUND);
    EXPECT_EQ(YLIBCErrGet(), 0x600U);
}

TEST(Ftp, AQuotedCommandThatIsRefusedIsCommandRefusedAndOneWithAStarIsPassedOver) {
    for (const bool star : {false, true}) {
        const wire::WireServer server({Dialogue(LoggedInAnd({"500 what?", "550 no such folder"}))});
        Conversation<FTPErrorHandler> talk;
        curl_slist* commands = curl_slist_append(nullptr, star ? "*OPTS UTF8 ON" : "OPTS UTF8 ON");
        EXPECT_TRUE(talk.api.SetCodePage("UTF-8", &commands));
        EXPECT_FALSE(talk.Get(server.Url("/a/file", "ftp")));
        EXPECT_EQ(talk.Curl(), star ? 9 : 21);
        EXPECT_EQ(talk.Code(), star ? VFS_ERR_NOT_FOUND : VFS_ERR_COMMAND_REFUSED);
        EXPECT_THAT(server.ReceivedText(), HasSubstr("OPTS UTF8 ON\r\n"));
        curl_slist_free_all(commands);
    }
}

TEST(Ftp, AFileThatIsNotThereIsNotFound) {
    const wire::WireServer data({{wire::ReadAll()}});
    const wire::WireServer server({Dialogue(
        LoggedInAnd({Passive(data), "200 binary", "213 5", "550 no such file", "221 bye"}))});
    Conversation<FTPErrorHandler> talk;
    EXPECT_FALSE(talk.Get(server.Url("/file", "ftp")));
    EXPECT_EQ(talk.Curl(), 78);
    EXPECT_EQ(talk.Code(), VFS_ERR_NOT_FOUND);
}

TEST(Ftp, AFullServerIsNoSpace) {
    const wire::WireServer data({{wire::ReadAll()}});
    const wire::WireServer server(
        {Dialogue(LoggedInAnd({Passive(data), "200 binary", "552 disk is full", "221 bye"}))});
    Conversation<FTPErrorHandler> talk;
    talk.api.SetReadFunAndData([](char*, size_t, size_t, void*) -> size_t { return 0; }, nullptr);
    talk.api.SetUploadOpt(true);
    EXPECT_FALSE(talk.Get(server.Url("/file", "ftp")));
    EXPECT_EQ(talk.Status(), 552);
    EXPECT_EQ(talk.Code(), VFS_ERR_NO_SPACE);
    EXPECT_EQ(YLIBCErrGet(), 0x2900U);
}

TEST(Ftp, ARefusedPassiveModeIsTriedAgainInActiveMode) {
    // The connection outlives the refusal, so both attempts are one dialogue.
    const wire::WireServer server({Dialogue(LoggedInAnd(
        {"500 what?", "502 not here", "500 what?", "500 what?", "500 what?", "500 what?"}))});
    Conversation<FTPErrorHandler> talk;
    EXPECT_FALSE(talk.Get(server.Url("/file", "ftp"), 1));
    const std::string told = server.ReceivedText();
    const size_t refused = told.find("EPSV\r\nPASV\r\n");
    ASSERT_NE(refused, std::string::npos) << told;
    const std::string second = told.substr(refused + strlen("EPSV\r\nPASV\r\n"));
    EXPECT_THAT(second, HasSubstr("EPRT |1|127.0.0.1|"));
    EXPECT_THAT(second, Not(HasSubstr("PASV")));
    EXPECT_THAT(seams::Sleeps(), ElementsAre(3)) << seams::LogDump();
}

TEST(Ftp, WithEpsvOffThePassiveCommandComesFirst) {
    const wire::WireServer server({Dialogue(LoggedInAnd({"502 not here"}))});
    Conversation<FTPErrorHandler> talk;
    EXPECT_TRUE(talk.api.SetFTPEPSV(false));
    EXPECT_FALSE(talk.Get(server.Url("/file", "ftp")));
    EXPECT_THAT(server.ReceivedText(), HasSubstr("PWD\r\nPASV\r\n"));
}

TEST(Ftp, APathIsEnteredAtOnceOrFolderByFolder) {
    for (const bool single : {true, false}) {
        const wire::WireServer server(
            {Dialogue(LoggedInAnd({single ? "550 no" : "250 ok", "550 no"}))});
        Conversation<FTPErrorHandler> talk;
        EXPECT_TRUE(talk.api.SetFTPCWD(single));
        EXPECT_FALSE(talk.Get(server.Url("/a/b/file", "ftp")));
        EXPECT_THAT(server.ReceivedText(),
                    HasSubstr(single ? "CWD a/b\r\n" : "CWD a\r\nCWD b\r\n"));
    }
}

}  // namespace
}  // namespace ZYROCloud
