#include <gmock/gmock.h>

#include <climits>
#include <cstdlib>
#include <cstring>
#include <new>
#include <string>
#include <thread>

#include "bridge/gvfs_cache.h"
#include "bridge/handle.h"
#include "support/profiles.h"
#include "support/seams.h"

namespace {

bool no_handle = false;

}  // namespace

void* operator new(size_t size, const std::nothrow_t&) noexcept {
    return no_handle ? nullptr : ::operator new(size);
}

namespace ZYROCloud {
namespace {

constexpr long long kBufferBytes = 0x1000000;

UniqueFileInfo Info() {
    GFileInfo* info = g_file_info_new();
    SetGFileInfo(&info, "files/1", false, "a", "a", 5, {}, {}, {}, {}, nullptr);
    return UniqueFileInfo(info);
}

class HandleTest : public profiles::ProfileTest {
  protected:
    void SetUp() override {
        ProfileTest::SetUp();
        handle = ZYROCloud_Cloud_Handle_New(nullptr, "/a", nullptr);
        ASSERT_NE(handle, nullptr);
    }
    void TearDown() override { ZYROCloud_Cloud_Handle_Free(handle, nullptr); }

    /** As if a download had brought this. */
    void Bring(const std::string& bytes) {
        std::memcpy(ZYROCloud_FileHandle_Buf_Get(handle), bytes.data(), bytes.size());
        ZYROCloud_FileHandle_Buf_Reset(handle, static_cast<long long>(bytes.size()));
    }
    /** What the next read of so many bytes gives. */
    std::string Read(long long size) {
        std::string bytes(64, '#');
        char* dest = bytes.data();
        const long long got = ZYROCloud_FileHandle_Buf_Fill(handle, &dest, size);
        EXPECT_EQ(bytes.substr(static_cast<size_t>(got)),
                  std::string(64 - static_cast<size_t>(got), '#'));
        return bytes.substr(0, static_cast<size_t>(got));
    }

    ZYROCloud_Handle* handle = nullptr;
};

using HandleBuffer = HandleTest;

// --- handle ---------------------------------------------------------------------------------

TEST_F(HandleTest, HandleNewWithNoPathAllocatesNoBuffer) {
    ZYROCloud_Handle* const bare = ZYROCloud_Cloud_Handle_New(nullptr, nullptr, nullptr);
    ASSERT_NE(bare, nullptr);
    EXPECT_EQ(ZYROCloud_FileHandle_Buf_Get(bare), nullptr);
    EXPECT_EQ(ZYROCloud_FileHandle_Buf_GetBufSize(bare), kBufferBytes);
    ZYROCloud_Cloud_Handle_Free(bare, nullptr);
}

TEST_F(HandleTest, BeginsAtTheStartOfItsFile) {
    const UniqueFileInfo info = Info();
    ZYROCloud_Handle* const made = ZYROCloud_Cloud_Handle_New(nullptr, "files/1", info.get());
    ASSERT_NE(made, nullptr);
    EXPECT_EQ(made->path, "files/1");
    EXPECT_EQ(made->url, "");
    EXPECT_EQ(made->position, 0);
    EXPECT_EQ(made->buffer_position, 0);
    EXPECT_EQ(made->buffer_filled, 0);
    EXPECT_EQ(made->descriptor, -1);
    EXPECT_NE(made->info, info);
    EXPECT_STREQ(AttrText(made->info.get(), kAttrFileId), "files/1");
    EXPECT_EQ(G_OBJECT(info.get())->ref_count, 1U);
    EXPECT_NE(ZYROCloud_FileHandle_Buf_Get(made), nullptr);
    ZYROCloud_Cloud_Handle_Free(made, nullptr);
}

TEST_F(HandleTest, AConnectionThatIsNotThereIsNoFailureYet) {
    ZYROCloud_Handle* const made =
        ZYROCloud_Cloud_Handle_New("box://nobody@example.com", "/a", nullptr);
    ASSERT_NE(made, nullptr);
    EXPECT_EQ(made->cloud, nullptr);
    EXPECT_TRUE(seams::Logged("Can't get server conf, box://nobody@example.com"))
        << seams::LogDump();
    ZYROCloud_Cloud_Handle_Free(made, nullptr);
}

TEST_F(HandleTest, WithoutMemoryThereIsNone) {
    no_handle = true;
    ZYROCloud_Handle* const made = ZYROCloud_Cloud_Handle_New(nullptr, "/a", nullptr);
    no_handle = false;
    EXPECT_EQ(made, nullptr);
}

/** A cache that knows the file of a handle. */
class HandleFree : public HandleTest {
  protected:
    void SetUp() override {
        HandleTest::SetUp();
        ZYROCloud_Cache_Init(&cache);
        ZYROCloud_Cache_Entry_Add(cache, "/", Info().get());
    }
    void TearDown() override {
        ZYROCloud_Cache_Destroy(&cache);
        HandleTest::TearDown();
    }
    bool IsCached() {
        GFileInfo* info = nullptr;
        return ZYROCloud_Cache_Entry_Get(cache, "/a", &info) == 1;
    }
    ZYROCloud_Cache* cache = nullptr;
};

TEST_F(HandleFree, AClosedFileIsLookedUpAfresh) {
    ZYROCloud_Cloud_Handle_Free(ZYROCloud_Cloud_Handle_New(nullptr, "/a", nullptr), cache);
    EXPECT_FALSE(IsCached());
    EXPECT_EQ(ZYROCloud_Cache_Entry_None_Get(cache, "/a"), 0);
}

TEST_F(HandleFree, WithoutACacheAPathOrAHandleNothingIsForgotten) {
    ZYROCloud_Cloud_Handle_Free(ZYROCloud_Cloud_Handle_New(nullptr, "/a", nullptr), nullptr);
    ZYROCloud_Cloud_Handle_Free(ZYROCloud_Cloud_Handle_New(nullptr, "", nullptr), cache);
    ZYROCloud_Cloud_Handle_Free(ZYROCloud_Cloud_Handle_New(nullptr, nullptr, nullptr), cache);
    ZYROCloud_Cloud_Handle_Free(nullptr, cache);
    EXPECT_TRUE(IsCached());
}

/** What the header allows: whoever frees a handle is the last to use it. */
TEST_F(HandleFree, AfterTheLastReadOfAnotherThreadIsNoFault) {
    ZYROCloud_Handle* const shared = ZYROCloud_Cloud_Handle_New(nullptr, "/a", nullptr);
    std::thread([&] { ZYROCloud_FileHandle_Buf_Reset(shared, 10); }).join();
    ZYROCloud_Cloud_Handle_Free(shared, cache);
    EXPECT_FALSE(IsCached());
}

// --- buffer ---------------------------------------------------------------------------------

TEST_F(HandleBuffer, FillAfterTheEndGivesZero) {
    Bring("abc");
    EXPECT_EQ(Read(3), "abc");
    EXPECT_EQ(Read(3), "");
    EXPECT_EQ(Read(1), "");
}

TEST_F(HandleBuffer, AFillThatAsksForMoreThanRemainsCopiesTheRestAndTheNextGivesZero) {
    Bring("abcde");
    EXPECT_EQ(Read(3), "abc");
    EXPECT_EQ(Read(10), "de");
    EXPECT_EQ(Read(1), "");
    EXPECT_EQ(handle->buffer_position, 13);
}

TEST_F(HandleBuffer, AnEmptyBufferFillsNothing) {
    EXPECT_EQ(Read(10), "");
}

TEST_F(HandleBuffer, ResetBeginsAnew) {
    Bring("abc");
    EXPECT_EQ(Read(10), "abc");
    Bring("de");
    EXPECT_EQ(Read(1), "d");
    EXPECT_EQ(Read(1), "e");
    EXPECT_EQ(Read(1), "");
}

TEST_F(HandleBuffer, RequestsOfAnySizeStayInside) {
    Bring("abc");
    EXPECT_EQ(Read(0), "");
    EXPECT_EQ(Read(-5), "");
    EXPECT_EQ(Read(LLONG_MIN), "");
    EXPECT_EQ(Read(1), "a");
    EXPECT_EQ(Read(LLONG_MAX), "bc");
    EXPECT_EQ(Read(LLONG_MAX), "");
}

TEST_F(HandleBuffer, MoreThanItHoldsIsNeverRead) {
    Bring("abc");
    ZYROCloud_FileHandle_Buf_Reset(handle, LLONG_MAX);
    std::string all(static_cast<size_t>(kBufferBytes) + 64, '#');
    char* dest = all.data();
    EXPECT_EQ(ZYROCloud_FileHandle_Buf_Fill(handle, &dest, static_cast<long long>(all.size())),
              kBufferBytes + 1);
    EXPECT_EQ(all.compare(0, 3, "abc"), 0);
    ZYROCloud_FileHandle_Buf_Reset(handle, -5);
    EXPECT_EQ(Read(10), "");
}

TEST_F(HandleBuffer, TheByteThatServicesAreAskedForBeyondItsSizeIsReadToo) {
    char* const buffer = ZYROCloud_FileHandle_Buf_Get(handle);
    EXPECT_EQ(buffer[0], 0);
    EXPECT_EQ(buffer[kBufferBytes], 0);
    buffer[kBufferBytes] = 'z';
    ZYROCloud_FileHandle_Buf_Reset(handle, kBufferBytes + 1);
    std::string all(static_cast<size_t>(kBufferBytes), '#');
    char* dest = all.data();
    EXPECT_EQ(ZYROCloud_FileHandle_Buf_Fill(handle, &dest, kBufferBytes), kBufferBytes);
    EXPECT_EQ(Read(10), "z");
    EXPECT_EQ(Read(10), "");
}

TEST_F(HandleBuffer, InitKeepsABufferAndEmptiesIt) {
    Bring("abc");
    const char* const before = ZYROCloud_FileHandle_Buf_Get(handle);
    ZYROCloud_FileHandle_Buf_SetBufSize(handle, 5);
    EXPECT_EQ(ZYROCloud_FileHandle_Buf_Init(handle), 1);
    EXPECT_EQ(ZYROCloud_FileHandle_Buf_Get(handle), before);
    EXPECT_EQ(ZYROCloud_FileHandle_Buf_GetBufSize(handle), kBufferBytes);
    EXPECT_EQ(Read(10), "");
}

TEST_F(HandleBuffer, AFreedBufferGivesNothingAndComesBackByInit) {
    Bring("abc");
    ZYROCloud_FileHandle_Buf_Free(handle);
    EXPECT_EQ(ZYROCloud_FileHandle_Buf_Get(handle), nullptr);
    EXPECT_EQ(Read(10), "");
    ZYROCloud_FileHandle_Buf_Reset(handle, 10);
    EXPECT_EQ(Read(10), "");
    EXPECT_EQ(ZYROCloud_FileHandle_Buf_Init(handle), 1);
    Bring("de");
    EXPECT_EQ(Read(10), "de");
}

TEST_F(HandleBuffer, ItsSizeIsANumberToAskBy) {
    for (const long long size : {4096LL, 0LL, 2 * kBufferBytes, -1LL}) {
        ZYROCloud_FileHandle_Buf_SetBufSize(handle, size);
        EXPECT_EQ(ZYROCloud_FileHandle_Buf_GetBufSize(handle), size);
    }
}

TEST_F(HandleBuffer, NullInAnyPlaceIsNoHarm) {
    char byte = '#';
    char* dest = &byte;
    char* nowhere = nullptr;
    Bring("abc");
    EXPECT_EQ(ZYROCloud_FileHandle_Buf_Init(nullptr), 0);
    EXPECT_EQ(ZYROCloud_FileHandle_Buf_Get(nullptr), nullptr);
    EXPECT_EQ(ZYROCloud_FileHandle_Buf_Fill(nullptr, &dest, 1), 0);
    EXPECT_EQ(ZYROCloud_FileHandle_Buf_Fill(handle, nullptr, 1), 0);
    EXPECT_EQ(ZYROCloud_FileHandle_Buf_Fill(handle, &nowhere, 1), 0);
    ZYROCloud_FileHandle_Buf_Reset(nullptr, 1);
    EXPECT_EQ(ZYROCloud_FileHandle_Buf_GetBufSize(nullptr), kBufferBytes);
    ZYROCloud_FileHandle_Buf_SetBufSize(nullptr, 1);
    ZYROCloud_FileHandle_Buf_Free(nullptr);
    EXPECT_EQ(Read(10), "abc");
}

TEST_F(HandleBuffer, OneThreadReadsWhileAnotherTellsWhatCame) {
    std::thread other([&] {
        for (int i = 0; i < 1000; ++i) {
            ZYROCloud_FileHandle_Buf_Reset(handle, i % 64);
            ZYROCloud_FileHandle_Buf_SetBufSize(handle, i);
        }
    });
    for (int i = 0; i < 1000; ++i) {
        EXPECT_LE(Read(10).size(), 10U);
        EXPECT_LE(ZYROCloud_FileHandle_Buf_GetBufSize(handle), kBufferBytes);
    }
    other.join();
}

}  // namespace
}  // namespace ZYROCloud
