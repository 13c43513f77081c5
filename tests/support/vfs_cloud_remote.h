/** What integration tests of transfers with a user's own servers share. */
#ifndef ZYROVFS_TESTS_VFS_CLOUD_REMOTE_H
#define ZYROVFS_TESTS_VFS_CLOUD_REMOTE_H

#include <fcntl.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <memory>
#include <random>
#include <string>

#include "support/machine.h"
#include "zyrovfs/zyrovfs_netdrive.h"

namespace remote_side {

using ZYROCloud::Cloud;
using namespace ZYROVFS;  // NOLINT(google-build-using-namespace)

inline constexpr unsigned kAmy = 4001;
inline constexpr const char* kPassword = "first-secret";
inline const std::string kRemote = "/srv/remote/";

/** Bytes without a pattern, the same for each run. */
inline std::string Noise(size_t size, unsigned seed = 1) {
    std::mt19937 random(seed);
    std::string bytes(size, '\0');
    for (char& byte : bytes) {
        byte = static_cast<char>(random());
    }
    return bytes;
}

inline void PutFile(const std::string& path, const std::string& bytes) {
    std::ofstream(path, std::ios::binary) << bytes;
    std::filesystem::permissions(path, std::filesystem::perms(0644));
}

/** A local file that a transfer reads or writes through its descriptor. */
class LocalFile {
  public:
    explicit LocalFile(const std::string& bytes = "")
        : fd_(open(kPath, O_RDWR | O_CREAT | O_TRUNC, 0600)) {
        EXPECT_EQ(write(fd_, bytes.data(), bytes.size()), static_cast<ssize_t>(bytes.size()));
        lseek(fd_, 0, SEEK_SET);
    }
    LocalFile(const LocalFile&) = delete;
    LocalFile& operator=(const LocalFile&) = delete;
    ~LocalFile() { close(fd_); }
    int Fd() const { return fd_; }
    static std::string Bytes() { return machine::Read(kPath); }

  private:
    static constexpr const char* kPath = "/tmp/local-file";
    int fd_;
};

struct Location {
    const char* protocol;
    const char* host;
    unsigned port;
    const char* uri_path;
    __tag_vfs_err_ wrong_password;
};

inline std::ostream& operator<<(std::ostream& out, const Location& l) {
    return out << l.protocol;
}

// An ssh server has no status that would tell a refused password from another failure.
inline constexpr Location kFtp = {"ftp", "127.0.0.1", 2121, "", VFS_ERR_PERMISSION_DENIED};
inline constexpr Location kDav = {"dav", "127.0.0.1", 8080, "", VFS_ERR_PERMISSION_DENIED};
inline constexpr Location kDavs = {"davs", "localhost", 8443, "", VFS_ERR_PERMISSION_DENIED};
inline constexpr Location kSftp = {"sftp", "127.0.0.1", 2222, "srv/remote", VFS_ERR_UNKNOWN};

inline std::string Connect(const Location& l, const std::string& account = "remo") {
    Json::Value profile;
    profile["protocol"] = l.protocol;
    profile["hostname"] = l.host;
    profile["port"] = l.port;
    profile["alias"] = std::string("My ") + l.protocol;
    profile["account"] = account;
    profile["password"] = kPassword;
    profile["codepage"] = "UTF-8";
    profile["uri_path"] = l.uri_path;
    std::string id;
    Json::Value stored;
    EXPECT_TRUE(Server::Add(kAmy, Server::VFS_CONFIG_CONNECT, id, profile, false, stored))
        << GetErrorName(GetError());
    return id;
}

/** The driver of a connection. */
class ConnectionTest : public testing::TestWithParam<Location> {
  protected:
    void SetUp() override {
        machine::Remote(std::string("password ") + kPassword);
        id_ = Connect(GetParam());
        Open();
    }
    void TearDown() override {
        Server::Delete(kAmy, Server::VFS_CONFIG_CONNECT, id_.c_str());
        machine::Must("rm -rf /srv/remote/new");
    }

    /** A driver as the connection stands now. */
    void Open() {
        cloud_.reset(
            ZYROCloud::Utils::CreateCloudByURI(kAmy, id_ + "/any", Server::VFS_CONFIG_CONNECT));
        ASSERT_NE(cloud_, nullptr);
        ASSERT_EQ(cloud_->GetCloudType(), ZYROCloud::CLOUD_TYPE_VFS);
    }
    bool Upload(const std::string& name, const std::string& bytes) {
        const LocalFile file(bytes);
        return Cloud::UploadFile(cloud_.get(), id_ + "/" + name, file.Fd(),
                                 static_cast<long long>(bytes.size()), nullptr, nullptr, nullptr);
    }
    bool Download(const std::string& name, long long size) {
        const LocalFile file;
        return Cloud::DownloadFile(cloud_.get(), id_ + "/" + name, file.Fd(), size, nullptr,
                                   nullptr, nullptr);
    }
    std::string Cause() const { return cloud_->GetError().toStyledString(); }

    std::string id_;
    std::unique_ptr<Cloud> cloud_;
};

}  // namespace remote_side

#endif
