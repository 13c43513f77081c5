/** Uploads in pieces to the simulated Google Drive. */
#include <algorithm>
#include <future>
#include <thread>

#include "support/cloudsim_gdrive.h"

namespace {

using cloudsim::Fault;
using cloudsim::GDriveTest;
using cloudsim::Got;
using cloudsim::Reason;
using testing::HasSubstr;
using testing::IsEmpty;

constexpr uint64_t kUnit = 256 * 1024;
constexpr const char* kUpload = "/upload/drive/v2/files";

std::string Pattern(size_t size) {
    return cloudsim::MakePattern(size, 5)->Bytes();
}

struct GDriveResumeTest : GDriveTest {
    std::string session, token = amy.IssueTokens(1000000).access_token;

    /** Opens a session for a file of this size; without one when negative. */
    Got Open(int64_t size, const std::string& metadata = R"({"title":"a.bin"})",
             const std::string& id = "", const std::string& more = "") {
        client.headers = {"Content-Type: application/json; charset=UTF-8"};
        if (size >= 0) {
            client.headers.push_back("X-Upload-Content-Length: " + std::to_string(size));
            client.headers.emplace_back("X-Upload-Content-Type: image/jpeg");
        }
        const Got got =
            Send(id.empty() ? "POST" : "PUT",
                 kUpload + (id.empty() ? "" : "/" + id) + "?uploadType=resumable" + more, metadata);
        session = HeaderOf(got, "Location");
        return got;
    }
    static std::string HeaderOf(const Got& got, const std::string& name) {
        const size_t at = got.head.find("\r\n" + name + ": ");
        if (at == std::string::npos) {
            return "";
        }
        const size_t start = at + name.size() + 4;
        return got.head.substr(start, got.head.find('\r', start) - start);
    }
    /**
     * Without a range when that is empty. On a connection of its own: libcurl sends a request again
     * by itself when a kept connection breaks.
     */
    Got Put(const std::string& range, const std::string& bytes = "") {
        cloudsim::Client own(token);
        own.headers = {"Expect:"};
        if (!range.empty()) {
            own.headers.push_back("Content-Range: " + range);
        }
        return own.Send("PUT", session, &bytes);
    }
    Got Piece(const std::string& all, uint64_t from, uint64_t size) {
        return Put("bytes " + std::to_string(from) + "-" + std::to_string(from + size - 1) + "/" +
                       std::to_string(all.size()),
                   all.substr(from, size));
    }
    /** What a status request tells; -1 for no range. */
    int64_t Arrived() {
        const Got got = Put("bytes */*");
        EXPECT_EQ(308, got.status) << got.body;
        const std::string range = HeaderOf(got, "Range");
        return range.empty() ? -1 : std::stoll(range.substr(8)) + 1;
    }
};

TEST_F(GDriveResumeTest, TakesAFileInOneRequest) {
    const std::string bytes = Pattern(300000);
    const Got open = Open(300000);
    EXPECT_EQ(200, open.status);
    EXPECT_THAT(open.body, IsEmpty());
    EXPECT_THAT(session, HasSubstr("uploadType=resumable&upload_id="));
    const Got got = Put("", bytes);
    EXPECT_EQ(201, got.status) << got.body;
    EXPECT_EQ("300000", got.Json()["fileSize"].asString());
    EXPECT_EQ("image/jpeg", got.Json()["mimeType"].asString());
    EXPECT_EQ(bytes, amy.Bytes(amy.Find("/a.bin")));
}

TEST_F(GDriveResumeTest, TakesAFileInPiecesAndTellsWhatArrived) {
    const std::string bytes = Pattern(2 * kUnit + 5);
    Open(static_cast<int64_t>(bytes.size()));
    EXPECT_EQ(-1, Arrived());
    const Got first = Piece(bytes, 0, kUnit);
    EXPECT_EQ(308, first.status);
    EXPECT_EQ("bytes=0-262143", HeaderOf(first, "Range"));
    EXPECT_EQ(308, Piece(bytes, kUnit, kUnit).status);
    EXPECT_EQ(static_cast<int64_t>(2 * kUnit), Arrived());
    EXPECT_EQ(1u, drive.UploadSessions());
    EXPECT_EQ(201, Piece(bytes, 2 * kUnit, 5).status);
    EXPECT_EQ(bytes, amy.Bytes(amy.Find("/a.bin")));
    EXPECT_EQ(0u, drive.UploadSessions());
}

TEST_F(GDriveResumeTest, AnswersTheSameWhenAskedAgainAfterTheEnd) {
    Open(4);
    const Got done = Put("", "text");
    const Got again = Put("bytes */4");
    EXPECT_EQ(done.status, again.status);
    EXPECT_EQ(done.body, again.body);
    EXPECT_EQ(1u, amy.List(root).size());
}

TEST_F(GDriveResumeTest, AFileOfNoBytesIsCompleteWhenItsTotalIsTold) {
    Open(0);
    EXPECT_EQ(-1, Arrived());
    EXPECT_EQ(201, Put("bytes */0").status);
    EXPECT_EQ("", amy.Bytes(amy.Find("/a.bin")));
    Open(0, R"({"title":"b.bin"})");
    EXPECT_EQ(201, Put("").status);
    EXPECT_TRUE(amy.Exists("/b.bin"));
}

TEST_F(GDriveResumeTest, ASizeThatIsUnknownAtFirstComesWithTheLastPiece) {
    const std::string bytes = Pattern(kUnit + 7);
    Open(-1);
    EXPECT_EQ(308, Put("bytes 0-262143/*", bytes.substr(0, kUnit)).status);
    EXPECT_EQ(201, Put("bytes 262144-262150/262151", bytes.substr(kUnit)).status);
    EXPECT_EQ(bytes, amy.Bytes(amy.Find("/a.bin")));
    Open(-1, R"({"title":"b.bin"})");
    EXPECT_EQ(308, Put("bytes 0-262143/*", bytes.substr(0, kUnit)).status);
    EXPECT_EQ(201, Put("bytes */262144").status);
    EXPECT_EQ(kUnit, amy.Get(amy.Find("/b.bin")).size);
}

TEST_F(GDriveResumeTest, GivesAnExistingFileANewContent) {
    const std::string file = amy.AddFile(root, "old.bin", "old");
    Open(3, R"({"modifiedDate":"2012-01-02T03:04:05.678Z"})", file, "&setModifiedDate=true");
    const Got got = Put("", "new");
    EXPECT_EQ(200, got.status) << got.body;
    EXPECT_EQ(file, got.Json()["id"].asString());
    EXPECT_EQ("2012-01-02T03:04:05.678Z", got.Json()["modifiedDate"].asString());
    EXPECT_EQ("new", amy.Bytes(file));
}

TEST_F(GDriveResumeTest, PiecesButTheLastHaveAQuarterMebibyteAtLeast) {
    const std::string bytes = Pattern(4 * kUnit);
    Open(static_cast<int64_t>(bytes.size()));
    const Got small = Piece(bytes, 0, kUnit - 1);
    EXPECT_EQ(400, small.status);
    EXPECT_THAT(small.body, HasSubstr("262144"));
    EXPECT_EQ(-1, Arrived());
}

TEST_F(GDriveResumeTest, OfAnOddPieceWholeUnitsAreKept) {
    const std::string bytes = Pattern(3 * kUnit);
    Open(static_cast<int64_t>(bytes.size()));
    const Got odd = Piece(bytes, 0, kUnit + 1000);
    EXPECT_EQ(308, odd.status);
    EXPECT_EQ("bytes=0-262143", HeaderOf(odd, "Range"));
    EXPECT_EQ(201, Piece(bytes, kUnit, 2 * kUnit).status);
    EXPECT_EQ(bytes, amy.Bytes(amy.Find("/a.bin")));
}

TEST_F(GDriveResumeTest, WhatCameTwiceIsTakenOnce) {
    const std::string bytes = Pattern(3 * kUnit);
    Open(static_cast<int64_t>(bytes.size()));
    EXPECT_EQ(308, Piece(bytes, 0, 2 * kUnit).status);
    EXPECT_EQ(308, Piece(bytes, 0, kUnit).status);
    EXPECT_EQ(static_cast<int64_t>(2 * kUnit), Arrived());
    EXPECT_EQ(201, Piece(bytes, kUnit, 2 * kUnit).status);
    EXPECT_EQ(bytes, amy.Bytes(amy.Find("/a.bin")));
}

TEST_F(GDriveResumeTest, APieceBehindAGapIsRefused) {
    const std::string bytes = Pattern(3 * kUnit);
    Open(static_cast<int64_t>(bytes.size()));
    EXPECT_EQ(503, Piece(bytes, kUnit, kUnit).status);
    EXPECT_EQ(-1, Arrived());
}

TEST_F(GDriveResumeTest, RefusesRangesThatAreNone) {
    Open(10);
    for (const char* range :
         {"bytes", "bytes 0-9", "bytes 0-/10", "bytes -9/10", "bytes 9-0/10", "bytes 0-10/10",
          "bytes 0-9/ten", "bytes a-9/10", "0-9/10", "bytes */", "bytes 0-9/11", "bytes */11",
          "bytes 0-99999999999999999999/10"}) {
        EXPECT_EQ(400, Put(range, "0123456789").status) << range;
    }
    EXPECT_EQ(400, Put("bytes 0-9/10", "01234").status);
    EXPECT_EQ(400, Put("bytes 0-4/10", "0123456789").status);
    EXPECT_EQ(400, Put("bytes */*", "0123456789").status);
    EXPECT_EQ(-1, Arrived());
    EXPECT_EQ(201, Put("bytes 0-9/10", "0123456789").status);
}

TEST_F(GDriveResumeTest, OfABrokenPieceWholeUnitsAreKept) {
    const std::string bytes = Pattern(4 * kUnit);
    Open(static_cast<int64_t>(bytes.size()));
    drive.AddFault(Fault::On("PUT", kUpload).CutUpload(2 * kUnit + 5000));
    EXPECT_NE(CURLE_OK, Piece(bytes, 0, bytes.size()).code);
    EXPECT_EQ(static_cast<int64_t>(2 * kUnit), Arrived());
    EXPECT_EQ(201, Piece(bytes, 2 * kUnit, 2 * kUnit).status);
    EXPECT_EQ(bytes, amy.Bytes(amy.Find("/a.bin")));
}

TEST_F(GDriveResumeTest, ALostAnswerLeavesWhatWasTaken) {
    const std::string bytes = Pattern(2 * kUnit);
    Open(static_cast<int64_t>(bytes.size()));
    drive.AddFault(Fault::On("PUT", kUpload).LoseAnswer());
    EXPECT_EQ(0, Piece(bytes, 0, kUnit).status);
    EXPECT_EQ(static_cast<int64_t>(kUnit), Arrived());
    drive.AddFault(Fault::On("PUT", kUpload).Status(503));
    EXPECT_EQ(503, Piece(bytes, kUnit, kUnit).status);
    EXPECT_EQ(201, Put("bytes */*").status);
    EXPECT_EQ(1u, amy.List(root).size());
}

TEST_F(GDriveResumeTest, ARefusedPieceLeavesNothing) {
    const std::string bytes = Pattern(2 * kUnit);
    Open(static_cast<int64_t>(bytes.size()));
    drive.AddFault(Fault::On("PUT", kUpload).Answer(500));
    EXPECT_EQ(500, Piece(bytes, 0, kUnit).status);
    EXPECT_EQ(-1, Arrived());
}

TEST_F(GDriveResumeTest, OfAPieceStoredShortWholeUnitsAreKept) {
    const std::string bytes = Pattern(3 * kUnit);
    Open(static_cast<int64_t>(bytes.size()));
    drive.AddFault(Fault::On("PUT", kUpload).ShortUpload(kUnit + 10));
    const Got got = Piece(bytes, 0, 2 * kUnit);
    EXPECT_EQ(308, got.status);
    EXPECT_EQ("bytes=0-262143", HeaderOf(got, "Range"));
    drive.AddFault(Fault::On("PUT", kUpload).ShortUpload(0));
    EXPECT_EQ("bytes=0-262143", HeaderOf(Piece(bytes, kUnit, kUnit), "Range"));
    drive.AddFault(Fault::On("PUT", kUpload).ShortUpload(2 * kUnit - 1));
    const Got last = Piece(bytes, kUnit, 2 * kUnit);
    EXPECT_EQ(308, last.status);
    EXPECT_EQ("bytes=0-524287", HeaderOf(last, "Range"));
    EXPECT_EQ(201, Piece(bytes, 2 * kUnit, kUnit).status);
    EXPECT_EQ(bytes, amy.Bytes(amy.Find("/a.bin")));
}

TEST_F(GDriveResumeTest, ABodyWithoutALengthIsTheWhole) {
    Open(-1);
    client.headers = {"Transfer-Encoding: chunked", "Expect:"};
    const Got got = client.Send("PUT", session, "text");
    EXPECT_EQ(201, got.status) << got.body;
    EXPECT_EQ("text", amy.Bytes(amy.Find("/a.bin")));
}

/** A body of which nothing more goes out until it is told to. */
struct HeldBody {
    const std::string bytes;
    std::promise<void> go;
    size_t sent = 0;

    static size_t Read(char* to, size_t, size_t size, void* self) {
        auto& body = *static_cast<HeldBody*>(self);
        if (body.sent >= kUnit && body.sent < body.bytes.size()) {
            body.go.get_future().wait();
        }
        const size_t end = body.sent < kUnit ? kUnit : body.bytes.size();
        const size_t part = body.bytes.copy(to, std::min(size, end - body.sent), body.sent);
        body.sent += part;
        return part;
    }
};

TEST_F(GDriveResumeTest, OfTwoRequestsAtOnceTheLaterOneCounts) {
    HeldBody body = {Pattern(kUnit + 1000), {}};
    Open(static_cast<int64_t>(body.bytes.size()));
    long status = 0;
    std::thread slow([&] {
        CURL* curl = curl_easy_init();
        curl_easy_setopt(curl, CURLOPT_URL, session.c_str());
        curl_easy_setopt(curl, CURLOPT_UPLOAD, 1L);
        curl_easy_setopt(curl, CURLOPT_UPLOAD_BUFFERSIZE, 2L * 1024 * 1024);
        curl_easy_setopt(curl, CURLOPT_INFILESIZE_LARGE,
                         static_cast<curl_off_t>(body.bytes.size()));
        curl_easy_setopt(curl, CURLOPT_READFUNCTION, HeldBody::Read);
        curl_easy_setopt(curl, CURLOPT_READDATA, &body);
        curl_easy_setopt(curl, CURLOPT_TIMEOUT, 20L);
        curl_easy_perform(curl);
        curl_easy_getinfo(curl, CURLINFO_RESPONSE_CODE, &status);
        curl_easy_cleanup(curl);
    });
    EXPECT_TRUE(drive.Journal().WaitFor([](const auto& entries) { return entries.size() == 2; }));
    const auto arrived = static_cast<uint64_t>(std::max<int64_t>(Arrived(), 0));
    body.go.set_value();
    slow.join();
    EXPECT_EQ(503, status);
    EXPECT_EQ(arrived, static_cast<uint64_t>(std::max<int64_t>(Arrived(), 0)));
    EXPECT_EQ(201, Piece(body.bytes, arrived, body.bytes.size() - arrived).status);
    EXPECT_EQ(body.bytes, amy.Bytes(amy.Find("/a.bin")));
}

TEST_F(GDriveResumeTest, ASessionEnds) {
    Open(10);
    drive.DropUploadSessions();
    const Got dropped = Put("bytes */*");
    EXPECT_EQ(404, dropped.status);
    EXPECT_EQ("notFound", Reason(dropped));
    Open(10);
    drive.AdvanceClock(7 * 24 * 3600);
    EXPECT_EQ(404, Put("", "0123456789").status);
    client.UseToken(token);
    Open(10);
    EXPECT_EQ(499, client.Send("DELETE", session).status);
    EXPECT_EQ(404, Put("bytes */*").status);
    EXPECT_THAT(amy.List(root), IsEmpty());
}

TEST_F(GDriveResumeTest, TheAddressIsEnoughButAWrongTokenIsRefused) {
    Open(4);
    token = "nonsense";
    EXPECT_EQ(401, Put("", "text").status);
    token = "";
    EXPECT_EQ(201, Put("", "text").status);
}

TEST_F(GDriveResumeTest, AFullDriveRefusesTheLastPiece) {
    Open(-1);
    amy.SetQuota(3);
    const Got got = Put("", "text");
    EXPECT_EQ(403, got.status);
    EXPECT_EQ("storageQuotaExceeded", Reason(got));
    EXPECT_EQ(404, Put("bytes */*").status);
}

TEST_F(GDriveResumeTest, AParentThatIsGoneAtTheEndIsNotFound) {
    const std::string folder = amy.AddFolder(root, "to");
    Open(4, R"({"title":"a","parents":[{"id":")" + folder + "\"}]}");
    amy.Remove(folder);
    EXPECT_EQ("notFound", Reason(Put("", "text")));
}

}  // namespace
