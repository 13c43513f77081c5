#include <unistd.h>

#include "cloud/guard.h"
#include "cloud/transfer.h"
#include "cloud/transfer_slot.h"
#include "core/error_cell.h"
#include "core/json.h"
#include "core/log.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

/** What one of the two threads works on. Only that thread touches it until it has ended. */
struct Side {
    Cloud* cloud;
    XferContext context;
    XferData xfer;
    Json::Value meta;
    pthread_t thread;
    bool done = false;  ///< what the driver answered; its code may be one of nothing or of before
};

/** The slot's bytes that the upload has not taken. */
size_t LeftInSlot() {
    return transfer.slot_length - transfer.slot_offset;
}

bool RefuseLeftover(Cloud& target, size_t left) {
    LOG_ERROR("The source has more than its size, %zu bytes were left over", left);
    target.SetError(VFS_ERR_TRANSFER_ABORTED, "");
    return false;
}

/** Upload: the content length must be known, so it starts when the first data is there. */
bool WaitForData(Side& side) {
    const time_t deadline = SlotDeadline();
    SlotLock lock;
    if (!lock.WaitWhile(kSlotEmpty, transfer.slot_full_cond, deadline)) {
        LOG_ERROR("timeout");
        side.cloud->SetError(VFS_ERR_TIMEOUT, "");
        return false;
    }
    if (transfer.slot_state == kSlotAborted) {
        // An upload without data would replace what stands at the target by an empty file.
        side.cloud->SetError(VFS_ERR_TRANSFER_ABORTED, "");
        return false;
    }
    // Announced too short, the file would be cut there. It is known before anything is replaced.
    if (LeftInSlot() > transfer.bytes_left) {
        return RefuseLeftover(*side.cloud, LeftInSlot() - transfer.bytes_left);
    }
    // The source knows its size better than the caller.
    side.meta["total_bytes"] = static_cast<Json::UInt64>(transfer.bytes_left);
    return true;
}

bool UploadAll(Side& side) {
    if (!WaitForData(side) || !side.cloud->Upload(&side.xfer, side.meta)) {
        return false;
    }
    SlotLock lock;
    if (transfer.bytes_left != 0) {
        LOG_ERROR("Upload left out %llu bytes", transfer.bytes_left);
        side.cloud->SetError(VFS_ERR_TRANSFER_ABORTED, "");
        return false;
    }
    return true;
}

/** Behind what went through: a failure that the driver overcame by itself, such as a name in the
 * way or a token that had ended, is no failure of the copy. The platform's error is the process's:
 * the other side may just have stored a cancel there. */
void Succeed(Side& side) {
    side.cloud->SetError(VFS_ERR_NONE, "");
}

void* UploadThread(void* argument) {
    Side& side = *static_cast<Side*>(argument);
    side.done = Guard(*side.cloud, [&side] { return UploadAll(side); });
    SlotLock lock;
    if (side.done) {
        Succeed(side);
    }
    transfer.slot_state = side.done ? kUploadDone : kSlotAborted;
    lock.Signal(transfer.slot_free_cond);
    return nullptr;
}

void* DownloadThread(void* argument) {
    Side& side = *static_cast<Side*>(argument);
    side.done = Guard(*side.cloud, [&side] { return side.cloud->Download(&side.xfer, side.meta); });
    SlotLock lock;
    if (side.done) {
        Succeed(side);
    }
    if (!side.done) {
        transfer.slot_state = kSlotAborted;
    } else if (transfer.slot_state != kSlotAborted) {  // what has failed stays so
        transfer.slot_state = kDownloadDone;
    }
    lock.Signal(transfer.slot_full_cond);
    return nullptr;
}

bool Start(Side& side, void* (*body)(void*)) {
    const int error = pthread_create(&side.thread, nullptr, body, &side);
    if (error != 0) {
        LOG_ERROR("Couldn't run thread, errno %d\n", error);
    }
    return error == 0;
}

/** Ends what waits in the slot. */
void AbortSlot() {
    SlotLock lock;
    transfer.slot_state = kSlotAborted;
    lock.Signal(transfer.slot_full_cond);
}

bool RunBoth(Side& source, Side& target) {
    if (!Start(target, UploadThread)) {
        return false;
    }
    const bool started = Start(source, DownloadThread);
    if (started) {
        pthread_join(source.thread, nullptr);
    } else {
        // The upload has nothing to wait for; its objects are the caller's, so that it must not
        // outlive this call.
        AbortSlot();
    }
    pthread_join(target.thread, nullptr);
    return started;
}

/** What came in went out. With both sides at their end: until then more may come. */
bool IsAllTaken(const Side& source, Side& target) {
    if (source.done && target.done && LeftInSlot() != 0) {
        target.done = RefuseLeftover(*target.cloud, LeftInSlot());
    }
    return source.done && target.done;
}

/** False, reported, when the side has failed. */
bool Report(Side& side, const char* text, SourceLine at = SourceLine::Here()) {
    if (side.done) {
        return true;
    }
    SetPlatformErrorFromCode(side.cloud->GetErrorCode());
    LOG_ERROR_AT(at, text, json::toString(side.cloud->GetError()).c_str(), YLIBCErrGet());
    return false;
}

bool CopyBoth(Cloud& src, Cloud& dst, const std::string& src_uri, const std::string& dst_uri,
              long long size) {
    Side source{&src, {}, {CopyWriteCallback, 0, nullptr}, Json::objectValue, {}};
    Side target{&dst, {}, {CopyReadCallback, 1, nullptr}, Json::objectValue, {}};
    source.xfer.context = &source.context;
    target.xfer.context = &target.context;
    dst.GetMetaDataByURI(dst_uri, target.meta, "Upload");
    target.meta["total_bytes"] = static_cast<Json::Int64>(size);
    target.meta["filesize"] = static_cast<Json::Int64>(size);
    src.GetMetaDataByURI(src_uri, source.meta, "Download");
    const SlotInUse slot;
    if (!RunBoth(source, target)) {
        return Conclude(dst, false, Json::Value());
    }
    if (IsAllTaken(source, target)) {
        SetPlatformErr(0);
        return true;
    }
    return Report(source, "Download Failed, err:%s, zyroerr=%x") &&
           Report(target, "Upload Failed, err:%s, zyroerr=%x");
}

}  // namespace

bool Cloud::CopyFile(Cloud* src, Cloud* dst, const std::string& src_uri, const std::string& dst_uri,
                     long long size, ProgressCallback progress, CancelCallback cancel,
                     SpeedCallback speed) {
    if (src == nullptr || dst == nullptr || src == dst) {
        LOG_ERROR("A copy needs two drivers");
        return dst != nullptr && Conclude(*dst, false, Json::Value());
    }
    BeginTransfer(static_cast<unsigned long long>(size), {progress, cancel, speed});
    transfer.watched_pid = getpid();
    return Barrier(*dst, [&] { return CopyBoth(*src, *dst, src_uri, dst_uri, size); });
}

}  // namespace ZYROCloud
