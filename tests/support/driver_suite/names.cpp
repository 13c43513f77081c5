/** Names and items as no one should make them, and as people do. */
#include "core/json.h"
#include "support/driver_suite.h"
#include "support/seams.h"

namespace driver_suite {
namespace {

const Json::Value kNoParams(Json::objectValue);

// Good ones, which every service has to take.
const char* const kPlainNames[] = {
    "Straße 😀.txt",  "a'b.txt",         "100%25.txt",
    "a+b&c=d;e.txt", "a - b.txt",       "\xe2\x80\x8frtl\xe2\x80\xae.txt",
    "ΣΊΣΥΦΟΣ.txt",   "İstanbul ı.txt",  "x.tar.gz",
    "(1) [2] {3}.x", "~$lock, really!_"};

struct OddName {
    const char* json;  ///< as it stands in the answer
    std::string name;
    bool hidden;  ///< where listings leave such names out
};

std::vector<OddName> OddNames() {
    static std::vector<std::string> texts;
    texts.clear();
    texts.reserve(4);
    const auto text = [](size_t size) {
        texts.push_back("\"" + std::string(size, 'n') + "\"");
        return texts.back().c_str();
    };
    return {{"\"\"", "", false},
            {text(255), std::string(255, 'n'), false},
            {text(256), std::string(256, 'n'), true},
            {text(4096), std::string(4096, 'n'), true},
            {"\"a/b\"", "a/b", true},
            {R"("a\"b")", "a\"b", false},
            {R"("\"")", "\"", true},
            {R"("'")", "'", true},
            {R"("a\\b")", "a\\b", false},
            {"\"a\xff\xfe\"", "a\xff\xfe", false},
            {"\"\\ud83d\\ude00\"", "😀", false},
            {"\"\\u200f\\u202ertl\"", "\xe2\x80\x8f\xe2\x80\xaertl", false},
            {"\"\\u0130\\u0131\"", "İı", false}};
}

const char* const kOddItems[] = {
    "{}",
    "null",
    "7",
    "[]",
    "\"text\"",
    R"({"name":null,"title":null,"id":null,"type":null,"path":null})",
    R"({"name":7,"title":7,"id":8,"type":9,"size":"12","path":10,"is_dir":"true"})",
    R"({"name":{},"title":{},"id":{},"type":{},"size":{},"path":{},"is_dir":{}})",
    R"({"name":[],"title":[],"id":[],"type":[],"size":[],"path":[],"is_dir":[]})",
    R"({"id":"x1","name":"no kind","title":"no kind"})",
    R"({"name":"no id","title":"no id","type":"file","size":-5})",
    R"({"id":"x2","name":"sizes","title":"sizes","size":1e300,"fileSize":"no number"})",
    R"({"id":"x3","name":"dates","title":"dates","modified_at":"31.12.1999","created_at":7,)"
    R"("createdDate":"9999-99-99T99:99:99Z","modifiedDate":{},"created_time":"","updated_time":[],)"
    R"("client_modified":"2020-02-30","server_modified":"T"})"};

}  // namespace

TEST_P(DriverNames, ThatPeopleGiveGoUpAndAreFound) {
    for (const char* name : kPlainNames) {
        const std::string path = std::string("/target/") + name;
        EXPECT_TRUE(Upload("hello", path)) << name << seams::LogDump();
        EXPECT_EQ(TextOf(path), "hello") << name;
        Json::Value out;
        EXPECT_TRUE(cloud->GetFileInfo(Id(path), kNoParams, out)) << name << seams::LogDump();
        EXPECT_EQ(rig->ItemName(out), name);
        if (can.walks) {
            std::string id;
            EXPECT_TRUE(rig->Resolve(*cloud, path, id)) << name << seams::LogDump();
            EXPECT_EQ(id, Id(path)) << name;
        }
        Show(path);
        EXPECT_TRUE(Download(path, 5)) << name << seams::LogDump();
        EXPECT_EQ(received.Text(), "hello") << name;
    }
    Json::Value out;
    EXPECT_TRUE(cloud->ListFolder(Id("/target"), kNoParams, out));
    EXPECT_THAT(NamesIn(out), testing::UnorderedElementsAreArray(kPlainNames));
}

TEST_P(DriverNames, ThatPeopleGiveAreMadeAndChanged) {
    std::string last = "a.txt";
    for (const char* name : kPlainNames) {
        EXPECT_TRUE(cloud->CreateFolder(Id("/target"), name, kNoParams))
            << name << seams::LogDump();
        EXPECT_TRUE(amy.Exists(std::string("/target/") + name)) << name;
        EXPECT_TRUE(cloud->Rename(Id("/docs/" + last), name)) << name << seams::LogDump();
        last = name;
        EXPECT_EQ(TextOf("/docs/" + last), kDigits) << name;
    }
}

TEST_P(DriverNames, TheServiceHasTheLastWordOnNamesOfAnyLength) {
    for (const size_t length : {0U, 255U, 256U, 4096U}) {
        const std::string name(length, 'n');
        const bool made = cloud->CreateFolder(Id("/target"), name, kNoParams);
        EXPECT_EQ(amy.List(amy.Find("/target")).size(), made ? 1U : 0U) << length;
        EXPECT_TRUE(made || Code() != VFS_ERR_NONE) << length;
        Restore();
        const bool renamed = cloud->Rename(Id("/docs/a.txt"), name);
        EXPECT_EQ(amy.List(amy.Find("/docs")).size(), 1U) << length;
        // An empty name may also be taken for none.
        EXPECT_TRUE(length == 0 || amy.Exists("/docs/a.txt") == !renamed) << length;
        Restore();
    }
}

TEST_P(DriverNames, OddOnesInAListingAreGivenAsTheyAre) {
    for (const OddName& row : OddNames()) {
        Restore();
        Add(On(Op::kList).Body(rig->PageText(rig->ItemText(row.json, "x9", false))));
        Json::Value out;
        EXPECT_TRUE(cloud->ListFolder(Id("/docs"), kNoParams, out)) << row.json << seams::LogDump();
        if (can.hides_names && row.hidden) {
            EXPECT_TRUE(out.isArray() && out.empty()) << row.json;
        } else {
            EXPECT_THAT(NamesIn(out), testing::ElementsAre(row.name)) << row.json;
        }
    }
}

TEST_P(DriverNames, AnItemThatIsNoneEndsAtMostTheListing) {
    for (const char* item : kOddItems) {
        Restore();
        Add(On(Op::kList).Body(rig->PageText(rig->ItemText("\"good\"", "x9", false) + "," + item)));
        Json::Value out;
        if (cloud->ListFolder(Id("/docs"), kNoParams, out)) {
            EXPECT_GE(out.size(), 1U) << item;
            EXPECT_EQ(rig->ItemName(out[0]), "good") << item;
        } else {
            EXPECT_EQ(Code(), VFS_ERR_CLOUD_FAILED) << item << seams::LogDump();
        }
    }
}

TEST_P(DriverNames, AWalkPastAnItemThatIsNoneEnds) {
    if (!can.walks) {
        GTEST_SKIP() << "paths are ids";
    }
    for (const char* item : kOddItems) {
        Restore();
        // Whatever is listed holds the same two items.
        Add(rig->AnyListing().Forever().Answer(
            200, rig->PageText(std::string(item) + "," + rig->ItemText("\"good\"", "x9", false))));
        std::string id;
        if (!rig->Resolve(*cloud, "/good", id)) {
            EXPECT_TRUE(Code() == VFS_ERR_CLOUD_FAILED || Code() == VFS_ERR_NOT_FOUND)
                << item << seams::LogDump();
            EXPECT_EQ(id, "") << item;
        }
        sim.ClearFaults();
    }
}

TEST_P(DriverNames, AFolderThatHoldsItselfIsWalkedAsFarAsThePathGoes) {
    if (!can.walks) {
        GTEST_SKIP() << "paths are ids";
    }
    const std::string self = rig->ItemText("\"self\"", "x9", true);
    Add(rig->AnyListing().Forever().Answer(200, rig->PageText(self)));
    std::string path, id;
    for (int i = 0; i < 50; i++) {
        path += "/self";
    }
    EXPECT_TRUE(rig->Resolve(*cloud, path, id)) << seams::LogDump();
    EXPECT_THAT(id, testing::EndsWith("x9"));
    EXPECT_LE(sim.Journal().All().size(), 51U);
    id.clear();
    EXPECT_FALSE(rig->Resolve(*cloud, path + "/none", id));
    EXPECT_EQ(Code(), VFS_ERR_NOT_FOUND);
}

TEST_P(DriverNames, APageThatIsItsOwnNextOneEndsTheListingWithALine) {
    const std::string page = rig->CircularPage();
    if (page.empty()) {
        GTEST_SKIP() << "pages have no names";
    }
    Add(On(Op::kList).Forever().Answer(200, page));
    Json::Value out;
    EXPECT_FALSE(cloud->ListFolder(Id("/docs"), kNoParams, out));
    EXPECT_EQ(Code(), VFS_ERR_CLOUD_FAILED);
    EXPECT_TRUE(seams::LoggedPart("Listing goes in a circle")) << seams::LogDump();
    EXPECT_LE(Count(Op::kList), 3U);
}

}  // namespace driver_suite
