// Google Drive as its backend sees it: what the other services do not have.
#include <algorithm>

#include "bridge/handle.h"
#include "support/backend.h"

namespace backend {
namespace {

using testing::UnorderedElementsAre;

class Google : public BackendTest {
  protected:
    Google() : BackendTest(Make<GoogleRig>()), service(static_cast<cloudsim::GDrive&>(sim)) {}

    static std::string Display(GFileInfo* info) { return g_file_info_get_display_name(info); }
    /** What the last listing asked for. */
    std::string Query() const { return Last().Query("q"); }

    cloudsim::GDrive& service;
};

TEST_F(Google, ShowsADocumentWithTheExtensionOfItsKind) {
    service.AddDocument(amy, amy.Root(), "report", "document", "text");
    service.AddDocument(amy, amy.Root(), "report.txt", "document", "text");
    EXPECT_EQ(List("/My Drive"), 1) << seams::LogDump();
    EXPECT_THAT(SeenNames(), UnorderedElementsAre("report.gdoc", "report.txt.gdoc"));
}

TEST_F(Google, TellsTwoFilesOfOneTitleApartByTheirDatesOfCreation) {
    for (const char* text : {"first", "second"}) {
        const std::string id = amy.AddFile(amy.Root(), "a.txt", text);
        amy.SetTimes(id, 1425291072, 1425291072);
    }
    EXPECT_EQ(List("/My Drive"), 1) << seams::LogDump();
    EXPECT_THAT(SeenNames(), ElementsAre("a.txt", "a - 2015-03-02T10:11:12.000Z.txt"));
    for (const ZYROCloud::UniqueFileInfo& info : seen) {
        EXPECT_EQ(Display(info.get()), "a.txt");
    }
    EXPECT_NE(IdOf(Seen("a.txt")), IdOf(Seen("a - 2015-03-02T10:11:12.000Z.txt")));
    // A second listing begins with no names taken.
    EXPECT_EQ(List("/My Drive"), 1);
    EXPECT_THAT(SeenNames(), ElementsAre("a.txt", "a - 2015-03-02T10:11:12.000Z.txt"));
}

TEST_F(Google, ListsItsTopFolderByItsFixedIdWithoutALookInTheCache) {
    Remember("/", "My Drive", "another", false);
    amy.AddPath("/a.txt", "a");
    for (const char* path : {"/My Drive", "My Drive", "/My Drive/"}) {
        EXPECT_EQ(List(path), 1) << path << seams::LogDump();
        EXPECT_THAT(SeenNames(), ElementsAre("a.txt"));
        EXPECT_THAT(Query(), HasSubstr("'root' in parents"));
    }
    EXPECT_EQ(Requests().size(), 3U);
}

TEST_F(Google, RefusesAPathOutsideBothFolders) {
    for (const char* path : {"/", "", "/other", "/other/My Drive", "/My Drives"}) {
        seams::Reset();
        EXPECT_EQ(List(path), 0) << path;
        EXPECT_TRUE(seams::Logged(std::string("Wrong path ") + path)) << seams::LogDump();
    }
    EXPECT_EQ(err, kUntouched);
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(Google, ShowsWhatIsStarredWhereverItLies) {
    const std::string inner = amy.AddPath("/docs/inner.txt", "a");
    service.SetStarred(amy, inner, true);
    amy.AddPath("/plain.txt", "a");
    EXPECT_EQ(List("/Starred"), 1) << seams::LogDump();
    EXPECT_THAT(SeenNames(), ElementsAre("inner.txt"));
    EXPECT_NE(Cached("/Starred/inner.txt"), nullptr);
    EXPECT_THAT(Query(), HasSubstr("starred=true"));
    EXPECT_EQ(Query().find("in parents"), std::string::npos);
}

TEST_F(Google, ListsAFolderBelowWhatIsStarredByTheIdInTheCache) {
    amy.AddPath("/docs/inner/b.txt", "b");
    const std::string docs = amy.Find("/docs");
    service.SetStarred(amy, docs, true);
    EXPECT_EQ(List("/Starred"), 1);
    EXPECT_EQ(List("/Starred/docs"), 1) << seams::LogDump();
    EXPECT_THAT(SeenNames(), ElementsAre("inner"));
    EXPECT_EQ(List("/Starred/docs/inner"), 1) << seams::LogDump();
    EXPECT_THAT(SeenNames(), ElementsAre("b.txt"));
    EXPECT_EQ(Requests().size(), 3U);
}

TEST_F(Google, LooksForTheUsersOwnFoldersBelowItsTopAndForAnyBelowWhatIsStarred) {
    EXPECT_EQ(List("/My Drive/none"), 0);
    EXPECT_EQ(err, G_IO_ERROR_NOT_FOUND);
    const std::string first = sim.Journal().All().front().Query("q");
    EXPECT_THAT(first, HasSubstr("title='My Drive'"));
    EXPECT_THAT(first, HasSubstr("'me' in owners and mimeType = "
                                 "'application/vnd.google-apps.folder'"));
    // The service does not find the root by its name: it is walked from there.
    EXPECT_THAT(Query(), HasSubstr("'root' in parents and (title='none'"));
    EXPECT_EQ(Requests().size(), 2U);
    EXPECT_EQ(List("/Starred/none"), 0);
    EXPECT_THAT(Query(), HasSubstr("mimeType = 'application/vnd.google-apps.folder'"));
    EXPECT_EQ(Query().find("in owners"), std::string::npos);
    EXPECT_EQ(Requests().size(), 3U);
    EXPECT_TRUE(seams::LoggedPart("Failed to find the path, /Starred/none, ")) << seams::LogDump();
}

TEST_F(Google, ChoosesOfTwoFoldersTheOneThatHoldsTheNameThatItIsGiven) {
    for (const char* file : {"one.txt", "two.txt"}) {
        const std::string folder = amy.AddFolder(amy.Root(), "docs");
        amy.AddFile(folder, file, "x");
    }
    EXPECT_EQ(ZYROCloud_Cloud_Google_List(server_id.c_str(), cache, "/My Drive/docs", "two.txt",
                                          See, this, &err),
              1)
        << seams::LogDump() << sim.Journal().Text();
    EXPECT_THAT(SeenNames(), ElementsAre("two.txt"));
}

// --- reading -------------------------------------------------------------------------------------

TEST_F(Google, ReadsADocumentAsTheLinkToItsPageInPiecesOfAnySize) {
    service.AddDocument(amy, amy.Root(), "report", "document", "text");
    for (const long long piece : {1LL, 7LL, 100LL, kMiB}) {
        const UniqueHandle handle = Open("report.gdoc");
        const Json::Value description = Object(Text(Seen("report.gdoc"), "standard::description"));
        sim.Journal().Clear();
        const std::string text = ReadAll(handle, piece);
        EXPECT_EQ(static_cast<long long>(text.size()), g_file_info_get_size(Seen("report.gdoc")));
        EXPECT_EQ(Object(text)["url"], description["alternateLink"]) << text;
        EXPECT_THAT(Requests(), IsEmpty());
    }
    EXPECT_EQ(err, kUntouched);
}

TEST_F(Google, ReadsNothingWithoutAnAddress) {
    amy.AddPath("/a.txt", "a");
    EXPECT_EQ(List("/My Drive"), 1);
    const struct {
        const char* description;
        const char* line;
    } rows[] = {
        {"", "Link info is empty"},
        {"no JSON", "Failed to parse no JSON"},
        {"{}", "No invalid url"},
        {"[]", "No invalid url"},
        {R"({"downloadUrl":"","alternateLink":""})", "No invalid url"},
        {R"({"downloadUrl":7,"alternateLink":{}})", "No invalid url"},
    };
    for (const auto& row : rows) {
        seams::Reset();
        const ZYROCloud::UniqueFileInfo info(g_file_info_dup(Seen("a.txt")));
        g_file_info_set_attribute_string(info.get(), "standard::description", row.description);
        const UniqueHandle handle(
            ZYROCloud_Cloud_Handle_New(server_id.c_str(), "/a.txt", info.get()));
        EXPECT_EQ(Read(handle, 4), -1) << row.description;
        EXPECT_TRUE(seams::Logged(row.line)) << seams::LogDump();
    }
    const ZYROCloud::UniqueFileInfo bare(g_file_info_dup(Seen("a.txt")));
    g_file_info_remove_attribute(bare.get(), "standard::description");
    const UniqueHandle handle(ZYROCloud_Cloud_Handle_New(server_id.c_str(), "/a", bare.get()));
    EXPECT_EQ(Read(handle, 4), -1);
    EXPECT_EQ(err, kUntouched);
}

TEST_F(Google, ReadsFromTheAddressThatTheListingGave) {
    amy.AddPath("/a.txt", "0123456789");
    const UniqueHandle handle = Open("a.txt");
    EXPECT_EQ(ReadAll(handle, 4), "0123456789");
    const Json::Value description = Object(Text(Seen("a.txt"), "standard::description"));
    EXPECT_EQ(handle->url, description["downloadUrl"].asString());
    service.ExpireDownloadUrls();
    const UniqueHandle late(ZYROCloud_Cloud_Handle_New(server_id.c_str(), "/a.txt", Seen("a.txt")));
    EXPECT_EQ(Read(late, 4), -1);
    EXPECT_EQ(err, G_IO_ERROR_PERMISSION_DENIED);
}

// --- changes -------------------------------------------------------------------------------------

TEST_F(Google, MovesAnItemFromOneFolderIntoAnother) {
    const std::string id = amy.AddPath("/docs/a.txt", "a");
    const std::string docs = amy.Find("/docs");
    const std::string target = amy.AddFolder(amy.Root(), "target");
    EXPECT_EQ(ZYROCloud_Cloud_Google_Move(server_id.c_str(), cache, docs.c_str(), id.c_str(),
                                          target.c_str(), &err),
              1)
        << seams::LogDump();
    EXPECT_EQ(service.Facts(amy, id).parents, std::vector<std::string>{target});
    EXPECT_EQ(ZYROCloud_Cloud_Google_Move(server_id.c_str(), cache, docs.c_str(), "none",
                                          target.c_str(), &err),
              0);
    EXPECT_EQ(err, G_IO_ERROR_NOT_FOUND);
    EXPECT_TRUE(seams::LoggedPart("Failed to move a file form " + docs + " to none, err: {"))
        << seams::LogDump();
}

TEST_F(Google, TakesAStarAwayAndLeavesTheItem) {
    const std::string id = amy.AddPath("/a.txt", "a");
    service.SetStarred(amy, id, true);
    EXPECT_EQ(ZYROCloud_Cloud_Google_DeleteStarred(server_id.c_str(), cache, id.c_str(), &err), 1)
        << seams::LogDump();
    EXPECT_FALSE(service.Facts(amy, id).starred);
    EXPECT_FALSE(service.Facts(amy, id).trashed);
    sim.AddFault(Fault::On("PUT", "/drive/v2/files/").Forever().Answer(403, "{}"));
    EXPECT_EQ(ZYROCloud_Cloud_Google_DeleteStarred(server_id.c_str(), cache, id.c_str(), &err), 0);
    EXPECT_EQ(err, G_IO_ERROR_PERMISSION_DENIED);
    EXPECT_TRUE(seams::Logged("Failed to delete starred, " + id)) << seams::LogDump();
}

TEST_F(Google, SetsTheTimeOfAnItem) {
    const std::string id = amy.AddPath("/a.txt", "a");
    EXPECT_EQ(
        ZYROCloud_Cloud_Google_Chmod_MTime(server_id.c_str(), cache, id.c_str(), 1425291072, &err),
        1)
        << seams::LogDump();
    EXPECT_EQ(service.Facts(amy, id).modified.seconds, 1425291072);
    EXPECT_EQ(ZYROCloud_Cloud_Google_Chmod_MTime(server_id.c_str(), cache, "none", 1, &err), 0);
    EXPECT_EQ(err, G_IO_ERROR_NOT_FOUND);
    EXPECT_TRUE(seams::Logged("Failed to delete starred, none")) << seams::LogDump();
    EXPECT_EQ(ZYROCloud_Cloud_Google_Chmod_MTime(server_id.c_str(), cache, "", 1, &err), 0);
}

TEST_F(Google, WithoutAConnectionChangesNothing) {
    Disconnect();
    const char* const id = server_id.c_str();
    EXPECT_EQ(ZYROCloud_Cloud_Google_Move(id, cache, "a", "b", "c", &err), 0);
    EXPECT_TRUE(seams::Logged("Failed to create cloud")) << seams::LogDump();
    EXPECT_EQ(ZYROCloud_Cloud_Google_DeleteStarred(id, cache, "a", &err), 0);
    EXPECT_TRUE(seams::Logged("Failed to create cloud by " + server_id)) << seams::LogDump();
    seams::Reset();
    EXPECT_EQ(ZYROCloud_Cloud_Google_Chmod_MTime(id, cache, "a", 1, &err), 0);
    EXPECT_TRUE(seams::Logged("Failed to create cloud by " + server_id)) << seams::LogDump();
    EXPECT_EQ(err, kUntouched);
}

TEST_F(Google, WithoutAnArgumentThatAChangeNeedsRefusesIt) {
    const char* const id = server_id.c_str();
    EXPECT_EQ(ZYROCloud_Cloud_Google_Move(nullptr, cache, "a", "b", "c", &err), 0);
    EXPECT_EQ(ZYROCloud_Cloud_Google_Move(id, nullptr, "a", "b", "c", &err), 0);
    EXPECT_EQ(ZYROCloud_Cloud_Google_Move(id, cache, nullptr, "b", "c", &err), 0);
    EXPECT_EQ(ZYROCloud_Cloud_Google_Move(id, cache, "a", nullptr, "c", &err), 0);
    EXPECT_EQ(ZYROCloud_Cloud_Google_Move(id, cache, "a", "b", nullptr, &err), 0);
    EXPECT_EQ(ZYROCloud_Cloud_Google_DeleteStarred(nullptr, cache, "a", &err), 0);
    EXPECT_EQ(ZYROCloud_Cloud_Google_DeleteStarred(id, nullptr, "a", &err), 0);
    EXPECT_EQ(ZYROCloud_Cloud_Google_DeleteStarred(id, cache, nullptr, &err), 0);
    EXPECT_EQ(ZYROCloud_Cloud_Google_Chmod_MTime(nullptr, cache, "a", 1, &err), 0);
    EXPECT_EQ(ZYROCloud_Cloud_Google_Chmod_MTime(id, nullptr, "a", 1, &err), 0);
    EXPECT_EQ(ZYROCloud_Cloud_Google_Chmod_MTime(id, cache, nullptr, 1, &err), 0);
    const std::vector<seams::LogLine> lines = seams::LogLines();
    EXPECT_EQ(std::count_if(lines.begin(), lines.end(),
                            [](const seams::LogLine& line) {
                                return line.text.find("gvfs_gdrive.cpp:") == 0 &&
                                       line.text.find(" Wrong parameters") != std::string::npos;
                            }),
              11)
        << seams::LogDump();
    EXPECT_EQ(err, kUntouched);
    EXPECT_EQ(ZYROCloud_Cloud_Google_Move(id, cache, "", "b", "c", nullptr), 0);
    EXPECT_EQ(ZYROCloud_Cloud_Google_Chmod_MTime(id, cache, "", 1, nullptr), 0);
    EXPECT_THAT(Requests(), IsEmpty());
}

}  // namespace
}  // namespace backend
