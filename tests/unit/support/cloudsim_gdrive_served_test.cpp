/** The simulated Google Drive, filled from a folder of the disk that shows its changes. */
#include <filesystem>
#include <fstream>
#include <sstream>

#include "support/cloudsim_gdrive.h"

namespace {

namespace fs = std::filesystem;

using cloudsim::GDriveTest;
using cloudsim::Got;

std::string ReadFile(const fs::path& path) {
    std::ifstream file(path, std::ios::binary);
    std::stringstream text;
    text << file.rdbuf();
    return text.str();
}

struct GDriveServed : GDriveTest {
    const fs::path folder = fs::temp_directory_path() / "cloudsim-drive";

    GDriveServed() {
        fs::remove_all(folder);
        fs::create_directories(folder / "docs");
        std::ofstream(folder / "docs" / "a.txt") << "hello";
        amy.Serve(folder);
    }
    Got Insert(const std::string& title, const std::string& parent, const std::string& bytes) {
        Json::Value metadata;
        metadata["title"] = title;
        metadata["parents"][0]["id"] = parent;
        return client.Upload(drive.ApiHost() + "/upload/drive/v2/files?uploadType=multipart",
                             {{"Metadata", cloudsim::OneLine(metadata)}, {"@file", bytes}});
    }
};

TEST_F(GDriveServed, WritesBackWhatClientsChange) {
    const std::string docs = amy.Find("/docs");
    const std::string file = Insert("new.bin", root, "fresh").Json()["id"].asString();
    EXPECT_EQ("fresh", ReadFile(folder / "new.bin"));
    Send("PUT", "/upload/drive/v2/files/" + file + "?uploadType=media", "fresher");
    EXPECT_EQ("fresher", ReadFile(folder / "new.bin"));
    Send("PUT", "/drive/v2/files/" + docs, R"({"title":"papers"})");
    Send("PUT", "/drive/v2/files/" + file + "?addParents=" + docs + "&removeParents=root",
         R"({"title":"b.bin"})");
    EXPECT_EQ("fresher", ReadFile(folder / "papers" / "b.bin"));
    EXPECT_FALSE(fs::exists(folder / "new.bin"));
    Send("POST", "/drive/v2/files/" + file + "/copy", R"({"title":"c.bin"})");
    EXPECT_EQ("fresher", ReadFile(folder / "papers" / "c.bin"));
    EXPECT_EQ(204, Send("DELETE", "/drive/v2/files/" + docs).status);
    EXPECT_FALSE(fs::exists(folder / "papers"));
}

TEST_F(GDriveServed, WhatIsTrashedIsGoneFromTheDiskUntilItIsRestored) {
    const std::string docs = amy.Find("/docs"), file = amy.Find("/docs/a.txt");
    Send("POST", "/drive/v2/files/" + docs + "/trash");
    EXPECT_FALSE(fs::exists(folder / "docs"));
    EXPECT_EQ("hello", amy.Bytes(file));
    Send("PUT", "/drive/v2/files/" + file, R"({"title":"b.txt"})");
    Send("POST", "/drive/v2/files/" + docs + "/untrash");
    EXPECT_EQ("hello", ReadFile(folder / "docs" / "b.txt"));
}

TEST_F(GDriveServed, ItemsOfOneNameLieBesideEachOther) {
    const std::string first = Insert("twin", root, "1").Json()["id"].asString();
    const std::string second = Insert("twin", root, "2").Json()["id"].asString();
    EXPECT_EQ("1", ReadFile(folder / "twin"));
    EXPECT_EQ(3, std::distance(fs::directory_iterator(folder), fs::directory_iterator()));
    EXPECT_EQ(204, Send("DELETE", "/drive/v2/files/" + first).status);
    EXPECT_FALSE(fs::exists(folder / "twin"));
    EXPECT_EQ("2", amy.Bytes(second));
    Send("PUT", "/drive/v2/files/" + second, R"({"title":"single"})");
    EXPECT_EQ("2", ReadFile(folder / "single"));
}

TEST_F(GDriveServed, NamesThatNoDiskTakesAreShownInAnotherForm) {
    EXPECT_EQ(200, Insert("a/b", root, "x").status);
    EXPECT_EQ("x", ReadFile(folder / "a_b"));
    EXPECT_EQ(200, Insert("..", root, "y").status);
    EXPECT_EQ("y", ReadFile(folder / "_"));
    EXPECT_EQ(200, Insert(std::string(4096, 'n'), root, "z").status);
    EXPECT_EQ("z", ReadFile(folder / std::string(200, 'n')));
}

TEST_F(GDriveServed, WhatLiesNowhereIsNotOnTheDiskButKeepsItsBytes) {
    const std::string file = amy.Find("/docs/a.txt");
    Send("PUT", "/drive/v2/files/" + file + "?removeParents=" + amy.Find("/docs"));
    EXPECT_FALSE(fs::exists(folder / "docs" / "a.txt"));
    EXPECT_EQ("hello", amy.Bytes(file));
    Send("PUT", "/drive/v2/files/" + file + "?addParents=root");
    EXPECT_EQ("hello", ReadFile(folder / "a.txt"));
}

}  // namespace
