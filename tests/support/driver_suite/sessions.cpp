/** Uploads in sessions: what may go wrong at each of their steps. A small file takes the same steps
 * as a large one. */
#include <unistd.h>

#include <algorithm>

#include "support/driver_suite.h"
#include "support/seams.h"

namespace driver_suite {
namespace {

constexpr const char* kText = "hello in a session";

}  // namespace

bool DriverSessions::UploadBySession(Source& source) {
    Json::Value meta(Json::objectValue);
    EXPECT_TRUE(cloud->GetMetaDataByURI(Uri("/up.txt"), meta, "Upload")) << seams::LogDump();
    meta["total_bytes"] = meta["filesize"] = static_cast<Json::Int64>(source.size);
    XferContext context;
    context.fd = source.file.Get();
    XferData xfer{[](char* to, size_t size, size_t count, void* data) {
                      auto& now = *static_cast<XferContext*>(data);
                      size_t want = size * count;
                      want = now.limited ? std::min<size_t>(want, now.chunk_left) : want;
                      const ssize_t got = read(now.fd, to, want);
                      now.chunk_left -= now.limited ? static_cast<unsigned>(got) : 0;
                      return static_cast<size_t>(got);
                  },
                  1, &context};
    return rig->SendInSession(*cloud, xfer, meta);
}

void DriverSessions::ExpectAt(const SessionStep& step, const Fault& fault, bool success) {
    Restore();
    Add(fault);
    Source source(kText);
    EXPECT_EQ(UploadBySession(source), success)
        << step.name << " " << fault.Text() << seams::LogDump() << sim.Journal().Text();
    // Whatever happens, nobody sees half a file.
    const std::string stored = TextOf("/up.txt");
    EXPECT_TRUE(stored == kText || (!success && !amy.Exists("/up.txt"))) << step.name << stored;
}

TEST_P(DriverSessions, CarryAFile) {
    if (rig->SessionSteps().empty()) {
        GTEST_SKIP() << "no sessions";
    }
    for (const long long size : {1LL, 23LL, 4096LL}) {
        Restore();
        Source source(size);
        EXPECT_TRUE(UploadBySession(source)) << size << seams::LogDump() << sim.Journal().Text();
        EXPECT_EQ(SumOf("/up.txt"), source.sum) << size;
    }
}

TEST_P(DriverSessions, MeetAPassingStatusAtEachStep) {
    for (const SessionStep& step : rig->SessionSteps()) {
        const Fault at = Fault::On(step.at.method, step.at.path).After(step.after);
        ExpectAt(step, Fault(at).Answer(503), step.repeats);
    }
}

TEST_P(DriverSessions, MeetAStatusThatStaysAtEachStep) {
    for (const SessionStep& step : rig->SessionSteps()) {
        const Fault at = Fault::On(step.at.method, step.at.path).After(step.after);
        for (const StatusCase& row : can.statuses) {
            const bool passes = row.passing || row.code == VFS_ERR_RANGE_FAILED;
            if (!passes && row.body == "{}") {
                ExpectAt(step, Fault(at).Answer(row.status), false);
            }
        }
    }
}

TEST_P(DriverSessions, LoseTheAnswerOfEachStep) {
    for (const SessionStep& step : rig->SessionSteps()) {
        const Fault at = Fault::On(step.at.method, step.at.path).After(step.after);
        ExpectAt(step, Fault(at).LoseAnswer(), step.survives_loss);
    }
}

TEST_P(DriverSessions, HaveTheirTokenRefusedAtEachStep) {
    for (const SessionStep& step : rig->SessionSteps()) {
        const Fault at = Fault::On(step.at.method, step.at.path).After(step.after);
        ExpectAt(step, Fault(at).ExpireToken(), can.renews_tokens);
    }
}

}  // namespace driver_suite
