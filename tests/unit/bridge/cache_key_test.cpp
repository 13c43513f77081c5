#include "bridge/cache_key.h"

#include <gtest/gtest.h>
#include <zosplatform/text.h>

#include <string>
#include <vector>

namespace ZYROCloud {
namespace {

using Key = ZYROCloud_CacheKey;

class CacheKeyTest : public testing::Test {
  protected:
    void TearDown() override { SetCaseless(false); }
};

TEST_F(CacheKeyTest, KeysAreOrderedByBytesAndThenByLength) {
    const std::vector<std::string> order = {"", "/", "/A", "/A/b", "/B", "/a", "/a ", "/\xc3\xa4"};
    for (size_t one = 0; one < order.size(); ++one) {
        for (size_t other = 0; other < order.size(); ++other) {
            EXPECT_EQ(Key{order[one]} < Key{order[other]}, one < other) << one << " " << other;
        }
    }
}

TEST_F(CacheKeyTest, WithTheCaseFlagSetTheOrderIsThatOfThePlatform) {
    SetCaseless(true);
    EXPECT_TRUE(Key{"a"} < Key{"B"});
    EXPECT_FALSE(Key{"B"} < Key{"a"});
    EXPECT_FALSE(Key{"b"} < Key{"B"} || Key{"B"} < Key{"b"});
}

/** What the platform finds equal must have one hash, or one of the two would never be found. */
TEST_F(CacheKeyTest, EqualKeysHaveOneHash) {
    const std::vector<std::string> texts = {"",
                                            "/docs/a.txt",
                                            "/DOCS/A.TXT",
                                            "/docs/b.txt",
                                            "stra\xc3\x9f\x65",
                                            "STRASSE",
                                            "\xc3\x84",
                                            "\xc3\xa4",
                                            "A\xcc\x88",
                                            "\xce\xa3",
                                            "\xcf\x83",
                                            "\xcf\x82",
                                            "\xe2\x84\xaa",
                                            "k",
                                            "K",
                                            "\xef\xac\x81",
                                            "FI",
                                            "\xc4\xb0",
                                            "i",
                                            "\xff",
                                            "\xfe",
                                            "\xff\xc3\x84",
                                            "\xff\xc3\xa4",
                                            "\xc3"};
    const KeyHash hash{true};
    const KeyEqual equal{true};
    for (const std::string& one : texts) {
        for (const std::string& other : texts) {
            EXPECT_EQ(equal({one}, {other}),
                      YLIBCUnicodeUTF8StrCaseCmp(one.c_str(), other.c_str()) == 0);
            if (equal({one}, {other})) {
                EXPECT_EQ(hash({one}), hash({other})) << one << " " << other;
            }
        }
    }
    EXPECT_NE(hash({"/docs/a.txt"}), hash({"/docs/b.txt"}));
}

TEST_F(CacheKeyTest, AMapFollowsTheSettingAndKeepsItsItems) {
    KeyMap<int> map = MakeKeyMap<int>();
    map.emplace(Key{"a"}, 1);
    map.emplace(Key{"A"}, 2);
    int* const one = FindKey(map, {"a"});
    SetCaseless(true);
    FollowSetting(map);
    EXPECT_EQ(map.count({"a"}), 2U);
    SetCaseless(false);
    FollowSetting(map);
    EXPECT_EQ(FindKey(map, {"a"}), one);
    EXPECT_EQ(map.count({"a"}), 1U);
}

TEST_F(CacheKeyTest, FindOrAddMakesAnItemOnce) {
    KeyMap<int> map = MakeKeyMap<int>();
    EXPECT_EQ(FindOrAdd(map, {"a"}, 1), 1);
    EXPECT_EQ(FindOrAdd(map, {"a"}, 2), 1);
    EXPECT_EQ(map.size(), 1U);
}

TEST_F(CacheKeyTest, ErasingGivesTheRoomBack) {
    KeyMap<int> map = MakeKeyMap<int>();
    for (int i = 0; i < 1000; ++i) {
        map.emplace(Key{std::to_string(i)}, i);
    }
    EraseIf(map, [](int value) { return value != 7; });
    EXPECT_EQ(map.size(), 1U);
    EXPECT_NE(FindKey(map, {"7"}), nullptr);
    EXPECT_LT(map.bucket_count(), 100U);
}

}  // namespace
}  // namespace ZYROCloud
