#include "cloud/conflict.h"

#include <gmock/gmock.h>

#include "support/bare_driver.h"
#include "support/scripted_cloud.h"

namespace ZYROCloud {
namespace {

using namespace ZYROVFS;
using testing::ElementsAre;

class Conflict : public testing::Test {
  protected:
    bool Replace() {
        return ReplaceFile(
            cloud_,
            [this](Json::Value& item) {
                item["id"] = "7";
                return Step("find");
            },
            [this](const Json::Value& item) { return item["id"] == "7" && folder_; },
            [this](const Json::Value& item) { return Step("remove " + item["id"].asString()); },
            [this] { return Step("again"); });
    }
    bool Step(const std::string& name) {
        steps_.push_back(name);
        return name != fails_;
    }

    ScriptedCloud cloud_;
    bool folder_ = false;
    std::string fails_;
    std::vector<std::string> steps_;
};

/** A service that knows the name of every item. */
class Shown : public bare::PlainDriver {
  public:
    bool GetFileInfo(const std::string& id, const Json::Value&, Json::Value& out) override {
        asked.push_back(id);
        out["name"] = name;
        return answers;
    }

    std::string name;
    bool answers = true;
    std::vector<std::string> asked;
};

Json::Value Named(const std::string& name) {
    Json::Value item;
    item["name"] = name;
    return item;
}

TEST_F(Conflict, AFileGivesWayAndTheWorkIsDoneOnceMore) {
    EXPECT_TRUE(Replace());
    EXPECT_THAT(steps_, ElementsAre("find", "remove 7", "again"));
    EXPECT_EQ(cloud_.GetErrorCode(), VFS_ERR_NONE);
}

TEST_F(Conflict, AFolderStaysWhereItIs) {
    folder_ = true;
    EXPECT_FALSE(Replace());
    EXPECT_THAT(steps_, ElementsAre("find"));
    EXPECT_EQ(cloud_.GetErrorCode(), VFS_ERR_IS_DIRECTORY);
}

TEST_F(Conflict, EachStepThatFailsEndsItWithItsOwnError) {
    struct {
        std::string fails;
        std::vector<std::string> steps;
    } rows[] = {{"find", {"find"}},
                {"remove 7", {"find", "remove 7"}},
                {"again", {"find", "remove 7", "again"}}};
    for (const auto& row : rows) {
        steps_.clear();
        fails_ = row.fails;
        cloud_.SetError(VFS_ERR_FORBIDDEN, "");
        EXPECT_FALSE(Replace());
        EXPECT_EQ(steps_, row.steps);
        EXPECT_EQ(cloud_.GetErrorCode(), VFS_ERR_FORBIDDEN);
    }
}

TEST(NamesInConflict, CompareWithoutCaseAndWithTheirQuotesAsUploadsWriteThem) {
    EXPECT_EQ(NameAtEnd("/docs/a.txt"), "a.txt");
    EXPECT_EQ(NameAtEnd("a.txt"), "a.txt");
    EXPECT_TRUE(IsNamed(Named("A.TXT"), "a.txt"));
    EXPECT_TRUE(IsNamed(Named("a \\\"b\\\""), "a \"b\""));
    EXPECT_FALSE(IsNamed(Named("b.txt"), "a.txt"));
    EXPECT_FALSE(IsNamed(Json::Value(), "a.txt"));
    EXPECT_FALSE(IsNamed(Json::Value("a.txt"), "a.txt"));
}

TEST(NamesInConflict, AreAskedForWhereAPathMayHaveAnOwnerInIt) {
    Shown cloud;
    cloud.name = "report";
    EXPECT_TRUE(HasNameOf(cloud, Named("report"), "7", "report - Amy Doe"));
    EXPECT_FALSE(HasNameOf(cloud, Named("report - Amy Doe"), "7", "report - Amy Doe"));
    cloud.name = "report - Amy Doe";
    EXPECT_FALSE(HasNameOf(cloud, Named("report"), "7", "report - Amy Doe"));
    EXPECT_TRUE(HasNameOf(cloud, Named("report - Amy Doe"), "7", "report - Amy Doe"));
    EXPECT_THAT(cloud.asked, testing::Each("7"));
    cloud.name = "";
    EXPECT_FALSE(HasNameOf(cloud, Named(""), "7", "report - Amy Doe"));
    cloud.answers = false;
    EXPECT_FALSE(HasNameOf(cloud, Named("report"), "7", "report - Amy Doe"));
    cloud.asked.clear();
    EXPECT_TRUE(HasNameOf(cloud, Named("report"), "7", "report"));
    EXPECT_THAT(cloud.asked, testing::IsEmpty());
}

}  // namespace
}  // namespace ZYROCloud
