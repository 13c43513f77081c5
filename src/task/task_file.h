/** The files of one queue: where they are, their lock, and reading them line by line. */
#ifndef ZYROVFS_TASK_TASK_FILE_H
#define ZYROVFS_TASK_TASK_FILE_H

#include <sys/types.h>

#include <string>

#include "core/handle.h"

namespace ZYROVFS::task {

/** Under which nobody is kept from the queue; the umask in force takes from it. */
inline constexpr mode_t kQueueMode = 0777;

struct QueueFiles {
    std::string folder;
    std::string queue;  ///< a line per job, in order of arrival: id, tab, process id
    std::string lock;
    std::string stamp;  ///< its modification time tells of the last clean-up
    std::string fresh;  ///< the queue to be, while it is cleaned
};

/** Of the acting user: to be asked before the effective uid changes. */
QueueFiles FilesOf(const char* name);

/** The lock of a queue for as long as the object lives; false when it could not be had. */
class QueueLock {
  public:
    /** Waits up to ten minutes. A failure leaves errno and the platform error. */
    QueueLock(const QueueFiles& files, bool exclusive);
    QueueLock(const QueueLock&) = delete;
    QueueLock& operator=(const QueueLock&) = delete;
    ~QueueLock() { Release(); }

    explicit operator bool() const { return fd_ >= 0; }
    void Release();

  private:
    int fd_ = -1;
};

/** One job as its line tells it; the texts live until the next line is read. */
struct Entry {
    const char* id;
    const char* process;  ///< the process id as it is written
    pid_t pid;            ///< 0, which is nobody's, for a text that is no process id
};

/** Reads a queue from its beginning. */
class QueueReader {
  public:
    /** False, with errno, also for what is no regular file: users can write to the folder. */
    bool Open(const std::string& path);
    /** The next line that has two words. False at the end, or when reading fails. */
    bool Next(Entry& entry);
    /** Whether Next has come to the end of the file, as opposed to a failure that errno tells. */
    bool AtEnd() const;
    void Close() { file_.reset(); }

  private:
    UniqueFile file_;
    UniqueCString line_;
    size_t capacity_ = 0;
};

/** Opens what lies in a folder that users can write to: no link is followed. Invalid with errno. */
UniqueFd OpenForAppend(const std::string& path);

/** A new and empty file in place of one that somebody left; null with errno. */
UniqueFile CreateFresh(const std::string& path);

/** Whether the stamp says that somebody has cleaned within the last two seconds. */
bool JustCleaned(const std::string& stamp);

}  // namespace ZYROVFS::task

#endif
