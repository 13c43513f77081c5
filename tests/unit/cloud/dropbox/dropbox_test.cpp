#include "unit/cloud/dropbox/dropbox_fixture.h"

namespace ZYROCloud {
namespace {

using DropboxAccount = DropboxTest;
using DropboxItem = DropboxTest;
using DropboxLimit = DropboxTest;
using DropboxToken = DropboxTest;

TEST_F(DropboxAccount, IsAskedForWithABodyOfNull) {
    Give({Answer(200, R"({"email":"amy@example.com"})")});
    Json::Value out;
    EXPECT_TRUE(drive->GetAccountInfo(Object(R"({"ignored":1})"), out)) << seams::LogDump();
    EXPECT_EQ(out, Object(R"({"email":"amy@example.com"})"));
    const Arrived request = Last();
    EXPECT_EQ(request.Line(), "POST api /2/users/get_current_account");
    EXPECT_EQ(request.body, "null");
    EXPECT_EQ(request.Header("Authorization"), std::string("Bearer ") + kToken);
    EXPECT_EQ(request.Header("Content-Type"), "application/json");
}

TEST_F(DropboxItem, IsAskedForByItsPathInTheAddress) {
    Give({Answer(200, R"({"path":"/docs/a b.txt","is_dir":false})")});
    Json::Value out;
    EXPECT_TRUE(drive->GetFileInfo("/docs/a b.txt", Object(R"({"locale":"en"})"), out))
        << seams::LogDump();
    EXPECT_EQ(drive->GetFileID(out), "/docs/a b.txt");
    EXPECT_FALSE(drive->IsDir(out));
    EXPECT_THAT(Requests(), ElementsAre("GET api /2/files/get_metadata//docs/a%20b.txt"
                                        "?include_deleted=false&list=false&locale=en"));
    EXPECT_EQ(Last().body, "");
    EXPECT_EQ(Last().Header("Content-Type"), "application/json");
}

TEST_F(DropboxItem, WithoutAPathIsTheRoot) {
    Give({Answer(200, R"({"is_dir":true})")});
    Json::Value out;
    EXPECT_TRUE(drive->GetFileInfo("", Json::Value(), out));
    EXPECT_TRUE(drive->IsDir(out));
    EXPECT_THAT(Requests(), ElementsAre("GET api /2/files/get_metadata"
                                        "?include_deleted=false&list=false"));
}

TEST_F(DropboxItem, InTheTrashIsNotFound) {
    Give({Answer(200, R"({"path":"/a.txt","is_deleted":true})")});
    Json::Value out;
    EXPECT_FALSE(drive->GetFileInfo("/a.txt", Json::Value(), out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_TRUE(seams::Logged("This file(/a.txt) is the trash")) << seams::LogDump();
}

TEST_F(DropboxItem, ThatIsNotThereIsNotFound) {
    Give({kNotFound});
    Json::Value out;
    EXPECT_FALSE(drive->GetFileInfo("/a.txt", Json::Value(), out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl " + ApiHost() +
                                  "/2/files/get_metadata//a.txt, err:{"))
        << seams::LogDump();
}

TEST_F(DropboxItem, OfAWrongShapeIsAFailureOfTheCloud) {
    for (const char* body :
         {"[]", "7", R"("text")", R"({"is_deleted":"no"})", R"({"is_deleted":{}})"}) {
        drive->SetError(VFS_ERR_NONE, "");
        Give({Answer(200, body)});
        Json::Value out;
        EXPECT_FALSE(drive->GetFileInfo("/a.txt", Json::Value(), out)) << body;
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED) << body;
    }
    Json::Value out;
    Give({});
    EXPECT_FALSE(drive->GetFileInfo("/a.txt", Object("[1]"), out));
    EXPECT_FALSE(drive->GetFileInfo("/a.txt", Json::Value("text"), out));
    EXPECT_EQ(server->Connections(), 0U);
}

TEST_F(DropboxItem, ABodyThatIsNotJsonIsRepeatedOneSecondApartUpToSixRequests) {
    drive->SetError(VFS_ERR_RATE_LIMITED, "");
    Give(std::vector<std::string>(7, Answer(200, "<html>")));
    Json::Value out;
    EXPECT_FALSE(drive->GetFileInfo("/a.txt", Json::Value(), out));
    EXPECT_THAT(Requests(), SizeIs(6));
    EXPECT_THAT(seams::Sleeps(), ElementsAre(1, 1, 1, 1, 1, 1));
    EXPECT_TRUE(seams::Logged("Failed to parse response to json format, <html>, retry: 1"))
        << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Failed to parse response to json format, <html>, retry: 6"));
    EXPECT_TRUE(seams::Logged("Reach max retry times"));
    // The answers came: the record is not about them.
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_RATE_LIMITED);
}

TEST_F(DropboxItem, ABodyThatIsJsonInTheEndIsTaken) {
    Give({Answer(200, "{"), Answer(200, ""), Answer(200, R"({"path":"/a"})")});
    Json::Value out;
    EXPECT_TRUE(drive->GetFileInfo("/a", Json::Value(), out));
    EXPECT_EQ(drive->GetFileID(out), "/a");
    EXPECT_THAT(seams::Sleeps(), ElementsAre(1, 1));
}

TEST_F(DropboxItem, OfABusyServiceIsAskedForSevenTimes) {
    Give(std::vector<std::string>(8, Answer(429, "slow down")));
    Json::Value out;
    EXPECT_FALSE(drive->GetFileInfo("/a", Json::Value(), out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_RATE_LIMITED);
    EXPECT_THAT(Requests(), SizeIs(7));
    EXPECT_THAT(seams::Sleeps(), ElementsAre(5, 5, 5, 5, 5, 5, 5));
}

TEST_F(DropboxToken, ThatIsRefusedIsReportedAndNotRenewed) {
    Give({Answer(401, R"({"error":{".tag":"expired_access_token"}})")});
    Json::Value out;
    EXPECT_FALSE(drive->GetAccountInfo(Json::Value(), out));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    EXPECT_THAT(Requests(), ElementsAre("POST api /2/users/get_current_account"));
    EXPECT_FALSE(drive->SetRefreshTokenParam(drive->GetAPIHandler()));
    EXPECT_FALSE(drive->SetRefreshTokenParam(nullptr));
}

TEST_F(DropboxToken, ThatHasEndedGoesToTheServiceAllTheSame) {
    Json::Value profile;
    profile["access_token"] = kToken;
    profile["expire_time"] = "1000";
    Dropbox old(profiles::kUser, profile);
    Give({Answer(200)});
    Json::Value out;
    EXPECT_TRUE(old.GetAccountInfo(Json::Value(), out));
    EXPECT_THAT(Requests(), SizeIs(1));
}

TEST_F(DropboxToken, DriversWithoutAProfileAreSafeToAsk) {
    Dropbox nobody;
    Json::Value out;
    Give({Answer(401)});
    EXPECT_FALSE(nobody.GetAccountInfo(Json::Value(), out));
    EXPECT_EQ(nobody.GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    EXPECT_FALSE(nobody.SetAPIErrorHandler(nullptr));
    EXPECT_EQ(nobody.GetCloudType(), 3);
}

TEST_F(DropboxLimit, CanFileUploadTakesTenGiBAndNotOneByteMore) {
    EXPECT_TRUE(drive->CanFileUpload(0));
    EXPECT_TRUE(drive->CanFileUpload(10737418240));
    EXPECT_TRUE(drive->CanFileUpload(~0ULL));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NONE);
    EXPECT_FALSE(drive->CanFileUpload(10737418241));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_FILE_TOO_LARGE);
    EXPECT_EQ(YLIBCErrGet(), 0xa400U);
    EXPECT_FALSE(drive->CanFileUpload(~0ULL - 1));
    EXPECT_EQ(server->Connections(), 0U);
}

TEST_F(DropboxLimit, NamesOfDesktopsAndOfTheServiceAreLeftOutInAnyCase) {
    for (const char* name : {"desktop.ini", "THUMBS.DB", ".DS_Store", "Icon\r", ".dropbox",
                             ".DROPBOX", ".dropbox.attr", ".Dropbox.Cache"}) {
        EXPECT_TRUE(drive->IsSkipMVCPFile(name)) << name;
        EXPECT_TRUE(drive->IsSkipMVCPFile(std::string("/a/b/") + name)) << name;
        EXPECT_FALSE(drive->IsSkipMVCPFile(std::string("/") + name + "/c")) << name;
    }
    for (const char* name : {"", "/", "dropbox", ".dropbox.attr2", ".dropbox.", "icon"}) {
        EXPECT_FALSE(drive->IsSkipMVCPFile(name)) << name;
    }
}

TEST_F(DropboxItem, TransfersAreToldPathAndAddress) {
    Json::Value meta;
    EXPECT_TRUE(drive->GetMetaDataByURI(std::string(kServerId) + "/docs/a.txt", meta, "Download"));
    EXPECT_EQ(meta["server_path"], "/docs/a.txt");
    EXPECT_EQ(meta["url"], ContentHost() + "/2/files/download");
    meta = Json::Value();
    EXPECT_TRUE(drive->GetMetaDataByURI(std::string(kServerId) + "/a", meta, "Upload"));
    EXPECT_EQ(meta["url"], ContentHost() + "/2/files/upload_session/finish");
}

TEST_F(DropboxItem, AUriOfAnotherConnectionHasNoPath) {
    for (const char* uri : {"dropbox://bob@example.com/a", "dropbox://amy@example.com", ""}) {
        Json::Value meta;
        EXPECT_FALSE(drive->GetMetaDataByURI(uri, meta, "Download")) << uri;
        EXPECT_TRUE(seams::Logged(std::string("Failed to get server path from dropbox, ") + uri))
            << seams::LogDump();
    }
    Json::Value list(Json::arrayValue);
    EXPECT_FALSE(drive->GetMetaDataByURI(std::string(kServerId) + "/a", list, "Upload"));
}

TEST_F(DropboxItem, AnActionOfDownloadWithASuffixGivesAnEmptyUrlAndTheDownloadWorksByThePath) {
    Json::Value meta;
    EXPECT_TRUE(drive->GetMetaDataByURI(std::string(kServerId) + "/a.txt", meta, "Download2"));
    EXPECT_EQ(meta["url"], "");
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_NONE);
    Give({Answer(200, "hello")});
    Bytes bytes(0);
    EXPECT_TRUE(drive->DownloadProcess(&bytes.xfer, meta)) << seams::LogDump();
    EXPECT_EQ(bytes.received, "hello");
    EXPECT_EQ(Last().Argument(), Object(R"({"path":"/a.txt"})"));
}

TEST_F(DropboxItem, DescriptionsWithWrongTypesAreNotReadAsSomethingElse) {
    EXPECT_THROW(drive->IsDir(Object(R"({"is_dir":"true"})")), Json::Exception);
    EXPECT_THROW(drive->GetFileID(Object(R"({"path":{}})")), Json::Exception);
    EXPECT_FALSE(drive->IsDir(Object("{}")));
    EXPECT_EQ(drive->GetFileID(Object("{}")), "");
}

}  // namespace
}  // namespace ZYROCloud
