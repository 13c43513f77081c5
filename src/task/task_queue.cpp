// What stands in the queues, for those who show it.
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>

#include "core/identity.h"
#include "core/paths.h"
#include "task/task_file.h"
#include "zyrovfs/global.h"
#include "zyrovfs/task.h"

namespace ZYROVFS {
namespace {

using task::IsType;
using task::OrOnFault;
using task::QueueFiles;
using task::QueueLock;

bool ReadNames(const OwnedFolder& root, std::vector<std::string>& names) {
    UniqueFd fd = root.OpenForReading();
    const UniqueDir dir(fd ? fdopendir(fd.Get()) : nullptr);
    if (dir == nullptr) {
        return false;
    }
    fd.Release();
    struct stat info {};
    while (const dirent* entry = readdir(dir.get())) {
        const std::string name = entry->d_name;
        if (IsType(name.c_str()) && root.Stat(name, info) && S_ISDIR(info.st_mode)) {
            names.push_back(name);
        }
    }
    std::sort(names.begin(), names.end());
    return true;
}

bool ReadEntries(const QueueFiles& files, std::vector<TaskQueueEntry>& entries) {
    const QueueLock lock(files, false);
    task::QueueReader reader;
    if (!lock || !reader.Open(files.Open(), files.name)) {
        LOG_ERROR("Failed to read %s, %m", files.queue.c_str());
        return false;
    }
    task::Entry entry{};
    while (reader.Next(entry)) {
        entries.push_back({entry.id, entry.pid});
    }
    return reader.AtEnd();
}

/** Looked for behind a newline, so that it is a whole line and not the end of one. */
bool CutLine(std::string& text, const std::string& line) {
    const size_t at = ("\n" + text).find("\n" + line);
    if (at == std::string::npos) {
        return false;
    }
    text.erase(at, line.size());
    return true;
}

bool RemoveLine(const QueueFiles& files, const std::string& line) {
    const QueueLock lock(files, true);
    const OwnedFolder folder = files.Open();
    std::string text;
    struct stat info {};
    if (!lock || !folder || !folder.Stat(files.name, info) ||
        !folder.Read(files.name, task::kLargestQueue, text)) {
        LOG_ERROR("Failed to read %s, %m", files.queue.c_str());
        return false;
    }
    if (!CutLine(text, line)) {
        return true;
    }
    const bool done =
        folder.Replace(files.name, text, info.st_mode & 07777, {info.st_uid, info.st_gid});
    if (!done) {
        LOG_ERROR("Failed to write %s, %m", files.queue.c_str());
    }
    return done;
}

}  // namespace

bool ListTaskQueues(std::vector<std::string>& names) {
    names.clear();
    return OrOnFault(false, [&] {
        const uid_t user = GetActorUID();
        const RootUid as_root;
        const OwnedFolder root = OwnedFolder::Open(paths::TaskRoot(user), user);
        return root ? ReadNames(root, names) : errno == ENOENT;
    });
}

bool ReadTaskQueue(const char* name, std::vector<TaskQueueEntry>& entries) {
    entries.clear();
    return IsType(name) && OrOnFault(false, [&] {
               const QueueFiles files = task::FilesOf(name);
               const RootUid as_root;
               return !task::HasQueue(files) ? errno == ENOENT : ReadEntries(files, entries);
           });
}

bool RemoveFromTaskQueue(const char* name, const char* taskID, int pid) {
    return IsType(name) && taskID != nullptr && OrOnFault(false, [&] {
               const QueueFiles files = task::FilesOf(name);
               const RootUid as_root;
               return RemoveLine(files, std::string(taskID) + "\t" +
                                            std::to_string(static_cast<unsigned>(pid)) + "\n");
           });
}

}  // namespace ZYROVFS
