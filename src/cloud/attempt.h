/**
 * The loop round every transfer: six attempts, a look at the driver's code for a cancel before and
 * after each, and between two attempts what the service needs. What differs between services is
 * the plan.
 */
#ifndef ZYROVFS_CLOUD_ATTEMPT_H
#define ZYROVFS_CLOUD_ATTEMPT_H

#include <json/value.h>
#include <sys/types.h>

#include <algorithm>
#include <functional>
#include <string>

#include "cloud/public_cloud.h"
#include "core/source_line.h"

namespace ZYROCloud {

constexpr int kMostAttempts = 6;

/** What a failed attempt leads to. */
struct NextStep {
    enum Kind {
        kEnd,     ///< no further attempt; whoever says so has logged what there is to log
        kGiveUp,  ///< no further attempt; the plan's `refused` line is logged
        kRetry    ///< one more attempt after a wait
    };
    Kind kind;
    /** Before the next attempt; negative: as long as the error handler asks for. */
    int seconds = -1;

    static NextStep End() { return {kEnd}; }
    static NextStep GiveUp() { return {kGiveUp}; }
    static NextStep Retry() { return {kRetry}; }
    static NextStep RetryAfter(int seconds) { return {kRetry, seconds}; }
    static NextStep RetryIf(bool worth_it) { return worth_it ? Retry() : GiveUp(); }
};

/** When the driver's record becomes the error of the handler. The tests for a cancel, and `judge`,
 * look at the driver's record, so the order shows. */
enum class CopyError {
    kBeforeCancelTest,
    kAfterCancelTest,
    kAtEnd,  ///< when no further attempt is made
    kNever   ///< `send` and `judge` see to it
};

struct AttemptPlan {
    /** False ends the transfer at once. May be empty. */
    std::function<bool()> prepare;
    std::function<bool()> send;
    /** Asked after a failure that was no cancel, with the driver's code at that time. */
    std::function<NextStep(__tag_vfs_err_)> judge;
    /** Puts the source where the next attempt begins; false ends the transfer. May be empty. */
    std::function<bool()> rewind;

    CopyError copy = CopyError::kBeforeCancelTest;
    bool cancel_test_after = true;
    /** The code of a failure for which neither the driver nor its handler has one. */
    __tag_vfs_err_ unexplained = ZYROVFS::VFS_ERR_CLOUD_FAILED;
    /** Number that the log gives the first attempt. */
    int first_number = 0;
    /** "Retry Download": the log line adds number and limit. */
    const char* retry = nullptr;
    /** Formats for what was asked for and the error; null for no line. `refused` when `judge` gives
     * up, `exhausted` after the last attempt. */
    const char* refused = nullptr;
    const char* exhausted = nullptr;
    /** First argument of those two; read when the line is written, must outlive the loop. */
    const std::string* what = nullptr;
};

constexpr const char* kRequestFailed = "Failed to process curl %s, err:%s";
constexpr const char* kNoAttemptLeft = "Retry times reach max times, %s, err: %s";

/** True when one attempt succeeded; those before it leave nothing in the driver's record. False
 * leaves the cause there. The log lines are those of the caller. */
bool RunAttempts(Cloud& cloud, const AttemptPlan& plan,
                 ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

/** An upload is repeated when its source can be read again and the failure may pass; `cured` is
 * for failures that the service's plan has cured by itself. */
NextStep JudgeUpload(Cloud& cloud, const XferContext& context, bool cured = false);

/**
 * The same for an upload with a token that may have run out on the way. One that the service
 * refuses is renewed, which is worth an attempt; a stream has none left, but the next transfer
 * finds the new token. `code` is the failure's.
 */
NextStep JudgeRenewing(PublicCloud& cloud, const XferContext& context, __tag_vfs_err_ code,
                       bool cured = false);

/** A download is repeated from its start, so only before the first byte was written. */
NextStep JudgeDownload(Cloud& cloud, const XferContext& context);

/**
 * What all downloads of an item by its URL have in common; `send` and `copy` are the driver's to
 * add. `xfer` and `url` must outlive the loop.
 */
AttemptPlan DownloadPlan(Cloud& cloud, const XferData& xfer, const std::string& url);

/** Where an upload of which `sent` bytes have gone out began in its source: what callers hand in
 * may stand anywhere. 0 for what has no position. */
off64_t SourceBegin(const XferContext& context, unsigned long long sent = 0);

/** lseek64 to `offset`, that of an upload which began at `begin`; a failure logs `text`, a format
 * that may end in "%m". */
bool SeekSource(int fd, off64_t begin, off64_t offset, const char* text,
                ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

/**
 * Asks for "from_bytes" to "from_bytes" + "len" of `meta`, when it has a "len" other than 0. The
 * upper end is the place behind the last byte that is wanted: one byte more than `len` arrives.
 */
bool SetRange(Cloud& cloud, const Json::Value& meta);

/**
 * An upload in pieces: `send(length)` for each, all of `most` bytes but the last one, then
 * `finish()`. A piece that fails ends it.
 */
template <typename Send, typename Finish>
bool ForEachChunk(unsigned long long total, unsigned long long most, Send send, Finish finish) {
    for (unsigned long long left = total; left > 0;) {
        const unsigned long long length = std::min(left, most);
        if (!send(length)) {
            return false;
        }
        left -= length;
    }
    return finish();
}

}  // namespace ZYROCloud

#endif
