/** What may go wrong with any request of any service. */
#include <cstring>

#include "support/driver_suite.h"
#include "support/seams.h"

namespace driver_suite {
namespace {

using testing::IsEmpty;

constexpr const char* kNoJson[] = {"<html>", "{", "\"", "{\"a\":}", "\xff\xfe"};

/** Requests that an operation makes in all before it gives up. */
int MostTries(Op op) {
    return op == Op::kUpload || op == Op::kDownload ? 6 : 7;
}

}  // namespace

TEST_P(DriverFaults, AStatusThatPassesIsWaitedForAndAskedAgain) {
    for (const StatusCase& row : can.statuses) {
        for (const Op op : kAllOps) {
            if (!row.passing) {
                continue;
            }
            Restore();
            Add(On(op).Times(2).Answer(row.status, row.body));
            EXPECT_TRUE(Run(op)) << op << row.status << seams::LogDump();
            EXPECT_EQ(Count(op), 3U) << op << row.status << sim.Journal().Text();
            EXPECT_GE(seams::Sleeps().size(), 2U) << op << row.status;
        }
    }
}

TEST_P(DriverFaults, AStatusThatStaysIsAFailureInTheEnd) {
    for (const StatusCase& row : can.statuses) {
        for (const Op op : kAllOps) {
            const bool detail_is_lost = op == Op::kDownload && row.body != "{}";
            if (detail_is_lost || (op == Op::kDelete && row.code == VFS_ERR_NOT_FOUND)) {
                continue;
            }
            Restore();
            const int tries = row.passing ? MostTries(op) : 1;
            Add(On(op).Times(tries).Answer(row.status, row.body));
            EXPECT_FALSE(Run(op)) << op << row.status;
            EXPECT_EQ(Code(), row.code) << op << row.status << seams::LogDump();
            EXPECT_EQ(Count(op), static_cast<size_t>(tries)) << op << row.status;
            EXPECT_EQ(seams::Sleeps().empty(), !row.passing) << op << row.status;
            EXPECT_TRUE(amy.Exists("/docs/a.txt")) << op << row.status;
        }
    }
}

TEST_P(DriverFaults, AConnectionThatBreaksBeforeAnythingTookPlaceIsMadeAnew) {
    for (const cloudsim::Break when : {cloudsim::Break::kBeforeBody, cloudsim::Break::kAfterBody}) {
        for (const Op op : kAllOps) {
            Restore();
            Add(On(op).Close(when));
            const bool done = Run(op);
            // A body that is on its way when the connection goes may also be a failure to send,
            // which is final.
            if (op == Op::kUpload && when == cloudsim::Break::kBeforeBody && !done) {
                EXPECT_FALSE(amy.Exists("/up.txt"));
                EXPECT_TRUE(seams::LoggedPart("curl code=55")) << seams::LogDump();
                continue;
            }
            EXPECT_TRUE(done) << op << seams::LogDump();
            EXPECT_EQ(Count(op), 2U) << op << sim.Journal().Text();
        }
    }
}

TEST_P(DriverFaults, AReadWhoseAnswerIsLostIsMadeAgain) {
    for (const Op op : {Op::kAccount, Op::kInfo, Op::kList, Op::kDownload}) {
        Restore();
        Add(On(op).LoseAnswer());
        EXPECT_TRUE(Run(op)) << op << seams::LogDump();
        EXPECT_EQ(Count(op), 2U) << op << sim.Journal().Text();
    }
}

TEST_P(DriverFaults, AChangeWhoseAnswerIsLostHasTakenPlace) {
    Add(On(Op::kRename).LoseAnswer());
    EXPECT_EQ(Run(Op::kRename), can.renames_twice) << seams::LogDump();
    EXPECT_EQ(TextOf("/docs/b.txt"), kDigits);
    Restore();
    Add(On(Op::kMove).LoseAnswer());
    EXPECT_EQ(Run(Op::kMove), can.moves_twice) << seams::LogDump();
    EXPECT_EQ(TextOf("/target/a.txt"), kDigits);
    EXPECT_FALSE(amy.Exists("/docs/a.txt"));
    Restore();
    Add(On(Op::kDelete).LoseAnswer());
    EXPECT_EQ(Run(Op::kDelete), can.deletes_twice) << seams::LogDump();
    EXPECT_FALSE(amy.Exists("/docs/a.txt"));
    Restore();
    Add(On(Op::kCreate).LoseAnswer());
    EXPECT_EQ(Run(Op::kCreate), !can.create_refuses_namesake) << seams::LogDump();
    EXPECT_TRUE(amy.Exists("/docs/new"));
}

TEST_P(DriverFaults, ACopyWhoseAnswerIsLostIsThere) {
    Add(On(Op::kCopy).LoseAnswer());
    EXPECT_TRUE(Run(Op::kCopy)) << seams::LogDump();
    EXPECT_EQ(TextOf("/target/a.txt"), kDigits);
    EXPECT_EQ(TextOf("/docs/a.txt"), kDigits);
    EXPECT_EQ(amy.List(amy.Find("/target")).size(),
              can.copy_onto_file == Meeting::kBeside ? 2U : 1U);
}

TEST_P(DriverFaults, AnUploadWhoseAnswerIsLostHasItsBytesThere) {
    Add(On(Op::kUpload).LoseAnswer());
    if (!Run(Op::kUpload)) {
        EXPECT_EQ(Code(), VFS_ERR_CONFLICT) << "with itself" << seams::LogDump();
    }
    EXPECT_EQ(TextOf("/up.txt"), "hello");
    EXPECT_EQ(Count(Op::kUpload), 2U);
}

TEST_P(DriverFaults, AnAnswerThatIsNoJsonIsAFailureOfTheCloud) {
    for (const char* body : kNoJson) {
        for (const Op op : {Op::kAccount, Op::kInfo, Op::kList}) {
            Restore();
            Add(On(op).Times(can.repeats_bad_answers ? 6 : 1).Body(body));
            EXPECT_FALSE(Run(op)) << op << body;
            EXPECT_EQ(Code(), VFS_ERR_CLOUD_FAILED) << op;
            EXPECT_TRUE(seams::LoggedPart("Failed to parse re")) << op << seams::LogDump();
        }
    }
}

TEST_P(DriverFaults, AnAnswerOfAnotherShapeEndsNothingButTheOperation) {
    for (const char* body : {"null", "7", "\"text\"", "[]", "[1,[2]]", "{}", "{\"entries\":7}",
                             "{\"items\":{}}", "{\"data\":7}", "{\"error\":[]}"}) {
        for (const Op op : kAllOps) {
            if (op == Op::kDownload) {
                continue;
            }
            Restore();
            Add(On(op).Answer(200, body));
            if (!Run(op)) {
                EXPECT_EQ(Code(), VFS_ERR_CLOUD_FAILED) << op << body << seams::LogDump();
            }
            EXPECT_TRUE(Run(Op::kInfo)) << op << body << seams::LogDump();
        }
    }
}

TEST_P(DriverFaults, AnAnswerThatBreaksOffIsNotTakenForWhole) {
    for (const Op op : {Op::kAccount, Op::kInfo, Op::kList}) {
        Restore();
        Add(On(op).CutAnswer(5));
        EXPECT_EQ(Run(op), can.repeats_bad_answers) << op << seams::LogDump();
    }
}

TEST_P(DriverFaults, HeaderLinesOfAnyKindDoNotEndTheOperation) {
    for (const char* line : {": no name", "No-Value:", "Odd: \x01\xff\x80", ""}) {
        Restore();
        if (*line == '\0') {
            Add(On(Op::kInfo).HeaderLine("Long: " + std::string(60000, 'x')));
        } else {
            Add(On(Op::kInfo).HeaderLine(line));
        }
        EXPECT_TRUE(Run(Op::kInfo)) << line << seams::LogDump();
    }
}

TEST_P(DriverFaults, ASourceThatIsShorterThanAnnouncedIsNotStored) {
    Source source(1000);
    source.size = 2000;
    EXPECT_FALSE(Upload(source, "/up.bin"));
    EXPECT_EQ(Code(), VFS_ERR_TRANSFER_ABORTED) << seams::LogDump();
    EXPECT_FALSE(amy.Exists("/up.bin"));
    EXPECT_TRUE(seams::LoggedPart("The file ended 1000 bytes before its size"));
}

TEST_P(DriverFaults, ASourceThatIsLongerThanAnnouncedIsSentAsAnnounced) {
    Source source("hello and more");
    source.size = 5;
    EXPECT_TRUE(Upload(source, "/up.txt")) << seams::LogDump();
    EXPECT_EQ(TextOf("/up.txt"), "hello");
}

TEST_P(DriverFaults, AnUploadFromAStreamIsNotRepeated) {
    Add(On(Op::kUpload).Answer(503));
    Json::Value meta(Json::objectValue);
    EXPECT_TRUE(cloud->GetMetaDataByURI(Uri("/up.txt"), meta, "Upload")) << seams::LogDump();
    meta["total_bytes"] = meta["filesize"] = 5;
    XferContext context;
    XferData xfer{[](char* to, size_t, size_t, void*) {
                      const bool first = User::asked++ == 0;
                      memcpy(to, "hello", 5);
                      return first ? size_t{5} : size_t{0};
                  },
                  1, &context};
    EXPECT_FALSE(cloud->Upload(&xfer, meta));
    EXPECT_EQ(Count(Op::kUpload), 1U) << sim.Journal().Text();
    EXPECT_FALSE(amy.Exists("/up.txt"));
}

TEST_P(DriverFaults, ADownloadThatBreaksOffGoesOnWhereItStopped) {
    amy.AddPattern(amy.Find("/target"), "big", 5 * kMiB, 3);
    Show("/target/big");
    Endpoint at = rig->At(Op::kContent);
    Add(Fault::On(at.method, rig->ContentOf("/target/big")).CutAnswer(3 * kMiB));
    EXPECT_TRUE(Download("/target/big", 5 * kMiB)) << seams::LogDump();
    EXPECT_EQ(received.Sum(), SumOf("/target/big"));
    EXPECT_THAT(sim.Journal().All().back().Header("Range"), testing::StartsWith("bytes=3145728-"))
        << sim.Journal().Text();
}

TEST_P(DriverFaults, ADownloadThatGainsTooLittleEnds) {
    amy.AddPattern(amy.Find("/target"), "big", 5 * kMiB, 3);
    Show("/target/big");
    Add(Fault::On(rig->At(Op::kContent).method, rig->ContentOf("/target/big")).CutAnswer(1000));
    EXPECT_FALSE(Download("/target/big", 5 * kMiB));
    EXPECT_TRUE(seams::Logged("Size is wrong, 1000, 5242880")) << seams::LogDump();
}

TEST_P(DriverFaults, APartThatIsNotTheOneAskedForIsNotTaken) {
    for (const cloudsim::RangeFault kind :
         {cloudsim::RangeFault::kIgnore, cloudsim::RangeFault::kWrongStart,
          cloudsim::RangeFault::kShort}) {
        Restore();
        Add(On(Op::kContent).Range(kind));
        char buffer[32] = "";
        long long got = -1;
        EXPECT_FALSE(Cloud::DownloadFileToBuffer(cloud.get(), rig->Address("/docs/a.txt"), buffer,
                                                 4, 4, &got, nullptr, nullptr, nullptr))
            << static_cast<int>(kind) << seams::LogDump();
        EXPECT_EQ(got, -1);
    }
}

}  // namespace driver_suite
