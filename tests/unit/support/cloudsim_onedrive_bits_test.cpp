/**
 * The simulated OneDrive's uploads by BITS. Two documents describe them, that of the protocol
 * [MC-BUP] and the service's own, and they differ; what follows from the one alone is tested by
 * StrictBitsTest.
 */
#include "support/cloudsim_onedrive.h"

namespace {

using cloudsim::Got;
using cloudsim::HeaderOf;
using testing::IsEmpty;
using testing::MatchesRegex;
using testing::SizeIs;

constexpr const char* kProtocol = "{7df0354d-249b-430f-820d-3d2a9bef4931}";
constexpr const char* kInvalid = "0x80070057";
constexpr const char* kNoSession = "0x8020001F";

struct BitsTest : cloudsim::OneDriveFixture {
    using Headers = std::vector<std::string>;
    static cloudsim::OneDriveOptions Small() {
        cloudsim::OneDriveOptions options;
        options.fragment_limit = 1000;
        return options;
    }
    explicit BitsTest(const cloudsim::OneDriveOptions& options = Small())
        : OneDriveFixture(options) {}

    std::string path = "/a.bin";

    std::string Url() {
        return drive.StorageHost(amy) + "/users/0x" + amy.Id() + "/LiveFolders" + path +
               "?pretty=false";
    }
    Got Packet(const std::string& type, const Headers& more, const std::string& body = "") {
        client.headers = more;
        client.headers.push_back("BITS-Packet-Type: " + type);
        return client.Send("BITS_POST", Url(), body);
    }
    Got Create(const std::string& protocol = kProtocol) {
        return Packet("Create-Session",
                      {"BITS-Supported-Protocols: " + protocol, "Content-Length: 0"});
    }
    std::string Begin() { return HeaderOf(Create(), "BITS-Session-Id"); }
    Got Fragment(const std::string& session, const std::string& range, const std::string& bytes) {
        return Packet("Fragment", {"BITS-Session-Id: " + session, "Content-Range: bytes " + range},
                      bytes);
    }
    Got Close(const std::string& session) {
        return Packet("Close-Session", {"BITS-Session-Id: " + session, "Content-Length: 0"});
    }
    Got Cancel(const std::string& session) {
        return Packet("Cancel-Session", {"BITS-Session-Id: " + session, "Content-Length: 0"});
    }
};

std::string Next(const Got& got) {
    return HeaderOf(got, "BITS-Received-Content-Range");
}

std::string Error(const Got& got) {
    return HeaderOf(got, "BITS-Error");
}

TEST_F(BitsTest, CarriesAFileInFragmentsAndShowsItWhenTheSessionIsClosed) {
    const Got created = Create();
    EXPECT_EQ(201, created.status);
    EXPECT_EQ("Ack", HeaderOf(created, "BITS-Packet-Type"));
    EXPECT_EQ(kProtocol, HeaderOf(created, "BITS-Protocol"));
    const std::string session = HeaderOf(created, "BITS-Session-Id");
    EXPECT_THAT(session, MatchesRegex("\\{[0-9A-F]{8}(-[0-9A-F]{4}){3}-[0-9A-F]{12}\\}"));
    const Got first = Fragment(session, "0-3/10", "0123");
    EXPECT_EQ(200, first.status);
    EXPECT_EQ("4", Next(first));
    EXPECT_EQ(session, HeaderOf(first, "BITS-Session-Id"));
    EXPECT_EQ("10", Next(Fragment(session, "4-9/10", "456789")));
    EXPECT_FALSE(amy.Exists("/a.bin"));
    const Got closed = Close(session);
    EXPECT_EQ(200, closed.status);
    const std::string id = amy.Find("/a.bin");
    EXPECT_EQ("0123456789", amy.Bytes(id));
    EXPECT_EQ(id.substr(id.rfind('.') + 1), HeaderOf(closed, "X-Resource-Id"));
    EXPECT_EQ(0u, drive.UploadSessions());
}

TEST_F(BitsTest, AClosedSessionIsGone) {
    const std::string session = Begin();
    Fragment(session, "0-3/4", "0123");
    EXPECT_EQ(200, Close(session).status);
    const Got again = Close(session);
    EXPECT_EQ(500, again.status);
    EXPECT_EQ(kNoSession, Error(again));
    EXPECT_EQ("0x5", HeaderOf(again, "BITS-Error-Context"));
}

TEST_F(BitsTest, ReplacesAFileWithoutRegardToTheCaseOfItsPath) {
    const std::string id = amy.AddPath("/Docs/A.bin", "old");
    path = "/docs/a.BIN";
    const std::string session = Begin();
    Fragment(session, "0-2/3", "new");
    EXPECT_EQ("old", amy.Bytes(id));
    path = "/DOCS/a.bin";
    EXPECT_EQ(200, Close(session).status);
    EXPECT_EQ("new", amy.Bytes(id));
    EXPECT_THAT(amy.List(amy.Find("/docs")), SizeIs(1));
}

TEST_F(BitsTest, DecodesThePath) {
    amy.AddFolder(amy.Root(), "a b");
    path = "/a%20b/%C3%A4%23.bin";
    const std::string session = Begin();
    Fragment(session, "0-0/1", "x");
    Close(session);
    EXPECT_EQ("x", amy.Bytes(amy.Find("/a b/\xc3\xa4#.bin")));
}

TEST_F(BitsTest, PlacesThatAreNoneAreRefusedAtOnce) {
    amy.AddFolder(amy.Root(), "docs");
    path = "/none/a.bin";
    EXPECT_EQ(404, Create().status);
    path = "/docs";
    EXPECT_EQ(400, Create().status);
    EXPECT_EQ(kInvalid, Error(Create()));
    path = "/a%3f";
    EXPECT_EQ(400, Create().status);
    EXPECT_EQ(0u, drive.UploadSessions());
}

TEST_F(BitsTest, SpeaksOneProtocolAlone) {
    EXPECT_EQ(201,
              Create("{00000000-0000-0000-0000-000000000000} " + std::string(kProtocol)).status);
    const Got other = Create("{00000000-0000-0000-0000-000000000000}");
    EXPECT_EQ(400, other.status);
    EXPECT_EQ(kInvalid, Error(other));
    EXPECT_EQ("", HeaderOf(other, "BITS-Session-Id"));
}

TEST_F(BitsTest, TakesTheProtocolWithoutBracesAndAPacketWithoutALength) {
    client.headers = {"BITS-Packet-Type: Create-Session",
                      "BITS-Supported-Protocols: 7df0354d-249b-430f-820d-3d2a9bef4931"};
    EXPECT_EQ(201, client.Send("BITS_POST", Url()).status);
}

TEST_F(BitsTest, TakesThePostThatCallsItselfBits) {
    client.headers = {"BITS-Packet-Type: CREATE-SESSION", "X-Http-Method-Override: BITS_POST",
                      "Content-Length: 0", "BITS-Supported-Protocols: " + std::string(kProtocol)};
    EXPECT_EQ(201, client.Send("POST", Url()).status);
    client.headers.erase(client.headers.begin() + 1);
    EXPECT_EQ(405, client.Send("POST", Url()).status);
    EXPECT_EQ(405, client.Send("PUT", Url(), "x").status);
}

TEST_F(BitsTest, AGapIsRefusedWithTheNextByteWanted) {
    const std::string session = Begin();
    Fragment(session, "0-3/10", "0123");
    const Got gap = Fragment(session, "5-9/10", "56789");
    EXPECT_EQ(416, gap.status);
    EXPECT_EQ("4", Next(gap));
    EXPECT_EQ("10", Next(Fragment(session, "4-9/10", "456789")));
    Close(session);
    EXPECT_EQ("0123456789", amy.Bytes(amy.Find("/a.bin")));
}

TEST_F(BitsTest, OfAnOverlapOnlyTheNewBytesAreWritten) {
    const std::string session = Begin();
    Fragment(session, "0-5/10", "012345");
    EXPECT_EQ("8", Next(Fragment(session, "2-7/10", "xxxx67")));
    EXPECT_EQ("8", Next(Fragment(session, "0-3/10", "xxxx")));
    EXPECT_EQ("10", Next(Fragment(session, "8-9/10", "89")));
    Close(session);
    EXPECT_EQ("0123456789", amy.Bytes(amy.Find("/a.bin")));
}

TEST_F(BitsTest, AFragmentWhoseAnswerWasLostCanBeSentAgain) {
    const std::string session = Begin();
    client.fresh = true;
    drive.AddFault(cloudsim::Fault::On("BITS_POST", "/users/").LoseAnswer());
    EXPECT_NE(CURLE_OK, Fragment(session, "0-3/8", "0123").code);
    EXPECT_EQ("4", Next(Fragment(session, "0-3/8", "0123")));
    EXPECT_EQ("8", Next(Fragment(session, "4-7/8", "4567")));
    Close(session);
    EXPECT_EQ("01234567", amy.Bytes(amy.Find("/a.bin")));
}

TEST_F(BitsTest, AnInterruptedFragmentLeavesNothing) {
    const std::string session = Begin();
    client.fresh = true;
    drive.AddFault(cloudsim::Fault::On("BITS_POST", "/users/").CutUpload(2));
    EXPECT_NE(CURLE_OK, Fragment(session, "0-3/4", "xxxx").code);
    EXPECT_EQ("4", Next(Fragment(session, "0-3/4", "0123")));
    Close(session);
    EXPECT_EQ("0123", amy.Bytes(amy.Find("/a.bin")));
}

TEST_F(BitsTest, AFragmentStoredShortIsAcknowledgedAsFarAsItIs) {
    const std::string session = Begin();
    drive.AddFault(cloudsim::Fault::On("BITS_POST", "/users/").ShortUpload(3));
    const Got got = Fragment(session, "0-7/8", "01234567");
    EXPECT_EQ(200, got.status);
    EXPECT_EQ("3", Next(got));
    EXPECT_EQ(416, Fragment(session, "4-7/8", "4567").status);
    EXPECT_EQ("8", Next(Fragment(session, "3-7/8", "34567")));
    Close(session);
    EXPECT_EQ("01234567", amy.Bytes(amy.Find("/a.bin")));
}

TEST_F(BitsTest, WrongRangesAreRefusedAndChangeNothing) {
    const std::string session = Begin();
    for (const char* range : {"", "0-3", "0-3/", "a-3/10", "0-b/10", "3-0/10", "0-3/3", "-3/10",
                              "0-99999999999999999999/10", "0-4/10", "0-2/10"}) {
        const Got got = Fragment(session, range, "0123");
        EXPECT_EQ(400, got.status) << range;
        EXPECT_EQ(kInvalid, Error(got)) << range;
    }
    Fragment(session, "0-3/10", "0123");
    EXPECT_EQ(400, Fragment(session, "4-7/9", "4567").status);
    EXPECT_EQ("8", Next(Fragment(session, "4-7/10", "4567")));
}

TEST_F(BitsTest, AFragmentInPiecesWithoutALengthHasToBeAsLongAsItsRange) {
    const std::string session = Begin();
    const auto send = [&](const std::string& range, const std::string& bytes) {
        return Packet("Fragment",
                      {"BITS-Session-Id: " + session, "Content-Range: bytes " + range,
                       "Transfer-Encoding: chunked"},
                      bytes);
    };
    EXPECT_EQ(400, send("0-3/4", "012").status);
    EXPECT_EQ(400, send("0-3/4", "01234").status);
    EXPECT_EQ("4", Next(send("0-3/4", "0123")));
}

TEST_F(BitsTest, AFragmentHasALimit) {
    const std::string session = Begin();
    EXPECT_EQ(200, Fragment(session, "0-999/3000", std::string(1000, 'x')).status);
    const Got got = Fragment(session, "1000-2000/3000", std::string(1001, 'x'));
    EXPECT_EQ(500, got.status);
    EXPECT_EQ("0x80200020", Error(got));
    EXPECT_EQ("2000", Next(Fragment(session, "1000-1999/3000", std::string(1000, 'x'))));
}

TEST_F(BitsTest, TheUsersSpaceIsCheckedWithTheFirstFragment) {
    amy.SetQuota(10);
    amy.AddFile(amy.Root(), "a.bin", "12345");
    EXPECT_EQ(200, Fragment(Begin(), "0-0/10", "x").status);
    const Got got = Fragment(Begin(), "0-0/11", "x");
    EXPECT_EQ(500, got.status);
    EXPECT_EQ("0x80070112", Error(got));
    amy.SetMaxUpload(5);
    EXPECT_EQ("0x80200020", Error(Fragment(Begin(), "0-0/6", "x")));
}

TEST_F(BitsTest, ASessionIsClosedByThePathThatItWasMadeFor) {
    const std::string session = Begin();
    EXPECT_EQ("10", Next(Fragment(session, "0-9/10", "0123456789")));
    path = "/other.bin";
    EXPECT_EQ(400, Close(session).status);
    EXPECT_FALSE(amy.Exists("/a.bin"));
    path = "/a.bin";
    EXPECT_EQ(200, Close(session).status);
}

TEST_F(BitsTest, AFolderThatWentAwayMeanwhileIsToldAtTheEnd) {
    const std::string docs = amy.AddFolder(amy.Root(), "docs");
    path = "/docs/a.bin";
    const std::string session = Begin();
    Fragment(session, "0-0/1", "x");
    amy.Remove(docs);
    EXPECT_EQ(404, Close(session).status);
}

TEST_F(BitsTest, ACancelledSessionLeavesNothing) {
    const std::string session = Begin();
    Fragment(session, "0-3/4", "0123");
    EXPECT_EQ(200, Cancel(session).status);
    EXPECT_EQ(kNoSession, Error(Close(session)));
    EXPECT_EQ(kNoSession, Error(Cancel(session)));
    EXPECT_THAT(amy.List(amy.Root()), IsEmpty());
}

TEST_F(BitsTest, SessionsCanBeForgottenByTheService) {
    const std::string session = Begin();
    EXPECT_EQ(1u, drive.UploadSessions());
    drive.DropUploadSessions();
    const Got got = Fragment(session, "0-3/4", "0123");
    EXPECT_EQ(500, got.status);
    EXPECT_EQ(kNoSession, Error(got));
}

TEST_F(BitsTest, AnswersAPingAndRefusesPacketsThatItDoesNotKnow) {
    EXPECT_EQ(200, Packet("Ping", {"Content-Length: 0"}).status);
    EXPECT_EQ(kInvalid, Error(Packet("Pong", {"Content-Length: 0"})));
    client.headers = {"Content-Length: 0"};
    EXPECT_EQ(kInvalid, Error(client.Send("BITS_POST", Url())));
}

TEST_F(BitsTest, SessionsAndPathsBelongToTheirUser) {
    const std::string session = Begin();
    cloudsim::Account& ben = drive.AddAccount("ben@example.com");
    const std::string amys = Url();
    client.UseToken(ben.IssueTokens().access_token);
    const Got other = Create();
    EXPECT_EQ(403, other.status);
    EXPECT_EQ("0x80070005", Error(other));
    client.headers = {"BITS-Packet-Type: Close-Session", "BITS-Session-Id: " + session,
                      "Content-Length: 0"};
    EXPECT_EQ(kNoSession, Error(client.Send("BITS_POST", drive.StorageHost(ben) + "/users/0x" +
                                                             ben.Id() + "/LiveFolders/a.bin")));
    client.UseToken("nonsense");
    EXPECT_EQ(401, Create().status);
    client.UseToken("");
    EXPECT_EQ(401, client.Send("BITS_POST", amys).status);
}

TEST_F(BitsTest, OtherPathsAreNotFound) {
    for (const std::string other : {"/", "/users", "/users/0x1/Mail/a", "/users/0x1/LiveFolders"}) {
        EXPECT_EQ(404, client.Send("BITS_POST", drive.StorageHost(amy) + other).status) << other;
    }
}

struct StrictBitsTest : BitsTest {
    static cloudsim::OneDriveOptions Strict() {
        cloudsim::OneDriveOptions options;
        options.strict_bits = true;
        return options;
    }
    StrictBitsTest() : BitsTest(Strict()) {}
};

TEST_F(StrictBitsTest, AFragmentBeginsAtTheNextByteWanted) {
    const std::string session = Begin();
    Fragment(session, "0-3/8", "0123");
    const Got overlap = Fragment(session, "2-7/8", "234567");
    EXPECT_EQ(416, overlap.status);
    EXPECT_EQ("4", Next(overlap));
}

TEST_F(StrictBitsTest, TheProtocolStandsInBracesAndEveryPacketHasALength) {
    EXPECT_EQ(kInvalid, Error(Create("7df0354d-249b-430f-820d-3d2a9bef4931")));
    client.headers = {"BITS-Packet-Type: Create-Session",
                      "BITS-Supported-Protocols: " + std::string(kProtocol)};
    EXPECT_EQ(kInvalid, Error(client.Send("BITS_POST", Url())));
    EXPECT_EQ(200, Create().status);
}

TEST(BitsSizeTest, TakesFragmentsOfUpToSixtyMebibytes) {
    cloudsim::OneDrive drive;
    cloudsim::Account& amy = drive.AddAccount("amy@example.com");
    cloudsim::Client client(amy.IssueTokens().access_token);
    const std::string url =
        drive.StorageHost(amy) + "/users/0x" + amy.Id() + "/LiveFolders/big.bin";
    client.headers = {"BITS-Packet-Type: Create-Session",
                      "BITS-Supported-Protocols: " + std::string(kProtocol)};
    const std::string session = HeaderOf(client.Send("BITS_POST", url), "BITS-Session-Id");
    const size_t size = size_t{60} << 20;
    client.headers = {
        "BITS-Packet-Type: Fragment", "BITS-Session-Id: " + session,
        "Content-Range: bytes 0-" + std::to_string(size - 1) + "/" + std::to_string(size)};
    EXPECT_EQ(std::to_string(size), Next(client.Send("BITS_POST", url, std::string(size, 'x'))));
    client.headers[0] = "BITS-Packet-Type: Close-Session";
    EXPECT_EQ(200, client.Send("BITS_POST", url).status);
    EXPECT_EQ(size, amy.Get(amy.Find("/big.bin")).size);
}

}  // namespace
