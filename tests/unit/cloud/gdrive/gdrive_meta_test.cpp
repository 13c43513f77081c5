#include "unit/cloud/gdrive/gdrive_fixture.h"

namespace ZYROCloud {
namespace {

class GDriveMeta : public GDriveTest {
  protected:
    bool Ask(const std::string& path, const std::string& operation) {
        meta = Json::Value();
        return drive->GetMetaDataByURI(server_id + path, meta, operation);
    }
    std::string UploadUrl() const { return service.ApiHost() + "/upload/drive/v2/files"; }

    Json::Value meta;
};

TEST_F(GDriveMeta, OfAnUploadToAnExistingPathReplacesThatItem) {
    const std::string id = amy.AddPath("/docs/a.txt", "x");
    Show("/docs");
    Show("/docs/a.txt");
    EXPECT_TRUE(Ask("/docs/a.txt", "Upload")) << seams::LogDump();
    EXPECT_EQ(meta["method"], "PUT");
    EXPECT_EQ(meta["url"], UploadUrl() + "/" + id);
    EXPECT_EQ(meta["id"], id);
    EXPECT_EQ(meta["parent_id"], amy.Find("/docs"));
    EXPECT_EQ(meta["title"], "a.txt");
    EXPECT_FALSE(meta.isMember("mimeType"));
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(GDriveMeta, OfAnUploadToANewPathMakesAnItem) {
    amy.AddPath("/docs/b.txt", "x");
    Show("/docs");
    EXPECT_TRUE(Ask("/docs/a.DOCX", "Upload")) << seams::LogDump();
    EXPECT_EQ(meta["method"], "POST");
    EXPECT_EQ(meta["url"], UploadUrl());
    EXPECT_EQ(meta["id"], "");
    EXPECT_EQ(meta["mimeType"],
              "application/vnd.openxmlformats-officedocument.wordprocessingml.document");
}

TEST_F(GDriveMeta, OfAnUploadBelowTheTopFolderHasItsId) {
    EXPECT_TRUE(Ask("/a.txt", "Upload"));
    EXPECT_EQ(meta["parent_id"], "root");
    EXPECT_EQ(meta["method"], "POST");
    EXPECT_TRUE(Ask("/", "Upload")) << "the top folder itself is never replaced";
    EXPECT_EQ(meta["id"], "root");
    EXPECT_EQ(meta["method"], "POST");
    EXPECT_EQ(meta["url"], UploadUrl());
}

TEST_F(GDriveMeta, OfAnUploadWithoutASlashFails) {
    EXPECT_FALSE(Ask("", "Upload"));
    EXPECT_TRUE(seams::Logged("Failed to find / from ")) << seams::LogDump();
    EXPECT_FALSE(Ask("docs", "Upload"));
    EXPECT_TRUE(seams::Logged("Failed to find / from docs")) << seams::LogDump();
}

TEST_F(GDriveMeta, OfAnUploadIntoAFolderThatTheTreeDoesNotKnowFails) {
    EXPECT_FALSE(Ask("/docs/a.txt", "Upload"));
    EXPECT_TRUE(seams::Logged("Failed to get parent id by [/docs]")) << seams::LogDump();
    EXPECT_FALSE(meta.isMember("url"));
    EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
}

TEST_F(GDriveMeta, OfADownloadHasTheAddressThatTheTreeKnows) {
    amy.AddPath("/docs/a.txt", "x");
    Show("/docs/a.txt");
    for (const char* operation : {"Download", "DOWNLOAD", "download", "Downloads", "Download="}) {
        EXPECT_TRUE(Ask("/docs/a.txt", operation)) << operation << seams::LogDump();
        EXPECT_EQ(meta["id"], amy.Find("/docs/a.txt"));
        EXPECT_EQ(meta["uri"], server_id + "/docs/a.txt");
        EXPECT_EQ(meta["path"], tree.Folder() + "/docs/a.txt");
        EXPECT_EQ(meta["linkAttr"], "");
        EXPECT_EQ(meta["url"].asString().rfind(service.ContentHost(), 0), 0U) << meta;
        EXPECT_FALSE(meta.isMember("method"));
    }
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(GDriveMeta, OfADownloadInAnotherFormNamesItsType) {
    service.AddDocument(amy, root, "Report", "document", "text");
    Show("/Report");
    EXPECT_TRUE(Ask("/Report", "Download=text/plain")) << seams::LogDump();
    EXPECT_EQ(meta["linkAttr"], "text/plain");
    EXPECT_THAT(meta["url"].asString(), HasSubstr("exportFormat=txt"));
    EXPECT_TRUE(Ask("/Report", "Download=a=b"));
    EXPECT_EQ(meta["linkAttr"], "a=b") << "behind the first one";
    EXPECT_EQ(meta["url"].asString().rfind("alternateLink://", 0), 0U) << meta;
}

TEST_F(GDriveMeta, OfADownloadThatTheTreeDoesNotKnowFails) {
    EXPECT_FALSE(Ask("/none", "Download"));
    EXPECT_TRUE(seams::Logged("Failed to get download url by [" + server_id + "/none]"))
        << seams::LogDump();
    EXPECT_FALSE(meta.isMember("url"));
}

TEST_F(GDriveMeta, OfAnyOtherOperationIsTheLocationItself) {
    for (const char* operation : {"", "upload", "UPLOAD", "Uploads", "Down", "Rename"}) {
        EXPECT_TRUE(Ask("/a.txt", operation)) << operation;
        EXPECT_EQ(meta.getMemberNames(), (std::vector<std::string>{"id", "url"})) << operation;
        EXPECT_EQ(meta["url"], server_id + "/a.txt");
    }
}

TEST_F(GDriveMeta, OfALocationElsewhereIsTheTopFolder) {
    EXPECT_TRUE(drive->GetMetaDataByURI("ftp://elsewhere/a.txt", meta, "Rename"));
    EXPECT_EQ(meta["id"], "root") << "an empty path is the top folder";
    EXPECT_FALSE(drive->GetMetaDataByURI("ftp://elsewhere/a.txt", meta, "Upload"));
}

TEST_F(GDriveMeta, IntoAValueThatIsNoObjectIsAFailureOfTheCloud) {
    for (const char* operation : {"Upload", "Rename"}) {
        Json::Value list = Object("[1]");
        drive->SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(drive->GetMetaDataByURI(server_id + "/a.txt", list, operation));
        EXPECT_EQ(drive->GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    }
}

}  // namespace
}  // namespace ZYROCloud
