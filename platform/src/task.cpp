#include "zosplatform/task.h"

#include <dirent.h>
#include <fcntl.h>
#include <json/reader.h>
#include <json/writer.h>
#include <sys/random.h>
#include <sys/stat.h>

#include <algorithm>
#include <cinttypes>
#include <cstdio>
#include <ctime>
#include <string_view>

#include "safe_path.h"
#include "support.h"

namespace {

constexpr const char* kBase = "/var/tmp";
constexpr std::string_view kStore = "/var/tmp/zos/task";
constexpr std::string_view kSuffix = ".json";
constexpr mode_t kSharedMode = 0755;
constexpr mode_t kUserMode = 0700;
constexpr mode_t kTaskMode = 0600;

bool CanNameAFile(const std::string& name) {
    return !name.empty() && name.front() != '.' && name.find('/') == std::string::npos &&
           name.find('\0') == std::string::npos;
}

/** Who reads a task ends the process that it names, so only what root or we wrote is a task. */
bool IsTrusted(int fd) {
    struct stat info {};
    if (fstat(fd, &info) != 0) {
        return false;
    }
    if ((info.st_uid == 0 || info.st_uid == geteuid()) &&
        (info.st_mode & (S_IWGRP | S_IWOTH)) == 0) {
        return true;
    }
    errno = EPERM;
    return false;
}

/** Anybody may have put something in its place before; what is no link root makes its own. */
zos::Fd Enter(const zos::Fd& parent, const std::string& name, bool make, mode_t mode) {
    zos::Fd dir = zos::EnterRootsFolder(parent.Get(), name.c_str(), make, mode);
    return dir && IsTrusted(dir.Get()) ? std::move(dir) : zos::Fd();
}

struct Place {
    std::string directory;
    std::string file;
};

Place Split(const std::string& path) {
    const size_t slash = path.rfind('/');
    return slash == std::string::npos ? Place{"", path}
                                      : Place{path.substr(0, slash), path.substr(slash + 1)};
}

/**
 * The folder of a user's tasks. What all users share only root makes: in the hands of the first
 * user who came by it would be closed to all others.
 */
zos::Fd OpenStore(const std::string& directory, bool make) {
    const Place place = Split(directory);
    if (place.directory != kStore || !CanNameAFile(place.file)) {
        errno = EINVAL;
        return zos::Fd();
    }
    zos::Fd dir(open(kBase, O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    const bool make_shared = make && geteuid() == 0;
    for (const char* shared : {"zos", "task"}) {
        if (dir) {
            dir = Enter(dir, shared, make_shared, kSharedMode);
        }
    }
    return dir ? Enter(dir, place.file, make, kUserMode) : zos::Fd();
}

std::string FileName(const std::string& id) {
    return id + std::string(kSuffix);
}

bool ParseObject(const std::string& text, Json::Value& value) {
    try {
        const Json::CharReaderBuilder builder;
        const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
        return reader->parse(text.data(), text.data() + text.size(), &value, nullptr) &&
               value.isObject();
    } catch (const Json::Exception&) {
        return false;  // nested too deeply
    }
}

std::string Print(const Json::Value& value) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["emitUTF8"] = true;
    return Json::writeString(builder, value) + "\n";
}

/** Ids sort by the time at which their tasks were made. */
std::string NewId() {
    timespec now{};
    clock_gettime(CLOCK_REALTIME, &now);
    uint32_t number = 0;
    if (getrandom(&number, sizeof number, 0) != sizeof number) {
        return {};
    }
    char id[48];
    std::snprintf(id, sizeof id, "%010" PRId64 ".%09ld-%08" PRIx32, int64_t{now.tv_sec},
                  now.tv_nsec, number);
    return id;
}

bool Failed(int line = __builtin_LINE()) {
    YLIBCErrSetEx(zos::CodeOfErrno(errno, ZOS_ERR_OPEN_FAILED), __FILE_NAME__, line);
    return false;
}

}  // namespace

namespace ZOS {

Task::Task(std::string path, std::string id, Json::Value properties)
    : path_(std::move(path)), id_(std::move(id)), properties_(std::move(properties)) {}

Json::Value Task::getProperty(const std::string& name) const {
    return properties_.isObject() ? properties_.get(name, Json::Value()) : Json::Value();
}

void Task::setProperty(const std::string& name, const Json::Value& value) {
    if (!properties_.isObject()) {
        properties_ = Json::Value(Json::objectValue);
    }
    properties_[name] = value;
}

bool Task::save() const {
    const Place place = Split(path_);
    const zos::Fd dir = OpenStore(place.directory, true);
    if (!dir) {
        return Failed();
    }
    zos::FreshFile file(dir.Get());
    constexpr uid_t kOwner = static_cast<uid_t>(-1);
    constexpr gid_t kGroup = static_cast<gid_t>(-1);
    return (file.Write(Print(properties_), kTaskMode, kOwner, kGroup) &&
            file.Replace(place.file)) ||
           Failed();
}

bool Task::remove() const {
    const Place place = Split(path_);
    const zos::Fd dir = OpenStore(place.directory, false);
    if (dir && unlinkat(dir.Get(), place.file.c_str(), 0) == 0) {
        return true;
    }
    return errno == ENOENT || Failed();
}

TaskMgr::TaskMgr(const std::string& user) {
    if (CanNameAFile(user)) {
        directory_ = std::string(kStore) + "/" + user;
    }
}

std::vector<std::string> TaskMgr::getAllTaskId() const {
    std::vector<std::string> ids;
    zos::Fd fd = directory_.empty() ? zos::Fd() : OpenStore(directory_, false);
    const std::unique_ptr<DIR, int (*)(DIR*)> dir(fd ? fdopendir(fd.Get()) : nullptr, closedir);
    if (!dir) {
        return ids;
    }
    fd.Release();
    while (const dirent* entry = readdir(dir.get())) {
        const std::string_view name = entry->d_name;
        if (name.front() != '.' && name.size() > kSuffix.size() &&
            name.substr(name.size() - kSuffix.size()) == kSuffix) {
            ids.emplace_back(name.substr(0, name.size() - kSuffix.size()));
        }
    }
    std::sort(ids.begin(), ids.end());
    return ids;
}

std::unique_ptr<Task> TaskMgr::getTask(const std::string& id) const {
    if (directory_.empty() || !CanNameAFile(id)) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return nullptr;
    }
    const zos::Fd dir = OpenStore(directory_, false);
    const zos::Fd fd = dir ? zos::OpenRegular(dir.Get(), FileName(id), O_NOFOLLOW) : zos::Fd();
    std::string text;
    if (!fd || !IsTrusted(fd.Get()) || !zos::ReadAll(fd.Get(), text)) {
        Failed();
        return nullptr;
    }
    Json::Value properties;
    if (!ParseObject(text, properties)) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_FORMAT);
        return nullptr;
    }
    return std::make_unique<Task>(directory_ + "/" + FileName(id), id, std::move(properties));
}

std::unique_ptr<Task> TaskMgr::createTask(const Json::Value& properties) const {
    const std::string id = NewId();
    if (directory_.empty() || id.empty() || !(properties.isObject() || properties.isNull())) {
        SET_PLATFORM_ERROR(ZOS_ERR_BAD_PARAMETER);
        return nullptr;
    }
    auto task =
        std::make_unique<Task>(directory_ + "/" + FileName(id), id,
                               properties.isNull() ? Json::Value(Json::objectValue) : properties);
    if (!task->save()) {
        return nullptr;
    }
    return task;
}

}  // namespace ZOS
