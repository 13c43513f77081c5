#include "task/task_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <zosplatform/file.h>
#include <zosplatform/text.h>

#include <cerrno>
#include <charconv>
#include <cstdint>
#include <cstring>
#include <ctime>
#include <utility>

#include "core/entry_name.h"
#include "core/paths.h"
#include "zyrovfs/global.h"

namespace ZYROVFS::task {
namespace {

constexpr int kLockSeconds = 600;

UniqueFile Stream(UniqueFd fd, const char* mode) {
    UniqueFile file(fd ? fdopen(fd.Get(), mode) : nullptr);
    if (file != nullptr) {
        fd.Release();
    }
    return file;
}

pid_t ProcessId(const char* text) {
    pid_t pid = 0;
    const char* end = text + strlen(text);
    const auto [stop, error] = std::from_chars(text, end, pid);
    return error == std::errc() && stop == end ? pid : 0;
}

}  // namespace

bool IsType(const char* name) {
    return name != nullptr && IsEntryName(name);
}

QueueFiles FilesOf(const char* name) {
    QueueFiles files{};
    files.user = GetActorUID();
    files.name = name;
    files.folder = paths::TaskRoot(files.user) + "/" + name;
    files.queue = files.folder + "/" + name;
    files.lock = files.queue + ".lock";
    files.stamp = files.queue + ".clean.stamp";
    files.fresh = files.queue + ".tmp";
    return files;
}

bool HasQueue(const QueueFiles& files) {
    const OwnedFolder folder = files.Open();
    struct stat info {};
    return folder && folder.Stat(files.name, info);
}

/** The file is made here, and a stranger's moved aside: who has it can lock it for ever. What fails
 * here is told by the lock itself. */
QueueLock::QueueLock(const QueueFiles& files, bool exclusive) {
    const OwnedFolder folder = files.Open();
    if (folder) {
        folder.OpenOrMake(files.LockName(), O_RDWR, 0600);
    }
    if (YLIBCFileLockTimeByFile(files.lock.c_str(), exclusive ? 1 : 0, kLockSeconds, &fd_) == 0) {
        fd_ = -1;
    }
}

void QueueLock::Release() {
    if (fd_ >= 0) {
        YLIBCFileUnlockByFile(std::exchange(fd_, -1));
    }
}

bool QueueReader::Open(const OwnedFolder& folder, const std::string& name) {
    UniqueFd fd = folder.OpenFile(name, O_RDONLY);
    struct stat info {};
    if (fd && (fstat(fd.Get(), &info) != 0 || info.st_size > kLargestQueue)) {
        errno = EFBIG;
        return false;
    }
    file_ = Stream(std::move(fd), "r");
    return file_ != nullptr;
}

bool QueueReader::Next(Entry& entry) {
    constexpr const char* kBetween = "\t\n";
    for (;;) {
        char* line = line_.release();
        const ssize_t length = getline(&line, &capacity_, file_.get());
        line_.reset(line);
        if (length < 0) {
            return false;
        }
        char* rest = nullptr;
        entry.id = YLIBCStrTok(line, kBetween, &rest);
        entry.process = entry.id == nullptr ? nullptr : YLIBCStrTok(nullptr, kBetween, &rest);
        if (entry.process != nullptr) {
            entry.pid = ProcessId(entry.process);
            return true;
        }
    }
}

bool QueueReader::AtEnd() const {
    return feof(file_.get()) != 0;
}

UniqueFd OpenForAppend(const QueueFiles& files) {
    const OwnedFolder folder = files.Open();
    return folder ? folder.OpenOrMake(files.name, O_RDWR | O_APPEND, kQueueMode) : UniqueFd();
}

UniqueFile CreateFresh(const OwnedFolder& folder, const std::string& name) {
    folder.Remove(name);  // what a killed clean-up left; nobody else has it while we hold the lock
    return Stream(folder.MakeFile(name, O_WRONLY, kQueueMode), "w");
}

bool JustCleaned(const QueueFiles& files) {
    const OwnedFolder folder = files.Open();
    struct stat info {};
    if (!folder || !folder.Stat(files.StampName(), info) || !S_ISREG(info.st_mode)) {
        return false;
    }
    // Unsigned, so that one comparison bounds both sides: a clock that was set back must not keep
    // the queue from being cleaned until it has caught up.
    return static_cast<uint64_t>(info.st_mtime - time(nullptr) + 2) < 5;
}

}  // namespace ZYROVFS::task
