// Trust of a server as a mount asks for it: saved copies and links.
#include <gmock/gmock.h>

#include "unit/mount/ssl_fixture.h"

namespace ZYROVFS {
namespace {

using testing::IsEmpty;

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
    EXPECT_EQ(answer.code, VFS_ERR_NONE);
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

TEST_F(SslPeer, AfterTheBundleWasAskedASavedCopyStillCountsInThisProcess) {
    const tls::TlsServer known(signed_);
    const tls::TlsServer saved(own_);
    EXPECT_TRUE(Force(Davs(saved)).ok);
    const Answer answer = fresh::Ask([&] {
        return Utils::SSLVerifyPeer(nullptr, nullptr, Davs(known).c_str(), false) &&
               Utils::SSLVerifyPeer(nullptr, nullptr, Davs(saved).c_str(), false);
    });
    EXPECT_TRUE(answer.ok) << answer;
    EXPECT_EQ(ReadFile(File(saved)), own_.certificate);
}

}  // namespace
}  // namespace ZYROVFS
