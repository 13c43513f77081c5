#include "cloud/path_walk.h"

#include <gmock/gmock.h>

#include <map>

#include "support/seams.h"

namespace ZYROCloud {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

/** A remote tree: for each parent and name the ids, in the order of the listing. */
class PathWalk : public testing::Test {
  protected:
    PathWalk() {
        rules_.lookup = [this](const std::string& parent, const std::string& name,
                               std::vector<std::string>& ids) {
            asked_.push_back(parent + ":" + name);
            if (name == broken_) {
                return false;
            }
            const auto found = tree_.find(parent + ":" + name);
            if (found != tree_.end()) {
                ids.insert(ids.end(), found->second.begin(), found->second.end());
            }
            return true;
        };
    }

    void SetUp() override { seams::Reset(); }
    bool Walk(const std::string& path) { return WalkPath("", path, rules_, id_); }

    std::map<std::string, std::vector<std::string>> tree_;
    std::string broken_ = "no name";
    WalkRules rules_;
    std::vector<std::string> asked_;
    std::string id_;
};

TEST_F(PathWalk, GoesDownNameByName) {
    tree_ = {{":docs", {"1"}}, {"1:old", {"2"}}, {"2:a.txt", {"3"}}};
    EXPECT_TRUE(Walk("/docs/old/a.txt"));
    EXPECT_EQ(id_, "3");
    EXPECT_THAT(asked_, ElementsAre(":docs", "1:old", "2:a.txt"));
}

TEST_F(PathWalk, FoldersOfOneNameAreSearchedDepthFirst) {
    tree_ = {{":docs", {"1", "2"}},
             {"1:old", {"3", "4"}},
             {"2:old", {"5"}},
             {"4:no.txt", {"6"}},
             {"5:a.txt", {"7", "8"}}};
    EXPECT_TRUE(Walk("/docs/old/a.txt"));
    EXPECT_EQ(id_, "7");
    EXPECT_THAT(asked_, ElementsAre(":docs", "1:old", "3:a.txt", "4:a.txt", "2:old", "5:a.txt"));
}

TEST_F(PathWalk, NoneOfTheFoldersLeadingThereIsTrueWithoutAnId) {
    tree_ = {{":docs", {"1", "2"}}};
    EXPECT_TRUE(Walk("/docs/a.txt"));
    EXPECT_EQ(id_, "");
}

TEST_F(PathWalk, ANameThatIsNotThereFailsOrEndsWithoutAnIdAsTheServiceHasIt) {
    EXPECT_FALSE(Walk("/docs/a.txt"));
    EXPECT_FALSE(Walk("/docs"));
    rules_.missing_fails = false;
    EXPECT_TRUE(Walk("/docs/a.txt"));
    EXPECT_TRUE(Walk("/docs"));
    EXPECT_EQ(id_, "");
}

TEST_F(PathWalk, OnlyTheFirstCandidateIsFollowedWhereTheServiceHasOne) {
    tree_ = {{":docs", {"1", "2"}}, {"2:a.txt", {"3"}}};
    rules_.first_only = true;
    EXPECT_FALSE(Walk("/docs/a.txt"));
    EXPECT_EQ(id_, "");
    EXPECT_THAT(asked_, ElementsAre(":docs", "1:a.txt"));
}

TEST_F(PathWalk, AServiceMayPickAmongTheLast) {
    tree_ = {{":docs", {"1"}}, {"1:a.txt", {"2", "3"}}};
    rules_.pick = [](std::vector<std::string>& ids, std::string& id) {
        id = ids.back();
        return true;
    };
    EXPECT_TRUE(Walk("/docs/a.txt"));
    EXPECT_EQ(id_, "3");
}

TEST_F(PathWalk, AServiceMayNameParentsInAnotherWay) {
    tree_ = {{":docs", {"folders/1"}}, {"1:a.txt", {"files/2"}}};
    rules_.as_parent = [](const std::string& id) { return id.substr(id.rfind('/') + 1); };
    EXPECT_TRUE(Walk("/docs/a.txt"));
    EXPECT_EQ(id_, "files/2");
}

TEST_F(PathWalk, ALookupThatFailsIsLoggedAndTheNextNamesakeTried) {
    tree_ = {{":docs", {"1"}}};
    broken_ = "a.txt";
    rules_.lookup_failed = "Failed to get id by name %s from server";
    EXPECT_TRUE(Walk("/docs/a.txt"));
    EXPECT_EQ(id_, "");
    EXPECT_TRUE(seams::Logged("Failed to get id by name a.txt from server")) << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart("path_walk_test.cpp:"));
    broken_ = "docs";
    EXPECT_FALSE(Walk("/docs/a.txt"));
}

TEST_F(PathWalk, FoldersThatHoldEachOtherAreEnteredOnceAtEachDepth) {
    tree_ = {{":a", {"1", "2"}}, {"1:a", {"1", "2"}}, {"2:a", {"1", "2"}}, {"2:b", {"3"}}};
    EXPECT_TRUE(Walk("/a/a/a/a/none"));
    EXPECT_EQ(id_, "");
    EXPECT_EQ(asked_.size(), 1U + 4U * 2U);
    EXPECT_TRUE(Walk("/a/a/a/a/b"));
    EXPECT_EQ(id_, "3");
}

TEST_F(PathWalk, AnEmptyPathFailsWithoutAQuestion) {
    EXPECT_FALSE(Walk(""));
    EXPECT_THAT(asked_, IsEmpty());
}

TEST_F(PathWalk, APathLongerThanTheTreeTakesIsNotWalked) {
    rules_.lookup = [](const std::string&, const std::string&, std::vector<std::string>& ids) {
        ids.push_back("1");
        return true;
    };
    std::string path;
    while (path.size() + 2 <= kLongestPath) {
        path += "/a";
    }
    EXPECT_TRUE(Walk(path));
    EXPECT_FALSE(Walk(path + "/a"));
}

TEST(CutPath, AtTheLastSlash) {
    struct {
        std::string path, parent, name;
    } rows[] = {{"/docs/old/a.txt", "/docs/old", "a.txt"},
                {"/a.txt", "", "a.txt"},
                {"/docs/", "/docs", ""},
                {"/", "", ""},
                {"docs/a", "docs", "a"}};
    for (const auto& row : rows) {
        std::string parent;
        std::string name;
        EXPECT_TRUE(CutAtLastSlash(row.path, parent, name)) << row.path;
        EXPECT_EQ(parent, row.parent) << row.path;
        EXPECT_EQ(name, row.name) << row.path;
    }
    std::string parent = "p";
    std::string name = "n";
    EXPECT_FALSE(CutAtLastSlash("docs", parent, name));
    EXPECT_FALSE(CutAtLastSlash("", parent, name));
    EXPECT_EQ(parent + name, "pn");
}

TEST(CutPath, BehindTheFirstComponent) {
    struct {
        std::string path, component, rest;
    } rows[] = {{"/docs/old/a", "docs", "/old/a"},
                {"/docs", "docs", ""},
                {"/docs/", "docs", "/"},
                {"//a", "", "/a"},
                {"/", "", ""},
                {"", "", ""}};
    for (const auto& row : rows) {
        std::string component = "x";
        std::string rest = "x";
        CutFirstComponent(row.path, component, rest);
        EXPECT_EQ(component, row.component) << row.path;
        EXPECT_EQ(rest, row.rest) << row.path;
    }
}

}  // namespace
}  // namespace ZYROCloud
