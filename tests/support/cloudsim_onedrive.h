/** What the tests of the simulated OneDrive share: an account, and a client that speaks for it. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_ONEDRIVE_FIXTURE_H
#define ZYROVFS_TESTS_CLOUDSIM_ONEDRIVE_FIXTURE_H

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "support/cloudsim/cloudsim.h"
#include "support/cloudsim_client.h"

namespace cloudsim {

struct OneDriveFixture : testing::Test {
    explicit OneDriveFixture(const OneDriveOptions& options = {}) : drive(options) {}

    OneDrive drive;
    Account& amy = drive.AddAccount("amy@example.com", "Amy Adams");
    Client client{amy.IssueTokens().access_token};

    std::string Api(const std::string& path) { return drive.ApiHost() + "/v5.0/" + path; }
    Got Get(const std::string& path) { return client.Get(Api(path)); }
    Got Send(const std::string& method, const std::string& path, const std::string& body = "") {
        return client.Send(method, Api(path), body);
    }
    void TearDown() override { EXPECT_THAT(drive.UnusedFaults(), testing::IsEmpty()); }
};

inline std::string ErrorOf(const Got& got) {
    return got.Json()["error"]["code"].asString();
}

inline std::vector<std::string> NamesOf(const Json::Value& list) {
    std::vector<std::string> names;
    for (const Json::Value& item : list["data"]) {
        names.push_back(item["name"].asString());
    }
    return names;
}

/** Of the last answer, behind all redirects; empty when it has no such header. */
inline std::string HeaderOf(const Got& got, const std::string& name) {
    const size_t at = got.head.find("\n" + name + ": ", got.head.rfind("HTTP/1.1 "));
    if (at == std::string::npos) {
        return "";
    }
    const size_t value = at + name.size() + 3;
    return got.head.substr(value, got.head.find('\r', value) - value);
}

}  // namespace cloudsim

#endif
