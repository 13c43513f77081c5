#include "unit/bridge/cache_fixture.h"

namespace ZYROCloud {
namespace {

/**
 * The limit is 28,800 in units that differ from map to map, so each test turns the clocks to where
 * its map's difference is at the limit.
 */
class CacheClean : public CacheTest {
  protected:
    static constexpr long long kLimit = 28800;
    /** Microseconds whose low word is exactly this number. */
    static long long MicrosOf(long long low_word) { return 0x100000000LL * 395000 + low_word; }

    void Clean() { ASSERT_EQ(ZYROCloud_Cache_Entry_Clean(cache), 1); }
};

TEST_F(CacheClean, AnEmptyCacheIsCleaned) {
    EXPECT_EQ(ZYROCloud_Cache_Entry_Clean(cache), 1);
}

TEST_F(CacheClean, InPracticeEverythingGoes) {
    AddAndList("/", "a");
    Remove("/b", true);
    cache_clock::now = kNow + 100000;
    Clean();
    EXPECT_EQ(cache->entries.size(), 0U);
    EXPECT_EQ(cache->absent.size(), 0U);
    EXPECT_EQ(cache->lists.size(), 0U);
    EXPECT_EQ(cache->ori_lists.size(), 0U);
}

TEST_F(CacheClean, AnEntryStaysWhileItsSecondsAreNearTheMicrosecondsOfNow) {
    constexpr long long kSeconds = 1700000000;
    const struct {
        long long now;
        bool stays;
    } rows[] = {{kSeconds, true},
                {kSeconds + kLimit, true},
                {kSeconds + kLimit + 1, false},
                {kSeconds - kLimit, true},
                {kSeconds - kLimit - 1, false}};
    for (const auto& row : rows) {
        seams::SetTime(kSeconds);
        Add("/", "a");
        cache_clock::now = MicrosOf(row.now);
        Clean();
        EXPECT_EQ(Get("/a") != nullptr, row.stays) << row.now;
    }
}

TEST_F(CacheClean, AnEntryStampedZeroGoes) {
    seams::SetTime(0);
    Add("/", "a");
    cache_clock::now = MicrosOf(0);
    Clean();
    EXPECT_EQ(Get("/a"), nullptr);
}

TEST_F(CacheClean, AMarkOfAbsenceStaysFor28800Microseconds) {
    Remove("/a", true);
    cache_clock::now = kNow + kLimit;
    Clean();
    EXPECT_TRUE(IsAbsent("/a"));
    cache_clock::now = kNow + kLimit + 1;
    Clean();
    EXPECT_FALSE(IsAbsent("/a"));
}

TEST_F(CacheClean, AListIsAsOldAsItsLastNameInTheOrderOfKeys) {
    List("/old", "b");
    List("/young", "a");
    cache_clock::now = kNow + kLimit + 1;
    List("/old", "a");
    List("/young", "b");
    Clean();
    ASSERT_EQ(cache->lists.size(), 1U);
    EXPECT_EQ(cache->lists.begin()->first.text, "/young");
}

TEST_F(CacheClean, ALongerNameComesAfterItsBeginningAndBytesAreUnsigned) {
    List("/young", "a");
    List("/young", "Z");
    List("/young", "z");
    List("/young", "\xc3");
    cache_clock::now = kNow + kLimit + 1;
    List("/young", "\xc3\xa4");
    Clean();
    EXPECT_EQ(cache->lists.size(), 1U);
}

TEST_F(CacheClean, WithTheCaseFlagSetTheOrderOfKeysIsThatOfLetters) {
    ZYROCloud_Cache_CassLess_Init(nullptr);
    List("/old", "B");
    cache_clock::now = kNow + kLimit + 1;
    List("/old", "a");
    Clean();
    EXPECT_EQ(cache->lists.size(), 0U);
    ZYROCloud_Cache_Init(nullptr);
}

TEST_F(CacheClean, AnOriListStaysWhileSecondsOfNowAreJustPastItsMicroseconds) {
    constexpr long long kSeconds = 1700000000;
    const struct {
        long long stamp;
        bool stays;
    } rows[] = {{kSeconds, true},
                {kSeconds - kLimit, true},
                {kSeconds - kLimit - 1, false},
                {kSeconds + 1, false},
                {0x80000000LL + 5, false}};
    for (const auto& row : rows) {
        cache_clock::now = MicrosOf(row.stamp);
        List("/docs", "a", true);
        seams::SetTime(kSeconds);
        Clean();
        EXPECT_EQ(IsTaken("/docs", "a"), row.stays) << row.stamp;
        ZYROCloud_Cache_List_Remove(cache, "/docs");
    }
}

TEST_F(CacheClean, OfEqualDisplayNamesTheNewestIsTheLast) {
    constexpr long long kSeconds = 1700000000;
    cache_clock::now = MicrosOf(kSeconds - kLimit - 100);
    List("/docs", "1", true, "a");
    cache_clock::now = MicrosOf(kSeconds);
    List("/docs", "2", true, "a");
    cache_clock::now = MicrosOf(kSeconds + 1);
    seams::SetTime(kSeconds + 1);
    Clean();
    EXPECT_TRUE(IsTaken("/docs", "a"));
}

}  // namespace
}  // namespace ZYROCloud
