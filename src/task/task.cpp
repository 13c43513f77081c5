#include "zyrovfs/task.h"

#include <sys/stat.h>
#include <unistd.h>
#include <zosplatform/file.h>
#include <zosplatform/process.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <memory>
#include <new>
#include <optional>

#include "core/error_cell.h"
#include "core/identity.h"
#include "task/background.h"
#include "task/task_file.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {

struct TaskMgrPrivate {
    uint64_t max_task;
};

namespace {

using task::Entry;
using task::IsType;
using task::OrOnFault;
using task::QueueFiles;
using task::QueueLock;
using task::QueueReader;

constexpr unsigned kDefaultMaxTask = 3;

/** A job, and what its caller knows of the others. */
struct Job {
    const char* name;
    const char* id;
    pid_t pid;
    TaskMgr::Check check;
    void* data;
};

bool IsEmpty(const char* text) {
    return text == nullptr || *text == '\0';
}

// --- adding -----------------------------------------------------------------------------------

bool MakeFolder(const QueueFiles& files) {
    constexpr unsigned kLeaveAlone = static_cast<unsigned>(-1);
    constexpr unsigned kOpenToAll = 0777;
    if (files.Open()) {
        return true;
    }
    const char* const path = files.folder.c_str();
    if (Utils::MkdirP(path, nullptr, 1, kLeaveAlone, kLeaveAlone, kOpenToAll) == 0) {
        if (files.Open()) {
            return true;
        }
        SetPlatformErr(ZOS_ERR_NO_PERMISSION);
    }
    LOG_ERROR("Failed to mkdir %s" PLATFORM_ERROR_FORMAT ", %m", path, ZYROERR_ARGS);
    return false;
}

UniqueFd OpenWithin10Seconds(const QueueFiles& files) {
    constexpr int kAttempts = 10;
    for (int attempt = 0; attempt < kAttempts; ++attempt) {
        UniqueFd fd = task::OpenForAppend(files);
        if (fd) {
            return fd;
        }
        LOG_ERROR("Failed to open %s (%s).", files.queue.c_str(), strerror(errno));
        sleep(1);
    }
    LOG_ERROR("Failed to wiret data");
    return UniqueFd();
}

/** In one piece. What a full disk let through of it goes again: it would spoil the next line. */
bool Append(int fd, const std::string& line, const std::string& path) {
    struct stat before {};
    const bool can_undo = fstat(fd, &before) == 0;
    errno = ENOSPC;
    const ssize_t written = write(fd, line.data(), line.size());
    if (written == static_cast<ssize_t>(line.size())) {
        return true;
    }
    LOG_ERROR("Failed to write %s. (%s)", path.c_str(), strerror(errno));
    if (written > 0 && can_undo && ftruncate(fd, before.st_size) != 0) {
        LOG_ERROR("Failed to truncate %s, %m", path.c_str());
    }
    return false;
}

bool AddLine(const QueueFiles& files, const char* id, pid_t pid) {
    if (strpbrk(id, "\t\n") != nullptr) {
        LOG_ERROR("A task id with a tab or a newline in it");
        return false;
    }
    if (!MakeFolder(files)) {
        return false;
    }
    const QueueLock lock(files, true);
    if (!lock) {
        LOG_ERROR("Failed to lock %s" PLATFORM_ERROR_FORMAT ", %m", files.lock.c_str(),
                  ZYROERR_ARGS);
        return false;
    }
    const UniqueFd fd = OpenWithin10Seconds(files);
    const std::string process = std::to_string(static_cast<unsigned>(pid));
    return fd && Append(fd.Get(), std::string(id) + "\t" + process + "\n", files.queue);
}

// --- asking -----------------------------------------------------------------------------------

/** Place of the job, 0 beyond the limit, -1 as the check said; nothing for a job without a line. */
std::optional<int64_t> FindPlace(QueueReader& reader, const Job& job, const std::string& process,
                                 uint64_t limit) {
    uint64_t place = 1;
    Entry entry{};
    while (reader.Next(entry)) {
        if (strcmp(entry.id, job.id) == 0 && process == entry.process) {
            return static_cast<int64_t>(place);
        }
        // Other jobs of the same process wait for each other by its own means.
        if (entry.pid == job.pid || YLIBCProcAlive(entry.pid) == 0) {
            continue;
        }
        const int verdict =
            job.check == nullptr ? 1 : job.check(job.name, entry.id, entry.pid, job.data);
        if (verdict == -1) {
            return -1;
        }
        if (verdict == 0) {
            continue;
        }
        if (place >= limit) {
            return 0;
        }
        ++place;
    }
    return std::nullopt;
}

int64_t AskForTurn(const QueueFiles& files, const Job& job, uint64_t limit) {
    if (!task::HasQueue(files) && !AddLine(files, job.id, job.pid)) {
        return 0;
    }
    QueueLock lock(files, false);
    if (!lock) {
        LOG_ERROR("Failed to lock %s " PLATFORM_ERROR_FORMAT ", %m", files.lock.c_str(),
                  ZYROERR_ARGS);
        return 0;
    }
    QueueReader reader;
    if (!reader.Open(files.Open(), files.name)) {
        LOG_ERROR("Failed to open %s, %m", files.queue.c_str());
        return 0;
    }
    const std::string process = std::to_string(static_cast<unsigned>(job.pid));
    const std::optional<int64_t> place = FindPlace(reader, job, process, limit);
    if (place) {
        return *place;
    }
    if (!reader.AtEnd()) {
        LOG_ERROR("Failed to read %s, %m", files.queue.c_str());
        return 0;
    }
    lock.Release();
    reader.Close();
    LOG_ERROR("Failed to find %s, pid %s", job.id, process.c_str());
    AddLine(files, job.id, job.pid);
    return 0;
}

/** Whether fewer living entries than the limit are of other processes than `pid`. */
bool HasRoom(QueueReader& reader, pid_t pid, uint64_t limit) {
    uint64_t count = 1;
    Entry entry{};
    while (reader.Next(entry)) {
        if (entry.pid == pid || YLIBCProcAlive(entry.pid) == 0) {
            continue;
        }
        if (count >= limit) {
            return false;
        }
        ++count;
    }
    return true;
}

bool AskForRoom(const QueueFiles& files, pid_t pid, uint64_t limit) {
    if (!task::HasQueue(files)) {
        return true;
    }
    // Before the lock is taken: a process without memory keeps nobody waiting.
    const std::unique_ptr<QueueReader> reader(new (std::nothrow) QueueReader);
    if (reader == nullptr) {
        SetPlatformErr(ZOS_ERR_OUT_OF_MEMORY);
        LOG_ERROR("Out of memory" PLATFORM_ERROR_FORMAT, ZYROERR_ARGS);
        return true;
    }
    const QueueLock lock(files, true);
    if (!lock) {
        LOG_ERROR("Failed to lock %s, %m" PLATFORM_ERROR_FORMAT, files.lock.c_str(), ZYROERR_ARGS);
        return true;
    }
    if (!reader->Open(files.Open(), files.name)) {
        LOG_ERROR("Failed to open %s, %m", files.queue.c_str());
        return true;
    }
    return HasRoom(*reader, pid, limit);
}

// --- cleaning ---------------------------------------------------------------------------------

/** Whether the entry stays in the queue when `job` cleans it. */
bool Stays(const Entry& entry, const Job& job, const std::string& process) {
    const bool meant =
        job.id != nullptr && strcmp(entry.id, job.id) == 0 && process == entry.process;
    if (meant || entry.pid == job.pid || YLIBCProcAlive(entry.pid) == 0) {
        return false;
    }
    return job.check == nullptr || job.check(job.name, entry.id, entry.pid, job.data) != 0;
}

bool CopyStaying(QueueReader& reader, FILE* fresh, const QueueFiles& files, const Job& job) {
    const std::string process = std::to_string(static_cast<unsigned>(job.pid));
    Entry entry{};
    while (reader.Next(entry)) {
        if (Stays(entry, job, process) && fprintf(fresh, "%s\t%s\n", entry.id, entry.process) < 0) {
            LOG_ERROR("Failed to save %s to %s, %m", entry.id, files.fresh.c_str());
            return false;
        }
    }
    if (!reader.AtEnd() || fflush(fresh) != 0) {
        LOG_ERROR("Failed to save data to %s, %m", files.fresh.c_str());
        return false;
    }
    return true;
}

bool Rewrite(const OwnedFolder& folder, const QueueFiles& files, const Job& job) {
    UniqueFile fresh = task::CreateFresh(folder, files.FreshName());
    if (fresh == nullptr) {
        SetPlatformErr(ZOS_ERR_OPEN_FAILED);
        return false;
    }
    QueueReader reader;
    if (!reader.Open(folder, files.name)) {
        LOG_ERROR("Failed to open %s, %m", files.queue.c_str());
        return false;
    }
    if (!CopyStaying(reader, fresh.get(), files, job)) {
        return false;
    }
    if (fclose(fresh.release()) != 0) {
        LOG_ERROR("Failed to close %s, %m", files.fresh.c_str());
        return false;
    }
    if (!folder.Rename(files.FreshName(), files.name)) {
        LOG_ERROR("Failed to rename %s, %m", files.fresh.c_str());
        return false;
    }
    return true;
}

bool CleanNow(const QueueFiles& files, const Job& job) {
    const QueueLock lock(files, true);
    if (!lock) {
        LOG_ERROR("Failed to lock %s, " PLATFORM_ERROR_FORMAT ", %m", files.lock.c_str(),
                  ZYROERR_ARGS);
        return false;
    }
    if (task::JustCleaned(files)) {
        return true;
    }
    // Jobs that are about to end do so in the meantime, and go with this clean-up.
    sleep(3);
    // Gone before the lock is: without it, the file could be another clean-up's.
    const OwnedFolder folder = files.Open();
    const ScopeExit remove_fresh([&] { folder.Remove(files.FreshName()); });
    if (!Rewrite(folder, files, job)) {
        return false;
    }
    YLIBCFileTouch(files.stamp.c_str());
    return true;
}

bool CleanOrHandOver(const QueueFiles& files, const Job& job, bool background) {
    if (!task::HasQueue(files) || task::JustCleaned(files)) {
        return true;
    }
    const pid_t child = background ? YLIBCProcFork() : -1;
    if (child > 0) {
        return true;
    }
    if (child == 0) {
        task::LetGoOfOutput();
    }
    const bool cleaned = OrOnFault(false, [&] { return CleanNow(files, job); });
    if (child == 0) {
        _exit(0);
    }
    return cleaned;
}

uint64_t LimitOf(const TaskMgrPrivate* self) {
    return self == nullptr ? kDefaultMaxTask : self->max_task;
}

}  // namespace

TaskMgr::TaskMgr(unsigned int maxTask) : private_(new (std::nothrow) TaskMgrPrivate{maxTask}) {}

TaskMgr::~TaskMgr() {
    delete private_;
}

void TaskMgr::SetMaxTask(unsigned int n) {
    if (private_ != nullptr) {
        private_->max_task = n == 0 ? kDefaultMaxTask : n;
    }
}

bool TaskMgr::GetTaskPath(const char* name, std::string& path) {
    return IsType(name) && OrOnFault(false, [&] {
               path = task::FilesOf(name).folder;
               return true;
           });
}

bool TaskMgr::Add(const char* name, const char* taskID, int pid) {
    return IsType(name) && !IsEmpty(taskID) && OrOnFault(false, [&] {
               const QueueFiles files = task::FilesOf(name);
               const RootUid as_root;
               return AddLine(files, taskID, pid);
           });
}

int64_t TaskMgr::IsRunnable(const char* name, const char* taskID, int pid, Check check,
                            void* data) {
    if (!IsType(name) || IsEmpty(taskID)) {
        return 0;
    }
    return OrOnFault(int64_t{0}, [&] {
        const QueueFiles files = task::FilesOf(name);
        const RootUid as_root;
        return AskForTurn(files, {name, taskID, pid, check, data}, LimitOf(private_));
    });
}

bool TaskMgr::IsAddable(const char* name, int pid) {
    return !IsType(name) || OrOnFault(true, [&] {
        const QueueFiles files = task::FilesOf(name);
        const RootUid as_root;
        return AskForRoom(files, pid, LimitOf(private_));
    });
}

bool TaskMgr::Clean(const char* name, const char* taskID, int pid, Check check, void* data,
                    bool background) {
    return IsType(name) && OrOnFault(false, [&] {
               const QueueFiles files = task::FilesOf(name);
               const RootUid as_root;
               return CleanOrHandOver(files, {name, taskID, pid, check, data}, background);
           });
}

}  // namespace ZYROVFS
