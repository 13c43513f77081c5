// Folders made, items renamed, moved and deleted.
#include "action.h"
#include "body.h"
#include "connection.h"
#include "failure.h"
#include "name.h"
#include "response.h"

namespace web {
namespace {

std::unique_ptr<Tree> FilesOf(const User& user, const Body& body) {
    return Connection(user, body.Text("connection")).Files();
}

/** A path that is not the connection itself. */
std::string ItemPath(const Body& body) {
    std::string path = body.Text("path");
    SplitPath(path);
    return path;
}

}  // namespace

void MakeFolder(const User& user, const Request& request) {
    const Body body(request);
    const std::string path = ItemPath(body);
    FilesOf(user, body)->MakeFolder(path);
    AnswerDone();
}

void Rename(const User& user, const Request& request) {
    const Body body(request);
    const std::string path = ItemPath(body);
    const std::string name = CheckName(body.Text("name"));
    FilesOf(user, body)->Move(path, SplitPath(path).folder, name);
    AnswerDone();
}

void Move(const User& user, const Request& request) {
    const Body body(request);
    const std::string path = ItemPath(body);
    const std::string folder = CheckPath(body.Text("folder"));
    const std::string name = CheckName(body.Text("name", SplitPath(path).name));
    if (IsWithin(folder, path)) {
        throw Failure(422, "A folder cannot be moved into itself.");
    }
    FilesOf(user, body)->Move(path, folder, name);
    AnswerDone();
}

void Delete(const User& user, const Request& request) {
    const Body body(request);
    const std::string path = ItemPath(body);
    FilesOf(user, body)->Delete(path, body.Flag("recursive"));
    AnswerDone();
}

}  // namespace web
