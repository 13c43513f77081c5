#include "bridge/gvfs_flow_read.h"

#include <json/value.h>

#include <algorithm>
#include <mutex>

#include "bridge/handle.h"
#include "core/json_member.h"
#include "core/log.h"
#include "core/loggable_url.h"

namespace ZYROCloud::gvfs {

using namespace ZYROVFS;
using namespace ZYROVFS::json;

namespace {

constexpr int kRangeNotSatisfiable = 416;

/** Whether a failed download asked for what lies behind the end. */
bool IsBehindEnd(const Cloud& cloud) {
    const Json::Value record = cloud.GetError();
    const Json::Value& status = MemberOf(record, "response_code");
    return status.isInt() && status.asInt() == kRangeNotSatisfiable;
}

/** What to ask for: a backend may have set a size for which its handle's buffer has no room. */
long long SizeFor(const ReadCall& call) {
    ZYROCloud_Handle& handle = *call.handle;
    const std::lock_guard<std::mutex> lock(handle.mutex);
    return *call.dest == handle.buffer.get() ? std::min(call.size, ZYROCloud_Handle::kBufferBytes)
                                             : call.size;
}

bool Fetch(const ReadCall& call, long long& got) {
    // What moves contents has its state in the process and not in the driver.
    static std::mutex transfers;
    const std::lock_guard<std::mutex> lock(transfers);
    ZYROCloud_Handle& handle = *call.handle;
    // A driver is used for one operation elsewhere. Here the failure of an earlier read would be
    // taken for that of this one: its status for the end of the file, its cancel for this one's.
    handle.cloud->SetError(Json::Value(Json::objectValue));
    return Cloud::DownloadFileToBuffer(handle.cloud.get(), handle.url, *call.dest, handle.position,
                                       SizeFor(call), &got, nullptr, nullptr, nullptr);
}

long long Read(const ReadCall& call, SourceLine at) {
    ZYROCloud_Handle& handle = *call.handle;
    // To ask for nothing would be to ask for the whole file.
    if (handle.position >= g_file_info_get_size(handle.info.get()) || call.size == 0) {
        return 0;
    }
    long long got = 0;
    if (Fetch(call, got)) {
        handle.position += got;
        return got;
    }
    if (IsBehindEnd(*handle.cloud)) {
        return 0;
    }
    StoreError(*handle.cloud, call.err);
    LOG_ERROR_AT(at, "Failed to download [%s] to buffer from:%llu, len:%llu",
                 LoggableUrl(handle.url).c_str(), static_cast<unsigned long long>(handle.position),
                 static_cast<unsigned long long>(call.size));
    return -1;
}

bool IsGiven(const ReadCall& call, SourceLine at) {
    if (call.handle != nullptr && call.handle->info != nullptr && call.p2 != nullptr &&
        call.p3 != nullptr && call.dest != nullptr && *call.dest != nullptr && call.size >= 0) {
        return true;
    }
    LOG_ERROR_AT(at, "Wrong parameters");
    return false;
}

/** A driver of another service would send its token to this one's address. */
bool HasDriver(const ZYROCloud_Handle& handle, _tag_cloud_type type, SourceLine at) {
    if (handle.cloud != nullptr && handle.cloud->GetCloudType() == type) {
        return true;
    }
    LOG_ERROR_AT(at, "Failed to create cloud");
    return false;
}

bool HasUrl(ZYROCloud_Handle& handle, const UrlOf& url_of) {
    return !handle.url.empty() || url_of(handle, handle.url);
}

}  // namespace

long long ReadInto(const ReadCall& call, _tag_cloud_type type, const UrlOf& url_of, SourceLine at) {
    long long result = -1;
    NoThrow(
        VFS_ERR_FAILED,
        [&] {
            if (IsGiven(call, at) && HasDriver(*call.handle, type, at) &&
                HasUrl(*call.handle, url_of)) {
                result = Read(call, at);
            }
            return result >= 0;
        },
        at);
    return result;
}

}  // namespace ZYROCloud::gvfs
