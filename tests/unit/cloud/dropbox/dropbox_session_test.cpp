// Upload sessions, and what can go wrong at each of their steps.
#include "unit/cloud/dropbox/dropbox_fixture.h"

namespace ZYROCloud {
namespace {

constexpr const char* kStart = "POST content /2/files/upload_session/start";
constexpr const char* kAppend = "POST content /2/files/upload_session/append_v2";
constexpr const char* kFinish = "POST content /2/files/upload_session/finish";
constexpr size_t kPiece = 33554432;

const std::string kStarted = Answer(200, R"({"session_id":"s"})");
const std::string kTaken = Answer(200, "null");
const std::string kWrongOffset =
    Refusal(R"({".tag":"incorrect_offset","correct_offset":33554432})");

class DropboxSession : public DropboxTest {
  protected:
    DropboxSession() : content_(kPiece, 'a') { content_ += 'b'; }

    bool Upload(Bytes& bytes) {
        Json::Value meta;
        meta["server_path"] = "/a.txt";
        meta["total_bytes"] = static_cast<Json::UInt64>(kPiece + 1);
        return drive->UploadProcess(&bytes.xfer, meta);
    }
    bool Upload() {
        Bytes bytes(1, content_);
        return Upload(bytes);
    }
    /** A session for a few bytes, in one piece. */
    bool UploadLittle() {
        Bytes bytes(1, "hello");
        return drive->ChunkedUpload(&bytes.xfer,
                                    Object(R"({"server_path":"/a.txt","total_bytes":5})"));
    }
    /** The place that each piece claims. */
    std::vector<unsigned long long> Offsets() const {
        std::vector<unsigned long long> offsets;
        for (const Arrived& request : All()) {
            if (request.Line() == kAppend) {
                offsets.push_back(request.Argument()["cursor"]["offset"].asUInt64());
            }
        }
        return offsets;
    }

    std::string content_;
};

TEST_F(DropboxSession, RefusedAtAnyStepHasTheCodeOfTheStatus) {
    struct {
        std::string answer;
        __tag_vfs_err_ code;
    } rows[] = {
        {Answer(400, "Error in call"), VFS_ERR_TOKEN_REVOKED},
        {Answer(401), VFS_ERR_UNAUTHORIZED},
        {Answer(403), VFS_ERR_UNKNOWN},
        {Answer(404), VFS_ERR_UNKNOWN},
        {Answer(413), VFS_ERR_UNKNOWN},
        {Answer(416), VFS_ERR_UNKNOWN},
        {kWrongOffset, VFS_ERR_BAD_REQUEST},
        {Refusal(R"({".tag":"not_found"})"), VFS_ERR_NOT_FOUND},
        {Refusal(R"({".tag":"closed"})"), VFS_ERR_BAD_REQUEST},
        {Refusal(R"({".tag":"lookup_failed","lookup_failed":{".tag":"not_found"}})"),
         VFS_ERR_BAD_REQUEST},
        {Refusal(R"({".tag":"path","path":{".tag":"conflict"}})"), VFS_ERR_CONFLICT},
        {Refusal(R"({".tag":"path","path":{".tag":"insufficient_space"}})"), VFS_ERR_NO_SPACE},
        {Refusal(R"({".tag":"too_many_write_operations"})"), VFS_ERR_BAD_REQUEST},
        {Answer(409, ""), VFS_ERR_BAD_REQUEST},
        {Answer(507), VFS_ERR_QUOTA_EXCEEDED}};
    const std::vector<std::string> steps = {kStart, kAppend, kFinish};
    for (const auto& row : rows) {
        for (size_t step = 0; step < steps.size(); ++step) {
            SCOPED_TRACE(steps[step] + row.answer);
            std::vector<std::string> answers = {kStarted, kTaken};
            answers.resize(step);
            answers.push_back(row.answer);
            Give(answers);
            drive->SetError(VFS_ERR_NONE, "");
            EXPECT_FALSE(UploadLittle());
            EXPECT_EQ(drive->GetErrorCode(), row.code);
            EXPECT_EQ(Requests(),
                      std::vector<std::string>(steps.begin(), steps.begin() + step + 1));
            EXPECT_THAT(seams::Sleeps(), IsEmpty());
        }
    }
}

TEST_F(DropboxSession, OfAStreamOfUnknownSizeIsFinishedWhereTheStreamEnds) {
    const std::pair<size_t, std::vector<unsigned long long>> rows[] = {
        {5, {0}}, {kPiece, {0, kPiece}}, {kPiece + 1, {0, kPiece}}};
    for (const auto& [size, offsets] : rows) {
        Give({kStarted, kTaken, kTaken, kTaken});
        Bytes bytes(1, content_.substr(0, size));
        bytes.context.fd = -1;
        EXPECT_TRUE(drive->UploadProcess(
            &bytes.xfer,
            Object(R"({"server_path":"/a.txt","total_bytes":90000000,"filesize":-1})")))
            << size << seams::LogDump();
        EXPECT_EQ(Offsets(), offsets) << size;
        EXPECT_EQ(All().back().Line(), kFinish);
        EXPECT_EQ(All().back().Argument()["cursor"]["offset"].asUInt64(), size);
    }
}

TEST_F(DropboxSession, OfAStreamOfUnknownSizeThatFailsIsNeitherRepeatedNorFinished) {
    Give({kStarted, kTaken, Answer(503)});
    Bytes bytes(1, content_);
    bytes.context.fd = -1;
    EXPECT_FALSE(drive->UploadProcess(
        &bytes.xfer, Object(R"({"server_path":"/a.txt","total_bytes":-1,"filesize":-1})")));
    EXPECT_THAT(Requests(), ElementsAre(kStart, kAppend, kAppend));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_RATE_LIMITED);
}

TEST_F(DropboxSession, RefusedSaysAtWhichStep) {
    Give({Answer(400)});
    EXPECT_FALSE(UploadLittle());
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl " + ContentHost() +
                                  "/2/files/upload_session/start, err:{"))
        << seams::LogDump();
    Give({kStarted, Answer(400)});
    EXPECT_FALSE(UploadLittle());
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl " + ContentHost() +
                                  "/2/files/upload_session/append_v2, err:{"));
    EXPECT_TRUE(seams::Logged("Chunk upload failed and do not retry"));
    Give({kStarted, kTaken, Answer(400)});
    EXPECT_FALSE(UploadLittle());
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl for path /a.txt, err:{"));
}

TEST_F(DropboxSession, OfABusyServiceIsWaitedForAtEachStep) {
    Give({Answer(503), kStarted, Answer(500), kTaken, Answer(429), kTaken, Answer(503), kTaken});
    EXPECT_TRUE(Upload()) << seams::LogDump();
    EXPECT_THAT(Requests(),
                ElementsAre(kStart, kStart, kAppend, kAppend, kAppend, kAppend, kFinish, kFinish));
    EXPECT_THAT(Offsets(), ElementsAre(0, 0, kPiece, kPiece));
    EXPECT_TRUE(All()[3].body == content_.substr(0, kPiece));
    EXPECT_EQ(All()[5].body, "b");
    // A piece is waited for twice: by the handler and by the loop.
    EXPECT_THAT(seams::Sleeps(), ElementsAre(5, 5, 5, 5, 5, 5));
    EXPECT_TRUE(seams::Logged("Retry chunk upload: 0/6")) << seams::LogDump();
}

TEST_F(DropboxSession, OfAFileThatDoesNotStandAtItsStartRepeatsEachPieceFromItsPlaceBehindThat) {
    Give({kStarted, Answer(503), kTaken, Answer(503), kTaken, kTaken});
    Bytes bytes(1, "skipped" + content_);
    lseek(bytes.file.Get(), 7, SEEK_SET);
    EXPECT_TRUE(Upload(bytes)) << seams::LogDump();
    EXPECT_THAT(Offsets(), ElementsAre(0, 0, kPiece, kPiece));
    EXPECT_TRUE(All()[2].body == content_.substr(0, kPiece));
    EXPECT_EQ(All()[4].body, "b");
}

TEST_F(DropboxSession, APieceIsTriedSixTimesInAll) {
    std::vector<std::string> answers(8, Answer(503));
    answers[0] = kStarted;
    answers[1] = kTaken;
    Give(answers);
    EXPECT_FALSE(Upload());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_RATE_LIMITED);
    EXPECT_THAT(Offsets(), ElementsAre(0, kPiece, kPiece, kPiece, kPiece, kPiece, kPiece));
    EXPECT_TRUE(seams::Logged("Retry chunk upload: 5/6")) << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart("Retry times reach max times, /a.txt, err: {"));
}

TEST_F(DropboxSession, OfAStreamEndsWithTheFirstFailedPiece) {
    Give({kStarted, Answer(503), kTaken});
    Bytes bytes(1, content_);
    bytes.context.fd = -1;
    EXPECT_FALSE(Upload(bytes));
    EXPECT_THAT(Offsets(), ElementsAre(0));
    EXPECT_TRUE(seams::Logged("Chunk upload failed and do not retry")) << seams::LogDump();
}

TEST_F(DropboxSession, OfASourceThatCannotSeekEndsWithALine) {
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    const UniqueFd in(ends[0]);
    const UniqueFd out(ends[1]);
    Give({kStarted, Answer(503), kTaken});
    Bytes bytes(1, content_);
    bytes.context.fd = in.Get();
    EXPECT_FALSE(Upload(bytes));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_RATE_LIMITED);
    EXPECT_THAT(Offsets(), ElementsAre(0));
    EXPECT_TRUE(seams::Logged("Failed to seek file to back to last position, Illegal seek"))
        << seams::LogDump();
}

TEST_F(DropboxSession, AnAnswerLostAfterTheServiceTookThePieceEndsTheUpload) {
    // The piece goes out once more to its place, where the service already has it.
    Serve({{wire::ReadRequest(), wire::Send(kStarted)},
           {wire::ReadRequest()},
           {wire::ReadRequest(), wire::Send(kWrongOffset)}});
    EXPECT_FALSE(Upload());
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_BAD_REQUEST);
    EXPECT_THAT(Offsets(), ElementsAre(0, 0));
}

TEST_F(DropboxSession, APieceCutOffOnItsWayDoesNotCountAsTaken) {
    Serve({{wire::ReadRequest(), wire::Send(kStarted)},
           {wire::ReadHead(), wire::Send("HTTP/1.1 100 Continue\r\n\r\n"), wire::ReadBytes(100000),
            wire::Reset()},
           {wire::ReadRequest(), wire::Send(kTaken)},
           {wire::ReadRequest(), wire::Send(kTaken)},
           {wire::ReadRequest(), wire::Send(kTaken)}});
    // Whether it is worth another try is told by the side on which libcurl notices.
    if (Upload()) {
        EXPECT_THAT(Offsets(), ElementsAre(0, 0, kPiece));
    } else {
        EXPECT_THAT(Requests(), Not(testing::Contains(kFinish)));
    }
}

TEST_F(DropboxSession, ThatTheUserCancelsEndsAtOnce) {
    for (const int at : {0, 3}) {
        Serve({{wire::ReadRequest(), wire::Send(kStarted)},
               {wire::ReadHead(), wire::Send("HTTP/1.1 100 Continue\r\n\r\n"), wire::ReadAll()}});
        drive->SetError(VFS_ERR_NONE, "");
        YLIBCErrSetEx(0, "test", 1);
        Bytes bytes(1, content_);
        bytes.cancel_at = at;
        EXPECT_FALSE(Upload(bytes)) << at;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CANCELLED) << at << seams::LogDump();
        EXPECT_EQ(server->Connections(), 2U) << at;
        EXPECT_THAT(seams::Sleeps(), IsEmpty());
    }
}

TEST_F(DropboxSession, WithoutAnIdHasNotBegun) {
    struct {
        const char* body;
        std::string line;
    } rows[] = {{"{}", "No upload id in response, {}"},
                {"null", "No upload id in response, null"},
                {"<html>", "Failed to parse response to json format, <html>"},
                {"", "Failed to parse response to json format, "},
                {"[]", ""},
                {R"({"session_id":{}})", ""}};
    for (const auto& row : rows) {
        Give({Answer(200, row.body)});
        drive->SetError(VFS_ERR_NONE, "");
        std::string out = "old";
        EXPECT_FALSE(drive->StartChunkUploadSession(out)) << row.body;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << row.body;
        EXPECT_EQ(out, "old");
        EXPECT_TRUE(row.line.empty() || seams::Logged(row.line)) << seams::LogDump();
        EXPECT_THAT(Requests(), ElementsAre(kStart));
    }
    Give({Answer(200, R"({"session_id":4711})")});
    std::string out;
    EXPECT_TRUE(drive->StartChunkUploadSession(out));
    EXPECT_EQ(out, "4711");
}

TEST_F(DropboxSession, WithoutAPathOrASourceFailsWithoutACode) {
    Bytes bytes(1, "x");
    XferData no_context{&Bytes::Read, 1, nullptr};
    const Json::Value meta = Object(R"({"server_path":"/a","total_bytes":40000000})");
    EXPECT_FALSE(drive->ChunkedUpload(&bytes.xfer, Object(R"({"total_bytes":40000000})")));
    EXPECT_FALSE(drive->ChunkedUpload(nullptr, meta));
    EXPECT_FALSE(drive->ChunkedUpload(&no_context, meta));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NONE);
    unsigned long long offset = 5;
    EXPECT_FALSE(drive->StartChunkUpload(&no_context, "s", &offset, 1));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_FALSE(drive->StartChunkUpload(nullptr, "s", &offset, 1));
    EXPECT_FALSE(drive->StartChunkUpload(&bytes.xfer, "s", nullptr, 1));
    EXPECT_EQ(offset, 5U);
    EXPECT_EQ(server->Connections(), 0U);
}

TEST_F(DropboxSession, APieceStopsAtItsEnd) {
    Bytes bytes(1, "0123456789");
    bytes.context.limited = true;
    Give({kTaken, kTaken});
    unsigned long long offset = 5368709120;
    EXPECT_TRUE(drive->StartChunkUpload(&bytes.xfer, "s", &offset, 4)) << seams::LogDump();
    EXPECT_EQ(offset, 5368709124U);
    EXPECT_EQ(Last().body, "0123");
    EXPECT_TRUE(drive->StartChunkUpload(&bytes.xfer, "s", &offset, 3));
    EXPECT_EQ(Last().body, "456");
    EXPECT_EQ(Last().Argument(), Object(R"({"cursor":{"session_id":"s","offset":5368709124}})"));
}

/** A service that words wrong places as a status of its own. */
class DropboxRange : public DropboxSession {
  protected:
    void SetUp() override {
        DropboxSession::SetUp();
        drive->GetAPIHandler()->SetErrorHandler(new OneDriveErrorHandler);
    }
};

TEST_F(DropboxRange, ThatIsRefusedMovesTheOffsetOnAllTheSame) {
    Bytes bytes(1, "0123456789");
    bytes.context.limited = true;
    Give({Answer(416)});
    unsigned long long offset = 100;
    EXPECT_FALSE(drive->StartChunkUpload(&bytes.xfer, "s", &offset, 4));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_RANGE_FAILED);
    EXPECT_EQ(offset, 104U);
}

TEST_F(DropboxRange, ThatIsRefusedForAFileGoesOnBehindItAndTheSizesDoNotMatch) {
    Give({kStarted, Answer(416), kTaken, kTaken});
    EXPECT_FALSE(Upload());
    EXPECT_THAT(Requests(), ElementsAre(kStart, kAppend, kAppend, kAppend));
    EXPECT_THAT(Offsets(), ElementsAre(0, kPiece, kPiece + 1));
    EXPECT_EQ(All()[2].body, "b");
    EXPECT_TRUE(seams::Logged("upload size is not match")) << seams::LogDump();
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_RANGE_FAILED);
}

TEST_F(DropboxRange, ThatIsRefusedForAStreamEndsTheUpload) {
    Give({kStarted, Answer(416), kTaken});
    Bytes bytes(1, content_);
    bytes.context.fd = -1;
    EXPECT_FALSE(Upload(bytes));
    EXPECT_THAT(Offsets(), ElementsAre(0));
}

TEST_F(DropboxSession, OfASourceThatIsShorterThanAnnouncedIsNotCommitted) {
    Serve({{wire::ReadRequest(), wire::Send(kStarted)},
           {wire::ReadRequest(), wire::Send(kTaken)},
           {wire::ReadHead(), wire::Send("HTTP/1.1 100 Continue\r\n\r\n"), wire::ReadAll()}});
    Bytes bytes(1, content_);
    EXPECT_FALSE(Cloud::UploadFile(drive.get(), std::string(kServerId) + "/a.txt", bytes.file.Get(),
                                   static_cast<long long>(kPiece) + 10, nullptr, nullptr, nullptr));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
    EXPECT_THAT(Requests(), Not(testing::Contains(kFinish)));
}

TEST_F(DropboxSession, OfASourceThatHasGrownEndsWhereItWasAnnounced) {
    Give({kStarted, kTaken, kTaken, kTaken});
    Bytes bytes(1, content_ + "more");
    EXPECT_TRUE(Cloud::UploadFile(drive.get(), std::string(kServerId) + "/a.txt", bytes.file.Get(),
                                  static_cast<long long>(kPiece) + 1, nullptr, nullptr, nullptr))
        << seams::LogDump();
    EXPECT_EQ(All()[2].body, "b");
    EXPECT_EQ(Last().Argument()["cursor"]["offset"].asUInt64(), kPiece + 1);
}

}  // namespace
}  // namespace ZYROCloud
