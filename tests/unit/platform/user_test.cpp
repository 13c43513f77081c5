#include <zosplatform/error.h>
#include <zosplatform/user.h>

#include <memory>

#include "support/scratch.h"

namespace {

struct FreeUser {
    void operator()(PZYROUSER user) const { ZYROUserFree(user); }
};
using User = std::unique_ptr<ZYROUSER, FreeUser>;

User ByName(const char* name) {
    PZYROUSER user = nullptr;
    const int result = ZYROUserGet(name, &user);
    EXPECT_EQ(result, user == nullptr ? -1 : 0);
    return User(user);
}

User ByUid(uid_t uid) {
    PZYROUSER user = nullptr;
    const int result = ZYROUserGetByUID(uid, &user);
    EXPECT_EQ(result, user == nullptr ? -1 : 0);
    return User(user);
}

void AddLine(const std::string& line) {
    std::ofstream("/etc/passwd", std::ios::app) << line << '\n';
}

TEST(User, IsFoundByNameAndByUid) {
    AddLine("amy:x:4711:100:Amy:/home/amy:/bin/sh");
    for (const User& user : {ByName("amy"), ByUid(4711)}) {
        ASSERT_NE(user, nullptr);
        EXPECT_STREQ(user->name, "amy");
        EXPECT_EQ(user->uid, 4711U);
        EXPECT_EQ(user->gid, 100U);
        EXPECT_STREQ(user->home, "/home/amy");
    }
}

TEST(User, EntryMayBeLong) {
    const std::string home = "/" + std::string(20000, 'h');
    AddLine("longhome:x:4712:100::" + home + ":/bin/sh");
    const User user = ByUid(4712);
    ASSERT_NE(user, nullptr);
    EXPECT_EQ(user->home, home);
}

TEST(User, UnknownOnesAreToldApartFromFailures) {
    YLIBCErrSetEx(0, "", 0);
    EXPECT_EQ(ByName("nobody-of-this-name"), nullptr);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_NO_SUCH_USER);
    EXPECT_STREQ(YLIBCErrorGetFile(), "user.cpp");
    YLIBCErrSetEx(0, "", 0);
    EXPECT_EQ(ByUid(3999999999U), nullptr);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_NO_SUCH_USER);
    EXPECT_EQ(ByName(""), nullptr);
    EXPECT_EQ(ByName("a:b\n"), nullptr);
}

TEST(User, NullArgumentsAreRefused) {
    PZYROUSER user = nullptr;
    EXPECT_EQ(ZYROUserGet(nullptr, &user), -1);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BAD_PARAMETER);
    EXPECT_EQ(ZYROUserGet("root", nullptr), -1);
    EXPECT_EQ(ZYROUserGetByUID(0, nullptr), -1);
    ZYROUserFree(nullptr);
}

}  // namespace
