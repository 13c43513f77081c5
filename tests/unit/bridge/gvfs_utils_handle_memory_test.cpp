/**
 * Handles in a program in which nobody gets 16 MiB at once. A sanitizer has its own allocator, and
 * is told so.
 */
#include <gtest/gtest.h>

#include <cstddef>

#include "support/seams.h"
#include "zyrovfs/zyrocloud.h"

#define WITHOUT_LARGE_BLOCKS "allocator_may_return_null=1:max_allocation_size_mb=15"

#if defined(__has_feature)
#define HAS_FEATURE(name) __has_feature(name)
#else
#define HAS_FEATURE(name) 0
#endif

#if defined(__SANITIZE_ADDRESS__) || HAS_FEATURE(address_sanitizer)
extern "C" const char* __asan_default_options() {
    return WITHOUT_LARGE_BLOCKS;
}
#elif defined(__SANITIZE_THREAD__) || HAS_FEATURE(thread_sanitizer)
extern "C" const char* __tsan_default_options() {
    return WITHOUT_LARGE_BLOCKS;
}
#else
extern "C" void* __libc_calloc(size_t count, size_t size);
extern "C" void* calloc(size_t count, size_t size) noexcept {
    return size >= 0x1000000 ? nullptr : __libc_calloc(count, size);
}
#endif

namespace {

TEST(HandleWithoutMemory, ForItsBufferIsNone) {
    EXPECT_EQ(ZYROCloud_Cloud_Handle_New(nullptr, "/a", nullptr), nullptr);
    EXPECT_TRUE(seams::Logged("Failed to allocate memory")) << seams::LogDump();
    EXPECT_TRUE(seams::LoggedPart("gvfs_utils_handle.cpp:")) << seams::LogDump();
}

TEST(HandleWithoutMemory, NeedsNoneWithoutAPath) {
    ZYROCloud_Handle* const handle = ZYROCloud_Cloud_Handle_New(nullptr, nullptr, nullptr);
    ASSERT_NE(handle, nullptr);
    EXPECT_EQ(ZYROCloud_FileHandle_Buf_Init(handle), 0);
    EXPECT_EQ(ZYROCloud_FileHandle_Buf_Get(handle), nullptr);
    EXPECT_EQ(ZYROCloud_FileHandle_Buf_GetBufSize(handle), 0x1000000);
    ZYROCloud_Cloud_Handle_Free(handle, nullptr);
}

}  // namespace
