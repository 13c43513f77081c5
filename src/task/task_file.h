/** The files of one queue: where they are, their lock, and reading them line by line. */
#ifndef ZYROVFS_TASK_TASK_FILE_H
#define ZYROVFS_TASK_TASK_FILE_H

#include <sys/types.h>

#include <exception>
#include <string>

#include "core/handle.h"
#include "core/log.h"
#include "core/owned_folder.h"

namespace ZYROVFS::task {

/** Far beyond any queue, far below what would exhaust the memory of the box by its longest line. */
inline constexpr off_t kLargestQueue = 64 << 20;

/** A type names a folder and files in it: another name would lead root out of the registry. */
bool IsType(const char* name);

/** Nothing leaves an operation by exception; `fault` is its answer when memory runs out. */
template <typename Result, typename Body>
Result OrOnFault(Result fault, Body body, SourceLine at = SourceLine::Here()) noexcept {
    try {
        return body();
    } catch (const std::exception& e) {
        LOG_ERROR_AT(at, "Unexpected failure, %s", e.what());
        return fault;
    }
}

/** Under which nobody is kept from the queue; the umask in force takes from it. */
inline constexpr mode_t kQueueMode = 0777;

/** Paths for the log and for platform calls; the files are reached by Open and the names. */
struct QueueFiles {
    uid_t user;
    std::string name;  ///< of the type, and of the queue in its folder
    std::string folder;
    std::string queue;  ///< a line per job, in order of arrival: id, tab, process id
    std::string lock;
    std::string stamp;  ///< its modification time tells of the last clean-up
    std::string fresh;  ///< the queue to be, while it is cleaned

    OwnedFolder Open() const { return OwnedFolder::Open(folder, user); }
    std::string LockName() const { return name + ".lock"; }
    std::string StampName() const { return name + ".clean.stamp"; }
    std::string FreshName() const { return name + ".tmp"; }
};

/** Of the acting user: to be asked before the effective uid changes. */
QueueFiles FilesOf(const char* name);

/** Whether there is a queue, which is a file of the registry's own. */
bool HasQueue(const QueueFiles& files);

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
    bool Open(const OwnedFolder& folder, const std::string& name);
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

/** Opens the queue for adding to it, made if it is missing. Invalid with errno. */
UniqueFd OpenForAppend(const QueueFiles& files);

/** A new and empty file in place of one that somebody left; null with errno. */
UniqueFile CreateFresh(const OwnedFolder& folder, const std::string& name);

/** Whether the stamp says that somebody has cleaned within the last two seconds. */
bool JustCleaned(const QueueFiles& files);

}  // namespace ZYROVFS::task

#endif
