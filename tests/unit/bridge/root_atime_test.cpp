#include <gtest/gtest.h>

#include <thread>
#include <vector>

#include "support/seams.h"
#include "zyrovfs/zyrocloud.h"

namespace {

TEST(RootAtime, IsStampedByInitAndByUpdate) {
    ZYROCloud_RootAtime atime;
    seams::SetTime(1000);
    InitRootAtime(&atime);
    EXPECT_EQ(GetRootAtime(&atime), 1000);
    seams::SetTime(2000);
    EXPECT_EQ(GetRootAtime(&atime), 1000);
    UpdateRootAtime(&atime);
    EXPECT_EQ(GetRootAtime(&atime), 2000);
    DestroyRootAtime(&atime);
}

TEST(RootAtime, OfNullIsZero) {
    InitRootAtime(nullptr);
    UpdateRootAtime(nullptr);
    EXPECT_EQ(GetRootAtime(nullptr), 0);
    DestroyRootAtime(nullptr);
}

TEST(RootAtime, SeveralThreadsMayStampAndReadIt) {
    ZYROCloud_RootAtime atime;
    seams::SetTime(1000);
    InitRootAtime(&atime);
    std::vector<std::thread> threads;
    for (int number = 0; number < 4; ++number) {
        threads.emplace_back([&] {
            for (int i = 0; i < 1000; ++i) {
                UpdateRootAtime(&atime);
                EXPECT_EQ(GetRootAtime(&atime), 1000);
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    DestroyRootAtime(&atime);
}

}  // namespace
