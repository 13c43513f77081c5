// Connections that outlive a handler: who gets them, and that nothing else of the handler does.
#include <fcntl.h>

#include "support/scratch.h"
#include "unit/http/curl_seam.h"
#include "unit/http/http_fixture.h"

namespace ZYROCloud {
namespace {

using wire::Answer;
using wire::ReadRequest;
using wire::Script;
using wire::Send;

class Kept : public testing::Test {
  protected:
    void SetUp() override {
        curl_seam::Now() = {};
        HandlePool::Instance().Empty();
    }
    void TearDown() override {
        curl_seam::Now() = {};
        HandlePool::Instance().Empty();
        unsetenv("ZYROVFS_UID");
    }
};

/** A connection that answers this many requests and stays open until the other side goes. */
Script Serve(int requests) {
    Script script;
    for (int i = 0; i < requests; ++i) {
        script.push_back(ReadRequest());
        script.push_back(Send(Answer(200, "hello")));
    }
    script.push_back(wire::ReadAll());
    return script;
}

/** One request by a handler that lives no longer. */
bool Fetch(const std::string& url) {
    Conversation<> talk;
    return talk.Get(url) && talk.api.GetResponse() == "hello";
}

TEST_F(Kept, HandlersThatLiveForOneRequestShareAConnection) {
    const wire::WireServer server({Serve(3)});
    for (int i = 0; i < 3; ++i) {
        EXPECT_TRUE(Fetch(server.Url())) << seams::LogDump();
    }
    EXPECT_EQ(server.Connections(), 1U);
}

TEST_F(Kept, TwoHandlersAtOnceHaveAConnectionEach) {
    const wire::WireServer server({Serve(2), Serve(1)});
    Conversation<> one;
    EXPECT_TRUE(one.Get(server.Url()));
    EXPECT_TRUE(Fetch(server.Url()));
    EXPECT_TRUE(one.Get(server.Url()));
    EXPECT_EQ(server.Connections(), 2U);
}

TEST_F(Kept, AConnectionOfOneUserIsNotUsedForAnother) {
    const wire::WireServer server({Serve(2), Serve(1)});
    for (const char* user : {"4567", "4568", "4567"}) {
        setenv("ZYROVFS_UID", user, 1);
        EXPECT_TRUE(Fetch(server.Url()));
    }
    EXPECT_EQ(server.Connections(), 2U);
}

TEST_F(Kept, AHandlerThatTurnsToAnotherUserUsesNoConnectionOfTheFirstAndLeavesNone) {
    const wire::WireServer server(
        {Serve(1), {ReadRequest(), Send(Answer(200, "hello"))}, Serve(1)});
    setenv("ZYROVFS_UID", "4567", 1);
    {
        Conversation<> talk;
        EXPECT_TRUE(talk.Get(server.Url()));
        setenv("ZYROVFS_UID", "4568", 1);
        EXPECT_TRUE(talk.api.Init());
        EXPECT_TRUE(talk.Get(server.Url()));
        EXPECT_EQ(server.Connections(), 2U);
    }
    EXPECT_EQ(HandlePool::Instance().Idle(), 0U);
    EXPECT_TRUE(Fetch(server.Url()));
    EXPECT_EQ(server.Connections(), 3U);
}

TEST_F(Kept, AConnectionThatProvedAnAccountIsUsedForThatAccountOnly) {
    const wire::WireServer server({Serve(2), Serve(1), Serve(1)});
    const std::string url = server.Url("/file", "dav");
    for (const char* user : {"amy", "bob", "amy"}) {
        Conversation<DavErrorHandler> talk;
        talk.api.ExpectVFSURL(url, user, "password");
        EXPECT_TRUE(talk.api.Init());
        EXPECT_TRUE(talk.api.SetUserPwOpt(user, "password"));
        talk.api.SetVFSURL(url);
        EXPECT_TRUE(talk.api.Process(0));
    }
    EXPECT_EQ(server.Connections(), 2U);
    EXPECT_TRUE(Fetch(server.Url()));
    EXPECT_EQ(server.Connections(), 3U) << "nor for one that has none";
}

TEST_F(Kept, AnAccountThatWasNotExpectedEndsTheKeptConnections) {
    const wire::WireServer server({Serve(1), {ReadRequest(), Send(Answer(200, "hello"))}});
    EXPECT_TRUE(Fetch(server.Url()));
    {
        Conversation<DavErrorHandler> talk;
        EXPECT_TRUE(talk.api.SetUserPwOpt("amy", "password"));
        EXPECT_TRUE(talk.Get(server.Url()));
    }
    EXPECT_EQ(server.Connections(), 2U);
    EXPECT_EQ(HandlePool::Instance().Idle(), 0U);
}

TEST_F(Kept, ALoginAtAFileServerEndsWithItsHandler) {
    const wire::WireServer server(
        {{wire::Send("220 hello\r\n"), wire::ReadLine(), wire::Send("331 password\r\n"),
          wire::ReadLine(), wire::Send("530 no\r\n")}});
    {
        Conversation<FTPErrorHandler> talk;
        talk.api.SetVFSURL(server.Url("/file", "ftp"));
        EXPECT_FALSE(talk.api.Process(0));
    }
    EXPECT_EQ(HandlePool::Instance().Idle(), 0U);
}

TEST_F(Kept, ConnectionsAreNotInheritedByProgramsThatThisProcessStarts) {
    const wire::WireServer server({Serve(1)});
    Conversation<> talk;
    EXPECT_TRUE(talk.Get(server.Url()));
    curl_socket_t socket = CURL_SOCKET_BAD;
    ASSERT_EQ(curl_easy_getinfo(talk.api.GetCurlHandler(), CURLINFO_ACTIVESOCKET, &socket),
              CURLE_OK);
    EXPECT_EQ(fcntl(socket, F_GETFD), FD_CLOEXEC);
}

// Forked children.

TEST_F(Kept, AForkedChildMakesItsOwnConnectionAndLeavesThatOfTheParentAlone) {
    const wire::WireServer server({Serve(3), Serve(1), Serve(1)});
    EXPECT_TRUE(Fetch(server.Url()));
    {
        Conversation<> lent;
        EXPECT_TRUE(lent.Get(server.Url()));
        EXPECT_EQ(0, scratch::InChild([&] {
                      // What the parent has lent out: its handle is not used, and not closed.
                      CURL* const parents = lent.api.GetCurlHandler();
                      const bool own = lent.api.Init() && lent.Get(server.Url());
                      return own && Fetch(server.Url()) && parents != nullptr ? 0 : 1;
                  }));
        EXPECT_TRUE(lent.Get(server.Url())) << seams::LogDump();
    }
    EXPECT_EQ(HandlePool::Instance().Idle(), 1U);
}

TEST_F(Kept, ARequestThatTheParentHasDescribedIsNotSentByAChild) {
    const wire::WireServer server({Serve(2)});
    Conversation<> talk;
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_EQ(0, scratch::InChild([&] { return talk.api.Process(0) ? 1 : 0; }));
    EXPECT_TRUE(talk.Get(server.Url()));
    EXPECT_EQ(server.Connections(), 1U);
}

// Connections that the server has closed.

TEST_F(Kept, AConnectionThatTheServerHasClosedIsReplacedWithoutARetry) {
    for (const wire::Step& end : {wire::Reset(), ReadRequest()}) {
        Script dying = {ReadRequest(), Send(Answer(200, "hello"))};
        if (end.kind == wire::Step::kReset) {
            dying.push_back(ReadRequest());
        }
        dying.push_back(end);
        const wire::WireServer server({dying, Serve(1)});
        EXPECT_TRUE(Fetch(server.Url()));
        Conversation<> talk;
        talk.api.AddPostParam("name", "value");
        EXPECT_TRUE(talk.Get(server.Url())) << seams::LogDump();
        EXPECT_EQ(talk.api.GetResponse(), "hello");
        EXPECT_EQ(server.Connections(), 2U);
        EXPECT_THAT(seams::Sleeps(), IsEmpty());
    }
}

/** More than the sockets between the two hold. */
const std::string& LargeText() {
    static const std::string text(7000000, 'x');
    return text;
}

/** Answers one request, and resets the connection in the middle of the next one. */
Script DiesInTheBody() {
    return {ReadRequest(), Send(Answer(200, "hello")), wire::ReadHead(), wire::ReadBytes(1000),
            wire::Reset()};
}

TEST_F(Kept, ABodyThatTheHandlerHoldsIsSentAgainWhenAnOldConnectionDiesUnderIt) {
    const wire::WireServer server({DiesInTheBody(), Serve(1)});
    EXPECT_TRUE(Fetch(server.Url()));
    Conversation<> talk;
    talk.api.AddHeader(Parsed(R"({"Expect":""})"));
    talk.api.AddPostParam("text", LargeText());
    EXPECT_TRUE(talk.Get(server.Url())) << seams::LogDump();
    EXPECT_EQ(talk.api.GetResponse(), "hello");
    EXPECT_EQ(server.Connections(), 2U);
    EXPECT_TRUE(server.Received().back().find("text=" + LargeText()) != std::string::npos);
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
}

size_t Endless(char* data, size_t size, size_t count, void*) {
    memset(data, 'x', size * count);
    return size * count;
}

TEST_F(Kept, ABodyThatCannotBeReadAgainFailsWithItsOldConnection) {
    const wire::WireServer server({DiesInTheBody(), Serve(1)});
    EXPECT_TRUE(Fetch(server.Url()));
    Conversation<> talk;
    talk.api.AddHeader(Parsed(R"({"Expect":""})"));
    EXPECT_TRUE(talk.api.SetReadFunAndData(Endless, nullptr));
    EXPECT_TRUE(talk.api.SetUploadOpt(true));
    EXPECT_TRUE(talk.api.SetUploadSize(static_cast<long long>(LargeText().size())));
    EXPECT_FALSE(talk.Get(server.Url()));
    EXPECT_THAT(talk.Curl(), testing::AnyOf(CURLE_SEND_ERROR, CURLE_SEND_FAIL_REWIND));
    EXPECT_NE(talk.Code(), VFS_ERR_NONE);
    const std::string all = server.ReceivedText();
    EXPECT_EQ(all.find("PUT /"), all.rfind("PUT /")) << "sent once";
}

TEST_F(Kept, ARequestOnANewConnectionIsNotSentTwice) {
    const wire::WireServer server({{ReadRequest(), wire::Reset()}, Serve(1)});
    EXPECT_FALSE(Fetch(server.Url()));
    EXPECT_EQ(server.Connections(), 1U);
}

}  // namespace
}  // namespace ZYROCloud
