#include "bridge/gvfs_utils.h"

#include "cloud/dropbox/dropbox.h"
#include "support/catalogue.h"
#include "support/cloudsim/dropbox.h"
#include "support/driver_fixture.h"
#include "zyrovfs/zyrocloud.h"

namespace ZYROCloud {
namespace {

/** What `err` holds as long as nobody has stored anything. */
constexpr int kUntouched = 4711;

/** The operations of all services, by way of one: paths are its ids, and it tells of too many
 * files.
 */
class CommonOperations : public DriverFixture<Dropbox, cloudsim::Dropbox> {
  protected:
    CommonOperations() : DriverFixture("dropbox") {}

    std::map<std::string, std::string> Hosts() const override {
        return {{"DropboxApiHost", service.ApiHost()},
                {"DropboxContentHost", service.ContentHost()}};
    }
    void SetUp() override {
        DriverFixture::SetUp();
        catalogue::Clear();
        catalogue::Add("dropbox", "Dropbox", "connect");
        drive.reset();
        amy.AddPath("/docs/a.txt", "text");
    }
    /** The next request is refused as the service words it. */
    void Refuse(const std::string& tag) {
        service.AddFault(
            Fault::On("POST", "/2/files/")
                .Answer(409, R"({"error_summary":"x","error":{".tag":")" + tag + R"("}})"));
    }

    const char* id() const { return server_id.c_str(); }

    int err = kUntouched;
    const void* const any = this;
};

// --- what they do ---------------------------------------------------------------------------

TEST_F(CommonOperations, RenameChangesTheName) {
    EXPECT_EQ(ZYROCloud_Cloud_Rename(id(), any, "/docs/a.txt", "b.txt", &err), 1);
    EXPECT_TRUE(amy.Exists("/docs/b.txt"));
    EXPECT_EQ(err, kUntouched);
}

TEST_F(CommonOperations, MoveChangesTheFolder) {
    EXPECT_EQ(ZYROCloud_Cloud_Move(id(), any, "/docs/a.txt", "/a.txt", &err), 1);
    EXPECT_TRUE(amy.Exists("/a.txt"));
    EXPECT_EQ(err, kUntouched);
}

TEST_F(CommonOperations, DeleteTakesAnItemAway) {
    EXPECT_EQ(ZYROCloud_Cloud_Delete(id(), any, "/docs/a.txt", &err), 1);
    EXPECT_FALSE(amy.Exists("/docs/a.txt"));
    EXPECT_EQ(err, kUntouched);
}

TEST_F(CommonOperations, CreateFolderMakesOne) {
    EXPECT_EQ(ZYROCloud_Cloud_CreateFolder(id(), any, "/docs", "new", &err), 1);
    EXPECT_TRUE(amy.Exists("/docs/new"));
    EXPECT_EQ(err, kUntouched);
}

// --- how they fail --------------------------------------------------------------------------

TEST_F(CommonOperations, RenameTellsItsFailureAsItIs) {
    Refuse("too_many_files");
    EXPECT_EQ(ZYROCloud_Cloud_Rename(id(), any, "/docs/a.txt", "b.txt", &err), 0);
    EXPECT_EQ(err, G_IO_ERROR_TOO_MANY_LINKS);
    EXPECT_TRUE(seams::LoggedPart("Failed to rename /docs/a.txt to b.txt, err: {"))
        << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart("}, code: " + std::to_string(VFS_ERR_TOO_MANY_FILES)))
        << seams::LogDump();
}

TEST_F(CommonOperations, MovingAFolderOfTooManyFilesWouldRecurse) {
    Refuse("too_many_files");
    EXPECT_EQ(ZYROCloud_Cloud_Move(id(), any, "/docs", "/other", &err), 0);
    EXPECT_EQ(err, G_IO_ERROR_WOULD_RECURSE);
    EXPECT_TRUE(seams::LoggedPart("Failed to rename /docs to /other, err: {")) << seams::LogDump();
}

TEST_F(CommonOperations, DeletingANonEmptyFolderThroughAServiceThatReportsTooManyLinksIsNotEmpty) {
    Refuse("too_many_files");
    EXPECT_EQ(ZYROCloud_Cloud_Delete(id(), any, "/docs", &err), 0);
    EXPECT_EQ(err, G_IO_ERROR_NOT_EMPTY);
    EXPECT_TRUE(seams::LoggedPart("Failed to delete /docs,err: {")) << seams::LogDump();
}

TEST_F(CommonOperations, CreateFolderTellsItsFailureAsItIs) {
    EXPECT_EQ(ZYROCloud_Cloud_CreateFolder(id(), any, "", "docs", &err), 0);
    EXPECT_EQ(err, G_IO_ERROR_EXISTS);
    EXPECT_TRUE(seams::LoggedPart("Failed to create folder /docs, err: {")) << seams::LogDump();
    Refuse("too_many_files");
    EXPECT_EQ(ZYROCloud_Cloud_CreateFolder(id(), any, "/docs", "new", &err), 0);
    EXPECT_EQ(err, G_IO_ERROR_TOO_MANY_LINKS);
}

TEST_F(CommonOperations, OtherFailuresAreToldAsTheyAre) {
    Refuse("no_write_permission");
    EXPECT_EQ(ZYROCloud_Cloud_Move(id(), any, "/docs/a.txt", "/a.txt", &err), 0);
    EXPECT_EQ(err, G_IO_ERROR_PERMISSION_DENIED);
    Refuse("no_write_permission");
    err = kUntouched;
    EXPECT_EQ(ZYROCloud_Cloud_Delete(id(), any, "/docs/a.txt", &err), 0);
    EXPECT_EQ(err, G_IO_ERROR_PERMISSION_DENIED);
}

TEST_F(CommonOperations, NobodyNeedsToAskForTheFailure) {
    for (int i = 0; i < 4; ++i) {
        Refuse("too_many_files");
    }
    EXPECT_EQ(ZYROCloud_Cloud_Rename(id(), any, "/docs", "b", nullptr), 0);
    EXPECT_EQ(ZYROCloud_Cloud_Move(id(), any, "/docs", "/b", nullptr), 0);
    EXPECT_EQ(ZYROCloud_Cloud_Delete(id(), any, "/docs", nullptr), 0);
    EXPECT_EQ(ZYROCloud_Cloud_CreateFolder(id(), any, "/docs", "b", nullptr), 0);
}

TEST_F(CommonOperations, NullInAnyPlaceIsAWrongParameter) {
    const int results[] = {ZYROCloud_Cloud_Rename(nullptr, any, "/a", "b", &err),
                           ZYROCloud_Cloud_Rename(id(), nullptr, "/a", "b", &err),
                           ZYROCloud_Cloud_Rename(id(), any, nullptr, "b", &err),
                           ZYROCloud_Cloud_Rename(id(), any, "/a", nullptr, &err),
                           ZYROCloud_Cloud_Move(nullptr, any, "/a", "/b", &err),
                           ZYROCloud_Cloud_Move(id(), nullptr, "/a", "/b", &err),
                           ZYROCloud_Cloud_Move(id(), any, nullptr, "/b", &err),
                           ZYROCloud_Cloud_Move(id(), any, "/a", nullptr, &err),
                           ZYROCloud_Cloud_Delete(nullptr, any, "/a", &err),
                           ZYROCloud_Cloud_Delete(id(), nullptr, "/a", &err),
                           ZYROCloud_Cloud_Delete(id(), any, nullptr, &err),
                           ZYROCloud_Cloud_CreateFolder(nullptr, any, "/a", "b", &err),
                           ZYROCloud_Cloud_CreateFolder(id(), nullptr, "/a", "b", &err),
                           ZYROCloud_Cloud_CreateFolder(id(), any, nullptr, "b", &err),
                           ZYROCloud_Cloud_CreateFolder(id(), any, "/a", nullptr, &err)};
    EXPECT_THAT(results, testing::Each(0));
    EXPECT_EQ(err, kUntouched);
    EXPECT_THAT(Requests(), IsEmpty());
    const std::vector<seams::LogLine> lines = seams::LogLines();
    ASSERT_EQ(lines.size(), std::size(results)) << seams::LogDump();
    for (const seams::LogLine& line : lines) {
        EXPECT_THAT(line.text, testing::MatchesRegex("gvfs_utils\\.cpp:[0-9]+ Wrong parameters"));
    }
}

TEST_F(CommonOperations, WithoutAConnectionTheFailureIsLeftAlone) {
    for (const char* nobody : {"dropbox://nobody@example.com", "no scheme", ""}) {
        seams::Reset();
        EXPECT_EQ(ZYROCloud_Cloud_Delete(nobody, any, "/a", &err), 0);
        EXPECT_TRUE(seams::Logged("Can't get server conf, " + std::string(nobody)))
            << seams::LogDump();
        EXPECT_TRUE(seams::Logged("Failed to create cloud")) << seams::LogDump();
    }
    EXPECT_EQ(ZYROCloud_Cloud_Rename("x://y", any, "/a", "b", &err), 0);
    EXPECT_EQ(ZYROCloud_Cloud_Move("x://y", any, "/a", "b", &err), 0);
    EXPECT_EQ(ZYROCloud_Cloud_CreateFolder("x://y", any, "/a", "b", &err), 0);
    EXPECT_EQ(err, kUntouched);
}

TEST_F(CommonOperations, NamesAndPathsOfAnyLengthAndBytesReachTheService) {
    for (const std::string& name :
         {std::string(255, 'x'), std::string(256, 'x'), std::string(4096, 'x'),
          std::string(4097, 'x'), std::string("a\nb"), std::string("a/b"), std::string("\xff")}) {
        service.AddFault(Fault::On("POST", "/2/files/create_folder").Answer(200, "{}"));
        EXPECT_EQ(ZYROCloud_Cloud_CreateFolder(id(), any, "/docs", name.c_str(), &err), 1) << name;
    }
}

// --- a driver for one call ------------------------------------------------------------------

TEST_F(CommonOperations, ADriverIsOfTheConnectionsService) {
    const UniqueCloud cloud = CreateCloud(id());
    ASSERT_NE(cloud, nullptr);
    EXPECT_EQ(cloud->GetCloudType(), CLOUD_TYPE_DROPBOX);
    EXPECT_EQ(cloud->GetServerID(), server_id);
    EXPECT_EQ(CreateCloud(nullptr), nullptr);
}

TEST_F(CommonOperations, AConnectionOfAnotherServiceIsNone) {
    class Other : public Dropbox {};
    EXPECT_EQ(WithDriver<Dropbox>(id(), [](Dropbox&) { return true; }), 1);
    EXPECT_EQ(WithDriver<Other>(id(), [](Other&) { return true; }), 0);
    EXPECT_TRUE(seams::Logged("Failed to create cloud")) << seams::LogDump();
}

TEST_F(CommonOperations, NoExceptionLeavesThem) {
    EXPECT_EQ(
        WithDriver(id(),
                   [](Cloud&) -> bool { return Json::Value(Json::arrayValue)["member"].asBool(); }),
        0);
    EXPECT_TRUE(seams::LoggedPart("Wrong JSON value, ")) << seams::LogDump();
}

// --- what needs no service ------------------------------------------------------------------

TEST(IsHiddenFolder, AsksTheNamesThatTheTreeLeavesOut) {
    EXPECT_EQ(ZYROCloud_IsHiddenFolder("/", "docs"), 0);
    EXPECT_EQ(ZYROCloud_IsHiddenFolder("/", "'"), 1);
    EXPECT_EQ(ZYROCloud_IsHiddenFolder("/", ".ZyrotechWorkingDirectory"), 1);
    EXPECT_EQ(ZYROCloud_IsHiddenFolder("/", "a/b"), 1);
    EXPECT_EQ(ZYROCloud_IsHiddenFolder("/", std::string(255, 'x').c_str()), 0);
    EXPECT_EQ(ZYROCloud_IsHiddenFolder("/", std::string(256, 'x').c_str()), 1);
    EXPECT_EQ(ZYROCloud_IsHiddenFolder(std::string(4096, 'x').c_str(), "a"), 0);
    EXPECT_EQ(ZYROCloud_IsHiddenFolder(std::string(4097, 'x').c_str(), "a"), 1);
}

TEST(IsHiddenFolder, OfNullIsZero) {
    EXPECT_EQ(ZYROCloud_IsHiddenFolder(nullptr, "'"), 0);
    EXPECT_EQ(ZYROCloud_IsHiddenFolder("/", nullptr), 0);
}

TEST(CurlGlobal, IsSetUpAndCleanedUpForTheProcess) {
    ZYROCloud_Cloud_InitCurlGlobal();
    EXPECT_TRUE(Cloud::_gblInitCurlGlobal);
    ZYROCloud_Cloud_InitCurlGlobal();
    ZYROCloud_Cloud_CleanupCurlGlobal();
    EXPECT_FALSE(Cloud::_gblInitCurlGlobal);
    ZYROCloud_Cloud_CleanupCurlGlobal();
}

}  // namespace
}  // namespace ZYROCloud
