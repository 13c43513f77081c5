#include <pthread.h>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <zosplatform/error.h>
#include <zosplatform/process.h>

#include <climits>
#include <csignal>
#include <cstring>
#include <future>
#include <memory>
#include <thread>

#include "support/scratch.h"

namespace {

struct FreeProc {
    void operator()(PYLIBCPROC proc) const { YLIBCProcFree(proc); }
};
using Proc = std::unique_ptr<YLIBCPROC, FreeProc>;

Proc Get(pid_t pid) {
    return Proc(YLIBCProcGetByPid(pid));
}

/** A child that has done `prepare` and then waits for its end. */
pid_t StartReady(const std::function<void()>& prepare) {
    int ready[2];
    EXPECT_EQ(pipe(ready), 0);
    const pid_t pid = scratch::Start([&] {
        prepare();
        close(ready[1]);
        close(ready[0]);
        for (;;) {
            pause();
        }
        return 0;
    });
    close(ready[1]);
    char none = 0;
    EXPECT_EQ(read(ready[0], &none, 1), 0);
    close(ready[0]);
    return pid;
}

void Stop(pid_t pid) {
    kill(pid, SIGKILL);
    scratch::End(pid);
}

void WaitUntilEnded(pid_t pid) {
    siginfo_t info{};
    EXPECT_EQ(waitid(P_PID, static_cast<id_t>(pid), &info, WEXITED | WNOWAIT), 0);
}

TEST(ProcAlive, TheRunningProcessIs) {
    EXPECT_EQ(YLIBCProcAlive(getpid()), 1);
}

TEST(ProcAlive, AnEndedProcessIsNotEvenBeforeItIsCollected) {
    const pid_t pid = scratch::Start([] { return 0; });
    WaitUntilEnded(pid);
    EXPECT_EQ(kill(pid, 0), 0) << "its number is still taken";
    EXPECT_EQ(YLIBCProcAlive(pid), 0);
    scratch::End(pid);
    EXPECT_EQ(YLIBCProcAlive(pid), 0);
}

TEST(ProcAlive, AStoppedProcessIs) {
    const pid_t pid = StartReady([] {});
    kill(pid, SIGSTOP);
    siginfo_t info{};
    ASSERT_EQ(waitid(P_PID, static_cast<id_t>(pid), &info, WSTOPPED), 0);
    EXPECT_EQ(YLIBCProcAlive(pid), 1);
    Stop(pid);
}

TEST(ProcAlive, AProcessWhoseFirstThreadEndedIs) {
    auto* tid = static_cast<pid_t*>(
        mmap(nullptr, sizeof(pid_t), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0));
    ASSERT_NE(tid, MAP_FAILED);
    *tid = 0;
    const pid_t pid = scratch::Start([tid] {
        pthread_t thread;
        pthread_create(
            &thread, nullptr,
            [](void* out) -> void* {
                // Tells only when the first thread has gone.
                char state[256] = "";
                while (std::strstr(state, ") Z") == nullptr) {
                    FILE* stat = fopen("/proc/self/stat", "r");
                    if (fgets(state, sizeof state, stat) == nullptr) {
                        break;
                    }
                    fclose(stat);
                }
                *static_cast<volatile pid_t*>(out) = gettid();
                for (;;) {
                    pause();
                }
            },
            tid);
        return static_cast<int>(syscall(SYS_exit, 0));  // this thread alone
    });
    while (*static_cast<volatile pid_t*>(tid) == 0) {
        sched_yield();
    }
    EXPECT_EQ(YLIBCProcAlive(pid), 1);
    Stop(pid);
    EXPECT_EQ(YLIBCProcAlive(pid), 0);
    munmap(tid, sizeof(pid_t));
}

TEST(ProcAlive, NumbersThatAreNoProcessAreNot) {
    for (const pid_t pid : {0, -1, INT_MIN, INT_MAX}) {
        EXPECT_EQ(YLIBCProcAlive(pid), 0) << pid;
    }
}

/** A pid that was read from a file may be a thread's number by now, of any process. */
TEST(ProcAlive, AThreadIsNoProcess) {
    std::promise<pid_t> number;
    std::promise<void> end;
    std::thread thread([&] {
        number.set_value(gettid());
        end.get_future().wait();
    });
    const pid_t tid = number.get_future().get();
    EXPECT_NE(tid, getpid());
    EXPECT_EQ(YLIBCProcAlive(tid), 0);
    EXPECT_EQ(YLIBCProcGetByPid(tid), nullptr);
    end.set_value();
    thread.join();
}

TEST(ProcGetByPid, GivesTheKernelsNameAndTheEffectiveUser) {
    const pid_t pid = StartReady([] {
        prctl(PR_SET_NAME, "a name) Z 12345");
        ASSERT_EQ(setresuid(0, 1234, 0), 0);
    });
    const Proc proc = Get(pid);
    ASSERT_NE(proc, nullptr);
    EXPECT_EQ(proc->pid, pid);
    EXPECT_EQ(proc->uid, 1234U);
    EXPECT_STREQ(proc->name, "a name) Z 12345");
    EXPECT_EQ(YLIBCProcAlive(pid), 1) << "a name may look like a state";
    Stop(pid);
}

TEST(ProcGetByPid, ANameCannotFakeAUser) {
    const pid_t pid = StartReady([] { prctl(PR_SET_NAME, "x\nUid:\t0\t0\t0\t0"); });
    const pid_t other = StartReady([] {
        prctl(PR_SET_NAME, "x\nUid:\t0\t0");
        ASSERT_TRUE(scratch::BecomeUser(1234));
    });
    EXPECT_STREQ(Get(pid)->name, "x\nUid:\t0\t0\t0\t0");
    EXPECT_EQ(Get(other)->uid, 1234U);
    Stop(pid);
    Stop(other);
}

TEST(ProcGetByPid, NoSuchProcess) {
    const pid_t gone = scratch::Start([] { return 0; });
    scratch::End(gone);
    for (const pid_t pid : {gone, 0, -1}) {
        YLIBCErrSetEx(0, "", 0);
        EXPECT_EQ(Get(pid), nullptr);
        EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_NOT_FOUND);
    }
    YLIBCProcFree(nullptr);
}

TEST(ProcFork, ChildHasNoPendingSignals) {
    sigset_t blocked;
    sigset_t before;
    sigemptyset(&blocked);
    sigaddset(&blocked, SIGUSR1);
    ASSERT_EQ(sigprocmask(SIG_BLOCK, &blocked, &before), 0);
    raise(SIGUSR1);
    const pid_t pid = YLIBCProcFork();
    ASSERT_GE(pid, 0);
    if (pid == 0) {
        sigset_t pending;
        sigpending(&pending);
        _exit(sigismember(&pending, SIGUSR1));
    }
    EXPECT_EQ(scratch::End(pid), 0);
    signal(SIGUSR1, SIG_IGN);
    sigprocmask(SIG_SETMASK, &before, nullptr);
    signal(SIGUSR1, SIG_DFL);
}

TEST(PrivilegedMode, APlainLinuxMayRunTheFeature) {
    EXPECT_EQ(ZYRODZOSIsPrivilegedMode(), 1);
}

}  // namespace
