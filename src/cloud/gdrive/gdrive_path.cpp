#include <algorithm>

#include "cloud/fuse_attr.h"
#include "cloud/gdrive/gdrive.h"
#include "cloud/gdrive/gdrive_api.h"
#include "cloud/gdrive/gdrive_title.h"
#include "cloud/guard.h"
#include "cloud/target.h"
#include "core/log.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud {

using namespace ZYROVFS;
using namespace gdrive;

namespace {

Json::Value Search(const char* fields, const std::string& condition) {
    Json::Value query;
    query["fields"] = fields;
    query["q"] = condition;
    return query;
}

/** Finds an item of this name in any of these folders. */
std::string InAnyOf(const std::vector<std::string>& ids, const std::string& name) {
    std::string folders;
    for (const std::string& id : ids) {
        folders += (folders.empty() ? "'" : " or '") + id + "' in parents";
    }
    return "title='" + Utils::EscapeSingleQuote(name) + "' and (" + folders + ")";
}

/** The first parent of an item that is one of these; "" for none. */
std::string ParentAmong(const Json::Value& item, const std::vector<std::string>& ids) {
    for (const Json::Value& parent : item.get("parents", Json::Value())) {
        std::string id = parent.get("id", "").asString();
        if (!id.empty() && std::find(ids.begin(), ids.end(), id) != ids.end()) {
            return id;
        }
    }
    return "";
}

}  // namespace

std::string GDrive::FindListStartID(const std::string& path, std::string& found_path) {
    std::string here = path;
    std::string full_path, id, parent, name;
    while (!here.empty() && fuse_attr::FindFullPath(*this, here, full_path)) {
        if (fuse_attr::Read(full_path, fuse_attr::kFileId, fuse_attr::kMostIdBytes, id)) {
            found_path = here;
            return id;
        }
        if (!CutAtLastSlash(here, parent, name)) {
            break;
        }
        here = parent;
    }
    return "";
}

std::string GDrive::GetFileIDByPathFromFuse(const std::string& path) {
    return fuse_attr::ReadFileId(*this, path);
}

std::string GDrive::GetFileIDByPath(const std::string& path) {
    return path.empty() || path == "/" ? kRoot : GetFileIDByPathFromFuse(path);
}

bool GDrive::GetFileIDByNameFromServer(const std::string& parent_id, const std::string& name,
                                       const std::string& query, std::vector<std::string>& ids) {
    return Guard(*this, [&] {
        const ShownTitle wanted(name);
        Json::Value items;
        if (!ListFolder(parent_id, Search("items(createdDate,id,title)", wanted.Query(query)),
                        items)) {
            return false;
        }
        for (const Json::Value& item : items) {
            const std::string id = item.get("id", "").asString();
            if (!id.empty() && item.isMember("title") && wanted.Means(item)) {
                ids.push_back(id);
            }
        }
        return true;
    });
}

bool GDrive::GetFileIDFromListByName(const std::string& name, std::vector<std::string>& ids,
                                     std::string& id) {
    if (ids.empty()) {
        return true;
    }
    if (ids.size() == 1 || name.empty()) {
        id = ids.front();
        return true;
    }
    return Guard(*this, [&] {
        Json::Value items;
        if (!ListFolder("", Search("items(id,title,parents/id)", InAnyOf(ids, name)), items)) {
            LOG_ERROR("Failed to list folder, %s", name.c_str());
            return false;
        }
        if (!items.empty()) {
            id = ParentAmong(items[0], ids);
        }
        return true;
    });
}

bool GDrive::GetFileIDByPathFromServerRecursive(const std::string& parent_id,
                                                const std::string& path, const std::string& query,
                                                const std::string& name, std::string& id) {
    WalkRules rules;
    rules.lookup = [&](const std::string& parent, const std::string& component,
                       std::vector<std::string>& ids) {
        return GetFileIDByNameFromServer(parent, component, query, ids);
    };
    rules.pick = [&](std::vector<std::string>& ids, std::string& picked) {
        return GetFileIDFromListByName(name, ids, picked);
    };
    rules.missing_fails = false;
    rules.lookup_failed = "Failed to get id by name %s from server";
    return WalkPath(parent_id, path, rules, id);
}

bool GDrive::GetFileIDByPathFromServer(const std::string& /*root*/, const std::string& path,
                                       const std::string& query, const std::string& name,
                                       std::string& id) {
    if (path.empty()) {
        id = kRoot;
        return true;
    }
    const std::string wanted = name.empty() ? path.substr(path.rfind('/') + 1) : name;
    const auto walk = [&](std::string& found) {
        return GetFileIDByPathFromServerRecursive("", path, query, wanted, found);
    };
    return FindOnServer(*this, walk, id);
}

bool GDrive::GetFileInfoByPathFromServer(const std::string& path, const std::string& query,
                                         const Json::Value& params, const std::string& name,
                                         Json::Value& out) {
    const auto find = [&](std::string& id) {
        return GetFileIDByPathFromServer("", path, query, name, id);
    };
    return InfoOnServer(*this, "google", path, find, params, out);
}

}  // namespace ZYROCloud
