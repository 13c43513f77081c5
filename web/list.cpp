#include "action.h"
#include "connection.h"
#include "name.h"
#include "response.h"

namespace web {
namespace {

constexpr unsigned kMostEntries = 20000;

Json::Value Describe(const Entry& entry) {
    Json::Value shown;
    shown["name"] = entry.name;
    shown["folder"] = entry.folder;
    if (entry.size >= 0) {
        shown["size"] = static_cast<Json::Int64>(entry.size);
    }
    if (entry.modified >= 0) {
        shown["modified"] = static_cast<Json::Int64>(entry.modified);
    }
    for (const Export& format : entry.exports) {
        Json::Value choice;
        choice["format"] = format.format;
        choice["title"] = format.title;
        choice["extension"] = format.extension;
        shown["exports"].append(choice);
    }
    return shown;
}

}  // namespace

void ListFolder(const User& user, const Request& request) {
    const Connection connection(user, request.Parameter("connection"));
    const std::string path = CheckPath(request.Parameter("path", "/"));
    Json::Value answer;
    answer["entries"] = Json::Value(Json::arrayValue);
    unsigned left_out = 0;
    connection.Files()->List(path, [&](const Entry& entry) {
        if (IsName(entry.name) && answer["entries"].size() < kMostEntries) {
            answer["entries"].append(Describe(entry));
        } else {
            ++left_out;
        }
    });
    answer["left_out"] = left_out;
    AnswerJson(200, answer);
}

}  // namespace web
