// What drivers do with a transfer that its user would not expect is told before it happens.
#include "cloud/dropbox/dropbox.h"
#include "cloud/gdrive/gdrive.h"
#include "cloud/onedrive/onedrive.h"
#include "unit/cloud/box/box_fixture.h"

namespace ZYROCloud {
namespace {

constexpr long long kMost = 33554432;

class TransferSafe : public BoxTest {
  protected:
    /** Of a driver that need not ask its service. */
    template <typename Driver>
    bool IsSafe(const std::string& id, const std::string& path, bool upload, long long size = 1) {
        Json::Value profile;
        profile["server_id"] = id;
        Driver other(profiles::kUser, profile);
        const bool safe = Utils::IsTransferSafe(&other, id + path, upload, size, why);
        EXPECT_EQ(safe, why.empty()) << why;
        return safe;
    }
    bool IsBoxSafe(const std::string& path, bool upload = true) {
        return Utils::IsTransferSafe(box.get(), kServerId + path, upload, 1, why);
    }
    bool Dropboxes(const std::string& path, bool upload) {
        return IsSafe<Dropbox>("dropbox://amy@example.com", path, upload);
    }
    bool OneDrives(const std::string& path, long long size, bool upload = true) {
        return IsSafe<OneDrive>("onedrive://amy@example.com", path, upload, size);
    }

    std::string why;
};

TEST_F(TransferSafe, ADoubleQuoteInANameIsRefusedWhereItWouldBeSentInAnotherForm) {
    EXPECT_FALSE(IsBoxSafe("/a\"b.txt"));
    EXPECT_THAT(why, HasSubstr("double quote"));
    EXPECT_FALSE(Dropboxes("/a\"b.txt", true));
    EXPECT_FALSE(Dropboxes("/a\"b/c.txt", true)) << "the path goes as a whole";
    EXPECT_FALSE(Dropboxes("/a\"b.txt", false)) << "also for a download";
    EXPECT_FALSE(IsSafe<GDrive>("google://amy@example.com", "/a\"b.txt", true));
    EXPECT_TRUE(IsBoxSafe("/a\"b.txt", false)) << "goes by the item's id";
    EXPECT_TRUE(IsSafe<GDrive>("google://amy@example.com", "/a\"b.txt", false));
    EXPECT_TRUE(OneDrives("/a\"b.txt", 1)) << "names go as they are";
    EXPECT_TRUE(Dropboxes("/a'b.txt", true));
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(TransferSafe, ANameThatStandsInItsPathIsRefusedWhereTheFileWouldLandInAnotherFolder) {
    EXPECT_FALSE(OneDrives("/a/a", 1));
    EXPECT_THAT(why, HasSubstr("another folder"));
    EXPECT_FALSE(OneDrives("/data/dat", kMost)) << "as a part of a folder's name, too";
    EXPECT_FALSE(OneDrives("/a/a", -1)) << "of a size that nobody knows";
    EXPECT_TRUE(OneDrives("/a/a", kMost + 1)) << "fragments go by the whole path";
    EXPECT_TRUE(OneDrives("/a/a", 1, false));
    EXPECT_TRUE(OneDrives("/docs/a.txt", 1));
    EXPECT_TRUE(OneDrives("/a.txt", 1));
    EXPECT_TRUE(Dropboxes("/a/a", true));
}

TEST_F(TransferSafe, AFolderInTheWayOfAnUploadToBoxIsRefusedAndStays) {
    amy.AddPath("/docs/held/inside", "kept");
    Show("/docs");
    EXPECT_FALSE(IsBoxSafe("/docs/HELD")) << service.Journal().Text();
    EXPECT_THAT(why, HasSubstr("A folder of that name"));
    EXPECT_TRUE(amy.Exists("/docs/held/inside"));
    EXPECT_TRUE(IsBoxSafe("/docs/held", false));
}

TEST_F(TransferSafe, AFileInTheWayOrNothingAtAllIsNoObstacle) {
    amy.AddPath("/a.txt", "old");
    EXPECT_TRUE(IsBoxSafe("/a.txt")) << why;
    EXPECT_TRUE(IsBoxSafe("/b.txt")) << why;
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_NONE);
}

TEST_F(TransferSafe, AServiceThatDoesNotTellWhatIsThereIsNoYes) {
    service.AddFault(Fault::On("GET", "/2.0/folders/0/items").Answer(403, "{}"));
    EXPECT_FALSE(IsBoxSafe("/a.txt"));
    EXPECT_THAT(why, HasSubstr("did not tell"));
    EXPECT_EQ(box->GetErrorCode(), VFS_ERR_FORBIDDEN);
    EXPECT_FALSE(Utils::IsTransferSafe(nullptr, "box://x/a", true, 1, why));
    EXPECT_FALSE(why.empty());
}

}  // namespace
}  // namespace ZYROCloud
