#include "unit/cloud/onedrive/onedrive_fixture.h"

namespace ZYROCloud {
namespace {

class OneDriveWrite : public OneDriveTest {
  protected:
    void SetUp() override {
        OneDriveTest::SetUp();
        Show("/a.txt", "file.a");
        Show("/docs", "folder.d");
        Show("/old", "folder.o");
        Show("/old/b.txt", "file.b");
    }
    /** The body of a request, which must say of itself what it is. */
    Json::Value Sent(size_t number) const {
        const std::string body = BodyOf(Request(number));
        EXPECT_EQ(HeaderOf(Request(number), "Content-Type"), "application/json");
        EXPECT_EQ(HeaderOf(Request(number), "Content-Length"), std::to_string(body.size()));
        return Object(body);
    }
};

TEST_F(OneDriveWrite, AFolderIsMadeInItsParentOrTheRoot) {
    Give({Answer(201, "{}"), Answer(201, "{}"), Answer(201, "{}")});
    EXPECT_TRUE(drive->CreateFolder("folder.d", "a\"b\\'", Json::Value())) << seams::LogDump();
    EXPECT_TRUE(drive->CreateFolder("", "new", Object(R"({"x":1})")));
    EXPECT_TRUE(drive->CreateFolder("root", "new", Json::Value()));
    EXPECT_THAT(Requests(), ElementsAre("POST /v5.0/folder.d?pretty=false",
                                        "POST /v5.0/me/skydrive?pretty=false",
                                        "POST /v5.0/me/skydrive?pretty=false"));
    // Names go out as they are.
    EXPECT_EQ(Sent(0), Object(R"({"name":"a\"b\\'"})"));
    EXPECT_EQ(Sent(1), Object(R"({"name":"new"})"));
}

TEST_F(OneDriveWrite, AnItemIsDeletedAndRenamedById) {
    Give({Answer(204), Answer(200, "{}")});
    EXPECT_TRUE(drive->Delete("file.a")) << seams::LogDump();
    EXPECT_TRUE(drive->Rename("file.a", "b.txt"));
    EXPECT_THAT(Requests(),
                ElementsAre("DELETE /v5.0/file.a?pretty=false", "PUT /v5.0/file.a?pretty=false"));
    EXPECT_EQ(Sent(1), Object(R"({"name":"b.txt"})"));
}

TEST_F(OneDriveWrite, DeleteOfAnItemThatIsGoneReportsTheMappedError) {
    Give({Refusal(404, "resource_not_found")});
    EXPECT_FALSE(drive->Delete("file.a"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl " + Api("/file.a") + ", err:{"))
        << seams::LogDump();
}

TEST_F(OneDriveWrite, RefusalsHaveTheServicesCode) {
    struct {
        std::string answer;
        __tag_vfs_err_ code;
    } rows[] = {{Refusal(400, "resource_already_exists"), VFS_ERR_CONFLICT},
                {Refusal(400, "request_parameter_too_large"), VFS_ERR_NAME_TOO_LONG},
                {Refusal(400, "request_parameter_invalid"), VFS_ERR_INVALID_NAME},
                {Refusal(403, ""), VFS_ERR_FORBIDDEN},
                {Refusal(507, ""), VFS_ERR_QUOTA_EXCEEDED}};
    for (const auto& row : rows) {
        Give({row.answer, row.answer, row.answer, row.answer});
        EXPECT_FALSE(drive->CreateFolder("", "x", Json::Value()));
        EXPECT_EQ(drive->GetErrorCode(), row.code);
        EXPECT_FALSE(drive->Rename("file.a", "x"));
        EXPECT_EQ(drive->GetErrorCode(), row.code);
        EXPECT_FALSE(drive->Move("", "file.a", "folder.d"));
        EXPECT_EQ(drive->GetErrorCode(), row.code);
        EXPECT_FALSE(drive->DoCopy("/a.txt", "/docs/a.txt", false));
        EXPECT_EQ(drive->GetErrorCode(), row.code);
    }
}

TEST_F(OneDriveWrite, AMoveTellsTheNewParentAndKeepsTheName) {
    Give({Answer(201, "{}"), Answer(201, "{}")});
    EXPECT_TRUE(drive->Move("/old/b.txt", "/docs/another name")) << seams::LogDump();
    EXPECT_TRUE(drive->Move("not looked at", "file.b", "folder.d"));
    EXPECT_THAT(Requests(),
                ElementsAre("MOVE /v5.0/file.b?pretty=false", "MOVE /v5.0/file.b?pretty=false"));
    EXPECT_EQ(Sent(0), Object(R"({"destination":"folder.d"})"));
    EXPECT_EQ(Sent(1), Sent(0));
}

TEST_F(OneDriveWrite, AMoveIntoTheRootAsksForItsId) {
    Give({Answer(200, R"({"id":"folder.r"})"), Answer(201, "{}")});
    EXPECT_TRUE(drive->Move("/old/b.txt", "/b.txt")) << seams::LogDump();
    EXPECT_THAT(Requests(), ElementsAre("GET /v5.0/me/skydrive?pretty=false",
                                        "MOVE /v5.0/file.b?pretty=false"));
    EXPECT_EQ(Sent(1), Object(R"({"destination":"folder.r"})"));
}

TEST_F(OneDriveWrite, AMoveWithoutAnIdIsNotFound) {
    Give({});
    for (const auto& [from, to] : {std::pair("/gone", "/docs/x"), {"/old/b.txt", "/gone/x"}}) {
        drive->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(drive->Move(from, to));
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND) << from;
    }
    for (const auto& [id, to] : {std::pair("", "folder.d"), {"file.a", ""}}) {
        drive->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(drive->Move("folder.o", id, to));
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
    }
    drive->SetError(VFS_ERR_NONE, "");
    EXPECT_FALSE(drive->Move("/old/b.txt", "no slash"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_TRUE(seams::Logged("Failed to find / from [no slash]")) << seams::LogDump();
    EXPECT_THAT(Requests(), IsEmpty());
}

class OneDriveCopy : public OneDriveWrite {
  protected:
    const std::string conflict = Refusal(400, "resource_already_exists");
    const std::string docs = Listing(R"({"id":"folder.d","name":"docs","type":"folder"})");
    const std::string rival = Listing(R"({"id":"file.9","name":"a.txt","type":"file"})");
};

TEST_F(OneDriveCopy, TellsTheNewParentAndKeepsTheName) {
    Give({Answer(201, "{}")});
    EXPECT_TRUE(drive->Copy("/a.txt", "/docs/another name")) << seams::LogDump();
    EXPECT_THAT(Requests(), ElementsAre("COPY /v5.0/file.a?pretty=false"));
    EXPECT_EQ(Sent(0), Object(R"({"destination":"folder.d"})"));
}

TEST_F(OneDriveCopy, OntoAnExistingFileDeletesThatFileAndCopiesAgainOnce) {
    Give({conflict, docs, rival, Answer(200, R"({"id":"file.9","type":"file"})"), Answer(204),
          Answer(201, "{}")});
    EXPECT_TRUE(drive->Copy("/a.txt", "/docs/a.txt")) << seams::LogDump();
    EXPECT_THAT(
        Requests(),
        ElementsAre("COPY /v5.0/file.a?pretty=false", "GET /v5.0/me/skydrive/files?pretty=false",
                    "GET /v5.0/folder.d/files?pretty=false", "GET /v5.0/file.9?pretty=false",
                    "DELETE /v5.0/file.9?pretty=false", "COPY /v5.0/file.a?pretty=false"));
}

TEST_F(OneDriveCopy, OntoAnExistingFolderFailsWithIsDirectory) {
    Give({conflict, docs, rival, Answer(200, R"({"id":"file.9","type":"album"})")});
    EXPECT_FALSE(drive->Copy("/a.txt", "/docs/a.txt"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_IS_DIRECTORY);
    EXPECT_THAT(Requests(), SizeIs(4));
}

TEST_F(OneDriveCopy, ASecondConflictFailsSinceOverwriteIsThenFalse) {
    Give({conflict, docs, rival, Answer(200, R"({"id":"file.9","type":"file"})"), Answer(204),
          conflict});
    EXPECT_FALSE(drive->Copy("/a.txt", "/docs/a.txt"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CONFLICT);
    EXPECT_THAT(Requests(), SizeIs(6));
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl " + Api("/file.a") + ", err:{"))
        << seams::LogDump();
}

TEST_F(OneDriveCopy, OntoItselfNeverDeletesTheFile) {
    Give({conflict, docs, Listing(R"({"id":"file.a","name":"a.txt"})"),
          Answer(200, R"({"id":"file.a","type":"file"})")});
    EXPECT_FALSE(drive->Copy("/a.txt", "/docs/a.txt"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CONFLICT);
    EXPECT_THAT(Requests(), SizeIs(4));
}

TEST_F(OneDriveCopy, KeepsTheErrorOfTheStepThatFails) {
    Give({conflict, docs, Listing("")});
    EXPECT_FALSE(drive->Copy("/a.txt", "/docs/a.txt"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
    Give({conflict, docs, rival, Answer(200, R"({"id":"file.9","type":"file"})"), Answer(403)});
    EXPECT_FALSE(drive->Copy("/a.txt", "/docs/a.txt"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_FORBIDDEN);
    Give({Answer(507)});
    EXPECT_FALSE(drive->Copy("/a.txt", "/docs/a.txt"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_QUOTA_EXCEEDED);
}

TEST_F(OneDriveCopy, OfOrToWhatIsUnknownIsNotFound) {
    Give({});
    for (const auto& [from, to] :
         {std::pair("/gone", "/docs/x"), {"/a.txt", "/gone/x"}, {"/a.txt", "no slash"}}) {
        drive->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(drive->Copy(from, to));
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND) << to;
    }
    EXPECT_TRUE(seams::Logged("Failed to find / from [no slash]")) << seams::LogDump();
    EXPECT_THAT(Requests(), IsEmpty());
}

}  // namespace
}  // namespace ZYROCloud
