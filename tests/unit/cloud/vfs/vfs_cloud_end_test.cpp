// How the operations of the driver for users' own servers end, and as whom it logs in.
#include <gmock/gmock.h>
#include <sys/mman.h>
#include <zosplatform/error.h>

#include "cloud/vfs/vfs_cloud.h"
#include "core/handle.h"
#include "http/api_handler.h"
#include "support/checked_driver.h"
#include "support/profiles.h"
#include "support/seams.h"
#include "support/wire_server.h"
#include "unit/http/curl_seam.h"

namespace ZYROCloud {
namespace {

using namespace ZYROVFS;
using checked_driver::Checked;
using profiles::kUser;
using testing::HasSubstr;
using testing::Not;

Json::Value Profile(const std::string& protocol, const std::string& account,
                    const std::string& password) {
    Json::Value profile;
    profile["protocol"] = protocol;
    profile["account"] = account;
    profile["password"] = password;
    profile["server_id"] = protocol + "://host";
    return profile;
}

Json::Value Meta(const std::string& url) {
    Json::Value meta;
    meta["url"] = url;
    return meta;
}

class VfsCloudEnd : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        curl_seam::Now() = {};
        YLIBCErrSetEx(0, "test", 1);
        context_.can_retry = true;
    }

    static size_t Ignore(char*, size_t size, size_t count, void*) { return size * count; }
    static size_t Nothing(char*, size_t, size_t, void*) { return 0; }

    XferContext context_;
    XferData down_{Ignore, 0, &context_};
    XferData up_{Nothing, 1, &context_};
};

TEST_F(VfsCloudEnd, AFailureOfAnyKindHasACode) {
    Checked<VFSCloud> cloud(kUser, Profile("dav", "amy", "pw"));
    Json::Value meta;
    EXPECT_FALSE(cloud.GetMetaDataByURI("dav://nobody@nowhere/", meta, "Upload"));
    for (const char* url : {"", "nonsense"}) {
        cloud.SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(cloud.DownloadProcess(&down_, Meta(url)));
        cloud.SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(cloud.UploadProcess(&up_, Meta(url)));
    }
    cloud.SetError(VFS_ERR_NONE, "");
    EXPECT_FALSE(cloud.DownloadProcess(nullptr, Meta("dav://x/a")));
    cloud.SetError(VFS_ERR_NONE, "");
    EXPECT_FALSE(cloud.UploadProcess(nullptr, Meta("dav://x/a")));
    EXPECT_EQ(cloud.GetErrorCode(), VFS_ERR_CLOUD_FAILED);
}

TEST_F(VfsCloudEnd, ASuccessLeavesNothingOfTheAttemptsBeforeIt) {
    Checked<VFSCloud> cloud(kUser, Profile("dav", "amy", "pw"));
    curl_seam::Now().results = {CURLE_COULDNT_CONNECT, CURLE_COULDNT_CONNECT, CURLE_OK};
    EXPECT_TRUE(cloud.DownloadProcess(&down_, Meta("dav://x/a"))) << seams::LogDump();
    EXPECT_EQ(cloud.GetErrorCode(), VFS_ERR_NONE);
    curl_seam::Now().results = {CURLE_COULDNT_CONNECT, CURLE_OK};
    EXPECT_TRUE(cloud.UploadProcess(&up_, Meta("dav://x/a")));
    EXPECT_EQ(cloud.GetErrorCode(), VFS_ERR_NONE);
}

TEST_F(VfsCloudEnd, ASuccessLeavesWhatWasThereBefore) {
    Checked<VFSCloud> cloud(kUser, Profile("dav", "amy", "pw"));
    cloud.SetError(VFS_ERR_NOT_FOUND, "");
    curl_seam::Now().results = {CURLE_OK};
    EXPECT_TRUE(cloud.DownloadProcess(&down_, Meta("dav://x/a")));
    EXPECT_EQ(cloud.GetErrorCode(), VFS_ERR_NOT_FOUND);
}

/** What an FTP server hears up to the password. */
std::string LogIn(const std::string& account, const std::string& password, XferData& xfer) {
    const wire::WireServer server(
        {{wire::Send("220 ready\r\n"), wire::ReadLine(), wire::Send("331 password?\r\n"),
          wire::ReadLine(), wire::Send("530 no\r\n")}});
    VFSCloud cloud(kUser, Profile("ftp", account, password));
    EXPECT_FALSE(cloud.DownloadProcess(&xfer, Meta(server.Url("/a", "ftp"))));
    return server.ReceivedText();
}

TEST_F(VfsCloudEnd, AGuestOfAnFtpServerLogsInAsOne) {
    for (const char* account : {"", "anonymous"}) {
        EXPECT_EQ(LogIn(account, "", down_), "USER anonymous\r\nPASS ftp@example.com\r\n");
    }
    EXPECT_EQ(LogIn("anonymous", "amy@example.com", down_),
              "USER anonymous\r\nPASS amy@example.com\r\n");
    EXPECT_EQ(LogIn("amy", "", down_), "USER amy\r\nPASS \r\n");
}

TEST_F(VfsCloudEnd, AGuestOfAWebServerSendsNoCredentials) {
    const wire::WireServer server({{wire::ReadRequest(), wire::Send(wire::Answer(200, "abc"))}});
    VFSCloud cloud(kUser, Profile("dav", "", ""));
    EXPECT_TRUE(cloud.DownloadProcess(&down_, Meta(server.Url("/a", "dav"))));
    EXPECT_THAT(server.ReceivedText(), Not(HasSubstr("Authorization")));
}

}  // namespace
}  // namespace ZYROCloud
