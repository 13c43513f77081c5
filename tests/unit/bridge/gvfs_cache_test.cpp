#include "unit/bridge/cache_fixture.h"

#include <new>

namespace {

bool no_memory = false;

}  // namespace

void* operator new(size_t size, const std::nothrow_t&) noexcept {
    return no_memory ? nullptr : ::operator new(size);
}

namespace ZYROCloud {
namespace {

// --- life -----------------------------------------------------------------------------------

TEST(CacheLife, WithoutMemoryNullIsStored) {
    int something = 0;
    auto* cache = reinterpret_cast<ZYROCloud_Cache*>(&something);
    no_memory = true;
    const int made = ZYROCloud_Cache_Init(&cache);
    no_memory = false;
    EXPECT_EQ(made, 0);
    EXPECT_EQ(cache, nullptr);
}

TEST(CacheLife, InitOfNullFailsAndChangesTheSettingAllTheSame) {
    EXPECT_EQ(ZYROCloud_Cache_CassLess_Init(nullptr), 0);
    EXPECT_TRUE(IsCaseless());
    EXPECT_EQ(ZYROCloud_Cache_Init(nullptr), 0);
    EXPECT_FALSE(IsCaseless());
}

TEST(CacheLife, DestroyLeavesTheCallersPointer) {
    ZYROCloud_Cache* cache = nullptr;
    ASSERT_EQ(ZYROCloud_Cache_Init(&cache), 1);
    const ZYROCloud_Cache* const before = cache;
    EXPECT_EQ(ZYROCloud_Cache_Destroy(&cache), 1);
    EXPECT_EQ(cache, before);
}

TEST(CacheLife, DestroyFreesTheRecordsAndEndsHoldsOfItsThread) {
    ZYROCloud_Cache* cache = nullptr;
    ASSERT_EQ(ZYROCloud_Cache_Init(&cache), 1);
    ZYROCloud_Cache_Entry_Add(cache, "/", Info("a").get());
    GFileInfo* record = nullptr;
    ASSERT_EQ(ZYROCloud_Cache_Entry_Get(cache, "/a", &record), 1);
    GFileInfo* watched = record;
    g_object_add_weak_pointer(G_OBJECT(record), reinterpret_cast<gpointer*>(&watched));
    ZYROCloud_Cache_Lock(&cache);
    ZYROCloud_Cache_Lock(&cache);
    ZYROCloud_Cache_Destroy(&cache);
    EXPECT_EQ(watched, nullptr);
}

TEST_F(CacheTest, NullInAnyPlaceGivesZeroAndChangesNothing) {
    ZYROCloud_Cache* none = nullptr;
    const UniqueFileInfo info = Info("a");
    GFileInfo* out = nullptr;
    EXPECT_EQ(ZYROCloud_Cache_Destroy(nullptr), 0);
    EXPECT_EQ(ZYROCloud_Cache_Destroy(&none), 0);
    EXPECT_EQ(ZYROCloud_Cache_Lock(nullptr), 0);
    EXPECT_EQ(ZYROCloud_Cache_Lock(&none), 0);
    EXPECT_EQ(ZYROCloud_Cache_Unlock(nullptr), 0);
    EXPECT_EQ(ZYROCloud_Cache_Unlock(&none), 0);
    EXPECT_EQ(ZYROCloud_Cache_Entry_Get(nullptr, "/a", &out), 0);
    EXPECT_EQ(ZYROCloud_Cache_Entry_Get(cache, nullptr, &out), 0);
    EXPECT_EQ(ZYROCloud_Cache_Entry_Get(cache, "/a", nullptr), 0);
    EXPECT_EQ(ZYROCloud_Cache_Entry_None_Get(nullptr, "/a"), 0);
    EXPECT_EQ(ZYROCloud_Cache_Entry_None_Get(cache, nullptr), 0);
    EXPECT_EQ(ZYROCloud_Cache_Entry_SetMTime(nullptr, "/a", 1), 0);
    EXPECT_EQ(ZYROCloud_Cache_Entry_SetMTime(cache, nullptr, 1), 0);
    EXPECT_EQ(ZYROCloud_Cache_Entry_Add(nullptr, "/", info.get()), 0);
    EXPECT_EQ(ZYROCloud_Cache_Entry_Add(cache, nullptr, info.get()), 0);
    EXPECT_EQ(ZYROCloud_Cache_Entry_Add(cache, "/", nullptr), 0);
    EXPECT_EQ(ZYROCloud_Cache_Entry_Remove(nullptr, "/a", true), 0);
    EXPECT_EQ(ZYROCloud_Cache_Entry_Remove(cache, nullptr, true), 0);
    EXPECT_EQ(ZYROCloud_Cache_Entry_Clean(nullptr), 0);
    EXPECT_EQ(ZYROCloud_Cache_List_Add(nullptr, "/", true, info.get()), 0);
    EXPECT_EQ(ZYROCloud_Cache_List_Add(cache, nullptr, true, info.get()), 0);
    EXPECT_EQ(ZYROCloud_Cache_List_Add(cache, "/", true, nullptr), 0);
    EXPECT_EQ(ZYROCloud_Cache_List_Remove(nullptr, "/"), 0);
    EXPECT_EQ(ZYROCloud_Cache_List_Remove(cache, nullptr), 0);
    EXPECT_EQ(ZYROCloud_Cache_List_Ori_Get(nullptr, "/", "a"), 0);
    EXPECT_EQ(ZYROCloud_Cache_List_Ori_Get(cache, nullptr, "a"), 0);
    EXPECT_EQ(ZYROCloud_Cache_List_Ori_Get(cache, "/", nullptr), 0);
    EXPECT_EQ(Get("/a"), nullptr);
    EXPECT_EQ(seams::LogDump(), "");
}

// --- entries --------------------------------------------------------------------------------

TEST_F(CacheTest, EntryAddOfANameUnderTheRootGivesAKeyWithOneSlash) {
    EXPECT_EQ(Add("/", "x", "1"), 1);
    EXPECT_EQ(IdOf("/x"), "1");
    EXPECT_EQ(Get("//x"), nullptr);
    EXPECT_EQ(Get("x"), nullptr);
}

TEST_F(CacheTest, BelowAnyOtherDirectoryASlashComesInBetween) {
    Add("/docs", "x", "1");
    Add("", "y", "2");
    Add("/docs/", "z", "3");
    EXPECT_EQ(IdOf("/docs/x"), "1");
    EXPECT_EQ(IdOf("/y"), "2");
    EXPECT_EQ(IdOf("/docs//z"), "3");
}

TEST_F(CacheTest, ANamelessRecordUnderTheRootIsTheRoot) {
    EXPECT_EQ(Add("/", "", "root"), 1);
    EXPECT_EQ(IdOf("/"), "root");
}

TEST_F(CacheTest, ARecordWithoutANameIsRefused) {
    const UniqueFileInfo info(g_file_info_new());
    EXPECT_EQ(ZYROCloud_Cache_Entry_Add(cache, "/", info.get()), 0);
}

TEST_F(CacheTest, TheStoredRecordIsACopy) {
    const UniqueFileInfo info = Info("a", "1");
    ZYROCloud_Cache_Entry_Add(cache, "/", info.get());
    EXPECT_NE(Get("/a"), info.get());
    g_file_info_set_attribute_string(info.get(), kAttrFileId, "2");
    EXPECT_EQ(IdOf("/a"), "1");
}

TEST_F(CacheTest, GetAddsNoReference) {
    Add("/", "a");
    EXPECT_EQ(G_OBJECT(Get("/a"))->ref_count, 1U);
    EXPECT_EQ(G_OBJECT(Get("/a"))->ref_count, 1U);
}

TEST_F(CacheTest, GetOfWhatIsNotThereLeavesTheResultAlone) {
    const UniqueFileInfo mine = Info("mine");
    GFileInfo* out = mine.get();
    EXPECT_EQ(ZYROCloud_Cache_Entry_Get(cache, "/a", &out), 0);
    EXPECT_EQ(out, mine.get());
}

TEST_F(CacheTest, ARecordOfAnyAgeIsFound) {
    seams::SetTime(1);
    Add("/", "a", "1");
    seams::SetTime(2000000000);
    EXPECT_EQ(IdOf("/a"), "1");
}

TEST_F(CacheTest, APathThatIsThereIsOverwrittenInPlace) {
    Add("/", "a", "1");
    GFileInfo* const before = Get("/a");
    EXPECT_EQ(Add("/", "a", "2"), 1);
    EXPECT_EQ(Get("/a"), before);
    EXPECT_EQ(IdOf("/a"), "2");
}

TEST_F(CacheTest, OverwritingRenewsTheStamp) {
    seams::SetTime(100);
    Add("/", "a");
    seams::SetTime(200);
    Add("/", "a");
    ASSERT_EQ(cache->entries.size(), 1U);
    EXPECT_EQ(cache->entries.begin()->second.stamp, 200);
}

TEST_F(CacheTest, ARecordThatCameFromTheCacheMayBeStoredAgain) {
    Add("/", "a", "1");
    EXPECT_EQ(ZYROCloud_Cache_Entry_Add(cache, "/", Get("/a")), 1);
    EXPECT_EQ(IdOf("/a"), "1");
    EXPECT_STREQ(InfoName(Get("/a")), "a");
}

TEST_F(CacheTest, NamesAndPathsOfAnyLengthAndBytesAreKept) {
    for (const std::string& name :
         {std::string(255, 'x'), std::string(256, 'x'), std::string(4096, 'x'),
          std::string(4097, 'x'), std::string("a/b"), std::string("a\nb"), std::string("\xff\xfe"),
          std::string("\xe4\xbd\xa0\xe5\xa5\xbd")}) {
        EXPECT_EQ(Add("/dir", name, "1"), 1);
        EXPECT_EQ(IdOf("/dir/" + name), "1") << name;
    }
}

TEST_F(CacheTest, SetMTimeChangesTheStoredRecord) {
    Add("/", "a");
    EXPECT_EQ(ZYROCloud_Cache_Entry_SetMTime(cache, "/a", 1234567890), 1);
    EXPECT_EQ(g_file_info_get_attribute_uint64(Get("/a"), "time::modified"), 1234567890U);
}

TEST_F(CacheTest, SetMTimeOfZeroOrOfAnUnknownPathFails) {
    Add("/", "a");
    ZYROCloud_Cache_Entry_SetMTime(cache, "/a", 5);
    EXPECT_EQ(ZYROCloud_Cache_Entry_SetMTime(cache, "/a", 0), 0);
    EXPECT_EQ(g_file_info_get_attribute_uint64(Get("/a"), "time::modified"), 5U);
    EXPECT_EQ(ZYROCloud_Cache_Entry_SetMTime(cache, "/b", 5), 0);
}

// --- marks of absence -----------------------------------------------------------------------

TEST_F(CacheTest, APathRemovedWithAMarkIsAbsentWithinASecondAndForgottenAfterIt) {
    EXPECT_EQ(Remove("/a", true), 1);
    EXPECT_TRUE(IsAbsent("/a"));
    cache_clock::now = kNow + 1000000;
    EXPECT_TRUE(IsAbsent("/a"));
    EXPECT_EQ(cache->absent.size(), 1U);
    cache_clock::now = kNow + 1000001;
    EXPECT_FALSE(IsAbsent("/a"));
    EXPECT_EQ(cache->absent.size(), 0U);
}

TEST_F(CacheTest, OnlyTheLowWordsOfAMarksTimeCount) {
    // One microsecond before the low word turns over, and one before it becomes negative.
    for (const long long edge : {0x100000000LL * 395000, 0x100000000LL * 395000 + 0x80000000LL}) {
        cache_clock::now = edge - 1;
        Remove("/a", true);
        cache_clock::now = edge + 999999;
        EXPECT_TRUE(IsAbsent("/a"));
        cache_clock::now = edge + 1000000;
        EXPECT_FALSE(IsAbsent("/a"));
    }
}

TEST_F(CacheTest, AMarkFromTheFutureIsAnOldOne) {
    Remove("/a", true);
    cache_clock::now = kNow - 1;
    EXPECT_FALSE(IsAbsent("/a"));
    EXPECT_EQ(cache->absent.size(), 0U);
}

TEST_F(CacheTest, AMarkIsRenewed) {
    Remove("/a", true);
    cache_clock::now = kNow + 900000;
    Remove("/a", true);
    cache_clock::now = kNow + 1800000;
    EXPECT_TRUE(IsAbsent("/a"));
}

TEST_F(CacheTest, EntryAddOfAPathWithALiveMarkOfAbsenceClearsTheMark) {
    Remove("/a", true);
    ASSERT_TRUE(IsAbsent("/a"));
    Add("/", "a");
    EXPECT_FALSE(IsAbsent("/a"));
    // Of a path that is there already, too.
    cache->absent.emplace(ZYROCloud_CacheKey{"/a"}, CacheClock());
    Add("/", "a");
    EXPECT_FALSE(IsAbsent("/a"));
}

TEST_F(CacheTest, RemovingWithoutAMarkTakesOneAway) {
    Remove("/a", true);
    EXPECT_EQ(Remove("/a", false), 1);
    EXPECT_FALSE(IsAbsent("/a"));
}

// --- keys -----------------------------------------------------------------------------------

TEST_F(CacheTest, PathsThatDifferInCaseAreTwoEntries) {
    Add("/", "A", "1");
    Add("/", "a", "2");
    EXPECT_EQ(IdOf("/A"), "1");
    EXPECT_EQ(IdOf("/a"), "2");
}

TEST_F(CaselessCacheTest, WithTheCaseFlagSetPathsThatDifferInCaseAreOneEntry) {
    Add("/", "A", "1");
    Add("/", "a", "2");
    EXPECT_EQ(cache->entries.size(), 1U);
    EXPECT_EQ(IdOf("/A"), "2");
    EXPECT_EQ(Get("/A"), Get("/a"));
    Remove("/A", true);
    EXPECT_EQ(Get("/a"), nullptr);
    EXPECT_TRUE(IsAbsent("/a"));
}

TEST_F(CaselessCacheTest, LettersOfAllScriptsHaveNoCase) {
    const struct {
        const char* one;
        const char* other;
    } rows[] = {{"\xc3\x84rger.txt", "\xc3\xa4RGER.TXT"},
                {"\xd0\x9f\xd0\xbb\xd0\xb0\xd0\xbd", "\xd0\xbf\xd0\xbb\xd0\xb0\xd0\xbd"},
                {"stra\xc3\x9f"
                 "e",
                 "STRASSE"},
                {"\xff\xc3\x84", "\xff\xc3\xa4"}};
    for (const auto& row : rows) {
        Add("/", row.one, "1");
        EXPECT_EQ(IdOf(std::string("/") + row.other), "1") << row.one;
    }
    EXPECT_EQ(cache->entries.size(), std::size(rows));
}

TEST_F(CacheTest, TheLastInitDecidesForAllCachesAndForWhatTheyHold) {
    Add("/", "A", "1");
    Add("/", "a", "2");
    Add("/", "b", "3");
    GFileInfo* const record = Get("/b");
    ZYROCloud_Cache_CassLess_Init(nullptr);
    EXPECT_EQ(Get("/B"), record);
    EXPECT_EQ(cache->entries.size(), 3U);
    Remove("/A");
    EXPECT_EQ(cache->entries.size(), 1U);
    ZYROCloud_Cache_Init(nullptr);
    EXPECT_EQ(Get("/B"), nullptr);
    EXPECT_EQ(Get("/b"), record);
}

}  // namespace
}  // namespace ZYROCloud
