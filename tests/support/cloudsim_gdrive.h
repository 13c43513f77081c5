/** What the tests of the simulated Google Drive share. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_GDRIVE_TEST_H
#define ZYROVFS_TESTS_CLOUDSIM_GDRIVE_TEST_H

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "support/cloudsim/cloudsim.h"
#include "support/cloudsim_client.h"

namespace cloudsim {

inline std::string Reason(const Got& got) {
    return got.Json()["error"]["errors"][0]["reason"].asString();
}

inline std::vector<std::string> Titles(const Json::Value& list) {
    std::vector<std::string> titles;
    for (const Json::Value& item : list["items"]) {
        titles.push_back(item["title"].asString());
    }
    return titles;
}

/** One account, and a client that may use it. */
struct GDriveTest : testing::Test {
    GDrive drive;
    Account& amy = drive.AddAccount("amy@example.com", "Amy Adams");
    Client client{amy.IssueTokens().access_token};
    const std::string root = amy.Root();

    Got Get(const std::string& path) { return client.Get(drive.ApiHost() + path); }
    Got Send(const std::string& method, const std::string& path, const std::string& body = "") {
        return client.Send(method, drive.ApiHost() + path, body);
    }
    std::string Escape(const std::string& text) {
        char* escaped =
            curl_easy_escape(client.Handle(), text.data(), static_cast<int>(text.size()));
        std::string result = escaped;
        curl_free(escaped);
        return result;
    }
    Got Query(const std::string& query) { return Get("/drive/v2/files?q=" + Escape(query)); }
    Json::Value List(const std::string& query, const std::string& more = "") {
        const Got got = Get("/drive/v2/files?q=" + Escape(query) + more);
        EXPECT_EQ(200, got.status) << query << ": " << got.body;
        return got.Json();
    }
    void TearDown() override { EXPECT_THAT(drive.UnusedFaults(), testing::IsEmpty()); }
};

}  // namespace cloudsim

#endif
