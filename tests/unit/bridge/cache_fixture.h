/**
 * A cache for one test, and its clock: a program that includes this in its one source file defines
 * gettimeofday itself.
 */
#ifndef ZYROVFS_TESTS_CACHE_FIXTURE_H
#define ZYROVFS_TESTS_CACHE_FIXTURE_H

#include <gmock/gmock.h>
#include <sys/time.h>

#include <atomic>
#include <ctime>
#include <string>

#include "bridge/gvfs_cache.h"
#include "support/seams.h"

namespace cache_clock {

/** Microseconds of the epoch; -1 is the machine's own time. */
inline std::atomic<long long> now{-1};

}  // namespace cache_clock

extern "C" int gettimeofday(timeval* out, void*) noexcept {
    const long long micros = cache_clock::now;
    if (micros >= 0) {
        *out = {micros / 1000000, micros % 1000000};
        return 0;
    }
    timespec real{};
    clock_gettime(CLOCK_REALTIME, &real);
    *out = {real.tv_sec, real.tv_nsec / 1000};
    return 0;
}

namespace ZYROCloud {

/** A record of a file; the display name is the name unless another is given. */
inline UniqueFileInfo Info(const std::string& name, const std::string& id = "",
                           const std::string& display_name = "") {
    GFileInfo* info = g_file_info_new();
    SetGFileInfo(&info, id.c_str(), false, (display_name.empty() ? name : display_name).c_str(),
                 name.c_str(), 0, {}, {}, {}, {}, nullptr);
    return UniqueFileInfo(info);
}

class CacheTest : public testing::Test {
  protected:
    static constexpr long long kNow = 1700000000LL * 1000000;

    void SetUp() override {
        cache_clock::now = kNow;
        ASSERT_EQ(ZYROCloud_Cache_Init(&cache), 1);
    }
    void TearDown() override {
        ZYROCloud_Cache_Destroy(&cache);
        cache_clock::now = -1;
    }

    int Add(const std::string& dir, const std::string& name, const std::string& id = "") {
        return ZYROCloud_Cache_Entry_Add(cache, dir.c_str(), Info(name, id).get());
    }
    int List(const std::string& dir, const std::string& name, bool ori = false,
             const std::string& display_name = "") {
        return ZYROCloud_Cache_List_Add(cache, dir.c_str(), ori,
                                        Info(name, "", display_name).get());
    }
    /** An item as a listing stores it. */
    void AddAndList(const std::string& dir, const std::string& name) {
        EXPECT_EQ(Add(dir, name), 1);
        EXPECT_EQ(List(dir, name, true), 1);
    }
    /** The stored record, or null. */
    GFileInfo* Get(const std::string& path) {
        GFileInfo* info = nullptr;
        const int found = ZYROCloud_Cache_Entry_Get(cache, path.c_str(), &info);
        EXPECT_EQ(found, info == nullptr ? 0 : 1);
        return info;
    }
    std::string IdOf(const std::string& path) { return AttrText(Get(path), kAttrFileId); }
    bool IsAbsent(const std::string& path) {
        return ZYROCloud_Cache_Entry_None_Get(cache, path.c_str()) == 1;
    }
    bool IsTaken(const std::string& dir, const std::string& display_name) {
        return ZYROCloud_Cache_List_Ori_Get(cache, dir.c_str(), display_name.c_str()) == 1;
    }
    int Remove(const std::string& path, bool mark_absent = false) {
        return ZYROCloud_Cache_Entry_Remove(cache, path.c_str(), mark_absent);
    }

    ZYROCloud_Cache* cache = nullptr;
};

class CaselessCacheTest : public CacheTest {
  protected:
    void SetUp() override {
        cache_clock::now = kNow;
        ASSERT_EQ(ZYROCloud_Cache_CassLess_Init(&cache), 1);
    }
};

}  // namespace ZYROCloud

#endif
