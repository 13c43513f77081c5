#include "support/cloudsim/gdrive_changes.h"

#include "support/cloudsim/gdrive_json.h"

namespace cloudsim::gdrive {
namespace {

[[noreturn]] void Fail(const std::string& member) {
    throw Failure{Error(400, "invalid", "Invalid value for: " + member)};
}

std::optional<std::string> ReadText(const Json::Value& body, const char* member) {
    const Json::Value& value = body[member];
    if (!value.isNull() && !value.isString()) {
        Fail(member);
    }
    return value.isNull() ? std::nullopt : std::optional<std::string>(value.asString());
}

std::optional<bool> ReadLabel(const Json::Value& labels, const char* member) {
    const Json::Value& value = labels[member];
    if (!value.isNull() && !value.isBool()) {
        Fail(member);
    }
    return value.isNull() ? std::nullopt : std::optional<bool>(value.asBool());
}

std::optional<std::vector<std::string>> ReadParents(const Json::Value& parents) {
    if (parents.isNull()) {
        return std::nullopt;
    }
    std::vector<std::string> ids;
    for (const Json::Value& parent : parents.isArray() ? parents : (Fail("parents"), parents)) {
        if (!parent.isObject() || !parent["id"].isString()) {
            Fail("parents");
        }
        ids.push_back(parent["id"].asString());
    }
    return ids;
}

}  // namespace

Changes ReadChanges(const Json::Value& body) {
    Changes changes;
    changes.title = ReadText(body, "title");
    changes.description = ReadText(body, "description");
    changes.mime_type = ReadText(body, "mimeType");
    const Json::Value& labels = body["labels"];
    if (!labels.isNull() && !labels.isObject()) {
        Fail("labels");
    }
    changes.starred = ReadLabel(labels, "starred");
    changes.trashed = ReadLabel(labels, "trashed");
    changes.parents = ReadParents(body["parents"]);
    const std::optional<std::string> date = ReadText(body, "modifiedDate");
    if (date && !(changes.modified = ParseDate(*date))) {
        Fail("modifiedDate");
    }
    return changes;
}

std::vector<std::string> SplitList(const std::string& list) {
    std::vector<std::string> parts;
    for (size_t start = 0; start < list.size();) {
        const size_t end = std::min(list.find(',', start), list.size());
        if (end > start) {
            parts.push_back(list.substr(start, end - start));
        }
        start = end + 1;
    }
    return parts;
}

}  // namespace cloudsim::gdrive
