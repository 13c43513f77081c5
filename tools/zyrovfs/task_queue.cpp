#include "task_queue.h"

#include <zosplatform/file.h>
#include <zosplatform/process.h>
#include <zyrovfs/task.h>

#include <algorithm>
#include <charconv>
#include <filesystem>
#include <sstream>

#include "file.h"

namespace tool {
namespace {

namespace fs = std::filesystem;

std::string QueueFolder(const std::string& name) {
    std::string folder;
    ZYROVFS::TaskMgr::GetTaskPath(name.c_str(), folder);
    return folder;
}

std::string QueueFile(const std::string& name) {
    return QueueFolder(name) + "/" + name;
}

/** The users can write to the folder: a link or a FIFO in the queue's place is not read. */
bool IsRegular(const std::string& path) {
    std::error_code error;
    return fs::symlink_status(path, error).type() == fs::file_type::regular;
}

/** The lock that the library takes, for as long as the object lives. */
class Lock {
  public:
    Lock(const std::string& queue, bool exclusive) {
        constexpr int kSeconds = 600;
        held_ = YLIBCFileLockTimeByFile((queue + ".lock").c_str(), exclusive ? 1 : 0, kSeconds,
                                        &fd_) != 0;
    }
    Lock(const Lock&) = delete;
    Lock& operator=(const Lock&) = delete;
    ~Lock() {
        if (held_) {
            YLIBCFileUnlockByFile(fd_);
        }
    }
    explicit operator bool() const { return held_; }

  private:
    int fd_ = -1;
    bool held_ = false;
};

/** False for a line that tells no job. */
bool ParseLine(const std::string& line, TaskEntry& entry) {
    std::istringstream words(line);
    std::string pid;
    if (!std::getline(words, entry.id, '\t') || !std::getline(words, pid, '\t')) {
        return false;
    }
    const char* end = pid.data() + pid.size();
    const auto [stop, error] = std::from_chars(pid.data(), end, entry.pid);
    return error == std::errc() && stop == end;
}

/** Entries of one process take no place before each other. */
void CountPlaces(std::vector<TaskEntry>& entries) {
    for (auto entry = entries.begin(); entry != entries.end(); ++entry) {
        entry->alive = YLIBCProcAlive(entry->pid) != 0;
        const auto before = std::count_if(entries.begin(), entry, [&](const TaskEntry& other) {
            return other.alive && other.pid != entry->pid;
        });
        entry->place = entry->alive ? static_cast<int>(before) + 1 : 0;
    }
}

}  // namespace

std::vector<std::string> TaskNames() {
    std::vector<std::string> names;
    std::error_code error;
    for (const auto& folder :
         fs::directory_iterator(fs::path(QueueFolder("any")).parent_path(), error)) {
        names.push_back(folder.path().filename());
    }
    std::sort(names.begin(), names.end());
    return names;
}

bool ReadTasks(const std::string& name, std::vector<TaskEntry>& entries) {
    entries.clear();
    const std::string queue = QueueFile(name);
    if (YLIBCFileExist(queue.c_str()) == 0) {
        return true;
    }
    const Lock lock(queue, false);
    std::string text;
    if (!lock || !IsRegular(queue) || !ReadFile(queue, text)) {
        return false;
    }
    std::istringstream lines(text);
    TaskEntry entry{};
    for (std::string line; std::getline(lines, line);) {
        if (ParseLine(line, entry)) {
            entries.push_back(entry);
        }
    }
    CountPlaces(entries);
    return true;
}

bool RemoveTask(const std::string& name, const std::string& id, int pid) {
    const std::string queue = QueueFile(name);
    const Lock lock(queue, true);
    std::string text;
    if (!lock || !IsRegular(queue) || !ReadFile(queue, text)) {
        return false;
    }
    // Looked for behind a newline, so that it is a whole line and not the end of one.
    text.insert(0, "\n");
    const std::string line = "\n" + id + "\t" + std::to_string(pid) + "\n";
    const size_t at = text.find(line);
    if (at == std::string::npos) {
        return true;
    }
    text.erase(at, line.size() - 1);
    std::error_code error;
    const auto mode = static_cast<mode_t>(fs::status(queue, error).permissions());
    return !error && ReplaceFile(queue, text.substr(1), mode);
}

}  // namespace tool
