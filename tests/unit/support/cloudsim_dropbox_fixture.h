/** A simulated Dropbox with two users, and a plain HTTP client of the first one. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_DROPBOX_FIXTURE_H
#define ZYROVFS_TESTS_CLOUDSIM_DROPBOX_FIXTURE_H

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "support/cloudsim/cloudsim.h"
#include "support/cloudsim_client.h"

struct DropboxTest : testing::Test {
    using Got = cloudsim::Got;

    static cloudsim::DropboxOptions Options() {
        cloudsim::DropboxOptions options;
        options.page_size = 3;
        options.max_request = 100;
        return options;
    }

    cloudsim::Dropbox dropbox{Options()};
    cloudsim::Account& amy = dropbox.AddAccount("amy@example.com", "Amy Adams");
    cloudsim::Account& bob = dropbox.AddAccount("bob@example.com");
    cloudsim::Client client{amy.IssueTokens().access_token};

    Got CallText(const std::string& function, const std::string& body) {
        client.headers = {"Content-Type: application/json"};
        return client.Send("POST", dropbox.ApiHost() + "/2/" + function, &body);
    }
    Got Call(const std::string& function, const Json::Value& body) {
        return CallText(function, cloudsim::OneLine(body));
    }
    static Json::Value Path(const std::string& path) {
        Json::Value args;
        args["path"] = path;
        return args;
    }
    static Json::Value FromTo(const std::string& from, const std::string& to) {
        Json::Value args;
        args["from_path"] = from;
        args["to_path"] = to;
        return args;
    }
    Got Send(const std::string& function, const Json::Value& args, const std::string& bytes) {
        client.headers = {"Content-Type: application/octet-stream",
                          "Dropbox-API-Arg: " + cloudsim::dropbox::HeaderText(args)};
        return client.Send("POST", dropbox.ContentHost() + "/2/files/" + function, &bytes);
    }
    Got Download(const std::string& path, const std::vector<std::string>& more = {}) {
        client.headers = {"Dropbox-API-Arg: " + cloudsim::dropbox::HeaderText(Path(path)),
                          "Content-Type:"};
        client.headers.insert(client.headers.end(), more.begin(), more.end());
        const std::string nothing;
        return client.Send("POST", dropbox.ContentHost() + "/2/files/download", &nothing);
    }
    std::string Bytes(const std::string& path) { return amy.Bytes(amy.Find(path)); }
    void TearDown() override { EXPECT_THAT(dropbox.UnusedFaults(), testing::IsEmpty()); }
};

/** The error's tags, without the dots behind them. */
inline std::string Summary(const cloudsim::Got& got) {
    const std::string text = got.Json()["error_summary"].asString();
    return std::to_string(got.status) + " " + text.substr(0, text.find_last_not_of('.') + 1);
}

inline std::vector<std::string> Names(const Json::Value& list) {
    std::vector<std::string> names;
    for (const Json::Value& entry : list["entries"]) {
        names.push_back(entry["name"].asString());
    }
    return names;
}

#endif
