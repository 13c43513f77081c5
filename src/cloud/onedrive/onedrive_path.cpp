#include <strings.h>
#include <zosplatform/text.h>

#include <cstring>

#include "cloud/fuse_attr.h"
#include "cloud/guard.h"
#include "cloud/onedrive/onedrive.h"
#include "cloud/onedrive/onedrive_api.h"
#include "cloud/target.h"
#include "core/log.h"

namespace ZYROCloud {

using namespace ZYROVFS;
using namespace onedrive;

namespace {

/** An item without a name or an id is none that a path can lead to. */
bool HasName(const Json::Value& item, const std::string& name) {
    const std::string has = Text(item, "name");
    return !name.empty() && has.find('\0') == std::string::npos && !Text(item, "id").empty() &&
           YLIBCUnicodeUTF8StrCaseCmp(has.c_str(), name.c_str()) == 0;
}

/** An account's id becomes part of a host name, where it must not lead to another host. */
bool IsHostLabel(const std::string& id) {
    constexpr const char* kAllowed =
        "0123456789abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ-_.";
    return !id.empty() && id.find_first_not_of(kAllowed) == std::string::npos;
}

bool Begins(const std::string& text, const char* with) {
    return strncasecmp(text.c_str(), with, strlen(with)) == 0;
}

}  // namespace

std::string OneDrive::GetFileIDByPathFromFuse(const std::string& path) {
    return fuse_attr::ReadFileId(*this, path, true);
}

std::string OneDrive::GetFileIDByPath(const std::string& path) {
    return path.empty() || path == "/" ? GetRootFileID() : GetFileIDByPathFromFuse(path);
}

bool OneDrive::GetFileIDByNameFromServer(const std::string& parent_id, const std::string& name,
                                         const std::string& /*kind*/, bool search,
                                         std::vector<std::string>& out) {
    return Guard(*this, [&] {
        Json::Value items;
        const Json::Value no_params(Json::objectValue);
        if (!(search ? SearchFile(name, items) : ListFolder(parent_id, no_params, items))) {
            return false;
        }
        for (const Json::Value& item : items) {
            if (!HasName(item, name)) {
                continue;
            }
            out.push_back(GetFileID(item));
            if (!search) {
                break;
            }
        }
        return true;
    });
}

bool OneDrive::GetFileIDByPathFromServerRecursive(const std::string& parent_id,
                                                  const std::string& path, const std::string& kind,
                                                  const std::string& /*hint*/, std::string& out) {
    WalkRules rules;
    rules.lookup = [&](const std::string& parent, const std::string& name,
                       std::vector<std::string>& ids) {
        return GetFileIDByNameFromServer(parent, name, kind, false, ids);
    };
    rules.first_only = true;
    return WalkPath(parent_id, path, rules, out);
}

bool OneDrive::GetFileIDByPathFromServer(const std::string& /*root*/, const std::string& path,
                                         const std::string& kind, const std::string& hint,
                                         std::string& out) {
    if (path.empty()) {
        out = GetRootFileID();
        return true;
    }
    const auto walk = [&](std::string& id) {
        return GetFileIDByPathFromServerRecursive("", path, kind, hint, id);
    };
    return FindOnServer(*this, walk, out);
}

bool OneDrive::GetFileInfoByPathFromServer(const std::string& path, const std::string& kind,
                                           const Json::Value& params, const std::string& hint,
                                           Json::Value& out) {
    const auto find = [&](std::string& id) {
        return GetFileIDByPathFromServer("", path, kind, hint, id);
    };
    return InfoOnServer(*this, "onedrive", path, find, params, out);
}

bool OneDrive::GetMetaDataByURI(const std::string& uri, Json::Value& meta,
                                const std::string& action) {
    // That nothing is known of an item is no failure yet: what is missing shows when it is used.
    return Barrier(*this, [&] {
        const std::string server_path = GetServerPathBySharePath(uri);
        std::string url;
        // A relayed download has "=" and a MIME type behind its action.
        if (Begins(action, "Download")) {
            const std::string id = GetFileIDByPath(server_path);
            url = id.empty() ? "" : ItemUrl(id) + "/content";
        } else if (Begins(action, "Upload")) {
            const std::string account = Text(account_info_, "id");
            url = IsHostLabel(account) ? StorageUrl(account, server_path) : "";
        }
        if (url.empty()) {
            return false;
        }
        meta["server_path"] = server_path;
        meta["url"] = url;
        return true;
    });
}

}  // namespace ZYROCloud
