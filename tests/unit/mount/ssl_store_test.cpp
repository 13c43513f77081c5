// Trust of a server as a mount asks for it: the user's folder, saved copies and links.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <grp.h>
#include <gtest/gtest.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <sstream>

#include "core/error_cell.h"
#include "core/handle.h"
#include "core/paths.h"
#include "support/fresh_process.h"
#include "support/seams.h"
#include "support/tls_server.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {
namespace {

namespace fs = std::filesystem;
using fresh::Answer;
using testing::HasSubstr;
using testing::IsEmpty;

constexpr uid_t kAmy = 4567;

const tls::Identity& Authority() {
    static const tls::Identity authority = tls::MakeAuthority("Test CA");
    return authority;
}

std::string ReadFile(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    std::stringstream text;
    text << file.rdbuf();
    return text.str();
}

std::string Target(const std::string& link) {
    return fs::is_symlink(link) ? fs::read_symlink(link).string() : "no link";
}

/** One certificate as PEM, without what stands behind it. */
std::string First(const std::string& pem) {
    const std::string end = "-----END CERTIFICATE-----\n";
    return pem.substr(0, pem.find(end) + end.size());
}

std::string Davs(const tls::TlsServer& server, const std::string& path = "/dav/") {
    return "davs://localhost:" + std::to_string(server.Port()) + path;
}

/** SSLVerifyPeer as one CGI program after the other calls it. */
Answer Ask(const std::string& url, bool force = false, const char* user = nullptr,
           const char* password = nullptr) {
    return fresh::Ask([&] { return Utils::SSLVerifyPeer(user, password, url.c_str(), force); });
}
Answer Force(const std::string& url) {
    return Ask(url, true);
}

class SslPeer : public testing::Test {
  protected:
    void SetUp() override {
        setenv("ZYROVFS_UID", std::to_string(kAmy).c_str(), 1);
        std::ofstream(paths::kCaBundle) << Authority().certificate;
        fs::remove_all(parent_);
        fs::create_directories(parent_);
        chmod(parent_.c_str(), 0777);
        ResetError();
        VFSSetJson(Json::Value());
    }

    std::string File(int port) const { return folder_ + "/localhost:" + std::to_string(port); }
    std::string File(const tls::TlsServer& server) const { return File(server.Port()); }

    /** Puts `text` where the server's saved certificate lies. */
    void Save(const tls::TlsServer& server, const std::string& text) const {
        fs::create_directories(folder_);
        std::ofstream(File(server), std::ios::binary) << text;
    }

    std::vector<std::string> Names() const {
        std::vector<std::string> names;
        for (const auto& entry : fs::directory_iterator(folder_)) {
            names.push_back(entry.path().filename());
        }
        return names;
    }

    const std::string parent_ = paths::UserConfigDir(kAmy);
    const std::string folder_ = paths::SslDir(kAmy);
    const tls::Identity own_ = tls::Make({});
    const tls::Identity signed_ = tls::Make({}, &Authority());
};

// --- trusted by the bundle --------------------------------------------------------------------

TEST_F(SslPeer, TrustedByTheBundleIsRecordedAsALink) {
    const tls::TlsServer server(signed_);
    const Answer answer = Ask(Davs(server));
    EXPECT_TRUE(answer.ok) << answer;
    EXPECT_EQ(Target(File(server)), paths::kCaBundle);
    EXPECT_THAT(answer.log, IsEmpty());
}

TEST_F(SslPeer, TheFolderBelongsToTheUserAndTheRootGroup) {
    const tls::TlsServer server(signed_);
    EXPECT_TRUE(Ask(Davs(server)).ok);
    struct stat info {};
    ASSERT_EQ(stat(folder_.c_str(), &info), 0);
    EXPECT_EQ(info.st_mode & 07777, 0700U);
    EXPECT_EQ(info.st_uid, kAmy);
    EXPECT_EQ(info.st_gid, 0U);
}

TEST_F(SslPeer, TheLinkIsGoodForTheNextTime) {
    const tls::TlsServer server(signed_);
    EXPECT_TRUE(Ask(Davs(server)).ok);
    EXPECT_TRUE(Ask(Davs(server)).ok);
    EXPECT_EQ(Target(File(server)), paths::kCaBundle);
    EXPECT_EQ(server.Requests().size(), 2U);
}

TEST_F(SslPeer, ALinkedHostThatTurnsUntrustedLosesItsLink) {
    tls::TlsServer server(signed_);
    EXPECT_TRUE(Ask(Davs(server)).ok);
    server.Restart(own_);
    const Answer answer = Ask(Davs(server));
    EXPECT_EQ(answer.code, VFS_ERR_CERT_UNTRUSTED) << answer;
    EXPECT_THAT(Names(), IsEmpty());
    EXPECT_EQ(ReadFile(paths::kCaBundle), Authority().certificate);
}

TEST_F(SslPeer, ALinkThatLeadsNowhereIsReplaced) {
    const tls::TlsServer server(signed_);
    fs::create_directories(folder_);
    fs::create_symlink("/none/at/all", File(server));
    const Answer answer = Ask(Davs(server));
    EXPECT_TRUE(answer.ok) << answer;
    EXPECT_EQ(Target(File(server)), paths::kCaBundle);
}

// --- not trusted ------------------------------------------------------------------------------

TEST_F(SslPeer, AnUntrustedCertificateComesBackWithItsDataAndLeavesNoFile) {
    tls::CertSpec expired;
    expired.starts = -7200;
    expired.ends = -3600;
    tls::CertSpec elsewhere;
    elsewhere.dns_names = {"other.example"};
    const std::map<std::string, tls::Identity> rows = {
        {"signed by itself", own_},
        {"expired", tls::Make(expired, &Authority())},
        {"for another host", tls::Make(elsewhere, &Authority())},
    };
    for (const auto& [label, identity] : rows) {
        const tls::TlsServer server(identity);
        const Answer answer = Ask(Davs(server));
        EXPECT_FALSE(answer.ok) << label;
        EXPECT_EQ(answer.code, VFS_ERR_CERT_UNTRUSTED) << label << answer;
        EXPECT_EQ(answer.detail.getMemberNames(),
                  (std::vector<std::string>{"availDate", "expDate", "issuer", "subject"}))
            << label;
        EXPECT_EQ(answer.detail["subject"], "localhost") << label;
        EXPECT_THAT(Names(), IsEmpty()) << label;
    }
}

// --- saved copies -----------------------------------------------------------------------------

TEST_F(SslPeer, ForceSavesTheCertificateAndItIsAcceptedByFingerprint) {
    const tls::TlsServer server(own_);
    const Answer forced = Force(Davs(server));
    EXPECT_TRUE(forced.ok) << forced;
    EXPECT_EQ(ReadFile(File(server)), own_.certificate);
    EXPECT_FALSE(fs::is_symlink(File(server)));
    const Answer answer = Ask(Davs(server));
    EXPECT_TRUE(answer.ok) << answer;
    EXPECT_EQ(Names().size(), 1U);
}

TEST_F(SslPeer, ForceInTheProcessThatAsked) {
    const tls::TlsServer server(own_);
    EXPECT_TRUE(Utils::SSLVerifyPeer("amy", "secret", Davs(server).c_str(), true));
    EXPECT_TRUE(Utils::SSLVerifyPeer("amy", "secret", Davs(server).c_str(), false));
    EXPECT_EQ(ReadFile(File(server)), own_.certificate);
}

TEST_F(SslPeer, TheSavedFileIsReadableWhateverTheUmask) {
    const tls::TlsServer server(own_);
    const mode_t mask = umask(077);
    EXPECT_TRUE(Force(Davs(server)).ok);
    umask(mask);
    struct stat info {};
    ASSERT_EQ(stat(File(server).c_str(), &info), 0);
    EXPECT_EQ(info.st_mode & 07777, 0644U);
}

TEST_F(SslPeer, ARenewedCertificateRemovesTheSavedCopyAndComesBackWithItsData) {
    tls::TlsServer server(own_);
    EXPECT_TRUE(Force(Davs(server)).ok);
    tls::CertSpec renewed;
    renewed.common_names = {"renewed.example"};
    server.Restart(tls::Make(renewed));
    const Answer answer = Ask(Davs(server));
    EXPECT_FALSE(answer.ok);
    EXPECT_EQ(answer.code, VFS_ERR_CERT_UNTRUSTED) << answer;
    EXPECT_EQ(answer.detail["subject"], "renewed.example");
    EXPECT_EQ(answer.detail["issuer"], "renewed.example");
    EXPECT_TRUE(answer.detail["availDate"].isInt64());
    EXPECT_TRUE(answer.detail["expDate"].isInt64());
    EXPECT_THAT(Names(), IsEmpty());
    EXPECT_TRUE(Force(Davs(server)).ok) << "the user says yes";
    EXPECT_TRUE(Ask(Davs(server)).ok);
}

TEST_F(SslPeer, ARenewedCertificateOfAKnownAuthorityTurnsTheCopyIntoALink) {
    tls::TlsServer server(own_);
    EXPECT_TRUE(Force(Davs(server)).ok);
    server.Restart(signed_);
    const Answer answer = Ask(Davs(server));
    EXPECT_TRUE(answer.ok) << answer;
    EXPECT_EQ(Target(File(server)), paths::kCaBundle);
}

TEST_F(SslPeer, ForceSavesTheServersOwnCertificateOutOfAChain) {
    const tls::Identity upper = tls::MakeAuthority("Upper", &Authority());
    const tls::Identity lower = tls::MakeAuthority("Lower", &upper);
    const tls::Identity chained = tls::Make({}, &lower);
    const tls::TlsServer server(chained);
    std::ofstream(paths::kCaBundle) << tls::MakeAuthority("Another").certificate;
    EXPECT_TRUE(Force(Davs(server)).ok);
    EXPECT_EQ(ReadFile(File(server)), First(chained.certificate));
    EXPECT_TRUE(Ask(Davs(server)).ok);
}

TEST_F(SslPeer, ForceSavesWhatIsWrongWithACertificateToo) {
    tls::CertSpec spec;
    spec.starts = -7200;
    spec.ends = -3600;
    spec.dns_names = {"other.example"};
    spec.common_names = {std::string(1100, 'n'), std::string("a\0b", 3)};
    const tls::TlsServer server(tls::Make(spec));
    EXPECT_TRUE(Force(Davs(server)).ok);
    EXPECT_TRUE(Ask(Davs(server)).ok);
}

TEST_F(SslPeer, ForceReplacesTheLinkAndLeavesTheBundleAlone) {
    tls::TlsServer server(signed_);
    EXPECT_TRUE(Ask(Davs(server)).ok);
    server.Restart(own_);
    EXPECT_TRUE(Force(Davs(server)).ok);
    EXPECT_FALSE(fs::is_symlink(File(server)));
    EXPECT_EQ(ReadFile(File(server)), own_.certificate);
    EXPECT_EQ(ReadFile(paths::kCaBundle), Authority().certificate);
    EXPECT_TRUE(Ask(Davs(server)).ok);
}

TEST_F(SslPeer, ForceDoesNotWriteThroughAUsersLink) {
    const tls::TlsServer server(own_);
    const std::string victim = testing::TempDir() + "shadow";
    std::ofstream(victim) << "root:*:";
    fs::create_directories(folder_);
    fs::create_symlink(victim, File(server));
    EXPECT_TRUE(Force(Davs(server)).ok);
    EXPECT_EQ(ReadFile(victim), "root:*:");
    EXPECT_FALSE(fs::is_symlink(File(server)));
}

TEST_F(SslPeer, ForceKeepsTheOldFileWhenTheServerIsGone) {
    tls::ServerOptions options;
    options.manner = tls::Manner::kCloseAtOnce;
    options.identity = own_;
    const tls::TlsServer server(options);
    Save(server, "kept");
    const Answer answer = Force(Davs(server));
    EXPECT_EQ(answer.code, VFS_ERR_HOST_UNREACHABLE) << answer;
    EXPECT_TRUE(answer.Logged("Failed to download cert https://localhost:")) << answer;
    EXPECT_EQ(ReadFile(File(server)), "kept");
}

TEST_F(SslPeer, SavedFilesThatAreNoCertificateGoAndTheBundleDecides) {
    const tls::TlsServer good(signed_);
    const tls::TlsServer bad(own_);
    for (const std::string& text : {std::string(), std::string("garbage\n"),
                                    std::string("-----BEGIN CERTIFICATE-----\nAA==\n")}) {
        Save(good, text);
        EXPECT_TRUE(Ask(Davs(good)).ok);
        EXPECT_EQ(Target(File(good)), paths::kCaBundle);
        fs::remove(File(good));
        Save(bad, text);
        const Answer answer = Ask(Davs(bad));
        EXPECT_EQ(answer.code, VFS_ERR_CERT_UNTRUSTED) << answer;
        EXPECT_THAT(Names(), IsEmpty());
    }
}

TEST_F(SslPeer, AFifoInTheFilesPlaceIsNotWaitedFor) {
    const tls::TlsServer server(own_);
    fs::create_directories(folder_);
    ASSERT_EQ(mkfifo(File(server).c_str(), 0600), 0);
    EXPECT_EQ(Ask(Davs(server)).code, VFS_ERR_CERT_UNTRUSTED);
    EXPECT_TRUE(Force(Davs(server)).ok);
    EXPECT_TRUE(fs::is_regular_file(File(server)));
}

TEST_F(SslPeer, AfterTheBundleWasAskedASavedCopyNoLongerCountsInThisProcess) {
    const tls::TlsServer known(signed_);
    const tls::TlsServer saved(own_);
    EXPECT_TRUE(Force(Davs(saved)).ok);
    const Answer answer = fresh::Ask([&] {
        return Utils::SSLVerifyPeer(nullptr, nullptr, Davs(known).c_str(), false) &&
               Utils::SSLVerifyPeer(nullptr, nullptr, Davs(saved).c_str(), false);
    });
    EXPECT_EQ(answer.code, VFS_ERR_CERT_UNTRUSTED) << answer;
    EXPECT_FALSE(fs::exists(File(saved)));
}

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

TEST_F(SslPeer, AWrongPasswordKeepsTheSavedCopy) {
    tls::ServerOptions options;
    options.identity = own_;
    options.answer = [](const tls::Request& request) {
        const auto sent = request.headers.find("authorization");
        const bool right =
            sent != request.headers.end() && sent->second == tls::Basic("amy", "right");
        return tls::Response{right ? 200 : 401, {}, ""};
    };
    const tls::TlsServer server(options);
    EXPECT_TRUE(Ask(Davs(server), true, "amy", "right").ok);
    const Answer answer = Ask(Davs(server), false, "amy", "wrong");
    EXPECT_EQ(answer.code, VFS_ERR_FAILED) << answer;
    EXPECT_EQ(ReadFile(File(server)), own_.certificate);
    EXPECT_TRUE(Ask(Davs(server), false, "amy", "right").ok);
}

TEST_F(SslPeer, ForceWithAWrongPasswordFailsButTheCertificateIsSaved) {
    tls::ServerOptions options;
    options.identity = own_;
    options.answer = [](const tls::Request&) { return tls::Response{401, {}, ""}; };
    const tls::TlsServer server(options);
    const Answer answer = Ask(Davs(server), true, "amy", "wrong");
    EXPECT_EQ(answer.code, VFS_ERR_FAILED) << answer;
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

TEST_F(SslPeer, WithoutTheUsersFolderTheOneForCertificatesIsNotMade) {
    fs::remove_all(parent_);
    const Answer answer = Ask("davs://localhost:1/");
    EXPECT_EQ(answer.code, VFS_ERR_FAILED) << answer;
    EXPECT_TRUE(answer.Logged("Failed to create ssl folder " + folder_)) << answer;
    EXPECT_FALSE(fs::exists(parent_));
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
