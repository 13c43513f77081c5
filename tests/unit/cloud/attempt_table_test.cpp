// Every kind of transfer that goes through the loop: outcomes in; events, waits and lines out.
#include <gmock/gmock.h>

#include <map>
#include <sstream>

#include "cloud/attempt.h"
#include "support/seams.h"
#include "unit/cloud/attempt_plans.h"

namespace ZYROCloud {
namespace {

using testing::ElementsAreArray;
using testing::IsEmpty;

/** What is special about the transfer in this row. */
enum Case { kFile, kStream, kBytesWritten, kTokenLost, kNoSeek };

struct Row {
    std::string name;
    void (*transfer)(Transfer&);
    Case special;
    std::string outcomes;  ///< a letter each, see Script
    __tag_vfs_err_ code;   ///< of the driver in the end
    std::string events;
    std::vector<unsigned> sleeps;
    size_t lines;  ///< one for each retry, one for giving up or running out
};

std::deque<Outcome> Script(const std::string& outcomes) {
    static const std::map<char, Outcome> letters = {{'D', kDone},      {'B', kBusy},
                                                    {'L', kLost},      {'F', kFull},
                                                    {'T', kToken},     {'C', kStopped},
                                                    {'G', kGone},      {'W', kWrongPlace},
                                                    {'P', kForbidden}, {'K', kStoppedYetRetryable}};
    std::deque<Outcome> script;
    for (const char letter : outcomes) {
        script.push_back(letters.at(letter));
    }
    return script;
}

constexpr auto kNone = VFS_ERR_NONE;
constexpr auto kServer = VFS_ERR_SERVER_ERROR;
constexpr auto kTime = VFS_ERR_TIMEOUT;
constexpr auto kQuota = VFS_ERR_QUOTA_EXCEEDED;
constexpr auto kRefused = VFS_ERR_UNAUTHORIZED;
constexpr auto kCancel = VFS_ERR_CANCELLED;
constexpr auto kRange = VFS_ERR_RANGE_FAILED;
const std::vector<unsigned> kSixFives(6, 5), kSixThrees(6, 3);

// clang-format off
const Row kRows[] = {
    {"Box upload, at once", BoxUpload, kFile, "D", kNone, "send", {}, 0},
    {"Box upload, third time", BoxUpload, kFile, "BLD", kNone, "send rewind send rewind send", {5, 3}, 2},
    {"Box upload, refused", BoxUpload, kFile, "F", kQuota, "send", {}, 1},
    {"Box upload, stream", BoxUpload, kStream, "B", kServer, "send", {}, 1},
    {"Box upload, token", BoxUpload, kFile, "T", kRefused, "send renew", {}, 0},
    {"Box upload, cancel", BoxUpload, kFile, "C", kCancel, "send", {}, 0},
    {"Box upload, no seek", BoxUpload, kNoSeek, "B", kServer, "send rewind", {}, 0},
    {"Box upload, never", BoxUpload, kFile, "BBBBBB", kServer,
     "send rewind send rewind send rewind send rewind send rewind send rewind", kSixFives, 7},
    {"Dropbox direct, token", DropboxDirect, kFile, "T", kRefused, "send", {}, 1},
    {"Dropbox direct, stream", DropboxDirect, kStream, "B", kServer, "send", {}, 1},
    {"Dropbox direct, again", DropboxDirect, kFile, "BD", kNone, "send rewind send", {5}, 1},
    {"Google direct, token", GoogleDirect, kFile, "TTD", kNone,
     "send renew rewind send renew rewind send", {3, 3}, 2},
    {"Google direct, token lost", GoogleDirect, kTokenLost, "T", kRefused, "send renew", {}, 0},
    {"Google direct, stream and token", GoogleDirect, kStream, "T", kRefused, "send renew", {}, 0},
    {"Google direct, refused", GoogleDirect, kFile, "F", kQuota, "send", {}, 0},
    {"Google resumable, asks each time", GoogleResumable, kFile, "BTD", kNone,
     "ask send ask send renew ask send", {5, 3}, 2},
    {"Google resumable, stream", GoogleResumable, kStream, "B", kServer, "ask send", {}, 0},
    {"Dropbox chunk, wrong place", DropboxChunk, kFile, "WD", kNone, "send rewind send", {3}, 1},
    {"Dropbox chunk, of a stream", DropboxChunk, kStream, "W", kRange, "send", {}, 1},
    {"Dropbox chunk, token", DropboxChunk, kFile, "T", kRefused, "send", {}, 1},
    {"OneDrive fragment, token and place", OneDriveFragment, kFile, "TWD", kNone,
     "send renew rewind send rewind send", {3, 3}, 2},
    {"Box download, again", BoxDownload, kFile, "BLD", kNone, "send send send", {5, 3}, 2},
    {"Box download, bytes written", BoxDownload, kBytesWritten, "B", kServer, "send", {}, 1},
    {"Box download, cancel", BoxDownload, kFile, "C", kCancel, "send", {}, 0},
    {"Box download, never", BoxDownload, kStream, "BBBBBB", kServer,
     "send send send send send send", kSixFives, 7},
    {"Google download, fresh link", GoogleDownload, kFile, "PD", kNone,
     "send clean send", {5}, 1},
    {"Google download, bytes written", GoogleDownload, kBytesWritten, "P", VFS_ERR_FORBIDDEN,
     "send", {}, 1},
    {"Dropbox download, not there yet", DropboxDownload, kFile, "GGD", kNone,
     "build send look build send look build send", {10, 10}, 2},
    {"OneDrive size, refused", OneDriveSize, kFile, "F", kQuota, "send", {}, 1},
    {"OneDrive size, cancel seen at the next look", OneDriveSize, kFile, "K", kCancel, "send",
     {3}, 1},
    {"Generic download, again", GenericDownload, kFile, "LD", kNone, "send send", {3}, 1},
    {"Generic download, refused", GenericDownload, kFile, "LF", kQuota, "send send", {3}, 2},
    {"Generic download, never", GenericDownload, kFile, "LLLLLL", kTime,
     "send send send send send send", kSixThrees, 7},
};
// clang-format on

std::string Joined(const Texts& events) {
    std::string text;
    for (const std::string& event : events) {
        text += (text.empty() ? "" : " ") + event;
    }
    return text;
}

TEST(AttemptTable, EveryRow) {
    for (const Row& row : kRows) {
        SCOPED_TRACE(row.name);
        seams::Reset();
        Transfer run(Script(row.outcomes));
        run.context.fd = row.special == kStream ? -1 : 7;
        run.context.can_retry = row.special != kBytesWritten;
        run.renews = row.special != kTokenLost;
        run.can_seek = row.special != kNoSeek;
        row.transfer(run);
        EXPECT_EQ(run.Go(), row.outcomes.back() == 'D');
        EXPECT_EQ(run.cloud.GetErrorCode(), row.code);
        EXPECT_EQ(Joined(run.events), row.events);
        EXPECT_EQ(seams::Sleeps(), row.sleeps);
        EXPECT_EQ(seams::LogLines().size(), row.lines) << seams::LogDump();
    }
}

TEST(AttemptTable, EveryTransferIsCancelledBeforeItsFirstRequest) {
    for (const Row& row : kRows) {
        SCOPED_TRACE(row.name);
        Transfer run(Script(row.outcomes));
        row.transfer(run);
        run.cloud.SetError(VFS_ERR_CANCELLED, "");
        EXPECT_FALSE(run.Go());
        EXPECT_THAT(run.events, IsEmpty());
        EXPECT_EQ(run.cloud.GetErrorCode(), VFS_ERR_CANCELLED);
    }
}

}  // namespace
}  // namespace ZYROCloud
