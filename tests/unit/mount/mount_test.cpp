#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <zosplatform/device.h>

#include <fstream>
#include <thread>

#include "support/machine.h"
#include "support/mount_fixture.h"
#include "support/tls_server.h"

namespace {
std::string proxy_auth;
}

extern "C" int ZYROProxyGetAuth(char* auth, int size) {
    snprintf(auth, static_cast<size_t>(size), "%s", proxy_auth.c_str());
    return 1;
}

namespace ZYROVFS {
namespace {

using testing::HasSubstr;
using testing::Not;

constexpr int kUserAndPassword = G_ASK_PASSWORD_NEED_USERNAME | G_ASK_PASSWORD_NEED_PASSWORD;

class Mount : public mounting::Road {
  protected:
    ~Mount() override { proxy_auth.clear(); }

    /** A backend that gives up when a question is aborted. */
    void AsksForPassword(int questions, int flags = kUserAndPassword,
                         const char* message = "Enter password") {
        Script().on_mount = [=](GMountOperation* operation) {
            for (int i = 0; i < questions; ++i) {
                if (!scripted::AskPassword(operation, message, flags)) {
                    scripted::TheScript().mount_end = scripted::Failure(G_IO_ERROR_FAILED_HANDLED);
                    return;
                }
            }
        };
    }
    void AsksForConfirmation(const char* message) {
        Script().on_mount = [=](GMountOperation* operation) {
            if (!scripted::AskQuestion(operation, message)) {
                scripted::TheScript().mount_end = scripted::Failure(G_IO_ERROR_FAILED_HANDLED);
            }
        };
    }
    void ReportsPath(const std::string& path) {
        Script().on_mount = [=](GMountOperation* operation) {
            scripted::AskPassword(operation, "mount_path", 0, path.c_str());
        };
    }
    void Fails(const scripted::End& end) { Script().mount_end = end; }
};

// --- success ----------------------------------------------------------------------------------

TEST_F(Mount, BringsThePathOfTheBackendToTheParent) {
    ReportsPath("/remote.php/dav");
    EXPECT_TRUE(session_.Mount());
    EXPECT_EQ(session_.GetPath(), "remote.php/dav");
    EXPECT_EQ(Seen().mounts, 1);
    EXPECT_EQ(mounting::forks, 1);
}

TEST_F(Mount, KeepsThePathThatTheSessionHad) {
    session_.SetPath("share", nullptr);
    EXPECT_TRUE(session_.Mount());
    EXPECT_EQ(session_.GetPath(), "share");
    EXPECT_STREQ(Seen().uri, "scripted://nas/share");
}

TEST_F(Mount, KeepsAPathWhoseBytesAreNoUtf8) {
    session_.SetPath("caf\xE9 \"x\" \x01", nullptr);
    EXPECT_TRUE(session_.Mount());
    EXPECT_EQ(session_.GetPath(), "caf\xE9 \"x\" \x01");
}

TEST_F(Mount, OfALocationAlreadyMountedIsTrue) {
    session_.SetPath("share", nullptr);
    Fails(scripted::Failure(G_IO_ERROR_ALREADY_MOUNTED));
    EXPECT_TRUE(session_.Mount());
    EXPECT_EQ(session_.GetPath(), "share");
}

TEST_F(Mount, OfALocationAlreadyMountedHasABackendPathIfTheBackendTellsItAgain) {
    ReportsPath("/again");
    Fails(scripted::Failure(G_IO_ERROR_ALREADY_MOUNTED));
    EXPECT_TRUE(session_.Mount());
    EXPECT_EQ(session_.GetPath(), "again");
}

TEST_F(Mount, ThatSucceedsLeavesTheCellAsItWas) {
    VFSSetErrEx(VFS_ERR_BUSY, "x", 1);
    EXPECT_TRUE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_BUSY);
}

TEST_F(Mount, RunsAsTheUserWithTheGroupOfUsersAndNoOther) {
    EXPECT_TRUE(session_.Mount());
    EXPECT_NE(Seen().pid, getpid());
    EXPECT_EQ(Seen().uid, mounting::kUser);
    EXPECT_EQ(Seen().effective_uid, mounting::kUser);
    EXPECT_EQ(Seen().gid, 100U);
    EXPECT_EQ(Seen().effective_gid, 100U);
    EXPECT_EQ(Seen().groups, 0);
}

TEST_F(Mount, OfAServiceThatIsTheUserByItsEffectiveIdRunsAsThatUser) {
    unsetenv("ZYROVFS_UID");
    const mounting::AsUser user;
    EXPECT_TRUE(session_.Mount());
    EXPECT_EQ(Seen().uid, mounting::kUser);
    EXPECT_EQ(Seen().effective_uid, mounting::kUser);
    EXPECT_EQ(Seen().gid, 100U);
}

TEST_F(Mount, PutsTheUserAndTheDecodedPathIntoTheLocation) {
    session_.SetURI("ftp://nas:2121");
    session_.SetUser("amy");
    session_.SetPath("a%20b", nullptr);
    EXPECT_TRUE(session_.Mount());
    EXPECT_STREQ(Seen().uri, "ftp://amy@nas:2121/a b");
}

TEST_F(Mount, HoldsTheMountLockWhileTheChildWorks) {
    Script().on_mount = [](GMountOperation*) {
        scripted::TheSeen().mark = mounting::LockIsFree() ? 1 : 2;
    };
    EXPECT_TRUE(session_.Mount());
    EXPECT_EQ(Seen().mark, 2);
}

// --- dialogue ---------------------------------------------------------------------------------

TEST_F(Mount, AnswersTheQuestionForCredentials) {
    session_.SetUser("amy");
    session_.SetPass("s3cret:\t");
    AsksForPassword(1);
    EXPECT_TRUE(session_.Mount());
    EXPECT_STREQ(Seen().user, "amy");
    EXPECT_STREQ(Seen().password, "s3cret:\t");
}

TEST_F(Mount, IsAnonymousForAnEmptyUserWhereThatIsAllowed) {
    AsksForPassword(1, kUserAndPassword | G_ASK_PASSWORD_ANONYMOUS_SUPPORTED);
    EXPECT_TRUE(session_.Mount());
    EXPECT_EQ(Seen().anonymous, TRUE);
    EXPECT_STREQ(Seen().user, "");
}

TEST_F(Mount, ThatIsRefusedAnonymouslyIsNotAskedAnonymouslyAgain) {
    AsksForPassword(2, kUserAndPassword | G_ASK_PASSWORD_ANONYMOUS_SUPPORTED);
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_WRONG_USERNAME);
    EXPECT_EQ(Seen().questions, 2);
}

TEST_F(Mount, WithARefusedUserFailsWithTheUserName) {
    session_.SetUser("amy");
    AsksForPassword(2);
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_WRONG_USERNAME);
    EXPECT_TRUE(seams::Logged("Fail to mount, error = 8")) << seams::LogDump();
}

TEST_F(Mount, WithARefusedPasswordFailsWithThePassword) {
    session_.SetPass("wrong");
    AsksForPassword(2, G_ASK_PASSWORD_NEED_PASSWORD);
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_WRONG_PASSWORD);
}

TEST_F(Mount, GivesTheProxyItsCredentialsTwiceAndNoMore) {
    proxy_auth = "bob";
    AsksForPassword(2, kUserAndPassword, "proxy password");
    EXPECT_TRUE(session_.Mount());
    EXPECT_STREQ(Seen().user, "bob");
    AsksForPassword(3, kUserAndPassword, "proxy password");
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_PROXY_AUTH);
}

TEST_F(Mount, ConfirmsAnUnknownIdentityWithForce) {
    session_.SetForce(true);
    AsksForConfirmation("identity:nas\tSHA256:abc");
    EXPECT_TRUE(session_.Mount());
    EXPECT_EQ(Seen().choice, 0);
    EXPECT_TRUE(Detail().isNull());
}

TEST_F(Mount, LeavesAnUnknownIdentityToTheUserWithHostAndFingerprint) {
    AsksForConfirmation("identity:nas\tSHA256:abc");
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_IDENTITY_QUESTION);
    EXPECT_EQ(Detail()["host"], "nas");
    EXPECT_EQ(Detail()["fingerprint"], "SHA256:abc");
    EXPECT_EQ(Detail().size(), 2U);
}

TEST_F(Mount, IdentityTextWithoutATabIsHostAndFingerprint) {
    AsksForConfirmation("identity:SHA256:abc");
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_IDENTITY_QUESTION);
    EXPECT_EQ(Detail()["host"], "SHA256:abc");
    EXPECT_EQ(Detail()["fingerprint"], "SHA256:abc");
}

TEST_F(Mount, IdentityTextWithAThirdPieceUsesTheFirstTwo) {
    AsksForConfirmation("identity:nas\tSHA256:abc\tmore");
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(Detail()["host"], "nas");
    EXPECT_EQ(Detail()["fingerprint"], "SHA256:abc");
}

TEST_F(Mount, IdentityWithoutAColonIsUnknownAndHasNoDetail) {
    AsksForConfirmation("identity of nas");
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_UNKNOWN);
    EXPECT_TRUE(Detail().isNull());
}

TEST_F(Mount, AnIdentityQuestionDoesNotChangeThePath) {
    session_.SetPath("share", nullptr);
    AsksForConfirmation("identity:nas\tSHA256:abc");
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(session_.GetPath(), "share");
}

TEST_F(Mount, AcceptsAChangedAddress) {
    AsksForConfirmation("ip change");
    EXPECT_TRUE(session_.Mount());
}

TEST_F(Mount, RefusesAnyOtherQuestion) {
    AsksForConfirmation("Shall I?");
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_UNKNOWN);
    EXPECT_TRUE(seams::Logged("Shall I?")) << seams::LogDump();
}

// --- failures of GIO --------------------------------------------------------------------------

struct Row {
    scripted::End end;
    const char* uri;
    __tag_vfs_err_ code;
};
std::ostream& operator<<(std::ostream& out, const Row& row) {
    return out << "GIO error " << row.end.code << " \"" << row.end.message << "\" of " << row.uri;
}

class MountFailure : public Mount, public testing::WithParamInterface<Row> {};

TEST_P(MountFailure, ReachesTheParentAsACode) {
    session_.SetURI(GetParam().uri);
    session_.SetPath("kept", nullptr);
    Fails(GetParam().end);
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), GetParam().code);
    EXPECT_EQ(session_.GetPath(), "kept");
    EXPECT_TRUE(seams::Logged("Fail to mount, error = " + std::to_string(GetParam().code)))
        << seams::LogDump();
}

INSTANTIATE_TEST_SUITE_P(
    Codes, MountFailure,
    testing::Values(
        Row{scripted::Failure(G_IO_ERROR_FAILED), "ftp://nas", VFS_ERR_ACCESS_DENIED},
        Row{scripted::Failure(G_IO_ERROR_NOT_SUPPORTED), "ftp://nas", VFS_ERR_ACCESS_DENIED},
        Row{scripted::Failure(G_IO_ERROR_BROKEN_PIPE), "ftp://nas", VFS_ERR_ACCESS_DENIED},
        Row{scripted::Failure(G_IO_ERROR_PERMISSION_DENIED), "ftp://nas", VFS_ERR_WRONG_USERNAME},
        Row{scripted::Failure(G_IO_ERROR_CLOSED), "ftp://nas", VFS_ERR_HOST_UNREACHABLE},
        Row{scripted::Failure(G_IO_ERROR_TIMED_OUT), "ftp://nas", VFS_ERR_HOST_UNREACHABLE},
        Row{scripted::Failure(G_IO_ERROR_HOST_NOT_FOUND), "ftp://nas", VFS_ERR_HOST_UNREACHABLE},
        Row{scripted::Failure(G_IO_ERROR_HOST_UNREACHABLE), "ftp://nas", VFS_ERR_HOST_UNREACHABLE},
        Row{scripted::Failure(G_IO_ERROR_NETWORK_UNREACHABLE), "ftp://nas",
            VFS_ERR_HOST_UNREACHABLE},
        Row{scripted::Failure(G_IO_ERROR_PENDING), "ftp://nas", VFS_ERR_MOUNT_PENDING},
        Row{scripted::Failure(G_IO_ERROR_CONNECTION_REFUSED), "sftp://nas", VFS_ERR_ACCESS_DENIED},
        Row{scripted::Failure(G_IO_ERROR_CONNECTION_REFUSED), "box://amy@x.org",
            VFS_ERR_UNAUTHORIZED},
        Row{scripted::Failure(G_IO_ERROR_BUSY), "ftp://nas", VFS_ERR_FAILED},
        Row{scripted::Failure(G_IO_ERROR_FAILED_HANDLED), "ftp://nas", VFS_ERR_FAILED},
        Row{scripted::Failure(G_IO_ERROR_CANCELLED), "ftp://nas", VFS_ERR_FAILED},
        Row{scripted::Failure(G_IO_ERROR_FAILED, "Login dialog cancelled"), "ftp://nas",
            VFS_ERR_IDENTITY_QUESTION},
        Row{scripted::Failure(G_IO_ERROR_FAILED, "Identification is wrong"), "ftp://nas",
            VFS_ERR_IDENTITY_WRONG},
        Row{scripted::Failure(G_IO_ERROR_TIMED_OUT, "Not a WebDAV enabled share"), "dav://nas",
            VFS_ERR_ACCESS_DENIED}));

TEST_F(Mount, AnIdentityMessageOfTheFailureReachesTheDetail) {
    Fails(scripted::Failure(G_IO_ERROR_FAILED, "identity:nas\tSHA256:abc"));
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_IDENTITY_QUESTION);
    EXPECT_EQ(Detail()["host"], "nas");
    EXPECT_EQ(Detail()["fingerprint"], "SHA256:abc");
}

TEST_F(Mount, ReplacesAnOldCodeByItsOwn) {
    VFSSetErrEx(VFS_ERR_BUSY, "x", 1);
    Fails(scripted::Failure(G_IO_ERROR_CANCELLED));
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_STREQ(GetErrorFile(), "mount.cpp");
}

TEST_F(Mount, OfATextThatIsNoUriCannotReachItsHost) {
    session_.SetURI("nonsense");
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_HOST_UNREACHABLE);
    EXPECT_TRUE(seams::Logged("Wrong uri, nonsense")) << seams::LogDump();
    EXPECT_EQ(Seen().mounts, 0);
}

TEST_F(Mount, OfAnEmptySessionCannotReachItsHost) {
    session_.SetURI("");
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_HOST_UNREACHABLE);
}

TEST_F(Mount, OfASchemeThatNobodyServesIsDenied) {
    session_.SetURI("nobody://nas");
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_ACCESS_DENIED);
}

// --- the child's end --------------------------------------------------------------------------

TEST_F(Mount, WhoseChildIsKilledIsFalseAndLeavesTheCellUnchanged) {
    VFSSetErrEx(VFS_ERR_BUSY, "x", 1);
    session_.SetPath("share", nullptr);
    Script().on_mount = [](GMountOperation*) { kill(getpid(), SIGKILL); };
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_BUSY);
    EXPECT_EQ(session_.GetPath(), "share");
}

TEST_F(Mount, WithAnEmptyMountPathEndsTheChildAndLeavesTheCellUnchanged) {
    ReportsPath("");
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
}

/** Plays a child that is killed between its report and its exit. */
class KilledAfterReport : public Mount {
  protected:
    void Reports(const std::string& text) {
        Script().on_mount = [text](GMountOperation*) {
            if (write(STDOUT_FILENO, text.data(), text.size()) > 0) {
                scripted::TheSeen().mark = 1;
            }
            kill(getpid(), SIGKILL);
        };
    }
};

TEST_F(KilledAfterReport, IsFalseAndStillGivesThePath) {
    Reports(R"({"uri_path":"from/the/dead"})");
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(Seen().mark, 1);
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
    EXPECT_EQ(session_.GetPath(), "from/the/dead");
}

TEST_F(KilledAfterReport, ThatIsNoObjectWithATextChangesNothing) {
    for (const char* report :
         {R"({"uri_path":)", R"(["uri_path"])", R"({"uri_path":{"a":1}})", "7", "nas\tSHA256:x"}) {
        session_.SetPath("share", nullptr);
        Reports(report);
        EXPECT_FALSE(session_.Mount()) << report;
        EXPECT_EQ(session_.GetPath(), "share") << report;
    }
}

TEST_F(KilledAfterReport, WithoutThePathsKeyClearsThePath) {
    session_.SetPath("share", nullptr);
    Reports("{}");
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(session_.GetPath(), "");
}

TEST_F(Mount, ReadsAReportOfUpTo4095Bytes) {
    const std::string path(4095 - strlen(R"({"uri_path":""})"), 'p');
    ReportsPath("/" + path);
    EXPECT_TRUE(session_.Mount());
    EXPECT_EQ(session_.GetPath(), path);
    session_.SetPath("share", nullptr);
    ReportsPath("/" + path + "p");
    EXPECT_TRUE(session_.Mount());
    EXPECT_EQ(session_.GetPath(), "share");
}

TEST_F(Mount, WithAPathLargerThanThePipeIsStillMounted) {
    session_.SetPath("share", nullptr);
    ReportsPath("/" + std::string(1000000, 'p'));
    EXPECT_TRUE(session_.Mount());
    EXPECT_EQ(session_.GetPath(), "share");
}

TEST_F(Mount, CollectsItsChildUnderAServiceThatIgnoresChildren) {
    const mounting::Sigchld ignoring(SIG_DFL, SA_NOCLDWAIT);
    Fails(scripted::Failure(G_IO_ERROR_PENDING));
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_MOUNT_PENDING);
    EXPECT_TRUE(mounting::Sigchld::HasNoCldWait());
    Fails({});
    EXPECT_TRUE(session_.Mount());
    EXPECT_TRUE(mounting::Sigchld::HasNoCldWait());
}

/** What a service may do about its children: the status is lost to whoever waits for it. */
class MountOfAService : public Mount, public testing::WithParamInterface<void (*)(int)> {};

void CollectAll(int) {
    const int saved = errno;
    while (waitpid(-1, nullptr, WNOHANG) > 0) {
    }
    errno = saved;
}

TEST_P(MountOfAService, IsJudgedByWhatTheHelperHasSaid) {
    const mounting::Sigchld collecting(GetParam(), 0);
    ReportsPath("/remote");
    Fails(scripted::Failure(G_IO_ERROR_PENDING));
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_MOUNT_PENDING);
    Fails({});
    EXPECT_TRUE(session_.Mount());
    EXPECT_EQ(session_.GetPath(), "remote");
}

TEST_P(MountOfAService, WhoseHelperIsKilledIsFalse) {
    const mounting::Sigchld collecting(GetParam(), 0);
    Script().on_mount = [](GMountOperation*) { kill(getpid(), SIGKILL); };
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
}

INSTANTIATE_TEST_SUITE_P(Children, MountOfAService, testing::Values(SIG_IGN, CollectAll));

TEST_F(Mount, WaitsThroughSignals) {
    struct sigaction action {};
    struct sigaction old {};
    action.sa_handler = [](int) {};
    sigaction(SIGALRM, &action, &old);
    const itimerval often{{0, 2000}, {0, 2000}};
    const itimerval never{};
    Script().on_mount = [](GMountOperation* operation) {
        const itimerval off{};
        setitimer(ITIMER_REAL, &off, nullptr);
        timespec pause{0, 30 * 1000 * 1000};
        nanosleep(&pause, nullptr);
        scripted::AskPassword(operation, "mount_path", 0, "/late");
    };
    setitimer(ITIMER_REAL, &often, nullptr);
    EXPECT_TRUE(session_.Mount());
    setitimer(ITIMER_REAL, &never, nullptr);
    sigaction(SIGALRM, &old, nullptr);
    EXPECT_EQ(session_.GetPath(), "late");
}

TEST_F(Mount, DoesNotRunTheParentsExitHandlersOrFlushItsFiles) {
    atexit([] { scripted::TheSeen().mark += 1; });
    const UniqueFile file(tmpfile());
    ASSERT_GT(fprintf(file.get(), "once"), 0);
    EXPECT_TRUE(session_.Mount());
    fflush(file.get());
    struct stat info {};
    ASSERT_EQ(fstat(fileno(file.get()), &info), 0);
    EXPECT_EQ(info.st_size, 4);
    EXPECT_EQ(Seen().mark, 0);
}

TEST_F(Mount, DoesNotRunTheParentsMainLoop) {
    const guint source = g_idle_add(
        [](gpointer) -> gboolean {
            scripted::TheSeen().mark = 1;
            return G_SOURCE_CONTINUE;
        },
        nullptr);
    open_ = mounting::OpenDescriptors();  // the default context keeps its wake-up descriptor
    EXPECT_TRUE(session_.Mount());
    EXPECT_EQ(Seen().mark, 0);
    g_source_remove(source);
}

TEST_F(Mount, WorksWhileAnotherThreadOwnsTheDefaultMainContext) {
    GMainLoop* loop = g_main_loop_new(nullptr, FALSE);
    std::thread service([loop] { g_main_loop_run(loop); });
    while (!g_main_loop_is_running(loop)) {
        std::this_thread::yield();
    }
    session_.SetUser("amy");
    AsksForPassword(1);
    EXPECT_TRUE(session_.Mount());
    EXPECT_STREQ(Seen().user, "amy");
    g_main_loop_quit(loop);
    service.join();
    g_main_loop_unref(loop);
}

// --- steps that fail --------------------------------------------------------------------------

TEST_F(Mount, WithoutAChildIsFalseWithoutACode) {
    const mounting::Sigchld ignoring(SIG_DFL, SA_NOCLDWAIT);
    mounting::fork_fails = true;
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
    EXPECT_TRUE(mounting::Sigchld::HasNoCldWait());
}

TEST_F(Mount, WithoutAPipeIsFalseAndChildrenAreNoLongerIgnored) {
    const mounting::Sigchld ignoring(SIG_DFL, SA_NOCLDWAIT);
    mounting::pipe_fails = true;
    EXPECT_FALSE(session_.Mount());
    EXPECT_TRUE(seams::Logged("Failed to create pipe")) << seams::LogDump();
    EXPECT_FALSE(mounting::Sigchld::HasNoCldWait());
    EXPECT_EQ(mounting::forks, 0);
    EXPECT_EQ(GetError(), VFS_ERR_NONE);
}

TEST_F(Mount, WhoseLockIsHeldElsewhereIsFalseAndForksNothing) {
    {
        const UniqueFd other = mounting::HoldLock();
        EXPECT_FALSE(session_.Mount());
    }
    EXPECT_TRUE(seams::Logged("Fail to lock mnt")) << seams::LogDump();
    EXPECT_EQ(mounting::forks, 0);
    EXPECT_EQ(seams::MicroSleeps().size(), 2200U);
}

TEST_F(Mount, WhoseLockCannotBeUpgradedKeepsTheSharedOne) {
    ASSERT_TRUE(Utils::LockMnt(false));
    EXPECT_FALSE(session_.Mount());
    EXPECT_FALSE(mounting::LockIsFree());
    EXPECT_EQ(seams::MicroSleeps().size(), 0U);
    Utils::UnLockMnt();
}

TEST_F(Mount, WhoseChildCannotTakeTheGroupMountsNothing) {
    seams::FailIdentity("setregid", EPERM);
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_EQ(Seen().mounts, 0);
    EXPECT_TRUE(seams::Logged("Failed to set gid 100, Operation not permitted"))
        << seams::LogDump();
}

TEST_F(Mount, WhoseChildCannotBecomeTheUserMountsNothing) {
    seams::FailIdentity("setreuid", EAGAIN);
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_FAILED);
    EXPECT_EQ(Seen().mounts, 0);
    EXPECT_TRUE(seams::Logged("Failed to set uid 5001, Resource temporarily unavailable"))
        << seams::LogDump();
}

TEST_F(Mount, WhoseChildCannotBecomeTheUserReportsTheCodeThatStoodInTheCell) {
    VFSSetErrEx(VFS_ERR_BUSY, "x", 1);
    seams::FailIdentity("setregid", EPERM);
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_BUSY);
    EXPECT_STREQ(GetErrorFile(), "mount.cpp");
}

TEST_F(Mount, SwitchesIdentityInTheRequiredOrder) {
    EXPECT_TRUE(session_.Mount());
    const std::vector<std::string> calls = seams::IdentityCalls();
    const std::vector<std::string> expected = {"setresuid(-1, 0, -1)", "setregid(100, 100)",
                                               "setreuid(5001, 5001)"};
    ASSERT_GE(calls.size(), expected.size());
    EXPECT_EQ(std::vector<std::string>(calls.end() - 3, calls.end()), expected);
}

// --- certificates of davs ---------------------------------------------------------------------

TEST_F(Mount, OfDavsWithARefusedCertificateNeverForks) {
    {
        const tls::TlsServer server(tls::Make({}));
        const auto pid_of_server = waitpid(-1, nullptr, WNOHANG);
        ASSERT_EQ(pid_of_server, 0) << "the server lives";
        session_.SetURI(("davs://localhost:" + std::to_string(server.Port())).c_str());
        EXPECT_FALSE(session_.Mount());
    }
    EXPECT_EQ(GetError(), VFS_ERR_CERT_UNTRUSTED);
    EXPECT_EQ(Detail()["subject"], "localhost");
    EXPECT_TRUE(seams::Logged("Failed to verify peer ssl CA")) << seams::LogDump();
    EXPECT_EQ(mounting::forks, 0);
    EXPECT_EQ(Seen().mounts, 0);
}

TEST_F(Mount, OfDavsWithAnUnreachableHostNeverForksOrLocks) {
    const UniqueFd other = mounting::HoldLock();
    session_.SetURI(("davs://localhost:" + std::to_string(tls::RefusedPort())).c_str());
    EXPECT_FALSE(session_.Mount());
    EXPECT_EQ(GetError(), VFS_ERR_HOST_UNREACHABLE);
    EXPECT_EQ(mounting::forks, 0);
    EXPECT_EQ(seams::MicroSleeps().size(), 0U);
}

TEST_F(Mount, OfDavsWithForceTakesTheCertificateAndMounts) {
    {
        const tls::TlsServer server(tls::Make({}));
        session_.SetURI(("davs://localhost:" + std::to_string(server.Port())).c_str());
        session_.SetForce(true);
        EXPECT_TRUE(session_.Mount());
    }
    EXPECT_EQ(Seen().mounts, 1);
}

// --- host keys of sftp ------------------------------------------------------------------------

class HostKey : public Mount {
  protected:
    HostKey() : file_(paths::KnownHosts(mounting::kUser)) {
        const std::string folder = std::filesystem::path(file_).parent_path();
        machine::Must(
            "mkdir -p " + folder + " && cd " + folder +
            " && rm -f * && ssh-keygen -q -t ed25519 -N '' -f key && cut -d' ' -f1,2 "
            "key.pub >pub && for h in '[nas.example]:2222' nas.example other.example; do "
            "echo \"$h $(cat pub)\"; done >known_hosts && rm key key.pub pub && chown -R " +
            std::to_string(mounting::kUser) + " . && chmod 700 .");
        session_.SetURI("sftp://nas.example:2222");
        session_.SetForce(true);
    }
    std::string Known() const { return machine::Read(file_); }

    std::string file_;
};

TEST_F(HostKey, IsForgottenWithForceAndOthersAreKept) {
    EXPECT_TRUE(session_.Mount());
    EXPECT_THAT(Known(), Not(HasSubstr("[nas.example]:2222")));
    EXPECT_THAT(Known(), HasSubstr("nas.example ssh-ed25519"));
    EXPECT_THAT(Known(), HasSubstr("other.example ssh-ed25519"));
    struct stat info {};
    ASSERT_EQ(stat(file_.c_str(), &info), 0);
    EXPECT_EQ(info.st_uid, mounting::kUser);
    EXPECT_EQ(Seen().mounts, 1);
}

TEST_F(HostKey, IsKeptWithoutForce) {
    session_.SetForce(false);
    EXPECT_TRUE(session_.Mount());
    EXPECT_THAT(Known(), HasSubstr("[nas.example]:2222"));
}

TEST_F(HostKey, IsKeptForOtherProtocols) {
    session_.SetURI("ftp://nas.example");
    EXPECT_TRUE(session_.Mount());
    EXPECT_THAT(Known(), HasSubstr("\nnas.example"));
}

TEST_F(HostKey, ThatCannotBeForgottenIsLoggedAndDoesNotStopTheMount) {
    std::ofstream(file_) << "no known_hosts file\n";
    EXPECT_TRUE(session_.Mount());
    EXPECT_TRUE(seams::LoggedPart("Failed to rmove ssh key [nas.example]:2222, errno="))
        << seams::LogDump();
}

TEST_F(HostKey, OfAUserWithoutAFileIsNothingToForget) {
    unlink(file_.c_str());
    EXPECT_TRUE(session_.Mount());
    EXPECT_FALSE(std::filesystem::exists(file_));
    EXPECT_FALSE(seams::LoggedPart("ssh key")) << seams::LogDump();
}

TEST_F(HostKey, IsKeptWhenTheIdentityCannotBeSwitchedAndTheMountGoesOn) {
    seams::FailIdentity("setresuid", EAGAIN);
    EXPECT_TRUE(session_.Mount());
    EXPECT_TRUE(seams::Logged("Failed to change to uid 5001")) << seams::LogDump();
    EXPECT_THAT(Known(), HasSubstr("[nas.example]:2222"));
    EXPECT_EQ(Seen().mounts, 1);
}

}  // namespace
}  // namespace ZYROVFS
