#include "cloud/transfer_slot.h"

#include <curl/curl.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <thread>

#include "support/scratch.h"
#include "unit/cloud/transfer_fixture.h"

namespace ZYROCloud {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr size_t kAbort = CURL_READFUNC_ABORT;

/** What stands for pthread_cond_timedwait: no test waits. */
struct {
    std::vector<time_t> deadlines;
    /** Called in place of each wait, with the mutex held; its answer is the wait's. */
    std::function<int()> wait;
} waits;

class Slot : public testing::Test {
  protected:
    void SetUp() override {
        YLIBCErrSetEx(0, "test", 1);
        waits.deadlines.clear();
        waits.wait = [] { return ETIMEDOUT; };
        BeginTransfer(1000, {nullptr, nullptr, nullptr});
        seams::SetTime(1000);
    }
    size_t Write(const std::string& bytes) {
        std::string copy = bytes;
        return CopyWriteCallback(copy.data(), 1, copy.size(), &context_);
    }
    size_t Read(size_t want) { return CopyReadCallback(room_, 1, want, &context_); }
    std::string Taken(size_t n) const { return std::string(room_, n); }
    static int State() { return transfer.slot_state; }

    SlotInUse slot_;
    XferContext context_;
    char room_[300000] = {};
};

TEST_F(Slot, AChunkGoesThroughInPiecesOfTheReader) {
    EXPECT_EQ(Write("abcdefghij"), 10U);
    EXPECT_EQ(State(), kSlotFull);
    EXPECT_FALSE(context_.can_retry);
    EXPECT_EQ(Read(4), 4U);
    EXPECT_EQ(Taken(4), "abcd");
    EXPECT_EQ(State(), kSlotFull);
    EXPECT_EQ(transfer.bytes_left, 996U);
    EXPECT_EQ(Read(100), 6U);
    EXPECT_EQ(Taken(6), "efghij");
    EXPECT_EQ(State(), kSlotEmpty);
    EXPECT_EQ(transfer.bytes_left, 990U);
    EXPECT_THAT(waits.deadlines, IsEmpty());
}

TEST_F(Slot, AReaderWhoWantsExactlyTheChunkEmptiesTheSlot) {
    EXPECT_EQ(Write("abcd"), 4U);
    EXPECT_EQ(Read(4), 4U);
    EXPECT_EQ(State(), kSlotEmpty);
}

TEST_F(Slot, AChunkOfExactlyTwentyThreeBytesEndsTheCopy) {
    EXPECT_EQ(Write(std::string(23, 'x')), 23U);
    EXPECT_EQ(State(), kSlotAborted);
    EXPECT_EQ(Read(100), kAbort);
    EXPECT_EQ(Write("abc"), 23U);
    EXPECT_EQ(State(), kSlotAborted);
}

TEST_F(Slot, AWriterWaitsForTheSlotUntilNinetySecondsAfterItsEntry) {
    EXPECT_EQ(Write("abc"), 3U);
    // Awake twice for nothing, while the clock goes on: the deadline stays.
    int wakes = 0;
    waits.wait = [&] {
        seams::SetTime(1000 + 40 * ++wakes);
        return wakes < 3 ? 0 : ETIMEDOUT;
    };
    EXPECT_EQ(Write("def"), 23U);
    EXPECT_THAT(waits.deadlines, ElementsAre(1090, 1090, 1090));
    EXPECT_EQ(State(), kSlotAborted);
    EXPECT_EQ(YLIBCErrGet(), 0U);
}

TEST_F(Slot, AReaderWaitsForAChunkUntilNinetySecondsAfterItsEntry) {
    int wakes = 0;
    waits.wait = [&] {
        seams::SetTime(1000 + 40 * ++wakes);
        return wakes < 3 ? 0 : ETIMEDOUT;
    };
    EXPECT_EQ(Read(10), kAbort);
    EXPECT_THAT(waits.deadlines, ElementsAre(1090, 1090, 1090));
    EXPECT_TRUE(seams::Logged("timeout")) << seams::LogDump();
    EXPECT_EQ(State(), kSlotAborted);
}

TEST_F(Slot, AChunkThatArrivesInTheLastMomentIsTaken) {
    waits.wait = [] {
        // The other side, while this one waits without the mutex.
        transfer.slot_buffer = static_cast<char*>(realloc(transfer.slot_buffer, 8));
        transfer.slot_capacity = 8;
        memcpy(transfer.slot_buffer, "abc", 3);
        transfer.slot_length = 3;
        transfer.slot_state = kSlotFull;
        return ETIMEDOUT;
    };
    EXPECT_EQ(Read(10), 3U);
    EXPECT_EQ(Taken(3), "abc");
}

TEST_F(Slot, AWaitingWriterGoesOnWhenTheReaderHasTakenTheChunk) {
    EXPECT_EQ(Write("abc"), 3U);
    waits.wait = [] {
        transfer.slot_state = kSlotEmpty;
        return 0;
    };
    EXPECT_EQ(Write("def"), 3U);
    EXPECT_EQ(Read(10), 3U);
    EXPECT_EQ(Taken(3), "def");
}

TEST_F(Slot, AnAbortEndsEveryWait) {
    waits.wait = [] {
        transfer.slot_state = kSlotAborted;
        return 0;
    };
    EXPECT_EQ(Read(10), kAbort);
    transfer.slot_state = kSlotFull;
    EXPECT_EQ(Write("abc"), 23U);
    EXPECT_EQ(State(), kSlotAborted);
    EXPECT_EQ(waits.deadlines.size(), 2U);
    EXPECT_FALSE(seams::Logged("timeout"));
    EXPECT_EQ(Read(10), kAbort);
    EXPECT_EQ(Write("abc"), 23U);
    EXPECT_EQ(waits.deadlines.size(), 2U);
}

TEST_F(Slot, TheLastChunkIsTakenAfterTheDownloadHasFinished) {
    transfer.bytes_left = 3;
    EXPECT_EQ(Write("abc"), 3U);
    transfer.slot_state = kDownloadDone;
    EXPECT_EQ(Read(2), 2U);
    EXPECT_EQ(Read(2), 1U);
    EXPECT_EQ(State(), kDownloadDone);
    EXPECT_EQ(Read(2), 0U);
    EXPECT_EQ(State(), kDownloadDone);
    EXPECT_EQ(Write("abc"), 0U);  // nothing comes behind the end
}

TEST_F(Slot, ASourceThatEndsEarlyAbortsInsteadOfGivingItsLastChunkAgain) {
    EXPECT_EQ(Write("abc"), 3U);
    transfer.slot_state = kDownloadDone;
    EXPECT_EQ(Read(10), 3U);
    EXPECT_EQ(Read(10), kAbort);
    EXPECT_TRUE(seams::Logged("Wrong size, 997 0 0 0")) << seams::LogDump();
    EXPECT_EQ(transfer.bytes_left, 997U);
}

TEST_F(Slot, AChunkBeyondTheSizeIsWrong) {
    transfer.bytes_left = 2;
    EXPECT_EQ(Write("abc"), 3U);
    EXPECT_EQ(Read(10), kAbort);
    EXPECT_TRUE(seams::Logged("Wrong size, 2 3 3 0")) << seams::LogDump();
    EXPECT_EQ(State(), kSlotAborted);
}

TEST_F(Slot, AnOffsetBehindTheLengthIsWrong) {
    EXPECT_EQ(Write("abc"), 3U);
    transfer.slot_offset = 4;
    EXPECT_EQ(Read(10), kAbort);
    EXPECT_TRUE(seams::Logged("Wrong size, 3 4")) << seams::LogDump();
}

TEST_F(Slot, WithNothingLeftAReadGivesNothingAndTheSlotIsFree) {
    transfer.bytes_left = 0;
    transfer.slot_state = kDownloadDone;
    EXPECT_EQ(Read(10), 0U);
    transfer.slot_state = kSlotFull;
    EXPECT_EQ(Read(10), 0U);
    EXPECT_EQ(State(), kSlotEmpty);
}

TEST_F(Slot, ALimitedReaderLeavesTheNextRequestsBytesInTheSlot) {
    context_.limited = true;
    context_.chunk_left = 4;
    EXPECT_EQ(Write("abcdef"), 6U);
    EXPECT_EQ(Read(100), 4U);
    EXPECT_EQ(Read(100), 0U);
    context_.chunk_left = 2;
    EXPECT_EQ(Read(100), 2U);
    EXPECT_EQ(Taken(2), "ef");
    EXPECT_EQ(Write("ghij"), 4U);
    EXPECT_EQ(Read(100), 0U);  // at a border of chunks, with a fresh chunk in the slot
    EXPECT_EQ(State(), kSlotFull);
    context_.chunk_left = 4;
    EXPECT_EQ(Read(100), 4U);
    EXPECT_EQ(Taken(4), "ghij");
}

// What libcurl hands over at a time, when the source is fast.
constexpr size_t kWhole = CURL_MAX_WRITE_SIZE;

TEST_F(Slot, WholeChunksGatherWhileNothingHasBeenTaken) {
    const std::string bytes = Pattern(8 * kWhole);
    transfer.bytes_left = transfer.bytes_total = 10 * kWhole;
    for (size_t at = 0; at < bytes.size(); at += kWhole) {
        EXPECT_EQ(Write(bytes.substr(at, kWhole)), kWhole) << at;
        EXPECT_EQ(State(), kSlotFull);
    }
    EXPECT_THAT(waits.deadlines, IsEmpty());
    EXPECT_EQ(Write(std::string(kWhole, 'x')), 23U) << "128 KiB, and no more";
    EXPECT_THAT(waits.deadlines, ElementsAre(1090));
    transfer.slot_state = kSlotFull;
    EXPECT_EQ(Read(sizeof room_), bytes.size());
    EXPECT_TRUE(Taken(bytes.size()) == bytes);
    EXPECT_EQ(State(), kSlotEmpty);
    EXPECT_EQ(transfer.bytes_left, 2 * kWhole);
}

TEST_F(Slot, BehindWhatHasBeenBegunNothingIsAppended) {
    transfer.bytes_left = transfer.bytes_total = 10 * kWhole;
    EXPECT_EQ(Write(std::string(kWhole, 'a')), kWhole);
    EXPECT_EQ(Read(1), 1U);
    waits.wait = [&] {
        waits.wait = [] { return ETIMEDOUT; };
        EXPECT_EQ(transfer.slot_length, kWhole) << "the writer waits";
        transfer.slot_state = kSlotEmpty;
        return 0;
    };
    EXPECT_EQ(Write(std::string(kWhole, 'b')), kWhole);
    EXPECT_EQ(waits.deadlines.size(), 1U);
    EXPECT_EQ(Read(kWhole), kWhole);
    EXPECT_EQ(Taken(kWhole), std::string(kWhole, 'b'));
}

TEST_F(Slot, AReaderWhoBeginsWhileTheWriterAsksForTheSpeedIsWaitedFor) {
    transfer.bytes_left = transfer.bytes_total = 10 * kWhole;
    EXPECT_EQ(Write(std::string(kWhole, 'a')), kWhole);
    transfer.speed_cb = [](unsigned long long, unsigned long long) -> long long {
        transfer.slot_offset = 1;  // between the look at the slot and the copy into it
        return 0;
    };
    waits.wait = [] {
        transfer.slot_state = kSlotEmpty;
        return 0;
    };
    EXPECT_EQ(Write(std::string(kWhole, 'b')), kWhole);
    EXPECT_THAT(waits.deadlines, ElementsAre(1090));
    EXPECT_EQ(Read(sizeof room_), kWhole);
    EXPECT_EQ(Taken(kWhole), std::string(kWhole, 'b'));
}

TEST_F(Slot, AChunkOfTwentyThreeBytesEndsTheCopyAlsoBehindOthers) {
    EXPECT_EQ(Write(std::string(kWhole, 'a')), kWhole);
    waits.wait = [] {
        transfer.slot_state = kSlotEmpty;
        return 0;
    };
    EXPECT_EQ(Write(std::string(23, 'x')), 23U);
    EXPECT_EQ(State(), kSlotAborted);
}

int cancel_after = 0;
int CancelLater() {
    return --cancel_after < 0 ? 1 : 0;
}

TEST_F(Slot, ACancelIsSeenOnEntryAndAfterTheWaitOnBothSides) {
    transfer.cancel_cb = CancelLater;
    for (int after = 0; after < 2; ++after) {
        transfer.slot_state = kSlotEmpty;
        YLIBCErrSetEx(0, "test", 1);
        cancel_after = after;
        EXPECT_EQ(Write("abc"), 23U) << after;
        EXPECT_EQ(YLIBCErrGet(), 0xa600U);
        EXPECT_EQ(State(), kSlotAborted);

        transfer.slot_state = kSlotEmpty;
        cancel_after = 2;
        EXPECT_EQ(Write("abc"), 3U);
        YLIBCErrSetEx(0, "test", 1);
        cancel_after = after;
        EXPECT_EQ(Read(10), kAbort) << after;
        EXPECT_EQ(YLIBCErrGet(), 0xa600U);
        EXPECT_EQ(State(), kSlotAborted);
    }
}

TEST_F(Slot, ACancelDuringAWaitTakesEffectAtTheWakeUp) {
    transfer.cancel_cb = CancelLater;
    cancel_after = 2;
    EXPECT_EQ(Write("abc"), 3U);
    cancel_after = 1000;
    int wakes = 0;
    waits.wait = [&] {
        if (++wakes == 1) {
            cancel_after = 0;  // wished now, and nobody woken for it
            return 0;
        }
        transfer.slot_state = kSlotEmpty;
        return 0;
    };
    EXPECT_EQ(Write("def"), 23U);
    EXPECT_EQ(wakes, 2);
    EXPECT_EQ(YLIBCErrGet(), 0xa600U);
}

TEST_F(Slot, TheDeathOfTheWatchedProcessStopsBothSides) {
    const pid_t child = scratch::Start([] { return 0; });
    EXPECT_EQ(scratch::End(child), 0);
    transfer.watched_pid = child;
    EXPECT_EQ(Write("abc"), 23U);
    EXPECT_EQ(YLIBCErrGet(), 0xa600U);
    transfer.slot_state = kSlotEmpty;
    EXPECT_EQ(Read(10), kAbort);
}

TEST_F(Slot, NullDataAndNullContextsFail) {
    EXPECT_EQ(CopyWriteCallback(nullptr, 1, 10, &context_), 23U);
    EXPECT_EQ(State(), kSlotAborted);
    transfer.slot_state = kSlotEmpty;
    EXPECT_EQ(CopyReadCallback(nullptr, 1, 10, &context_), kAbort);
    EXPECT_EQ(State(), kSlotAborted);
    char byte = 'x';
    EXPECT_EQ(CopyWriteCallback(&byte, 1, 1, nullptr), 23U);
    EXPECT_EQ(CopyReadCallback(&byte, 1, 1, nullptr), kAbort);
}

std::vector<std::pair<unsigned long long, unsigned long long>> progress_told, speed_asked;
int Progress(unsigned long long chunk, unsigned long long done) {
    progress_told.emplace_back(chunk, done);
    return 0;
}
long long Speed(unsigned long long chunk, unsigned long long done) {
    speed_asked.emplace_back(chunk, done);
    return 0;
}

TEST_F(Slot, TheReaderTellsTheProgressAndTheWriterAsksForTheSpeed) {
    progress_told.clear();
    speed_asked.clear();
    transfer.progress_cb = Progress;
    transfer.speed_cb = Speed;
    EXPECT_EQ(Write("abcd"), 4U);
    EXPECT_EQ(Read(100), 4U);
    EXPECT_EQ(Write("ef"), 2U);
    EXPECT_EQ(Read(100), 2U);
    EXPECT_THAT(progress_told, ElementsAre(std::pair(4ULL, 4ULL), std::pair(2ULL, 6ULL)));
    EXPECT_THAT(speed_asked, ElementsAre(std::pair(4ULL, 0ULL), std::pair(2ULL, 4ULL)));
}

TEST_F(Slot, AHandleWithoutATransferKeepsTheCallersSize) {
    CURL* curl = curl_easy_init();
    context_.curl = curl;
    EXPECT_EQ(Write("abc"), 3U);
    EXPECT_EQ(transfer.bytes_left, 1000U);
    EXPECT_FALSE(transfer.first_write);
    curl_easy_cleanup(curl);
}

TEST_F(Slot, TheSlotIsUsedAgainForLaterChunks) {
    EXPECT_EQ(Write(std::string(100, 'a')), 100U);
    const char* buffer = transfer.slot_buffer;
    EXPECT_EQ(transfer.slot_capacity, 101U);
    EXPECT_EQ(Read(200), 100U);
    EXPECT_EQ(Write(std::string(50, 'b')), 50U);
    EXPECT_EQ(transfer.slot_buffer, buffer);
    EXPECT_EQ(Read(200), 50U);
    EXPECT_EQ(Taken(50), std::string(50, 'b'));
}

TEST_F(Slot, BytesPassInOrderBetweenTwoThreads) {
    const std::string bytes = Pattern(3000000);
    transfer.bytes_left = transfer.bytes_total = bytes.size();
    waits.wait = nullptr;
    timespec real{};
    clock_gettime(CLOCK_REALTIME, &real);
    seams::SetTime(real.tv_sec);
    XferContext reader;
    std::string got;
    std::thread upload([&] {
        std::vector<char> room(65536);
        for (size_t n = 1; n > 0;) {
            n = CopyReadCallback(room.data(), 1, room.size(), &reader);
            ASSERT_LE(n, room.size());
            got.append(room.data(), n);
        }
    });
    for (size_t at = 0, piece = 1; at < bytes.size(); at += piece) {
        piece = 1 + (at * 7919) % 16384;
        piece = piece == 23 ? 24 : piece;
        const std::string part = bytes.substr(at, piece);
        ASSERT_EQ(Write(part), part.size());
    }
    {
        const SlotLock lock;
        transfer.slot_state = kDownloadDone;
        pthread_cond_signal(&transfer.slot_full_cond);
    }
    upload.join();
    EXPECT_TRUE(got == bytes);
}

}  // namespace
}  // namespace ZYROCloud

extern "C" int pthread_cond_timedwait(pthread_cond_t* cond, pthread_mutex_t* mutex,
                                      const timespec* until) {
    using ZYROCloud::waits;
    if (waits.wait) {
        waits.deadlines.push_back(until->tv_sec);
        return waits.wait();
    }
    return pthread_cond_clockwait(cond, mutex, CLOCK_REALTIME, until);
}
