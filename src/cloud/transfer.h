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

#include "core/source_line.h"
#include "zyrovfs/cloud.h"

namespace ZYROCloud {

/** The hand-over from the download thread to the upload thread of a copy: one chunk at a time, or
 * those that came before the upload took the first. */
enum SlotState : int {
    kSlotFull = 0,      ///< something waits in the slot
    kSlotEmpty = 1,     ///< at the start, and when the upload side has taken the chunk
    kSlotAborted = 2,   ///< every wait ends
    kUploadDone = 3,    ///< upload finished
    kDownloadDone = 4,  ///< download finished; its last chunk may still be in the slot
};

/** What the service was asked for in one pass of a download, and what came of it. */
struct Answer {
    unsigned long long from = 0;
    unsigned long long length = 0;  ///< as in "len": 0 is the whole file
    unsigned long long received = 0;
    unsigned long long expected = 0;  ///< bytes of a whole answer; 0 when that is not known
    /** A chunk of the size that means failure has failed, which libcurl cannot see, ... */
    bool refused = false;
    unsigned int refused_for = 0;  ///< ... and the platform error of that moment
};

struct TransferGlobals {
    std::atomic<int> slot_state{kSlotEmpty};
    char* slot_buffer = nullptr;
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

    pid_t own_pid = 0;         ///< asked once: a copy looks at it with each chunk
    size_t slot_capacity = 0;  ///< of slot_buffer, which only grows
    Answer answer;
    /** Position at which the local file of an upload ends, by the size that the service was told;
     * -1 when that is not known. */
    long long source_end = -1;
};

extern TransferGlobals transfer;

struct TransferCallbacks {
    ProgressCallback progress;
    CancelCallback cancel;
    SpeedCallback speed;
};

/** Begins a transfer of `size` bytes, all of what the last one left forgotten. */
void BeginTransfer(unsigned long long size, const TransferCallbacks& callbacks);

/** Sets the platform error that callers of a copy look at. */
void SetPlatformErrorFromCode(__tag_vfs_err_ code);

// --- for libcurl; `context` is an XferContext ----------------------------------------------------

/** What a write function of the engine answers to end a transfer. libcurl takes any number but the
 * chunk's size for a failure; a failed chunk of this very size goes through. */
inline constexpr size_t kWriteFailed = 23;

/** Platform error when fewer bytes could be moved than were there or announced. */
inline constexpr unsigned int kPlatformShort = 0x3b00;

/** Bytes of a local file, for an upload. */
size_t FileReadCallback(char* data, size_t size, size_t count, void* context);
/** Bytes into a local file or a buffer, for a download. */
size_t FileWriteCallback(char* data, size_t size, size_t count, void* context);
/** The two ends of the slot. */
size_t CopyWriteCallback(char* data, size_t size, size_t count, void* context);
size_t CopyReadCallback(char* data, size_t size, size_t count, void* context);

// --- parts of these, shared ----------------------------------------------------------------------

/** Whether the user wants to stop; leaves the platform error of a cancel. */
bool IsStopAsked();
/** read(2) for a read function. A failure gives -1, the platform error and, for an unusual cause, a
 * log line in the name of `at`. */
ssize_t ReadSource(int fd, char* data, size_t size,
                   ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());
/** What a write function returns for a chunk of `size` bytes that it does not take. */
size_t RefuseChunk(size_t size);
/** Asks the speed callback, if there is one, how much to take at once behind this chunk. */
void LimitReceiving(size_t chunk, unsigned long long done, void* curl);
/** False, logged, when an answer is another part of the file than was asked for. For its first
 * bytes, with the state of `transfer.answer`. */
bool BeginsWhereAsked(void* curl);

}  // namespace ZYROCloud

#endif
