// Box as its backend sees it: what the other services do not have.
#include "bridge/handle.h"
#include "support/backend.h"

namespace backend {
namespace {

class Box : public BackendTest {
  protected:
    Box() : BackendTest(Make<BoxRig>()) {}

    /** The next listing is of these items. */
    void Give(const std::string& items) {
        sim.AddFault(rig->OnListing().Answer(200, rig->Page(items)));
    }
    int CheckText(const std::string& json) {
        return ZYROCloud_Cloud_Box_CheckAccount(server_id.c_str(), json.c_str(), &account, &err);
    }
    void TearDown() override {
        free(account);
        BackendTest::TearDown();
    }
    char* account = nullptr;
};

TEST_F(Box, ShowsAFolderThatAnnSharesAtTheTopWithHerName) {
    const std::string ann = R"("parent":null,"owned_by":{"id":"99","name":"Ann"})";
    Give(R"({"type":"folder","id":"1","name":"Docs",)" + ann + "}," +
         R"({"type":"folder","id":"2","name":"Pics - Ann",)" + ann + "}");
    EXPECT_EQ(List("/"), 1) << seams::LogDump();
    EXPECT_THAT(SeenNames(), ElementsAre("Docs - Ann", "Pics - Ann"));
    EXPECT_STREQ(g_file_info_get_display_name(Seen("Docs - Ann")), "Docs");
    EXPECT_STREQ(g_file_info_get_display_name(Seen("Pics - Ann")), "Pics - Ann");
    EXPECT_NE(Cached("/Docs - Ann"), nullptr);
    EXPECT_EQ(ZYROCloud_Cache_List_Ori_Get(cache, "/", "Docs"), 1);
    EXPECT_EQ(ZYROCloud_Cache_List_Ori_Get(cache, "/", "Pics - Ann"), 0);
}

TEST_F(Box, NeverShowsAWebLink) {
    Give(R"({"type":"web_link","id":"1","name":"link"},)" + rig->ItemText("\"a\"", "2"));
    EXPECT_EQ(List("/"), 1);
    EXPECT_THAT(SeenNames(), ElementsAre("a"));
    EXPECT_EQ(Cached("/link"), nullptr);
}

TEST_F(Box, WithoutAnAccountShowsNothing) {
    amy.AddPath("/a.txt", "a");
    EXPECT_EQ(
        ZYROCloud_Cloud_Box_List(nullptr, server_id.c_str(), cache, "/", nullptr, See, this, &err),
        1);
    EXPECT_THAT(SeenNames(), IsEmpty());
    EXPECT_EQ(Cached("/a.txt"), nullptr);
}

TEST_F(Box, ListsAFolderWhoseIdHasBecomeStaleByItsPath) {
    amy.AddPath("/docs/b.txt", "b");
    Remember("/", "docs", "folders/404404", true);
    EXPECT_EQ(List("/docs"), 1) << seams::LogDump();
    EXPECT_THAT(SeenNames(), ElementsAre("b.txt"));
    Remember("/", "gone", "folders/404404", true);
    EXPECT_EQ(List("/gone"), 0);
    EXPECT_EQ(err, G_IO_ERROR_NOT_FOUND);
    EXPECT_TRUE(seams::LoggedPart("Failed to find the path, /gone, ")) << seams::LogDump();
}

TEST_F(Box, NeedsTheServerIdForAListing) {
    EXPECT_EQ(ZYROCloud_Cloud_Box_List("17", nullptr, cache, "/", nullptr, nullptr, nullptr, &err),
              0);
    EXPECT_TRUE(seams::Logged("Wrong parameters")) << seams::LogDump();
}

TEST_F(Box, ReadsFromTheAddressOfTheId) {
    const std::string id = amy.AddPath("/a.txt", "0123456789");
    const UniqueHandle handle = Open("a.txt");
    EXPECT_EQ(ReadAll(handle, 4), "0123456789");
    EXPECT_EQ(handle->url, rig->Hosts()["BoxApiHost"].asString() + "/2.0/files/" + id + "/content");
    g_file_info_remove_attribute(Seen("a.txt"), "id::file");
    const UniqueHandle bare(ZYROCloud_Cloud_Handle_New(server_id.c_str(), "/a.txt", Seen("a.txt")));
    EXPECT_EQ(Read(bare, 4), -1);
    EXPECT_TRUE(seams::Logged("File ID is empty")) << seams::LogDump();
    EXPECT_EQ(err, kUntouched);
}

TEST_F(Box, GivesTheAccountOfGoodCredentials) {
    EXPECT_EQ(CheckText(json::toString(Credentials())), 1) << seams::LogDump();
    EXPECT_STREQ(account, amy.Id().c_str());
}

TEST_F(Box, GivesTheAccountOfCredentialsThatThereIsNoConnectionFor) {
    Disconnect();
    EXPECT_EQ(CheckText(R"({"account_info":"{\"id\":\"17\"}"})"), 1);
    EXPECT_STREQ(account, "17");
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(Box, WantsAnAccountInCredentials) {
    const struct {
        const char* json;
        const char* line;
    } rows[] = {
        {"no JSON", "Failed to parse no JSON"},
        {"{}", "Failed to parse {}"},
        {R"({"account_info":"no JSON"})", "Failed to parse account info"},
        {R"({"account_info":{"id":"17"}})", "Failed to parse account info"},
        {R"({"account_info":"{}"})", "No account info"},
        {R"({"account_info":"[]"})", "No account info"},
        {R"({"account_info":"{\"id\":\"\"}"})", "No account info"},
    };
    for (const auto& row : rows) {
        seams::Reset();
        EXPECT_EQ(CheckText(row.json), 0) << row.json;
        EXPECT_TRUE(seams::Logged(row.line)) << row.json << seams::LogDump();
        EXPECT_EQ(account, nullptr) << row.json;
    }
    EXPECT_EQ(err, kUntouched);
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_F(Box, GivesNoAccountOfRefusedCredentials) {
    amy.ExpireAccessTokens();
    amy.RevokeRefreshTokens();
    EXPECT_EQ(CheckText(json::toString(Credentials())), 0);
    EXPECT_EQ(account, nullptr);
    EXPECT_EQ(err, G_IO_ERROR_CONNECTION_REFUSED);
}

TEST_F(Box, NeedsAPlaceForTheAccount) {
    const std::string text = json::toString(Credentials());
    EXPECT_EQ(ZYROCloud_Cloud_Box_CheckAccount(server_id.c_str(), text.c_str(), nullptr, &err), 0);
    EXPECT_TRUE(seams::Logged("Wrong parameters")) << seams::LogDump();
    EXPECT_THAT(Requests(), IsEmpty());
}

}  // namespace
}  // namespace backend
