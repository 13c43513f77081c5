// OneDrive as its backend sees it: what the other services do not have.
#include "bridge/handle.h"
#include "support/backend.h"

namespace backend {
namespace {

using testing::UnorderedElementsAre;

class OneDrive : public BackendTest {
  protected:
    OneDrive() : BackendTest(Make<OneDriveRig>()), service(static_cast<cloudsim::OneDrive&>(sim)) {}

    int GetRoot() {
        seen.clear();
        return ZYROCloud_Cloud_OneDrive_GetRoot(server_id.c_str(), cache, See, this, &err);
    }
    Fault OnRoot() const { return Fault::On("GET", "/v5.0/me/skydrive?"); }

    cloudsim::OneDrive& service;
};

TEST_F(OneDrive, LeavesANotebookOutAndShowsAnAlbumAsADirectory) {
    amy.AddPath("/docs/a.txt", "a");
    service.SetType(amy.AddFolder(amy.Root(), "notes"), "notebook");
    service.SetType(amy.AddFolder(amy.Root(), "pictures"), "album");
    EXPECT_EQ(List("/"), 1) << seams::LogDump();
    EXPECT_THAT(SeenNames(), UnorderedElementsAre("docs", "pictures"));
    EXPECT_TRUE(IsFolder(Seen("pictures")));
    EXPECT_EQ(Cached("/notes"), nullptr);
}

TEST_F(OneDrive, FilesItsNamelessRootUnderASlash) {
    EXPECT_EQ(GetRoot(), 1) << seams::LogDump();
    GFileInfo* const root = Cached("/");
    ASSERT_NE(root, nullptr);
    EXPECT_STREQ(g_file_info_get_name(root), "");
    EXPECT_TRUE(IsFolder(root));
    EXPECT_EQ(IdOf(root), amy.Root());
    EXPECT_THAT(SeenNames(), ElementsAre(""));
    EXPECT_EQ(err, kUntouched);
}

TEST_F(OneDrive, WithoutARootToldOfNothing) {
    sim.AddFault(OnRoot().Answer(403, "{}"));
    EXPECT_EQ(GetRoot(), 0);
    EXPECT_EQ(err, G_IO_ERROR_PERMISSION_DENIED);
    EXPECT_TRUE(seams::LoggedPart("Failed to get root info err: {")) << seams::LogDump();
    for (const char* root :
         {"null", "{}", R"({"type":"notebook","id":"x"})", R"({"id":7})", "[]", "7", "\"text\""}) {
        seams::Reset();
        sim.AddFault(OnRoot().Answer(200, root));
        EXPECT_EQ(GetRoot(), 0) << root;
        EXPECT_TRUE(seams::Logged("Failed to parse root")) << root << seams::LogDump();
    }
    EXPECT_THAT(SeenNames(), IsEmpty());
    EXPECT_EQ(Cached("/"), nullptr);
}

TEST_F(OneDrive, NeedsAConnectionAndACacheForItsRoot) {
    EXPECT_EQ(ZYROCloud_Cloud_OneDrive_GetRoot(nullptr, cache, See, this, &err), 0);
    EXPECT_EQ(ZYROCloud_Cloud_OneDrive_GetRoot(server_id.c_str(), nullptr, See, this, &err), 0);
    EXPECT_TRUE(seams::Logged("Wrong parameters")) << seams::LogDump();
    EXPECT_THAT(Requests(), IsEmpty());
    EXPECT_EQ(ZYROCloud_Cloud_OneDrive_GetRoot(server_id.c_str(), cache, nullptr, nullptr, nullptr),
              1);
    Disconnect();
    EXPECT_EQ(GetRoot(), 0);
    EXPECT_TRUE(seams::Logged("Failed to create cloud")) << seams::LogDump();
}

TEST_F(OneDrive, DoesNotTakeAnItemWithoutAParentForTheRootOfTheTree) {
    EXPECT_EQ(GetRoot(), 1);
    sim.AddFault(rig->OnListing().Answer(
        200, rig->Page(R"({"id":"x","name":"a","type":"folder","parent_id":null})")));
    EXPECT_EQ(List("/"), 1);
    EXPECT_THAT(SeenNames(), IsEmpty());
    EXPECT_EQ(IdOf(Cached("/")), amy.Root());
}

TEST_F(OneDrive, ListsItsTopByNoIdAndAFolderWhoseIdHasBecomeStaleByItsPath) {
    amy.AddPath("/docs/b.txt", "b");
    EXPECT_EQ(List("/"), 1);
    EXPECT_EQ(Last().Path(), "/v5.0/me/skydrive/files");
    Remember("/", "docs", "folder.a1.404404", true);
    EXPECT_EQ(List("/docs"), 1) << seams::LogDump();
    EXPECT_THAT(SeenNames(), ElementsAre("b.txt"));
}

TEST_F(OneDrive, TellsOfLinks) {
    amy.AddPath("/a.txt", "a");
    EXPECT_EQ(List("/"), 1);
    EXPECT_THAT(Object(Text(Seen("a.txt"), "standard::description"))["link"].asString(),
                HasSubstr("https://"));
}

TEST_F(OneDrive, ReadsFromTheAddressOfTheId) {
    const std::string id = amy.AddPath("/a.txt", "0123456789");
    const UniqueHandle handle = Open("a.txt");
    EXPECT_EQ(ReadAll(handle, 4), "0123456789");
    EXPECT_EQ(handle->url, rig->Hosts()["LiveApiHost"].asString() + "/v5.0/" + id + "/content");
    g_file_info_remove_attribute(Seen("a.txt"), "id::file");
    const UniqueHandle bare(ZYROCloud_Cloud_Handle_New(server_id.c_str(), "/a.txt", Seen("a.txt")));
    EXPECT_EQ(Read(bare, 4), -1);
    EXPECT_TRUE(seams::Logged("File ID is empty")) << seams::LogDump();
}

TEST_F(OneDrive, NeedsTheServerIdForAListing) {
    EXPECT_EQ(ZYROCloud_Cloud_OneDrive_List(nullptr, cache, "/", nullptr, nullptr, nullptr, &err),
              0);
    EXPECT_TRUE(seams::Logged("Wrong parameters")) << seams::LogDump();
}

}  // namespace
}  // namespace backend
