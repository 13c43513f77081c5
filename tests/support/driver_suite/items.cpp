/** What only looks: account, items, listings, walks. */
#include <algorithm>

#include "core/json.h"
#include "support/driver_suite.h"
#include "support/seams.h"

namespace driver_suite {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::UnorderedElementsAre;

const Json::Value kNoParams(Json::objectValue);

std::string Ten(int number) {
    return "part-" + std::to_string(number);
}

}  // namespace

TEST_P(DriverItems, TheAccountIsAskedOnce) {
    Json::Value out;
    EXPECT_TRUE(cloud->GetAccountInfo(kNoParams, out)) << seams::LogDump();
    EXPECT_TRUE(out.isObject() && !out.empty());
    EXPECT_EQ(Count(Op::kAccount), 1U);
}

TEST_P(DriverItems, AFileAndAFolderAreDescribedByTheirIds) {
    Json::Value out;
    EXPECT_TRUE(cloud->GetFileInfo(Id("/docs/a.txt"), kNoParams, out)) << seams::LogDump();
    EXPECT_EQ(rig->ItemName(out), "a.txt");
    EXPECT_FALSE(rig->IsFolder(*cloud, out));
    EXPECT_EQ(rig->ItemId(*cloud, out), Id("/docs/a.txt"));
    EXPECT_TRUE(cloud->GetFileInfo(Id("/docs"), kNoParams, out)) << seams::LogDump();
    EXPECT_TRUE(rig->IsFolder(*cloud, out));
    EXPECT_EQ(rig->ItemId(*cloud, out), Id("/docs"));
}

TEST_P(DriverItems, WhatIsGoneIsNotFound) {
    const std::string id = Id("/docs/a.txt");
    amy.Remove(amy.Find("/docs/a.txt"));
    Json::Value out;
    EXPECT_FALSE(cloud->GetFileInfo(id, kNoParams, out));
    EXPECT_EQ(Code(), VFS_ERR_NOT_FOUND) << seams::LogDump();
}

TEST_P(DriverItems, AFolderIsListedWithFilesAndFolders) {
    amy.AddPath("/docs/b.txt", "x");
    amy.AddFolder(amy.Find("/docs"), "sub");
    Json::Value out;
    EXPECT_TRUE(cloud->ListFolder(Id("/docs"), kNoParams, out)) << seams::LogDump();
    EXPECT_THAT(NamesIn(out), UnorderedElementsAre("a.txt", "b.txt", "sub"));
    for (const Json::Value& item : out) {
        EXPECT_EQ(rig->IsFolder(*cloud, item), rig->ItemName(item) == "sub");
        EXPECT_EQ(rig->ItemId(*cloud, item), Id("/docs/" + rig->ItemName(item)));
    }
    EXPECT_EQ(Count(Op::kList), 1U);
}

TEST_P(DriverItems, TheRootIsListed) {
    Json::Value out;
    EXPECT_TRUE(cloud->ListFolder(Id("/"), kNoParams, out)) << seams::LogDump();
    EXPECT_THAT(NamesIn(out), UnorderedElementsAre("docs", "target"));
}

TEST_P(DriverItems, AnEmptyFolderIsAnEmptyArray) {
    Json::Value out;
    EXPECT_TRUE(cloud->ListFolder(Id("/target"), kNoParams, out)) << seams::LogDump();
    EXPECT_TRUE(out.isArray());
    EXPECT_TRUE(out.empty());
}

TEST_P(DriverItems, AFolderThatIsGoneCannotBeListed) {
    const std::string id = Id("/target");
    amy.Remove(amy.Find("/target"));
    Json::Value out;
    EXPECT_FALSE(cloud->ListFolder(id, kNoParams, out));
    EXPECT_EQ(Code(), VFS_ERR_NOT_FOUND) << seams::LogDump();
}

TEST_P(DriverItems, AListingOfManyItemsHasEachOfThemOnce) {
    const size_t count = can.page_size == 0 ? 1500 : 2 * can.page_size + 1;
    amy.AddMany(amy.Find("/target"), count, 1);
    sim.Journal().Clear();
    Json::Value out;
    EXPECT_TRUE(cloud->ListFolder(Id("/target"), kNoParams, out)) << seams::LogDump();
    std::vector<std::string> names = NamesIn(out);
    std::sort(names.begin(), names.end());
    EXPECT_EQ(names.size(), count);
    EXPECT_TRUE(std::unique(names.begin(), names.end()) == names.end());
    EXPECT_EQ(sim.Journal().All().size(), can.page_size == 0 ? 1U : 3U) << sim.Journal().Text();
}

TEST_P(DriverItems, HiddenNamesAreLeftOutWhereTheListingDoesThat) {
    amy.AddPath("/target/'", "x");
    amy.AddPath("/target/b.txt", "x");
    amy.AddFolder(amy.Find("/target"), ".ZyrotechWorkingDirectory");
    Json::Value out;
    EXPECT_TRUE(cloud->ListFolder(Id("/target"), kNoParams, out));
    EXPECT_EQ(out.size(), can.hides_names ? 1U : 3U);
}

TEST_P(DriverItems, AWalkOfTenStepsFindsItsItem) {
    if (!can.walks) {
        GTEST_SKIP() << "paths are ids";
    }
    std::string path;
    for (int i = 0; i < 9; i++) {
        path += "/" + Ten(i);
    }
    amy.AddPath(path + "/end.txt", "x");
    sim.Journal().Clear();
    std::string id;
    EXPECT_TRUE(rig->Resolve(*cloud, path + "/end.txt", id)) << seams::LogDump();
    EXPECT_EQ(id, Id(path + "/end.txt"));
    EXPECT_LE(sim.Journal().All().size(), 10U) << sim.Journal().Text();
    RecordProperty("requests", static_cast<int>(sim.Journal().All().size()));
}

TEST_P(DriverItems, AWalkThatLeadsNowhereIsNotFound) {
    if (!can.walks) {
        GTEST_SKIP() << "paths are ids";
    }
    for (const char* path : {"/none", "/docs/none", "/docs/a.txt/none", "/none/a.txt", "/docs/"}) {
        cloud->SetError(VFS_ERR_NONE, "");
        std::string id;
        EXPECT_FALSE(rig->Resolve(*cloud, path, id)) << path;
        EXPECT_EQ(Code(), VFS_ERR_NOT_FOUND) << path;
        EXPECT_EQ(id, "") << path;
    }
}

TEST_P(DriverItems, AWalkFindsNamesInAnotherCaseWhereTheServiceTakesThemForOne) {
    if (!can.walks) {
        GTEST_SKIP() << "paths are ids";
    }
    amy.AddPath("/docs/Übung ΣΔ.txt", "x");
    std::string id;
    EXPECT_EQ(rig->Resolve(*cloud, "/DOCS/A.TXT", id), can.folds_case) << seams::LogDump();
    EXPECT_EQ(id, can.folds_case ? Id("/docs/a.txt") : "");
    id.clear();
    EXPECT_EQ(rig->Resolve(*cloud, "/docs/üBUNG σδ.TXT", id), can.folds_case) << seams::LogDump();
    EXPECT_EQ(id, can.folds_case ? Id("/docs/Übung ΣΔ.txt") : "");
}

TEST_P(DriverItems, NamesakesAreAllListedAndNoneIsTakenForThePath) {
    if (!can.namesakes) {
        GTEST_SKIP() << "one item of a name";
    }
    constexpr unsigned kMany = 500;
    const std::string folder = amy.Find("/target");
    for (unsigned i = 0; i < kMany; i++) {
        amy.AddFile(folder, "same.txt", "");
    }
    Json::Value out;
    EXPECT_TRUE(cloud->ListFolder(Id("/target"), kNoParams, out)) << seams::LogDump();
    EXPECT_EQ(out.size(), kMany);
    std::string id;
    EXPECT_FALSE(rig->Resolve(*cloud, "/target/same.txt", id));
    EXPECT_EQ(Code(), VFS_ERR_NOT_FOUND);
    EXPECT_EQ(id, "");
}

TEST_P(DriverItems, APageOfTenThousandItemsOfOneNameIsListedWhole) {
    std::string items;
    for (int i = 0; i < 10000; i++) {
        items +=
            (i == 0 ? "" : ",") + rig->ItemText("\"same.txt\"", "x" + std::to_string(i), false);
    }
    Add(On(Op::kList).Body(rig->PageText(items)));
    Json::Value out;
    EXPECT_TRUE(cloud->ListFolder(Id("/docs"), kNoParams, out)) << seams::LogDump();
    EXPECT_EQ(out.size(), 10000U);
}

}  // namespace driver_suite
