#include "task/task_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <zosplatform/file.h>
#include <zosplatform/text.h>

#include <cerrno>
#include <charconv>
#include <cstdint>
#include <cstring>
#include <ctime>
#include <utility>

#include "core/paths.h"
#include "zyrovfs/global.h"

namespace ZYROVFS::task {
namespace {

constexpr int kLockSeconds = 600;
constexpr int kNoTrap = O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC;

bool IsRegular(int fd) {
    struct stat info {};
    if (fstat(fd, &info) != 0) {
        return false;
    }
    if (!S_ISREG(info.st_mode)) {
        errno = S_ISDIR(info.st_mode) ? EISDIR : ENXIO;
        return false;
    }
    return true;
}

/** An open regular file, or none with errno. */
UniqueFd OpenRegular(const std::string& path, int flags, mode_t mode = 0) {
    UniqueFd fd(open(path.c_str(), flags | kNoTrap, mode));
    if (fd && !IsRegular(fd.Get())) {
        const int error = errno;
        fd.Reset();
        errno = error;
    }
    return fd;
}

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

QueueFiles FilesOf(const char* name) {
    QueueFiles files;
    files.folder = paths::TaskRoot(GetActorUID()) + "/" + name;
    files.queue = files.folder + "/" + name;
    files.lock = files.queue + ".lock";
    files.stamp = files.queue + ".clean.stamp";
    files.fresh = files.queue + ".tmp";
    return files;
}

QueueLock::QueueLock(const QueueFiles& files, bool exclusive) {
    if (YLIBCFileLockTimeByFile(files.lock.c_str(), exclusive ? 1 : 0, kLockSeconds, &fd_) == 0) {
        fd_ = -1;
    }
}

void QueueLock::Release() {
    if (fd_ >= 0) {
        YLIBCFileUnlockByFile(std::exchange(fd_, -1));
    }
}

bool QueueReader::Open(const std::string& path) {
    file_ = Stream(OpenRegular(path, O_RDONLY), "r");
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

UniqueFd OpenForAppend(const std::string& path) {
    return OpenRegular(path, O_RDWR | O_CREAT | O_APPEND, kQueueMode);
}

UniqueFile CreateFresh(const std::string& path) {
    unlink(path.c_str());  // what a killed clean-up left; nobody else has it while we hold the lock
    return Stream(OpenRegular(path, O_WRONLY | O_CREAT | O_EXCL, kQueueMode), "w");
}

bool JustCleaned(const std::string& stamp) {
    struct stat info {};
    if (stat(stamp.c_str(), &info) != 0 || !S_ISREG(info.st_mode)) {
        return false;
    }
    // Unsigned, so that one comparison bounds both sides: a clock that was set back must not keep
    // the queue from being cleaned until it has caught up.
    return static_cast<uint64_t>(info.st_mtime - time(nullptr) + 2) < 5;
}

}  // namespace ZYROVFS::task
