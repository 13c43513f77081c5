// Trust of a server when something else goes wrong: network, disk, folder, address.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <grp.h>
#include <sys/mount.h>

#include "core/error_cell.h"
#include "core/handle.h"
#include "support/seams.h"
#include "support/stranger.h"
#include "unit/mount/ssl_fixture.h"

namespace ZYROVFS {
namespace {

// --- failures that say nothing about the certificate --------------------------------------------

TEST_F(SslPeer, AHostThatCannotBeReachedKeepsItsSavedCopy) {
    const int port = tls::RefusedPort();
    fs::create_directories(folder_);
    std::ofstream(File(port)) << own_.certificate;
    const std::string url = "https://localhost:" + std::to_string(port) + "/";
    const Answer answer = Ask(url);
    EXPECT_EQ(answer.code, VFS_ERR_HOST_UNREACHABLE) << answer;
    EXPECT_TRUE(answer.Logged("Failed to verify cert " + url + " by " + File(port))) << answer;
    EXPECT_EQ(ReadFile(File(port)), own_.certificate);
}

TEST_F(SslPeer, AWrongPasswordIsNoMatterOfTrustAndKeepsTheSavedCopy) {
    tls::ServerOptions options;
    options.identity = own_;
    options.answer = [](const tls::Request&) { return tls::Response{401, {}, ""}; };
    const tls::TlsServer server(options);
    const Answer forced = Ask(Davs(server), true, "amy", "wrong");
    EXPECT_TRUE(forced.ok) << forced;
    EXPECT_EQ(ReadFile(File(server)), own_.certificate);
    const Answer answer = Ask(Davs(server), false, "amy", "wrong");
    EXPECT_TRUE(answer.ok) << "the mount finds the password wrong, with a code of its own: "
                           << answer;
    EXPECT_EQ(ReadFile(File(server)), own_.certificate);
}

TEST_F(SslPeer, ADirectoryInTheFilesPlaceFails) {
    const tls::TlsServer server(signed_);
    fs::create_directories(File(server) + "/inside");
    const Answer asked = fresh::Ask([&] {
        SetErr(VFS_ERR_CERT_UNTRUSTED);  // left by an earlier host
        return Utils::SSLVerifyPeer(nullptr, nullptr, Davs(server).c_str(), false);
    });
    EXPECT_EQ(asked.code, VFS_ERR_FAILED) << asked;
    EXPECT_TRUE(asked.Logged("Failed to verify cert ")) << asked;
    const Answer forced = Force(Davs(server));
    EXPECT_EQ(forced.code, VFS_ERR_FAILED) << forced;
    EXPECT_TRUE(forced.Logged("Failed to save cert " + File(server))) << forced;
    EXPECT_TRUE(fs::is_directory(File(server) + "/inside"));
    EXPECT_EQ(Names().size(), 1U);
}

/** A small file system of its own in the folder's place. */
class SmallDisk {
  public:
    explicit SmallDisk(const std::string& folder) : folder_(folder) {
        fs::create_directories(folder_);
        mounted_ = mount("tmpfs", folder_.c_str(), "tmpfs", 0, "size=16k") == 0;
    }
    SmallDisk(const SmallDisk&) = delete;
    SmallDisk& operator=(const SmallDisk&) = delete;
    ~SmallDisk() { umount2(folder_.c_str(), MNT_DETACH); }

    bool Mounted() const { return mounted_; }
    bool MakeReadOnly() const {
        return mount("tmpfs", folder_.c_str(), "tmpfs", MS_REMOUNT | MS_RDONLY, nullptr) == 0;
    }
    void Fill() const {
        const UniqueFd fd(
            open((folder_ + "/filler").c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600));
        const std::string block(4096, 'f');
        while (write(fd.Get(), block.data(), block.size()) > 0) {
        }
    }

  private:
    std::string folder_;
    bool mounted_;
};

TEST_F(SslPeer, AFullDiskWhileSavingKeepsTheOldFile) {
    const SmallDisk disk(folder_);
    ASSERT_TRUE(disk.Mounted());
    const tls::TlsServer server(own_);
    Save(server, "old");
    disk.Fill();
    const Answer answer = Force(Davs(server));
    EXPECT_EQ(answer.code, VFS_ERR_FAILED) << answer;
    EXPECT_TRUE(answer.Logged("No space left on device")) << answer;
    EXPECT_TRUE(answer.Logged("Failed to save cert " + File(server))) << answer;
    EXPECT_EQ(ReadFile(File(server)), "old");
    EXPECT_EQ(Names().size(), 2U) << "nothing half written stays";
}

TEST_F(SslPeer, AReadOnlyFolderFailsWithTheStepThatCouldNotBeDone) {
    const SmallDisk disk(folder_);
    ASSERT_TRUE(disk.Mounted());
    const tls::TlsServer good(signed_);
    const tls::TlsServer renewed(signed_);
    Save(renewed, own_.certificate);
    ASSERT_TRUE(disk.MakeReadOnly());

    const Answer linked = Ask(Davs(good));
    EXPECT_EQ(linked.code, VFS_ERR_FAILED) << linked;
    EXPECT_TRUE(linked.Logged("Failed to create symlink to " + File(good))) << linked;

    const Answer forced = Force(Davs(good));
    EXPECT_EQ(forced.code, VFS_ERR_FAILED) << forced;
    EXPECT_TRUE(forced.Logged("Failed to save cert " + File(good))) << forced;

    const Answer decided = Ask(Davs(renewed));
    EXPECT_TRUE(decided.ok) << "the bundle decides, the old copy stays: " << decided;
    EXPECT_EQ(ReadFile(File(renewed)), own_.certificate);
}

// --- the folder -------------------------------------------------------------------------------

TEST_F(SslPeer, AUserWithoutAnyFolderGetsBothOnTheFirstQuestion) {
    const tls::TlsServer server(signed_);
    fs::remove_all(parent_);
    const Answer answer = Ask(Davs(server));
    EXPECT_TRUE(answer.ok) << answer;
    struct stat above {};
    struct stat info {};
    ASSERT_EQ(stat(parent_.c_str(), &above), 0);
    ASSERT_EQ(stat(folder_.c_str(), &info), 0);
    EXPECT_EQ(above.st_mode & 07777, 01777U);
    EXPECT_EQ(info.st_mode & 07777, 0700U);
    EXPECT_EQ(info.st_uid, kAmy);
    EXPECT_EQ(info.st_gid, 0U);
    EXPECT_EQ(Target(File(server)), paths::kCaBundle);
}

TEST_F(SslPeer, AFolderThatCannotBeMadeFailsBeforeAnyoneIsAsked) {
    const tls::TlsServer server(signed_);
    fs::remove_all(parent_);
    const Answer answer = fresh::Ask([&] {
        return setgroups(0, nullptr) == 0 && setgid(100) == 0 && setuid(kAmy) == 0 &&
               Utils::SSLVerifyPeer(nullptr, nullptr, Davs(server).c_str(), false);
    });
    EXPECT_EQ(answer.code, VFS_ERR_FAILED) << answer;
    EXPECT_TRUE(answer.Logged("Failed to create ssl folder " + folder_)) << answer;
    EXPECT_FALSE(fs::exists(parent_));
    EXPECT_TRUE(server.Requests().empty());
}

TEST_F(SslPeer, AFolderThatCannotBeGivenAwayIsTakenBack) {
    const Answer answer = fresh::Ask([] {
        return setgroups(0, nullptr) == 0 && setegid(100) == 0 && seteuid(kAmy) == 0 &&
               Utils::SSLVerifyPeer(nullptr, nullptr, "davs://localhost:1/", false);
    });
    EXPECT_EQ(answer.code, VFS_ERR_FAILED) << answer;
    EXPECT_TRUE(answer.Logged("Failed to create ssl folder " + folder_)) << answer;
    EXPECT_FALSE(fs::exists(folder_));
}

TEST_F(SslPeer, TheUserMayAskInPersonOnceTheFolderIsThere) {
    const tls::TlsServer server(signed_);
    fs::create_directories(folder_);
    ASSERT_EQ(chown(folder_.c_str(), kAmy, 0), 0);
    const Answer answer = fresh::Ask([&] {
        return setgroups(0, nullptr) == 0 && setegid(100) == 0 && seteuid(kAmy) == 0 &&
               Utils::SSLVerifyPeer(nullptr, nullptr, Davs(server).c_str(), false) &&
               Utils::SSLVerifyPeer(nullptr, nullptr, Davs(server).c_str(), true);
    });
    EXPECT_TRUE(answer.ok) << answer;
    EXPECT_EQ(ReadFile(File(server)), First(signed_.certificate));
}

TEST_F(SslPeer, AStrangersLinkOrFileInTheFoldersPlaceIsRefused) {
    const std::string elsewhere = testing::TempDir() + "elsewhere";
    fs::create_directories(elsewhere);
    fs::create_directory_symlink(elsewhere, folder_);
    const tls::TlsServer server(own_);
    EXPECT_EQ(Force(Davs(server)).code, VFS_ERR_FAILED);
    EXPECT_TRUE(fs::is_empty(elsewhere));
    fs::remove(folder_);
    std::ofstream{folder_};
    EXPECT_EQ(Force(Davs(server)).code, VFS_ERR_FAILED);
}

TEST_F(SslPeer, StrangersFolderDoesNotSayWhomTheUserTrusts) {
    const tls::TlsServer server(own_);
    ASSERT_TRUE(stranger::Folder(folder_));
    ASSERT_TRUE(stranger::File(File(server), own_.certificate));
    const Answer answer = Ask(Davs(server));
    EXPECT_EQ(answer.code, VFS_ERR_CERT_UNTRUSTED) << answer;
    EXPECT_EQ(stranger::OwnerOf(folder_), kAmy);
    EXPECT_THAT(Names(), testing::IsEmpty());
}

TEST_F(SslPeer, StrangersFileInTheUsersFolderDoesNotSayWhomTheUserTrusts) {
    const tls::TlsServer server(own_);
    Save(server, own_.certificate);
    ASSERT_EQ(chown(folder_.c_str(), kAmy, 0), 0);
    EXPECT_TRUE(Ask(Davs(server)).ok);
    ASSERT_EQ(chown(File(server).c_str(), stranger::kMallory, 100), 0);
    EXPECT_EQ(Ask(Davs(server)).code, VFS_ERR_CERT_UNTRUSTED);
    EXPECT_TRUE(Force(Davs(server)).ok) << "but the user may still decide";
}

// --- addresses --------------------------------------------------------------------------------

TEST_F(SslPeer, ANonStandardPortGetsItsOwnFile) {
    const tls::TlsServer first(own_);
    const tls::TlsServer second(tls::Make({}));
    EXPECT_TRUE(Force(Davs(first)).ok);
    EXPECT_TRUE(Force(Davs(second)).ok);
    EXPECT_NE(ReadFile(File(first)), ReadFile(File(second)));
    EXPECT_TRUE(Ask(Davs(first)).ok);
    EXPECT_TRUE(Ask(Davs(second)).ok);
}

TEST_F(SslPeer, HttpAndHttpsOfAHostAreSeparateFiles) {
    tls::ServerOptions plain;
    plain.port = 80;
    const tls::TlsServer http(plain);
    tls::ServerOptions secure;
    secure.port = 443;
    secure.identity = own_;
    const tls::TlsServer https(secure);
    EXPECT_TRUE(Force("davs://localhost/dav").ok);
    const Answer answer = Ask("dav://localhost/dav");
    EXPECT_TRUE(answer.ok) << answer;
    EXPECT_THAT(Names(), testing::UnorderedElementsAre("localhost:80", "localhost:443"));
    EXPECT_EQ(Target(File(80)), paths::kCaBundle);
    EXPECT_EQ(ReadFile(File(443)), own_.certificate);
}

TEST_F(SslPeer, SchemesAreComparedWithoutCase) {
    const tls::TlsServer server(signed_);
    const std::string rest = "://localhost:" + std::to_string(server.Port()) + "/";
    for (const char* scheme : {"davs", "DAVS", "Davs", "https"}) {
        EXPECT_TRUE(Ask(scheme + rest).ok) << scheme;
    }
}

TEST_F(SslPeer, TheUserIsLeftOutOfTheAddress) {
    const tls::TlsServer server(signed_);
    const std::string url = "davs://amy@localhost:" + std::to_string(server.Port()) + "/my files/x";
    const Answer answer = Ask(url, false, "ben", "secret");
    EXPECT_TRUE(answer.ok) << answer;
    EXPECT_TRUE(Ask(url).ok);
    const std::vector<tls::Request> requests = server.Requests();
    ASSERT_EQ(requests.size(), 2U);
    EXPECT_EQ(requests[0].headers.at("authorization"), tls::Basic("ben", "secret"));
    EXPECT_EQ(requests[0].target, "/my%20files/x");
    EXPECT_EQ(requests[1].headers.count("authorization"), 0U);
}

TEST_F(SslPeer, AccountsWithReservedCharactersDoNotLeadToAnotherServer) {
    const tls::TlsServer server(signed_);
    const std::string at = "@localhost:" + std::to_string(server.Port());
    for (const std::string account : {"a@b", "a%2Fb", "a%3Fb", "a%23b", "a%40b"}) {
        const Answer answer = Ask("davs://" + account + at + "/x@localhost:1");
        EXPECT_TRUE(answer.ok) << account << answer;
    }
    EXPECT_EQ(Names().size(), 1U);
}

TEST_F(SslPeer, PathsWithSpacesUtf8AndPercentSignsReachTheServer) {
    const tls::TlsServer server(signed_);
    const Answer answer = Ask(Davs(server, "/my files/\xC3\xA9t\xC3\xA9/100%/a?b#c"));
    EXPECT_TRUE(answer.ok) << answer;
    const std::vector<tls::Request> requests = server.Requests();
    ASSERT_EQ(requests.size(), 1U);
    EXPECT_EQ(requests[0].target, "/my%20files/%C3%A9t%C3%A9/100%25/a%3Fb%23c");
}

TEST_F(SslPeer, ANullUrlIsRefused) {
    EXPECT_FALSE(Utils::SSLVerifyPeer("amy", "secret", nullptr, false));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    EXPECT_TRUE(seams::Logged("Bad Parameters: szURL is null")) << seams::LogDump();
}

TEST_F(SslPeer, AUrlThatDoesNotParseIsRefusedBeforeAnythingIsMade) {
    for (const std::string url : {"", "nonsense", "https:", "://", "davs://host:port/"}) {
        const Answer answer = Ask(url);
        EXPECT_TRUE(answer.finished && !answer.ok) << url << answer;
        EXPECT_EQ(answer.code, VFS_ERR_HOST_UNREACHABLE) << url << answer;
        EXPECT_TRUE(answer.Logged("Failed to get host from ")) << url << answer;
    }
    EXPECT_FALSE(fs::exists(folder_));
}

TEST_F(SslPeer, AnEmptyHostIsReachedByNobody) {
    for (const std::string url : {"davs://", "davs:///dav", "dav://:80/"}) {
        const Answer answer = Ask(url);
        EXPECT_TRUE(answer.finished && !answer.ok) << url << answer;
        EXPECT_THAT(answer.code, testing::AnyOf(VFS_ERR_HOST_UNREACHABLE, VFS_ERR_FAILED)) << url;
    }
}

TEST_F(SslPeer, AHostThatWouldLeaveTheFolderIsRefused) {
    for (const bool force : {false, true}) {
        const Answer answer = Ask("davs://..%2f..%2f..%2fetc%2fcron.d%2fx/", force);
        EXPECT_FALSE(answer.ok);
        EXPECT_TRUE(answer.Logged("Failed to get host from ")) << answer;
    }
}

TEST_F(SslPeer, ForceOfAPlainServerHasNothingToSave) {
    const tls::TlsServer server{tls::ServerOptions()};
    const Answer answer = Ask("dav://localhost:" + std::to_string(server.Port()) + "/", true);
    EXPECT_EQ(answer.code, VFS_ERR_FAILED) << answer;
    EXPECT_TRUE(answer.Logged("Failed to save cert " + File(server))) << answer;
}

TEST_F(SslPeer, DownloadNeedsUrlAndPath) {
    EXPECT_FALSE(Utils::DownloadCert(nullptr, nullptr, nullptr, "/tmp/x"));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    ResetError();
    EXPECT_FALSE(Utils::DownloadCert(nullptr, nullptr, "https://localhost/", nullptr));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
}

TEST_F(SslPeer, AHostNameBeyondTheFileSystemsLimitFails) {
    const Answer answer = Ask("davs://" + std::string(5000, 'h') + "/", true);
    EXPECT_TRUE(answer.finished && !answer.ok) << answer.code;
    EXPECT_NE(answer.code, VFS_ERR_NONE);
}

}  // namespace
}  // namespace ZYROVFS
