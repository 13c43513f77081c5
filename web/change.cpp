#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <memory>

#include "action.h"
#include "connection.h"
#include "failure.h"
#include "name.h"
#include "response.h"

namespace web {
namespace {

constexpr int kDeepest = 100;

/** What a change is about. */
struct Target {
    Target(const User& user, const Json::Value& body)
        : split(SplitPath(Text(body, "path"))),
          shown("\"" + split.name + "\""),
          folder(Connection(user, Text(body, "connection"))
                     .Open(split.folder, O_RDONLY | O_DIRECTORY)) {}

    static std::string Text(const Json::Value& body, const char* key) {
        if (!body[key].isString()) {
            throw Failure(400, std::string("The request lacks \"") + key + "\".");
        }
        return body[key].asString();
    }

    const Split split;
    const std::string shown;
    const Descriptor folder;
};

void AnswerDone() {
    AnswerJson(200, Json::Value(Json::objectValue));
}

/** The library's own trees take no flags with a rename. */
bool RenameTo(int folder, const std::string& from, const std::string& to) {
    if (renameat2(folder, from.c_str(), folder, to.c_str(), RENAME_NOREPLACE) == 0) {
        return true;
    }
    if (errno != EINVAL && errno != ENOSYS && errno != EOPNOTSUPP) {
        return false;
    }
    struct stat there {};
    if (fstatat(folder, to.c_str(), &there, AT_SYMLINK_NOFOLLOW) == 0) {
        errno = EEXIST;
        return false;
    }
    return renameat(folder, from.c_str(), folder, to.c_str()) == 0;
}

/** Removes an item with what is in it, without following links. False with errno. */
bool RemoveAll(int parent, const char* name, int depth) {
    if (unlinkat(parent, name, 0) == 0) {
        return true;
    }
    if (errno != EISDIR && errno != EPERM) {
        return false;
    }
    if (depth == kDeepest) {
        errno = ELOOP;
        return false;
    }
    const int fd = openat(parent, name, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
    const std::unique_ptr<DIR, int (*)(DIR*)> folder(fd < 0 ? nullptr : fdopendir(fd), closedir);
    if (folder == nullptr) {
        return false;
    }
    while (const dirent* item = readdir(folder.get())) {
        const std::string below = item->d_name;
        if (below != "." && below != ".." && !RemoveAll(fd, below.c_str(), depth + 1)) {
            return false;
        }
    }
    return unlinkat(parent, name, AT_REMOVEDIR) == 0;
}

bool RemoveOne(int parent, const char* name) {
    if (unlinkat(parent, name, 0) == 0) {
        return true;
    }
    return (errno == EISDIR || errno == EPERM) && unlinkat(parent, name, AT_REMOVEDIR) == 0;
}

}  // namespace

void MakeFolder(const User& user, const Request& request) {
    const Target target(user, ReadJson(request));
    if (mkdirat(target.folder.Get(), target.split.name.c_str(), 0777) != 0) {
        throw FailureOfErrno(target.shown);
    }
    AnswerDone();
}

void Rename(const User& user, const Request& request) {
    const Json::Value body = ReadJson(request);
    const Target target(user, body);
    const std::string name = CheckName(Target::Text(body, "name"));
    if (!RenameTo(target.folder.Get(), target.split.name, name)) {
        throw FailureOfErrno(target.shown);
    }
    AnswerDone();
}

void Delete(const User& user, const Request& request) {
    const Json::Value body = ReadJson(request);
    const Target target(user, body);
    const bool recursive = body["recursive"].isBool() && body["recursive"].asBool();
    const char* name = target.split.name.c_str();
    if (!(recursive ? RemoveAll(target.folder.Get(), name, 0)
                    : RemoveOne(target.folder.Get(), name))) {
        throw FailureOfErrno(target.shown);
    }
    AnswerDone();
}

}  // namespace web
