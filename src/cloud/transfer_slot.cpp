#include "cloud/transfer_slot.h"

#include <sched.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>

#include "core/log.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

constexpr time_t kLongestWait = 90;

// Giving the processor to the other side and looking again costs a third of a sleep and a wake-up.
// Where it does not help, because the network is what both wait for, it is tried less and less.
constexpr int kMostYields = 64;
constexpr int kLeastYields = 4;

// A late reader gets several chunks at once, as long as they come as large as libcurl makes them: a
// source with smaller ones is slower than the target, and each of its chunks has the slot alone.
constexpr size_t kMostInSlot = 131072;
constexpr size_t kLeastAppended = CURL_MAX_WRITE_SIZE;

Patience writer;
Patience reader;

/** reallocf: what cannot grow is freed. */
bool GrowSlot(size_t size) {
    if (size <= transfer.slot_capacity) {
        return true;
    }
    char* bigger = static_cast<char*>(realloc(transfer.slot_buffer, size));
    if (bigger == nullptr) {
        free(transfer.slot_buffer);
    }
    transfer.slot_buffer = bigger;
    transfer.slot_capacity = bigger == nullptr ? 0 : size;
    return bigger != nullptr;
}

// --- download side -------------------------------------------------------------------------------

size_t FailWrite(size_t size) {
    SlotLock lock;
    transfer.slot_state = kSlotAborted;
    lock.Signal(transfer.slot_full_cond);
    return RefuseChunk(size);
}

/** The service tells the size that the upload has to announce. */
void TakeLength(void* curl) {
    if (transfer.first_write && curl != nullptr) {
        curl_off_t length = -1;
        if (curl_easy_getinfo(curl, CURLINFO_CONTENT_LENGTH_DOWNLOAD_T, &length) != CURLE_OK) {
            LOG_ERROR("Failed to get download content length");
        } else if (length != -1) {
            SlotLock lock;
            transfer.bytes_left = static_cast<unsigned long long>(length);
            transfer.bytes_total = transfer.bytes_left;  // or the progress would run past it
            transfer.answer.expected = transfer.bytes_left;
        }
    }
    transfer.first_write = false;
}

enum Room { kRoom, kNoRoom, kNotWanted };

/** Whether a chunk fits behind what waits in the slot, of which nothing has been taken yet. */
bool MayAppend(size_t size) {
    return transfer.slot_state == kSlotFull && transfer.slot_offset == 0 &&
           size >= kLeastAppended && transfer.slot_length + size <= kMostInSlot;
}

bool IsThereRoomBehind(size_t size, unsigned long long& done) {
    const SlotLock lock;
    done = transfer.bytes_total - transfer.bytes_left;
    return MayAppend(size);
}

Room WaitForRoom(size_t size, time_t deadline, unsigned long long& done) {
    if (IsThereRoomBehind(size, done)) {
        return kRoom;
    }
    writer.Await(kSlotFull);
    SlotLock lock;
    if (transfer.slot_state == kSlotAborted) {
        return kNoRoom;
    }
    if (transfer.slot_state == kDownloadDone) {
        return kNotWanted;
    }
    if (!lock.WaitWhile(kSlotFull, transfer.slot_free_cond, deadline)) {
        return kNoRoom;
    }
    done = transfer.bytes_total - transfer.bytes_left;
    // Nobody is left to take what the source has beyond its size.
    return transfer.slot_state == kUploadDone ? kNoRoom : kRoom;
}

bool Put(const char* data, size_t size, time_t deadline) {
    SlotLock lock;
    const bool append = MayAppend(size);
    // The reader may just have begun with what the chunk was to stand behind.
    if (!append && !lock.WaitWhile(kSlotFull, transfer.slot_free_cond, deadline)) {
        return false;
    }
    if (transfer.slot_state == kSlotAborted || transfer.slot_state == kUploadDone) {
        return false;
    }
    const size_t before = append ? transfer.slot_length : 0;
    if (!GrowSlot((append ? kMostInSlot : size) + 1)) {
        LOG_ERROR("Alloc Memory Fail");
        return false;
    }
    memcpy(transfer.slot_buffer + before, data, size);
    transfer.slot_length = before + size;
    transfer.slot_offset = 0;
    // The failure result is a number like any other: a chunk of this size is taken for a failed
    // one and ends the copy.
    transfer.slot_state = size == kWriteFailed ? kSlotAborted : kSlotFull;
    lock.Signal(transfer.slot_full_cond);
    return true;
}

// --- upload side ---------------------------------------------------------------------------------

size_t FailRead() {
    SlotLock lock;
    if (transfer.slot_state != kSlotAborted && transfer.slot_state != kDownloadDone) {
        transfer.slot_state = kSlotAborted;
    }
    lock.Signal(transfer.slot_free_cond);
    return CURL_READFUNC_ABORT;
}

/** What the upload takes now of the chunk; false when the slot is not as it should be. */
bool Take(XferContext& context, char* data, size_t want, size_t& taken) {
    taken = 0;
    if (transfer.bytes_left == 0) {
        return true;
    }
    if (transfer.slot_length < transfer.slot_offset) {
        LOG_ERROR("Wrong size, %zu %zu", transfer.slot_length, transfer.slot_offset);
        return false;
    }
    const size_t n = std::min(want, transfer.slot_length - transfer.slot_offset);
    if (n > transfer.bytes_left || (n == 0 && want > 0)) {
        // More than the source announced, or its end before that.
        LOG_ERROR("Wrong size, %llu %zu %zu %zu", transfer.bytes_left, n, transfer.slot_length,
                  transfer.slot_offset);
        return false;
    }
    memcpy(data, transfer.slot_buffer + transfer.slot_offset, n);
    transfer.slot_offset += n;
    transfer.bytes_left -= n;
    if (context.limited) {
        context.chunk_left -= static_cast<unsigned int>(n);
    }
    taken = n;
    return true;
}

/** Makes room for the next chunk when this one is used up. */
void Release(SlotLock& lock) {
    if (transfer.slot_offset != transfer.slot_length) {
        return;
    }
    transfer.slot_offset = 0;
    transfer.slot_length = 0;
    if (transfer.slot_state != kSlotAborted && transfer.slot_state != kDownloadDone) {
        transfer.slot_state = kSlotEmpty;
    }
    lock.Signal(transfer.slot_free_cond);
}

bool WaitForChunk(time_t deadline) {
    reader.Await(kSlotEmpty);
    SlotLock lock;
    if (transfer.slot_state == kSlotAborted) {
        return false;
    }
    if (!lock.WaitWhile(kSlotEmpty, transfer.slot_full_cond, deadline)) {
        LOG_ERROR("timeout");
        return false;
    }
    return true;
}

/** One chunk, or what `want` leaves room for; `more` tells whether the source has any behind it. */
size_t TakeChunk(XferContext& context, char* data, size_t want, time_t deadline, bool& more) {
    if (IsStopAsked()) {
        return FailRead();
    }
    if (context.limited) {
        want = std::min<size_t>(want, context.chunk_left);
    }
    if (want == 0) {
        return 0;  // the next request's bytes stay in the slot
    }
    if (!WaitForChunk(deadline) || IsStopAsked()) {
        return FailRead();
    }
    size_t n = 0;
    bool taken = false;
    unsigned long long done = 0;
    {
        SlotLock lock;
        taken = Take(context, data, want, n);
        done = transfer.bytes_total - transfer.bytes_left;
        more = transfer.bytes_left != 0;
    }
    if (!taken) {
        return FailRead();
    }
    if (transfer.progress_cb != nullptr) {
        transfer.progress_cb(n, done);
    }
    SlotLock lock;
    Release(lock);
    return n;
}

}  // namespace

SlotInUse::SlotInUse() {
    pthread_mutex_init(&transfer.transfer_mutex, nullptr);
    pthread_cond_init(&transfer.slot_free_cond, nullptr);
    pthread_cond_init(&transfer.slot_full_cond, nullptr);
    transfer.slot_state = kSlotEmpty;
}

SlotInUse::~SlotInUse() {
    pthread_mutex_destroy(&transfer.transfer_mutex);
    pthread_cond_destroy(&transfer.slot_free_cond);
    pthread_cond_destroy(&transfer.slot_full_cond);
    free(transfer.slot_buffer);
    transfer.slot_buffer = nullptr;
    transfer.slot_capacity = 0;
}

time_t SlotDeadline() {
    return time(nullptr) + kLongestWait;
}

bool SlotLock::WaitWhile(SlotState state, pthread_cond_t& changed, time_t deadline) const {
    const timespec until{deadline, 0};
    int result = 0;
    while (transfer.slot_state == state && result == 0) {
        result = pthread_cond_timedwait(&changed, &transfer.transfer_mutex, &until);
    }
    return transfer.slot_state != state;
}

bool Patience::Await(SlotState state) {
    for (int i = 0; i < limit_; ++i) {
        if (transfer.slot_state.load(std::memory_order_relaxed) != state) {
            limit_ = std::min(2 * limit_, kMostYields);
            return true;
        }
        sched_yield();
    }
    limit_ = std::max(limit_ / 2, kLeastYields);
    return false;
}

SlotLock::~SlotLock() {
    pthread_mutex_unlock(&transfer.transfer_mutex);
    if (signalled_ != nullptr) {
        pthread_cond_signal(signalled_);
    }
}

size_t CopyWriteCallback(char* data, size_t size, size_t count, void* opaque) {
    const time_t deadline = SlotDeadline();
    const size_t n = size * count;
    auto* context = static_cast<XferContext*>(opaque);
    if (context == nullptr) {
        return FailWrite(n);
    }
    context->can_retry = false;
    if (transfer.first_write && !BeginsWhereAsked(context->curl)) {
        return FailWrite(n);
    }
    TakeLength(context->curl);
    if (IsStopAsked() || data == nullptr) {
        return FailWrite(n);
    }
    unsigned long long done = 0;
    const Room room = WaitForRoom(n, deadline, done);
    if (room == kNotWanted || n == 0) {
        return 0;
    }
    if (room == kNoRoom || IsStopAsked()) {
        return FailWrite(n);
    }
    LimitReceiving(n, done, context->curl);
    if (!Put(data, n, deadline)) {
        return FailWrite(n);
    }
    transfer.answer.received += n;
    return n;
}

size_t CopyReadCallback(char* data, size_t size, size_t count, void* opaque) {
    const time_t deadline = SlotDeadline();
    auto* context = static_cast<XferContext*>(opaque);
    if (context == nullptr || data == nullptr) {
        IsStopAsked();  // a cancel is told as one
        return FailRead();
    }
    const size_t room = size * count;
    size_t total = 0;
    bool more = true;
    // Several chunks, as long as they come without a sleep: libcurl then sends them at once.
    while (more && (total == 0 || (reader.Await(kSlotEmpty) && transfer.slot_state == kSlotFull))) {
        const size_t n = TakeChunk(*context, data + total, room - total, deadline, more);
        if (n == CURL_READFUNC_ABORT) {
            return n;
        }
        total += n;
        more = more && n > 0 && total < room;
    }
    return total;
}

}  // namespace ZYROCloud
