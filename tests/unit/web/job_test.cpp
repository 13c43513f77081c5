// Records of work that runs, as other requests of the same user see them.
#include "job.h"

#include <gmock/gmock.h>
#include <sys/wait.h>
#include <unistd.h>

#include <fstream>

#include "support/machine.h"

namespace {

using namespace web;
using testing::ElementsAre;
using testing::IsEmpty;

const User kAmy{"amy", 4001};
const User kBen{"ben", 4002};
const std::string kId = "0123456789abcdef";

int StatusOf(const std::function<void()>& call) {
    try {
        call();
    } catch (const Failure& failure) {
        return failure.Status();
    }
    return 200;
}

class WebJob : public testing::Test {
  protected:
    void SetUp() override { machine::Must("rm -rf /run/zyrovfs"); }
    static std::unique_ptr<Job> Start(const std::string& id = kId) {
        return Job::Start(kAmy, JobKind::kCopy, id, "title");
    }
    static JobState StateOf(const std::string& id = kId) {
        return ReadJob(kAmy, JobKind::kCopy, id).state;
    }
};

TEST_F(WebJob, WhatOneProcessWritesAnotherReads) {
    const auto job = Start();
    ASSERT_NE(job, nullptr);
    EXPECT_EQ(StateOf(), JobState::kWaiting);
    job->Record().state = JobState::kRunning;
    job->Record().moved = 7;
    EXPECT_EQ(StateOf(), JobState::kRunning);
    EXPECT_EQ(ReadJob(kAmy, JobKind::kCopy, kId).moved, 7U);
    job->Succeed();
    EXPECT_EQ(StateOf(), JobState::kDone);
    EXPECT_THAT(JobIds(kAmy, JobKind::kCopy), ElementsAre(kId));
}

TEST_F(WebJob, EachUserAndKindHasItsOwn) {
    const auto job = Start();
    EXPECT_THAT(JobIds(kBen, JobKind::kCopy), IsEmpty());
    EXPECT_THAT(JobIds(kAmy, JobKind::kUpload), IsEmpty());
    EXPECT_EQ(StatusOf([] { ReadJob(kBen, JobKind::kCopy, kId); }), 404);
    EXPECT_EQ(StatusOf([] { CancelJob(kBen, JobKind::kCopy, kId); }), 404);
    EXPECT_EQ(StatusOf([] { RemoveJob(kBen, JobKind::kCopy, kId); }), 404);
    EXPECT_FALSE(job->IsCancelAsked());
}

TEST_F(WebJob, ACancelIsHeardByWhoDoesTheWork) {
    const auto job = Start();
    CancelJob(kAmy, JobKind::kCopy, kId);
    EXPECT_TRUE(job->IsCancelAsked());
    job->Fail(Failure(502, "Stopped", ZYROVFS::VFS_ERR_CANCELLED));
    EXPECT_EQ(StateOf(), JobState::kCancelled);
}

TEST_F(WebJob, AFailureKeepsItsWords) {
    const auto job = Start();
    job->Fail(Failure(507, std::string(600, 'x') + "ü", ZYROVFS::VFS_ERR_QUOTA_EXCEEDED));
    const Json::Value shown = DescribeFailure(ReadJob(kAmy, JobKind::kCopy, kId));
    EXPECT_EQ(shown["status"], 507);
    EXPECT_EQ(shown["name"], "VFS_ERR_QUOTA_EXCEEDED");
    EXPECT_EQ(shown["meaning"].asString(), std::string(511, 'x'));
    EXPECT_FALSE(shown["advice"].asString().empty());
}

TEST_F(WebJob, WorkWhoseProcessWasKilledHasFailed) {
    const pid_t pid = fork();
    if (pid == 0) {
        const auto job = Start();
        job->Record().state = JobState::kRunning;
        raise(SIGKILL);
    }
    waitpid(pid, nullptr, 0);
    EXPECT_EQ(StateOf(), JobState::kFailed);
    EXPECT_EQ(ReadJob(kAmy, JobKind::kCopy, kId).status, 500);
    EXPECT_EQ(StatusOf([] { RemoveJob(kAmy, JobKind::kCopy, kId); }), 200);
    EXPECT_EQ(StatusOf([] { ReadJob(kAmy, JobKind::kCopy, kId); }), 404);
}

TEST_F(WebJob, WorkThatLivesCannotBeForgotten) {
    auto job = Start();
    EXPECT_EQ(StatusOf([] { RemoveJob(kAmy, JobKind::kCopy, kId); }), 409);
    EXPECT_EQ(StatusOf([] { Start(); }), 409) << "nor begun twice";
    job.reset();
    EXPECT_EQ(StatusOf([] { RemoveJob(kAmy, JobKind::kCopy, kId); }), 200);
}

TEST_F(WebJob, WhatLivesIsCountedAndWhatHasEndedMakesRoom) {
    std::vector<std::unique_ptr<Job>> jobs;
    for (int i = 0; i < 64; ++i) {
        jobs.push_back(Start("job-" + std::to_string(100000000000 + i)));
        ASSERT_NE(jobs.back(), nullptr);
    }
    EXPECT_EQ(StatusOf([] { Start(); }), 429);
    jobs.pop_back();
    EXPECT_EQ(StatusOf([] { Start(); }), 200);
}

TEST_F(WebJob, IdsNameNoOtherFile) {
    for (const std::string& id :
         std::vector<std::string>{"", ".", "..", "../../../etc/passwd", "0123456789abcde",
                                  "0123456789abcdef/", std::string("0123456789abcdef\0", 17),
                                  std::string(65, 'a'), "0123456789abcde\n", "0123456789abcdé"}) {
        EXPECT_EQ(StatusOf([&] { Start(id); }), 422) << id;
        EXPECT_EQ(StatusOf([&] { ReadJob(kAmy, JobKind::kCopy, id); }), 422) << id;
    }
    EXPECT_EQ(StatusOf([] { CheckJobId(NewJobId()); }), 200);
    EXPECT_NE(NewJobId(), NewJobId());
}

TEST_F(WebJob, ARecordThatIsNoneIsNotRead) {
    machine::Must(
        "mkdir -p /run/zyrovfs/web/4001/copy; echo short "
        ">/run/zyrovfs/web/4001/copy/" +
        kId +
        "; ln -s /etc/passwd "
        "/run/zyrovfs/web/4001/copy/" +
        kId +
        "-link; mkfifo "
        "/run/zyrovfs/web/4001/copy/" +
        kId + "-fifo");
    EXPECT_EQ(StatusOf([] { ReadJob(kAmy, JobKind::kCopy, kId); }), 404);
    EXPECT_EQ(StatusOf([] { ReadJob(kAmy, JobKind::kCopy, kId + "-link"); }), 404);
    EXPECT_EQ(StatusOf([] { CancelJob(kAmy, JobKind::kCopy, kId); }), 200);
    EXPECT_EQ(machine::Read("/run/zyrovfs/web/4001/copy/" + kId), "short\n");
}

TEST_F(WebJob, WithoutRoomForARecordTheWorkGoesOnWithout) {
    machine::Must(
        "mkdir -p /run/zyrovfs/web/4001/copy && mount -t tmpfs -o size=4k none "
        "/run/zyrovfs/web/4001/copy && (yes >/run/zyrovfs/web/4001/copy/full "
        "2>/dev/null; true)");
    EXPECT_EQ(Start(), nullptr);
    EXPECT_THAT(machine::Must("ls /run/zyrovfs/web/4001/copy"), "full\n");
    machine::Must("umount /run/zyrovfs/web/4001/copy");
}

}  // namespace
