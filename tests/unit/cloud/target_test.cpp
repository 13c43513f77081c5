#include "cloud/target.h"

#include <gmock/gmock.h>

#include <map>
#include <vector>

#include "support/bare_driver.h"
#include "support/seams.h"

namespace ZYROCloud {
namespace {

using namespace ZYROVFS;  // NOLINT(google-build-using-namespace)
using testing::ElementsAre;
using testing::IsEmpty;

/** Knows some paths, and notes what it is asked to do. */
class IdDriver : public bare::PlainDriver {
  public:
    std::string GetFileIDByPath(const std::string& path) const {
        const auto found = ids.find(path);
        return found == ids.end() ? "" : found->second;
    }
    std::string GetFileID(const Json::Value& item) const { return item["id"].asString(); }
    bool IsDir(const Json::Value& item) const { return item["folder"].asBool(); }
    bool Delete(const std::string& id) override { return Note("delete " + id); }
    using PlainDriver::Move;
    bool Move(const std::string& old_parent, const std::string& id, const std::string& parent) {
        return Note("move " + id + " from " + old_parent + " to " + parent);
    }
    bool Note(const std::string& step) {
        steps.push_back(step);
        return true;
    }

    std::map<std::string, std::string> ids = {
        {"", "root"}, {"/a", "1"}, {"/docs", "2"}, {"/docs/b", "3"}};
    std::vector<std::string> steps;
};

class Target : public testing::Test {
  protected:
    void SetUp() override { seams::Reset(); }

    bool Replace(const std::string& source, const std::string& rival, bool folder = false,
                 const std::string& name = "a.txt") {
        const auto find = [&](Json::Value& item) {
            item["id"] = rival;
            item["name"] = name;
            item["folder"] = folder;
            return true;
        };
        return ReplaceItem(drive, source, "a.txt", find, [this] { return drive.Note("again"); });
    }

    IdDriver drive;
    std::string id, parent;
};

TEST_F(Target, OfACopyIsTheItemAndTheFolderOfTheNewPlace) {
    EXPECT_TRUE(FindCopyIds(drive, "/a", "/docs/new", id, parent));
    EXPECT_EQ(id + " " + parent, "1 2");
    EXPECT_TRUE(FindCopyIds(drive, "/docs/b", "/new", id, parent));
    EXPECT_EQ(id + " " + parent, "3 root");
}

TEST_F(Target, ThatIsUnknownOrHasNoSlashIsNotFound) {
    for (const auto& [from, to] :
         {std::pair("/x", "/docs/y"), {"/a", "/x/y"}, {"/a", "no slash"}}) {
        drive.SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(FindCopyIds(drive, from, to, id, parent)) << to;
        EXPECT_EQ(drive.GetErrorCode(), VFS_ERR_NOT_FOUND);
    }
    EXPECT_TRUE(seams::Logged("Failed to find / from [no slash]")) << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart("target_test.cpp:"));
}

TEST_F(Target, OfAMoveIsTheFolderOfTheNewPlace) {
    EXPECT_TRUE(MoveByPath(drive, "/docs/b", "/another name"));
    EXPECT_THAT(drive.steps, ElementsAre("move 3 from 2 to root"));
}

TEST_F(Target, OfAMoveOfWhatIsUnknownIsNotFound) {
    for (const auto& [from, to] : {std::pair("/x", "/docs/y"), {"/a", "no slash"}}) {
        drive.SetError(VFS_ERR_NONE, "");
        EXPECT_FALSE(MoveByPath(drive, from, to));
        EXPECT_EQ(drive.GetErrorCode(), VFS_ERR_NOT_FOUND);
    }
    drive.ids["no slash"] = "4";
    EXPECT_FALSE(MoveByPath(drive, "no slash", "/docs/y"));
    EXPECT_THAT(drive.steps, IsEmpty());
}

TEST_F(Target, AFileInTheWayIsDeletedAndAFolderIsNot) {
    EXPECT_TRUE(Replace("1", "9"));
    EXPECT_THAT(drive.steps, ElementsAre("delete 9", "again"));
    drive.steps.clear();
    EXPECT_FALSE(Replace("1", "9", true));
    EXPECT_EQ(drive.GetErrorCode(), VFS_ERR_IS_DIRECTORY);
    EXPECT_THAT(drive.steps, IsEmpty());
}

TEST_F(Target, ASourceIsNeverDeletedForItsOwnCopy) {
    drive.SetError(VFS_ERR_CONFLICT, "");
    EXPECT_FALSE(Replace("1", "1"));
    EXPECT_EQ(drive.GetErrorCode(), VFS_ERR_CONFLICT);
    EXPECT_THAT(drive.steps, IsEmpty());
}

TEST_F(Target, AnItemOfAnotherNameIsNotWhatTheCopyMet) {
    for (const char* name : {"b.txt", ""}) {
        drive.SetError(VFS_ERR_CONFLICT, "");
        EXPECT_FALSE(Replace("1", "9", false, name));
        EXPECT_EQ(drive.GetErrorCode(), VFS_ERR_CONFLICT);
    }
    EXPECT_FALSE(Replace("1", ""));
    EXPECT_THAT(drive.steps, IsEmpty());
    EXPECT_TRUE(Replace("1", "9", false, "A.TXT"));
    EXPECT_THAT(drive.steps, ElementsAre("delete 9", "again"));
}

TEST_F(Target, AWalkWithoutAnIdIsNotFound) {
    EXPECT_TRUE(FindOnServer(
        drive, [](std::string& found) { return !(found = "7").empty(); }, id));
    EXPECT_EQ(id, "7");
    EXPECT_FALSE(FindOnServer(
        drive, [](std::string&) { return true; }, id));
    EXPECT_EQ(drive.GetErrorCode(), VFS_ERR_NOT_FOUND);
    drive.SetError(VFS_ERR_TIMEOUT, "");
    EXPECT_FALSE(FindOnServer(
        drive,
        [](std::string& found) {
            found = "8";
            return false;
        },
        id));
    EXPECT_EQ(drive.GetErrorCode(), VFS_ERR_NOT_FOUND);
    EXPECT_EQ(id, "7");
}

}  // namespace
}  // namespace ZYROCloud
