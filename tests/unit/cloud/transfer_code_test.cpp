#include "unit/cloud/transfer_fixture.h"

namespace ZYROCloud {
namespace {

TEST(TransferCode, AnUploadProgramEndsWithTheStatusOfTheDriversCode) {
    const std::pair<__tag_vfs_err_, int> rows[] = {
        {VFS_ERR_UNAUTHORIZED, -16},   {VFS_ERR_RATE_LIMITED, -16},
        {VFS_ERR_FORBIDDEN, -1},       {VFS_ERR_PERMISSION_DENIED, -1},
        {VFS_ERR_QUOTA_EXCEEDED, -11}, {VFS_ERR_NO_SPACE, -11},
        {VFS_ERR_FILE_TOO_LARGE, -15}, {VFS_ERR_INVALID_NAME, -17},
        {VFS_ERR_NOT_FOUND, -4},       {VFS_ERR_NONE, -9},
        {VFS_ERR_CANCELLED, -9},       {VFS_ERR_CONFLICT, -9},
        {VFS_ERR_SERVER_ERROR, -9},
    };
    FakeDriver driver;
    EXPECT_EQ(Cloud::GetUploadErrorCode(&driver), -9);
    for (const auto& [code, status] : rows) {
        driver.SetError(code, "");
        EXPECT_EQ(Cloud::GetUploadErrorCode(&driver), status) << code;
    }
    EXPECT_EQ(Cloud::GetUploadErrorCode(nullptr), -9);
}

TEST(TransferCode, ACopyLeavesThePlatformErrorOfTheDriversCode) {
    const std::pair<__tag_vfs_err_, unsigned int> rows[] = {
        {VFS_ERR_UNAUTHORIZED, 0x300},     {VFS_ERR_PERMISSION_DENIED, 0x300},
        {VFS_ERR_TOKEN_REVOKED, 0xd100},   {VFS_ERR_NOT_SUPPORTED, 0xd100},
        {VFS_ERR_QUOTA_EXCEEDED, 0x2900},  {VFS_ERR_NO_SPACE, 0x2900},
        {VFS_ERR_CONFLICT, 0xa300},        {VFS_ERR_NOT_FOUND, 0x600},
        {VFS_ERR_REQUEST_TIMEOUT, 0x6400}, {VFS_ERR_REMOTE_FAILED, 0x6c00},
        {VFS_ERR_FILE_EXISTS, 0x800},      {VFS_ERR_FORBIDDEN, 0x8000},
        {VFS_ERR_CANCELLED, 0x8000},       {VFS_ERR_TIMEOUT, 0x8000},
    };
    for (const auto& [code, platform] : rows) {
        SetPlatformErrorFromCode(code);
        EXPECT_EQ(YLIBCErrGet(), platform) << code;
    }
}

}  // namespace
}  // namespace ZYROCloud
