#include <thread>
#include <vector>

#include "unit/bridge/cache_fixture.h"

namespace ZYROCloud {
namespace {

/** Several threads at one cache; the thread sanitizer watches. */
class CacheThreads : public CacheTest {
  protected:
    static constexpr int kItems = 50;
    static constexpr int kRounds = 20;

    /** Runs `work(number)` in so many threads to its end. */
    template <typename Work>
    static void Run(int count, Work work) {
        std::vector<std::thread> threads;
        threads.reserve(static_cast<size_t>(count));
        for (int number = 0; number < count; ++number) {
            threads.emplace_back(work, number);
        }
        for (std::thread& thread : threads) {
            thread.join();
        }
    }

    static std::string Name(int item) { return "file " + std::to_string(item); }

    /** Refills a directory as a listing does. */
    void Refill(const std::string& dir) {
        ZYROCloud_Cache_Lock(&cache);
        ZYROCloud_Cache_List_Remove(cache, dir.c_str());
        for (int item = 0; item < kItems; ++item) {
            IsTaken(dir, Name(item));
            AddAndList(dir, Name(item));
        }
        ZYROCloud_Cache_Unlock(&cache);
    }
};

TEST_F(CacheThreads, TwoThatListTheSameFolderLeaveAllOfItsItems) {
    Run(2, [&](int) {
        for (int round = 0; round < kRounds; ++round) {
            Refill("/docs");
        }
    });
    for (int item = 0; item < kItems; ++item) {
        EXPECT_NE(Get("/docs/" + Name(item)), nullptr);
    }
    EXPECT_EQ(cache->lists.begin()->second.size(), static_cast<size_t>(kItems));
}

TEST_F(CacheThreads, AListingDuringTheRemovalOfItsParentLeavesNothingThatCannotBeRemoved) {
    Run(2, [&](int number) {
        for (int round = 0; round < kRounds; ++round) {
            if (number == 0) {
                AddAndList("/", "docs");
                AddAndList("/docs", "sub");
                Refill("/docs/sub");
            } else {
                Remove("/docs", true);
            }
        }
    });
    AddAndList("/docs", "sub");
    Refill("/docs/sub");
    Remove("/docs");
    EXPECT_EQ(cache->entries.size() - cache->entries.count({"/docs"}), 0U);
}

TEST_F(CacheThreads, EightThatListLookUpRemoveAndCleanGetAlong) {
    Run(8, [&](int number) {
        const std::string dir = "/dir " + std::to_string(number / 2);
        for (int round = 0; round < kRounds; ++round) {
            Refill(dir);
            for (int item = 0; item < kItems; ++item) {
                const std::string path = dir + "/" + Name(item);
                ZYROCloud_Cache_Lock(&cache);
                GFileInfo* info = Get(path);
                if (info != nullptr) {
                    EXPECT_EQ(InfoName(info), Name(item));
                }
                ZYROCloud_Cache_Unlock(&cache);
                ZYROCloud_Cache_Entry_SetMTime(cache, path.c_str(), 5);
                Remove(path, item % 2 == 0);
                IsAbsent(path);
            }
            if (number == 0) {
                ZYROCloud_Cache_Entry_Clean(cache);
            }
        }
    });
    Refill("/dir 0");
    EXPECT_NE(Get("/dir 0/" + Name(0)), nullptr);
}

TEST_F(CacheThreads, OthersComeInFromTheFirstNewEntryOfAHoldOn) {
    ZYROCloud_Cache_Lock(&cache);
    Add("/", "a");
    std::thread([&] { Add("/", "b"); }).join();  // would wait for ever
    EXPECT_NE(Get("/b"), nullptr);
    EXPECT_EQ(ZYROCloud_Cache_Unlock(&cache), 1);
    std::thread([&] { Add("/", "c"); }).join();
    EXPECT_NE(Get("/c"), nullptr);
}

TEST_F(CacheThreads, OnlyOneHoldEndsWithEachNewEntry) {
    ZYROCloud_Cache_Lock(&cache);
    ZYROCloud_Cache_Lock(&cache);
    Add("/", "a");
    int seen = 0;
    std::thread other([&] {
        ZYROCloud_Cache_Lock(&cache);
        EXPECT_EQ(seen, 1);
        ZYROCloud_Cache_Unlock(&cache);
    });
    Get("/a");
    seen = 1;
    ZYROCloud_Cache_Unlock(&cache);
    other.join();
}

TEST_F(CacheThreads, AnEntryThatIsThereEndsNoHold) {
    Add("/", "a", "1");
    ZYROCloud_Cache_Lock(&cache);
    Add("/", "a", "2");
    std::thread other([&] { Remove("/a"); });
    for (int i = 0; i < 1000; ++i) {
        ASSERT_NE(Get("/a"), nullptr);
    }
    ZYROCloud_Cache_Unlock(&cache);
    other.join();
    EXPECT_EQ(Get("/a"), nullptr);
}

}  // namespace
}  // namespace ZYROCloud
