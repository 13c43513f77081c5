#include "unit/cloud/box/box_fixture.h"

namespace ZYROCloud {
namespace {

using testing::Not;

constexpr const char* kUploadPath = "/api/2.0/files/content";

class BoxUpload : public BoxTest {
  protected:
    /** What GetMetaDataByURI and the engine tell of an upload of `size` bytes to this path. */
    Json::Value Meta(const std::string& path, size_t size) {
        Json::Value meta;
        EXPECT_TRUE(box->GetMetaDataByURI(kServerId + path, meta, "Upload")) << seams::LogDump();
        meta["total_bytes"] = static_cast<Json::UInt64>(size);
        return meta;
    }
    bool Upload(Bytes& bytes, const std::string& path, size_t size) {
        const Json::Value meta = Meta(path, size);
        return box->UploadProcess(&bytes.xfer, meta);
    }
    bool Upload(const std::string& content, const std::string& path = "/a.txt") {
        Bytes bytes(1, content);
        return Upload(bytes, path, content.size());
    }
    std::string Stored(const std::string& path = "/a.txt") { return amy.Bytes(amy.Find(path)); }
};

TEST_F(BoxUpload, IsOneCheckAndOneRequestWhateverTheSize) {
    const size_t sizes[] = {0, 1, 4096, 33554433};
    for (const size_t size : sizes) {
        const std::string content(size, static_cast<char>('a' + size % 26));
        const std::string path = "/" + std::to_string(size);
        service.Journal().Clear();
        EXPECT_TRUE(Upload(content, path)) << seams::LogDump();
        EXPECT_TRUE(Stored(path) == content) << size;
        EXPECT_THAT(Requests(),
                    ElementsAre("OPTIONS /2.0/files/content", std::string("POST ") + kUploadPath));
    }
}

TEST_F(BoxUpload, TellsNameParentAndSizeInBothRequests) {
    EXPECT_TRUE(Upload("hello")) << seams::LogDump();
    const auto entries = service.Journal().All();
    ASSERT_EQ(entries.size(), 2U);
    const Json::Value wanted = Object(R"({"name":"a.txt","parent":{"id":"0"},"size":5})");
    EXPECT_EQ(Object(entries[0].body), wanted);
    EXPECT_THAT(entries[1].body, HasSubstr(json::toString(wanted)));
    EXPECT_THAT(entries[1].body, HasSubstr("name=\"attributes\""));
    EXPECT_THAT(entries[1].body, HasSubstr("name=\"file\"; filename=\"file\""));
    for (const auto& entry : entries) {
        EXPECT_FALSE(entry.HasHeader("Expect"));
        EXPECT_EQ(entry.Header("Authorization"), box->Bearer());
    }
}

TEST_F(BoxUpload, OfAnUnknownSizeTellsNoSizeThatMayBeWrongAndSendsAllThereIs) {
    for (const long long most : {900LL, -1LL}) {
        service.Journal().Clear();
        Bytes bytes(1, "hello");
        Json::Value meta = Meta("/a.txt", 0);
        meta["total_bytes"] = static_cast<Json::Int64>(most);
        meta["filesize"] = -1;
        EXPECT_TRUE(box->UploadProcess(&bytes.xfer, meta)) << seams::LogDump();
        EXPECT_EQ(Stored(), "hello") << most;
        const auto entries = service.Journal().All();
        // The check is for the space that there is: the most that may come has to fit.
        EXPECT_EQ(Object(entries.front().body)["size"],
                  most == -1 ? Json::Value() : Json::Value(900));
        EXPECT_THAT(entries.back().body, Not(HasSubstr("\"size\"")));
        EXPECT_EQ(entries.back().Header("Transfer-Encoding"), "chunked");
    }
}

TEST_F(BoxUpload, OfANameWithQuotesEscapesThem) {
    // The service itself takes no backslash in a name.
    service.AddFault(Fault::On("OPTIONS", "/2.0/files/content").Answer(200, "{}"));
    service.AddFault(Fault::On("POST", kUploadPath).Answer(201, "{}"));
    Bytes bytes(1, "x");
    Json::Value meta = Meta("/a.txt", 1);
    meta["name"] = "a\"b.txt";
    EXPECT_TRUE(box->UploadProcess(&bytes.xfer, meta)) << seams::LogDump();
    const auto entries = service.Journal().All();
    EXPECT_EQ(Object(entries.front().body)["name"], "a\\\"b.txt");
    EXPECT_THAT(entries.back().body, HasSubstr(R"("name":"a\\\"b.txt")"));
}

TEST_F(BoxUpload, OfAKnownFileReplacesItsContent) {
    const std::string id = amy.AddPath("/docs/a.txt", "old");
    Show("/docs");
    Show("/docs/a.txt");
    EXPECT_TRUE(Upload("new", "/docs/a.txt")) << seams::LogDump();
    EXPECT_EQ(amy.Bytes(id), "new");
    EXPECT_THAT(Requests(), ElementsAre("OPTIONS /2.0/files/" + id + "/content",
                                        "POST /api/2.0/files/" + id + "/content"));
}

TEST_F(BoxUpload, OverANameThatTheTreeDoesNotKnowYetReplacesTheFile) {
    const std::string old = amy.AddPath("/a.txt", "old");
    tree.Add("/a.txt");
    EXPECT_TRUE(Upload("new")) << seams::LogDump();
    EXPECT_EQ(Stored(), "new");
    EXPECT_THAT(Requests(), ElementsAre("OPTIONS /2.0/files/content", "DELETE /2.0/files/" + old,
                                        std::string("POST ") + kUploadPath));
    const auto writes = tree.Writes();
    ASSERT_EQ(writes.size(), 1U);
    EXPECT_EQ(writes[0].path + " " + writes[0].name, "/a.txt zyro::cacheclean");
}

TEST_F(BoxUpload, OverAFolderDeletesThatFolder) {
    amy.AddPath("/a.txt/inside", "lost");
    const std::string folder = amy.Find("/a.txt");
    EXPECT_TRUE(box->PreflightCheck("", "a.txt", "0", "", 3));
    EXPECT_FALSE(amy.Exists("/a.txt"));
    EXPECT_THAT(Requests(),
                ElementsAre("OPTIONS /2.0/files/content", "DELETE /2.0/folders/" + folder));
}

TEST_F(BoxUpload, IsRefusedForWhatTheServiceDoesNotTake) {
    amy.SetMaxUpload(3);
    EXPECT_FALSE(Upload("four"));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_FILE_TOO_LARGE);
    amy.SetMaxUpload(1000);
    amy.SetQuota(5);
    EXPECT_FALSE(Upload("sixsix"));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_QUOTA_EXCEEDED);
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl " + service.ApiHost() +
                                  "/2.0/files/content, err:"))
        << seams::LogDump();
    Bytes bytes(1, "x");
    Json::Value meta = Meta("/a.txt", 1);
    meta["name"] = "a/b";
    EXPECT_FALSE(box->UploadProcess(&bytes.xfer, meta));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_INVALID_NAME);
    meta = Meta("/a.txt", 1);
    meta["parent_id"] = "404404";
    EXPECT_FALSE(box->UploadProcess(&bytes.xfer, meta));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_EQ(service.Journal().Count("POST", kUploadPath), 0U);
}

TEST_F(BoxUpload, ThatTheServiceRefusesAtItsEndHasItsCode) {
    struct {
        int status;
        const char* body;
        __tag_vfs_err_ code;
    } rows[] = {
        {403, R"({"code":"storage_limit_exceeded"})", VFS_ERR_QUOTA_EXCEEDED},
        {403, R"({"code":"file_size_limit_exceeded"})", VFS_ERR_FILE_TOO_LARGE},
        {400, R"({"code":"item_name_invalid"})", VFS_ERR_INVALID_NAME},
        {404, "{}", VFS_ERR_NOT_FOUND},
        {409, R"({"context_info":{"conflicts":{"type":"file","id":"1"}}})", VFS_ERR_CONFLICT},
        {409, R"({"context_info":{"conflicts":{"type":"folder","id":"1"}}})", VFS_ERR_CONFLICT},
        {412, "", VFS_ERR_BAD_REQUEST}};
    for (const auto& row : rows) {
        seams::Reset();
        service.AddFault(Fault::On("POST", kUploadPath).Answer(row.status, row.body));
        EXPECT_FALSE(Upload("hello")) << row.body;
        EXPECT_EQ(box->GetErrorCode(), row.code) << row.body;
        EXPECT_TRUE(seams::LoggedPart("Failed to process  " + service.UploadHost() + kUploadPath +
                                      ", err: {"))
            << seams::LogDump();
    }
    EXPECT_FALSE(amy.Exists("/a.txt"));
    EXPECT_EQ(service.Journal().Count("DELETE", "/"), 0U);
}

TEST_F(BoxUpload, RefusedWithStatus401FailsAndTheNextCallWorks) {
    service.AddFault(Fault::On("POST", kUploadPath).ExpireToken());
    EXPECT_FALSE(Upload("hello"));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    EXPECT_THAT(Requests(), ElementsAre("OPTIONS /2.0/files/content",
                                        std::string("POST ") + kUploadPath, "POST /oauth2/token"));
    EXPECT_TRUE(Upload("hello")) << seams::LogDump();
    EXPECT_EQ(Stored(), "hello");
    EXPECT_EQ(service.Journal().Count("POST", "/oauth2/token"), 1U);
}

TEST_F(BoxUpload, OfAFileIsRepeatedFromItsStart) {
    service.AddFault(Fault::On("POST", kUploadPath).Answer(503));
    service.AddFault(Fault::On("POST", kUploadPath).After(1).Answer(429));
    EXPECT_TRUE(Upload("hello")) << seams::LogDump();
    EXPECT_EQ(Stored(), "hello");
    // The handler waits behind each failure, and so does the loop.
    EXPECT_THAT(seams::Sleeps(), ElementsAre(5, 5, 5, 5));
    EXPECT_TRUE(seams::Logged("Retry directly upload: 0/6")) << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Retry directly upload: 1/6"));
    EXPECT_TRUE(seams::LoggedPart("box_transfer.cpp:"));
}

TEST_F(BoxUpload, IsTriedSixTimesInAll) {
    service.AddFault(Fault::On("POST", kUploadPath).Times(6).Answer(503));
    EXPECT_FALSE(Upload("hello"));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_SERVER_ERROR);
    EXPECT_EQ(service.Journal().Count("POST", kUploadPath), 6U);
    EXPECT_THAT(seams::Sleeps(), testing::SizeIs(12));
    EXPECT_TRUE(seams::LoggedPart("Retry times reach max times, " + service.UploadHost() +
                                  kUploadPath + ", err: {"))
        << seams::LogDump();
}

TEST_F(BoxUpload, OfAStreamWithA503IsNotRetried) {
    service.AddFault(Fault::On("POST", kUploadPath).Answer(503));
    Bytes bytes(1, "hello");
    bytes.context.fd = -1;
    EXPECT_FALSE(Upload(bytes, "/a.txt", 5));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_SERVER_ERROR);
    EXPECT_EQ(service.Journal().Count("POST", kUploadPath), 1U);
    EXPECT_FALSE(seams::LoggedPart("Retry directly upload")) << seams::LogDump();
}

TEST_F(BoxUpload, OfWhatCannotSeekBackEndsWithALine) {
    service.AddFault(Fault::On("POST", kUploadPath).Answer(503));
    Bytes bytes(1, "hello");
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    const UniqueFd in(ends[0]);
    const UniqueFd out(ends[1]);
    bytes.context.fd = in.Get();
    EXPECT_FALSE(Upload(bytes, "/a.txt", 5));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_SERVER_ERROR);
    EXPECT_TRUE(seams::Logged("Failed to seek file to back to zero position, Illegal seek"))
        << seams::LogDump();
}

TEST_F(BoxUpload, CancelledInTheMiddleEndsThere) {
    Bytes bytes(1, std::string(1 << 20, 'x'));
    bytes.cancel_at = 2;
    EXPECT_FALSE(Upload(bytes, "/a.txt", 1 << 20));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CANCELLED);
    EXPECT_THAT(seams::Sleeps(), IsEmpty());
    EXPECT_FALSE(amy.Exists("/a.txt"));
}

TEST_F(BoxUpload, CancelledBeforeItsRequestIsNotSent) {
    Bytes bytes(1, "hello");
    const Json::Value meta = Meta("/a.txt", 5);
    box->SetError(VFS_ERR_CANCELLED, "");
    EXPECT_FALSE(box->DirectUpload(&bytes.xfer, meta));
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(BoxUpload, OnAKeptConnectionThatDiesInTheMiddleIsSentAgainOnANewOne) {
    service.AddFault(Fault::On("POST", kUploadPath).After(1).CutUpload(100000).Reset());
    const std::string content(8 << 20, 'y');
    EXPECT_TRUE(Upload("first", "/first"));
    EXPECT_TRUE(Upload(content, "/second")) << seams::LogDump();
    EXPECT_TRUE(Stored("/second") == content);
    // libcurl does it by itself: no attempt of the driver's is used up.
    EXPECT_EQ(service.Journal().Count("POST", kUploadPath), 3U);
    EXPECT_FALSE(seams::LoggedPart("Retry directly upload")) << seams::LogDump();
}

TEST_F(BoxUpload, WithAPieceOfItsDescriptionMissingFails) {
    Bytes bytes(1, "hello");
    const Json::Value whole = Meta("/a.txt", 5);
    for (const char* member : {"name", "parent_id", "total_bytes"}) {
        Json::Value meta = whole;
        meta.removeMember(member);
        EXPECT_FALSE(box->DirectUpload(&bytes.xfer, meta)) << member;
        EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << member;
    }
    Json::Value meta = whole;
    meta.removeMember("url");
    EXPECT_FALSE(box->DirectUpload(&bytes.xfer, meta));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_FALSE(box->DirectUpload(nullptr, whole));
    XferData nothing{nullptr, 1, nullptr};
    EXPECT_FALSE(box->DirectUpload(&nothing, whole));
    EXPECT_FALSE(box->UploadProcess(&bytes.xfer, Object("[1]")));
    EXPECT_FALSE(box->UploadProcess(&bytes.xfer, Object(R"({"name":{}})")));
    EXPECT_THAT(Requests(), IsEmpty());
}

class BoxPreflight : public BoxTest {};

TEST_F(BoxPreflight, OnANameHeldByAFolderDeletesThatFolder) {
    amy.AddFolder(root, "held");
    EXPECT_TRUE(box->PreflightCheck("", "held", "0", tree.Folder() + "/held", 1));
    EXPECT_FALSE(amy.Exists("/held"));
}

TEST_F(BoxPreflight, KeepsTheErrorOfADeleteThatFails) {
    const std::string old = amy.AddPath("/a.txt", "old");
    service.AddFault(Fault::On("DELETE", "/2.0/files/" + old).Answer(403, "{}"));
    EXPECT_FALSE(box->PreflightCheck("", "a.txt", "0", "", 1));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_FORBIDDEN);
}

TEST_F(BoxPreflight, DeletesNothingWithoutAnItemOfAKnownKind) {
    for (const char* body :
         {"{}", R"({"context_info":{}})", R"({"context_info":{"conflicts":{}}})",
          R"({"context_info":{"conflicts":{"type":"file"}}})",
          R"({"context_info":{"conflicts":{"type":"file","id":""}}})",
          R"({"context_info":{"conflicts":{"type":"web_link","id":"5"}}})", "null"}) {
        service.AddFault(Fault::On("OPTIONS", "/2.0/files/content").Answer(409, body));
        EXPECT_FALSE(box->PreflightCheck("", "a.txt", "0", "", 1)) << body;
        EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CONFLICT) << body;
    }
    for (const char* body :
         {"[]", R"({"context_info":[]})", R"({"context_info":{"conflicts":[{"id":"5"}]}})",
          R"({"context_info":{"conflicts":{"type":"file","id":{}}}})"}) {
        service.AddFault(Fault::On("OPTIONS", "/2.0/files/content").Answer(409, body));
        EXPECT_FALSE(box->PreflightCheck("", "a.txt", "0", "", 1)) << body;
        EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << body;
    }
    EXPECT_EQ(service.Journal().Count("DELETE", "/"), 0U);
}

TEST_F(BoxPreflight, AConflictThatIsNoJsonIsLogged) {
    service.AddFault(Fault::On("OPTIONS", "/2.0/files/content").Answer(409, "<html>"));
    EXPECT_FALSE(box->PreflightCheck("", "a.txt", "0", "", 1));
    EXPECT_TRUE(seams::Logged("Failed to decode to json format, <html>")) << seams::LogDump();
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CONFLICT);
}

}  // namespace
}  // namespace ZYROCloud
