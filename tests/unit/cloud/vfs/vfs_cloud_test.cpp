#include "cloud/vfs/vfs_cloud.h"

#include <gmock/gmock.h>
#include <sys/mman.h>
#include <unistd.h>
#include <zosplatform/error.h>

#include <cstring>

#include "cloud/attempt.h"
#include "core/handle.h"
#include "core/json.h"
#include "http/api_handler.h"
#include "support/profiles.h"
#include "support/seams.h"
#include "support/wire_server.h"
#include "support/xattrtree/xattrtree.h"
#include "unit/http/curl_seam.h"

namespace {

bool no_list = false;

}  // namespace

extern "C" curl_slist* curl_slist_append(curl_slist* list, const char* text) {
    using Append = curl_slist* (*)(curl_slist*, const char*);
    return no_list ? nullptr : curl_seam::Real<Append>("curl_slist_append")(list, text);
}

namespace ZYROCloud {
namespace {

using namespace ZYROVFS;
using profiles::kUser;
using testing::Each;
using testing::ElementsAre;
using testing::EndsWith;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

constexpr const char* kPassword = "s3cret of amy";

Json::Value Profile(const std::string& protocol, const std::string& id = "ftp://amy@host") {
    Json::Value profile;
    profile["protocol"] = protocol;
    profile["account"] = "amy";
    profile["password"] = kPassword;
    profile["server_id"] = id;
    return profile;
}

Json::Value Meta(const std::string& url, Json::Value total = Json::Value()) {
    Json::Value meta;
    meta["url"] = url;
    if (!total.isNull()) {
        meta["total_bytes"] = total;
    }
    return meta;
}

/** One transfer between a driver and a file or a stream. */
struct Content {
    explicit Content(int direction, const std::string& bytes = "", bool stream = false)
        : file(memfd_create("content", 0)),
          xfer{direction == 1 ? Read : Write, direction, &context} {
        now = this;
        EXPECT_EQ(write(file.Get(), bytes.data(), bytes.size()),
                  static_cast<ssize_t>(bytes.size()));
        lseek(file.Get(), 0, SEEK_SET);
        context.fd = stream ? -1 : file.Get();
    }

    static size_t Read(char* data, size_t size, size_t count, void*) {
        return static_cast<size_t>(read(now->file.Get(), data, size * count));
    }
    static size_t Write(char* data, size_t size, size_t count, void*) {
        now->context.can_retry = false;
        now->received.append(data, size * count);
        return size * count;
    }

    static inline Content* now = nullptr;
    UniqueFd file;
    std::string received;
    XferContext context;
    XferData xfer;
};

class VfsCloud : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        no_list = false;
        curl_seam::Now() = curl_seam::State();
        seams::Reset();
        YLIBCErrSetEx(0, "test", 1);
    }
    void TearDown() override {
        no_list = false;
        EXPECT_FALSE(seams::LoggedPart(kPassword)) << seams::LogDump();
    }

    static size_t Performs() { return curl_seam::Values(curl_seam::kPerform).size(); }
    /** The next transfers end thus, without a server. */
    static void Results(std::deque<CURLcode> results) {
        curl_seam::Now().results = std::move(results);
    }
    static std::deque<CURLcode> Refusals(size_t count) {
        return std::deque<CURLcode>(count, CURLE_COULDNT_CONNECT);
    }
};

TEST_F(VfsCloud, AServerIdMissingFromTheConfigurationIsTest) {
    EXPECT_EQ(VFSCloud(kUser, Json::Value()).GetServerID(), "test");
    EXPECT_EQ(VFSCloud(kUser, Profile("ftp", "ftp://host")).GetServerID(), "ftp://host");
    EXPECT_EQ(VFSCloud().GetServerID(), "");
    EXPECT_EQ(VFSCloud().GetCloudType(), CLOUD_TYPE_VFS);
}

TEST_F(VfsCloud, ADavsProtocolHasTheErrorsOfDavAndFtpOrSftpThoseOfFtp) {
    const struct {
        const char* protocol;
        __tag_vfs_err_ code;
    } cases[] = {{"davs", VFS_ERR_CONFLICT},   {"dav", VFS_ERR_CONFLICT},
                 {"DAVS", VFS_ERR_CONFLICT},   {"ftp", VFS_ERR_NOT_FOUND},
                 {"sftp", VFS_ERR_NOT_FOUND},  {"da", VFS_ERR_NOT_FOUND},
                 {"webdav", VFS_ERR_NOT_FOUND}};
    for (const auto& c : cases) {
        const wire::WireServer server({{wire::ReadRequest(), wire::Send(wire::Answer(409))}});
        VFSCloud cloud(kUser, Profile(c.protocol));
        Content content(0);
        EXPECT_FALSE(cloud.DownloadProcess(&content.xfer, Meta(server.Url("/a", "dav"))));
        EXPECT_EQ(cloud.GetErrorCode(), c.code) << c.protocol;
    }
    EXPECT_FALSE(VFSCloud().SetAPIErrorHandler(nullptr));
}

TEST_F(VfsCloud, OperationsOfTheMountLogALineAndLeaveTheErrorAsItWas) {
    VFSCloud cloud(kUser, Profile("ftp"));
    cloud.SetError(VFS_ERR_QUOTA_EXCEEDED, "before");
    const Json::Value none;
    Json::Value out = "before";
    EXPECT_FALSE(cloud.GetAccountInfo(none, out));
    EXPECT_FALSE(cloud.GetFileInfo("x", none, out));
    EXPECT_FALSE(cloud.ListFolder("x", none, out));
    EXPECT_FALSE(cloud.CreateFolder("x", "y", none));
    EXPECT_FALSE(cloud.Delete("x"));
    EXPECT_FALSE(cloud.Rename("x", "y"));
    EXPECT_FALSE(cloud.Copy("x", "y"));
    EXPECT_FALSE(cloud.Move("x", "y"));
    for (const char* what :
         {"get account info", "get file info", "list operation", "create folder operation",
          "delete operation", "rename operation", "copy operation", "move operation"}) {
        EXPECT_TRUE(seams::Logged(std::string("VFSCloud not implement ") + what)) << what;
    }
    EXPECT_EQ(cloud.GetErrorCode(), VFS_ERR_QUOTA_EXCEEDED);
    EXPECT_EQ(cloud.GetError()["msg"], "before");
    EXPECT_EQ(out, "before");
    EXPECT_EQ(Performs(), 0U);
}

TEST_F(VfsCloud, TheUrlOfALocationIsThatOfTheServerWithoutTheUser) {
    Json::Value connections;
    connections["ftp://amy@host:2121"]["protocol"] = "ftp";
    connections["ftp://amy@host:2121"]["uri_path"] = "share";
    profiles::Put(profiles::VFS_CONFIG_CONNECT, connections);
    VFSCloud cloud(kUser, Profile("ftp"));
    Json::Value meta;
    for (const char* operation : {"Upload", "Download", "anything"}) {
        EXPECT_TRUE(cloud.GetMetaDataByURI("ftp://amy@host:2121/a b/\xc3\xbc", meta, operation));
        EXPECT_EQ(json::toString(meta), "{\"url\":\"ftp://host:2121/share/a b/\xc3\xbc\"}");
    }
    EXPECT_FALSE(cloud.GetMetaDataByURI("ftp://ben@host/a", meta, "Upload"));
    EXPECT_TRUE(seams::Logged("Failed to get username and uri from ftp://ben@host/a"))
        << seams::LogDump();
    EXPECT_EQ(cloud.GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    cloud.SetError(VFS_ERR_NONE, "");
    Json::Value list(Json::arrayValue);
    EXPECT_FALSE(cloud.GetMetaDataByURI("ftp://amy@host:2121/a", list, "Upload"));
    EXPECT_EQ(cloud.GetErrorCode(), VFS_ERR_CLOUD_FAILED);
}

TEST_F(VfsCloud, AWebdavUploadOfSizeZeroOrOfUnknownSizeSetsNoUploadSize) {
    VFSCloud cloud(kUser, Profile("dav"));
    const struct {
        const char* url;
        Json::Value total;
        std::vector<long> sizes;
    } cases[] = {
        {"dav://x/a", 0, {}},    {"dav://x/a", -1, {}},
        {"dav://x/a", {}, {}},   {"dav://x/a", "no", {}},
        {"davs://x/a", 1, {1}},  {"DAV://x/a", "4096", {4096}},
        {"ftp://x/a", 4096, {}}, {"dav://x/a", Json::Value(Json::Int64{1} << 40), {1L << 40}},
    };
    for (const auto& c : cases) {
        curl_seam::Now() = curl_seam::State();
        Results({CURLE_OK});
        Content content(1);
        EXPECT_TRUE(cloud.UploadProcess(&content.xfer, Meta(c.url, c.total))) << c.url << c.total;
        EXPECT_EQ(curl_seam::Values(CURLOPT_INFILESIZE_LARGE), c.sizes) << c.url << c.total;
        EXPECT_THAT(curl_seam::Values(CURLOPT_UPLOAD), ElementsAre(1));
    }
    // As long as the request that brings it, and shorter.
    curl_seam::Now() = curl_seam::State();
    Results({CURLE_OK});
    Content content(1);
    Json::Value meta = Meta("dav://x/a", 900);
    meta["filesize"] = -1;
    EXPECT_TRUE(cloud.UploadProcess(&content.xfer, meta));
    EXPECT_THAT(curl_seam::Values(CURLOPT_INFILESIZE_LARGE), testing::IsEmpty());
}

TEST_F(VfsCloud, OnlyTheCodePageUtf8TurnsTheServersUtf8On) {
    for (const char* page : {"", "utf-8", "BIG5", "ISO-8859-1", "UTF8"}) {
        for (const int direction : {0, 1}) {
            curl_seam::Now() = curl_seam::State();
            Results({CURLE_OK});
            Json::Value profile = Profile("ftp");
            profile["codepage"] = page;
            VFSCloud cloud(kUser, profile);
            Content content(direction);
            EXPECT_TRUE(direction == 1 ? cloud.UploadProcess(&content.xfer, Meta("ftp://x/a"))
                                       : cloud.DownloadProcess(&content.xfer, Meta("ftp://x/a")));
            EXPECT_THAT(curl_seam::Values(CURLOPT_QUOTE), IsEmpty()) << page;
        }
    }
    for (const char* url : {"ftp://x/a", "FTPS://x/a", "dav://x/a", "sftp://x/a"}) {
        curl_seam::Now() = curl_seam::State();
        Results({CURLE_OK});
        Json::Value profile = Profile("ftp");
        profile["codepage"] = "UTF-8";
        VFSCloud cloud(kUser, profile);
        Content content(0);
        EXPECT_TRUE(cloud.DownloadProcess(&content.xfer, Meta(url)));
        const bool ftp = strncasecmp(url, "ftp", 3) == 0;
        EXPECT_EQ(curl_seam::Values(CURLOPT_QUOTE).size(), ftp ? 1U : 0U) << url;
        EXPECT_EQ(curl_seam::Values(CURLOPT_FTP_FILEMETHOD).size(), ftp ? 1U : 0U) << url;
    }
    EXPECT_THAT(curl_seam::Values(CURLOPT_FTP_FILEMETHOD), Each(3));
}

TEST_F(VfsCloud, TheServerHearsOfUtf8BeforeTheTransfer) {
    wire::Script script = {wire::Send("220 ready\r\n")};
    for (const char* reply : {"331 password?", "230 in", "257 \"/\"", "500 what?", "550 no"}) {
        script.push_back(wire::ReadLine());
        script.push_back(wire::Send(std::string(reply) + "\r\n"));
    }
    const wire::WireServer server({script});
    Json::Value profile = Profile("ftp");
    profile["codepage"] = "UTF-8";
    VFSCloud cloud(kUser, profile);
    Content content(0);
    EXPECT_FALSE(cloud.DownloadProcess(&content.xfer, Meta(server.Url("/a/b c/file", "ftp"))));
    EXPECT_EQ(server.ReceivedText(), std::string("USER amy\r\nPASS ") + kPassword +
                                         "\r\nPWD\r\nOPTS UTF8 ON\r\nCWD a/b c\r\n");
    EXPECT_EQ(cloud.GetErrorCode(), VFS_ERR_NOT_FOUND);
}

TEST_F(VfsCloud, AMountWhoseRootIsDescribedByTwoTurnsExtendedPassiveModeOff) {
    XattrTree tree("/tmp/vfs_cloud_tree");
    Json::Value connections;
    connections["ftp://amy@host"]["protocol"] = "ftp";
    connections["ftp://amy@host"]["path"] = tree.Folder();
    profiles::Put(profiles::VFS_CONFIG_CONNECT, connections);
    VFSCloud cloud(kUser, Profile("ftp"));
    EXPECT_TRUE(cloud.isSetFTPEPSV("")) << "no attribute";
    const struct {
        std::string text;
        bool epsv;
    } cases[] = {{"2", false},
                 {"02", false},
                 {"1", true},
                 {"", true},
                 {"two", true},
                 {"22", true},
                 {"2x", true},
                 {"0x2", true},
                 {std::string("2\0junk", 6), false},
                 {std::string(31, '0') + "2", false},
                 {std::string(32, '0') + "2", true}};
    for (const auto& c : cases) {
        tree.Set("/", "standard::description", c.text);
        EXPECT_EQ(cloud.isSetFTPEPSV("ftp://elsewhere"), c.epsv) << c.text;
    }
    tree.Set("/", "standard::description", "2");
    for (const int direction : {0, 1}) {
        for (const char* url : {"ftp://host/a", "ftps://host/a", "dav://host/a"}) {
            curl_seam::Now() = curl_seam::State();
            Results({CURLE_OK});
            Content content(direction);
            EXPECT_TRUE(direction == 1 ? cloud.UploadProcess(&content.xfer, Meta(url))
                                       : cloud.DownloadProcess(&content.xfer, Meta(url)));
            const std::vector<long> off = {0};
            EXPECT_EQ(curl_seam::Values(CURLOPT_FTP_USE_EPSV),
                      *url == 'f' ? off : std::vector<long>());
        }
    }
    tree.Fail("standard::description", EIO);
    EXPECT_TRUE(cloud.isSetFTPEPSV(""));
}

TEST_F(VfsCloud, WithoutAMountExtendedPassiveModeStaysAsItIs) {
    VFSCloud cloud(kUser, Profile("ftp", "no uri"));
    Results({CURLE_OK});
    Content content(0);
    EXPECT_TRUE(cloud.DownloadProcess(&content.xfer, Meta("ftp://x/a")));
    EXPECT_THAT(curl_seam::Values(CURLOPT_FTP_USE_EPSV), IsEmpty());
}

TEST_F(VfsCloud, AnUploadHasTheThreeRetriesOfTheHandlerAndNoMore) {
    VFSCloud cloud(kUser, Profile("ftp"));
    Results(Refusals(20));
    Content content(1, "body");
    EXPECT_FALSE(cloud.UploadProcess(&content.xfer, Meta("ftp://x/a")));
    EXPECT_EQ(Performs(), 4U);
    EXPECT_EQ(cloud.GetErrorCode(), VFS_ERR_CONNECT_FAILED);
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl ftp://x/a, err:{")) << seams::LogDump();
}

TEST_F(VfsCloud, ADownloadIsTriedSixTimes) {
    VFSCloud cloud(kUser, Profile("ftp"));
    Results(Refusals(20));
    Content content(0);
    EXPECT_FALSE(cloud.DownloadProcess(&content.xfer, Meta("ftp://x/a")));
    EXPECT_EQ(Performs(), 6U);
    EXPECT_EQ(cloud.GetErrorCode(), VFS_ERR_CONNECT_FAILED);
    EXPECT_TRUE(seams::Logged("Retry Download: 0/6")) << seams::LogDump();
    EXPECT_TRUE(seams::Logged("Retry Download: 5/6"));
    EXPECT_TRUE(seams::LoggedPart("Failed to process curl ftp://x/a, err:{"));
    EXPECT_THAT(seams::Sleeps(), Each(3));

    Results({CURLE_COULDNT_CONNECT, CURLE_OPERATION_TIMEDOUT, CURLE_OK});
    EXPECT_TRUE(cloud.DownloadProcess(&content.xfer, Meta("ftp://x/a")));
    EXPECT_EQ(Performs(), 9U);
}

TEST_F(VfsCloud, ADownloadThatHasBegunOrThatMayNotPassIsNotTriedAgain) {
    VFSCloud cloud(kUser, Profile("ftp"));
    Results(Refusals(20));
    Content content(0);
    content.context.can_retry = false;
    EXPECT_FALSE(cloud.DownloadProcess(&content.xfer, Meta("ftp://x/a")));
    EXPECT_EQ(Performs(), 1U);
    content.context.can_retry = true;
    Results({CURLE_REMOTE_FILE_NOT_FOUND});
    EXPECT_FALSE(cloud.DownloadProcess(&content.xfer, Meta("ftp://x/a")));
    EXPECT_EQ(Performs(), 2U);
    EXPECT_EQ(cloud.GetErrorCode(), VFS_ERR_NOT_FOUND);
}

TEST_F(VfsCloud, ACancelledDriverDownloadsNothing) {
    VFSCloud cloud(kUser, Profile("ftp"));
    cloud.SetError(VFS_ERR_CANCELLED, "");
    Content content(0);
    EXPECT_FALSE(cloud.DownloadProcess(&content.xfer, Meta("ftp://x/a")));
    EXPECT_EQ(Performs(), 0U);
}

TEST_F(VfsCloud, ARangeEndsOneByteBehindTheWantedLength) {
    VFSCloud cloud(kUser, Profile("dav"));
    const wire::WireServer server({{wire::ReadRequest(), wire::Send(wire::Answer(206, "abc"))},
                                   {wire::ReadRequest(), wire::Send(wire::Answer(200, "abc"))}});
    Json::Value meta = Meta(server.Url("/a", "dav"));
    meta["from_bytes"] = 100;
    meta["len"] = 2;
    Content content(0);
    EXPECT_TRUE(cloud.DownloadProcess(&content.xfer, meta));
    EXPECT_EQ(content.received, "abc");
    EXPECT_THAT(server.ReceivedText(), HasSubstr("Range: bytes=100-102\r\n"));
    meta["len"] = 0;
    EXPECT_TRUE(cloud.DownloadProcess(&content.xfer, meta));
    EXPECT_THAT(server.Received().back(), Not(HasSubstr("Range:")));
}

TEST_F(VfsCloud, LocalStepsThatFailAreACloudFailureWithAnEmptyMessage) {
    const struct {
        int option;
        const char* url;
        int direction;
    } cases[] = {{CURLOPT_USERNAME, "dav://x/a", 0},
                 {CURLOPT_USERNAME, "dav://x/a", 1},
                 {CURLOPT_QUOTE, "ftp://x/a", 0},
                 {CURLOPT_QUOTE, "ftp://x/a", 1},
                 {CURLOPT_USERAGENT, "ftp://x/a", 1},
                 {CURLOPT_RANGE, "ftp://x/a", 0},
                 {-1, "ftp://x/a", 0},
                 {-1, "ftps://x/a", 1}};
    for (const auto& c : cases) {
        curl_seam::Now() = curl_seam::State();
        curl_seam::Now().refused[c.option] = CURLE_OUT_OF_MEMORY;
        no_list = c.option == -1;
        Json::Value profile = Profile("ftp");
        profile["codepage"] = "UTF-8";
        VFSCloud cloud(kUser, profile);
        Json::Value meta = Meta(c.url);
        meta["len"] = 5;
        Content content(c.direction);
        EXPECT_FALSE(c.direction == 1 ? cloud.UploadProcess(&content.xfer, meta)
                                      : cloud.DownloadProcess(&content.xfer, meta));
        EXPECT_EQ(json::toString(cloud.GetError()),
                  "{\"code\":" + std::to_string(VFS_ERR_CLOUD_FAILED) + ",\"msg\":\"\"}")
            << c.option << c.url;
        EXPECT_EQ(Performs(), 0U);
    }
}

TEST_F(VfsCloud, WithoutATransferNothingHappensAndWrongValuesAreAFailure) {
    VFSCloud cloud(kUser, Profile("dav"));
    EXPECT_FALSE(cloud.UploadProcess(nullptr, Meta("dav://x/a")));
    EXPECT_FALSE(cloud.DownloadProcess(nullptr, Meta("dav://x/a")));
    EXPECT_EQ(cloud.GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    for (const char* text : {"[]", "7", R"({"url":{}})", R"({"url":[1]})", "{}"}) {
        Json::Value meta;
        ASSERT_TRUE(json::fromString(meta, text));
        Content up(1, "x");
        EXPECT_FALSE(cloud.UploadProcess(&up.xfer, meta)) << text;
        Content down(0);
        EXPECT_FALSE(cloud.DownloadProcess(&down.xfer, meta)) << text;
    }
    EXPECT_EQ(Performs(), 0U);
    XferData bare{nullptr, 0, nullptr};
    Results(Refusals(2));
    EXPECT_FALSE(cloud.DownloadProcess(&bare, Meta("dav://x/a")));
}

// --- bodies that have to be sent again --------------------------------------------------------

/** Takes the body of 14 bytes and goes away. Without the leave that libcurl waits a second for, the
 * attempt ends without any status. */
const wire::Script kBreaks = {wire::ReadHead(), wire::ReadBytes(14)};

TEST_F(VfsCloud, AnUploadThatIsRepeatedSendsTheWholeFile) {
    const wire::WireServer server({kBreaks, {wire::ReadRequest(), wire::Send(wire::Answer(201))}});
    VFSCloud cloud(kUser, Profile("dav"));
    Content content(1, "the whole body");
    EXPECT_TRUE(cloud.UploadProcess(&content.xfer, Meta(server.Url("/a", "dav"), 14)))
        << seams::LogDump();
    EXPECT_EQ(server.Connections(), 2U);
    EXPECT_THAT(server.Received()[1], EndsWith("the whole body"));
    EXPECT_THAT(server.Received().back(), EndsWith("\r\n\r\nthe whole body"));
}

TEST_F(VfsCloud, AnUploadFromTheMiddleOfAFileIsRepeatedFromThere) {
    const wire::WireServer server({kBreaks, {wire::ReadRequest(), wire::Send(wire::Answer(201))}});
    VFSCloud cloud(kUser, Profile("dav"));
    Content content(1, "not the whole body");
    lseek(content.file.Get(), 4, SEEK_SET);
    EXPECT_TRUE(cloud.UploadProcess(&content.xfer, Meta(server.Url("/a", "dav"), 14)));
    EXPECT_THAT(server.Received().back(), EndsWith("\r\n\r\nthe whole body"));
}

TEST_F(VfsCloud, AStreamThatHasBegunIsNotSentOnFromTheMiddle) {
    const wire::WireServer server({kBreaks, {wire::ReadRequest(), wire::Send(wire::Answer(201))}});
    VFSCloud cloud(kUser, Profile("dav"));
    Content content(1, "the whole body", true);
    EXPECT_FALSE(cloud.UploadProcess(&content.xfer, Meta(server.Url("/a", "dav"), 14)));
    EXPECT_EQ(server.Connections(), 1U);
    EXPECT_NE(cloud.GetErrorCode(), VFS_ERR_NONE);
}

TEST_F(VfsCloud, AStreamThatHasNotBegunIsTriedAgain) {
    VFSCloud cloud(kUser, Profile("dav"));
    Results({CURLE_COULDNT_CONNECT, CURLE_COULDNT_CONNECT, CURLE_OK});
    Content content(1, "the whole body", true);
    EXPECT_TRUE(cloud.UploadProcess(&content.xfer, Meta("dav://x/a", 14)));
    EXPECT_EQ(Performs(), 3U);
}

TEST_F(VfsCloud, TheQuestionForAPasswordComesBeforeTheBodyOfAStreamAndMayComeBehindThatOfAFile) {
    const std::string ask = wire::Answer(401, "", "WWW-Authenticate: Basic realm=\"x\"\r\n");
    for (const bool stream : {true, false}) {
        const wire::Step first = stream ? wire::ReadHead() : wire::ReadRequest();
        const wire::WireServer server(
            {{first, wire::Send(ask), wire::ReadRequest(), wire::Send(wire::Answer(201))},
             {wire::ReadRequest(), wire::Send(wire::Answer(201))}});
        VFSCloud cloud(kUser, Profile("dav"));
        Content content(1, "the whole body", stream);
        EXPECT_TRUE(cloud.UploadProcess(&content.xfer, Meta(server.Url("/a", "dav"), 14)))
            << seams::LogDump();
        EXPECT_THAT(server.Received().back(), HasSubstr("Authorization: Basic "));
        EXPECT_THAT(server.Received().back(), EndsWith("the whole body"));
    }
}

}  // namespace
}  // namespace ZYROCloud
