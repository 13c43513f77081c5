/** Whose turn it is: the queues of a user's background jobs. */
#ifndef ZYROVFS_TASK_H
#define ZYROVFS_TASK_H

#include <cstdint>
#include <string>
#include <vector>

#include "zyrovfs/export.h"

namespace ZYROVFS {

struct TaskMgrPrivate;

/**
 * Each type of job has one queue per user (GetActorUID), in order of arrival, which all processes
 * of that user share. An entry is a job id and the process that does the job; it counts as long as
 * that process lives. The registry is files and nothing else: a job that ends needs no goodbye, and
 * Clean takes out what has ended.
 *
 * Every operation works as root (effective or saved) and puts the effective uid back, so a process
 * must not run other work beside these calls. They wait up to ten minutes for the queue's lock,
 * never throw and leave the error cell alone; failures are logged. `name` is the type, a file name
 * that the caller chooses; `taskID` is a text without tabs and newlines.
 */
class ZYROVFS_API TaskMgr {
  public:
    /**
     * What a caller knows of a living entry: 0 when it does not compete (IsRunnable) or is to go
     * (Clean), -1 to give the question up (IsRunnable), any other value when it counts. Called as
     * root with the queue locked: it must not use the registry itself. `data` is the caller's own.
     */
    using Check = int (*)(const char* name, const char* taskID, int pid, void* data);

    /** `maxTask` jobs may run at once. 0 is kept: nobody may then run behind a living entry. */
    explicit TaskMgr(unsigned int maxTask);
    ~TaskMgr();
    TaskMgr(const TaskMgr&) = delete;
    TaskMgr& operator=(const TaskMgr&) = delete;

    /** 0 stands for 3. The limit is this object's and is not stored: all processes that share a
     * queue should set the same. */
    void SetMaxTask(unsigned int n);

    /** Folder of a type. False for a null or empty name. */
    static bool GetTaskPath(const char* name, std::string& path);

    /**
     * Puts a job at the end of its queue; adding it twice gives two entries. False for a null or
     * empty argument, a task id that a line cannot hold, and when the registry fails.
     */
    bool Add(const char* name, const char* taskID, int pid);

    /**
     * The job's place, from 1 up to the limit, when its turn has come; 0 when it has to wait or the
     * registry fails; -1 when `check` said so. A job without an entry is added at the end, which
     * answers 0, but 1 where it is the first of its queue. Dead entries and other entries of `pid`
     * take no place. `check` may be null.
     */
    int64_t IsRunnable(const char* name, const char* taskID, int pid, Check check, void* data);

    /**
     * Whether a new job of the process `pid` would find room: fewer living entries of other
     * processes than the limit. True also when the registry fails, which is no reason to stop a
     * user's work.
     */
    bool IsAddable(const char* name, int pid);

    /**
     * Takes out the entry of `taskID` (may be null) and `pid`, every entry of `pid`, of dead
     * processes, and those for which `check` (may be null) answers 0. Takes three seconds, with the
     * queue locked; `background` leaves that to a child process, which the caller may collect, and
     * answers true at once. True also when nothing was done: no queue, or cleaned within the last
     * two seconds. A failure leaves the queue as it was.
     */
    bool Clean(const char* name, const char* taskID, int pid, Check check, void* data,
               bool background);

  private:
    TaskMgrPrivate* private_;
};

// --- what stands in the queues, for people to see. As the operations above: they work as root,
// wait for the lock, never throw and leave the error cell alone.

struct TaskQueueEntry {
    std::string id;
    int pid;
};

/** Types of which the acting user has queues, sorted; none where nothing was ever queued. False
 * when the registry cannot be read. */
ZYROVFS_API bool ListTaskQueues(std::vector<std::string>& names);

/** The entries of a queue in their order, none for a queue that is not there. False when it cannot
 * be locked or read, also for what a stranger put in its place. */
ZYROVFS_API bool ReadTaskQueue(const char* name, std::vector<TaskQueueEntry>& entries);

/**
 * Takes one entry out, at once: Clean keeps the whole queue waiting for seconds, which is for jobs
 * that died in it. True also for an entry that is not there; false when the queue cannot be locked,
 * read or written.
 */
ZYROVFS_API bool RemoveFromTaskQueue(const char* name, const char* taskID, int pid);

}  // namespace ZYROVFS

#endif
