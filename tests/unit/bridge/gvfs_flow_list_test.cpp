// What the listings of all services have in common.
#include "bridge/gvfs_flow_list.h"

#include "support/backend.h"

namespace backend {
namespace {

using testing::AnyOf;
using testing::UnorderedElementsAre;

class FlowList : public EachBackend {
  protected:
    /** The next listing is this page. */
    void Give(const std::string& items) {
        sim.AddFault(rig->OnListing().Answer(200, rig->Page(items)));
    }
    std::string Good() const { return rig->ItemText("\"good\"", "/x9"); }
};

TEST_P(FlowList, PutsAFolderIntoTheCacheAndTellsOfEachItem) {
    amy.AddPath("/a.txt", "0123456789");
    amy.AddPath("/docs/b.txt", "b");
    EXPECT_EQ(List(rig->Top()), 1) << seams::LogDump();
    EXPECT_THAT(SeenNames(), UnorderedElementsAre("a.txt", "docs"));
    EXPECT_EQ(err, kUntouched);
    for (const char* name : {"a.txt", "docs"}) {
        GFileInfo* const cached = Cached(Shown(std::string("/") + name));
        ASSERT_NE(cached, nullptr) << name;
        EXPECT_EQ(IdOf(cached), IdOf(Seen(name)));
        EXPECT_NE(IdOf(cached), "");
        EXPECT_STREQ(g_file_info_get_display_name(cached), name);
    }
    EXPECT_FALSE(IsFolder(Seen("a.txt")));
    EXPECT_EQ(g_file_info_get_size(Seen("a.txt")), 10);
    EXPECT_GT(g_file_info_get_attribute_uint64(Seen("a.txt"), "time::modified"), 1000000000U);
    EXPECT_TRUE(IsFolder(Seen("docs")));
    EXPECT_EQ(g_file_info_get_size(Seen("docs")), 0);
}

TEST_P(FlowList, OfAFolderBelowTakesItsIdFromTheCache) {
    amy.AddPath("/docs/b.txt", "b");
    EXPECT_EQ(List(rig->Top()), 1);
    sim.Journal().Clear();
    EXPECT_EQ(List(Shown("/docs")), 1) << seams::LogDump();
    EXPECT_THAT(SeenNames(), ElementsAre("b.txt"));
    EXPECT_EQ(Requests().size(), 1U);
    EXPECT_NE(Cached(Shown("/docs/b.txt")), nullptr);
}

TEST_P(FlowList, OfAFolderThatTheCacheDoesNotKnowAsksTheService) {
    amy.AddPath("/docs/inner/b.txt", "b");
    EXPECT_EQ(List(Shown("/docs/inner")), 1) << seams::LogDump();
    EXPECT_THAT(SeenNames(), ElementsAre("b.txt"));
}

TEST_P(FlowList, OfWhatIsNotThereFailsAsNotFound) {
    EXPECT_EQ(List(Shown("/none")), 0);
    EXPECT_THAT(err, AnyOf(G_IO_ERROR_NOT_FOUND, G_IO_ERROR_FAILED));
    EXPECT_TRUE(seams::LoggedPart("Failed to find the path, " + Shown("/none")) ||
                seams::LoggedPart("Failed to list folder " + Shown("/none")))
        << seams::LogDump();
    EXPECT_THAT(SeenNames(), IsEmpty());
}

TEST_P(FlowList, OfAFileIsRefusedWithoutARequest) {
    Remember(rig->Top(), "a.txt", "/x1", false);
    const std::string path = Shown("/a.txt");
    EXPECT_EQ(List(path), 0);
    EXPECT_EQ(err, G_IO_ERROR_NOT_DIRECTORY);
    EXPECT_TRUE(seams::Logged("The file is not a directory " + path)) << seams::LogDump();
    EXPECT_THAT(Requests(), IsEmpty());
    EXPECT_NE(Cached(path), nullptr);
}

TEST_P(FlowList, ReplacesWhatTheCacheHadOfTheFolder) {
    const std::string path = Shown("/docs");
    amy.AddPath("/docs/b.txt", "b");
    EXPECT_EQ(List(rig->Top()), 1);
    Remember(path, "gone.txt", "/x1", false);
    EXPECT_EQ(List(path), 1);
    EXPECT_EQ(Cached(path + "/gone.txt"), nullptr);
    EXPECT_NE(Cached(path + "/b.txt"), nullptr);
    EXPECT_NE(Cached(path), nullptr);
}

TEST_P(FlowList, ThatFailsLeavesTheCacheAsItWas) {
    const std::string path = Shown("/docs");
    amy.AddPath("/docs/b.txt", "b");
    EXPECT_EQ(List(rig->Top()), 1);
    Remember(path, "old.txt", "/x1", false);
    const struct {
        int status;
        const char* body;
    } rows[] = {{403, "{}"}, {400, "{}"}, {200, "no JSON"}, {200, "[]"}, {200, "7"}, {200, ""}};
    for (const auto& row : rows) {
        sim.AddFault(rig->OnListing().Forever().Answer(row.status, row.body));
        EXPECT_EQ(List(path), 0) << row.status << row.body;
        EXPECT_THAT(SeenNames(), IsEmpty()) << row.status << row.body;
        EXPECT_NE(Cached(path + "/old.txt"), nullptr) << row.status << row.body;
        sim.ClearFaults();
    }
}

TEST_P(FlowList, ThatFailsOnItsSecondPageLeavesTheCacheAsItWas) {
    if (rig->FirstPage("").empty()) {
        GTEST_SKIP() << "a listing is one answer";
    }
    const std::string path = Shown("/docs");
    amy.AddPath("/docs/b.txt", "b");
    EXPECT_EQ(List(rig->Top()), 1);
    Remember(path, "old.txt", "/x1", false);
    sim.AddFault(rig->OnListing().Answer(200, rig->FirstPage(Good())));
    sim.AddFault(rig->OnListing().Forever().Answer(403, "{}"));
    sim.Journal().Clear();
    EXPECT_EQ(List(path), 0);
    EXPECT_NE(err, kUntouched);
    EXPECT_GE(Requests().size(), 2U);
    EXPECT_TRUE(seams::LoggedPart("Failed to list folder " + path + " err: ")) << seams::LogDump();
    EXPECT_THAT(SeenNames(), IsEmpty());
    EXPECT_NE(Cached(path + "/old.txt"), nullptr);
    EXPECT_EQ(Cached(path + "/good"), nullptr);
}

TEST_P(FlowList, GoesOnPastAnItemThatIsNone) {
    const char* const items[] = {
        "{}",
        "null",
        "7",
        "[]",
        "\"text\"",
        R"({"name":null,"title":null,"id":null,"type":null,"path_display":null})",
        R"({"name":7,"title":7,"id":8,"type":9,"size":"12","path_display":10})",
        R"({"name":{},"title":{},"id":{},"type":{},"size":{},"path_display":{}})",
        R"({"name":[],"title":[],"id":[],"type":[],"size":[],"path_display":[]})",
        R"({"name":"no id","title":"no id","type":"file","size":-5})",
        R"({"id":"x1","path_display":"/x1"})"};
    for (const char* item : items) {
        Give(std::string(item) + "," + Good());
        EXPECT_EQ(List(rig->Top()), 1) << item << seams::LogDump();
        EXPECT_THAT(SeenNames(), ElementsAre("good")) << item;
    }
}

TEST_P(FlowList, KeepsAnItemWhoseOtherMembersMakeNoSense) {
    const std::string id = R"("id":"x1","path_display":"/x1","name":"odd","title":"odd")";
    for (const char* more :
         {R"("size":1e300,"fileSize":"no number")", R"("size":-5,"fileSize":[],"type":{})",
          R"("modified_at":"31.12.1999","created_at":7,"createdDate":"9999-99-99T99:99:99Z")",
          R"("modifiedDate":{},"created_time":"","updated_time":[],"server_modified":"T")",
          R"("parent":7,"owned_by":[],"mimeType":[],"exportLinks":7,"link":{"a":1})",
          R"("downloadUrl":7,"alternateLink":{})"}) {
        Give("{" + id + "," + more + "}," + Good());
        EXPECT_EQ(List(rig->Top()), 1) << more;
        EXPECT_THAT(SeenNames(), ElementsAre("odd", "good")) << more;
    }
}

TEST_P(FlowList, LeavesOutNamesThatWouldLeaveTheFolder) {
    for (const char* name : {"\"\"", "\".\"", "\"..\"", "\"a/..\"", R"("a\u0000b")", "\"a\xff\""}) {
        Give(rig->ItemText(name, "/x1") + "," + Good());
        EXPECT_EQ(List(rig->Top()), 1) << name << seams::LogDump();
        EXPECT_THAT(SeenNames(), ElementsAre("good")) << name;
    }
    EXPECT_EQ(Cached("/"), nullptr);
}

TEST_P(FlowList, ShowsNamesThatAreOnlyOdd) {
    for (const char* name : {R"("a\nb")", R"("a\"b")", "\"...\"", "\" \"", R"("a\\b")"}) {
        Give(rig->ItemText(name, "/x1") + "," + Good());
        EXPECT_EQ(List(rig->Top()), 1) << name;
        EXPECT_THAT(SeenNames(), ElementsAre(Object(name).asString(), "good")) << name;
    }
}

TEST_P(FlowList, ShowsNamesOf255BytesAndLeavesOut256) {
    const std::string name(255, 'n');
    Give(rig->ItemText("\"" + name + "\"", "/x1") + "," +
         rig->ItemText("\"" + name + "n\"", "/x2"));
    EXPECT_EQ(List(rig->Top()), 1);
    EXPECT_THAT(SeenNames(), ElementsAre(name));
}

TEST_P(FlowList, OfALongPathShowsWhatStillFits) {
    // The cache knows the folder; the service never hears of its path but where that is its id.
    const std::string top = rig->Top() == "/" ? "" : rig->Top();
    const std::string name(4090 - top.size() - 1, 'd');
    Remember(rig->Top(), name, "/x1", true);
    Give(rig->ItemText("\"12345\"", "/x2") + "," + rig->ItemText("\"123456\"", "/x3"));
    EXPECT_EQ(List(top + "/" + name), 1) << seams::LogDump();
    EXPECT_THAT(SeenNames(), ElementsAre("12345"));
    EXPECT_TRUE(seams::LoggedPart("File path is too long, ")) << seams::LogDump();
}

TEST_P(FlowList, TellsWhoCallsBackAndUsesTheCacheMeanwhile) {
    amy.AddPath("/a.txt", "a");
    amy.AddPath("/b.txt", "b");
    struct Caller {
        ZYROCloud_Cache* cache;
        std::string top;
        int known = 0;
    } caller{cache, Shown("/"), 0};
    const auto use = [](GFileInfo* info, void* user_data) {
        auto& me = *static_cast<Caller*>(user_data);
        GFileInfo* found = nullptr;
        ZYROCloud_Cache_Lock(&me.cache);
        const std::string path = me.top + g_file_info_get_name(info);
        me.known += ZYROCloud_Cache_Entry_Get(me.cache, path.c_str(), &found);
        ZYROCloud_Cache_Entry_Remove(me.cache, path.c_str(), true);
        ZYROCloud_Cache_Entry_Add(me.cache, "/elsewhere", info);
        ZYROCloud_Cache_List_Remove(me.cache, "/elsewhere");
        ZYROCloud_Cache_Unlock(&me.cache);
    };
    EXPECT_EQ(rig->List(server_id.c_str(), cache, rig->Top().c_str(), use, &caller, &err), 1);
    EXPECT_EQ(caller.known, 2);
    EXPECT_EQ(Cached(Shown("/a.txt")), nullptr);
    EXPECT_NE(Cached("/elsewhere/a.txt"), nullptr);
}

TEST_P(FlowList, GivesTheCallbackARecordOfItsOwnToChange) {
    amy.AddPath("/a.txt", "text");
    const auto change = [](GFileInfo* info, void*) {
        g_file_info_remove_attribute(info, "id::file");
        g_file_info_set_size(info, 99);
    };
    ASSERT_EQ(rig->List(server_id.c_str(), cache, rig->Top().c_str(), change, nullptr, &err), 1);
    GFileInfo* const cached = Cached(Shown("/a.txt"));
    ASSERT_NE(cached, nullptr);
    EXPECT_NE(IdOf(cached), "");
    EXPECT_EQ(g_file_info_get_size(cached), 4);
}

TEST_P(FlowList, NeedsNeitherACallbackNorAPlaceForTheError) {
    amy.AddPath("/a.txt", "a");
    const char* const top = rig->Top() == "/" ? "/" : "/My Drive";
    EXPECT_EQ(rig->List(server_id.c_str(), cache, top, nullptr, nullptr, nullptr), 1);
    EXPECT_NE(Cached(Shown("/a.txt")), nullptr);
    sim.AddFault(rig->OnListing().Forever().Answer(403, "{}"));
    EXPECT_EQ(rig->List(server_id.c_str(), cache, top, nullptr, nullptr, nullptr), 0);
}

TEST_P(FlowList, WithoutAConnectionOrWithThatOfAnotherServiceFails) {
    const std::string other = rig->Protocol() == "box" ? "dropbox" : "box";
    for (const std::string& id : {std::string("none://amy@example.com"), std::string(),
                                  other + "://amy@example.com", rig->Protocol() + "://zoe@x.org"}) {
        seams::Reset();
        EXPECT_EQ(rig->List(id.c_str(), cache, rig->Top().c_str(), See, this, &err), 0) << id;
        EXPECT_TRUE(seams::Logged("Failed to create cloud")) << id << seams::LogDump();
        EXPECT_EQ(err, kUntouched) << id;
    }
    Disconnect();
    EXPECT_EQ(List(rig->Top()), 0);
    EXPECT_EQ(err, kUntouched);
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_P(FlowList, WithoutACacheOrAPathIsRefused) {
    EXPECT_EQ(rig->List(server_id.c_str(), nullptr, "/", See, this, &err), 0);
    EXPECT_TRUE(seams::Logged("Wrong parameters")) << seams::LogDump();
    seams::Reset();
    EXPECT_EQ(rig->List(server_id.c_str(), cache, nullptr, See, this, &err), 0);
    EXPECT_TRUE(seams::Logged("Wrong parameters")) << seams::LogDump();
    EXPECT_EQ(rig->List(nullptr, cache, rig->Top().c_str(), See, this, &err), 0);
    EXPECT_EQ(rig->List(nullptr, nullptr, nullptr, nullptr, nullptr, nullptr), 0);
    EXPECT_EQ(err, kUntouched);
    EXPECT_THAT(Requests(), IsEmpty());
}

}  // namespace

RUN_FOR_EACH_BACKEND(FlowList);

}  // namespace backend
