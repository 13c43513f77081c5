#include "unit/cloud/dropbox/dropbox_fixture.h"

namespace ZYROCloud {
namespace {

constexpr const char* kDownload = "POST content /2/files/download";
constexpr const char* kLook =
    "GET api /2/files/get_metadata//a.txt?include_deleted=false&list=false";

const std::string kThere = Answer(200, R"({"path":"/a.txt","is_dir":false})");

/** What the content side says of a path that it does not know. */
const std::string kNotYet = Refusal(R"({".tag":"path","path":{".tag":"not_found"}})");

std::string Part(const std::string& body, const std::string& range) {
    return wire::Answer(206, body, "Connection: close\r\nContent-Range: bytes " + range + "\r\n");
}

class DropboxDownload : public DropboxTest {
  protected:
    DropboxDownload() { meta_["server_path"] = "/a.txt"; }
    bool Download() { return drive->DownloadProcess(&bytes_.xfer, meta_); }

    Bytes bytes_{0};
    Json::Value meta_;
};

TEST_F(DropboxDownload, IsOneRequestByThePath) {
    Give({Answer(200, "hello")});
    meta_["url"] = "nobody reads this";
    EXPECT_TRUE(Download()) << seams::LogDump();
    EXPECT_EQ(bytes_.received, "hello");
    EXPECT_THAT(Requests(), ElementsAre(kDownload));
    const Arrived request = Last();
    EXPECT_EQ(request.Argument(), Object(R"({"path":"/a.txt"})"));
    EXPECT_EQ(request.Header("Authorization"), std::string("Bearer ") + kToken);
    EXPECT_FALSE(request.Has("Expect"));
    EXPECT_FALSE(request.Has("Range"));
    EXPECT_EQ(request.body, "");
}

TEST_F(DropboxDownload, WithoutAServerPathGoesByTheUrlAsASharePath) {
    Give({Part("01234", "7-11/100")});
    char buffer[6] = "";
    long long got = 0;
    EXPECT_TRUE(Cloud::DownloadFileToBuffer(drive.get(), std::string(kServerId) + "/b c.txt",
                                            buffer, 7, 4, &got, nullptr, nullptr, nullptr))
        << seams::LogDump();
    EXPECT_EQ(Last().Argument(), Object(R"({"path":"/b c.txt"})"));
    EXPECT_EQ(Last().Header("Range"), "bytes=7-11");
    EXPECT_EQ(std::string(buffer), "01234");
}

TEST_F(DropboxDownload, OfAPartAsksForOneByteMore) {
    struct {
        const char* from;
        const char* length;
        const char* range;
    } rows[] = {{"2", "4", "bytes=2-6"},
                {"\"2\"", "\"4\"", "bytes=2-6"},
                {"5368709120", "4294967296", "bytes=5368709120-9663676416"},
                {"2", "0", ""},
                {"2", "\"many\"", ""},
                {"-1", "4", "bytes=0-4"}};
    for (const auto& row : rows) {
        Give({Answer(206, "23456")});
        meta_["from_bytes"] = Object(std::string("[") + row.from + "]")[0];
        meta_["len"] = Object(std::string("[") + row.length + "]")[0];
        EXPECT_TRUE(Download());
        EXPECT_EQ(Last().Header("Range"), row.range);
    }
}

TEST_F(DropboxDownload, NamesTheFileInPrintableAsciiWithItsQuotesEscaped) {
    Give({Answer(200, "x")});
    const std::string path = "/\"\xc3\xa4\xf0\x9f\x98\x80\\'\n.txt";
    meta_["server_path"] = path;
    EXPECT_TRUE(Download());
    EXPECT_EQ(Last().Argument()["path"].asString(), "/\\" + path.substr(1));
    for (const char c : Last().Header("Dropbox-API-Arg")) {
        EXPECT_TRUE(c >= ' ' && c < '\x7f') << Last().head;
    }
}

TEST_F(DropboxDownload, LeavesLaterRefusalsWithoutTheirBody) {
    Give({Answer(200, "x"), kNotFound});
    EXPECT_TRUE(Download());
    Json::Value out;
    EXPECT_FALSE(drive->GetFileInfo("/a.txt", Json::Value(), out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_BAD_REQUEST);
    EXPECT_EQ(drive->GetError()["msg"], "");
    // Until the driver is set up anew.
    Give({kNotFound});
    EXPECT_TRUE(drive->Init());
    EXPECT_FALSE(drive->GetFileInfo("/a.txt", Json::Value(), out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
}

TEST_F(DropboxDownload, ThatTheServiceRefusesHasTheCodeOfTheStatusAndLeavesNoByte) {
    struct {
        std::string answer;
        __tag_vfs_err_ code;
    } rows[] = {{Answer(400, "Error in call"), VFS_ERR_TOKEN_REVOKED},
                {Answer(401), VFS_ERR_UNAUTHORIZED},
                {Answer(403), VFS_ERR_UNKNOWN},
                {Answer(404), VFS_ERR_UNKNOWN},
                {Refusal(R"({".tag":"unsupported_file"})"), VFS_ERR_BAD_REQUEST},
                {Answer(416), VFS_ERR_UNKNOWN},
                {Answer(507), VFS_ERR_QUOTA_EXCEEDED}};
    for (const auto& row : rows) {
        Give({row.answer});
        seams::Reset();
        EXPECT_FALSE(Download()) << row.answer;
        EXPECT_EQ(drive->GetErrorCode(), row.code) << row.answer;
        EXPECT_TRUE(seams::LoggedPart("Failed to process curl " + ContentHost() +
                                      "/2/files/download, err:{"))
            << seams::LogDump();
        EXPECT_THAT(Requests(), ElementsAre(kDownload));
    }
    EXPECT_EQ(bytes_.received, "");
    EXPECT_TRUE(bytes_.context.can_retry);
}

TEST_F(DropboxDownload, OfABusyServiceIsAskedForAgainAsAWhole) {
    Give({Answer(503), Answer(429), Answer(200, "hello")});
    meta_["len"] = 3;
    EXPECT_TRUE(Download()) << seams::LogDump();
    EXPECT_THAT(Requests(), ElementsAre(kDownload, kDownload, kDownload));
    for (const Arrived& request : All()) {
        EXPECT_EQ(request.Header("Range"), "bytes=0-3");
    }
    EXPECT_THAT(seams::Sleeps(), ElementsAre(5, 5, 5, 5));
    EXPECT_TRUE(seams::Logged("Retry Download: 1/6")) << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Retry Download: 2/6"));
}

TEST_F(DropboxDownload, IsTriedSixTimesInAll) {
    Give(std::vector<std::string>(7, Answer(500)));
    EXPECT_FALSE(Download());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_SERVER_ERROR);
    EXPECT_THAT(Requests(), SizeIs(6));
    EXPECT_TRUE(seams::Logged("Retry Download: 6/6")) << seams::LogDump();
    EXPECT_TRUE(
        seams::LoggedPart("Failed to process curl " + ContentHost() + "/2/files/download, err:{"));
}

TEST_F(DropboxDownload, ThatHasBegunIsNotRepeated) {
    Serve({{wire::ReadRequest(), wire::Send("HTTP/1.1 200 OK\r\nContent-Length: 9\r\n\r\nhel"),
            wire::Stall()},
           {wire::ReadRequest(), wire::Send(Answer(200, "hello"))}});
    bytes_.impatient = drive->GetAPIHandler()->GetCurlHandler();
    EXPECT_FALSE(Download());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_TIMEOUT) << seams::LogDump();
    EXPECT_EQ(bytes_.received, "hel");
    EXPECT_EQ(server->Connections(), 1U);
}

TEST_F(DropboxDownload, ThatTheUserCancelsIsNotRepeated) {
    Give({Answer(200, "hello"), Answer(200, "hello")});
    bytes_.cancel_at = 0;
    EXPECT_FALSE(Download());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CANCELLED);
    EXPECT_EQ(server->Connections(), 1U);
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
    // The record keeps it, and so the next one does not begin.
    EXPECT_FALSE(Download());
    EXPECT_EQ(server->Connections(), 1U);
}

TEST_F(DropboxDownload, WithoutAPlaceForTheBytesOrOddMetadataFails) {
    XferData nowhere{&Bytes::Write, 0, nullptr};
    EXPECT_FALSE(drive->DownloadProcess(nullptr, meta_));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_FALSE(drive->DownloadProcess(&nowhere, meta_));
    for (const char* meta : {R"({"server_path":{}})", R"({"url":[]})", "[1]", "\"x\""}) {
        drive->SetError(VFS_ERR_NONE, "");
        const Json::Value value = Object(std::string("[") + meta + "]")[0];
        EXPECT_FALSE(drive->DownloadProcess(&bytes_.xfer, value)) << meta;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << meta;
    }
    EXPECT_EQ(server->Connections(), 0U);
}

TEST_F(DropboxDownload, GoesOnWhereItBrokeOff) {
    const std::string first(2000000, 'x');
    Serve({{wire::ReadRequest(),
            wire::Send("HTTP/1.1 200 OK\r\nContent-Length: 3000000\r\n\r\n" + first),
            wire::Drip("x", 1, 200), wire::Drip("x", 1, 200), wire::Reset()},
           {wire::ReadRequest(),
            wire::Send(Part(std::string(999998, 'y'), "2000002-2999999/3000000"))}});
    EXPECT_TRUE(Cloud::DownloadFile(drive.get(), std::string(kServerId) + "/a.txt",
                                    bytes_.file.Get(), 3000000, nullptr, nullptr, nullptr))
        << seams::LogDump();
    EXPECT_EQ(Last().Header("Range"), "bytes=2000002-3000000");
    EXPECT_EQ(lseek(bytes_.file.Get(), 0, SEEK_CUR), 3000000);
}

// --- a file that was just created, which the content side does not have yet
// -----------------------

TEST_F(DropboxDownload, OfAFileThatWasJustCreatedWaitsThirteenSecondsPerTryUpToSixTries) {
    std::vector<std::string> answers;
    std::vector<std::string> requests;
    std::vector<unsigned> sleeps;
    for (int i = 0; i < 6; ++i) {
        answers.insert(answers.end(), {kNotYet, kThere});
        requests.insert(requests.end(), {kDownload, kLook});
        sleeps.insert(sleeps.end(), {3, 10});
    }
    Give(answers);
    EXPECT_FALSE(Download());
    EXPECT_EQ(Requests(), requests);
    EXPECT_EQ(seams::Sleeps(), sleeps);
    // The looks went well; the record is about the download all the same.
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
    for (const char* line : {"Retry Download: 1/6", "Retry Download: 6/6"}) {
        EXPECT_TRUE(seams::Logged(line)) << seams::LogDump();
    }
    EXPECT_TRUE(
        seams::LoggedPart("Failed to process curl " + ContentHost() + "/2/files/download, err:{"));
    EXPECT_EQ(bytes_.received, "");
}

TEST_F(DropboxDownload, GetsTheFileOnceTheContentSideHasIt) {
    Give({kNotYet, kThere, Answer(200, "hello")});
    EXPECT_TRUE(Download()) << seams::LogDump();
    EXPECT_EQ(bytes_.received, "hello");
    EXPECT_THAT(seams::Sleeps(), ElementsAre(3, 10));
}

TEST_F(DropboxDownload, OfWhatIsTrulyGoneEndsBehindOneLook) {
    for (const std::string& look : {kNotFound, Answer(200, R"({"is_deleted":true})")}) {
        Give({kNotYet, look});
        seams::Reset();
        drive->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(Download());
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
        EXPECT_THAT(Requests(), ElementsAre(kDownload, kLook));
        EXPECT_THAT(seams::Sleeps(), ElementsAre(3));
    }
    EXPECT_TRUE(seams::Logged("This file(/a.txt) is the trash")) << seams::LogDump();
}

TEST_F(DropboxDownload, ThatIsRefusedWhileTheServiceIsAwayTellsThatAndNotThatTheFileIsGone) {
    Give({kNotYet, Answer(401)});
    EXPECT_FALSE(Download());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_UNAUTHORIZED);
}

TEST_F(DropboxDownload, ThatIsRefusedForAnotherReasonIsNotWaitedFor) {
    const std::string reason = R"({".tag":"path","path":{".tag":"restricted_content"}})";
    Give({Refusal(reason)});
    EXPECT_FALSE(Download());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_BAD_REQUEST);
    EXPECT_THAT(Requests(), ElementsAre(kDownload));
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
    EXPECT_THAT(drive->GetError()["msg"].asString(), HasSubstr("restricted_content"));
}

}  // namespace
}  // namespace ZYROCloud
