#include "unit/cloud/dropbox/dropbox_fixture.h"

namespace ZYROCloud {
namespace {

constexpr const char* kCopy = "POST api /2/files/copy";
constexpr const char* kMove = "POST api /2/files/move";
constexpr const char* kDelete = "POST api /2/files/delete";
constexpr const char* kSave = "POST api /2/files/copy_reference/save";
constexpr const char* kGetRef = "POST api /2/files/copy_reference/get";

/** The question what is at "/b.txt". */
constexpr const char* kLook =
    "GET api /2/files/get_metadata//b.txt?include_deleted=false&list=false";

const std::string kFile = Answer(200, R"({"path":"/b.txt","is_dir":false})");
const std::string kFolder = Answer(200, R"({"path":"/b.txt","is_dir":true})");

using DropboxWrite = DropboxTest;

/** Copies and moves, and what is in their way. */
class DropboxMvcp : public DropboxTest {
  protected:
    Json::Value Body(size_t n) const { return Object(All()[n].body); }
};

TEST_F(DropboxWrite, AFolderIsMadeByItsPath) {
    struct {
        const char* parent;
        const char* path;
    } rows[] = {{"/", "/new"}, {"/docs", "/docs/new"}, {"", "/new"}};
    for (const auto& row : rows) {
        Give({Answer(200, "no JSON, and nobody looks")});
        EXPECT_TRUE(drive->CreateFolder(row.parent, "new", Object(R"({"ignored":1})")));
        EXPECT_THAT(Requests(), ElementsAre("POST api /2/files/create_folder"));
        EXPECT_EQ(Object(Last().body)["path"], row.path);
        EXPECT_EQ(Object(Last().body).size(), 1U);
    }
}

TEST_F(DropboxWrite, AFolderThatIsThereIsAConflict) {
    Give({Refusal(R"({".tag":"path","path":{".tag":"conflict"}})")});
    EXPECT_FALSE(drive->CreateFolder("/", "new", Json::Value()));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CONFLICT);
    EXPECT_TRUE(seams::LoggedPart("dropbox_write.cpp:")) << seams::LogDump();
    EXPECT_TRUE(
        seams::LoggedPart("Failed to process curl " + ApiHost() + "/2/files/create_folder, err:{"));
}

TEST_F(DropboxWrite, NamesOfAnyBytesGoAsTheyAre) {
    for (const std::string& name :
         {std::string(), std::string(255, 'x'), std::string(4096, 'x'), std::string("a/b"),
          std::string("\"'\\"), std::string("\xf0\x9f\x98\x80\xe2\x80\xae")}) {
        Give({Answer(200)});
        EXPECT_TRUE(drive->CreateFolder("/", name, Json::Value())) << name;
        EXPECT_EQ(Object(Last().body)["path"], "/" + name);
    }
}

TEST_F(DropboxWrite, WhatIsDeletedIsNamedByItsPath) {
    Give({Answer(200)});
    EXPECT_TRUE(drive->Delete("/a.txt"));
    EXPECT_THAT(Requests(), ElementsAre(kDelete));
    EXPECT_EQ(Object(Last().body), Object(R"({"path":"/a.txt"})"));
}

TEST_F(DropboxWrite, DeletingWhatIsNotThereSucceeds) {
    Give({kNotFound});
    EXPECT_TRUE(drive->Delete("/a.txt"));
    EXPECT_FALSE(seams::LoggedPart("Failed to process curl")) << seams::LogDump();
}

TEST_F(DropboxWrite, DeletingWhatMayNotBeDeletedFails) {
    Give({Refusal(R"({".tag":"path_write","path_write":{}})"),
          Refusal(R"({".tag":"no_write_permission"})")});
    EXPECT_FALSE(drive->Delete("/a.txt"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_BAD_REQUEST);
    EXPECT_FALSE(drive->Delete("/a.txt"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_PERMISSION_DENIED);
}

TEST_F(DropboxMvcp, EachActionHasItsCall) {
    struct {
        const char* action;
        const char* line;
    } rows[] = {{"copy", kCopy}, {"move", kMove}, {"rename", kMove}, {"", kMove}, {"Copy", kMove}};
    for (const auto& row : rows) {
        Give({Answer(200)});
        EXPECT_TRUE(drive->MVCP("/a.txt", "/b.txt", row.action, "ref", true)) << row.action;
        EXPECT_THAT(Requests(), ElementsAre(row.line));
        EXPECT_EQ(Body(0), Object(R"({"from_path":"/a.txt","to_path":"/b.txt"})"));
    }
    Give({Answer(200)});
    EXPECT_TRUE(drive->MVCP("/a.txt", "/b.txt", "copy_ref", "ref", true));
    EXPECT_THAT(Requests(), ElementsAre(kSave));
    EXPECT_EQ(Body(0), Object(R"({"path":"/b.txt","copy_reference":"ref"})"));
}

TEST_F(DropboxMvcp, AMoveOntoAnExistingFileOverwritesIt) {
    Give({kConflict, kFile, Answer(200), Answer(200)});
    EXPECT_TRUE(drive->Move("/a.txt", "/b.txt")) << seams::LogDump();
    EXPECT_THAT(Requests(), ElementsAre(kMove, kLook, kDelete, kMove));
    EXPECT_EQ(Body(2), Object(R"({"path":"/b.txt"})"));
    EXPECT_EQ(Body(3), Body(0));
}

TEST_F(DropboxMvcp, ARenameOntoAnExistingFileFailsWithAConflict) {
    Give({kConflict});
    EXPECT_FALSE(drive->Rename("/docs/a.txt", "b.txt"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CONFLICT);
    EXPECT_THAT(Requests(), ElementsAre(kMove));
    EXPECT_EQ(Body(0), Object(R"({"from_path":"/docs/a.txt","to_path":"/docs/b.txt"})"));
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl " + ApiHost() + "/2/files/move, err:{"));
}

TEST_F(DropboxMvcp, ARenameNeedsAPathWithASlash) {
    EXPECT_FALSE(drive->Rename("a.txt", "b.txt"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_EQ(server->Connections(), 0U);
    Give({Answer(200)});
    EXPECT_TRUE(drive->Rename("/a.txt", "b.txt"));
    EXPECT_EQ(Body(0), Object(R"({"from_path":"/a.txt","to_path":"/b.txt"})"));
}

TEST_F(DropboxMvcp, AFolderInTheWayOfACopyGivesIsDirectory) {
    const std::string tagged = Answer(200, R"({".tag":"folder","path_display":"/b.txt"})");
    for (const std::string& folder : {kFolder, tagged}) {
        Give({kConflict, folder});
        EXPECT_FALSE(drive->Copy("/a.txt", "/b.txt"));
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_IS_DIRECTORY);
        EXPECT_THAT(Requests(), ElementsAre(kCopy, kLook));
    }
}

TEST_F(DropboxMvcp, WhatIsInTheWayIsKeptWhenItCannotBeLookedAt) {
    struct {
        std::string answer;
        __tag_vfs_err_ code;
    } rows[] = {{kNotFound, VFS_ERR_NOT_FOUND},
                {Answer(401), VFS_ERR_UNAUTHORIZED},
                {Answer(200, R"({"is_deleted":true})"), VFS_ERR_NOT_FOUND},
                {Answer(200, R"({"is_dir":"what"})"), VFS_ERR_CLOUD_FAILED},
                {Answer(200, R"({"is_dir":null})"), VFS_ERR_CLOUD_FAILED},
                {Answer(200, "{}"), VFS_ERR_CLOUD_FAILED},
                {Answer(200, "null"), VFS_ERR_CLOUD_FAILED},
                {Answer(200, "[]"), VFS_ERR_CLOUD_FAILED}};
    for (const auto& row : rows) {
        Give({kConflict, row.answer});
        EXPECT_FALSE(drive->Copy("/a.txt", "/b.txt")) << row.answer;
        EXPECT_EQ(drive->GetErrorCode(), row.code) << row.answer;
        EXPECT_THAT(Requests(), ElementsAre(kCopy, kLook));
    }
}

TEST_F(DropboxMvcp, ASecondConflictIsTheResult) {
    Give({kConflict, kFile, Answer(200), kConflict});
    EXPECT_FALSE(drive->Copy("/a.txt", "/b.txt"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CONFLICT);
    EXPECT_THAT(Requests(), ElementsAre(kCopy, kLook, kDelete, kCopy));
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl " + ApiHost() + "/2/files/copy, err:{"));
}

TEST_F(DropboxMvcp, AFileThatCannotBeDeletedEndsTheCopy) {
    Give({kConflict, kFile, Refusal(R"({".tag":"no_permission"})")});
    EXPECT_FALSE(drive->Copy("/a.txt", "/b.txt"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_PERMISSION_DENIED);
    EXPECT_THAT(Requests(), ElementsAre(kCopy, kLook, kDelete));
}

TEST_F(DropboxMvcp, AConflictWithoutOverwritingIsTheResult) {
    Give({kConflict});
    EXPECT_FALSE(drive->MVCP("/a.txt", "/b.txt", "copy", "", false));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CONFLICT);
    EXPECT_THAT(Requests(), ElementsAre(kCopy));
}

TEST_F(DropboxMvcp, AnItemIsNotDeletedToMakeRoomForItself) {
    Give({kConflict, kFile});
    EXPECT_FALSE(drive->Move("/B.txt", "/b.txt"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CONFLICT);
    EXPECT_THAT(Requests(), ElementsAre(kMove, kLook));
}

TEST_F(DropboxMvcp, TwoSpellingsOfOneNameAreOneItem) {
    Give({kConflict, kFile});
    EXPECT_FALSE(drive->Move("/caf\xc3\xa9", "/CAFE\xcc\x81"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CONFLICT);
    EXPECT_THAT(Requests(), SizeIs(2));
}

TEST_F(DropboxMvcp, OtherRefusalsAreTheResult) {
    struct {
        std::string answer;
        __tag_vfs_err_ code;
    } rows[] = {{Answer(400, "Error in call"), VFS_ERR_TOKEN_REVOKED},
                {Answer(401), VFS_ERR_UNAUTHORIZED},
                {Refusal(R"({".tag":"from_lookup","from_lookup":{".tag":"not_found"}})"),
                 VFS_ERR_NOT_FOUND},
                {Refusal(R"({".tag":"too_many_files"})"), VFS_ERR_TOO_MANY_FILES},
                {Refusal(R"({".tag":"to","to":{".tag":"insufficient_space"}})"), VFS_ERR_NO_SPACE},
                {Answer(409, "no JSON"), VFS_ERR_BAD_REQUEST},
                {Answer(409, R"({"error":[]})"), VFS_ERR_BAD_REQUEST},
                {Answer(500), VFS_ERR_SERVER_ERROR},
                {Answer(507), VFS_ERR_QUOTA_EXCEEDED}};
    for (const auto& row : rows) {
        Give(std::vector<std::string>(7, row.answer));
        EXPECT_FALSE(drive->Copy("/a.txt", "/b.txt")) << row.answer;
        EXPECT_EQ(drive->GetErrorCode(), row.code) << row.answer;
        EXPECT_THAT(Requests(), Each(kCopy)) << row.answer;
    }
}

TEST_F(DropboxMvcp, AReferenceIsTakenUnderEitherName) {
    for (const char* member : {"copy_ref", "copy_reference"}) {
        Give({Answer(200, std::string("{\"") + member + "\":\"ref\"}")});
        std::string out;
        EXPECT_TRUE(drive->GetCopyRef("/a.txt", out));
        EXPECT_EQ(out, "ref");
        EXPECT_THAT(Requests(), ElementsAre(kGetRef));
        EXPECT_EQ(Body(0), Object(R"({"path":"/a.txt"})"));
    }
    Give({Answer(200, R"({"copy_ref":"old","copy_reference":"new"})")});
    std::string out;
    EXPECT_TRUE(drive->GetCopyRef("/a.txt", out));
    EXPECT_EQ(out, "old");
}

TEST_F(DropboxMvcp, AReferenceOfNothingIsNotAskedFor) {
    std::string out;
    EXPECT_FALSE(drive->GetCopyRef("", out));
    EXPECT_EQ(server->Connections(), 0U);
}

TEST_F(DropboxMvcp, AnAnswerWithoutAReferenceFailsWithALine) {
    std::string out = "old";
    Give({Answer(200)});
    EXPECT_FALSE(drive->GetCopyRef("/a.txt", out));
    EXPECT_TRUE(seams::Logged("No copy reference in response")) << seams::LogDump();
    for (const char* body : {"[]", "\"x\"", R"({"copy_ref":{}})"}) {
        Give({Answer(200, body)});
        EXPECT_FALSE(drive->GetCopyRef("/a.txt", out)) << body;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << body;
    }
    EXPECT_EQ(out, "old");
}

TEST_F(DropboxMvcp, ACopyBetweenAccountsTakesAReferenceHereAndSavesItThere) {
    Json::Value profile;
    profile["access_token"] = "canary-of-bob";
    Dropbox bob(profiles::kUser, profile);
    Give({Answer(200, R"({"copy_reference":"ref"})"), Answer(200)});
    EXPECT_TRUE(bob.CopyFromRef("/a.txt", "/b.txt", drive.get())) << seams::LogDump();
    EXPECT_THAT(Requests(), ElementsAre(kGetRef, kSave));
    EXPECT_EQ(Body(0), Object(R"({"path":"/a.txt"})"));
    EXPECT_EQ(Body(1), Object(R"({"path":"/b.txt","copy_reference":"ref"})"));
    EXPECT_EQ(All()[0].Header("Authorization"), std::string("Bearer ") + kToken);
    EXPECT_EQ(All()[1].Header("Authorization"), "Bearer canary-of-bob");
}

TEST_F(DropboxMvcp, ACopyBetweenAccountsReplacesAFileOfTheSamePath) {
    Give({Answer(200, R"({"copy_reference":"ref"})"),
          Refusal(R"({".tag":"path","path":{".tag":"conflict"}})"), kFile, Answer(200),
          Answer(200)});
    Json::Value profile;
    profile["access_token"] = "canary-of-bob";
    profile["server_id"] = "dropbox://bob@example.com";
    Dropbox bob(profiles::kUser, profile);
    EXPECT_TRUE(drive->CopyFromRef("/b.txt", "/b.txt", &bob)) << seams::LogDump();
    EXPECT_THAT(Requests(), ElementsAre(kGetRef, kSave, kLook, kDelete, kSave));
    EXPECT_EQ(Body(4), Body(1));
}

TEST_F(DropboxMvcp, ACopyBetweenAccountsNeedsASourceThatGivesAReference) {
    EXPECT_FALSE(drive->CopyFromRef("/a.txt", "/b.txt", nullptr));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    Dropbox bob;
    Give({kNotFound});
    EXPECT_FALSE(drive->CopyFromRef("/a.txt", "/b.txt", &bob));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_EQ(bob.GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_TRUE(seams::LoggedPart("Faile to get copy_ref from /a.txt, err: {")) << seams::LogDump();
}

}  // namespace
}  // namespace ZYROCloud
