// `zyrovfs task` as people and scripts use it: commands that wait for their turn, what they print
// and pass on, and what is left when they are interrupted.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

#include <filesystem>

#include "support/locations.h"
#include "support/machine.h"

namespace {

using machine::Eventually;
using machine::Outcome;
using machine::Read;
using testing::AllOf;
using testing::HasSubstr;

const std::string kTool = BuildDir() + "/tools/zyrovfs/zyrovfs";
const std::string kQueue = "/var/tmp/user/4001/zyrovfs/task/copy/copy";

Outcome Task(const std::string& arguments) {
    return machine::Run(kTool + " task " + arguments);
}

/** A `task run` in the background, its output in a file. */
class Job {
  public:
    Job(const std::string& id, const std::string& command, const std::string& options = "")
        : output_("/tmp/job-" + id) {
        std::filesystem::remove(output_);
        fflush(nullptr);
        pid_ = fork();
        if (pid_ == 0) {
            // A group of its own, as a shell with job control gives it.
            setpgid(0, 0);
            const std::string line = "exec " + kTool + " task run copy --uid 4001 --id " + id +
                                     " " + options + " -- " + command + " >" + output_ + " 2>&1";
            execl("/bin/sh", "sh", "-c", line.c_str(), nullptr);
            _exit(1);
        }
        setpgid(pid_, pid_);
    }
    Job(const Job&) = delete;
    Job& operator=(const Job&) = delete;
    ~Job() {
        if (pid_ > 0) {
            kill(-pid_, SIGKILL);
            waitpid(pid_, nullptr, 0);
        }
    }

    int End() {
        int status = 0;
        waitpid(pid_, &status, 0);
        pid_ = -1;
        return WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status);
    }
    pid_t pid() const { return pid_; }
    std::string Output() const { return Read(output_); }
    bool Says(const std::string& text) const {
        return Eventually([&] { return Output().find(text) != std::string::npos; });
    }

  private:
    std::string output_;
    pid_t pid_ = -1;
};

class ToolTask : public testing::Test {
  protected:
    static void SetUpTestSuite() { machine::AddUser("amy", 4001); }
    void SetUp() override {
        std::filesystem::remove_all("/var/tmp/user/4001");
        machine::Run("rm -f /tmp/job-* /tmp/go-*");
    }
    /** A command that tells its start and runs until a file lets it go. */
    static std::string Until(const std::string& file) {
        return "sh -c 'echo started; until [ -e " + file + " ]; do sleep 0.02; done'";
    }
    static void LetGo(const std::string& file) { std::ofstream{file}; }
};

TEST_F(ToolTask, ACommandRunsAsTheUserAndItsStatusAndOutputArePassedOn) {
    const Outcome outcome =
        Task("run copy --user amy -- sh -c 'id -u; id -G; echo $HOME; echo list --json; exit 7'");
    EXPECT_EQ(outcome.status, 7);
    EXPECT_EQ(outcome.output, "4001\n100\n/home/amy\nlist --json\n");
    EXPECT_EQ(Read(kQueue), "");
    EXPECT_EQ(Task("run copy --user amy -- sh -c 'kill -9 $$'").status, 128 + 9);
}

TEST_F(ToolTask, ACommandThatCannotBeRunEndsAsInAShell) {
    EXPECT_EQ(Task("run copy --user amy -- /no/such/program").status, 127);
    const Outcome outcome = Task("run copy --user amy -- /etc/passwd");
    EXPECT_EQ(outcome.status, 126);
    EXPECT_EQ(outcome.output, "zyrovfs: /etc/passwd: Permission denied\n");
    EXPECT_EQ(Read(kQueue), "");
}

TEST_F(ToolTask, TheFourthOfFourWaitsAndShowsItsPlaceUntilOneEnds) {
    Job first("1", Until("/tmp/go-1"));
    Job second("2", Until("/tmp/go-2"));
    Job third("3", Until("/tmp/go-3"));
    for (const Job* job : {&first, &second, &third}) {
        ASSERT_TRUE(job->Says("started\n"));
    }
    Job fourth("4", Until("/tmp/go-4"));
    ASSERT_TRUE(fourth.Says("copy: waiting at place 4, 3 may run at once\n"));
    const std::string list = Task("list copy --user amy").output;
    EXPECT_THAT(list, HasSubstr("copy   4      4   " + std::to_string(fourth.pid())));

    LetGo("/tmp/go-2");
    EXPECT_EQ(second.End(), 0);
    ASSERT_TRUE(fourth.Says("copy: running\nstarted\n"));
    for (const char* number : {"1", "3", "4"}) {
        LetGo(std::string("/tmp/go-") + number);
    }
    EXPECT_EQ(first.End(), 0);
    EXPECT_EQ(third.End(), 0);
    EXPECT_EQ(fourth.End(), 0);
    EXPECT_EQ(Read(kQueue), "");
    EXPECT_EQ(Task("list --user amy").output, "There are no tasks to show.\n");
}

TEST_F(ToolTask, CtrlCWhileWaitingLeavesNothingBehind) {
    Job first("1", Until("/tmp/go-1"), "--limit 1");
    ASSERT_TRUE(first.Says("started\n"));
    for (const int signal : {SIGINT, SIGTERM, SIGHUP}) {
        Job second("2", "touch /tmp/job-was-run", "--limit 1");
        ASSERT_TRUE(second.Says("waiting at place 2, 1 may run at once\n"));
        kill(-second.pid(), signal);
        EXPECT_EQ(second.End(), 128 + signal);
        EXPECT_EQ(Read(kQueue), "1\t" + std::to_string(first.pid()) + "\n");
    }
    EXPECT_FALSE(std::filesystem::exists("/tmp/job-was-run"));
}

TEST_F(ToolTask, CtrlCWhileTheCommandRunsEndsItAndLeavesNothingBehind) {
    Job job("1", Until("/tmp/go-1"));
    ASSERT_TRUE(job.Says("started\n"));
    kill(-job.pid(), SIGINT);
    EXPECT_EQ(job.End(), 128 + SIGINT);
    EXPECT_EQ(Read(kQueue), "");
    EXPECT_NE(machine::Run("pgrep -f [g]o-1").status, 0);
}

TEST_F(ToolTask, ASignalToTheToolAloneReachesTheCommand) {
    Job job("1",
            "sh -c 'trap \"echo asked to end; exit 5\" TERM; echo started; "
            "while :; do sleep 0.02; done'");
    ASSERT_TRUE(job.Says("started\n"));
    kill(job.pid(), SIGTERM);
    EXPECT_EQ(job.End(), 5);
    EXPECT_THAT(job.Output(), HasSubstr("asked to end\n"));
    EXPECT_EQ(Read(kQueue), "");
}

TEST_F(ToolTask, AKilledToolTakesItsCommandAlongAndItsPlaceIsFree) {
    Job first("1", "sleep 1000", "--limit 1");
    ASSERT_TRUE(Eventually([] { return machine::Run("pgrep -x sleep").status == 0; }));
    kill(first.pid(), SIGKILL);
    first.End();
    EXPECT_TRUE(Eventually([] { return machine::Run("pgrep -x sleep").status != 0; }));
    EXPECT_EQ(Task("run copy --uid 4001 --limit 1 -- true").status, 0);
    EXPECT_THAT(Task("list copy --uid 4001").output, HasSubstr("ended"));
    EXPECT_EQ(Task("clean copy --uid 4001").output, "Jobs left in copy: 0.\n");
}

TEST_F(ToolTask, AProcessThatRunsAlreadyCanBeAdded) {
    const std::string me = std::to_string(getpid());
    EXPECT_EQ(Task("add copy mine --uid 4001 --pid " + me).output, "Added mine to copy.\n");
    EXPECT_EQ(Read(kQueue), "mine\t" + me + "\n");
    EXPECT_THAT(Task("list --uid 4001 --json").output,
                AllOf(HasSubstr("\"id\" : \"mine\""), HasSubstr("\"place\" : 1"),
                      HasSubstr("\"pid\" : " + me), HasSubstr("\"alive\" : true")));
    const Outcome dead = Task("add copy other --uid 4001 --pid 999999999");
    EXPECT_EQ(dead.status, 1);
    EXPECT_EQ(dead.output, "zyrovfs: There is no process 999999999.\n");
}

TEST_F(ToolTask, BadUseIsRefusedAndNothingMade) {
    for (const char* arguments :
         {"run a/b --uid 4001 -- true", "run .. --uid 4001 -- true", "run '' --uid 4001 -- true",
          "run copy --uid 4001", "run copy -- true", "run copy --uid 4001 --limit 0 -- true",
          "run copy --uid 4001 --id 'a\tb' -- true", "add copy --uid 4001", "clean --uid 4001"}) {
        EXPECT_EQ(Task(arguments).status, 2) << arguments;
    }
    EXPECT_FALSE(std::filesystem::exists("/var/tmp/user/4001"));
}

TEST_F(ToolTask, AQueueThatCannotBeMadeOrReadFailsTheCommandUnrun) {
    machine::Must("mkdir -p /var/tmp/user && mount -t tmpfs -o ro none /var/tmp/user");
    const Outcome outcome = Task("run copy --uid 4001 -- echo run");
    machine::Must("umount /var/tmp/user");
    EXPECT_EQ(outcome.status, 1);
    EXPECT_EQ(outcome.output,
              "zyrovfs: The queue copy cannot be written; the system log tells why.\n");
    machine::Must("mkdir -p " + kQueue);
    EXPECT_EQ(Task("list --uid 4001").status, 1);
}

}  // namespace
