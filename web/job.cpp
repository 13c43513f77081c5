#include "job.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/file.h>
#include <sys/mman.h>
#include <sys/random.h>
#include <sys/stat.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <cerrno>
#include <cstring>
#include <ctime>

namespace web {
namespace {

/** In memory, and of root alone. */
constexpr const char* kBase = "/run";
constexpr const char* kFolders[] = {"zyrovfs", "web"};
constexpr size_t kMostJobs = 64;  // of a user and kind
constexpr size_t kShortestId = 16;
constexpr size_t kLongestId = 64;

const char* FolderOf(JobKind kind) {
    return kind == JobKind::kUpload ? "upload" : "copy";
}

Descriptor Enter(const Descriptor& parent, const std::string& name, bool make) {
    if (make) {
        mkdirat(parent.Get(), name.c_str(), 0700);
    }
    return Descriptor(
        openat(parent.Get(), name.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
}

/** The folder of a user's records; no descriptor when there is none. For root. */
Descriptor OpenFolder(const User& user, JobKind kind, bool make) {
    Descriptor folder(open(kBase, O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    for (const char* name : kFolders) {
        folder = Enter(folder, name, make);
    }
    folder = Enter(folder, std::to_string(user.uid), make);
    return Enter(folder, FolderOf(kind), make);
}

/** Whether the process that does the work lives. */
bool IsLocked(int fd) {
    if (flock(fd, LOCK_SH | LOCK_NB) == 0) {
        flock(fd, LOCK_UN);
        return false;
    }
    return errno == EWOULDBLOCK;
}

JobRecord* Map(int fd, int protection) {
    struct stat file {};
    // A record whose maker was killed before it had its size would end the reader by a signal.
    if (fstat(fd, &file) != 0 || file.st_size != sizeof(JobRecord)) {
        return nullptr;
    }
    void* memory = mmap(nullptr, sizeof(JobRecord), protection, MAP_SHARED, fd, 0);
    return memory == MAP_FAILED ? nullptr : static_cast<JobRecord*>(memory);
}

void Unmap(JobRecord* record) {
    munmap(record, sizeof(JobRecord));
}

std::vector<std::string> NamesIn(const Descriptor& folder) {
    std::vector<std::string> names;
    DIR* const listing = folder.Get() < 0 ? nullptr : fdopendir(dup(folder.Get()));
    if (listing == nullptr) {
        return names;
    }
    rewinddir(listing);
    while (const dirent* item = readdir(listing)) {
        if (item->d_name[0] != '.') {
            names.emplace_back(item->d_name);
        }
    }
    closedir(listing);
    return names;
}

/** Makes room for one more: records of work that has ended go, the oldest first. */
void MakeRoom(const Descriptor& folder) {
    std::vector<std::pair<time_t, std::string>> ended;
    const std::vector<std::string> names = NamesIn(folder);
    if (names.size() < kMostJobs) {
        return;
    }
    for (const std::string& name : names) {
        const Descriptor fd(openat(folder.Get(), name.c_str(), O_RDWR | O_NOFOLLOW | O_CLOEXEC));
        struct stat file {};
        if (fd.Get() >= 0 && fstat(fd.Get(), &file) == 0 && !IsLocked(fd.Get())) {
            ended.emplace_back(file.st_mtime, name);
        }
    }
    if (ended.empty()) {
        throw Failure(429, "Too much is under way at once.")
            .Advise("Wait until some of it is done.");
    }
    std::sort(ended.begin(), ended.end());
    for (size_t i = 0; i < std::max<size_t>(ended.size() / 2, 1); ++i) {
        unlinkat(folder.Get(), ended[i].second.c_str(), 0);
    }
}

Descriptor OpenRecord(const User& user, JobKind kind, const std::string& id, int flags) {
    CheckJobId(id);
    const AsRoot root;
    const Descriptor folder = OpenFolder(user, kind, false);
    Descriptor fd(openat(folder.Get(), id.c_str(), flags | O_NOFOLLOW | O_CLOEXEC));
    if (fd.Get() < 0) {
        throw Failure(404, "There is no such upload or copy.");
    }
    return fd;
}

void CopyText(char* to, size_t size, const std::string& text) {
    size_t length = std::min(text.size(), size - 1);
    // Not through the middle of a character.
    while (length < text.size() && length > 0 &&
           (static_cast<unsigned char>(text[length]) & 0xc0) == 0x80) {
        --length;
    }
    memcpy(to, text.data(), length);
    to[length] = '\0';
}

}  // namespace

const std::string& CheckJobId(const std::string& id) {
    constexpr const char* kLetters =
        "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789-";
    if (id.size() < kShortestId || id.size() > kLongestId ||
        id.find_first_not_of(kLetters) != std::string::npos) {
        throw Failure(422, "That is no id of an upload or a copy.");
    }
    return id;
}

std::string NewJobId() {
    std::array<unsigned char, 16> bytes{};
    if (getrandom(bytes.data(), bytes.size(), 0) != static_cast<ssize_t>(bytes.size())) {
        throw Failure(500, "The system gives no random numbers.");
    }
    std::string id;
    for (const unsigned char byte : bytes) {
        id += "0123456789abcdef"[byte >> 4];
        id += "0123456789abcdef"[byte & 15];
    }
    return id;
}

std::unique_ptr<Job> Job::Start(const User& user, JobKind kind, const std::string& id,
                                const std::string& title) {
    CheckJobId(id);
    const AsRoot root;
    const Descriptor folder = OpenFolder(user, kind, true);
    MakeRoom(folder);
    Descriptor fd(openat(folder.Get(), id.c_str(), O_RDWR | O_CREAT | O_EXCL | O_CLOEXEC, 0600));
    if (fd.Get() < 0 && errno == EEXIST) {
        throw Failure(409, "This upload or copy was begun already.");
    }
    // Room is reserved: a write through the map must not meet a full file system.
    JobRecord* record = nullptr;
    if (fd.Get() >= 0 && flock(fd.Get(), LOCK_EX | LOCK_NB) == 0 &&
        posix_fallocate(fd.Get(), 0, sizeof(JobRecord)) == 0) {
        record = Map(fd.Get(), PROT_READ | PROT_WRITE);
    }
    if (record == nullptr) {
        unlinkat(folder.Get(), id.c_str(), 0);
        return nullptr;
    }
    record->started = time(nullptr);
    CopyText(record->title, sizeof record->title, title);
    return std::make_unique<Job>(std::move(fd), record);
}

Job::~Job() {
    Unmap(record_);
}

bool Job::IsCancelAsked() const {
    return __atomic_load_n(&record_->cancel_asked, __ATOMIC_RELAXED) != 0;
}

void Job::End(JobState state) {
    record_->counting = 0;
    record_->ended = time(nullptr);
    std::atomic_thread_fence(std::memory_order_release);
    record_->state = state;
}

void Job::Succeed() {
    End(JobState::kDone);
}

void Job::Fail(const Failure& failure) {
    record_->status = failure.Status();
    record_->code = static_cast<int>(failure.Code());
    CopyText(record_->meaning, sizeof record_->meaning, failure.what());
    End(failure.Code() == ZYROVFS::VFS_ERR_CANCELLED ? JobState::kCancelled : JobState::kFailed);
}

JobRecord ReadJob(const User& user, JobKind kind, const std::string& id) {
    const Descriptor fd = OpenRecord(user, kind, id, O_RDONLY);
    // Asked first: what has ended says so before it lets go of the lock.
    const bool lives = IsLocked(fd.Get());
    JobRecord* const record = Map(fd.Get(), PROT_READ);
    if (record == nullptr) {
        throw Failure(404, "There is no such upload or copy.");
    }
    JobRecord copy = *record;
    Unmap(record);
    if (!lives && (copy.state == JobState::kWaiting || copy.state == JobState::kRunning)) {
        copy.state = JobState::kFailed;
        copy.counting = 0;
        copy.status = 500;
        CopyText(copy.meaning, sizeof copy.meaning, "The program that did it was ended.");
    }
    return copy;
}

std::vector<std::string> JobIds(const User& user, JobKind kind) {
    const AsRoot root;
    return NamesIn(OpenFolder(user, kind, false));
}

void CancelJob(const User& user, JobKind kind, const std::string& id) {
    const Descriptor fd = OpenRecord(user, kind, id, O_RDWR);
    JobRecord* const record = Map(fd.Get(), PROT_READ | PROT_WRITE);
    if (record != nullptr) {
        __atomic_store_n(&record->cancel_asked, 1, __ATOMIC_RELAXED);
        Unmap(record);
    }
}

void RemoveJob(const User& user, JobKind kind, const std::string& id) {
    const Descriptor fd = OpenRecord(user, kind, id, O_RDWR);
    if (IsLocked(fd.Get())) {
        throw Failure(409, "It is still under way.").Advise("Cancel it first.");
    }
    const AsRoot root;
    unlinkat(OpenFolder(user, kind, false).Get(), id.c_str(), 0);
}

const char* NameOf(JobState state) {
    constexpr const char* kNames[] = {"waiting", "running", "done", "failed", "cancelled"};
    return kNames[static_cast<uint32_t>(state) % 5];
}

Json::Value DescribeFailure(const JobRecord& record) {
    if (record.state != JobState::kFailed) {
        return {};
    }
    const std::string meaning(record.meaning, strnlen(record.meaning, sizeof record.meaning));
    return Failure(record.status, meaning, static_cast<ZYROVFS::__tag_vfs_err_>(record.code))
        .Describe();
}

}  // namespace web
