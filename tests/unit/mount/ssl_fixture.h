/** What the tests of certificates share: an authority, saved files, questions in fresh processes.
 */
#ifndef ZYROVFS_TESTS_SSL_FIXTURE_H
#define ZYROVFS_TESTS_SSL_FIXTURE_H

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

#include "core/paths.h"
#include "support/fresh_process.h"
#include "support/tls_server.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {

namespace fs = std::filesystem;
using fresh::Answer;

constexpr uid_t kAmy = 4567;

inline const tls::Identity& Authority() {
    static const tls::Identity authority = tls::MakeAuthority("Test CA");
    return authority;
}

/** The CA bundle of this private host knows the test authority and nobody else. */
inline void TrustAuthority() {
    std::ofstream(paths::kCaBundle) << Authority().certificate;
}

inline std::string WriteFile(const std::string& name, const std::string& text) {
    const std::string path = testing::TempDir() + name;
    unlink(path.c_str());
    std::ofstream(path, std::ios::binary) << text;
    return path;
}

/** VerifyCert in a process that has not asked before. */
inline Answer Verify(const std::string& url, const std::string& file, const char* user = nullptr,
                     const char* password = nullptr) {
    return fresh::Ask([&] { return Utils::VerifyCert(user, password, url.c_str(), file.c_str()); });
}

inline std::string ReadFile(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    std::stringstream text;
    text << file.rdbuf();
    return text.str();
}

inline std::string Target(const std::string& link) {
    return fs::is_symlink(link) ? fs::read_symlink(link).string() : "no link";
}

/** One certificate as PEM, without what stands behind it. */
inline std::string First(const std::string& pem) {
    const std::string end = "-----END CERTIFICATE-----\n";
    return pem.substr(0, pem.find(end) + end.size());
}

inline std::string Davs(const tls::TlsServer& server, const std::string& path = "/dav/") {
    return "davs://localhost:" + std::to_string(server.Port()) + path;
}

/** SSLVerifyPeer as one CGI program after the other calls it. */
inline Answer Ask(const std::string& url, bool force = false, const char* user = nullptr,
                  const char* password = nullptr) {
    return fresh::Ask([&] { return Utils::SSLVerifyPeer(user, password, url.c_str(), force); });
}
inline Answer Force(const std::string& url) {
    return Ask(url, true);
}

class SslPeer : public testing::Test {
  protected:
    void SetUp() override {
        setenv("ZYROVFS_UID", std::to_string(kAmy).c_str(), 1);
        TrustAuthority();
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

}  // namespace ZYROVFS

#endif
