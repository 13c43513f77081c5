#include <gtest/gtest.h>
#include <time.h>
#include <zosplatform/task.h>

#include <algorithm>

#include "support/machine.h"
#include "support/mount_fixture.h"

namespace ZYROVFS {
namespace {

class UnMount : public mounting::Road {
  protected:
    void Fails(const scripted::End& end) { Script().unmount_end = end; }
    void AsksForPassword(int questions, const scripted::End& when_aborted) {
        Script().on_unmount = [=](GMountOperation* operation) {
            for (int i = 0; i < questions; ++i) {
                if (!scripted::AskPassword(operation, "Enter password",
                                           G_ASK_PASSWORD_NEED_PASSWORD)) {
                    scripted::TheScript().unmount_end = when_aborted;
                    return;
                }
            }
        };
    }
};

TEST_F(UnMount, UnmountsAsTheUserWithTheGroupOfUsers) {
    EXPECT_TRUE(session_.UnMount());
    EXPECT_EQ(Seen().unmounts, 1);
    EXPECT_NE(Seen().pid, getpid());
    EXPECT_EQ(Seen().uid, mounting::kUser);
    EXPECT_EQ(Seen().effective_uid, mounting::kUser);
    EXPECT_EQ(Seen().gid, 100U);
    EXPECT_EQ(Seen().groups, 0);
    EXPECT_STREQ(Seen().uri, "scripted://nas");
}

TEST_F(UnMount, OfAServiceThatIsTheUserByItsEffectiveIdRunsAsThatUser) {
    unsetenv("ZYROVFS_UID");
    const mounting::AsUser user;
    EXPECT_TRUE(session_.UnMount());
    EXPECT_EQ(Seen().uid, mounting::kUser);
}

TEST_F(UnMount, PutsUserAndPathIntoTheLocationWithOneLeadingSlash) {
    session_.SetURI("ftp://nas:2121");
    session_.SetUser("amy");
    session_.SetPath("a b/c", nullptr);
    EXPECT_TRUE(session_.UnMount());
    EXPECT_STREQ(Seen().uri, "ftp://amy@nas:2121/a b/c");
    session_.SetPath("/d", nullptr);
    EXPECT_TRUE(session_.UnMount());
    EXPECT_STREQ(Seen().uri, "ftp://amy@nas:2121/d");
}

TEST_F(UnMount, TakesAFullPathAsItIs) {
    session_.SetURI("nonsense");
    session_.SetUser("amy");
    session_.SetPath("share", nullptr);
    session_.SetFullPath("scripted://elsewhere/x");
    EXPECT_TRUE(session_.UnMount());
    EXPECT_STREQ(Seen().uri, "scripted://elsewhere/x");
}

TEST_F(UnMount, OfWhatIsNotMountedIsTrue) {
    VFSSetErrEx(VFS_ERR_BUSY, "x", 1);
    Script().mounted = false;
    EXPECT_TRUE(session_.UnMount());
    EXPECT_EQ(Seen().unmounts, 0);
    EXPECT_TRUE(seams::Logged("Unable to unmount location uri scripted://nas, [" +
                              std::to_string(G_IO_ERROR_NOT_MOUNTED) +
                              "], The location is not mounted"))
        << seams::LogDump();
    EXPECT_EQ(GetError(), VFS_ERR_BUSY) << "success leaves the parent's cell alone";
}

TEST_F(UnMount, ThatTheServerRefusesIsLoggedAndTrueWhateverTheCellHeld) {
    VFSSetErrEx(VFS_ERR_WRONG_PASSWORD, "x", 1);
    Fails(scripted::Failure(G_IO_ERROR_BUSY, "in use"));
    EXPECT_TRUE(session_.UnMount());
    EXPECT_TRUE(seams::Logged("Unable to unmount location uri scripted://nas, [" +
                              std::to_string(G_IO_ERROR_BUSY) + "], in use"))
        << seams::LogDump();
}

TEST_F(UnMount, ThatFindsNothingMountedAnyMoreIsTrue) {
    Fails(scripted::Failure(G_IO_ERROR_NOT_MOUNTED));
    EXPECT_TRUE(session_.UnMount());
}

TEST_F(UnMount, AnswersThePasswordQuestion) {
    session_.SetPass("secret");
    AsksForPassword(1, {});
    EXPECT_TRUE(session_.UnMount());
    EXPECT_STREQ(Seen().password, "secret");
}

TEST_F(UnMount, WhoseAbortIsHandledIsTrue) {
    AsksForPassword(2, scripted::Failure(G_IO_ERROR_FAILED_HANDLED));
    EXPECT_TRUE(session_.UnMount());
    EXPECT_EQ(Seen().questions, 2);
}

TEST_F(UnMount, WhoseAbortTheBackendCallsOtherwiseFailsWithTheHandlersCode) {
    AsksForPassword(2, scripted::Failure(G_IO_ERROR_CANCELLED));
    EXPECT_FALSE(session_.UnMount());
    EXPECT_EQ(GetError(), VFS_ERR_WRONG_PASSWORD);
    EXPECT_STREQ(GetErrorFile(), "unmount.cpp");
    EXPECT_TRUE(seams::Logged("Fail to unmount, error = 9")) << seams::LogDump();
}

TEST_F(UnMount, AnswersNoOtherQuestion) {
    session_.SetForce(true);
    Script().on_unmount = [](GMountOperation* operation) {
        scripted::AskQuestion(operation, "identity:nas\tabc");
    };
    EXPECT_TRUE(session_.UnMount());
    EXPECT_EQ(Seen().questions, 0);
}

TEST_F(UnMount, OfATextThatIsNoUriIsABadParameter) {
    session_.SetURI("nonsense");
    EXPECT_FALSE(session_.UnMount());
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    EXPECT_TRUE(seams::Logged("Wrong uri, nonsense")) << seams::LogDump();
}

TEST_F(UnMount, WhoseChildIsKilledIsFalseAndLeavesTheCellUnchanged) {
    VFSSetErrEx(VFS_ERR_BUSY, "x", 1);
    Script().on_unmount = [](GMountOperation*) { kill(getpid(), SIGKILL); };
    EXPECT_FALSE(session_.UnMount());
    EXPECT_EQ(GetError(), VFS_ERR_BUSY);
}

TEST_F(UnMount, CollectsItsChildUnderAServiceThatIgnoresChildren) {
    const mounting::Sigchld ignoring(SIG_DFL, SA_NOCLDWAIT);
    session_.SetURI("nonsense");
    EXPECT_FALSE(session_.UnMount());
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
    EXPECT_TRUE(mounting::Sigchld::HasNoCldWait());
}

TEST_F(UnMount, WhoseChildSomebodyElseCollectsIsJudgedByWhatTheHelperHasSaid) {
    const mounting::Sigchld ignoring(SIG_IGN, 0);
    EXPECT_TRUE(session_.UnMount());
    session_.SetURI("");
    EXPECT_FALSE(session_.UnMount());
    EXPECT_EQ(GetError(), VFS_ERR_BAD_PARAM);
}

TEST_F(UnMount, WithoutAChildIsFalseWithoutACode) {
    const mounting::Sigchld ignoring(SIG_DFL, SA_NOCLDWAIT);
    mounting::fork_fails = true;
    EXPECT_FALSE(session_.UnMount());
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
    EXPECT_TRUE(mounting::Sigchld::HasNoCldWait());
}

TEST_F(UnMount, WhoseLockIsHeldElsewhereIsFalseAndForksNothing) {
    {
        const UniqueFd other = mounting::HoldLock();
        EXPECT_FALSE(session_.UnMount());
    }
    EXPECT_TRUE(seams::Logged("Fail to lock unmmount")) << seams::LogDump();
    EXPECT_EQ(mounting::forks, 0);
}

TEST_F(UnMount, WhoseLockCannotBeUpgradedGivesOneLevelBack) {
    ASSERT_TRUE(Utils::LockMnt(false));
    EXPECT_FALSE(session_.UnMount());
    EXPECT_TRUE(mounting::LockIsFree());
}

TEST_F(UnMount, WhoseChildCannotBecomeTheUserUnmountsNothing) {
    for (const char* call : {"setregid", "setreuid"}) {
        ResetError();
        seams::FailIdentity(call, EPERM);
        EXPECT_FALSE(session_.UnMount());
        EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    }
    EXPECT_EQ(Seen().unmounts, 0);
    EXPECT_TRUE(seams::Logged("Failed to set gid 100, Operation not permitted"))
        << seams::LogDump();
}

// --- running transfers ------------------------------------------------------------------------

class Transfers : public UnMount {
  protected:
    static void SetUpTestSuite() {
        UnMount::SetUpTestSuite();
        machine::AddUser("amy", mounting::kUser);
    }
    static void TearDownTestSuite() { machine::Must("userdel amy"); }

    ~Transfers() override {
        for (const pid_t pid : pids_) {
            kill(pid, SIGKILL);
            waitpid(pid, nullptr, 0);
        }
    }

    /** A process of root that is registered as moving files of `uri`. */
    pid_t Start(const std::string& uri) {
        const pid_t pid = fork();
        if (pid == 0) {
            pause();
            _exit(0);
        }
        pids_.push_back(pid);
        Json::Value task;
        task["pid"] = pid;
        task["data"]["is_vfs"] = true;
        task["data"]["vfs_uri"][uri] = true;
        EXPECT_NE(ZOS::TaskMgr("amy").createTask(task), nullptr);
        return pid;
    }
    /**
     * Whether the process was sent SIGTERM; it has ended then and is collected. What was not is
     * ended by a signal of a higher number, which the kernel delivers after one that waits.
     */
    bool WasEnded(pid_t pid) {
        kill(pid, SIGPROF);
        int status = 0;
        EXPECT_EQ(waitpid(pid, &status, 0), pid);
        pids_.erase(std::find(pids_.begin(), pids_.end(), pid));
        return WIFSIGNALED(status) && WTERMSIG(status) == SIGTERM;
    }

    std::vector<pid_t> pids_;
};

TEST_F(Transfers, OfTheConnectionEndAsRootBeforeTheUnmount) {
    const pid_t of_root = Start("scripted://nas");
    const pid_t other = Start("scripted://other");
    Script().on_unmount = [of_root](GMountOperation*) {
        // It has been sent its end, or this process, which is the user by now, will never see it.
        for (int i = 0; i < 500 && YLIBCProcAlive(of_root) != 0; ++i) {
            const timespec pause{0, 10 * 1000 * 1000};
            nanosleep(&pause, nullptr);
        }
        scripted::TheSeen().mark = YLIBCProcAlive(of_root) == 0 ? 1 : 2;
    };
    EXPECT_TRUE(session_.UnMount());
    EXPECT_EQ(Seen().mark, 1) << "ended before the unmount";
    EXPECT_TRUE(WasEnded(of_root));
    EXPECT_FALSE(WasEnded(other));
}

TEST_F(Transfers, EndForALocationThatIsNotMounted) {
    const pid_t pid = Start("scripted://nas");
    Script().mounted = false;
    EXPECT_TRUE(session_.UnMount());
    EXPECT_TRUE(WasEnded(pid));
}

TEST_F(Transfers, OfAnEmptyUriAreLeftAlone) {
    const pid_t pid = Start("");
    session_.SetURI("");
    session_.SetFullPath("scripted://nas/x");
    EXPECT_TRUE(session_.UnMount());
    EXPECT_EQ(Seen().unmounts, 1);
    EXPECT_FALSE(WasEnded(pid));
}

TEST_F(Transfers, AreLeftAloneInAProcessWithoutAnActingUser) {
    const pid_t pid = Start("scripted://nas");
    unsetenv("ZYROVFS_UID");
    const mounting::AsUser user;
    EXPECT_TRUE(session_.UnMount());
    EXPECT_FALSE(WasEnded(pid));
}

TEST_F(Transfers, OfAUserWhomNobodyKnowsAreLoggedAndTheUnmountGoesOn) {
    setenv("ZYROVFS_UID", "5999", 1);
    EXPECT_TRUE(session_.UnMount());
    EXPECT_EQ(Seen().unmounts, 1);
    EXPECT_TRUE(seams::Logged("Failed to kill vfs procs, uid=            5999"))
        << seams::LogDump();
    EXPECT_TRUE(mounting::LockIsFree(5999));
}

}  // namespace
}  // namespace ZYROVFS
