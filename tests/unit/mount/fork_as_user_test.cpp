#include "mount/fork_as_user.h"

#include <gmock/gmock.h>
#include <grp.h>
#include <gtest/gtest.h>
#include <sys/time.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>

#include "support/fake_daemons.h"
#include "support/seams.h"

namespace ZYROVFS {
namespace {

using fakes::InFreshProcess;

void SetFlags(int flags) {
    struct sigaction action {};
    action.sa_handler = SIG_DFL;
    action.sa_flags = flags;
    sigaction(SIGCHLD, &action, nullptr);
}

int Flags() {
    struct sigaction action {};
    sigaction(SIGCHLD, nullptr, &action);
    return action.sa_flags & SA_NOCLDWAIT;
}

pid_t Child(void (*body)()) {
    const pid_t pid = fork();
    if (pid == 0) {
        body();
        _exit(0);
    }
    return pid;
}

class Sigchld : public testing::Test {
  protected:
    void TearDown() override { SetFlags(0); }
};

TEST_F(Sigchld, BitIsClearForTheGuardAndComesBack) {
    SetFlags(SA_NOCLDWAIT);
    {
        const SigchldGuard guard;
        EXPECT_EQ(Flags(), 0);
    }
    EXPECT_EQ(Flags(), SA_NOCLDWAIT);
}

TEST_F(Sigchld, BitThatWasNotSetStaysClear) {
    {
        const SigchldGuard guard;
        EXPECT_EQ(Flags(), 0);
    }
    EXPECT_EQ(Flags(), 0);
}

TEST_F(Sigchld, DismissedGuardLeavesTheBitClear) {
    SetFlags(SA_NOCLDWAIT);
    {
        SigchldGuard guard;
        guard.Dismiss();
    }
    EXPECT_EQ(Flags(), 0);
}

TEST_F(Sigchld, GuardLetsAChildsStatusBeCollected) {
    SetFlags(SA_NOCLDWAIT);
    const SigchldGuard guard;
    EXPECT_EQ(WaitForChild(Child([] { _exit(7); })).Result(), 7);
}

TEST(Wait, ExitStatusIsTheResult) {
    const ChildEnd end = WaitForChild(Child([] { _exit(20); }));
    EXPECT_EQ(end.how, ChildEnd::kExited);
    EXPECT_EQ(end.Result(), 20);
}

TEST(Wait, SignalIsMinusOne) {
    const ChildEnd end = WaitForChild(Child([] { raise(SIGKILL); }));
    EXPECT_EQ(end.how, ChildEnd::kSignalled);
    EXPECT_EQ(end.Result(), -1);
}

TEST(Wait, ChildThatIsGoneIsZero) {
    const pid_t pid = Child([] { _exit(3); });
    waitpid(pid, nullptr, 0);
    const ChildEnd end = WaitForChild(pid);
    EXPECT_EQ(end.how, ChildEnd::kNotFound);
    EXPECT_EQ(end.Result(), 0);
}

TEST(Wait, InterruptionsAreWaitedThrough) {
    struct sigaction action {};
    action.sa_handler = [](int) {};
    sigaction(SIGALRM, &action, nullptr);
    itimerval often{{0, 20000}, {0, 20000}};
    setitimer(ITIMER_REAL, &often, nullptr);
    const ChildEnd end = WaitForChild(Child([] {
        timespec time{0, 200000000};
        nanosleep(&time, nullptr);
        _exit(9);
    }));
    often = {};
    setitimer(ITIMER_REAL, &often, nullptr);
    EXPECT_EQ(end.Result(), 9);
}

TEST(BecomeUser, IsForGoodAndWithoutTheGroupsOfRoot) {
    InFreshProcess([] {
        const gid_t groups[] = {4, 27};
        ASSERT_EQ(setgroups(2, groups), 0);
        ASSERT_TRUE(BecomeUserForGood(4001));
        uid_t r, e, s;
        getresuid(&r, &e, &s);
        EXPECT_TRUE(r == 4001 && e == 4001 && s == 4001);
        gid_t gr, ge, gs;
        getresgid(&gr, &ge, &gs);
        EXPECT_TRUE(gr == 100 && ge == 100 && gs == 100);
        EXPECT_EQ(getgroups(0, nullptr), 0);
        EXPECT_EQ(seteuid(0), -1);
    });
}

TEST(BecomeUser, GroupGoesBeforeTheUser) {
    InFreshProcess([] {
        ASSERT_TRUE(BecomeUserForGood(4001));
        EXPECT_THAT(seams::IdentityCalls(),
                    testing::ElementsAre("setregid(100, 100)", "setreuid(4001, 4001)"));
    });
}

TEST(BecomeUser, FailuresAreTold) {
    InFreshProcess([] {
        seams::FailIdentity("setregid", EPERM);
        EXPECT_FALSE(BecomeUserForGood(4001));
        EXPECT_TRUE(seams::Logged("Failed to set gid 100, Operation not permitted"));
    });
    InFreshProcess([] {
        seams::FailIdentity("setreuid", EAGAIN);
        EXPECT_FALSE(BecomeUserForGood(4001));
        EXPECT_TRUE(seams::Logged("Failed to set uid 4001, Resource temporarily unavailable"));
    });
}

TEST(BecomeUser, GoesByTheSavedRootOfAProcessThatIsAnotherUser) {
    InFreshProcess([] {
        ASSERT_EQ(setresuid(0, 4002, 0), 0);
        EXPECT_FALSE(BecomeUserForGood(4001)) << "not from an effective user";
        ASSERT_EQ(TryBecomeUserBySavedRoot(4001), IdentityStep::kDone);
        EXPECT_EQ(getuid(), 4001U);
        EXPECT_EQ(seteuid(0), -1);
    });
}

TEST(BecomeUser, ProcessWithoutASavedRootStaysWhatItIs) {
    InFreshProcess([] {
        ASSERT_EQ(setresuid(4002, 4002, 4002), 0);
        ASSERT_EQ(TryBecomeUserBySavedRoot(4001), IdentityStep::kRoot);
        EXPECT_TRUE(seams::LogLines().empty()) << "a child of a process with threads may not log";
        LogIdentity(IdentityStep::kRoot, 4001, SourceLine::Here());
        EXPECT_TRUE(seams::LoggedPart("Failed to set uid 0, Operation not permitted"));
        EXPECT_EQ(getuid(), 4002U);
    });
}

TEST(BecomeRoot, IsRootInFull) {
    InFreshProcess([] {
        ASSERT_EQ(setresuid(4001, 4001, 0), 0);
        ASSERT_TRUE(BecomeRootForGood());
        EXPECT_EQ(getuid(), 0U);
        EXPECT_EQ(geteuid(), 0U);
    });
}

TEST(BecomeRoot, FailureNamesTheIdsThatTheProcessHas) {
    InFreshProcess([] {
        ASSERT_EQ(setresuid(4001, 4002, 4003), 0);
        EXPECT_FALSE(BecomeRootForGood());
        EXPECT_TRUE(seams::Logged("Failed to set uid 4001 4002 4003, Operation not permitted"))
            << seams::LogDump();
    });
}

}  // namespace
}  // namespace ZYROVFS
