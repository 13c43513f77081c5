#include <gtest/gtest.h>
#include <zosplatform/error.h>
#include <zosplatform/text.h>

#include <memory>
#include <string>

namespace {

struct FreeHash {
    void operator()(PYLIBCSZHASH hash) const { YLIBCSzHashFree(hash); }
};

class Hash : public testing::Test {
  protected:
    int Set(const char* key, const char* value) {
        PYLIBCSZHASH hash = hash_.get();
        return YLIBCSzHashSetValue(&hash, key, value);
    }

    std::unique_ptr<_tag_YLIBCSZHASH_, FreeHash> hash_{YLIBCSzHashAlloc(1024)};
};

TEST_F(Hash, GivesWhatWasSetLast) {
    EXPECT_EQ(Set("Name", "a"), 0);
    EXPECT_EQ(Set("Name", "b"), 0);
    EXPECT_EQ(Set("", "empty key"), 0);
    EXPECT_STREQ(YLIBCSzHashGetValue(hash_.get(), "Name"), "b");
    EXPECT_STREQ(YLIBCSzHashGetValue(hash_.get(), ""), "empty key");
}

TEST_F(Hash, KeysAreExact) {
    Set("Name", "a");
    EXPECT_EQ(YLIBCSzHashGetValue(hash_.get(), "name"), nullptr);
    EXPECT_EQ(YLIBCSzHashGetValue(hash_.get(), "Nam"), nullptr);
}

TEST_F(Hash, HoldsManyKeys) {
    for (int i = 0; i < 10000; ++i) {
        ASSERT_EQ(Set(std::to_string(i).c_str(), std::to_string(-i).c_str()), 0);
    }
    EXPECT_STREQ(YLIBCSzHashGetValue(hash_.get(), "9999"), "-9999");
}

TEST_F(Hash, NullsAreRefused) {
    EXPECT_EQ(Set(nullptr, "a"), -1);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BAD_PARAMETER);
    EXPECT_EQ(Set("a", nullptr), -1);
    EXPECT_EQ(YLIBCSzHashSetValue(nullptr, "a", "b"), -1);
    EXPECT_EQ(YLIBCSzHashGetValue(nullptr, "a"), nullptr);
    EXPECT_EQ(YLIBCSzHashGetValue(hash_.get(), nullptr), nullptr);
    YLIBCSzHashFree(nullptr);
}

}  // namespace
