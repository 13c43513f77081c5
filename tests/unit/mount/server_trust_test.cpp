#include "mount/server_trust.h"

#include <gmock/gmock.h>

#include "unit/mount/ssl_fixture.h"

namespace ZYROVFS {
namespace {

std::string NameOf(const std::string& url) {
    std::string name = "untouched";
    return ServerFileName(url, name) ? name : "none";
}

TEST(ServerFileName, IsHostAndPortTheSameForAllWhoAsk) {
    EXPECT_EQ(NameOf("davs://nas.example:5006/dav"), "nas.example:5006");
    EXPECT_EQ(NameOf("https://nas.example/"), "nas.example:443");
    EXPECT_EQ(NameOf("davs://nas.example/"), "nas.example:443");
    EXPECT_EQ(NameOf("dav://nas.example/"), "nas.example:80");
    EXPECT_EQ(NameOf("DAVS://amy@nas.example/"), "nas.example:443");
}

TEST(ServerFileName, OfAnIpv6AddressHasNoBrackets) {
    EXPECT_EQ(NameOf("davs://[::1]:8443/dav"), "::1:8443");
    EXPECT_EQ(NameOf("https://[fd00::17]/"), "fd00::17:443");
}

TEST(ServerFileName, DoesNotLeadOutOfTheFolder) {
    EXPECT_EQ(NameOf("davs://..%2f..%2fx/"), "none");
    EXPECT_EQ(NameOf("nonsense"), "none");
}

using Saved = SslPeer;

TEST_F(Saved, NothingIsUndecided) {
    const ServerTrust trust = TrustOfServer(kAmy, "nas.example:443");
    EXPECT_EQ(trust.kind, ServerTrust::kUndecided);
    EXPECT_EQ(trust.file, folder_ + "/nas.example:443");
    EXPECT_EQ(trust.certificate, "");
}

TEST_F(Saved, CopyIsAPinAndALinkIsTheBundle) {
    fs::create_directories(folder_);
    std::ofstream(folder_ + "/one:443") << own_.certificate;
    fs::create_symlink(paths::kCaBundle, folder_ + "/two:443");
    EXPECT_EQ(TrustOfServer(kAmy, "one:443").kind, ServerTrust::kPinned);
    EXPECT_EQ(TrustOfServer(kAmy, "one:443").certificate, own_.certificate);
    EXPECT_EQ(TrustOfServer(kAmy, "two:443").kind, ServerTrust::kBundle);
}

TEST_F(Saved, CopyOfAnotherUserIsNone) {
    fs::create_directories(folder_);
    std::ofstream(folder_ + "/one:443") << own_.certificate;
    EXPECT_EQ(TrustOfServer(kAmy + 1, "one:443").kind, ServerTrust::kUndecided);
}

/** A server on ::1, and the two names that its file may have. */
class SavedIpv6 : public SslPeer {
  protected:
    SavedIpv6() : server_(Options()) {}

    tls::ServerOptions Options() const {
        tls::ServerOptions options;
        options.identity = own_;
        options.ipv6 = true;
        return options;
    }
    void SetUp() override {
        SslPeer::SetUp();
        fs::create_directories(folder_);
    }
    std::string Name(const std::string& host = "::1") const {
        return host + ":" + std::to_string(server_.Port());
    }
    std::string Davs() const { return "davs://" + Name("[::1]") + "/dav"; }

    tls::TlsServer server_;
};

TEST_F(SavedIpv6, IsWrittenUnderOneName) {
    EXPECT_TRUE(Force(Davs()).ok);
    EXPECT_THAT(Names(), testing::ElementsAre(Name()));
    EXPECT_TRUE(Ask(Davs()).ok);
}

TEST_F(SavedIpv6, IsFoundUnderTheNameInBracketsToo) {
    std::ofstream(folder_ + "/" + Name("[::1]")) << own_.certificate;
    EXPECT_TRUE(Ask(Davs()).ok);
    EXPECT_EQ(TrustOfServer(kAmy, Name()).certificate, own_.certificate);
}

TEST_F(SavedIpv6, TheOneNameComesFirst) {
    std::ofstream(folder_ + "/" + Name("[::1]")) << own_.certificate;
    std::ofstream(folder_ + "/" + Name()) << signed_.certificate;
    EXPECT_EQ(TrustOfServer(kAmy, Name()).certificate, signed_.certificate);
}

TEST_F(SavedIpv6, ThatNoLongerFitsGoesUnderBothNames) {
    std::ofstream(folder_ + "/" + Name("[::1]")) << own_.certificate;
    std::ofstream(folder_ + "/" + Name()) << signed_.certificate;
    EXPECT_EQ(Ask(Davs()).code, VFS_ERR_CERT_UNTRUSTED);
    EXPECT_THAT(Names(), testing::IsEmpty());
}

}  // namespace
}  // namespace ZYROVFS
