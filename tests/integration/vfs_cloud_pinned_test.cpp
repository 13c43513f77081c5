// Transfers with a davs server whose certificate nobody but this user trusts.
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>

#include "support/tls_server.h"
#include "support/vfs_cloud_remote.h"

namespace {

using namespace remote_side;
using machine::InProcess;
using machine::Must;
namespace fs = std::filesystem;

constexpr const char* kConnection = "davs://remo@localhost:8443";
constexpr int kDone = 0;
constexpr int kRefused = 1;

class PinnedCertificate : public testing::Test {
  protected:
    static void SetUpTestSuite() {
        setenv("ZYROVFS_UID", "4001", 1);
        machine::AddUser("amy", kAmy);
        machine::Remote(std::string("start ") + kPassword);
        ASSERT_EQ(InProcess([] { return Connect(kDavs) == kConnection ? kDone : kRefused; }),
                  kDone);
    }
    void SetUp() override {
        Must("rm -rf /usr/zyro/etc/zyrovfs/4001/ssl");
        SelfSign();
    }

    static void SelfSign() {
        Must(
            "cd /srv/tls && openssl req -x509 -newkey ec -pkeyopt ec_paramgen_curve:P-256 -nodes"
            " -days 2 -subj /CN=localhost -keyout self.key -out self.crt 2>/dev/null &&"
            " cat self.key self.crt >server.pem");
        machine::Remote("restart dav");
    }
    static int Trust() {
        return InProcess([] {
            return Utils::SSLVerifyPeer("remo", kPassword, "davs://localhost:8443/", true)
                       ? kDone
                       : kRefused;
        });
    }
    /** A transfer of a program of its own. */
    static int With(const std::function<bool(Cloud* cloud)>& transfer) {
        return InProcess([&] {
            Cloud::InitCurlGlobal();
            const std::unique_ptr<Cloud> cloud(
                ZYROCloud::Utils::CreateCloudByURI(kAmy, kConnection, Server::VFS_CONFIG_CONNECT));
            return cloud != nullptr && transfer(cloud.get()) ? kDone : kRefused;
        });
    }
    static int Upload(const std::string& name, const std::string& bytes) {
        return With([&](Cloud* cloud) {
            const LocalFile file(bytes);
            return Cloud::UploadFile(cloud, std::string(kConnection) + "/" + name, file.Fd(),
                                     static_cast<long long>(bytes.size()), nullptr, nullptr,
                                     nullptr);
        });
    }
    static int Download(const std::string& name, size_t size) {
        return With([&](Cloud* cloud) {
            const LocalFile file;
            return Cloud::DownloadFile(cloud, std::string(kConnection) + "/" + name, file.Fd(),
                                       static_cast<long long>(size), nullptr, nullptr, nullptr);
        });
    }
};

TEST_F(PinnedCertificate, ThatNobodyTrustsGetsAndGivesNothing) {
    PutFile(kRemote + "secret.txt", "secret");
    EXPECT_EQ(Download("secret.txt", 6), kRefused);
    EXPECT_EQ(LocalFile::Bytes(), "");
    EXPECT_EQ(Upload("new.txt", "secret"), kRefused);
    EXPECT_FALSE(fs::exists(kRemote + "new.txt"));
}

TEST_F(PinnedCertificate, ThatTheUserTrustsIsEnoughUntilItIsRenewed) {
    ASSERT_EQ(Trust(), kDone);
    const std::string bytes = Noise(100000, 5);
    ASSERT_EQ(Upload("pinned.bin", bytes), kDone);
    EXPECT_TRUE(machine::Read(kRemote + "pinned.bin") == bytes);
    ASSERT_EQ(Download("pinned.bin", bytes.size()), kDone);
    EXPECT_TRUE(LocalFile::Bytes() == bytes);
    SelfSign();
    EXPECT_EQ(Download("pinned.bin", bytes.size()), kRefused);
    EXPECT_EQ(LocalFile::Bytes(), "");
}

/** Another server, which the bundle knows. */
tls::Identity Office(tls::Identity& authority) {
    authority = tls::MakeAuthority("Office CA");
    std::ofstream("/etc/ssl/certs/ca-certificates.crt", std::ios::app) << authority.certificate;
    return tls::Make({}, &authority);
}

TEST_F(PinnedCertificate, IsStillTheOneThatCountsBehindACheckByTheBundle) {
    ASSERT_EQ(Trust(), kDone);
    const std::string bytes = Noise(1000, 6);
    tls::Identity authority;
    const tls::TlsServer other(Office(authority));
    const std::string url = "davs://localhost:" + std::to_string(other.Port()) + "/";
    const auto behind_the_check = [&](Cloud* cloud) {
        const LocalFile file(bytes);
        return Utils::SSLVerifyPeer(nullptr, nullptr, url.c_str(), false) &&
               Cloud::UploadFile(cloud, std::string(kConnection) + "/behind.bin", file.Fd(),
                                 static_cast<long long>(bytes.size()), nullptr, nullptr, nullptr);
    };
    EXPECT_EQ(With(behind_the_check), kDone);
    EXPECT_TRUE(machine::Read(kRemote + "behind.bin") == bytes);
    // Now somebody else answers, with a certificate of that authority.
    const tls::Identity impostor = tls::Make({}, &authority);
    std::ofstream("/srv/tls/server.pem") << impostor.key << impostor.certificate;
    machine::Remote("restart dav");
    fs::remove(kRemote + "behind.bin");
    EXPECT_EQ(With(behind_the_check), kRefused);
    EXPECT_FALSE(fs::exists(kRemote + "behind.bin"));
}

}  // namespace
