#include <algorithm>
#include <iterator>

#include "cloud/transfer.h"
#include "core/error_cell.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

template <typename Result>
struct Row {
    __tag_vfs_err_ code;
    Result result;
};

constexpr int kUploadFailed = -9;
constexpr Row<int> kUploadStatus[] = {
    {VFS_ERR_UNAUTHORIZED, -16},     {VFS_ERR_RATE_LIMITED, -16},   {VFS_ERR_FORBIDDEN, -1},
    {VFS_ERR_PERMISSION_DENIED, -1}, {VFS_ERR_QUOTA_EXCEEDED, -11}, {VFS_ERR_NO_SPACE, -11},
    {VFS_ERR_FILE_TOO_LARGE, -15},   {VFS_ERR_INVALID_NAME, -17},   {VFS_ERR_NOT_FOUND, -4},
};

constexpr unsigned int kCopyFailed = 0x8000;
constexpr Row<unsigned int> kPlatformCodes[] = {
    {VFS_ERR_UNAUTHORIZED, 0x300},     {VFS_ERR_PERMISSION_DENIED, 0x300},
    {VFS_ERR_TOKEN_REVOKED, 0xd100},   {VFS_ERR_NOT_SUPPORTED, 0xd100},
    {VFS_ERR_QUOTA_EXCEEDED, 0x2900},  {VFS_ERR_NO_SPACE, 0x2900},
    {VFS_ERR_CONFLICT, 0xa300},        {VFS_ERR_NOT_FOUND, 0x600},
    {VFS_ERR_REQUEST_TIMEOUT, 0x6400}, {VFS_ERR_REMOTE_FAILED, 0x6c00},
    {VFS_ERR_FILE_EXISTS, 0x800},
};

template <typename Result, size_t N>
Result Find(const Row<Result> (&rows)[N], __tag_vfs_err_ code, Result otherwise) {
    const auto* row = std::find_if(std::begin(rows), std::end(rows),
                                   [code](const Row<Result>& r) { return r.code == code; });
    return row == std::end(rows) ? otherwise : row->result;
}

}  // namespace

int Cloud::GetUploadErrorCode(Cloud* cloud) {
    return cloud == nullptr ? kUploadFailed
                            : Find(kUploadStatus, cloud->GetErrorCode(), kUploadFailed);
}

void SetPlatformErrorFromCode(__tag_vfs_err_ code) {
    SetPlatformErr(Find(kPlatformCodes, code, kCopyFailed));
}

}  // namespace ZYROCloud
