// List: which entries, in which order, which page, and in which words.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <climits>

#include "support/catalogue.h"
#include "support/fake_server.h"
#include "support/profiles.h"

namespace ZYROVFS::Server {
namespace {

using profiles::kUser;
using profiles::Put;
using testing::ElementsAre;
using testing::IsEmpty;

class ListTest : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        catalogue::Clear();
        catalogue::Add("ftp", "File Transfer", "list,read");
        catalogue::Add("dav", "WebDAV", "list");
    }

    static Json::Value Entry(const std::string& protocol, const std::string& host, unsigned port,
                             const std::string& alias, const std::string& account = "",
                             const std::string& codepage = "") {
        Json::Value entry;
        entry["protocol"] = protocol;
        entry["hostname"] = host;
        entry["port"] = port;
        entry["alias"] = alias;
        entry["account"] = account;
        entry["codepage"] = codepage;
        return entry;
    }

    /** Profiles "ftp://0" to "ftp://N-1". */
    static void PutNumbered(unsigned count, VFS_CONFIG_MODE mode = VFS_CONFIG_SERVER) {
        Json::Value servers(Json::objectValue);
        for (unsigned i = 0; i < count; ++i) {
            const std::string host = std::to_string(i);
            servers["ftp://" + host] = Entry("ftp", host, i, "same");
        }
        Put(mode, servers);
    }

    bool Run(const char* sortBy = nullptr, bool ascending = true, unsigned long offset = 0,
             unsigned long limit = 0) {
        return List(kUser, VFS_CONFIG_SERVER, nullptr, sortBy, ascending, offset, limit, out_);
    }

    std::vector<std::string> Ids(const char* key = "profiles") const {
        std::vector<std::string> ids;
        for (const Json::Value& entry : out_[key]) {
            ids.push_back(entry["id"].asString());
        }
        return ids;
    }

    fake::Scope fakes_;
    Json::Value out_;
};

TEST_F(ListTest, EmptyStoreGivesAnEmptyPageUnderTheKeyOfItsMode) {
    for (const auto& [mode, key] :
         {std::pair(VFS_CONFIG_SERVER, "profiles"), std::pair(VFS_CONFIG_CONNECT, "connections")}) {
        out_ = "before";
        EXPECT_TRUE(List(kUser, mode, nullptr, "alias", true, 7, 5, out_));
        EXPECT_EQ(out_["total"].asUInt(), 0U);
        EXPECT_EQ(out_["offset"].asUInt(), 7U);
        EXPECT_EQ(out_[key], Json::Value(Json::arrayValue));
        EXPECT_EQ(out_.size(), 3U);
    }
}

TEST_F(ListTest, EntryHasTheseTwelveKeys) {
    Json::Value servers;
    servers["some id"] = Entry("ftp", "nas", 2121, "mine", "amy", "UTF-8");
    servers["some id"]["uri_path"] = "music";
    servers["some id"]["password"] = "never shown";
    Put(VFS_CONFIG_SERVER, servers);
    ASSERT_TRUE(Run());
    Json::Value expected;
    expected["id"] = "some id";  // of the file, not as the type computes it
    expected["protocol"] = "ftp";
    expected["port"] = 2121U;
    expected["hostname"] = "nas";
    expected["alias"] = "mine";
    expected["account"] = "amy";
    expected["codepage"] = "UTF-8";
    expected["api"].append("list");
    expected["api"].append("read");
    expected["protocol_name"] = "File Transfer";
    expected["uri_path"] = "music";
    expected["uri"] = "ftp://nas";
    expected["connect_status"] = 0;
    EXPECT_EQ(out_["profiles"][0], expected);
    EXPECT_EQ(out_["total"].asUInt(), 1U);
}

TEST_F(ListTest, SavedProfileShowsAsConnectedWhileItsConnectionLives) {
    Json::Value servers;
    servers["ftp://nas"] = Entry("ftp", "nas", 21, "mine");
    Put(VFS_CONFIG_SERVER, servers);
    servers["ftp://nas"]["path"] = "/tmp";
    Put(VFS_CONFIG_CONNECT, servers);
    ASSERT_TRUE(Run());
    EXPECT_EQ(out_["profiles"][0]["connect_status"], 1);
    servers["ftp://nas"]["path"] = "/tmp/gone";
    Put(VFS_CONFIG_CONNECT, servers);
    ASSERT_TRUE(Run());
    EXPECT_EQ(out_["profiles"][0]["connect_status"], 0);
}

TEST_F(ListTest, OnlyConnectionsAskTheirService) {
    PutNumbered(1, VFS_CONFIG_SERVER);
    PutNumbered(1, VFS_CONFIG_CONNECT);
    for (const VFS_CONFIG_MODE mode : {VFS_CONFIG_SERVER, VFS_CONFIG_CONNECT}) {
        fake::Now().calls.clear();
        ASSERT_TRUE(List(kUser, mode, nullptr, nullptr, true, 0, 0, out_));
        EXPECT_EQ(fake::Calls("Load")[0].online, mode == VFS_CONFIG_CONNECT);
        EXPECT_TRUE(fake::Calls("Load")[0].flag) << "stored credentials are enciphered";
    }
}

TEST_F(ListTest, ProtocolTakesItsOwnEntries) {
    Json::Value servers;
    servers["a"] = Entry("ftp", "a", 1, "x");
    servers["b"] = Entry("ftps", "b", 1, "x");
    servers["c"] = Entry("FTP", "c", 1, "x");
    servers["d"] = Entry("dav", "d", 1, "x");
    servers["e"] = "ftp";
    servers["f"]["protocol"] = 5;
    Put(VFS_CONFIG_SERVER, servers);
    ASSERT_TRUE(List(kUser, VFS_CONFIG_SERVER, "ftp", nullptr, true, 0, 0, out_));
    EXPECT_THAT(Ids(), ElementsAre("a"));
    EXPECT_FALSE(seams::LoggedPart("Skip")) << "what is not asked for is not looked at";
    ASSERT_TRUE(List(kUser, VFS_CONFIG_SERVER, "", nullptr, true, 0, 0, out_));
    EXPECT_EQ(out_["total"].asUInt(), 4U) << "an empty text takes all";
    ASSERT_TRUE(List(kUser, VFS_CONFIG_SERVER, "nfs", nullptr, true, 0, 0, out_));
    EXPECT_EQ(out_["total"].asUInt(), 0U);
}

TEST_F(ListTest, MalformedEntryIsSkippedLoggedAndStaysInTheFile) {
    Json::Value servers;
    servers["good"] = Entry("ftp", "nas", 21, "mine");
    servers["no alias"] = Entry("ftp", "nas", 21, "mine");
    servers["no alias"].removeMember("alias");
    Put(VFS_CONFIG_SERVER, servers);
    const std::string before = profiles::Text(profiles::File(VFS_CONFIG_SERVER));
    ASSERT_TRUE(Run("alias", true, 0, 10));
    EXPECT_THAT(Ids(), ElementsAre("good"));
    EXPECT_EQ(out_["total"].asUInt(), 1U);
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM) << "the code of the skip";
    EXPECT_TRUE(seams::Logged("Skip malformed server config, serverID=no alias, code=2"))
        << seams::LogDump();
    EXPECT_EQ(profiles::Text(profiles::File(VFS_CONFIG_SERVER)), before);
}

TEST_F(ListTest, EntryThatCannotBeDumpedIsSkipped) {
    PutNumbered(3);
    fake::Fail("DumpToStruct", {VFS_ERR_NONE, VFS_ERR_UNAUTHORIZED});
    ASSERT_TRUE(Run());
    EXPECT_THAT(Ids(), ElementsAre("ftp://0", "ftp://2"));
    EXPECT_TRUE(seams::Logged("Skip malformed server config, serverID=ftp://1, code=25"));
}

TEST_F(ListTest, EntriesThatAreNoProfilesAreSkipped) {
    Json::Value servers;
    servers["good"] = Entry("ftp", "nas", 21, "mine");
    servers["text"] = "ftp";
    servers["number"] = 7;
    servers["null"] = Json::Value();
    servers["array"] = Json::Value(Json::arrayValue);
    servers["empty"] = Json::Value(Json::objectValue);
    servers["number for protocol"] = Entry("ftp", "nas", 21, "mine");
    servers["number for protocol"]["protocol"] = 5;
    servers["object for port"] = Entry("ftp", "nas", 21, "mine");
    servers["object for port"]["port"] = Json::Value(Json::objectValue);
    servers["object for alias"] = Entry("ftp", "nas", 21, "mine");
    servers["object for alias"]["alias"] = Json::Value(Json::objectValue);
    Put(VFS_CONFIG_SERVER, servers);
    ASSERT_TRUE(Run("alias"));
    EXPECT_THAT(Ids(), ElementsAre("good"));
    EXPECT_EQ(out_["total"].asUInt(), 1U);
}

struct Order {
    const char* sort_by;
    bool ascending;
    std::vector<std::string> ids;
};

TEST_F(ListTest, SortsByEachKeyInBothDirections) {
    Json::Value servers;
    servers["1"] = Entry("sftp", "Bravo", 9, "xray", "amy", "UTF-8");
    servers["2"] = Entry("dav", "alpha", 2121, "Yankee", "Carl", "big5");
    servers["3"] = Entry("FTP", "charlie", 80, "whisky", "ben", "cp850");
    Put(VFS_CONFIG_SERVER, servers);
    const Order orders[] = {
        {"protocol", true, {"2", "3", "1"}}, {"protocol", false, {"1", "3", "2"}},
        {"port", true, {"1", "3", "2"}},     {"port", false, {"2", "3", "1"}},
        {"hostname", true, {"2", "1", "3"}}, {"hostname", false, {"3", "1", "2"}},
        {"alias", true, {"3", "1", "2"}},    {"alias", false, {"2", "1", "3"}},
        {"account", true, {"1", "3", "2"}},  {"account", false, {"2", "3", "1"}},
        {"codepage", true, {"2", "3", "1"}}, {"codepage", false, {"1", "3", "2"}},
        {"uri", true, {"2", "3", "1"}},      {"uri", false, {"1", "3", "2"}},
        {"nonsense", true, {"2", "3", "1"}}, {"nonsense", false, {"1", "3", "2"}},
        {nullptr, true, {"1", "2", "3"}},    {nullptr, false, {"1", "2", "3"}},
    };
    for (const Order& order : orders) {
        ASSERT_TRUE(Run(order.sort_by, order.ascending));
        EXPECT_EQ(Ids(), order.ids) << (order.sort_by == nullptr ? "null" : order.sort_by)
                                    << (order.ascending ? " up" : " down");
    }
}

TEST_F(ListTest, EqualEntriesKeepTheFilesOrderAndChangePlacesDownwards) {
    PutNumbered(5);
    ASSERT_TRUE(Run("alias", true));
    EXPECT_THAT(Ids(), ElementsAre("ftp://0", "ftp://1", "ftp://2", "ftp://3", "ftp://4"));
    ASSERT_TRUE(Run("alias", false));
    EXPECT_THAT(Ids(), ElementsAre("ftp://4", "ftp://3", "ftp://2", "ftp://1", "ftp://0"));
}

TEST_F(ListTest, SortIsStableForManyEqualEntries) {
    PutNumbered(90);
    ASSERT_TRUE(Run());
    std::vector<std::string> order = Ids();
    ASSERT_TRUE(Run("alias", true));
    EXPECT_EQ(Ids(), order);
    ASSERT_TRUE(Run("alias", false));
    std::reverse(order.begin(), order.end());
    EXPECT_EQ(Ids(), order);
}

struct Page {
    unsigned long offset;
    unsigned long limit;
    unsigned first;
    unsigned count;
};

TEST_F(ListTest, PagesOfFiveEntries) {
    PutNumbered(5);
    const Page pages[] = {
        {0, 0, 0, 5},         {3, 0, 0, 5},  {99, 0, 0, 5},  // no limit: no page
        {0, 2, 0, 2},         {1, 2, 1, 2},  {4, 2, 4, 1},
        {3, 5, 3, 2},         {0, 5, 0, 5},  {0, 6, 0, 5},
        {5, 2, 0, 0},         {5, 99, 0, 0},                // all skipped
        {6, 2, 0, 2},         {6, 99, 0, 5}, {8, 2, 2, 2},  // round once
        {11, 2, 0, 0},        {12, 1, 0, 1}, {ULONG_MAX, 9, ULONG_MAX % 6, 5 - ULONG_MAX % 6},
        {0, ULONG_MAX, 0, 5},
    };
    for (const Page& page : pages) {
        ASSERT_TRUE(Run(nullptr, true, page.offset, page.limit));
        std::vector<std::string> expected;
        for (unsigned i = 0; i < page.count; ++i) {
            expected.push_back("ftp://" + std::to_string(page.first + i));
        }
        EXPECT_EQ(Ids(), expected) << page.offset << ", " << page.limit;
        EXPECT_EQ(out_["total"].asUInt(), 5U) << "counted before the cut";
        EXPECT_EQ(out_["offset"].asUInt64(), page.offset);
    }
}

TEST_F(ListTest, PageIsCutAfterSorting) {
    PutNumbered(5);
    ASSERT_TRUE(Run("port", false, 1, 2));
    EXPECT_THAT(Ids(), ElementsAre("ftp://3", "ftp://2"));
}

TEST_F(ListTest, ProtocolThatTheCatalogueLacksShowsItself) {
    Json::Value servers;
    servers["x"] = Entry("gopher", "nas", 70, "old");
    Put(VFS_CONFIG_SERVER, servers);
    ASSERT_TRUE(Run());
    EXPECT_EQ(out_["profiles"][0]["protocol_name"], "gopher");
    EXPECT_EQ(out_["profiles"][0]["api"], Json::Value(Json::arrayValue));
}

TEST_F(ListTest, ItemsOfTheApiAreSplitAtCommasWithoutEmptyOnes) {
    const std::pair<const char*, std::vector<std::string>> texts[] = {
        {"", {}}, {",", {}}, {",,a,,b,", {"a", "b"}}, {"one", {"one"}}, {"a b,c", {"a b", "c"}}};
    PutNumbered(1);
    for (const auto& [text, items] : texts) {
        catalogue::Add("ftp", "FTP", text);
        ASSERT_TRUE(Run());
        Json::Value expected(Json::arrayValue);
        for (const std::string& item : items) {
            expected.append(item);
        }
        EXPECT_EQ(out_["profiles"][0]["api"], expected) << text;
    }
}

TEST_F(ListTest, UnreadableStoreFails) {
    profiles::PutText(profiles::File(VFS_CONFIG_SERVER), "no json");
    EXPECT_FALSE(Run());
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
}

TEST_F(ListTest, UnreadableCatalogueFails) {
    std::filesystem::create_directories(std::string(paths::kCatalogueDir) + "/x.mount");
    EXPECT_FALSE(Run());
    EXPECT_EQ(GetError(), VFS_ERR_CONFIG_READ);
    EXPECT_TRUE(seams::Logged("Failed to list protocol, code=3")) << seams::LogDump();
}

TEST_F(ListTest, MachineWithoutACatalogueStillLists) {
    std::filesystem::remove_all(paths::kCatalogueDir);
    PutNumbered(1);
    ASSERT_TRUE(Run());
    EXPECT_EQ(out_["profiles"][0]["protocol_name"], "ftp");
}

TEST_F(ListTest, DocumentsOfAWrongShapeHaveNoEntries) {
    for (const char* doc : {R"({"servers":[{"protocol":"ftp"}]})", R"({"servers":"x"})",
                            R"({"servers":5})", "[1]", "17", "null", "{}"}) {
        profiles::PutText(profiles::File(VFS_CONFIG_SERVER), doc);
        EXPECT_TRUE(Run()) << doc;
        EXPECT_EQ(out_["total"].asUInt(), 0U) << doc;
        EXPECT_EQ(out_["profiles"], Json::Value(Json::arrayValue)) << doc;
    }
}

TEST_F(ListTest, TextsOfAnyBytesAreListedAndSorted) {
    Json::Value servers;
    servers["a"] = Entry("ftp", "nas", 1, std::string(1 << 20, 'x'));
    servers["b"] = Entry("ftp", "nas", 2, std::string("x\0y", 3));
    servers["c"] = Entry("ftp", "nas", 3, "\xff\xfe");
    servers["d"] = Entry("ftp", "nas", 4, "");
    Put(VFS_CONFIG_SERVER, servers);
    for (const bool ascending : {true, false}) {
        ASSERT_TRUE(Run("alias", ascending));
        ASSERT_EQ(out_["profiles"].size(), 4U);
        for (const Json::Value& entry : out_["profiles"]) {
            EXPECT_EQ(entry["alias"], servers[entry["id"].asString()]["alias"]);
        }
    }
}

}  // namespace
}  // namespace ZYROVFS::Server
