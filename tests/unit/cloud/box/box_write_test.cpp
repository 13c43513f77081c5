#include "unit/cloud/box/box_fixture.h"

namespace ZYROCloud {
namespace {

using BoxChange = BoxTest;

class BoxCopy : public BoxTest {
  protected:
    void SetUp() override {
        BoxTest::SetUp();
        source_ = amy.AddPath("/docs/a.txt", "new");
        target_ = amy.AddFolder(root, "target");
        Show("/docs/a.txt");
        Show("/target");
    }
    std::string source_, target_;
};

TEST_F(BoxChange, AFolderIsMadeBelowAnotherOne) {
    const std::string docs = amy.AddFolder(root, "docs");
    EXPECT_TRUE(box->CreateFolder("folders/" + docs, "new \"one\"", Json::Value("not read")));
    EXPECT_TRUE(amy.Exists("/docs/new \"one\""));
    EXPECT_EQ(Object(Last().body),
              Object(R"({"name":"new \"one\"","parent":{"id":")" + docs + R"("}})"));
    EXPECT_EQ(Last().Header("Content-Type"), "application/json");
    EXPECT_EQ(Last().Header("Content-Length"), std::to_string(Last().body_size));
    EXPECT_TRUE(box->CreateFolder("folders/0", "top", Json::Value()));
    EXPECT_FALSE(box->CreateFolder("folders/0", "top", Json::Value()));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CONFLICT);
}

TEST_F(BoxChange, AFolderGoesWithItsContent) {
    amy.AddPath("/docs/a.txt", "x");
    EXPECT_TRUE(box->Delete("folders/" + amy.Find("/docs")));
    EXPECT_FALSE(amy.Exists("/docs"));
    EXPECT_EQ(Last().Query("recursive"), "true");
    const std::string id = amy.AddPath("/b.txt", "x");
    EXPECT_TRUE(box->Delete("files/" + id));
    EXPECT_FALSE(box->Delete("files/" + id));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_NOT_FOUND);
}

TEST_F(BoxChange, ARenameToAnotherCaseGoesToTheServiceAsAnyOther) {
    const std::string id = amy.AddPath("/a.txt", "x");
    EXPECT_TRUE(box->Rename("files/" + id, "A.TXT"));
    EXPECT_EQ(amy.Get(id).name, "A.TXT");
    EXPECT_EQ(Last().method, "PUT");
    EXPECT_EQ(Last().body, R"({"name":"A.TXT"})");
    EXPECT_FALSE(box->Rename("files/" + id, "a/b"));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_INVALID_NAME);
}

TEST_F(BoxChange, AnItemMovesByIds) {
    const std::string id = amy.AddPath("/a.txt", "x");
    const std::string docs = amy.AddFolder(root, "docs");
    EXPECT_TRUE(box->Move("not read", "files/" + id, "folders/" + docs));
    EXPECT_TRUE(amy.Exists("/docs/a.txt"));
    EXPECT_EQ(Last().method + " " + Last().Path(), "PUT /2.0/files/" + id);
    EXPECT_EQ(Last().body, R"({"parent":{"id":")" + docs + R"("}})");
}

TEST_F(BoxChange, AMoveWithoutAnIdIsNotFoundBeforeTheTokenIsLookedAt) {
    Renew("1000");
    EXPECT_FALSE(box->Move("", "", "folders/1"));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_NOT_FOUND);
    box->SetError(VFS_ERR_NONE, "");
    EXPECT_FALSE(box->Move("", "files/1", ""));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(BoxChange, AMoveByTwoPathsIsNotOffered) {
    EXPECT_FALSE(box->Move("/a.txt", "/docs/a.txt"));
    EXPECT_THAT(Requests(), IsEmpty());
    EXPECT_TRUE(box->SetModifiedDate("files/1", "2020-01-01T00:00:00Z"));
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(BoxChange, ARefusedTokenIsRenewedAndTheChangeMadeOnce) {
    amy.ExpireAccessTokens();
    EXPECT_TRUE(box->CreateFolder("folders/0", "docs", Json::Value())) << seams::LogDump();
    EXPECT_THAT(Requests(),
                ElementsAre("POST /2.0/folders", "POST /oauth2/token", "POST /2.0/folders"));
}

TEST_F(BoxCopy, KeepsTheNameOfItsSource) {
    EXPECT_TRUE(box->Copy("/docs/a.txt", "/target/other.txt")) << seams::LogDump();
    EXPECT_EQ(amy.Bytes(amy.Find("/target/a.txt")), "new");
    EXPECT_FALSE(amy.Exists("/target/other.txt"));
    EXPECT_THAT(Requests(), ElementsAre("POST /2.0/files/" + source_ + "/copy"));
    EXPECT_EQ(Last().body, R"({"parent":{"id":")" + target_ + R"("}})");
}

TEST_F(BoxCopy, IntoTheRoot) {
    EXPECT_TRUE(box->Copy("/docs/a.txt", "/a.txt"));
    EXPECT_TRUE(amy.Exists("/a.txt"));
}

TEST_F(BoxCopy, OntoAnExistingFileDeletesItAndCopiesAgainOnce) {
    const std::string old = amy.AddFile(target_, "a.txt", "old");
    EXPECT_TRUE(box->Copy("/docs/a.txt", "/target/a.txt")) << seams::LogDump();
    EXPECT_EQ(amy.Bytes(amy.Find("/target/a.txt")), "new");
    EXPECT_EQ(service.Journal().Count("DELETE", "/2.0/files/" + old), 1U);
    EXPECT_EQ(service.Journal().Count("POST", "/2.0/files/" + source_ + "/copy"), 2U);
    EXPECT_FALSE(seams::LoggedPart("Failed to process curl")) << seams::LogDump();
}

TEST_F(BoxCopy, ASecondConflictFails) {
    amy.AddFile(target_, "a.txt", "old");
    service.AddFault(
        Fault::On("POST", "/2.0/files/" + source_ + "/copy").After(1).Answer(409, "{}"));
    EXPECT_FALSE(box->Copy("/docs/a.txt", "/target/a.txt"));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CONFLICT);
    EXPECT_EQ(service.Journal().Count("POST", "/2.0/files/" + source_ + "/copy"), 2U);
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl")) << seams::LogDump();
}

TEST_F(BoxCopy, ThatMeetsItsOwnNameLeavesTheFileItWasToReplace) {
    const std::string met = amy.AddFile(target_, "a.txt", "met");
    const std::string named = amy.AddFile(target_, "b.txt", "named");
    EXPECT_FALSE(box->Copy("/docs/a.txt", "/target/b.txt"));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CONFLICT);
    EXPECT_EQ(amy.Bytes(met), "met");
    EXPECT_EQ(amy.Bytes(named), "named");
    EXPECT_EQ(service.Journal().Count("DELETE", "/"), 0U);
}

TEST_F(BoxCopy, OfANameThatEndsInAnOwnerLeavesTheFileOfTheShorterName) {
    amy.AddPath("/docs/report - Amy Doe", "new");
    Show("/docs/report - Amy Doe");
    const std::string other = amy.AddFile(target_, "report", "kept");
    amy.AddFile(target_, "report - Amy Doe", "old");
    EXPECT_FALSE(box->Copy("/docs/report - Amy Doe", "/target/report - Amy Doe"));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CONFLICT);
    EXPECT_EQ(amy.Bytes(other), "kept");
    EXPECT_TRUE(box->Delete("files/" + other));
    EXPECT_TRUE(box->Copy("/docs/report - Amy Doe", "/target/report - Amy Doe"));
    EXPECT_EQ(amy.Bytes(amy.Find("/target/report - Amy Doe")), "new");
}

TEST_F(BoxCopy, OntoAnExistingFolderIsRefused) {
    amy.AddFolder(target_, "a.txt");
    EXPECT_FALSE(box->Copy("/docs/a.txt", "/target/a.txt"));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_IS_DIRECTORY);
    EXPECT_TRUE(amy.Exists("/target/a.txt"));
    EXPECT_EQ(service.Journal().Count("DELETE", "/"), 0U);
}

TEST_F(BoxCopy, WithoutOverwritingAConflictIsAFailure) {
    const std::string old = amy.AddFile(target_, "a.txt", "old");
    EXPECT_FALSE(box->DoCopy("/docs/a.txt", "/target/a.txt", false));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CONFLICT);
    EXPECT_EQ(amy.Bytes(old), "old");
}

TEST_F(BoxCopy, ATargetThatIsGoneInTheMeantimeIsNotFound) {
    service.AddFault(Fault::On("POST", "/2.0/files/" + source_ + "/copy").Answer(409, "{}"));
    EXPECT_FALSE(box->Copy("/docs/a.txt", "/target/a.txt"));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_NOT_FOUND);
}

TEST_F(BoxCopy, ATargetThatCannotBeDeletedKeepsTheErrorOfThat) {
    const std::string old = amy.AddFile(target_, "a.txt", "old");
    service.AddFault(Fault::On("DELETE", "/2.0/files/" + old).Answer(403, "{}"));
    EXPECT_FALSE(box->Copy("/docs/a.txt", "/target/a.txt"));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_FORBIDDEN);
    EXPECT_EQ(service.Journal().Count("POST", "/2.0/files/" + source_ + "/copy"), 1U);
}

TEST_F(BoxCopy, OfWhatTheTreeDoesNotKnowIsNotFound) {
    for (const auto& [from, to] :
         {std::pair("/none", "/target/a.txt"), std::pair("/docs/a.txt", "/none/a.txt")}) {
        box->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(box->Copy(from, to));
        EXPECT_EQ(box->GetErrorCode(), VFS_ERR_NOT_FOUND);
    }
    EXPECT_FALSE(box->Copy("/docs/a.txt", "noslash"));
    EXPECT_TRUE(seams::Logged("Failed to find / from [noslash]")) << seams::LogDump();
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(BoxCopy, AnOddDescriptionOfTheTargetIsAFailureOfTheCloud) {
    const std::string old = amy.AddFile(target_, "a.txt", "old");
    for (const char* body : {R"({"id":{},"type":"file"})", R"({"id":"1","type":[]})", "[1]"}) {
        service.AddFault(Fault::On("GET", "/2.0/files/" + old).Body(body));
        EXPECT_FALSE(box->Copy("/docs/a.txt", "/target/a.txt")) << body;
        EXPECT_EQ(box->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << body;
    }
    EXPECT_TRUE(amy.Exists("/target/a.txt"));
}

}  // namespace
}  // namespace ZYROCloud
