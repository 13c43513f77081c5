#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <zyrovfs/server.h>

#include <memory>

#include "action.h"
#include "connection.h"
#include "failure.h"
#include "name.h"
#include "response.h"

namespace web {

using namespace ZYROVFS;

namespace {

constexpr unsigned kMostEntries = 20000;

struct CloseFolder {
    void operator()(DIR* folder) const { closedir(folder); }
};

using Folder = std::unique_ptr<DIR, CloseFolder>;

Folder OpenFolder(const Connection& connection, const std::string& path) {
    Descriptor fd(connection.Open(path, O_RDONLY | O_DIRECTORY));
    Folder folder(fdopendir(fd.Get()));
    if (folder == nullptr) {
        throw FailureOfErrno("\"" + path + "\"");
    }
    fd.Release();
    return folder;
}

/** What cannot be looked at, such as a link of the server, is shown with its name alone. */
Json::Value Describe(int folder, const std::string& name) {
    Json::Value entry;
    entry["name"] = name;
    struct stat item {};
    const bool known = fstatat(folder, name.c_str(), &item, AT_SYMLINK_NOFOLLOW) == 0;
    entry["folder"] = known && S_ISDIR(item.st_mode);
    if (known) {
        entry["size"] = static_cast<Json::Int64>(item.st_size);
        entry["modified"] = static_cast<Json::Int64>(item.st_mtim.tv_sec);
    }
    return entry;
}

}  // namespace

void ListConnections(const User& user, const Request&) {
    Json::Value list;
    if (!Server::List(user.uid, Server::VFS_CONFIG_CONNECT, nullptr, "alias", true, 0, 0, list)) {
        throw FailureOf("The connections cannot be listed", GetError());
    }
    Json::Value answer;
    answer["user"] = user.name;
    answer["connections"] = list["connections"];
    AnswerJson(200, answer);
}

void ListFolder(const User& user, const Request& request) {
    const Connection connection(user, request.Parameter("connection"));
    const Folder folder = OpenFolder(connection, request.Parameter("path", "/"));
    Json::Value answer;
    answer["entries"] = Json::Value(Json::arrayValue);
    unsigned left_out = 0;
    while (const dirent* item = readdir(folder.get())) {
        const std::string name = item->d_name;
        if (name == "." || name == "..") {
            continue;
        }
        if (!IsUtf8(name) || answer["entries"].size() >= kMostEntries) {
            ++left_out;
            continue;
        }
        answer["entries"].append(Describe(dirfd(folder.get()), name));
    }
    answer["left_out"] = left_out;
    AnswerJson(200, answer);
}

}  // namespace web
