/**
 * A OneDrive driver before a server that says what a test wrote down. The driver keeps its
 * connections, so that one script serves all requests to one host name, in their order; a request
 * for a token comes on a connection of its own. Tokens and secrets must not reach the log.
 */
#ifndef ZYROVFS_TESTS_ONEDRIVE_FIXTURE_H
#define ZYROVFS_TESTS_ONEDRIVE_FIXTURE_H

#include <gmock/gmock.h>
#include <sys/mman.h>
#include <unistd.h>
#include <zosplatform/error.h>

#include <memory>
#include <string>
#include <vector>

#include "cloud/onedrive/onedrive.h"
#include "core/handle.h"
#include "support/cloudsim/onedrive.h"
#include "support/driver_fixture.h"
#include "support/wire_server.h"

namespace ZYROCloud {

using testing::Not;
using testing::SizeIs;
using wire::Answer;

inline constexpr const char* kServerId = "onedrive://amy@example.com";
inline constexpr long long kMiB = 1048576;

/** A script that gives these answers, each to a whole request. */
inline wire::Script Answering(const std::vector<std::string>& answers) {
    wire::Script script;
    for (const std::string& answer : answers) {
        script.push_back(wire::ReadRequest());
        script.push_back(wire::Send(answer));
    }
    return script;
}

inline std::string Listing(const std::string& items) {
    return Answer(200, R"({"data":[)" + items + "]}");
}

/** "code" as the service's refusals have it. */
inline std::string Refusal(int status, const std::string& code, const std::string& message = "") {
    return Answer(status, R"({"error":{"code":")" + code + R"(","message":")" + message + "\"}}");
}

class OneDriveTest : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        std::filesystem::create_directories(paths::kConfigRoot);
        std::filesystem::remove(paths::kServiceConfig);
        ASSERT_TRUE(Utils::AddClient("onedrive", "fixed", kSecret));
        Store(kToken, kGrant);
        Renew();
        seams::Reset();
        YLIBCErrSetEx(0, "test", 1);
    }

    void TearDown() override {
        for (const char* secret : {kSecret, kToken, kNewToken, kGrant}) {
            EXPECT_FALSE(seams::LoggedPart(secret)) << seams::LogDump();
        }
    }

    void Renew(const std::string& account = R"({"id":"a1b2"})", const std::string& expires = "") {
        Json::Value profile;
        profile["access_token"] = kToken;
        profile["refresh_token"] = kGrant;
        profile["expire_time"] = expires;
        profile["client_id"] = "another one";
        profile["server_id"] = kServerId;
        profile["account_info"] = account;
        drive = std::make_unique<OneDrive>(profiles::kUser, profile);
    }

    /** Puts the profile into both files. */
    void Store(const std::string& access_token, const std::string& refresh_token) {
        Json::Value connections;
        Json::Value& profile = connections[kServerId];
        profile["protocol"] = "onedrive";
        profile["alias"] = profile["email"] = "amy@example.com";
        profile["account_info"] = "{}";
        profile["client_id"] = "fixed";
        profile["expire_time"] = "500";
        profile["path"] = "";
        profile["access_token"] = token_profile::Enciphered(access_token);
        profile["refresh_token"] = token_profile::Enciphered(refresh_token);
        profiles::Put(profiles::VFS_CONFIG_SERVER, connections);
        profile["path"] = tree.Folder();
        profiles::Put(profiles::VFS_CONFIG_CONNECT, connections);
    }

    static void SetHosts(const std::string& api, const std::string& login,
                         const std::string& storage) {
        Json::Value document;
        ASSERT_TRUE(json::fromFile(document, paths::kServiceConfig));
        document["hosts"]["LiveApiHost"] = api;
        document["hosts"]["LiveLoginHost"] = login;
        document["hosts"]["LiveStorageDomain"] = storage;
        ASSERT_TRUE(json::toFile(document, paths::kServiceConfig, 0640));
    }

    /** Stands for the service from now on. */
    void Serve(const std::vector<wire::Script>& connections) {
        drive->GetAPIHandler()->Reset();
        server = std::make_unique<wire::WireServer>(connections);
        SetHosts(server->Url(""), server->Url(""), ".localhost:" + std::to_string(server->Port()));
    }
    void Give(const std::vector<std::string>& answers) { Serve({Answering(answers)}); }

    /** Address of the driver's interface. */
    std::string Api(const std::string& what) const { return server->Url("/v5.0" + what); }

    /** Makes the mounted tree know an id. */
    void Show(const std::string& path, const std::string& id) { tree.Set(path, "id::file", id); }

    /** "GET /v5.0/me?pretty=false" for each request. */
    std::vector<std::string> Requests() const {
        std::vector<std::string> lines;
        for (const std::string& request : server->Received()) {
            lines.push_back(request.substr(0, request.find(" HTTP/1.1\r\n")));
        }
        return lines;
    }
    std::string Request(size_t number) const { return server->Received().at(number); }
    static std::string BodyOf(const std::string& request) {
        return request.substr(request.find("\r\n\r\n") + 4);
    }
    /** Value of a header, "-" without one. */
    static std::string HeaderOf(const std::string& request, const std::string& name) {
        const std::string head = request.substr(0, request.find("\r\n\r\n") + 2);
        const size_t at = head.find("\r\n" + name + ": ");
        if (at == std::string::npos) {
            return "-";
        }
        const size_t begin = at + name.size() + 4;
        return head.substr(begin, head.find("\r\n", begin) - begin);
    }
    std::vector<std::string> Headers(const std::string& name) const {
        std::vector<std::string> values;
        for (const std::string& request : server->Received()) {
            values.push_back(HeaderOf(request, name));
        }
        return values;
    }

    static std::string TokenAnswer() {
        return Answer(200,
                      std::string(R"({"expires_in":3600,"access_token":")") + kNewToken + "\"}");
    }

    static constexpr const char* kSecret = "secret-of-this";
    static constexpr const char* kToken = "token-canary";
    static constexpr const char* kNewToken = "fresh-canary";
    static constexpr const char* kGrant = "grant-canary";
    XattrTree tree{"/tmp/onedrive_tree"};
    std::unique_ptr<wire::WireServer> server;
    std::unique_ptr<OneDrive> drive;
};

/** A file of so many bytes, with no period that a fragment could be shifted by. */
inline UniqueFd PatternFile(long long size, std::string* text = nullptr) {
    constexpr size_t kPeriod = 65537;
    UniqueFd file(memfd_create("pattern", MFD_CLOEXEC));
    std::string bytes;
    for (size_t i = 0; i < kPeriod; ++i) {
        bytes += static_cast<char>(i ^ (i >> 8));
    }
    bytes.reserve(static_cast<size_t>(size) + kPeriod);
    while (bytes.size() < static_cast<size_t>(size)) {
        bytes.append(bytes, 0, kPeriod);
    }
    bytes.resize(static_cast<size_t>(size));
    EXPECT_EQ(write(file.Get(), bytes.data(), bytes.size()), size);
    lseek(file.Get(), 0, SEEK_SET);
    if (text != nullptr) {
        text->swap(bytes);
    }
    return file;
}

/** Conflicts as the driver's table has them; the service's description has two forms. */
struct LiveService : cloudsim::OneDrive {
    LiveService() : OneDrive(Options()) {}
    static cloudsim::OneDriveOptions Options() {
        cloudsim::OneDriveOptions options;
        options.conflict_status = 400;
        options.journal_hashes = options.hash_uploads = false;
        return options;
    }
};

/** The driver before a service that keeps what it is given. */
class OneDriveServiceTest : public DriverFixture<OneDrive, LiveService> {
  protected:
    OneDriveServiceTest() : DriverFixture("onedrive") {
        account_info = R"({"id":")" + amy.Id() + "\"}";
    }
    std::map<std::string, std::string> Hosts() const override {
        return {{"LiveApiHost", service.ApiHost()},
                {"LiveLoginHost", service.LoginHost()},
                {"LiveStorageDomain", service.StorageDomain()}};
    }
};

}  // namespace ZYROCloud

#endif
