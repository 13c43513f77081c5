/**
 * What moves file contents: the state of the one transfer that a process does at a time, and the
 * functions that libcurl calls for its bytes. Cloud's entry points set the state, drivers hand the
 * functions to their handler (Cloud::InitXferData), the relay shares both.
 */
#ifndef ZYROVFS_CLOUD_TRANSFER_H
#define ZYROVFS_CLOUD_TRANSFER_H

#include <curl/curl.h>
#include <pthread.h>
#include <sys/types.h>

#include <atomic>
#include <cstddef>

#include "zyrovfs/cloud.h"

namespace ZYROCloud {

/** The hand-over from the download thread to the upload thread of a copy: one chunk at a time. */
enum SlotState : int {
    kSlotFull = 0,      ///< a chunk waits in the slot
    kSlotEmpty = 1,     ///< at the start, and when the upload side has taken the chunk
    kSlotAborted = 2,   ///< every wait ends
    kUploadDone = 3,    ///< upload finished
    kDownloadDone = 4,  ///< download finished; its last chunk may still be in the slot
};

struct TransferGlobals {
    std::atomic<int> slot_state{kSlotEmpty};
    char* slot_buffer = nullptr;
    size_t slot_capacity = 0;
    size_t slot_length = 0;
    size_t slot_offset = 0;
    unsigned long long bytes_left = 0;
    unsigned long long bytes_total = 0;
    bool first_write = true;
    CancelCallback cancel_cb = nullptr;
    ProgressCallback progress_cb = nullptr;
    SpeedCallback speed_cb = nullptr;
    pid_t watched_pid = 0;  ///< its death stops the transfer; 0 for none
    pthread_mutex_t transfer_mutex = PTHREAD_MUTEX_INITIALIZER;
    pthread_cond_t slot_free_cond = PTHREAD_COND_INITIALIZER;
    pthread_cond_t slot_full_cond = PTHREAD_COND_INITIALIZER;

    /** Where the local file of an upload ends, by the size that the service was told; -1 unknown. */
    long long source_end = -1;
    /** What the service was asked for, in this pass of a download; a length of 0 is all. */
    unsigned long long asked_from = 0;
    unsigned long long asked_length = 0;
    /** Bytes of the answer that were taken, and how many there must be for a whole one (0 when that
     * is not known). */
    unsigned long long received = 0;
    unsigned long long expected = 0;
};

extern TransferGlobals transfer;

/** Begins a transfer of `size` bytes: forgets the last one's state. The relay sets what is its own
 * behind that. */
void BeginTransfer(unsigned long long size, ProgressCallback progress, CancelCallback cancel,
                   SpeedCallback speed);

/** Runs `body`, which answers bool: a false or an exception is false, and an exception leaves
 * VFS_ERR_CLOUD_FAILED in the driver's record. */
bool DriverStep(Cloud& cloud, bool (*body)(void*), void* argument) noexcept;

// --- for libcurl ---------------------------------------------------------------------------------

/** What a write function of this engine answers to end a transfer. libcurl takes any number but the
 * chunk's size for a failure, so that a chunk of this very size goes through. */
inline constexpr size_t kWriteFailed = 23;

/** Bytes of a local file, for an upload. */
size_t FileReadCallback(char* data, size_t size, size_t count, void* context);
/** Bytes into a local file or a buffer, for a download. */
size_t FileWriteCallback(char* data, size_t size, size_t count, void* context);
/** The two ends of the slot. */
size_t CopyWriteCallback(char* data, size_t size, size_t count, void* context);
size_t CopyReadCallback(char* data, size_t size, size_t count, void* context);

/** True, with the platform error of a cancel, when the user wants to stop. */
bool IsCancelled();
/** read() for a read function; a failure, logged, leaves the platform error and gives -1. */
ssize_t ReadSource(int fd, char* data, size_t size);
/** Asks the speed callback, if any, how much to take next, and gives that to the handle. */
void LimitReceiving(size_t chunk, unsigned long long done, CURL* curl);
/** False, with a log line, when the first bytes of an answer are not those that were asked for: the
 * whole file in place of a part of it, or another part. */
bool BeginsWhereAsked(CURL* curl);

/** Sets the platform error that callers of a copy look at. */
void SetPlatformErrorFromCode(__tag_vfs_err_ code);

}  // namespace ZYROCloud

#endif
