#include <fcntl.h>
#include <sys/stat.h>
#include <zosplatform/error.h>
#include <zosplatform/process.h>

#include <csignal>

#include "support/scratch.h"

namespace {

constexpr const char* kShell = "/bin/sh";

class Exec : public scratch::ScratchTest {
  protected:
    void TearDown() override { signal(SIGCHLD, SIG_DFL); }
    static int Shell(const std::string& script) {
        return YLIBCExec(kShell, "-c", script.c_str(), nullptr);
    }
    static void SetNoCldWait() {
        struct sigaction action {};
        action.sa_handler = SIG_DFL;
        action.sa_flags = SA_NOCLDWAIT;
        ASSERT_EQ(sigaction(SIGCHLD, &action, nullptr), 0);
    }
    static struct sigaction ChildAction() {
        struct sigaction action {};
        sigaction(SIGCHLD, nullptr, &action);
        return action;
    }
};

TEST_F(Exec, GivesTheExitStatus) {
    EXPECT_EQ(Shell("exit 0"), 0);
    EXPECT_EQ(Shell("exit 3"), 3);
    EXPECT_EQ(Shell("exit 255"), 255);
}

TEST_F(Exec, PassesTheArguments) {
    const std::string out = Path("out");
    EXPECT_EQ(YLIBCExec(kShell, "-c", "printf '%s|' \"$@\" >\"$0\"", out.c_str(), "a b", "", "$x",
                        nullptr),
              0);
    EXPECT_EQ(scratch::Text(out), "a b||$x|");
}

TEST_F(Exec, ArrayStartsWithTheProgramsName) {
    const std::string out = Path("out");
    const std::string script = "echo $0 >" + out;
    const char* const argv[] = {"a-name", "-c", script.c_str(), nullptr};
    EXPECT_EQ(YLIBCExecv(kShell, argv), 0);
    EXPECT_EQ(scratch::Text(out), "a-name\n");
}

TEST_F(Exec, ProgramThatCannotStartIsNegative) {
    EXPECT_LT(YLIBCExec("/no/such/program", nullptr), 0);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_NOT_FOUND);
    EXPECT_STREQ(YLIBCErrorGetFile(), "exec.cpp");
    EXPECT_LT(YLIBCExec(Put("data", "text").c_str(), nullptr), 0);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_NO_PERMISSION);
    EXPECT_LT(Shell("exit 127"), 0);
}

TEST_F(Exec, KilledProgramIsNegative) {
    EXPECT_LT(Shell("kill -9 $$"), 0);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_SYSTEM);
}

TEST_F(Exec, NullArgumentsAreRefused) {
    const char* const empty[] = {nullptr};
    EXPECT_LT(YLIBCExec(nullptr, nullptr), 0);
    EXPECT_LT(YLIBCExecv(kShell, nullptr), 0);
    EXPECT_LT(YLIBCExecv(kShell, empty), 0);
    EXPECT_LT(YLIBCExecv(nullptr, empty), 0);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BAD_PARAMETER);
}

TEST_F(Exec, InputAndOutputAreNothing) {
    EXPECT_EQ(Shell("read line"), 1) << "end of file at once";
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    EXPECT_EQ(scratch::InChild([&] {
                  dup2(ends[1], STDOUT_FILENO);
                  return Shell("echo a CGI program answers on its standard output");
              }),
              0);
    close(ends[1]);
    char byte = 0;
    EXPECT_EQ(read(ends[0], &byte, 1), 0);
    close(ends[0]);
}

TEST_F(Exec, ErrorsStayVisible) {
    const std::string out = Path("errors");
    EXPECT_EQ(scratch::InChild([&] {
                  dup2(open(out.c_str(), O_WRONLY | O_CREAT, 0600), STDERR_FILENO);
                  return Shell("echo trouble >&2");
              }),
              0);
    EXPECT_EQ(scratch::Text(out), "trouble\n");
}

TEST_F(Exec, OpenFilesOfTheCallerAreNotInherited) {
    const int fd = open("/etc/hosts", O_RDONLY);  // without O_CLOEXEC, as fopen opens it
    ASSERT_GE(fd, 3);
    EXPECT_NE(Shell("true <&" + std::to_string(fd)), 0);
    EXPECT_EQ(fcntl(fd, F_GETFD), 0) << "the caller's stays open";
    close(fd);
}

TEST_F(Exec, SignalsStartAfresh) {
    sigset_t blocked;
    sigset_t before;
    sigfillset(&blocked);
    signal(SIGTERM, SIG_IGN);
    ASSERT_EQ(sigprocmask(SIG_BLOCK, &blocked, &before), 0);
    const int status = Shell("kill -TERM $$; exit 0");
    sigprocmask(SIG_SETMASK, &before, nullptr);
    signal(SIGTERM, SIG_DFL);
    EXPECT_LT(status, 0);
}

TEST_F(Exec, StatusIsHadFromACallerThatIgnoresItsChildren) {
    signal(SIGCHLD, SIG_IGN);
    EXPECT_EQ(Shell("exit 3"), 3);
    EXPECT_EQ(ChildAction().sa_handler, SIG_IGN);
}

TEST_F(Exec, StatusIsHadFromACallerThatLetsTheKernelCollect) {
    SetNoCldWait();
    EXPECT_EQ(Shell("exit 3"), 3);
    EXPECT_EQ(Shell("exit 0"), 0);
    EXPECT_NE(ChildAction().sa_flags & SA_NOCLDWAIT, 0);
}

TEST_F(Exec, StatusIsHadFromACallerWhoseHandlerCollectsAllChildren) {
    signal(SIGCHLD, [](int) {
        while (waitpid(-1, nullptr, WNOHANG) > 0) {
        }
    });
    for (int i = 0; i < 20; ++i) {
        EXPECT_EQ(Shell("exit 3"), 3);
    }
}

TEST_F(Exec, SignalMaskIsTheCallersAfterwards) {
    sigset_t before;
    sigset_t after;
    sigprocmask(SIG_BLOCK, nullptr, &before);
    Shell("exit 0");
    sigprocmask(SIG_BLOCK, nullptr, &after);
    EXPECT_EQ(sigismember(&after, SIGCHLD), sigismember(&before, SIGCHLD));
    EXPECT_EQ(sigismember(&after, SIGCHLD), 0);
}

TEST_F(Exec, OtherChildrenOfTheCallerAreLeftToIt) {
    const pid_t other = scratch::Start([] { return 7; });
    EXPECT_EQ(Shell("exit 3"), 3);
    EXPECT_EQ(scratch::End(other), 7);
}

class Service : public Exec {
  protected:
    /** A stand-in that notes how it was called and ends with `status`. */
    void PutSystemctl(int status) {
        std::filesystem::create_directories("/run/systemd/system");
        unlink("/usr/bin/systemctl");
        scratch::PutText("/usr/bin/systemctl", "#!/bin/sh\necho \"$@\" >" + Path("called") +
                                                   "\necho noise >&2\nexit " +
                                                   std::to_string(status) + "\n");
        ASSERT_EQ(chmod("/usr/bin/systemctl", 0755), 0);
    }
};

TEST_F(Service, NothingHappensWithoutAServiceManager) {
    PutSystemctl(1);
    std::filesystem::remove_all("/run/systemd");
    EXPECT_EQ(YLIBServicectlStart("pkg-FileHarbor-zyrovfsd", 0), 0);
    EXPECT_EQ(scratch::Text(Path("called")), "");
}

TEST_F(Service, IsStartedThroughTheServiceManager) {
    PutSystemctl(0);
    EXPECT_EQ(YLIBServicectlStart("pkg-FileHarbor-zyrovfsd", 0), 0);
    EXPECT_EQ(scratch::Text(Path("called")),
              "--quiet --no-ask-password --no-block start -- pkg-FileHarbor-zyrovfsd\n");
}

TEST_F(Service, FailureIsToldQuietly) {
    PutSystemctl(5);
    const std::string errors = Path("errors");
    EXPECT_EQ(scratch::InChild([&] {
                  dup2(open(errors.c_str(), O_WRONLY | O_CREAT, 0600), STDERR_FILENO);
                  return YLIBServicectlStart("--help", 0) == -1 ? 0 : 1;
              }),
              0);
    EXPECT_EQ(scratch::Text(errors), "");
    EXPECT_EQ(scratch::Text(Path("called")),
              "--quiet --no-ask-password --no-block start -- --help\n");
}

TEST_F(Service, NamelessServiceIsRefused) {
    EXPECT_EQ(YLIBServicectlStart(nullptr, 0), -1);
    EXPECT_EQ(YLIBServicectlStart("", 0), -1);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BAD_PARAMETER);
}

}  // namespace
