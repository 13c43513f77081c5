#include <gtest/gtest.h>

#include <set>
#include <string>

#include "zyrovfs/error.h"

namespace ZYROVFS {
namespace {

__tag_vfs_err_ Code(int number) {
    return static_cast<__tag_vfs_err_>(number);
}

TEST(ErrorName, NumbersThatTravelAreFixed) {
    const struct {
        int number;
        const char* name;
    } rows[] = {
        {0, "VFS_ERR_NONE"},
        {1, "VFS_ERR_UNKNOWN"},
        {2, "VFS_ERR_BAD_PARAM"},
        {3, "VFS_ERR_FAILED"},
        {10, "VFS_ERR_RESERVED_10"},
        {11, "VFS_ERR_DBUS_ADDRESS"},
        {12, "VFS_ERR_RESERVED_12"},
        {18, "VFS_ERR_OUT_OF_MEMORY"},
        {24, "VFS_ERR_CERT_UNTRUSTED"},
        {25, "VFS_ERR_UNAUTHORIZED"},
        {32, "VFS_ERR_RESERVED_32"},
        {33, "VFS_ERR_CANCELLED"},
        {41, "VFS_ERR_RESERVED_41"},
        {42, "VFS_ERR_PROFILE_UPDATE"},
        {47, "VFS_ERR_CONFLICT"},
        {49, "VFS_ERR_NOT_FOUND"},
        {56, "VFS_ERR_COMMAND_REFUSED"},
        {57, "VFS_ERR_MOUNT_PENDING"},
    };
    for (const auto& row : rows) {
        EXPECT_STREQ(GetErrorName(Code(row.number)), row.name);
    }
}

TEST(ErrorName, EachCodeHasItsOwn) {
    std::set<std::string> names;
    for (int number = 0; number <= 57; ++number) {
        names.insert(GetErrorName(Code(number)));
    }
    EXPECT_EQ(names.size(), 58U);
}

TEST(ErrorName, NumberThatIsNoCodeIsUnknown) {
    for (const int number : {58, 255, -1, INT32_MAX, INT32_MIN}) {
        EXPECT_STREQ(GetErrorName(Code(number)), "VFS_ERR_UNKNOWN") << number;
        EXPECT_STREQ(GetErrorMeaning(Code(number)), GetErrorMeaning(VFS_ERR_UNKNOWN)) << number;
    }
}

TEST(ErrorMeaning, IsASentenceForEachCode) {
    for (int number = 0; number <= 57; ++number) {
        const std::string meaning = GetErrorMeaning(Code(number));
        ASSERT_GT(meaning.size(), 5U) << number;
        EXPECT_EQ(meaning.back(), '.') << meaning;
        EXPECT_TRUE(isupper(meaning.front())) << meaning;
    }
}

}  // namespace
}  // namespace ZYROVFS
