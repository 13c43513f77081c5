/** Contents that take no memory, uploads that are only counted, and folders of the disk. */
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>
#include <fstream>
#include <sstream>

#include "support/cloudsim/cloudsim.h"
#include "support/cloudsim_client.h"

namespace {

namespace fs = std::filesystem;

using cloudsim::Got;
using testing::IsEmpty;

constexpr uint64_t kMiB = 1024 * 1024;

std::string ReadFile(const fs::path& path) {
    std::ifstream file(path, std::ios::binary);
    std::stringstream text;
    text << file.rdbuf();
    return text.str();
}

TEST(Pattern, LooksTheSameHoweverItIsRead) {
    const cloudsim::ContentPtr pattern = cloudsim::MakePattern(3 * kMiB + 5, 7);
    const std::string all = pattern->Bytes();
    ASSERT_EQ(3 * kMiB + 5, all.size());
    for (const size_t from : {0UL, 3UL, kMiB - 1, kMiB, kMiB + 4, 2 * kMiB - 3, 3 * kMiB + 4}) {
        char piece[11] = {};
        const int64_t got = pattern->Read(from, piece, sizeof piece);
        EXPECT_EQ(all.substr(from, sizeof piece), std::string(piece, static_cast<size_t>(got)));
    }
    EXPECT_EQ(0, pattern->Read(all.size(), nullptr, 10));
}

TEST(Pattern, DiffersFromPlaceToPlaceAndFromSeedToSeed) {
    const std::string all = cloudsim::MakePattern(2 * kMiB)->Bytes();
    EXPECT_NE(all.substr(0, kMiB), all.substr(kMiB));
    EXPECT_NE(all, cloudsim::MakePattern(2 * kMiB, 1)->Bytes());
    EXPECT_EQ(cloudsim::MakeBytes(all)->Sha1(), cloudsim::MakePattern(2 * kMiB)->Sha1());
}

TEST(Pattern, ServesRangesBeyondFourGibibytes) {
    cloudsim::BoxService box;
    cloudsim::Account& amy = box.AddAccount("amy@example.com");
    cloudsim::Client client(amy.IssueTokens().access_token);
    client.follow = true;
    const uint64_t size = 10 * 1024 * kMiB, from = 5 * 1024 * kMiB + 3;
    const std::string file = amy.AddPattern("0", "big", size);
    client.headers = {"Range: bytes=" + std::to_string(from) + "-" + std::to_string(from + 999)};
    const Got got = client.Get(box.ApiHost() + "/2.0/files/" + file + "/content");
    std::string wanted(1000, '\0');
    cloudsim::MakePattern(size)->Read(from, wanted.data(), wanted.size());
    EXPECT_EQ(206, got.status);
    EXPECT_EQ(wanted, got.body);
}

struct StorageTest : testing::TestWithParam<cloudsim::Storage::Kind> {};
INSTANTIATE_TEST_SUITE_P(All, StorageTest,
                         testing::Values(cloudsim::Storage::Kind::kMemory,
                                         cloudsim::Storage::Kind::kFolder,
                                         cloudsim::Storage::Kind::kCountOnly));

TEST_P(StorageTest, HashesWhatIsUploadedWhereverItGoes) {
    cloudsim::BoxOptions options;
    options.storage = {GetParam(), "/tmp"};
    cloudsim::BoxService box(options);
    cloudsim::Account& amy = box.AddAccount("amy@example.com");
    cloudsim::Client client(amy.IssueTokens().access_token);
    client.follow = true;
    const std::string bytes = cloudsim::MakePattern(2 * kMiB + 1)->Bytes();
    const Got got =
        client.Upload(box.UploadHost() + "/api/2.0/files/content",
                      {{"attributes", R"({"name":"a","parent":{"id":"0"}})"}, {"@file", bytes}});
    ASSERT_EQ(201, got.status) << got.body;
    const cloudsim::Item item = amy.Get(amy.Find("/a"));
    EXPECT_EQ(bytes.size(), item.size);
    EXPECT_EQ(cloudsim::MakePattern(2 * kMiB + 1)->Sha1(), item.sha1);
    const Got back = client.Get(box.ApiHost() + "/2.0/files/" + item.id + "/content");
    if (GetParam() == cloudsim::Storage::Kind::kCountOnly) {
        EXPECT_NE(CURLE_OK, back.code);
    } else {
        EXPECT_EQ(bytes, back.body);
    }
}

TEST(Journal, KeepsTheBeginningAndTheSumOfLargeBodies) {
    cloudsim::BoxOptions options;
    options.journal_body_limit = 100;
    cloudsim::BoxService box(options);
    cloudsim::Client client;
    const std::string body(5000, 'b');
    client.Send("POST", box.TokenUrl(), body);
    const cloudsim::JournalEntry entry = box.Journal().All().at(0);
    EXPECT_EQ(body.substr(0, 100), entry.body);
    EXPECT_EQ(5000u, entry.body_size);
    EXPECT_EQ(cloudsim::MakeBytes(body)->Sha1(), entry.body_sha1);
}

TEST(Journal, IsWrittenToAFileLineByLine) {
    const std::string file = fs::temp_directory_path() / "cloudsim-journal";
    fs::remove(file);
    {
        cloudsim::BoxOptions options;
        options.journal_file = file;
        cloudsim::BoxService box(options);
        cloudsim::Client client("b\xff");
        client.Get(box.ApiHost() + "/2.0/users/me");
    }
    Json::Value line;
    std::istringstream(ReadFile(file)) >> line;
    EXPECT_EQ("/2.0/users/me", line["target"].asString());
    EXPECT_EQ(401, line["status"].asInt());
}

struct Served : testing::Test {
    const fs::path folder = fs::temp_directory_path() / "cloudsim-served";
    cloudsim::BoxService box;
    cloudsim::Account& amy = box.AddAccount("amy@example.com");
    cloudsim::Client client{amy.IssueTokens().access_token};

    Served() {
        fs::remove_all(folder);
        fs::create_directories(folder / "docs");
        std::ofstream(folder / "docs" / "a.txt") << "hello";
        amy.Serve(folder);
    }
    Got Send(const std::string& method, const std::string& path, const std::string& body = "") {
        return client.Send(method, box.ApiHost() + path, body);
    }
};

TEST_F(Served, ShowsWhatLiesThere) {
    EXPECT_EQ("hello", amy.Bytes(amy.Find("/docs/a.txt")));
}

TEST_F(Served, WritesBackWhatClientsChange) {
    const Got up = client.Upload(
        box.UploadHost() + "/api/2.0/files/content",
        {{"attributes", R"({"name":"new.bin","parent":{"id":"0"}})"}, {"@file", "fresh"}});
    ASSERT_EQ(201, up.status) << up.body;
    EXPECT_EQ("fresh", ReadFile(folder / "new.bin"));
    const std::string file = amy.Find("/new.bin"), docs = amy.Find("/docs");
    client.Upload(box.UploadHost() + "/api/2.0/files/" + file + "/content",
                  {{"attributes", "{}"}, {"@file", "fresher"}});
    EXPECT_EQ("fresher", ReadFile(folder / "new.bin"));
    Send("PUT", "/2.0/folders/" + docs, R"({"name":"papers"})");
    Send("PUT", "/2.0/files/" + file, R"({"name":"b.bin","parent":{"id":")" + docs + "\"}}");
    EXPECT_EQ("fresher", ReadFile(folder / "papers" / "b.bin"));
    Send("POST", "/2.0/folders/" + docs + "/copy", R"({"name":"copy","parent":{"id":"0"}})");
    EXPECT_EQ("hello", ReadFile(folder / "copy" / "a.txt"));
    EXPECT_EQ(204, Send("DELETE", "/2.0/folders/" + docs + "?recursive=true").status);
    EXPECT_FALSE(fs::exists(folder / "papers"));
    EXPECT_EQ("hello", amy.Bytes(amy.Find("/copy/a.txt")));
}

TEST_F(Served, ANameThatTheDiskRefusesChangesNothing) {
    std::string name;
    for (int i = 0; i < 200; i++) {
        name += "\xc3\xa4";
    }
    EXPECT_EQ(
        500,
        Send("POST", "/2.0/folders", R"({"name":")" + name + R"(","parent":{"id":"0"}})").status);
    EXPECT_FALSE(amy.Exists("/" + name));
}

TEST(JoinedContent, ReadsAcrossItsPiecesAndNothingBehindThem) {
    const auto joined = cloudsim::MakeJoined({cloudsim::MakeBytes("012"), cloudsim::MakeBytes(""),
                                              cloudsim::MakeBytes("34"), cloudsim::MakeBytes("5")});
    EXPECT_EQ(6u, joined->Size());
    EXPECT_EQ("012345", joined->Bytes());
    EXPECT_EQ(cloudsim::MakeBytes("012345")->Sha1(), joined->Sha1());
    char byte = 0;
    EXPECT_EQ(1, joined->Read(3, &byte, 1));
    EXPECT_EQ('3', byte);
    EXPECT_EQ(0, joined->Read(6, &byte, 1));
    EXPECT_EQ(0u, cloudsim::MakeJoined({})->Size());
}

}  // namespace
