#include <zosplatform/text.h>

#include <cstring>

#include "cloud/box/box.h"
#include "cloud/box/box_api.h"
#include "cloud/fuse_attr.h"
#include "cloud/guard.h"
#include "cloud/target.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud {

using namespace ZYROVFS;
using namespace box;

namespace {

/** The name of an item as a path has it: the item's own, or, among namesakes, with its owner. */
class ShownName {
  public:
    explicit ShownName(const std::string& name) : name_(Utils::EscapeDoubleQuote(name)) {
        const size_t cut = name.find(kOwnerMark);
        if (cut != std::string::npos && cut > 0 && cut + strlen(kOwnerMark) < name.size()) {
            base_ = Utils::EscapeDoubleQuote(name.substr(0, cut));
            owner_ = name.substr(cut + strlen(kOwnerMark));
        }
    }

    bool Means(const Json::Value& item) const {
        const std::string name = item.get("name", "").asString();
        return Equal(name_, name) ||
               (!base_.empty() && Equal(base_, name) && Equal(owner_, OwnerOf(item)));
    }

  private:
    static constexpr const char* kOwnerMark = " - ";

    /** Names travel and are kept as uploads escape them, so they compare in that form. */
    static bool Equal(const std::string& a, const std::string& b) {
        return YLIBCUnicodeUTF8StrCaseCmp(a.c_str(), b.c_str()) == 0;
    }

    static std::string OwnerOf(const Json::Value& item) {
        return item.get("owned_by", Json::Value()).get("name", "").asString();
    }

    std::string name_, base_, owner_;
};

std::string IdWithKind(const Json::Value& item) {
    const std::string kind = item.get("type", "").asString();
    const std::string id = item.get("id", "").asString();
    return (kind == "file" ? kFiles : kind == "folder" ? kFolders : "") + id;
}

bool Begins(const std::string& text, const char* with) {
    return strncasecmp(text.c_str(), with, strlen(with)) == 0;
}

}  // namespace

std::string Box::GetFileIDByPathFromFuse(const std::string& path) {
    return fuse_attr::ReadFileId(*this, path);
}

std::string Box::GetFileIDByPath(const std::string& path) {
    return path.empty() || path == "/" ? kRoot : GetFileIDByPathFromFuse(path);
}

bool Box::GetFileIDByNameFromServer(const std::string& parent_id, const std::string& name,
                                    const std::string& /*kind*/, bool search,
                                    std::vector<std::string>& out) {
    return Guard(*this, [&] {
        Json::Value items;
        const Json::Value no_params(Json::objectValue);
        if (!(search ? SearchFile(name, items) : ListFolder(parent_id, no_params, items))) {
            return false;
        }
        const ShownName wanted(name);
        for (const Json::Value& item : items) {
            if (wanted.Means(item)) {
                out.push_back(IdWithKind(item));
            }
        }
        return true;
    });
}

bool Box::GetFileIDByPathFromServerRecursive(const std::string& parent_id, const std::string& path,
                                             const std::string& kind, const std::string& /*hint*/,
                                             std::string& out) {
    WalkRules rules;
    rules.lookup = [&](const std::string& parent, const std::string& name,
                       std::vector<std::string>& ids) {
        return GetFileIDByNameFromServer(parent, name, kind, false, ids);
    };
    rules.as_parent = StripIdPrefix;
    rules.lookup_failed = "Failed to get id by name %s from server";
    return WalkPath(parent_id, path, rules, out);
}

bool Box::GetFileIDByPathFromServer(const std::string& /*root*/, const std::string& path,
                                    const std::string& kind, const std::string& hint,
                                    std::string& out) {
    if (path.empty()) {
        out = kRoot;
        return true;
    }
    const auto walk = [&](std::string& id) {
        return GetFileIDByPathFromServerRecursive("", path, kind, hint, id);
    };
    return FindOnServer(*this, walk, out);
}

bool Box::GetFileInfoByPathFromServer(const std::string& root, const std::string& path,
                                      const Json::Value& params, const std::string& hint,
                                      Json::Value& out) {
    const auto find = [&](std::string& id) {
        return GetFileIDByPathFromServer(root, path, "", hint, id);
    };
    return InfoOnServer(*this, "box", path, find, params, out);
}

bool Box::GetMetaDataByURI(const std::string& uri, Json::Value& meta, const std::string& action) {
    return Guard(*this, [&] {
        // A relayed download has "=" and a MIME type behind its action.
        const bool download = Begins(action, "Download");
        if (!download && !Begins(action, "Upload")) {
            LOG_ERROR("Non support action, %s", action.c_str());
            return false;
        }
        const std::string server_path = GetServerPathBySharePath(uri);
        std::string full_path;
        GetFullPathByURI(uri, full_path);
        Json::Value found;
        if (!(download ? DescribeDownload(server_path, found)
                       : DescribeUpload(server_path, found))) {
            return false;
        }
        for (const std::string& member : found.getMemberNames()) {
            meta[member] = found[member];
        }
        meta["full_path"] = full_path;
        meta["server_path"] = server_path;
        return true;
    });
}

bool Box::DescribeDownload(const std::string& server_path, Json::Value& meta) {
    const std::string id = StripIdPrefix(GetFileIDByPath(server_path));
    meta["url"] = Api(kFiles + id + "/content");
    return !id.empty();
}

bool Box::DescribeUpload(const std::string& server_path, Json::Value& meta) {
    std::string parent;
    std::string name;
    const std::string id = StripIdPrefix(GetFileIDByPath(server_path));
    if (!CutAtLastSlash(server_path, parent, name) || name.empty()) {
        return false;
    }
    const std::string parent_id = StripIdPrefix(GetFileIDByPath(parent));
    if (!id.empty()) {
        meta["id"] = id;
    }
    meta["name"] = name;
    meta["parent_id"] = parent_id;
    meta["url"] = BoxUploadHost() + "/api/2.0/files" + (id.empty() ? "" : "/" + id) + "/content";
    return !parent_id.empty();
}

}  // namespace ZYROCloud
