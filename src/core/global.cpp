#include "zyrovfs/global.h"

#include <unistd.h>

#include <atomic>
#include <cstdlib>
#include <utility>

#include "core/bus_address.h"
#include "core/paths.h"
#include "zyrovfs/error.h"

namespace ZYROVFS {
namespace {

/** One for the process; both threads of a copy may renew a token, which sets it. */
struct {
    std::atomic<__tag_vfs_err_> code{VFS_ERR_NONE};
    std::atomic<const char*> file{nullptr};
    std::atomic<int> line{0};
} cell;

Json::Value& Detail() {
    static Json::Value detail;
    return detail;
}

}  // namespace

void VFSSetErrEx(__tag_vfs_err_ code, const char* file, int line) {
    cell.code = code;
    cell.file = file;
    cell.line = line;
}

void ResetError() {
    VFSSetErrEx(VFS_ERR_NONE, nullptr, 0);
}

__tag_vfs_err_ GetError() {
    return cell.code;
}

const char* GetErrorFile() {
    return cell.file;
}

int GetErrorLine() {
    return cell.line;
}

void VFSSetJson(Json::Value detail) {
    Detail() = std::move(detail);
}

void VFSGetJson(Json::Value& detail) {
    detail = Detail();
}

uid_t GetActorUID() {
    const uid_t effective = geteuid();
    if (effective != 0) {
        return effective;
    }
    const char* text = getenv("ZYROVFS_UID");
    return text == nullptr ? effective : static_cast<uid_t>(strtoul(text, nullptr, 10));
}

bool InitEnv(const char* uid, const char* busAddress) {
    if (uid == nullptr || busAddress == nullptr) {
        return false;
    }
    setenv("ZYROVFS_UID", uid, 1);
    setenv("XDG_RUNTIME_DIR", paths::RuntimeDir(GetActorUID()).c_str(), 1);
    SetBusAddress(GetActorUID(), busAddress);
    return true;
}

}  // namespace ZYROVFS
