#include <gio/gio.h>
#include <gtest/gtest.h>

#include <map>

#include "support/bare_driver.h"

namespace ZYROCloud {

using namespace ZYROVFS;  // NOLINT(google-build-using-namespace)

// Grouped by what a file manager shows, so that it is no copy of the table under test.
const std::map<int, std::vector<int>> kCodesByAnswer = {
    {G_IO_ERROR_CONNECTION_REFUSED, {25}},
    {G_IO_ERROR_NOT_SUPPORTED, {27, 54, 56}},
    {G_IO_ERROR_PERMISSION_DENIED, {28, 48}},
    {G_IO_ERROR_HOST_UNREACHABLE, {29, 44}},
    {G_IO_ERROR_TIMED_OUT, {30}},
    {G_IO_ERROR_CANCELLED, {31, 33}},
    {G_IO_ERROR_NO_SPACE, {34, 51}},
    {G_IO_ERROR_INVALID_DATA, {35}},
    {G_IO_ERROR_IS_DIRECTORY, {36}},
    {G_IO_ERROR_FILENAME_TOO_LONG, {37}},
    {G_IO_ERROR_INVALID_FILENAME, {38}},
    {G_IO_ERROR_BUSY, {40, 50}},
    {G_IO_ERROR_NOT_DIRECTORY, {41}},
    {G_IO_ERROR_TOO_MANY_LINKS, {45}},
    {G_IO_ERROR_EXISTS, {47, 55}},
    {G_IO_ERROR_NOT_FOUND, {49}},
    {G_IO_ERROR_FAILED, {26, 32, 39, 42, 43, 46, 52, 53}},
};

int AnswerTo(int code) {
    bare::PlainDriver cloud;
    Json::Value record;
    record["code"] = code;
    cloud.SetError(record);
    return cloud.GetGIOError();
}

TEST(GioError, EveryCodeOfTheCloudsHasItsRow) {
    size_t told = 0;
    for (const auto& [gio, codes] : kCodesByAnswer) {
        for (const int code : codes) {
            EXPECT_EQ(gio, AnswerTo(code)) << code;
            ++told;
        }
    }
    EXPECT_EQ(32U, told);
}

TEST(GioError, CodesOutsideOfTheCloudsAreAPlainFailure) {
    for (const int code : {-2147483647, -1, 0, 1, 6, 24, 57, 58, 1000, 2147483647}) {
        EXPECT_EQ(G_IO_ERROR_FAILED, AnswerTo(code)) << code;
    }
}

TEST(GioError, OfANewDriverIsAPlainFailure) {
    EXPECT_EQ(G_IO_ERROR_FAILED, bare::PlainDriver().GetGIOError());
}

}  // namespace ZYROCloud
