/**
 * A Dropbox driver before a server that says what a test wrote down. Each answer has a connection
 * of its own; the two hosts of the service differ by their names. The token must not reach the log.
 */
#ifndef ZYROVFS_TESTS_DROPBOX_FIXTURE_H
#define ZYROVFS_TESTS_DROPBOX_FIXTURE_H

#include <gmock/gmock.h>
#include <zosplatform/error.h>

#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "cloud/dropbox/dropbox.h"
#include "core/json.h"
#include "core/paths.h"
#include "http/api_handler.h"
#include "http/error_handler.h"
#include "support/profiles.h"
#include "support/seams.h"
#include "support/transfer_bytes.h"
#include "support/wire_server.h"

namespace ZYROCloud {

using namespace ZYROVFS;  // NOLINT(google-build-using-namespace)
using testing::Each;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;

inline constexpr const char* kServerId = "dropbox://amy@example.com";
inline constexpr const char* kToken = "canary-4711";

inline Json::Value Object(const std::string& text) {
    Json::Value value;
    EXPECT_TRUE(json::fromString(value, text)) << text;
    return value;
}

inline std::string Answer(int status, const std::string& body = "{}") {
    return wire::Answer(status, body, "Connection: close\r\n");
}

/** A refusal as the service words it; `error` is the value of that member. */
inline std::string Refusal(const std::string& error, int status = 409) {
    return Answer(status, R"({"error_summary":"x/..","error":)" + error + "}");
}

inline const std::string kConflict =
    Refusal(R"({".tag":"to","to":{".tag":"conflict","conflict":{".tag":"file"}}})");
inline const std::string kNotFound =
    Refusal(R"({".tag":"path_lookup","path_lookup":{".tag":"not_found"}})");

/** One request as it arrived. */
struct Arrived {
    explicit Arrived(const std::string& text) : head(text.substr(0, text.find("\r\n\r\n") + 2)) {
        body = text.substr(head.size() + 2);
        if (Header("Transfer-Encoding") == "chunked") {
            body = Dechunked(body);
        }
    }

    static std::string Dechunked(const std::string& text) {
        std::string whole;
        for (size_t at = 0;;) {
            const size_t line = text.find("\r\n", at);
            const size_t size = strtoul(text.c_str() + at, nullptr, 16);
            if (line == std::string::npos || size == 0) {
                return whole;
            }
            whole.append(text, line + 2, size);
            at = line + 2 + size + 2;
        }
    }

    /** "POST api /2/files/delete": method, host, address. */
    std::string Line() const {
        const std::string line = head.substr(0, head.find(" HTTP/1.1\r\n"));
        const bool content = Header("Host").rfind("content.", 0) == 0;
        return line.substr(0, line.find('/')) + (content ? "content " : "api ") +
               line.substr(line.find('/'));
    }
    bool Has(const std::string& name) const {
        return head.find("\r\n" + name + ":") != std::string::npos;
    }
    std::string Header(const std::string& name) const {
        const size_t at = head.find("\r\n" + name + ": ");
        const size_t begin = at + name.size() + 4;
        return at == std::string::npos ? "" : head.substr(begin, head.find("\r\n", begin) - begin);
    }
    Json::Value Argument() const { return Object(Header("Dropbox-API-Arg")); }

    std::string head, body;
};

class DropboxTest : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        Json::Value profile;
        profile["access_token"] = kToken;
        profile["server_id"] = kServerId;
        drive = std::make_unique<Dropbox>(profiles::kUser, profile);
        seams::Reset();
        YLIBCErrSetEx(0, "test", 1);
        Give({});
    }
    void TearDown() override { EXPECT_FALSE(seams::LoggedPart(kToken)) << seams::LogDump(); }

    /** Stands for the service from now on. */
    void Serve(const std::vector<wire::Script>& connections) {
        server = std::make_unique<wire::WireServer>(connections);
        Json::Value document;
        document["hosts"]["DropboxApiHost"] = ApiHost();
        document["hosts"]["DropboxContentHost"] = ContentHost();
        std::filesystem::create_directories(paths::kConfigRoot);
        ASSERT_TRUE(json::toFile(document, paths::kServiceConfig, 0640));
    }
    std::string ApiHost() const { return server->Url(""); }
    std::string ContentHost() const {
        return "http://content.localhost:" + std::to_string(server->Port());
    }
    void Give(const std::vector<std::string>& answers) {
        std::vector<wire::Script> connections;
        connections.reserve(answers.size());
        for (const std::string& answer : answers) {
            connections.push_back({wire::ReadRequest(), wire::Send(answer)});
        }
        Serve(connections);
    }

    std::vector<Arrived> All() const {
        std::vector<Arrived> all;
        for (const std::string& text : server->Received()) {
            if (text.rfind("POST ", 0) == 0 || text.rfind("GET ", 0) == 0) {
                all.emplace_back(text);  // else the rest of one that was read in parts
            }
        }
        return all;
    }
    std::vector<std::string> Requests() const {
        std::vector<std::string> lines;
        for (const Arrived& request : All()) {
            lines.push_back(request.Line());
        }
        return lines;
    }
    Arrived Last() const { return All().back(); }

    std::unique_ptr<wire::WireServer> server;
    std::unique_ptr<Dropbox> drive;
};

}  // namespace ZYROCloud

#endif
