#include "server/config_compare.h"

#include <gtest/gtest.h>

namespace ZYROVFS::Server {
namespace {

using Info = _tag_VFS_CONFIG_INFO_;

struct Field {
    const char* key;
    std::string Info::*field;
};

const Field kTexts[] = {
    {"protocol", &Info::protocol}, {"hostname", &Info::hostname}, {"alias", &Info::alias},
    {"account", &Info::account},   {"codepage", &Info::codepage}, {"uri", &Info::uri},
};

bool Before(const char* key, const Info& a, const Info& b) {
    return ConfigCompare(key)(a, b);
}

TEST(ConfigCompare, TextsCompareWithoutRegardToCase) {
    for (const Field& row : kTexts) {
        Info a, b;
        a.*row.field = "alpha";
        b.*row.field = "Beta";
        EXPECT_TRUE(Before(row.key, a, b)) << row.key;
        EXPECT_FALSE(Before(row.key, b, a)) << row.key;
        b.*row.field = "ALPHA";
        EXPECT_FALSE(Before(row.key, a, b) || Before(row.key, b, a)) << row.key;
    }
}

TEST(ConfigCompare, OnlyTheNamedFieldCounts) {
    for (const Field& row : kTexts) {
        for (const Field& other : kTexts) {
            Info a, b;
            a.*other.field = "a";
            b.*other.field = "b";
            EXPECT_EQ(Before(row.key, a, b), row.field == other.field)
                << row.key << " by " << other.key;
        }
    }
}

TEST(ConfigCompare, TextsBeyondAsciiCompareWithoutRegardToCase) {
    Info a, b;
    a.alias = "\xc3\x84pfel";  // Ae, upper case
    b.alias = "\xc3\xa4pfel";
    EXPECT_FALSE(Before("alias", a, b) || Before("alias", b, a));
}

TEST(ConfigCompare, PortsCompareAsUnsignedNumbers) {
    Info a, b;
    a.port = 9;
    b.port = 21;
    EXPECT_TRUE(Before("port", a, b)) << "not as texts";
    EXPECT_FALSE(Before("port", b, a));
    EXPECT_FALSE(Before("port", a, a));
    b.port = 4294967295U;
    EXPECT_TRUE(Before("port", a, b)) << "not as signed numbers";
}

TEST(ConfigCompare, AnyOtherKeyComparesProtocols) {
    Info a, b;
    a.protocol = "dav";
    b.protocol = "ftp";
    a.alias = "z";
    b.alias = "a";
    for (const char* key : {"", "id", "uri_path", "Alias", "connect_status", "\xff"}) {
        EXPECT_TRUE(Before(key, a, b)) << key;
        EXPECT_FALSE(Before(key, b, a)) << key;
    }
}

}  // namespace
}  // namespace ZYROVFS::Server
