// Uploads of one request, and what decides between that and a session.
#include "unit/cloud/dropbox/dropbox_fixture.h"

namespace ZYROCloud {
namespace {

constexpr const char* kUpload = "POST content /2/files/upload";
constexpr const char* kStart = "POST content /2/files/upload_session/start";
constexpr const char* kAppend = "POST content /2/files/upload_session/append_v2";
constexpr const char* kFinish = "POST content /2/files/upload_session/finish";
constexpr size_t kPiece = 33554432;

class DropboxUpload : public DropboxTest {
  protected:
    static Json::Value Meta(const std::string& path, size_t size) {
        Json::Value meta;
        meta["server_path"] = path;
        meta["total_bytes"] = static_cast<Json::UInt64>(size);
        return meta;
    }
    bool Upload(Bytes& bytes, size_t size, const std::string& path = "/a.txt") {
        return drive->UploadProcess(&bytes.xfer, Meta(path, size));
    }
    bool Upload(const std::string& content, const std::string& path = "/a.txt") {
        Bytes bytes(1, content);
        return Upload(bytes, content.size(), path);
    }
    /** Through the engine, which knows how long the source is said to be. */
    bool UploadFile(const std::string& content, long long size) {
        Bytes bytes(1, content);
        return Cloud::UploadFile(drive.get(), std::string(kServerId) + "/a.txt", bytes.file.Get(),
                                 size, nullptr, nullptr, nullptr);
    }
};

TEST_F(DropboxUpload, OfASmallFileIsOneRequest) {
    for (const size_t size : {0, 1, 22, 23, 24, 65537}) {
        Give({Answer(200)});
        const std::string content(size, 'x');
        EXPECT_TRUE(Upload(content)) << size << seams::LogDump();
        EXPECT_THAT(Requests(), ElementsAre(kUpload));
        EXPECT_EQ(Last().body.size(), size);
    }
    const Arrived request = Last();
    EXPECT_EQ(request.Header("Authorization"), std::string("Bearer ") + kToken);
    EXPECT_EQ(request.Header("Content-Type"), "application/octet-stream");
    EXPECT_FALSE(request.Has("Expect"));
}

TEST_F(DropboxUpload, TakesNoOtherFilesPlace) {
    // A direct upload over an existing name makes a file under a changed name.
    Give({Answer(200, R"({"name":"a (1).txt"})")});
    EXPECT_TRUE(Upload("x"));
    EXPECT_EQ(Last().Argument(), Object(R"({"path":"/a.txt","mode":"add","autorename":true})"));
}

TEST_F(DropboxUpload, NamesTheFileInPrintableAsciiWithItsQuotesEscaped) {
    Give({Answer(200)});
    const std::string path = "/\"\xc3\xa4\xf0\x9f\x98\x80\xe2\x80\xae\\'\n\x7f.txt";
    EXPECT_TRUE(Upload("x", path));
    EXPECT_EQ(Last().Argument()["path"].asString(), "/\\" + path.substr(1));
    for (const char c : Last().Header("Dropbox-API-Arg")) {
        EXPECT_TRUE(c >= ' ' && c < '\x7f') << Last().head;
    }
}

TEST_F(DropboxUpload, OfThirtyTwoMiBGoesDirectAndOneByteMoreBySession) {
    std::string content(kPiece, 'a');
    Give({Answer(200)});
    EXPECT_TRUE(Upload(content)) << seams::LogDump();
    EXPECT_THAT(Requests(), ElementsAre(kUpload));
    EXPECT_TRUE(Last().body == content);

    content += 'b';
    Give({Answer(200, R"({"session_id":"s"})"), Answer(200), Answer(200), Answer(200)});
    EXPECT_TRUE(Upload(content, "/\"b\".txt")) << seams::LogDump();
    EXPECT_THAT(Requests(), ElementsAre(kStart, kAppend, kAppend, kFinish));
    const std::vector<Arrived> all = All();
    EXPECT_EQ(all[0].Argument(), Object("{}"));
    EXPECT_TRUE(all[0].body.empty());
    EXPECT_EQ(all[1].Argument(), Object(R"({"cursor":{"session_id":"s","offset":0}})"));
    EXPECT_TRUE(all[1].body == content.substr(0, kPiece));
    EXPECT_EQ(all[2].Argument(), Object(R"({"cursor":{"session_id":"s","offset":33554432}})"));
    EXPECT_EQ(all[2].body, "b");
    // The name stands as it is here, and what happens to a name that is taken is the service's.
    EXPECT_EQ(all[3].Argument(), Object(R"({"cursor":{"session_id":"s","offset":33554433},
                         "commit":{"path":"/\"b\".txt"}})"));
    EXPECT_TRUE(all[3].body.empty());
    for (const Arrived& request : all) {
        EXPECT_EQ(request.Header("Content-Type"), "application/octet-stream");
        EXPECT_EQ(request.Header("Authorization"), std::string("Bearer ") + kToken);
    }
}

TEST_F(DropboxUpload, WithoutASizeOrWithAnOddOneIsOneRequest) {
    for (const char* size : {"null", "\"many\"", "[]", "1e300"}) {
        Give({Answer(200)});
        Bytes bytes(1, "hello");
        Json::Value meta = Meta("/a.txt", 0);
        meta["total_bytes"] = Object(std::string("[") + size + "]")[0];
        EXPECT_TRUE(drive->UploadProcess(&bytes.xfer, meta)) << size << seams::LogDump();
        EXPECT_EQ(Last().body, "hello") << size;
    }
}

TEST_F(DropboxUpload, WithoutAPathOrASourceIsNotFound) {
    Bytes bytes(1, "x");
    XferData no_context{&Bytes::Read, 1, nullptr};
    EXPECT_FALSE(drive->DirectUpload(&bytes.xfer, Json::Value()));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
    for (XferData* xfer : {static_cast<XferData*>(nullptr), &no_context}) {
        drive->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(drive->DirectUpload(xfer, Meta("/a.txt", 1)));
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
    }
    EXPECT_FALSE(drive->UploadProcess(&bytes.xfer, Object(R"({"server_path":{}})")));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_FALSE(drive->UploadProcess(&bytes.xfer, Json::Value("text")));
    EXPECT_EQ(server->Connections(), 0U);
}

TEST_F(DropboxUpload, OfAFileIsRepeatedFromItsStart) {
    Give({Answer(503), Answer(429), Answer(200)});
    EXPECT_TRUE(Upload("hello")) << seams::LogDump();
    for (const Arrived& request : All()) {
        EXPECT_EQ(request.body, "hello");
    }
    // The handler waits behind each failure, and so does the loop.
    EXPECT_THAT(seams::Sleeps(), ElementsAre(5, 5, 5, 5));
    EXPECT_TRUE(seams::Logged("Retry directly upload: 0/6")) << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Retry directly upload: 1/6"));
    EXPECT_TRUE(seams::LoggedPart("dropbox_transfer.cpp:"));
}

TEST_F(DropboxUpload, IsTriedSixTimesInAll) {
    Give(std::vector<std::string>(7, Answer(503)));
    EXPECT_FALSE(Upload("hello"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_RATE_LIMITED);
    EXPECT_THAT(Requests(), SizeIs(6));
    EXPECT_THAT(seams::Sleeps(), SizeIs(12));
    EXPECT_TRUE(seams::LoggedPart("Retry times reach max times, /a.txt, err: {"))
        << seams::LogDump();
}

TEST_F(DropboxUpload, IsRepeatedFromWhereTheFileStood) {
    Give({Answer(503), Answer(200)});
    Bytes bytes(1, "not hello");
    lseek(bytes.file.Get(), 4, SEEK_SET);
    EXPECT_TRUE(Upload(bytes, 5)) << seams::LogDump();
    EXPECT_EQ(All().back().body, "hello");
}

TEST_F(DropboxUpload, OfAStreamIsNotRepeated) {
    Give({Answer(503), Answer(200)});
    Bytes bytes(1, "hello");
    bytes.context.fd = -1;
    EXPECT_FALSE(Upload(bytes, 5));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_RATE_LIMITED);
    EXPECT_THAT(Requests(), SizeIs(1));
    EXPECT_TRUE(seams::Logged("Directly upload failed and do not retry")) << seams::LogDump();
}

TEST_F(DropboxUpload, OfASourceThatCannotSeekEndsWithALine) {
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    const UniqueFd in(ends[0]);
    const UniqueFd out(ends[1]);
    Give({Answer(503), Answer(200)});
    Bytes bytes(1, "hello");
    bytes.context.fd = in.Get();
    EXPECT_FALSE(Upload(bytes, 5));
    EXPECT_THAT(Requests(), SizeIs(1));
    EXPECT_TRUE(seams::Logged("Failed to seek file to back to zero position, Illegal seek"))
        << seams::LogDump();
    EXPECT_THAT(seams::LogLines().back().text, testing::StartsWith("dropbox_transfer.cpp:"));
}

TEST_F(DropboxUpload, ThatTheServiceRefusesHasItsCode) {
    struct {
        std::string answer;
        __tag_vfs_err_ code;
    } rows[] = {
        {Answer(400, "Error in call"), VFS_ERR_TOKEN_REVOKED},
        {Answer(401), VFS_ERR_UNAUTHORIZED},
        {Answer(404), VFS_ERR_UNKNOWN},
        {Refusal(R"({".tag":"path","reason":{".tag":"insufficient_space"}})"), VFS_ERR_NO_SPACE},
        {Refusal(R"({".tag":"path","reason":{".tag":"conflict"}})"), VFS_ERR_CONFLICT},
        {Refusal(R"({".tag":"path","reason":{".tag":"malformed_path"}})"), VFS_ERR_BAD_REQUEST},
        {Answer(409, "{{"), VFS_ERR_BAD_REQUEST},
        {Answer(507), VFS_ERR_QUOTA_EXCEEDED}};
    for (const auto& row : rows) {
        Give({row.answer});
        seams::Reset();
        EXPECT_FALSE(Upload("hello")) << row.answer;
        EXPECT_EQ(drive->GetErrorCode(), row.code) << row.answer;
        EXPECT_THAT(Requests(), SizeIs(1));
        EXPECT_TRUE(seams::Logged("Directly upload failed and do not retry")) << seams::LogDump();
    }
}

TEST_F(DropboxUpload, ThatTheUserCancelsIsNotRepeated) {
    Serve({{wire::ReadHead(), wire::ReadAll()}, {wire::ReadRequest(), wire::Send(Answer(200))}});
    Bytes bytes(1, std::string(3000000, 'x'));
    bytes.cancel_at = 2;
    EXPECT_FALSE(Upload(bytes, 3000000));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CANCELLED);
    // It may be over before the server has seen the connection.
    EXPECT_LE(server->Connections(), 1U);
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
}

TEST_F(DropboxUpload, OfACancelledDriverIsNotSent) {
    drive->SetError(VFS_ERR_CANCELLED, "");
    EXPECT_FALSE(Upload("hello"));
    EXPECT_EQ(server->Connections(), 0U);
    Give({Answer(200, R"({"session_id":"s"})")});
    Bytes bytes(1, "");
    EXPECT_FALSE(Upload(bytes, kPiece + 1));
    EXPECT_THAT(Requests(), ElementsAre(kStart));
}

TEST_F(DropboxUpload, WhoseAnswerIsLostIsSentAgain) {
    Serve({{wire::ReadRequest()}, {wire::ReadRequest(), wire::Send(Answer(200))}});
    EXPECT_TRUE(Upload("hello")) << seams::LogDump();
    EXPECT_THAT(Requests(), ElementsAre(kUpload, kUpload));
    EXPECT_EQ(Last().body, "hello");
    EXPECT_THAT(seams::Sleeps(), ElementsAre(3, 3));
}

TEST_F(DropboxUpload, OfASourceThatIsShorterThanAnnouncedFails) {
    Serve({{wire::ReadHead(), wire::ReadAll()}});
    EXPECT_FALSE(UploadFile("hello", 6));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
    EXPECT_TRUE(seams::LoggedPart("The file ended 1 bytes before its size")) << seams::LogDump();
}

TEST_F(DropboxUpload, OfASourceThatHasGrownEndsWhereItWasAnnounced) {
    Give({Answer(200)});
    EXPECT_TRUE(UploadFile("hello, world", 5)) << seams::LogDump();
    EXPECT_EQ(Last().body, "hello");
}

}  // namespace
}  // namespace ZYROCloud
