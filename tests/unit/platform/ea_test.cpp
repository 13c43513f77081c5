#include "zosplatform/ea.h"

#include <gtest/gtest.h>

TEST(HiddenFile, FoldersAndStreamsOfTheBox) {
    EXPECT_EQ(1, ZYROEAIsHiddenFile("@ZyroEA"));
    EXPECT_EQ(1, ZYROEAIsHiddenFile("photo.jpg@ZyroResource"));
    EXPECT_EQ(1, ZYROEAIsHiddenFile("photo.jpg@ZyroEAStream"));
    EXPECT_EQ(1, ZYROEAIsHiddenFile("@ZyroEAStream"));
}

TEST(HiddenFile, NamesOfUsersAreShown) {
    for (const char* name : {"", "photo.jpg", "@zyroea", "@ZyroEA2", "my@ZyroEA", "ZyroEA", "@",
                             "a@b", "photo@ZyroResource.jpg", "photo@zyroeastream", ".hidden"}) {
        EXPECT_EQ(0, ZYROEAIsHiddenFile(name)) << name;
    }
}

TEST(HiddenFile, NullIsNoName) {
    EXPECT_EQ(0, ZYROEAIsHiddenFile(nullptr));
}
