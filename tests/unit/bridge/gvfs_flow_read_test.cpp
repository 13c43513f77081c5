// What the downloads of all services have in common.
#include "bridge/gvfs_flow_read.h"

#include "bridge/handle.h"
#include "core/loggable_url.h"
#include "support/backend.h"

namespace backend {
namespace {

using cloudsim::RangeFault;

constexpr const char* kLetters = "abcdefghijklmnopqrstuvwxyz";

class FlowRead : public EachBackend {
  protected:
    void SetUp() override {
        EachBackend::SetUp();
        id = amy.AddPath("/a.txt", kLetters);
    }
    /** The file as if its record told this size. */
    UniqueHandle OpenWithSize(long long size) {
        EXPECT_EQ(List(rig->Top()), 1) << seams::LogDump();
        GFileInfo* const info = Seen("a.txt");
        g_file_info_set_size(info, size);
        return UniqueHandle(
            ZYROCloud_Cloud_Handle_New(server_id.c_str(), IdOf(info).c_str(), info));
    }
    /** "none", and the ranges that contents were asked for. */
    std::vector<std::string> Ranges() const {
        std::vector<std::string> ranges = {"none"};
        for (const cloudsim::JournalEntry& entry : sim.Journal().All()) {
            if (!entry.Header("Range").empty()) {
                ranges.push_back(entry.Header("Range"));
            }
        }
        return ranges;
    }
    std::string id;
};

TEST_P(FlowRead, GoesThroughAFileInPiecesToItsEnd) {
    for (const long long piece : {1LL, 4LL, 25LL, 26LL, 27LL, kMiB}) {
        EXPECT_EQ(ReadAll(Open("a.txt"), piece), kLetters) << piece << seams::LogDump();
    }
    EXPECT_EQ(err, kUntouched);
}

TEST_P(FlowRead, GivesTheOneByteMoreThatServicesAreAskedForAndMovesByWhatCame) {
    const UniqueHandle handle = Open("a.txt");
    EXPECT_EQ(Read(handle, 4), 5);
    EXPECT_EQ(bytes, "abcde");
    EXPECT_EQ(handle->position, 5);
    EXPECT_EQ(Read(handle, 4), 5);
    EXPECT_EQ(bytes, "fghij");
    EXPECT_EQ(handle->position, 10);
    EXPECT_EQ(Ranges().at(1), "bytes=0-4");
    EXPECT_EQ(Ranges().back(), "bytes=5-9");
}

/** As a backend reads: from the handle's buffer, which downloads refill. */
TEST_P(FlowRead, ThroughTheBufferOfItsHandleLosesNoByteAndKeepsInsideOfIt) {
    amy.AddPattern(amy.Root(), "large", 2 * ZYROCloud_Handle::kBufferBytes + 100, 7);
    const UniqueHandle handle = Open("large");
    const std::string expected = amy.Bytes(amy.Find("/large"));
    ASSERT_EQ(ZYROCloud_FileHandle_Buf_Init(handle.get()), 1);
    ZYROCloud_FileHandle_Buf_SetBufSize(handle.get(), 4 * ZYROCloud_Handle::kBufferBytes);
    std::string all;
    for (;;) {
        char* buffer = ZYROCloud_FileHandle_Buf_Get(handle.get());
        const long long got = rig->Read(handle.get(), &buffer,
                                        ZYROCloud_FileHandle_Buf_GetBufSize(handle.get()), &err);
        ASSERT_LE(got, ZYROCloud_Handle::kBufferRoom);
        if (got <= 0) {
            break;
        }
        ZYROCloud_FileHandle_Buf_Reset(handle.get(), got);
        std::string piece(1000001, '#');
        char* dest = piece.data();
        for (long long filled = 1; filled > 0;) {
            filled = ZYROCloud_FileHandle_Buf_Fill(handle.get(), &dest, 1000001);
            all.append(piece, 0, static_cast<size_t>(filled));
        }
    }
    EXPECT_TRUE(all == expected) << all.size() << seams::LogDump();
}

TEST_P(FlowRead, AtTheSizeOfTheRecordIsTheEndWithoutARequest) {
    const UniqueHandle handle = Open("a.txt");
    EXPECT_EQ(ReadAll(handle, 100), kLetters);
    sim.Journal().Clear();
    EXPECT_EQ(Read(handle, 100), 0);
    EXPECT_EQ(Read(handle, 100), 0);
    EXPECT_THAT(Requests(), IsEmpty());
    EXPECT_EQ(err, kUntouched);
}

TEST_P(FlowRead, OfAnEmptyFileIsItsEnd) {
    amy.AddPath("/empty", "");
    const UniqueHandle handle = Open("empty");
    sim.Journal().Clear();
    EXPECT_EQ(Read(handle, 100), 0);
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_P(FlowRead, OfNothingIsNothing) {
    const UniqueHandle handle = Open("a.txt");
    sim.Journal().Clear();
    EXPECT_EQ(Read(handle, 0), 0);
    EXPECT_EQ(handle->position, 0);
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_P(FlowRead, BehindTheEndOfAFileThatShrankIsTheEnd) {
    const UniqueHandle handle = OpenWithSize(1000);
    EXPECT_EQ(ReadAll(handle, 10), kLetters) << seams::LogDump();
    EXPECT_EQ(handle->position, 26);
    sim.AddFault(rig->OnContent().Answer(416, ""));
    EXPECT_EQ(Read(handle, 10), 0);
    EXPECT_EQ(err, kUntouched);
}

TEST_P(FlowRead, OfAFileThatGrewEndsAtTheSizeThatItHadWhenItWasOpened) {
    const UniqueHandle handle = OpenWithSize(10);
    EXPECT_EQ(Read(handle, 5), 6);
    EXPECT_EQ(Read(handle, 5), 6);  // the end lies in this piece
    EXPECT_EQ(Read(handle, 5), 0);
}

TEST_P(FlowRead, OfAFileThatVanishedFails) {
    const UniqueHandle handle = Open("a.txt");
    EXPECT_EQ(Read(handle, 4), 5);
    amy.Remove(id);
    EXPECT_EQ(Read(handle, 4), -1);
    EXPECT_NE(err, kUntouched);
    EXPECT_EQ(handle->position, 5);
    EXPECT_TRUE(seams::LoggedPart("Failed to download [" + ZYROVFS::LoggableUrl(handle->url) +
                                  "] to buffer from:5, len:4"))
        << seams::LogDump();
}

TEST_P(FlowRead, TakesNoBytesFromAnotherPlaceThanAskedFor) {
    const UniqueHandle handle = Open("a.txt");
    EXPECT_EQ(Read(handle, 4), 5);
    for (const RangeFault fault : {RangeFault::kIgnore, RangeFault::kWrongStart}) {
        sim.AddFault(rig->OnContent().Range(fault));
        EXPECT_EQ(Read(handle, 4), -1) << static_cast<int>(fault);
        EXPECT_EQ(handle->position, 5);
    }
    EXPECT_EQ(Read(handle, 4), 5) << seams::LogDump();
    EXPECT_EQ(bytes, "fghij");
}

TEST_P(FlowRead, TakesAWholeBodyForAPieceOnlyAsFarAsThereIsRoom) {
    const UniqueHandle handle = Open("a.txt");
    sim.AddFault(rig->OnContent().Range(RangeFault::kIgnore));
    std::string room(32, '#');
    char* dest = room.data();
    EXPECT_EQ(rig->Read(handle.get(), &dest, 4, &err), -1);
    EXPECT_EQ(room.substr(5), std::string(27, '#'));
    sim.AddFault(rig->OnContent().Range(RangeFault::kIgnore));
    EXPECT_EQ(rig->Read(handle.get(), &dest, 26, &err), 26) << seams::LogDump();
    EXPECT_EQ(room.substr(0, 26), kLetters);
}

TEST_P(FlowRead, WithATokenThatIsRefusedOnTheWayRenewsItOnceAndGoesOn) {
    const UniqueHandle handle = Open("a.txt");
    EXPECT_EQ(Read(handle, 4), 5);
    amy.ExpireAccessTokens();
    if (!rig->Renews()) {
        EXPECT_EQ(Read(handle, 4), -1);
        EXPECT_EQ(err, G_IO_ERROR_CONNECTION_REFUSED);
        return;
    }
    const std::string before = amy.LastTokens().access_token;
    EXPECT_EQ(ReadAll(handle, 4), "fghijklmnopqrstuvwxyz") << seams::LogDump();
    EXPECT_EQ(err, kUntouched);
    EXPECT_NE(amy.LastTokens().access_token, before);
    size_t renewals = 0;
    for (const std::string& request : Requests()) {
        renewals += request.find("token") != std::string::npos ? 1 : 0;
    }
    EXPECT_EQ(renewals, 1U) << sim.Journal().Text();
}

TEST_P(FlowRead, GoesOnWhenTheConnectionIsGone) {
    const UniqueHandle handle = Open("a.txt");
    EXPECT_EQ(Read(handle, 4), 5);
    Disconnect();
    EXPECT_EQ(Read(handle, 4), 5) << seams::LogDump();
    if (rig->Renews()) {
        amy.ExpireAccessTokens();
        EXPECT_EQ(Read(handle, 4), 5) << seams::LogDump();
    }
}

TEST_P(FlowRead, OfAHandleThatWasMadeWithoutAConnectionFails) {
    EXPECT_EQ(List(rig->Top()), 1);
    Disconnect();
    const UniqueHandle handle(
        ZYROCloud_Cloud_Handle_New(server_id.c_str(), "/a.txt", Seen("a.txt")));
    ASSERT_NE(handle, nullptr);
    EXPECT_EQ(Read(handle, 4), -1);
    EXPECT_EQ(err, kUntouched);
    EXPECT_TRUE(seams::Logged("Failed to create cloud")) << seams::LogDump();
}

TEST_P(FlowRead, OfAHandleOfAnotherServiceSendsNobodyAToken) {
    EXPECT_EQ(List(rig->Top()), 1);
    const UniqueHandle handle(
        ZYROCloud_Cloud_Handle_New(server_id.c_str(), "/a.txt", Seen("a.txt")));
    sim.Journal().Clear();
    char* dest = bytes.data();
    const auto other =
        rig->Protocol() == "box" ? ZYROCloud_Cloud_OneDrive_Download : ZYROCloud_Cloud_Box_Download;
    EXPECT_EQ(other(handle.get(), kUnused, kUnused, &dest, 1, &err), -1);
    EXPECT_THAT(Requests(), IsEmpty());
}

TEST_P(FlowRead, TakesNoFailureForThatOfAnEarlierRead) {
    const UniqueHandle handle = OpenWithSize(1000);
    sim.AddFault(rig->OnContent().Answer(416, ""));
    EXPECT_EQ(Read(handle, 4), 0);
    handle->cloud->SetError(VFS_ERR_CANCELLED, "");
    EXPECT_EQ(Read(handle, 4), 5) << seams::LogDump();
    sim.AddFault(rig->OnContent().Answer(416, ""));
    EXPECT_EQ(Read(handle, 4), 0);
    amy.ExpireAccessTokens();
    amy.RevokeRefreshTokens();
    EXPECT_EQ(Read(handle, 4), -1);
    EXPECT_NE(err, kUntouched);
}

TEST_P(FlowRead, BehindFourGiBAsksForThatPlace) {
    const UniqueHandle handle = OpenWithSize(1LL << 40);
    handle->position = 5368709120;
    EXPECT_EQ(Read(handle, 4), 0);
    EXPECT_EQ(Ranges().back(), "bytes=5368709120-5368709124");
}

TEST_P(FlowRead, WithoutAnArgumentThatItNeedsIsRefused) {
    const UniqueHandle handle = Open("a.txt");
    const UniqueHandle bare(ZYROCloud_Cloud_Handle_New(server_id.c_str(), "/a.txt", nullptr));
    sim.Journal().Clear();
    char* dest = bytes.data();
    char* nowhere = nullptr;
    EXPECT_EQ(rig->Read(nullptr, &dest, 4, &err), -1);
    EXPECT_EQ(rig->Read(bare.get(), &dest, 4, &err), -1);
    EXPECT_EQ(rig->Read(handle.get(), nullptr, 4, &err), -1);
    EXPECT_EQ(rig->Read(handle.get(), &nowhere, 4, &err), -1);
    EXPECT_EQ(rig->Read(handle.get(), &dest, -1, &err), -1);
    EXPECT_EQ(err, kUntouched);
    EXPECT_TRUE(seams::Logged("Wrong parameters")) << seams::LogDump();
    EXPECT_THAT(Requests(), IsEmpty());
    amy.Remove(id);
    bytes.resize(8);
    dest = bytes.data();
    EXPECT_EQ(rig->Read(handle.get(), &dest, 4, nullptr), -1);
}

TEST_P(FlowRead, WithoutTheUnusedArgumentsIsRefused) {
    const UniqueHandle handle = Open("a.txt");
    sim.Journal().Clear();
    char* dest = bytes.data();
    for (const auto download : {ZYROCloud_Cloud_Box_Download, ZYROCloud_Cloud_OneDrive_Download,
                                ZYROCloud_Cloud_Google_Download}) {
        EXPECT_EQ(download(handle.get(), nullptr, kUnused, &dest, 1, &err), -1);
        EXPECT_EQ(download(handle.get(), kUnused, nullptr, &dest, 1, &err), -1);
    }
    EXPECT_EQ(ZYROCloud_Cloud_Dropbox_Download(handle.get(), nullptr, kUnused, &dest, 1, &err), -1);
    EXPECT_EQ(ZYROCloud_Cloud_Dropbox_Download(handle.get(), "p", nullptr, &dest, 1, &err), -1);
    EXPECT_THAT(Requests(), IsEmpty());
}

}  // namespace

RUN_FOR_EACH_BACKEND(FlowRead);

}  // namespace backend
