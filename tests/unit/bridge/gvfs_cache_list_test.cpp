#include "unit/bridge/cache_fixture.h"

namespace ZYROCloud {
namespace {

TEST_F(CacheTest, AnOriListMayHoldOneDisplayNameSeveralTimes) {
    List("/docs", "a.txt", true, "a.txt");
    List("/docs", "a - 2.txt", true, "a.txt");
    EXPECT_EQ(ZYROCloud_Cache_List_Ori_Get(cache, "/docs", "a.txt"), 1);
    ASSERT_EQ(cache->ori_lists.size(), 1U);
    EXPECT_EQ(cache->ori_lists.begin()->second.size(), 2U);
    EXPECT_EQ(cache->lists.begin()->second.size(), 2U);
}

TEST_F(CacheTest, ANameIsListedOnceAndStampedAnew) {
    List("/docs", "a");
    cache_clock::now = kNow + 5;
    List("/docs", "a");
    const CacheStamps& names = cache->lists.begin()->second;
    ASSERT_EQ(names.size(), 1U);
    EXPECT_EQ(names.begin()->second, CacheClock());
}

TEST_F(CacheTest, WithoutOriNoDisplayNameIsTaken) {
    EXPECT_EQ(List("/docs", "a"), 1);
    EXPECT_FALSE(IsTaken("/docs", "a"));
    EXPECT_EQ(cache->ori_lists.size(), 0U);
}

TEST_F(CacheTest, DisplayNamesBelongToTheirDirectory) {
    List("/docs", "a", true, "shown");
    EXPECT_TRUE(IsTaken("/docs", "shown"));
    EXPECT_FALSE(IsTaken("/docs", "a"));
    EXPECT_FALSE(IsTaken("/", "shown"));
    EXPECT_FALSE(IsTaken("/docs", "Shown"));
}

TEST_F(CaselessCacheTest, NamesThatDifferInCaseAreOneInAList) {
    List("/Docs", "A", true);
    List("/docs", "a", true);
    EXPECT_EQ(cache->lists.size(), 1U);
    EXPECT_EQ(cache->lists.begin()->second.size(), 1U);
    EXPECT_TRUE(IsTaken("/DOCS", "A"));
}

TEST_F(CacheTest, ListsFollowTheSettingOfTheProcess) {
    AddAndList("/Docs", "A");
    ZYROCloud_Cache_CassLess_Init(nullptr);
    EXPECT_TRUE(IsTaken("/docs", "a"));
    List("/docs", "a");
    EXPECT_EQ(cache->lists.begin()->second.size(), 1U);
    ZYROCloud_Cache_List_Remove(cache, "/docs");
    EXPECT_EQ(Get("/docs/a"), nullptr);
    EXPECT_EQ(cache->lists.size() + cache->ori_lists.size(), 0U);
    ZYROCloud_Cache_Init(nullptr);
}

TEST_F(CacheTest, ARecordWithoutNameOrDisplayNameIsNotListed) {
    const UniqueFileInfo nameless(g_file_info_new());
    g_file_info_set_display_name(nameless.get(), "shown");
    EXPECT_EQ(ZYROCloud_Cache_List_Add(cache, "/", true, nameless.get()), 0);
    const UniqueFileInfo hidden(g_file_info_new());
    g_file_info_set_name(hidden.get(), "name");
    EXPECT_EQ(ZYROCloud_Cache_List_Add(cache, "/", true, hidden.get()), 0);
    EXPECT_EQ(cache->lists.size() + cache->ori_lists.size(), 0U);
}

TEST_F(CacheTest, ListRemoveTakesTheEntriesThatTheListNames) {
    AddAndList("/docs", "a");
    Add("/docs", "unlisted");
    AddAndList("/", "docs");
    EXPECT_EQ(ZYROCloud_Cache_List_Remove(cache, "/docs"), 1);
    EXPECT_EQ(Get("/docs/a"), nullptr);
    EXPECT_NE(Get("/docs/unlisted"), nullptr);
    EXPECT_NE(Get("/docs"), nullptr);
    EXPECT_FALSE(IsTaken("/docs", "a"));
    EXPECT_TRUE(IsTaken("/", "docs"));
}

TEST_F(CacheTest, ListRemoveOfWhatHasNoListSucceeds) {
    EXPECT_EQ(ZYROCloud_Cache_List_Remove(cache, "/docs"), 1);
}

TEST_F(CacheTest, ListRemoveTakesMarksOfAbsenceOnlyOfEntriesThatItRemoves) {
    List("/docs", "gone");
    Remove("/docs/gone", true);
    ZYROCloud_Cache_List_Remove(cache, "/docs");
    EXPECT_TRUE(IsAbsent("/docs/gone"));
}

TEST_F(CacheTest, ListRemoveOfTheRootLeavesTheEntriesBelow) {
    AddAndList("/", "a");
    EXPECT_EQ(ZYROCloud_Cache_List_Remove(cache, "/"), 1);
    EXPECT_NE(Get("/a"), nullptr);
    EXPECT_FALSE(IsTaken("/", "a"));
}

TEST_F(CacheTest, EntryRemoveGoesThroughSubdirectories) {
    AddAndList("/", "docs");
    AddAndList("/docs", "sub");
    AddAndList("/docs/sub", "deep");
    AddAndList("/docs/sub", "er");
    EXPECT_EQ(Remove("/docs"), 1);
    EXPECT_EQ(cache->entries.size(), 0U);
    EXPECT_FALSE(IsTaken("/docs", "sub"));
    EXPECT_FALSE(IsTaken("/docs/sub", "deep"));
}

TEST_F(CacheTest, EntryRemoveStopsAtADirectoryThatHasNoEntry) {
    List("/docs", "sub");
    AddAndList("/docs/sub", "deep");
    Remove("/docs");
    EXPECT_NE(Get("/docs/sub/deep"), nullptr);
    EXPECT_TRUE(IsTaken("/docs/sub", "deep"));
}

TEST_F(CacheTest, TheNameOfARemovedEntryStaysInItsParentsList) {
    AddAndList("/docs", "a");
    Remove("/docs/a", true);
    EXPECT_TRUE(IsTaken("/docs", "a"));
    EXPECT_EQ(cache->lists.begin()->second.size(), 1U);
}

TEST_F(CacheTest, OnlyTheRemovedPathIsMarkedAbsent) {
    AddAndList("/docs", "a");
    Add("/", "docs");
    Remove("/docs", true);
    EXPECT_TRUE(IsAbsent("/docs"));
    EXPECT_FALSE(IsAbsent("/docs/a"));
}

TEST_F(CacheTest, AFolderThatWasCleanedOutOfItsListLosesItsDisplayNames) {
    Add("/", "docs");
    List("/", "docs");
    List("/docs", "a", true);
    cache->lists.erase(ZYROCloud_CacheKey{"/docs"});
    List("/parent", "x");
    Add("/parent", "x");
    List("/parent/x", "y", true);
    cache->lists.erase(ZYROCloud_CacheKey{"/parent/x"});
    ZYROCloud_Cache_List_Remove(cache, "/parent");
    EXPECT_FALSE(IsTaken("/parent/x", "y"));
}

TEST_F(CacheTest, AVeryDeepTreeIsRemoved) {
    constexpr int kDepth = 3000;
    std::string dir;
    for (int level = 0; level < kDepth; ++level) {
        AddAndList(dir, "d");
        dir += "/d";
    }
    Remove("/d");
    EXPECT_EQ(cache->entries.size(), 0U);
    EXPECT_EQ(cache->lists.size(), 1U);
}

TEST_F(CacheTest, ANamelessChildIsNoEndlessTree) {
    Add("/", "");
    List("/", "");
    Add("", "");
    List("", "");
    EXPECT_EQ(Remove(""), 1);
    EXPECT_EQ(Get("/"), nullptr);
}

}  // namespace
}  // namespace ZYROCloud
