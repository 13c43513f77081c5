/** A second process for tests of what processes do to each other. */
#ifndef ZYROVFS_TESTS_OTHER_PROCESS_H
#define ZYROVFS_TESTS_OTHER_PROCESS_H

#include <sys/types.h>

#include <functional>

namespace support {

/**
 * A forked process that does `begin`, tells so, and stays until it is ended. The constructor
 * returns when `begin` is done; `ok()` says whether it answered true.
 */
class OtherProcess {
  public:
    explicit OtherProcess(const std::function<bool()>& begin);
    OtherProcess(const OtherProcess&) = delete;
    OtherProcess& operator=(const OtherProcess&) = delete;
    ~OtherProcess();

    bool ok() const { return ok_; }
    pid_t pid() const { return pid_; }
    /** Ends it and collects it; harmless when it has ended. */
    void End();
    bool Runs() const;
    /** Waits for it to end by itself: the signal that ended it, 0 when none did. */
    int EndedBy();

  private:
    pid_t pid_ = -1;
    bool ok_ = false;
};

/** Exit status of a forked process that runs `body`; -1 when a signal ended it. */
int ExitOf(const std::function<int()>& body);

/** Whether a process of its own could have this flock operation on the file at once. */
bool OthersCanLock(const char* path, int operation);

}  // namespace support

#endif
