#include "support/xattrtree/xattrtree.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/xattr.h>

#include <cerrno>
#include <string>

namespace {

using ::testing::IsEmpty;
using ::testing::SizeIs;

std::string Read(const std::string& path, const char* name) {
    char buffer[128] = "";
    const ssize_t n = getxattr(path.c_str(), name, buffer, sizeof buffer);
    return n < 0 ? "errno " + std::to_string(errno) : std::string(buffer, n);
}

TEST(XattrTree, AnswersTheAttributesThatWereSet) {
    XattrTree tree("/tmp/xattrtree");
    tree.Set("/folder/file", "id::file", "files/12");
    EXPECT_EQ(Read("/tmp/xattrtree/folder/file", "id::file"), "files/12");
    tree.Set("/folder/file", "id::file", "files/13");
    EXPECT_EQ(Read("/tmp/xattrtree/folder/file", "id::file"), "files/13") << "nothing is cached";
    tree.Set("/", "standard::description", "2");
    EXPECT_EQ(Read("/tmp/xattrtree/", "standard::description"), "2");
}

TEST(XattrTree, WhatIsNotThereFailsAsOnAnyFileSystem) {
    XattrTree tree("/tmp/xattrtree");
    tree.Add("/file");
    EXPECT_EQ(Read("/tmp/xattrtree/file", "id::file"), "errno " + std::to_string(ENODATA));
    EXPECT_EQ(Read("/tmp/xattrtree/gone", "id::file"), "errno " + std::to_string(ENOENT));
    tree.Fail("id::file", EIO);
    EXPECT_EQ(Read("/tmp/xattrtree/file", "id::file"), "errno " + std::to_string(EIO));
}

TEST(XattrTree, RecordsWhatIsWritten) {
    XattrTree tree("/tmp/xattrtree");
    tree.Add("/file", 1234);
    EXPECT_THAT(tree.Writes(), IsEmpty());
    EXPECT_EQ(setxattr("/tmp/xattrtree/file", "zyro::cacheclean", "", 0, 0), 0);
    ASSERT_THAT(tree.Writes(), SizeIs(1));
    EXPECT_EQ(tree.Writes()[0].path, "/file");
    EXPECT_EQ(tree.Writes()[0].name, "zyro::cacheclean");
    EXPECT_EQ(tree.Writes()[0].value, "");
    struct stat info {};
    EXPECT_EQ(stat("/tmp/xattrtree/file", &info), 0);
    EXPECT_EQ(info.st_size, 1234);
}

}  // namespace
