#include "cloud/conflict.h"

#include <gmock/gmock.h>

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

}  // namespace
}  // namespace ZYROCloud
