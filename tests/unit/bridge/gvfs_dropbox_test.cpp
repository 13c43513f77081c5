// Dropbox as its backend sees it: what the other services do not have.
#include "bridge/handle.h"
#include "support/backend.h"

namespace backend {
namespace {

class Dropbox : public BackendTest {
  protected:
    Dropbox() : BackendTest(Make<DropboxRig>()) {}

    int Get(const std::string& dir, const std::string& path) {
        return ZYROCloud_Cloud_Dropbox_Get(server_id.c_str(), cache, dir.c_str(), path.c_str(),
                                           &err);
    }
    /** The answer to the next question about an item. */
    void Describe(const std::string& item) {
        sim.AddFault(Fault::On("GET", "/2/files/get_metadata").Answer(200, item));
    }
};

TEST_F(Dropbox, TellsNeitherCacheNorCallbackOfAHiddenName) {
    sim.AddFault(rig->OnListing().Answer(
        200, rig->Page(rig->ItemText(R"("'")", "/'") + "," +
                       rig->ItemText("\".ZyrotechWorkingDirectory\"", "/.Z") + "," +
                       rig->ItemText("\"a\"", "/a"))));
    EXPECT_EQ(List("/"), 1) << seams::LogDump();
    EXPECT_THAT(SeenNames(), ElementsAre("a"));
    EXPECT_EQ(Cached("/'"), nullptr);
    EXPECT_EQ(Cached("/.ZyrotechWorkingDirectory"), nullptr);
    EXPECT_NE(Cached("/a"), nullptr);
}

TEST_F(Dropbox, ListsAFolderByItsPathWhateverIdTheCacheHas) {
    amy.AddPath("/docs/b.txt", "b");
    Remember("/", "docs", "/elsewhere", true);
    EXPECT_EQ(List("/docs"), 1) << seams::LogDump();
    EXPECT_THAT(SeenNames(), ElementsAre("b.txt"));
}

TEST_F(Dropbox, KeepsNoDisplayNames) {
    amy.AddPath("/a.txt", "a");
    EXPECT_EQ(List("/"), 1);
    EXPECT_EQ(ZYROCloud_Cache_List_Ori_Get(cache, "/", "a.txt"), 0);
}

TEST_F(Dropbox, GetsOneItemIntoTheCache) {
    Describe(R"({".tag":"file","path_display":"/Docs/A.txt","name":"A.txt","size":5})");
    EXPECT_EQ(Get("/docs", "/docs/a.txt"), 1) << seams::LogDump();
    GFileInfo* const info = Cached("/docs/A.txt");
    ASSERT_NE(info, nullptr);
    EXPECT_EQ(IdOf(info), "/Docs/A.txt");
    EXPECT_EQ(g_file_info_get_size(info), 5);
    EXPECT_THAT(Last().Path(), HasSubstr("/docs/a.txt"));
}

TEST_F(Dropbox, GetsAnItemOfTheAccount) {
    amy.AddPath("/docs/a.txt", "0123456789");
    EXPECT_EQ(Get("/docs", "/docs/a.txt"), 1) << seams::LogDump();
    EXPECT_NE(Cached("/docs/a.txt"), nullptr) << sim.Journal().Text();
}

TEST_F(Dropbox, GettingAHiddenItemSucceedsWithoutAnEntry) {
    Describe(R"({".tag":"file","path_display":"/'","name":"'","size":5})");
    EXPECT_EQ(Get("/", "/'"), 1) << seams::LogDump();
    EXPECT_EQ(Cached("/'"), nullptr);
    EXPECT_EQ(err, kUntouched);
}

TEST_F(Dropbox, GettingAnItemThatIsNoneLeavesTheCacheAsItWas) {
    for (const char* item : {"{}", R"({"name":"..","path_display":"/x"})",
                             R"({"name":7,"path_display":[]})", R"({"name":"a"})"}) {
        Describe(item);
        EXPECT_EQ(Get("/docs", "/docs/a"), 1) << item;
        EXPECT_EQ(Cached("/docs/a"), nullptr) << item;
        EXPECT_EQ(Cached("/docs/.."), nullptr) << item;
    }
    for (const char* item : {"[]", "7", "\"text\""}) {
        Describe(item);
        const int result = Get("/docs", "/docs/a");
        EXPECT_TRUE(result == 0 || result == 1) << item;
        EXPECT_EQ(Cached("/docs/a"), nullptr) << item;
    }
}

TEST_F(Dropbox, GettingWhatIsNotThereFails) {
    EXPECT_EQ(Get("/docs", "/docs/none"), 0);
    EXPECT_EQ(err, G_IO_ERROR_NOT_FOUND);
    EXPECT_TRUE(seams::LoggedPart("Failed to list folder /docs/none err: {")) << seams::LogDump();
}

TEST_F(Dropbox, WithoutAnArgumentThatItNeedsGetsNothing) {
    const char* const id = server_id.c_str();
    EXPECT_EQ(ZYROCloud_Cloud_Dropbox_Get(nullptr, cache, "/", "/a", &err), 0);
    EXPECT_EQ(ZYROCloud_Cloud_Dropbox_Get(id, nullptr, "/", "/a", &err), 0);
    EXPECT_EQ(ZYROCloud_Cloud_Dropbox_Get(id, cache, nullptr, "/a", &err), 0);
    EXPECT_EQ(ZYROCloud_Cloud_Dropbox_Get(id, cache, "/", nullptr, &err), 0);
    EXPECT_TRUE(seams::Logged("Wrong parameters")) << seams::LogDump();
    EXPECT_EQ(err, kUntouched);
    EXPECT_THAT(Requests(), IsEmpty());
    EXPECT_EQ(ZYROCloud_Cloud_Dropbox_Get(id, cache, "/", "/none", nullptr), 0);
}

TEST_F(Dropbox, ReadsThePathOfTheHandleOrThatOfItsRecord) {
    amy.AddPath("/a.txt", "0123456789");
    amy.AddPath("/b.txt", "abc");
    EXPECT_EQ(List("/"), 1);
    GFileInfo* const info = Seen("a.txt");
    const UniqueHandle by_path(ZYROCloud_Cloud_Handle_New(server_id.c_str(), "/b.txt", info));
    EXPECT_EQ(ReadAll(by_path, 20), "abc") << seams::LogDump();
    EXPECT_EQ(by_path->url, server_id + "/b.txt");
    const UniqueHandle by_record(ZYROCloud_Cloud_Handle_New(server_id.c_str(), nullptr, info));
    EXPECT_EQ(ReadAll(by_record, 20), "0123456789") << seams::LogDump();
    EXPECT_EQ(by_record->url, server_id + "/a.txt");
    g_file_info_remove_attribute(info, "id::file");
    const UniqueHandle neither(ZYROCloud_Cloud_Handle_New(server_id.c_str(), "", info));
    EXPECT_EQ(Read(neither, 20), -1);
    EXPECT_TRUE(seams::Logged("File ID is empty")) << seams::LogDump();
}

}  // namespace
}  // namespace backend
