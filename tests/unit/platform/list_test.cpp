#include <gtest/gtest.h>
#include <zosplatform/error.h>
#include <zosplatform/text.h>

#include <memory>
#include <string>

namespace {

struct FreeList {
    void operator()(PYLIBCSZLIST list) const { YLIBCSzListFree(list); }
};

class List : public testing::Test {
  protected:
    void Push(const char* text) {
        PYLIBCSZLIST list = list_.get();
        EXPECT_EQ(YLIBCSzListPush(&list, text), 0);
    }

    std::unique_ptr<_tag_YLIBCSZLIST_, FreeList> list_{YLIBCSzListAlloc(512)};
};

TEST_F(List, KeepsTextsInOrder) {
    Push("b");
    Push("");
    Push("a");
    EXPECT_EQ(YLIBCSzListCount(list_.get()), 3);
    EXPECT_STREQ(YLIBCSzListGet(list_.get(), 0), "b");
    EXPECT_STREQ(YLIBCSzListGet(list_.get(), 1), "");
    EXPECT_STREQ(YLIBCSzListGet(list_.get(), 2), "a");
}

TEST_F(List, OutsideThereIsNothing) {
    Push("a");
    EXPECT_EQ(YLIBCSzListGet(list_.get(), -1), nullptr);
    EXPECT_EQ(YLIBCSzListGet(list_.get(), 1), nullptr);
    EXPECT_EQ(YLIBCSzListGet(nullptr, 0), nullptr);
    EXPECT_EQ(YLIBCSzListCount(nullptr), 0);
}

TEST_F(List, GrowsBeyondItsHint) {
    const std::string text(1000, 'x');
    for (int i = 0; i < 10000; ++i) {
        Push(text.c_str());
    }
    EXPECT_EQ(YLIBCSzListCount(list_.get()), 10000);
    EXPECT_EQ(YLIBCSzListGet(list_.get(), 9999), text);
}

TEST_F(List, HintOfNothingIsFine) {
    for (const int hint : {0, -1}) {
        const std::unique_ptr<_tag_YLIBCSZLIST_, FreeList> list(YLIBCSzListAlloc(hint));
        EXPECT_NE(list, nullptr);
    }
}

TEST_F(List, RemoveAllEmpties) {
    Push("a");
    YLIBCSzListRemoveAll(list_.get());
    EXPECT_EQ(YLIBCSzListCount(list_.get()), 0);
    YLIBCSzListRemoveAll(nullptr);
}

TEST_F(List, CaseFindIgnoresAsciiCaseOnly) {
    Push("Amy");
    Push("bob");
    Push("\xc3\x89");
    EXPECT_EQ(YLIBCSzListCaseFind(list_.get(), "BOB"), 1);
    EXPECT_EQ(YLIBCSzListCaseFind(list_.get(), "amy"), 0);
    EXPECT_EQ(YLIBCSzListCaseFind(list_.get(), "bo"), -1);
    EXPECT_EQ(YLIBCSzListCaseFind(list_.get(), "\xc3\xa9"), -1);
    EXPECT_EQ(YLIBCSzListCaseFind(list_.get(), nullptr), -1);
    EXPECT_EQ(YLIBCSzListCaseFind(nullptr, "amy"), -1);
}

TEST_F(List, NullTextIsRefused) {
    PYLIBCSZLIST list = list_.get();
    EXPECT_EQ(YLIBCSzListPush(&list, nullptr), -1);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BAD_PARAMETER);
    EXPECT_EQ(YLIBCSzListPush(nullptr, "a"), -1);
    YLIBCSzListFree(nullptr);
}

}  // namespace
