// Trust of a server through the shipped library: what a user sees from the first question to the
// renewal of the certificate, one CGI program after the other.
#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>

#include "support/machine.h"
#include "support/tls_server.h"
#include "zyrovfs/zyrovfs_netdrive.h"

namespace {

using namespace ZYROVFS;
namespace fs = std::filesystem;

constexpr const char* kBundle = "/etc/ssl/certs/ca-certificates.crt";
constexpr int kTrusted = 0;

class SslTrust : public testing::Test {
  protected:
    void SetUp() override {
        setenv("ZYROVFS_UID", "4001", 1);
        fs::remove_all("/usr/zyro/etc/zyrovfs/4001");
        fs::create_directories("/usr/zyro/etc/zyrovfs/4001");
    }

    /** 0, or the failure code, of one question in a process of its own. */
    static int Ask(const tls::TlsServer& server, bool force = false) {
        const std::string url = "davs://localhost:" + std::to_string(server.Port()) + "/dav";
        return machine::InProcess([&] {
            return Utils::SSLVerifyPeer("amy", "secret", url.c_str(), force) ? kTrusted
                                                                             : int{GetError()};
        });
    }
    static std::string File(const tls::TlsServer& server) {
        return "/usr/zyro/etc/zyrovfs/4001/ssl/localhost:" + std::to_string(server.Port());
    }
};

TEST_F(SslTrust, TheUserDecidesAboutACertificateAndAgainAboutItsRenewal) {
    tls::TlsServer server(tls::Make({}));
    EXPECT_EQ(Ask(server), VFS_ERR_CERT_UNTRUSTED);
    EXPECT_EQ(Ask(server, true), kTrusted);
    EXPECT_EQ(Ask(server), kTrusted);
    server.Restart(tls::Make({}));
    EXPECT_EQ(Ask(server), VFS_ERR_CERT_UNTRUSTED);
    EXPECT_FALSE(fs::exists(File(server)));
    EXPECT_EQ(Ask(server), VFS_ERR_CERT_UNTRUSTED) << "asking again is no decision";
    EXPECT_EQ(Ask(server, true), kTrusted);
    EXPECT_EQ(Ask(server), kTrusted);
}

TEST_F(SslTrust, AnAuthorityAddedToTheBundleIsTrustedFromThenOn) {
    const tls::Identity authority = tls::MakeAuthority("Office CA");
    const tls::TlsServer server(tls::Make({}, &authority));
    EXPECT_EQ(Ask(server), VFS_ERR_CERT_UNTRUSTED);
    std::ofstream(kBundle, std::ios::app) << authority.certificate;
    EXPECT_EQ(Ask(server), kTrusted);
    EXPECT_EQ(fs::read_symlink(File(server)), kBundle);
    const std::string bundle = machine::Read(kBundle);
    EXPECT_EQ(Ask(server, true), kTrusted);
    EXPECT_EQ(machine::Read(kBundle), bundle) << "the copy must not be written through the link";
    EXPECT_FALSE(fs::is_symlink(File(server)));
}

TEST_F(SslTrust, TheDetailTellsWhatTheUserHasToDecideAbout) {
    tls::CertSpec spec;
    spec.common_names = {"nas.example"};
    const tls::TlsServer server(tls::Make(spec));
    const std::string url = "davs://localhost:" + std::to_string(server.Port()) + "/";
    const int told = machine::InProcess([&] {
        Json::Value detail;
        const bool trusted = Utils::SSLVerifyPeer(nullptr, nullptr, url.c_str(), false);
        VFSGetJson(detail);
        return !trusted && detail["subject"] == "nas.example" &&
                       detail["issuer"] == "nas.example" && detail["availDate"].isInt64() &&
                       detail["expDate"].isInt64()
                   ? 0
                   : 1;
    });
    EXPECT_EQ(told, 0);
}

}  // namespace
