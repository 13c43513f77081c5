// A browser's file on its way through the relay: what the driver gets, and who is told what.
#include <unistd.h>

#include <cstring>

#include "cloud/transfer.h"
#include "unit/cloud/relay_fixture.h"

namespace ZYROCloud {
namespace {

using testing::Each;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;
using testing::SizeIs;

class RelayUploads : public RelayTest {};

TEST_F(RelayUploads, FilesOfAllSizesArriveWithAndWithoutTheirSize) {
    const size_t close = Closing().size();
    for (const size_t size : {size_t{0}, size_t{1}, size_t{23}, kTail - close, kTail - close + 1,
                              kTail - 1, kTail, kTail + 1, 2 * kTail, 8 * kTail + 5}) {
        const std::string file = Pattern(size);
        for (const size_t want : {size_t{1000}, size_t{16384}, kTail, 2 * kTail}) {
            for (const long long told : {-1LL, static_cast<long long>(size)}) {
                driver_.Keep(want);
                transferred_ = 0;
                ASSERT_TRUE(Relay(file + Closing(), told))
                    << size << " " << want << " " << told << seams::LogDump();
                EXPECT_TRUE(driver_.kept == file) << size << " " << want << " " << told;
                EXPECT_EQ(progress_.current, progress_.total);
                EXPECT_EQ(progress_.error, 0);
                EXPECT_EQ(transferred_, size);
            }
        }
    }
}

TEST_F(RelayUploads, TellTheDriverUriSizeAndAReadFunctionOfAStream) {
    const std::string request = Pattern(200000) + Closing();
    for (const long long size : {-1LL, 200000LL}) {
        driver_.metas.clear();
        driver_.actions.clear();
        driver_.upload = [&](XferData* xfer, const Json::Value&) {
            EXPECT_EQ(xfer->callback, &RelayReadCallback);
            EXPECT_EQ(xfer->direction, 1);
            EXPECT_EQ(xfer->context->fd, -1);
            EXPECT_FALSE(xfer->context->limited);
            EXPECT_EQ(transfer.bytes_left, size == -1 ? request.size() : 200000U);
            EXPECT_EQ(transfer.bytes_total, transfer.bytes_left);
            return Drain(driver_, xfer, driver_.kept);
        };
        ASSERT_TRUE(Relay(request, size)) << seams::LogDump();
        EXPECT_THAT(driver_.actions, ElementsAre("Upload"));
        ASSERT_THAT(driver_.metas, SizeIs(1));
        EXPECT_EQ(driver_.metas[0]["url"], "srv/up.bin");
        EXPECT_EQ(driver_.metas[0]["filesize"].asInt64(), size);
        EXPECT_EQ(driver_.metas[0]["total_bytes"].asUInt64(),
                  size == -1 ? request.size() : 200000U);
    }
}

TEST_F(RelayUploads, MetadataThatCannotBeHadDoesNotStopAnUpload) {
    driver_.metadata_known = false;
    EXPECT_TRUE(Relay("hello" + Closing())) << seams::LogDump();
    EXPECT_EQ(driver_.kept, "hello");
}

TEST_F(RelayUploads, ARequestOfAtMostTheTailsSizeIsReadAtOnceAndForwardedUpToTheBoundary) {
    const std::string file = Pattern(kTail - Closing().size());
    const relay_input::Descriptor request = relay_input::FileOf(file + Closing());
    const Input input(request.Get());
    driver_.upload = [&](XferData* xfer, const Json::Value&) {
        char byte = 0;
        EXPECT_EQ(xfer->callback(&byte, 1, 1, xfer->context), 1U);
        EXPECT_EQ(lseek(request.Get(), 0, SEEK_CUR), static_cast<off_t>(kTail)) << "all is read";
        EXPECT_EQ(progress_.current, Closing().size() + 1);
        driver_.kept = byte;
        std::string rest;
        const bool done = Drain(driver_, xfer, rest);
        driver_.kept += rest;
        return done;
    };
    ASSERT_TRUE(Init(kTail, -1) && Cloud::RelayUploadFile()) << seams::LogDump();
    EXPECT_TRUE(driver_.kept == file);
}

TEST_F(RelayUploads, ALargerRequestIsNotReadBeyondWhereTheTailBegins) {
    const std::string request = Pattern(3 * kTail) + Closing();
    const relay_input::Descriptor source = relay_input::FileOf(request);
    const Input input(source.Get());
    const auto start = static_cast<off_t>(request.size() - kTail);
    driver_.upload = [&](XferData* xfer, const Json::Value&) {
        std::string room(2 * kTail, '\0');
        std::vector<size_t> pieces;
        while (lseek(source.Get(), 0, SEEK_CUR) < start) {
            pieces.push_back(xfer->callback(room.data(), 1, room.size(), xfer->context));
        }
        EXPECT_THAT(pieces, ElementsAre(kTail, kTail, Closing().size()));
        EXPECT_EQ(lseek(source.Get(), 0, SEEK_CUR), start);
        return Drain(driver_, xfer, driver_.kept);
    };
    EXPECT_TRUE(Init(request.size(), -1) && Cloud::RelayUploadFile()) << seams::LogDump();
    EXPECT_EQ(driver_.kept.size(), kTail - Closing().size());
}

TEST_F(RelayUploads, AFileThatHoldsTheBoundaryTextInItsLast128KiBIsCutThere) {
    const std::string head = Pattern(2 * kTail);
    EXPECT_TRUE(Relay(head + "\r\n" + kBoundary + Pattern(1000) + Closing())) << seams::LogDump();
    EXPECT_TRUE(driver_.kept == head) << "the first match counts";
    EXPECT_EQ(progress_.current, progress_.total);

    const std::string before = Pattern(100) + "\r\n" + kBoundary + Pattern(2 * kTail);
    EXPECT_TRUE(Relay(before + Closing()));
    EXPECT_TRUE(driver_.kept == before) << "in front of the tail nobody looks";
}

TEST_F(RelayUploads, WhatFollowsTheFileMayBeAsLongAsTheTailAndNoLonger) {
    const std::string file = Pattern(3 * kTail);
    const std::string line = std::string("\r\n") + kBoundary;
    const std::string fields(kTail - line.size(), 'f');
    EXPECT_TRUE(Relay(file + line + fields)) << seams::LogDump();
    EXPECT_TRUE(driver_.kept == file) << "the boundary begins the tail";

    for (const size_t ahead : {size_t{1}, size_t{2}, line.size() - 1, line.size()}) {
        seams::Reset();
        EXPECT_FALSE(Relay(file + line + fields + std::string(ahead, 'f'))) << ahead;
        EXPECT_EQ(progress_.error, -9);
        EXPECT_TRUE(seams::LoggedPart("Can NOT find boundary(")) << seams::LogDump();
    }
}

TEST_F(RelayUploads, FieldsBehindTheFileDoNotReachTheCloud) {
    for (const size_t size : {size_t{5}, 4 * kTail}) {
        const std::string file = Pattern(size);
        const std::string field = relay_input::Field("overwrite", "true");
        ASSERT_TRUE(Relay(file + "\r\n" + kBoundary + field)) << seams::LogDump();
        EXPECT_TRUE(driver_.kept == file);
        ASSERT_TRUE(Relay(file + "\r\n" + kBoundary + field, static_cast<long long>(size)));
        EXPECT_TRUE(driver_.kept == file);
    }
}

TEST_F(RelayUploads, BoundariesOfAllKindsAreFound) {
    const std::string longest = "--" + std::string(70, 'b');
    const std::string endless = "--" + std::string(300, 'c');
    for (const std::string& boundary :
         {std::string("--x"), longest, endless, std::string("--.*+?[](){}|^$\\ '=,:/")}) {
        const std::string file = Pattern(2 * kTail) + "\r\n--" + boundary.substr(0, 1);
        ASSERT_TRUE(Relay(file + Closing(boundary), -1, boundary.c_str()))
            << boundary << seams::LogDump();
        EXPECT_TRUE(driver_.kept == file) << boundary;
    }
}

TEST_F(RelayUploads, OfABoundaryOfMoreThan253BytesTheFirst253AreLookedFor) {
    const std::string start = "--" + std::string(251, 'c');
    const std::string boundary = start + "rest";
    EXPECT_TRUE(Relay("file\r\n" + start + "other" + Closing(boundary), -1, boundary.c_str()));
    EXPECT_EQ(driver_.kept, "file");
    EXPECT_TRUE(Relay("file\r\n" + start.substr(0, 252) + Closing(boundary), -1, boundary.c_str()));
    EXPECT_EQ(driver_.kept, "file\r\n" + start.substr(0, 252));
}

TEST_F(RelayUploads, WithASizeOfMinusOneTheTailCorrectsWhatADriverCounts) {
    const std::string file = Pattern(1000);
    const auto total = static_cast<unsigned int>(file.size() + Closing().size());
    driver_.upload = [&](XferData* xfer, const Json::Value& meta) {
        EXPECT_EQ(meta["total_bytes"].asUInt(), total);
        xfer->context->limited = true;
        xfer->context->chunk_size = xfer->context->chunk_left = total;
        char room[600];
        EXPECT_EQ(xfer->callback(room, 1, sizeof room, xfer->context), 600U);
        EXPECT_EQ(xfer->context->chunk_left, 400U) << "what remains of the file";
        EXPECT_EQ(xfer->callback(room, 1, sizeof room, xfer->context), 400U);
        EXPECT_EQ(xfer->context->chunk_left, 0U);
        return xfer->callback(room, 1, sizeof room, xfer->context) == 0;
    };
    EXPECT_TRUE(Relay(file + Closing())) << seams::LogDump();
}

TEST_F(RelayUploads, WithASizeAPieceIsNotCorrected) {
    driver_.upload = [&](XferData* xfer, const Json::Value&) {
        char room[600];
        for (const unsigned int piece : {400U, 600U}) {
            xfer->context->limited = true;
            xfer->context->chunk_left = piece;
            EXPECT_EQ(xfer->callback(room, 1, sizeof room, xfer->context), piece);
            EXPECT_EQ(xfer->callback(room, 1, sizeof room, xfer->context), 0U);
        }
        return true;
    };
    EXPECT_TRUE(Relay(Pattern(1000) + Closing(), 1000)) << seams::LogDump();
}

TEST_F(RelayUploads, APieceThatEndsWithinTheClosingPartDoesNotCountBackwards) {
    driver_.upload = [&](XferData* xfer, const Json::Value&) {
        xfer->context->limited = true;
        xfer->context->chunk_left = 10;  // less than what the tail has behind the file
        std::string all;
        for (int piece = 0; piece < 3; ++piece) {
            EXPECT_TRUE(Drain(driver_, xfer, all));
            EXPECT_EQ(xfer->context->chunk_left, piece == 2 ? 88U : 0U);
            xfer->context->chunk_left = piece == 0 ? 6U : 94U;
        }
        EXPECT_EQ(all, "0123456789ab");
        return true;
    };
    EXPECT_TRUE(Relay("0123456789ab" + Closing())) << seams::LogDump();
}

TEST_F(RelayUploads, ADriverIsNeverGivenMoreThanItHasRoomFor) {
    driver_.upload = [&](XferData* xfer, const Json::Value&) {
        std::string room(2 * kTail, 'x');
        EXPECT_EQ(xfer->callback(room.data(), 1, 1000, xfer->context), 1000U);
        EXPECT_EQ(room[1000], 'x');
        EXPECT_EQ(xfer->callback(room.data(), 2, 500, xfer->context), 1000U);
        EXPECT_EQ(xfer->callback(room.data(), 1, room.size(), xfer->context), kTail)
            << "no more than this at once without a speed function";
        return Drain(driver_, xfer, driver_.kept);
    };
    EXPECT_TRUE(Relay(Pattern(4 * kTail) + Closing())) << seams::LogDump();
}

TEST_F(RelayUploads, ASpeedFunctionSaysHowMuchIsTakenNext) {
    static std::vector<std::vector<unsigned long long>> told;
    static long long answer;
    told.clear();
    speed_ = [](unsigned long long last, unsigned long long current, unsigned long long total) {
        told.push_back({last, current, total});
        return answer;
    };
    const std::string request = Pattern(6 * kTail) + Closing();
    driver_.upload = [&](XferData* xfer, const Json::Value&) {
        std::string room(kTail + 1000, '\0');
        const std::pair<long long, size_t> rows[] = {
            {10, 10}, {0, room.size()}, {-5, room.size()}, {LLONG_MAX, room.size()}, {777, 777}};
        for (const auto& [said, taken] : rows) {
            answer = said;
            EXPECT_EQ(xfer->callback(room.data(), 1, room.size(), xfer->context), taken) << said;
        }
        answer = 0;
        return Drain(driver_, xfer, driver_.kept);
    };
    EXPECT_TRUE(Relay(request)) << seams::LogDump();
    EXPECT_THAT(told[0], ElementsAre(0U, 0U, request.size()));
    EXPECT_THAT(told[1], ElementsAre(10U, 10U, request.size()));
    EXPECT_THAT(told[2], ElementsAre(kTail + 1000, kTail + 1010, request.size()));
}

TEST_F(RelayUploads, ProgressIsThatOfTheRequest) {
    const std::string request = Pattern(3 * kTail) + Closing();
    EXPECT_TRUE(Relay(request)) << seams::LogDump();
    ASSERT_FALSE(Browser::progress.empty());
    EXPECT_THAT(Browser::progress.front(), Pair(kTail, request.size()));
    EXPECT_THAT(Browser::progress.back(), Pair(request.size(), request.size()));
    EXPECT_THAT(
        Browser::progress,
        Each(testing::Field(&decltype(Browser::progress)::value_type::second, request.size())));
    EXPECT_TRUE(std::is_sorted(Browser::progress.begin(), Browser::progress.end()));
}

TEST_F(RelayUploads, WhatTheWebLayerHasReadCounts) {
    const std::string request = Pattern(3 * kTail) + Closing();
    const Input input(request);
    progress_.current = 5000;
    transferred_ = 7;
    ASSERT_TRUE(Init(5000 + request.size(), -1) && Cloud::RelayUploadFile()) << seams::LogDump();
    EXPECT_EQ(driver_.kept.size(), 3 * kTail);
    EXPECT_EQ(progress_.current, 5000 + request.size());
    EXPECT_EQ(transferred_, 7 + 3 * kTail);
}

TEST_F(RelayUploads, ThroughAPipeArriveAsTheyCome) {
    const std::string file = Pattern(20 * kTail + 3);
    const relay_input::Sender sender(file + Closing());
    const Input input(sender.Get());
    ASSERT_TRUE(Init(file.size() + Closing().size(), -1) && Cloud::RelayUploadFile())
        << seams::LogDump();
    EXPECT_TRUE(driver_.kept == file);
}

TEST_F(RelayUploads, ASecondRelayOfTheProcessKnowsNothingOfTheFirst) {
    driver_.upload = [&](XferData* xfer, const Json::Value&) {
        char room[100];
        xfer->callback(room, 1, sizeof room, xfer->context);
        driver_.SetError(VFS_ERR_QUOTA_EXCEEDED, "");
        return false;
    };
    EXPECT_FALSE(Relay(Pattern(1000) + Closing(), 1000));
    EXPECT_EQ(progress_.error, -11);
    driver_.Keep();
    const std::string file = Pattern(3 * kTail);
    EXPECT_TRUE(Relay(file + Closing("--other"), -1, "--other")) << seams::LogDump();
    EXPECT_TRUE(driver_.kept == file);
    EXPECT_EQ(progress_.error, 0);
}

TEST_F(RelayUploads, EachNeedsAnInitOfItsOwn) {
    EXPECT_FALSE(Cloud::RelayUploadFile());
    EXPECT_TRUE(Relay("a" + Closing()));
    EXPECT_FALSE(Cloud::RelayUploadFile());
    EXPECT_THAT(driver_.metas, SizeIs(1));
}

}  // namespace
}  // namespace ZYROCloud
