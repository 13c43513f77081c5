// Contents to and from Box through the shipped library, as callers move them: drivers from the
// factory, profiles on disk, the simulated service on loopback.
#include <gmock/gmock.h>
#include <sys/mman.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <memory>

#include "support/cloudsim/cloudsim.h"
#include "support/relay_input.h"
#include "support/xattrtree/xattrtree.h"
#include "zyrovfs/zyrovfs_netdrive.h"

namespace {

using namespace ZYROVFS;
using namespace ZYROVFS::Server;
using cloudsim::Fault;
using testing::IsEmpty;
using ZYROCloud::Cloud;

constexpr unsigned kUser = 4001;
constexpr size_t kMiB = 1 << 20;
using Progress = std::vector<unsigned long long>;

/** One user's account at the service, with its profile, its connection and its mounted tree. */
class Connection {
  public:
    Connection(cloudsim::BoxService& service, const std::string& name)
        : account(service.AddAccount(name + "@example.com", name)),
          id("box://" + name + "@example.com"),
          tree("/tmp/box_" + name) {
        const cloudsim::Tokens tokens = account.IssueTokens(3600, "mine");
        Json::Value profile;
        profile["protocol"] = "box";
        profile["alias"] = name;
        profile["access_token"] = tokens.access_token;
        profile["refresh_token"] = tokens.refresh_token;
        profile["client_id"] = "mine";
        profile["expires_in"] = "3600";
        std::string made;
        Json::Value stored;
        EXPECT_TRUE(Add(kUser, VFS_CONFIG_SERVER, made, profile, false, stored)) << GetError();
        EXPECT_EQ(made, id);
        // Stands for the mount: the box's own backend serves the tree that drivers look at.
        stored["path"] = tree.Folder();
        EXPECT_TRUE(CfgAppend(kUser, VFS_CONFIG_CONNECT, id.c_str(), stored)) << GetError();
        driver = Make();
    }

    std::unique_ptr<Cloud> Make() const {
        return std::unique_ptr<Cloud>(
            ZYROCloud::Utils::CreateCloudByServerID(kUser, id, VFS_CONFIG_CONNECT));
    }

    /** The tree learns of what the account has at this path. */
    void Show(const std::string& path) {
        tree.Set(path, "id::file", "files/" + account.Find(path));
    }

    std::string Token(VFS_CONFIG_MODE mode, const char* key) const {
        Json::Value profile;
        char plain[4097] = "";
        EXPECT_TRUE(CfgGetByID(kUser, mode, id.c_str(), profile));
        EXPECT_NE(SzDecrypt(profile[key].asCString(), plain, sizeof plain), 0);
        return plain;
    }

    cloudsim::Account& account;
    const std::string id;
    XattrTree tree;
    std::unique_ptr<Cloud> driver;
};

/** A file in memory that holds a pattern, or nothing yet. */
class File {
  public:
    explicit File(const cloudsim::ContentPtr& content = nullptr) : fd_(memfd_create("file", 0)) {
        const std::string bytes = content ? content->Bytes() : "";
        EXPECT_EQ(write(fd_, bytes.data(), bytes.size()), static_cast<ssize_t>(bytes.size()));
        lseek(fd_, 0, SEEK_SET);
    }
    File(const File&) = delete;
    File& operator=(const File&) = delete;
    ~File() { close(fd_); }

    int Fd() const { return fd_; }
    std::string Sha1() const { return cloudsim::MakeFile(fd_)->Sha1(); }
    off_t Size() const { return lseek(fd_, 0, SEEK_END); }

  private:
    int fd_;
};

Progress told;
int calls_left = -1;

int Tell(unsigned long long, unsigned long long done) {
    told.push_back(done);
    return 0;
}
int CancelLater() {
    return calls_left == 0 ? 1 : (--calls_left, 0);
}

class BoxRoad : public testing::Test {
  protected:
    static void SetUpTestSuite() { Cloud::InitCurlGlobal(); }
    static void TearDownTestSuite() { Cloud::CleanupCurlGlobal(); }

    void SetUp() override {
        setenv("ZYROVFS_UID", std::to_string(kUser).c_str(), 1);
        for (const char* folder : {"/usr/zyro/etc/zyrovfs/4001", "/var/tmp/zyrovfs/4001"}) {
            std::filesystem::remove_all(folder);
        }
        std::filesystem::create_directories("/usr/zyro/etc/zyrovfs");
        const std::string config = "/usr/zyro/etc/zyrovfs/cloud.conf";
        std::ofstream(config) << R"({"hosts":{"BoxApiHost":")" << service.ApiHost()
                              << R"(","BoxUploadHost":")" << service.UploadHost() << R"("}})";
        std::filesystem::permissions(config, std::filesystem::perms(0640));
        ASSERT_TRUE(ZYROCloud::Utils::AddClient("box", "mine", "secret-of-mine"));
        service.AddClient("mine", "secret-of-mine");
        amy = std::make_unique<Connection>(service, "amy");
        ASSERT_TRUE(amy->driver);
        told.clear();
    }
    void TearDown() override { EXPECT_THAT(service.UnusedFaults(), IsEmpty()); }

    cloudsim::BoxService service;
    std::unique_ptr<Connection> amy;
};

TEST_F(BoxRoad, FilesOfManySizesGoUpAndComeDownAsTheyWere) {
    unsigned seed = 1;
    for (const size_t size : {size_t{0}, size_t{1}, size_t{131072}, size_t{131073}, 5 * kMiB + 7}) {
        const auto content = cloudsim::MakePattern(size, seed++);
        const File source(content);
        const std::string path = "/" + std::to_string(size) + " \xC3\xBC.bin";
        ASSERT_TRUE(Cloud::UploadFile(amy->driver.get(), amy->id + path, source.Fd(),
                                      static_cast<long long>(size), Tell, nullptr, nullptr))
            << amy->driver->GetError().toStyledString();
        EXPECT_EQ(amy->account.Get(amy->account.Find(path)).sha1, content->Sha1());
        amy->Show(path);

        const auto reader = amy->Make();
        const File target;
        ASSERT_TRUE(Cloud::DownloadFile(reader.get(), amy->id + path, target.Fd(),
                                        static_cast<long long>(size), Tell, nullptr, nullptr));
        EXPECT_EQ(target.Size(), static_cast<off_t>(size));
        EXPECT_EQ(target.Sha1(), content->Sha1());
    }
    EXPECT_EQ(told.back(), 5 * kMiB + 7);
}

TEST_F(BoxRoad, AnUploadOverAFileReplacesItsContent) {
    amy->account.AddPath("/a.txt", "old");
    amy->Show("/a.txt");
    const auto content = cloudsim::MakePattern(3 * kMiB, 9);
    const File source(content);
    EXPECT_TRUE(Cloud::UploadFile(amy->driver.get(), amy->id + "/a.txt", source.Fd(), 3 * kMiB,
                                  nullptr, nullptr, nullptr));
    EXPECT_EQ(amy->account.Get(amy->account.Find("/a.txt")).sha1, content->Sha1());
}

TEST_F(BoxRoad, APartOfAFileComesIntoABuffer) {
    const std::string item = amy->account.AddPath("/a.txt", "0123456789");
    std::string buffer(5, '#');
    long long got = 0;
    EXPECT_TRUE(Cloud::DownloadFileToBuffer(amy->driver.get(),
                                            service.ApiHost() + "/2.0/files/" + item + "/content",
                                            buffer.data(), 2, 4, &got, nullptr, nullptr, nullptr));
    // One byte more is asked for, and the buffer has room for it.
    EXPECT_EQ(got, 5);
    EXPECT_EQ(buffer, "23456");
}

TEST_F(BoxRoad, AFileGoesFromOneAccountToAnother) {
    Connection ben(service, "ben");
    for (const size_t size : {size_t{1}, kMiB, 9 * kMiB + 11}) {
        const auto content = cloudsim::MakePattern(size, static_cast<unsigned>(size));
        const std::string name = std::to_string(size);
        amy->account.AddContent(amy->account.Root(), name, content);
        amy->Show("/" + name);
        ASSERT_TRUE(Cloud::CopyFile(amy->driver.get(), ben.driver.get(), amy->id + "/" + name,
                                    ben.id + "/" + name, static_cast<long long>(size), Tell,
                                    nullptr, nullptr))
            << amy->driver->GetError().toStyledString() << ben.driver->GetError().toStyledString();
        EXPECT_EQ(ben.account.Get(ben.account.Find("/" + name)).sha1, content->Sha1());
    }
}

TEST_F(BoxRoad, ATokenThatEndsInTheMiddleIsRenewedAndStoredInBothProfiles) {
    const auto content = cloudsim::MakePattern(10 * kMiB, 3);
    amy->account.AddContent(amy->account.Root(), "big", content);
    amy->Show("/big");
    const std::string old = amy->account.LastTokens().access_token;
    service.AddFault(Fault::On("GET", "/d/").CutAnswer(3 * kMiB));
    service.AddFault(
        Fault::On("GET", "/2.0/files/" + amy->account.Find("/big")).After(1).ExpireToken());
    const File target;
    EXPECT_TRUE(Cloud::DownloadFile(amy->driver.get(), amy->id + "/big", target.Fd(), 10 * kMiB,
                                    Tell, nullptr, nullptr))
        << service.Journal().Text();
    EXPECT_EQ(target.Sha1(), content->Sha1());
    EXPECT_EQ(service.Journal().Count("POST", "/oauth2/token"), 1U);
    const cloudsim::Tokens fresh = amy->account.LastTokens();
    EXPECT_NE(fresh.access_token, old);
    for (const VFS_CONFIG_MODE mode : {VFS_CONFIG_SERVER, VFS_CONFIG_CONNECT}) {
        EXPECT_EQ(amy->Token(mode, "access_token"), fresh.access_token) << mode;
        EXPECT_EQ(amy->Token(mode, "refresh_token"), fresh.refresh_token) << mode;
    }
    Json::Value account;
    EXPECT_TRUE(amy->Make()->GetAccountInfo(Json::Value(), account));
    EXPECT_EQ(service.Journal().Count("POST", "/oauth2/token"), 1U);
}

TEST_F(BoxRoad, ACancelEndsEachKindOfTransfer) {
    const auto content = cloudsim::MakePattern(5 * kMiB, 4);
    amy->account.AddContent(amy->account.Root(), "big", content);
    amy->Show("/big");
    const File target;
    calls_left = 3;
    EXPECT_FALSE(Cloud::DownloadFile(amy->driver.get(), amy->id + "/big", target.Fd(), 5 * kMiB,
                                     nullptr, CancelLater, nullptr));
    EXPECT_EQ(amy->driver->GetErrorCode(), VFS_ERR_CANCELLED);

    const auto sender = amy->Make();
    const File source(content);
    calls_left = 3;
    EXPECT_FALSE(Cloud::UploadFile(sender.get(), amy->id + "/up", source.Fd(), 5 * kMiB, nullptr,
                                   CancelLater, nullptr));
    EXPECT_EQ(sender->GetErrorCode(), VFS_ERR_CANCELLED);
    EXPECT_FALSE(amy->account.Exists("/up"));

    Connection ben(service, "ben");
    const auto reader = amy->Make();
    calls_left = 5;
    EXPECT_FALSE(Cloud::CopyFile(reader.get(), ben.driver.get(), amy->id + "/big", ben.id + "/big",
                                 5 * kMiB, nullptr, CancelLater, nullptr));
    EXPECT_FALSE(ben.account.Exists("/big"));
    calls_left = -1;
}

TEST_F(BoxRoad, ARevokedAccountIsRefusedAndItsProfileKept) {
    const std::string before = amy->Token(VFS_CONFIG_SERVER, "refresh_token");
    amy->account.ExpireAccessTokens();
    amy->account.RevokeRefreshTokens();
    Json::Value out;
    EXPECT_FALSE(amy->driver->ListFolder("", Json::Value(), out));
    EXPECT_EQ(amy->driver->GetErrorCode(), VFS_ERR_UNAUTHORIZED);
    EXPECT_EQ(amy->Token(VFS_CONFIG_SERVER, "refresh_token"), before);
    EXPECT_EQ(amy->Token(VFS_CONFIG_CONNECT, "refresh_token"), before);
}

// --- between a browser and the cloud
// --------------------------------------------------------------

/** A CGI program's part of an upload: standard input is a pipe from the web server. */
class Browser {
  public:
    explicit Browser(const std::string& bytes) : sender_(bytes), input_(sender_.Get()) {}

    bool Upload(Connection& to, const std::string& path, unsigned long long total, long long size) {
        progress.total = total;
        return Cloud::RelayUploadInit(to.driver.get(), (to.id + path).c_str(), &progress,
                                      relay_input::kBoundary, nullptr, nullptr, nullptr, nullptr,
                                      size) &&
               Cloud::RelayUploadFile();
    }

    ZYROCloud::_tag_cgi_upload_progress_ progress{0, 0, 0};

  private:
    relay_input::Sender sender_;
    relay_input::Input input_;
};

TEST_F(BoxRoad, ABrowsersFileGoesUpThroughAPipe) {
    for (const size_t size : {size_t{0}, size_t{131073}, 5 * kMiB + 7}) {
        const auto content = cloudsim::MakePattern(size, 5);
        const std::string request = content->Bytes() + relay_input::Closing();
        for (const long long known : {-1LL, static_cast<long long>(size)}) {
            const std::string path = "/" + std::to_string(size) + (known < 0 ? "u" : "k");
            Browser browser(request);
            ASSERT_TRUE(browser.Upload(*amy, path, request.size(), known))
                << amy->driver->GetError().toStyledString();
            EXPECT_EQ(amy->account.Get(amy->account.Find(path)).sha1, content->Sha1());
            EXPECT_EQ(browser.progress.current, request.size());
            EXPECT_EQ(browser.progress.error, 0);
        }
    }
}

TEST_F(BoxRoad, ABrowserThatGoesAwayLeavesTheFileThatIsThere) {
    amy->account.AddPath("/a.txt", "old");
    amy->Show("/a.txt");
    const std::string request = std::string(3 * kMiB, 'x') + relay_input::Closing();
    Browser browser(request.substr(0, 2 * kMiB));
    EXPECT_FALSE(browser.Upload(*amy, "/a.txt", request.size(), -1));
    EXPECT_EQ(browser.progress.error, -9);
    EXPECT_EQ(amy->account.Bytes(amy->account.Find("/a.txt")), "old");
}

TEST_F(BoxRoad, AFileComesDownToABrowserWholeAndInParts) {
    const auto content = cloudsim::MakePattern(2 * kMiB, 6);
    amy->account.AddContent(amy->account.Root(), "film", content);
    amy->Show("/film");
    const std::string uri = amy->id + "/film";
    ASSERT_TRUE(Cloud::RelayDownloadInit(amy->driver.get(), uri.c_str(), nullptr, ""));
    const File whole;
    ASSERT_TRUE(Cloud::RelayDownloadFile(whole.Fd(), 0, 2 * kMiB));
    EXPECT_EQ(whole.Sha1(), content->Sha1());
    const File part;
    ASSERT_TRUE(Cloud::RelayDownloadFile(part.Fd(), 1000000, 1000999));
    EXPECT_EQ(cloudsim::MakeFile(part.Fd())->Bytes(), content->Bytes().substr(1000000, 1000));
}

}  // namespace
