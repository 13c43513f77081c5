#include <algorithm>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <mutex>
#include <new>

#include "bridge/handle.h"
#include "core/log.h"
#include "core/no_throw.h"

using namespace ZYROCloud;
using namespace ZYROVFS;

namespace {

using Guard = std::lock_guard<std::mutex>;

std::unique_ptr<ZYROCloud_Handle> MakeHandle(const char* server_id, const char* path,
                                             GFileInfo* info) {
    std::unique_ptr<ZYROCloud_Handle> handle(new (std::nothrow) ZYROCloud_Handle);
    if (handle == nullptr) {
        return nullptr;
    }
    if (server_id != nullptr) {
        handle->cloud = CreateCloud(server_id);
    }
    if (info != nullptr) {
        handle->info.reset(g_file_info_dup(info));
    }
    if (path != nullptr) {
        handle->path = path;
        if (ZYROCloud_FileHandle_Buf_Init(handle.get()) == 0) {
            return nullptr;
        }
    }
    return handle;
}

/** How many bytes of the buffer are still to be read, whatever a backend said of it. */
long long BytesLeft(const ZYROCloud_Handle& handle) {
    const long long filled = std::min(handle.buffer_filled, ZYROCloud_Handle::kBufferRoom);
    return handle.buffer == nullptr ? 0 : std::max(0LL, filled - handle.buffer_position);
}

}  // namespace

ZYROCloud_Handle* ZYROCloud_Cloud_Handle_New(const char* server_id, const char* path,
                                             GFileInfo* info) {
    std::unique_ptr<ZYROCloud_Handle> handle;
    NoThrow(VFS_ERR_FAILED, [&] {
        handle = MakeHandle(server_id, path, info);
        return handle != nullptr;
    });
    return handle.release();
}

void ZYROCloud_Cloud_Handle_Free(ZYROCloud_Handle* handle, ZYROCloud_Cache* cache) {
    if (handle == nullptr) {
        return;
    }
    if (!handle->path.empty()) {
        ZYROCloud_Cache_Entry_Remove(cache, handle->path.c_str(), false);
    }
    delete handle;
}

int ZYROCloud_FileHandle_Buf_Init(ZYROCloud_Handle* handle) {
    if (handle == nullptr) {
        return 0;
    }
    const Guard guard(handle->mutex);
    if (handle->buffer == nullptr) {
        handle->buffer.reset(static_cast<char*>(std::calloc(1, ZYROCloud_Handle::kBufferRoom)));
    }
    if (handle->buffer == nullptr) {
        LOG_ERROR("Failed to allocate memory");
        return 0;
    }
    handle->buffer_filled = 0;
    handle->buffer_size = ZYROCloud_Handle::kBufferBytes;
    return 1;
}

char* ZYROCloud_FileHandle_Buf_Get(ZYROCloud_Handle* handle) {
    if (handle == nullptr) {
        return nullptr;
    }
    const Guard guard(handle->mutex);
    return handle->buffer.get();
}

long long ZYROCloud_FileHandle_Buf_Fill(ZYROCloud_Handle* handle, char** dest, long long size) {
    if (handle == nullptr || dest == nullptr || *dest == nullptr || size <= 0) {
        return 0;
    }
    const Guard guard(handle->mutex);
    const long long got = std::min(size, BytesLeft(*handle));
    if (got == 0) {
        return 0;
    }
    std::memcpy(*dest, handle->buffer.get() + handle->buffer_position, static_cast<size_t>(got));
    // By the request: a read that came short was the last one.
    handle->buffer_position += std::min(size, LLONG_MAX - handle->buffer_position);
    return got;
}

void ZYROCloud_FileHandle_Buf_Reset(ZYROCloud_Handle* handle, long long filled) {
    if (handle == nullptr) {
        return;
    }
    const Guard guard(handle->mutex);
    handle->buffer_filled = filled;
    handle->buffer_position = 0;
}

long long ZYROCloud_FileHandle_Buf_GetBufSize(ZYROCloud_Handle* handle) {
    return handle == nullptr ? ZYROCloud_Handle::kBufferBytes : handle->buffer_size.load();
}

void ZYROCloud_FileHandle_Buf_SetBufSize(ZYROCloud_Handle* handle, long long size) {
    if (handle != nullptr) {
        handle->buffer_size = size;
    }
}

void ZYROCloud_FileHandle_Buf_Free(ZYROCloud_Handle* handle) {
    if (handle == nullptr) {
        return;
    }
    const Guard guard(handle->mutex);
    handle->buffer.reset();
    handle->buffer_filled = 0;
}
