#include <dlfcn.h>
#include <pthread.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <thread>

#include "cloud/transfer_slot.h"
#include "support/scratch.h"
#include "unit/cloud/transfer_fixture.h"

namespace ZYROCloud {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr long long kMiB = 1024 * 1024;

/** Ends the waits of the slot as if their 90 seconds had gone by. */
std::atomic<bool> time_is_up{false};
/** Whether a test does that. */
std::atomic<bool> watch_time{false};
/** The n-th thread cannot be made; 0 for none. */
int failing_thread = 0;

std::atomic<int> cancel_calls{0};
std::atomic<int> cancel_at{-1};
int CancelLater() {
    return cancel_calls++ == cancel_at ? 1 : 0;
}

std::atomic<unsigned long long> progress_done{0};
int Progress(unsigned long long, unsigned long long done) {
    progress_done = done;
    return 0;
}

class Copies : public testing::Test {
  protected:
    void SetUp() override {
        time_is_up = watch_time = false;
        failing_thread = 0;
        cancel_calls = 0;
        cancel_at = -1;
        progress_done = 0;
        dst_.Keep();
    }
    bool Copy(long long size, CancelCallback cancel = nullptr, SpeedCallback speed = nullptr) {
        return Cloud::CopyFile(&src_, &dst_, "s/from", "t/to", size, Progress, cancel, speed);
    }
    /** Gives a piece and then nothing until the slot has been given up. */
    void ServeThenStall(const std::string& bytes) {
        src_.download = [=](XferData* xfer, const Json::Value&) {
            Feed(src_, xfer, bytes, bytes.size());
            while (transfer.slot_state != kSlotAborted) {
                std::this_thread::yield();
            }
            return Feed(src_, xfer, "late");
        };
    }

    FakeDriver src_, dst_;
};

TEST_F(Copies, EveryByteArrivesWhateverThePieces) {
    const std::string bytes = Pattern(5 * kMiB + 77);
    for (const size_t piece : {size_t{16384}, size_t{1000}, size_t{131072}, size_t{777777}}) {
        for (const size_t want : {size_t{65536}, size_t{262144}, size_t{333}, size_t{16384}}) {
            src_.Serve(bytes, piece);
            dst_.Keep(want);
            EXPECT_TRUE(Copy(static_cast<long long>(bytes.size()))) << piece << " " << want;
            EXPECT_TRUE(dst_.kept == bytes) << piece << " " << want;
            EXPECT_EQ(progress_done, bytes.size());
        }
    }
    EXPECT_EQ(transfer.slot_buffer, nullptr);
    EXPECT_THAT(seams::LogLines(), IsEmpty()) << seams::LogDump();
}

TEST_F(Copies, BothDriversKnowTheirUriAndTheUploadTheSize) {
    src_.Serve("12345");
    EXPECT_TRUE(Copy(5));
    EXPECT_THAT(src_.actions, ElementsAre("Download"));
    EXPECT_THAT(dst_.actions, ElementsAre("Upload"));
    EXPECT_EQ(src_.metas.at(0)["url"], "s/from");
    EXPECT_FALSE(src_.metas.at(0).isMember("total_bytes"));
    EXPECT_EQ(dst_.metas.at(0)["url"], "t/to");
    EXPECT_EQ(dst_.metas.at(0)["total_bytes"].asInt64(), 5);
    EXPECT_EQ(dst_.metas.at(0)["filesize"].asInt64(), 5);
    EXPECT_EQ(YLIBCErrGet(), 0U);
}

TEST_F(Copies, BothSidesHaveNoDescriptorSoThatNoDriverRewinds) {
    src_.download = [&](XferData* xfer, const Json::Value&) {
        EXPECT_EQ(xfer->context->fd, -1);
        EXPECT_EQ(xfer->direction, 0);
        EXPECT_EQ(xfer->callback, &CopyWriteCallback);
        return Feed(src_, xfer, "12345");
    };
    dst_.upload = [&](XferData* xfer, const Json::Value&) {
        EXPECT_EQ(xfer->context->fd, -1);
        EXPECT_EQ(xfer->direction, 1);
        EXPECT_EQ(xfer->callback, &CopyReadCallback);
        return Drain(dst_, xfer, dst_.kept);
    };
    EXPECT_TRUE(Copy(5));
}

TEST_F(Copies, AZeroByteCopyEndsTheFirstWaitAndGivesNothing) {
    src_.Serve("");
    EXPECT_TRUE(Copy(0)) << seams::LogDump();
    EXPECT_EQ(dst_.kept, "");
    ASSERT_EQ(dst_.metas.size(), 1U);
    EXPECT_EQ(dst_.metas[0]["total_bytes"].asInt64(), 0);
}

TEST_F(Copies, TheUploadStartsOnlyWhenTheFirstDataIsThere) {
    std::atomic<bool> given{false};
    src_.download = [&](XferData* xfer, const Json::Value&) {
        std::this_thread::yield();
        given = true;
        return Feed(src_, xfer, "12345");
    };
    dst_.upload = [&](XferData* xfer, const Json::Value&) {
        EXPECT_TRUE(given);
        return Drain(dst_, xfer, dst_.kept);
    };
    EXPECT_TRUE(Copy(5));
}

TEST_F(Copies, ASourceThatSendsNoDataForNinetySecondsEndsTheCopyThroughTheUploadThreadsTimeout) {
    time_is_up = watch_time = true;
    ServeThenStall("");
    EXPECT_FALSE(Copy(5));
    EXPECT_TRUE(seams::Logged("timeout")) << seams::LogDump();
    EXPECT_THAT(dst_.metas, IsEmpty());
    EXPECT_EQ(dst_.GetErrorCode(), VFS_ERR_TIMEOUT);
    EXPECT_EQ(src_.GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
}

TEST_F(Copies, ASourceThatEndsEmptyAfterTheTimeoutIsStillAFailure) {
    time_is_up = watch_time = true;
    src_.download = [](XferData*, const Json::Value&) {
        while (transfer.slot_state != kSlotAborted) {
            std::this_thread::yield();
        }
        return true;
    };
    EXPECT_FALSE(Copy(5));
    EXPECT_TRUE(seams::LoggedPart("Upload Failed, err:")) << seams::LogDump();
    EXPECT_EQ(YLIBCErrGet(), 0x8000U);
}

TEST_F(Copies, ASourceThatStallsInTheMiddleEndsTheCopy) {
    watch_time = true;
    ServeThenStall("0123456789");
    dst_.upload = [&](XferData* xfer, const Json::Value&) {
        const bool drained = [&] {
            char room[64];
            EXPECT_EQ(xfer->callback(room, 1, sizeof room, xfer->context), 10U);
            time_is_up = true;
            return Drain(dst_, xfer, dst_.kept);
        }();
        return drained;
    };
    EXPECT_FALSE(Copy(1000));
    EXPECT_TRUE(seams::Logged("timeout")) << seams::LogDump();
    EXPECT_EQ(dst_.GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
}

TEST_F(Copies, ATargetThatTakesNothingEndsTheCopyThroughTheWritersTimeout) {
    watch_time = true;
    src_.download = [&](XferData* xfer, const Json::Value&) {
        Feed(src_, xfer, "first");
        time_is_up = true;
        return Feed(src_, xfer, "second");
    };
    dst_.upload = [&](XferData* xfer, const Json::Value&) {
        while (transfer.slot_state != kSlotAborted) {
            std::this_thread::yield();
        }
        return Drain(dst_, xfer, dst_.kept);
    };
    EXPECT_FALSE(Copy(11));
    EXPECT_EQ(dst_.kept, "");
    EXPECT_EQ(src_.GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
    EXPECT_TRUE(seams::LoggedPart("Download Failed, err:")) << seams::LogDump();
}

TEST_F(Copies, ASourceThatFailsBeforeItsFirstByteLeavesTheTargetAlone) {
    src_.download = [&](XferData*, const Json::Value&) {
        src_.SetError(VFS_ERR_NOT_FOUND, "");
        return false;
    };
    EXPECT_FALSE(Copy(5));
    EXPECT_THAT(dst_.metas, IsEmpty());
    EXPECT_EQ(YLIBCErrGet(), 0x600U);
    EXPECT_TRUE(seams::Logged("Download Failed, err:{\"code\":" +
                              std::to_string(VFS_ERR_NOT_FOUND) + ",\"msg\":\"\"}, zyroerr=600"))
        << seams::LogDump();
}

TEST_F(Copies, ASourceThatDiesInTheMiddleEndsTheUpload) {
    src_.download = [&](XferData* xfer, const Json::Value&) {
        Feed(src_, xfer, Pattern(100000));
        src_.SetError(VFS_ERR_REMOTE_FAILED, "");
        return false;
    };
    EXPECT_FALSE(Copy(200000));
    EXPECT_EQ(dst_.GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
    EXPECT_EQ(YLIBCErrGet(), 0x6c00U);
    EXPECT_TRUE(seams::LoggedPart("Download Failed")) << seams::LogDump();
    EXPECT_FALSE(seams::LoggedPart("Upload Failed")) << "the source's failure is told first";
}

TEST_F(Copies, ATargetThatDiesInTheMiddleEndsTheDownload) {
    src_.Serve(Pattern(10 * kMiB));
    dst_.upload = [&](XferData* xfer, const Json::Value&) {
        std::string some(100000, '\0');
        xfer->callback(some.data(), 1, some.size(), xfer->context);
        dst_.SetError(VFS_ERR_QUOTA_EXCEEDED, "");
        return false;
    };
    EXPECT_FALSE(Copy(10 * kMiB));
    EXPECT_EQ(src_.GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
    EXPECT_EQ(dst_.GetErrorCode(), VFS_ERR_QUOTA_EXCEEDED);
}

TEST_F(Copies, ATargetThatRefusesAtOnceIsToldWhenTheSourceIsAtItsEnd) {
    src_.Serve("12345");
    dst_.upload = [&](XferData*, const Json::Value&) {
        dst_.SetError(VFS_ERR_NO_SPACE, "");
        return false;
    };
    EXPECT_FALSE(Copy(5));
    EXPECT_EQ(src_.GetErrorCode(), VFS_ERR_NONE);
    EXPECT_EQ(YLIBCErrGet(), 0x2900U);
    EXPECT_TRUE(seams::LoggedPart("Upload Failed, err:")) << seams::LogDump();
}

TEST_F(Copies, ACopyOfExactlyTwentyThreeBytesFails) {
    src_.Serve(std::string(23, 'x'));
    for (int i = 0; i < 50; ++i) {
        EXPECT_FALSE(Copy(23));
    }
}

TEST_F(Copies, AChunkOfTwentyThreeBytesInTheMiddleFails) {
    src_.download = [&](XferData* xfer, const Json::Value&) {
        return Feed(src_, xfer, Pattern(100)) && Feed(src_, xfer, Pattern(23)) &&
               Feed(src_, xfer, Pattern(77));
    };
    EXPECT_FALSE(Copy(200));
}

TEST_F(Copies, ACancelAtEveryCallEndsTheCopyAsCancelled) {
    src_.Serve(Pattern(100000), 10000);
    ASSERT_TRUE(Copy(100000, CancelLater));
    const int calls = cancel_calls;
    ASSERT_GE(calls, 40);
    for (int at = 0; at < 40; ++at) {
        FakeDriver src, dst;
        src.Serve(Pattern(100000), 10000);
        dst.Keep();
        cancel_calls = 0;
        cancel_at = at;
        EXPECT_FALSE(Cloud::CopyFile(&src, &dst, "a", "b", 100000, nullptr, CancelLater, nullptr))
            << at;
        EXPECT_TRUE(src.GetErrorCode() == VFS_ERR_CANCELLED ||
                    dst.GetErrorCode() == VFS_ERR_CANCELLED)
            << at << " " << src.GetErrorCode() << " " << dst.GetErrorCode();
    }
}

TEST_F(Copies, ASourceThatHasMoreThanItsSizeIsNoSuccess) {
    src_.Serve(Pattern(100000));
    EXPECT_FALSE(Copy(50000));
}

TEST_F(Copies, TwentyThreeBytesBehindTheSizeAreNoSuccessEither) {
    src_.download = [&](XferData* xfer, const Json::Value&) {
        Feed(src_, xfer, Pattern(100));
        while (transfer.slot_state != kUploadDone) {
            std::this_thread::yield();
        }
        return Feed(src_, xfer, Pattern(23));  // which libcurl takes for taken
    };
    dst_.upload = [](XferData* xfer, const Json::Value&) {
        char room[100];
        return xfer->callback(room, 1, sizeof room, xfer->context) == sizeof room;
    };
    EXPECT_FALSE(Copy(100));
    EXPECT_EQ(src_.GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
}

TEST_F(Copies, ASourceThatHasLessThanItsSizeIsNoSuccess) {
    src_.Serve(Pattern(50000));
    EXPECT_FALSE(Copy(100000));
    EXPECT_EQ(dst_.GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
}

TEST_F(Copies, ASideThatFailsWithoutACodeFailsTheCopyWithOne) {
    src_.Serve("12345");
    dst_.upload = [](XferData*, const Json::Value&) { return false; };
    EXPECT_FALSE(Copy(5));
    EXPECT_EQ(dst_.GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_EQ(YLIBCErrGet(), 0x8000U);
    EXPECT_TRUE(seams::LoggedPart("Upload Failed, err:")) << seams::LogDump();
    dst_.Keep();
    src_.download = [](XferData*, const Json::Value&) { return false; };
    EXPECT_FALSE(Copy(5));
    EXPECT_EQ(src_.GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    EXPECT_TRUE(seams::LoggedPart("Download Failed, err:")) << seams::LogDump();
}

TEST_F(Copies, AFirstChunkWithMoreThanTheSizeLeavesTheTargetAlone) {
    for (const long long told : {0LL, 4LL}) {
        src_.Serve("12345");
        EXPECT_FALSE(Copy(told));
        EXPECT_EQ(dst_.GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
        EXPECT_THAT(dst_.metas, IsEmpty());
    }
    EXPECT_TRUE(seams::LoggedPart("The source has more than its size, 1 bytes"))
        << seams::LogDump();
}

TEST_F(Copies, BytesBehindTheSizeThatNobodyTakesAreNoSuccess) {
    src_.Serve(Pattern(20000), 10000);
    dst_.upload = [&](XferData* xfer, const Json::Value&) {
        // libcurl asks for nothing behind the length that was announced.
        for (size_t left = 15000; left > 0;) {
            char room[15000];
            const size_t n = xfer->callback(room, 1, left, xfer->context);
            if (n > left) {
                return false;
            }
            left -= n;
        }
        return true;
    };
    EXPECT_FALSE(Copy(15000));
    EXPECT_EQ(dst_.GetErrorCode(), VFS_ERR_TRANSFER_ABORTED);
}

TEST_F(Copies, AnUploadThatLeavesBytesOutIsNoSuccess) {
    src_.Serve(Pattern(1000));
    dst_.upload = [](XferData*, const Json::Value&) { return true; };
    EXPECT_FALSE(Copy(1000));
    EXPECT_TRUE(seams::Logged("Upload left out 1000 bytes")) << seams::LogDump();
}

TEST_F(Copies, AFailureThatADriverOvercameIsNoneOfTheCopy) {
    src_.Serve("12345");
    src_.SetError(VFS_ERR_CONFLICT, "");
    dst_.SetError(VFS_ERR_UNAUTHORIZED, "");
    EXPECT_TRUE(Copy(5));
    EXPECT_EQ(dst_.kept, "12345");
    EXPECT_EQ(src_.GetErrorCode(), VFS_ERR_NONE);
    EXPECT_EQ(dst_.GetErrorCode(), VFS_ERR_NONE);
    EXPECT_EQ(YLIBCErrGet(), 0U);
}

TEST_F(Copies, ADriverThatThrowsEndsTheCopy) {
    src_.Serve(Pattern(1000));
    dst_.upload = [](XferData*, const Json::Value& meta) { return meta["url"].asInt64() != 0; };
    EXPECT_FALSE(Copy(1000));
    EXPECT_EQ(dst_.GetErrorCode(), VFS_ERR_CLOUD_FAILED);
    dst_.Keep();
    src_.download = [](XferData*, const Json::Value& meta) { return meta["url"].asInt64() != 0; };
    EXPECT_FALSE(Copy(1000));
    EXPECT_EQ(src_.GetErrorCode(), VFS_ERR_CLOUD_FAILED);
}

TEST_F(Copies, AThreadThatCannotBeMadeFailsTheCopyAndEndsTheOther) {
    src_.Serve("12345");
    for (const int thread : {1, 2}) {
        failing_thread = thread;
        EXPECT_FALSE(Copy(5)) << thread;
        EXPECT_TRUE(seams::LoggedPart("Couldn't run thread, errno 11")) << seams::LogDump();
    }
    EXPECT_THAT(src_.metas, IsEmpty());
    EXPECT_THAT(dst_.metas, IsEmpty());
    failing_thread = 0;
}

TEST_F(Copies, TwoDriversAreNeeded) {
    EXPECT_FALSE(Cloud::CopyFile(nullptr, &dst_, "a", "b", 1, nullptr, nullptr, nullptr));
    EXPECT_FALSE(Cloud::CopyFile(&src_, nullptr, "a", "b", 1, nullptr, nullptr, nullptr));
    EXPECT_FALSE(Cloud::CopyFile(&src_, &src_, "a", "b", 1, nullptr, nullptr, nullptr));
}

TEST_F(Copies, ThreeGiBPassTheBordersOfThirtyTwoBits) {
    const long long size = 3LL * 1024 * kMiB + 5;
    src_.download = [&](XferData* xfer, const Json::Value&) {
        std::vector<char> piece(kMiB);
        for (long long left = size; left > 0;) {
            const size_t n = static_cast<size_t>(std::min<long long>(left, kMiB));
            if (xfer->callback(piece.data(), 1, n, xfer->context) != n) {
                return false;
            }
            left -= static_cast<long long>(n);
        }
        return true;
    };
    long long got = 0;
    dst_.upload = [&](XferData* xfer, const Json::Value& meta) {
        EXPECT_EQ(meta["total_bytes"].asInt64(), size);
        std::vector<char> room(kMiB);
        for (size_t n = 1; n > 0; got += static_cast<long long>(n)) {
            n = xfer->callback(room.data(), 1, room.size(), xfer->context);
            if (n > room.size()) {
                return false;
            }
        }
        return true;
    };
    EXPECT_TRUE(Copy(size));
    EXPECT_EQ(got, size);
    EXPECT_EQ(progress_done, static_cast<unsigned long long>(size));
}

TEST_F(Copies, AChunkedTargetGetsEveryByteOnce) {
    const std::string bytes = Pattern(1000000);
    src_.Serve(bytes, 10000);
    for (const unsigned int chunk : {100000U, 65536U, 10000U, 4096U}) {
        std::string got;
        dst_.upload = [&](XferData* xfer, const Json::Value& meta) {
            long long left = meta["total_bytes"].asInt64();
            xfer->context->limited = true;
            while (left > 0) {
                xfer->context->chunk_left = xfer->context->chunk_size =
                    static_cast<unsigned int>(std::min<long long>(left, chunk));
                left -= xfer->context->chunk_left;
                if (!Drain(dst_, xfer, got)) {
                    return false;
                }
            }
            return true;
        };
        EXPECT_TRUE(Copy(1000000)) << chunk;
        EXPECT_TRUE(got == bytes) << chunk;
    }
}

}  // namespace
}  // namespace ZYROCloud

extern "C" int pthread_cond_timedwait(pthread_cond_t* cond, pthread_mutex_t* mutex,
                                      const timespec* until) {
    if (!ZYROCloud::watch_time) {
        return pthread_cond_clockwait(cond, mutex, CLOCK_REALTIME, until);
    }
    // In steps, so that the time can come to be up during a wait. A step that ends is a wake-up for
    // nothing.
    timespec step{};
    clock_gettime(CLOCK_REALTIME, &step);
    step.tv_nsec += 2000000;
    if (step.tv_nsec >= 1000000000) {
        step.tv_nsec -= 1000000000;
        ++step.tv_sec;
    }
    const int result = pthread_cond_clockwait(cond, mutex, CLOCK_REALTIME, &step);
    return result == ETIMEDOUT && !ZYROCloud::time_is_up ? 0 : result;
}

extern "C" int pthread_create(pthread_t* thread, const pthread_attr_t* attributes,
                              void* (*body)(void*), void* argument) noexcept {
    using Real = int (*)(pthread_t*, const pthread_attr_t*, void* (*)(void*), void*);
    static const Real real = reinterpret_cast<Real>(dlsym(RTLD_NEXT, "pthread_create"));
    if (ZYROCloud::failing_thread > 0 && --ZYROCloud::failing_thread == 0) {
        return EAGAIN;
    }
    return real(thread, attributes, body, argument);
}
