// What a program begins with, whatever its caller is like. Real programs are executed.
#include "mount/program.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>

#include "core/fd_io.h"
#include "core/handle.h"
#include "mount/fork_as_user.h"
#include "mount/user_environment.h"
#include "support/fake_daemons.h"
#include "support/seams.h"
#include "zyrovfs/global.h"

namespace ZYROVFS {
namespace {

using fakes::Eventually;
using fakes::InFreshProcess;
using testing::HasSubstr;
using testing::Not;

constexpr uid_t kNobodysUid = static_cast<uid_t>(-1);

/** A shell that runs `script` with these variables; `output` becomes its standard output. */
Program Shell(const std::string& script, int output,
              std::vector<std::string> environment = {"PATH=/usr/bin:/bin"}) {
    return {{"/bin/sh", "-c", script}, std::move(environment), {-1, output, -1}};
}

/** What a program, started by `start`, says on its standard output until it closes it. */
template <typename Starter>
std::string Says(const std::string& script, Starter start) {
    int ends[2];
    EXPECT_EQ(pipe2(ends, O_CLOEXEC), 0);
    const UniqueFd in(ends[0]);
    UniqueFd out(ends[1]);
    EXPECT_GT(start(Shell(script, out.Get())), 0) << strerror(errno);
    out.Reset();
    std::string text;
    ReadAll(in.Get(), text);
    return text;
}

std::string ChildSays(const std::string& script) {
    pid_t pid = -1;
    const std::string text =
        Says(script, [&pid](const Program& program) { return pid = StartChild(program); });
    WaitForChild(pid);
    return text;
}

std::string DaemonSays(const std::string& script, uid_t uid = kNobodysUid) {
    return Says(script, [uid](const Program& program) { return StartDaemon(program, uid); });
}

constexpr const char* kSignals = "grep -E '^Sig(Blk|Ign|Cgt):' /proc/self/status";
constexpr const char* kDescriptors = "ls -l /proc/self/fd | sed -n 's/.*[0-9]:[0-9][0-9] //p'";

/** The caller's own state is changed: in a process that ends with it. */
void InOddCaller(const std::function<void()>& body) {
    InFreshProcess([&] {
        sigset_t all;
        sigfillset(&all);
        sigprocmask(SIG_SETMASK, &all, nullptr);
        signal(SIGTERM, SIG_IGN);
        signal(SIGPIPE, SIG_IGN);
        body();
    });
}

TEST(Program, HasNoSignalBlockedOrIgnored) {
    InOddCaller([] {
        for (const std::string& text : {ChildSays(kSignals), DaemonSays(kSignals)}) {
            EXPECT_THAT(text, HasSubstr("SigBlk:\t0000000000000000\n"));
            EXPECT_THAT(text, HasSubstr("SigIgn:\t0000000000000000\n"));
        }
    });
}

TEST(Program, LeavesTheCallersSignalsAsTheyWere) {
    InOddCaller([] {
        ChildSays("true");
        sigset_t mask;
        sigprocmask(SIG_SETMASK, nullptr, &mask);
        EXPECT_EQ(sigismember(&mask, SIGUSR1), 1);
        struct sigaction action {};
        sigaction(SIGTERM, nullptr, &action);
        EXPECT_EQ(action.sa_handler, SIG_IGN);
    });
}

TEST(Program, HasItsOwnDescriptorsAndNoneOfTheCallers) {
    InFreshProcess([] {
        const int secret = open("/etc/shadow", O_RDONLY);
        ASSERT_GT(secret, 2);
        for (const std::string& text : {ChildSays(kDescriptors), DaemonSays(kDescriptors)}) {
            EXPECT_THAT(text, HasSubstr("0 -> /dev/null\n1 -> pipe:"));
            EXPECT_THAT(text, HasSubstr("2 -> /dev/null\n"));
            EXPECT_THAT(text, Not(HasSubstr("shadow")));
        }
    });
}

TEST(Program, HasAllThreeStandardDescriptorsEvenIfTheCallerHasNone) {
    InFreshProcess([] {
        int ends[2];
        ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
        ASSERT_EQ(fcntl(ends[0], F_DUPFD_CLOEXEC, 20), 20);
        close(ends[0]);
        for (const int fd : {0, 1, 2}) {
            close(fd);
        }
        // The pipe's other end and all that is opened on the way come to stand at 0, 1 and 2.
        const int out = fcntl(ends[1], F_DUPFD_CLOEXEC, 0);
        ASSERT_EQ(out, 0);
        close(ends[1]);
        const pid_t pid = StartDaemon(Shell(kDescriptors, out), kNobodysUid);
        close(out);
        std::string text;
        ReadAll(20, text);
        EXPECT_GT(pid, 0);
        EXPECT_THAT(text, HasSubstr("0 -> /dev/null\n1 -> pipe:"));
        EXPECT_THAT(text, HasSubstr("2 -> /dev/null\n"));
    });
}

TEST(Program, HasTheEnvironmentThatIsNamedAndNoOther) {
    setenv("HTTP_COOKIE", "session=42", 1);
    EXPECT_THAT(ChildSays("env"), Not(HasSubstr("HTTP_COOKIE")));
    EXPECT_THAT(DaemonSays("env"), HasSubstr("PATH=/usr/bin:/bin\n"));
    unsetenv("HTTP_COOKIE");
}

TEST(Program, ThatIsNotThereIsToldByErrno) {
    const Program none{{"/no/such/program"}, {}, {-1, -1, -1}};
    errno = 0;
    EXPECT_EQ(StartChild(none), -1);
    EXPECT_EQ(errno, ENOENT);
    errno = 0;
    EXPECT_EQ(StartDaemon(none, kNobodysUid), -1);
    EXPECT_EQ(errno, ENOENT);
    EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), -1) << "a child is left";
}

TEST(Program, OfACallerWithASavedRootIsRootInFull) {
    InFreshProcess([] {
        ASSERT_EQ(setresuid(4001, 4001, 0), 0);
        EXPECT_EQ(ChildSays("grep ^Uid: /proc/self/status"), "Uid:\t0\t0\t0\t0\n");
    });
}

TEST(Daemon, IsAtTheRootInASessionOfItsOwnAndNobodysChild) {
    const std::string text = DaemonSays("pwd; ps -o sid=,ppid= -p $$");
    EXPECT_THAT(text, testing::StartsWith("/\n"));
    int session = 0;
    int parent = 0;
    ASSERT_EQ(sscanf(text.c_str(), "/\n%d %d", &session, &parent), 2) << text;
    EXPECT_NE(session, getsid(0));
    EXPECT_NE(parent, getpid());
}

TEST(Daemon, IsTheUserForGood) {
    EXPECT_EQ(DaemonSays("grep -E '^(Uid|Gid|Groups):' /proc/self/status", 4001),
              "Uid:\t4001\t4001\t4001\t4001\nGid:\t100\t100\t100\t100\nGroups:\t \n");
}

TEST(Daemon, LeavesNothingToCollectUnderACallerThatIgnoresItsChildren) {
    InFreshProcess([] {
        signal(SIGCHLD, SIG_IGN);
        EXPECT_EQ(DaemonSays("echo up"), "up\n");
        EXPECT_EQ(StartDaemon({{"/no/such/program"}, {}, {-1, -1, -1}}, 4001), -1);
    });
}

// --- environment ------------------------------------------------------------------------------

TEST(UserEnvironment, HasTheUsersRuntimeFolderAndBus) {
    std::filesystem::remove_all("/var/tmp/user/4001");
    fakes::Write("/var/tmp/user/4001/dbus/dbus.path", "unix:path=/amys\n");
    setenv("DBUS_SESSION_BUS_ADDRESS", "unix:path=/tmp/trap", 1);
    setenv("http_proxy", "http://proxy:3128", 1);
    setenv("HTTP_PROXY", "http://of-the-client", 1);
    const std::vector<std::string> environment = UserEnvironment(4001);
    EXPECT_THAT(environment, testing::Contains("XDG_RUNTIME_DIR=/var/tmp/user/4001"));
    EXPECT_THAT(environment, testing::Contains("ZYROVFS_UID=4001"));
    EXPECT_THAT(environment, testing::Contains("DBUS_SESSION_BUS_ADDRESS=unix:path=/amys"));
    EXPECT_THAT(environment, testing::Contains("http_proxy=http://proxy:3128"));
    EXPECT_THAT(environment, testing::Each(Not(HasSubstr("of-the-client"))))
        << "a header of a request becomes this variable of a CGI program";
}

TEST(UserEnvironment, HasNoBusOfWhichNothingIsKnown) {
    std::filesystem::remove_all("/var/tmp/user/4001");
    setenv("DBUS_SESSION_BUS_ADDRESS", "unix:path=/tmp/trap", 1);
    EXPECT_THAT(UserEnvironment(4001), testing::Each(Not(HasSubstr("DBUS"))));
    ASSERT_TRUE(InitEnv("4001", "unix:path=/told"));
    EXPECT_THAT(UserEnvironment(4001),
                testing::Contains("DBUS_SESSION_BUS_ADDRESS=unix:path=/told"));
    EXPECT_THAT(UserEnvironment(4002), testing::Each(Not(HasSubstr("DBUS"))));
}

}  // namespace
}  // namespace ZYROVFS
