#include "core/no_throw.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <string>

#include "support/seams.h"

namespace ZYROVFS {
namespace {

class NoThrowTest : public testing::Test {
  protected:
    void SetUp() override { VFSSetErrEx(VFS_ERR_NONE, nullptr, 0); }
};

TEST_F(NoThrowTest, HandsTheResultThroughAndLeavesTheCell) {
    SetErr(VFS_ERR_BUSY);
    EXPECT_TRUE(NoThrow(VFS_ERR_BAD_PARAM, [] { return true; }));
    EXPECT_FALSE(NoThrow(VFS_ERR_BAD_PARAM, [] { return false; }));
    EXPECT_EQ(GetError(), VFS_ERR_BUSY);
    EXPECT_TRUE(seams::LogLines().empty());
}

TEST_F(NoThrowTest, ValueOfTheWrongTypeGivesTheCallersCode) {
    const Json::Value array(Json::arrayValue);
    const bool result =
        NoThrow(VFS_ERR_INVALID_SERVER, [&array] { return array["member"].asBool(); });
    EXPECT_FALSE(result);
    EXPECT_EQ(GetError(), VFS_ERR_INVALID_SERVER);
    EXPECT_TRUE(seams::LoggedPart("Wrong JSON value, ")) << seams::LogDump();
}

TEST_F(NoThrowTest, TextOfAnObjectGivesTheCallersCode) {
    EXPECT_FALSE(NoThrow(VFS_ERR_BAD_PARAM,
                         [] { return Json::Value(Json::objectValue).asString().empty(); }));
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
}

TEST_F(NoThrowTest, MemoryThatRanOutHasACodeOfItsOwn) {
    EXPECT_FALSE(NoThrow(VFS_ERR_BAD_PARAM, []() -> bool { throw std::bad_alloc(); }));
    EXPECT_EQ(GetError(), VFS_ERR_OUT_OF_MEMORY);
    EXPECT_TRUE(seams::Logged("Out of memory")) << seams::LogDump();
}

TEST_F(NoThrowTest, AnyOtherExceptionIsAFailedStep) {
    EXPECT_FALSE(NoThrow(VFS_ERR_BAD_PARAM, []() -> bool { throw std::length_error("too long"); }));
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_TRUE(seams::Logged("Unexpected failure, too long")) << seams::LogDump();
}

TEST_F(NoThrowTest, CellAndLogNameThePlaceOfTheCall) {
    const int line = __LINE__ + 1;
    NoThrow(VFS_ERR_BAD_PARAM, []() -> bool { throw std::bad_alloc(); });
    EXPECT_STREQ(GetErrorFile(), "no_throw_test.cpp");
    EXPECT_EQ(GetErrorLine(), line);
    EXPECT_EQ(seams::LogLines().at(0).text,
              "no_throw_test.cpp:" + std::to_string(line) + " Out of memory");
}

}  // namespace
}  // namespace ZYROVFS
