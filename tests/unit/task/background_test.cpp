// A clean-up in the background, as the web server sees it.
#include "task/background.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/wait.h>
#include <unistd.h>

#include "task_fixture.h"

namespace ZYROVFS {
namespace {

/** A pipe, and what reads as the end of it: nobody has its other end open any more. */
struct Pipe {
    Pipe() { EXPECT_EQ(pipe2(ends, O_CLOEXEC), 0); }
    ~Pipe() {
        close(ends[0]);
        close(ends[1]);
    }
    Pipe(const Pipe&) = delete;
    Pipe& operator=(const Pipe&) = delete;

    bool IsAtItsEnd() const {
        pollfd end{ends[0], POLLIN, 0};
        return poll(&end, 1, 10000) == 1 && (end.revents & POLLHUP) != 0;
    }
    int ends[2];
};

/** Takes the place of standard output and errors for as long as it lives. */
class OutputInto {
  public:
    explicit OutputInto(int fd) {
        fflush(nullptr);
        for (const int number : {STDOUT_FILENO, STDERR_FILENO}) {
            kept_[number] = fcntl(number, F_DUPFD_CLOEXEC, 10);
            dup2(fd, number);
        }
    }
    OutputInto(const OutputInto&) = delete;
    OutputInto& operator=(const OutputInto&) = delete;
    ~OutputInto() {
        for (const int number : {STDOUT_FILENO, STDERR_FILENO}) {
            dup2(kept_[number], number);
            close(kept_[number]);
        }
    }

  private:
    int kept_[3]{};
};

TEST(Background, ACleanUpDoesNotKeepTheCallersOutputOpen) {
    std::filesystem::remove_all("/var/tmp/user");
    setenv("ZYROVFS_UID", "1001", 1);
    TaskMgr tasks(3);
    ASSERT_TRUE(tasks.Add("copy", "gone", task_fixture::DeadPid()));
    Pipe output;
    Pipe go;
    seams::OnSleep([&] {
        char byte = 0;
        EXPECT_EQ(read(go.ends[0], &byte, 1), 1);  // the child waits until the test has looked
    });
    bool cleaned = false;
    {
        const OutputInto into(output.ends[1]);
        const int copy = dup(STDOUT_FILENO);  // as a program may have it twice
        cleaned = tasks.Clean("copy", nullptr, 0, nullptr, nullptr, true);
        close(copy);
    }
    close(output.ends[1]);
    output.ends[1] = -1;
    EXPECT_TRUE(output.IsAtItsEnd()) << "the child has it open still";
    EXPECT_EQ(write(go.ends[1], "", 1), 1);
    EXPECT_TRUE(cleaned);
    int status = -1;
    EXPECT_GT(wait(&status), 0);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(scratch::Text(task_fixture::kQueue), "");
}

TEST(Background, OtherDescriptorsStayOpen) {
    EXPECT_EQ(scratch::End(scratch::Start([] {
                  Pipe pipe;
                  task::LetGoOfOutput();
                  return write(pipe.ends[1], "", 1) == 1 ? 0 : 1;
              })),
              0);
}

}  // namespace
}  // namespace ZYROVFS
