/** Faults of the simulated services, and the journal that tells what came in spite of them. */
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <stdexcept>
#include <thread>

#include "support/cloudsim/cloudsim.h"
#include "support/cloudsim_client.h"
#include "support/test_certs.h"

namespace {

using cloudsim::Break;
using cloudsim::Fault;
using cloudsim::Got;
using cloudsim::RangeFault;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;
using testing::StartsWith;

const char* const kMe = "/2.0/users/me";

const tls::Identity& Authority() {
    static const tls::Identity authority = tls::MakeAuthority("test authority");
    return authority;
}

cloudsim::BoxOptions Options(bool secure) {
    cloudsim::BoxOptions options;
    if (secure) {
        tls::CertSpec spec;
        spec.dns_names = {"localhost", "upload.localhost", "dl.localhost"};
        const tls::Identity identity = tls::Make(spec, &Authority());
        options.certificate = identity.certificate;
        options.key = identity.key;
    }
    return options;
}

/** Each of these holds over TLS and without. */
struct Faults : testing::TestWithParam<bool> {
    cloudsim::BoxService box{Options(GetParam())};
    cloudsim::Account& amy = box.AddAccount("amy@example.com");
    cloudsim::Client client{amy.IssueTokens().access_token};

    Faults() {
        client.ca = GetParam() ? Authority().certificate : "";
        client.follow = true;
    }
    Got Get(const std::string& path) { return client.Get(box.ApiHost() + path); }
    Got GetContent(const std::string& id) { return Get("/2.0/files/" + id + "/content"); }
    Got Upload(const std::string& name, const std::string& bytes) {
        return client.Upload(box.UploadHost() + "/api/2.0/files/content",
                             {{"attributes", R"({"name":")" + name + R"(","parent":{"id":"0"}})"},
                              {"@file", bytes}});
    }
    void TearDown() override { EXPECT_THAT(box.UnusedFaults(), IsEmpty()); }
};

INSTANTIATE_TEST_SUITE_P(Plain, Faults, testing::Values(false));
INSTANTIATE_TEST_SUITE_P(Tls, Faults, testing::Values(true));

TEST_P(Faults, AnswersInPlaceOfTheServiceAsOftenAsDeclared) {
    box.AddFault(
        Fault::On("GET", kMe).After(1).Times(2).Answer(503, "busy", {{"Retry-After", "1"}}));
    EXPECT_EQ(200, Get(kMe).status);
    const Got busy = Get(kMe);
    EXPECT_EQ(503, busy.status);
    EXPECT_EQ("busy", busy.body);
    EXPECT_THAT(busy.head, HasSubstr("Retry-After: 1\r"));
    EXPECT_EQ(503, Get(kMe).status);
    EXPECT_EQ(200, Get(kMe).status);
}

TEST_P(Faults, ADeclaredAnswerTakesNoEffectAndAChangedStatusDoes) {
    const std::string folder = R"({"name":"a","parent":{"id":"0"}})";
    const std::string url = box.ApiHost() + "/2.0/folders";
    box.AddFault(Fault::On("POST", "/2.0/folders").Answer(500));
    box.AddFault(Fault::On("POST", "/2.0/folders").Status(500));
    EXPECT_EQ(500, client.Send("POST", url, folder).status);
    EXPECT_FALSE(amy.Exists("/a"));
    EXPECT_EQ(500, client.Send("POST", url, folder).status);
    EXPECT_TRUE(amy.Exists("/a"));
}

TEST_P(Faults, AFaultForOneHostLeavesTheOthersAlone) {
    box.AddFault(Fault::On("*", "*content").AtHost("download").Answer(410));
    box.AddFault(Fault::On("GET", "/d/").AtHost("download").Answer(410));
    const std::string file = amy.AddFile("0", "a", "text");
    EXPECT_EQ(410, GetContent(file).status);
    EXPECT_THAT(box.UnusedFaults(), ElementsAre(StartsWith("* *content host=download")));
    box.ClearFaults();
}

TEST_P(Faults, WaitsBeforeTheAnswer) {
    box.AddFault(Fault::On("GET", kMe).Delay(0.3));
    const auto began = std::chrono::steady_clock::now();
    EXPECT_EQ(200, Get(kMe).status);
    EXPECT_GE(std::chrono::steady_clock::now() - began, std::chrono::milliseconds(300));
}

TEST_P(Faults, ADelayEndsWithTheService) {
    auto other = std::make_unique<cloudsim::BoxService>(Options(GetParam()));
    other->AddFault(Fault::On("GET", kMe).Delay(1000));
    std::thread asking([&] { client.Get(other->ApiHost() + kMe); });
    EXPECT_TRUE(other->Journal().WaitFor([](auto& entries) { return !entries.empty(); }));
    EXPECT_TRUE([&] {
        while (!other->UnusedFaults().empty()) {
            std::this_thread::yield();
        }
        return true;
    }());
    other.reset();
    asking.join();
}

TEST_P(Faults, SendsNoFasterThanDeclared) {
    const std::string file = amy.AddPattern("0", "a", 50000);
    box.AddFault(Fault::On("GET", "/d/").Throttle(100000));
    const auto began = std::chrono::steady_clock::now();
    EXPECT_EQ(amy.Bytes(file), GetContent(file).body);
    EXPECT_GE(std::chrono::steady_clock::now() - began, std::chrono::milliseconds(490));
}

TEST_P(Faults, TakesAnUploadNoFasterThanDeclared) {
    box.AddFault(Fault::On("POST", "/api/2.0/files/content").ThrottleUpload(1000000));
    const auto began = std::chrono::steady_clock::now();
    EXPECT_EQ(201, Upload("a", std::string(400000, 'a')).status);
    EXPECT_GE(std::chrono::steady_clock::now() - began, std::chrono::milliseconds(390));
}

TEST_P(Faults, StandsStillInTheMiddleOfABody) {
    const std::string file = amy.AddPattern("0", "a", 300000);
    box.AddFault(Fault::On("GET", "/d/").Pause(100000, 0.3));
    box.AddFault(Fault::On("POST", "/api/2.0/files/content").PauseUpload(100000, 0.3));
    const auto began = std::chrono::steady_clock::now();
    EXPECT_EQ(amy.Bytes(file), GetContent(file).body);
    const auto middle = std::chrono::steady_clock::now();
    EXPECT_GE(middle - began, std::chrono::milliseconds(300));
    EXPECT_EQ(201, Upload("b", std::string(200000, 'b')).status);
    EXPECT_GE(std::chrono::steady_clock::now() - middle, std::chrono::milliseconds(300));
}

TEST_P(Faults, CutsAnAnswerBehindTheDeclaredBytes) {
    const std::string file = amy.AddPattern("0", "a", 300000);
    box.AddFault(Fault::On("GET", "/d/").CutAnswer(200001));
    box.AddFault(Fault::On("GET", "/d/").CutAnswer(0));
    const Got cut = GetContent(file);
    EXPECT_NE(CURLE_OK, cut.code);
    EXPECT_EQ(amy.Bytes(file).substr(0, 200001), cut.body);
    const Got none = GetContent(file);
    EXPECT_NE(CURLE_OK, none.code);
    EXPECT_EQ(200, none.status);
    EXPECT_EQ("", none.body);
}

TEST_P(Faults, CutsAnUploadAndKeepsNothingOfIt) {
    box.AddFault(Fault::On("POST", "/api/2.0/files/content").CutUpload(100000));
    EXPECT_NE(CURLE_OK, Upload("a", std::string(5000000, 'a')).code);
    EXPECT_THAT(amy.List("0"), IsEmpty());
    ASSERT_TRUE(box.Journal().WaitFor([](auto& all) { return all[0].finished; }));
    const auto entries = box.Journal().Find("POST", "/api/");
    EXPECT_EQ(100000u, entries[0].body_size);
    EXPECT_EQ(0, entries[0].status);
}

TEST_P(Faults, ClosesWithoutAnAnswerBeforeOrBehindTheRequestOrItsEffect) {
    const std::string url = box.ApiHost() + "/2.0/folders";
    const std::string body = R"({"name":"a","parent":{"id":"0"}})";
    for (const Break when : {Break::kBeforeBody, Break::kAfterBody}) {
        box.AddFault(Fault::On("POST", "/2.0/folders").Close(when));
        EXPECT_NE(CURLE_OK, client.Send("POST", url, body).code);
        EXPECT_FALSE(amy.Exists("/a"));
    }
    box.AddFault(Fault::On("POST", "/2.0/folders").LoseAnswer());
    EXPECT_NE(CURLE_OK, client.Send("POST", url, body).code);
    EXPECT_TRUE(amy.Exists("/a"));
}

TEST_P(Faults, ResetsInsteadOfClosing) {
    box.AddFault(Fault::On("GET", kMe).Close(Break::kAfterBody).Reset());
    EXPECT_EQ(CURLE_RECV_ERROR, Get(kMe).code);
}

TEST_P(Faults, SendsHeaderLinesThatNoLibraryWould) {
    box.AddFault(Fault::On("GET", kMe)
                     .HeaderLine("X-Empty:")
                     .HeaderLine(": nameless")
                     .HeaderLine("X-Binary: \x01\xff")
                     .HeaderLine("X-Long: " + std::string(65536, 'l')));
    const Got got = Get(kMe);
    EXPECT_EQ(CURLE_OK, got.code);
    EXPECT_THAT(got.head, HasSubstr("\r\nX-Empty:\r\n: nameless\r\nX-Binary: \x01\xff"));
    EXPECT_EQ("amy@example.com", got.Json()["login"].asString());
    box.AddFault(Fault::On("GET", kMe).HeaderLine("no colon"));
    EXPECT_EQ(CURLE_WEIRD_SERVER_REPLY, Get(kMe).code);
}

TEST_P(Faults, SendsRawAnswers) {
    box.AddFault(
        Fault::On("GET", kMe)
            .Raw("HTTP/1.1 100 Continue\r\n\r\nHTTP/1.1 299 Odd\r\nContent-Length: 2\r\n\r\nok"));
    const Got got = Get(kMe);
    EXPECT_EQ(299, got.status);
    EXPECT_EQ("ok", got.body);
    EXPECT_EQ(200, Get(kMe).status);
}

TEST_P(Faults, GivesAnotherBodyThanTheServices) {
    box.AddFault(Fault::On("GET", kMe).Body("{\"login\":"));
    const Got got = Get(kMe);
    EXPECT_EQ(200, got.status);
    EXPECT_EQ("{\"login\":", got.body);
}

TEST_P(Faults, MistakesRanges) {
    const std::string file = amy.AddFile("0", "a", "0123456789");
    client.headers = {"Range: bytes=4-7"};
    box.AddFault(Fault::On("GET", "/d/").Range(RangeFault::kIgnore));
    box.AddFault(Fault::On("GET", "/d/").Range(RangeFault::kWrongStart));
    box.AddFault(Fault::On("GET", "/d/").Range(RangeFault::kShort));
    const Got whole = GetContent(file);
    EXPECT_EQ(200, whole.status);
    EXPECT_EQ("0123456789", whole.body);
    EXPECT_THAT(whole.head, testing::Not(HasSubstr("Content-Range")));
    const Got wrong = GetContent(file);
    EXPECT_EQ("234567", wrong.body);
    EXPECT_THAT(wrong.head, HasSubstr("Content-Range: bytes 2-7/10\r"));
    const Got cut = GetContent(file);
    EXPECT_EQ(CURLE_PARTIAL_FILE, cut.code);
    EXPECT_EQ("45", cut.body);
}

TEST_P(Faults, ARangeFaultIsNotUsedByARequestWithoutRange) {
    const std::string file = amy.AddFile("0", "a", "0123456789");
    box.AddFault(Fault::On("GET", "/d/").Range(RangeFault::kIgnore));
    EXPECT_EQ("0123456789", GetContent(file).body);
    EXPECT_THAT(box.UnusedFaults(), ElementsAre(HasSubstr("range=ignore: 0 of 1")));
    box.ClearFaults();
}

TEST_P(Faults, ExpiresTheTokenThatComes) {
    box.AddFault(Fault::On("GET", kMe).After(1).ExpireToken());
    EXPECT_EQ(200, Get(kMe).status);
    EXPECT_EQ(401, Get(kMe).status);
    EXPECT_EQ(401, Get(kMe).status);
    client.UseToken(amy.IssueTokens().access_token);
    EXPECT_EQ(200, Get(kMe).status);
}

TEST_P(Faults, ClosesAKeptConnectionWithoutAnnouncingIt) {
    box.AddFault(Fault::On("GET", kMe).CloseAfterAnswer());
    const Got first = Get(kMe);
    EXPECT_EQ(200, first.status);
    EXPECT_THAT(first.head, testing::Not(HasSubstr("close")));
    EXPECT_EQ(200, Get(kMe).status);
    EXPECT_EQ(2u, box.Journal().Connections());
    EXPECT_EQ(2u, box.Journal().Count("GET", kMe));
    EXPECT_EQ(200, Get(kMe).status);
    EXPECT_EQ(2u, box.Journal().Connections());
}

TEST_P(Faults, FaultsDeclaredTogetherHappenTogether) {
    const std::string file = amy.AddFile("0", "a", "0123456789");
    box.AddFault(Fault::On("GET", "/d/").Delay(0.1).Status(203).CutAnswer(4));
    const Got got = GetContent(file);
    EXPECT_EQ(203, got.status);
    EXPECT_EQ("0123", got.body);
}

TEST_P(Faults, TheJournalHoldsRequestsAsTheyCame) {
    client.headers = {"X-First: 1", "x-second: two words", "X-First: 3"};
    client.Send("POST", box.ApiHost() + "/2.0/folders?fields=a%2Cb&x=%20", "{\"name\":1}");
    const auto entries = box.Journal().All();
    ASSERT_THAT(entries, SizeIs(1));
    EXPECT_EQ("/2.0/folders?fields=a%2Cb&x=%20", entries[0].target);
    EXPECT_EQ("/2.0/folders", entries[0].Path());
    EXPECT_EQ("a,b", entries[0].Query("fields"));
    EXPECT_EQ("{\"name\":1}", entries[0].body);
    EXPECT_EQ(10u, entries[0].body_size);
    EXPECT_EQ("amy@example.com", entries[0].account);
    EXPECT_EQ(400, entries[0].status);
    cloudsim::Headers tail(entries[0].headers.end() - 5, entries[0].headers.end());
    EXPECT_THAT(tail, testing::IsSupersetOf(cloudsim::Headers{
                          {"X-First", "1"}, {"x-second", "two words"}, {"X-First", "3"}}));
    EXPECT_EQ("two words", entries[0].Header("X-Second"));
}

TEST_P(Faults, ServesManyClientsAtOnce) {
    const std::string file = amy.AddPattern("0", "a", 2000000);
    const std::string wanted = amy.Bytes(file), token = amy.LastTokens().access_token;
    std::vector<std::thread> threads;
    std::atomic<int> good{0};
    for (int i = 0; i < 6; i++) {
        threads.emplace_back([&, i] {
            cloudsim::Client other(token);
            other.ca = client.ca;
            other.follow = true;
            const std::string url = box.ApiHost() + "/2.0/files/" + file + "/content";
            const std::string name = "upload" + std::to_string(i);
            good += other.Get(url).body == wanted ? 1 : 0;
            const Got up =
                other.Upload(box.UploadHost() + "/api/2.0/files/content",
                             {{"attributes", R"({"name":")" + name + R"(","parent":{"id":"0"}})"},
                              {"@file", wanted}});
            good += up.status == 201 ? 1 : 0;
            good += other.Get(box.ApiHost() + "/2.0/folders/0/items").status == 200 ? 1 : 0;
        });
    }
    while (good < 18 && box.Journal().All().size() < 24) {
        std::this_thread::yield();
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(18, good);
    EXPECT_THAT(amy.List("0"), SizeIs(7));
}

TEST(FaultText, ReadsWhatItWrites) {
    for (const char* text :
         {"GET /2.0/users/me after=1 times=2 answer=503 body=not\\x20yet header=Retry-After:1",
          "* *content host=upload times=forever delay=0.5 rate=1000 upload-rate=7 pause=1:2.5 "
          "cut=4 "
          "cut-upload=5 short-upload=6 close=effect range=short reset close-after-answer "
          "expire-token",
          "GET / raw=HTTP/1.1\\x20200\\x0d\\x0a line=no\\x20colon status=207"}) {
        const std::string first = cloudsim::ParseFault(text).Text();
        EXPECT_EQ(first, cloudsim::ParseFault(first).Text());
    }
    EXPECT_EQ("GET / answer=503 body=a\\x20b",
              cloudsim::ParseFault("GET / answer=503 body=a\\sb").Text());
    EXPECT_EQ("a b\r\n\xff", cloudsim::ParseFault("GET / body=a\\sb\\r\\n\\xff").body);
}

TEST(FaultText, RefusesWhatItCannotRead) {
    for (const char* text : {"", "GET", "GET / what", "GET / times=x", "GET / delay=x",
                             "GET / close=now", "GET / body=\\q", "GET / cut=-1"}) {
        EXPECT_THROW(cloudsim::ParseFault(text), std::invalid_argument) << text;
    }
}

}  // namespace
