// Google Drive as its gvfs backend sees it.
#include <json/value.h>

#include <string>

#include "bridge/gvfs_flow_account.h"
#include "bridge/gvfs_flow_list.h"
#include "bridge/gvfs_flow_read.h"
#include "bridge/gvfs_gdrive_item.h"
#include "bridge/gvfs_utils.h"
#include "bridge/handle.h"
#include "cloud/gdrive/gdrive.h"
#include "cloud/gdrive/gdrive_api.h"
#include "core/json.h"
#include "core/json_member.h"
#include "core/log.h"
#include "zyrovfs/utils.h"
#include "zyrovfs/zyrocloud.h"

using namespace ZYROCloud;
using namespace ZYROCloud::gvfs;
using ZYROVFS::SourceLine;
using ZYROVFS::json::TextOf;

namespace {

/** GIO has a GDrive of its own. */
using Drive = ZYROCloud::GDrive;

constexpr const char* kNoCloudBy = "Failed to create cloud by %s";
constexpr const char* kStarredQuery = "starred=true";
constexpr const char* kFolders = "mimeType = 'application/vnd.google-apps.folder'";
constexpr const char* kOwnFolders =
    "'me' in owners and mimeType = 'application/vnd.google-apps.folder'";

/**
 * The path begins with a folder that the account does not have, or does not find by its name: below
 * "My Drive" it is then walked from the root. What is starred has no place to begin at.
 */
bool FindFolder(const char* path, const char* folder_name, Drive& drive, std::string& id) {
    const bool own = GooglePathOf(path) == kGoogleInMyDrive;
    const std::string name = TextOrEmpty(folder_name);
    if (drive.GetFileIDByPathFromServer("", path, own ? kOwnFolders : kFolders, name, id)) {
        return true;
    }
    const std::string below = own ? PathInMyDrive(path) : "";
    return !below.empty() && drive.GetErrorCode() == ZYROVFS::VFS_ERR_NOT_FOUND &&
           drive.GetFileIDByPathFromServerRecursive(gdrive::kRoot, below, kFolders, name, id) &&
           !id.empty();
}

/** Puts in what depends on the kind of path; false for one outside both roots. */
bool AddFolder(const char* path, const char* folder_name, Drive& drive, ListRules& rules) {
    switch (GooglePathOf(path)) {
        case kGoogleMyDrive:
            rules.id = gdrive::kRoot;
            return true;
        case kGoogleStarred:
            rules.id = "";
            rules.query["q"] = kStarredQuery;
            return true;
        case kGoogleInMyDrive:
        case kGoogleInStarred:
        case kGoogleDeepInStarred:
            rules.find = [=, &drive](std::string& id) {
                return FindFolder(path, folder_name, drive, id);
            };
            return true;
        default:
            LOG_ERROR("Wrong path %s", path);
            return false;
    }
}

bool FindUrl(const ZYROCloud_Handle& handle, std::string& url) {
    const std::string text = AttrText(handle.info.get(), kAttrDescription);
    Json::Value description;
    if (text.empty()) {
        LOG_ERROR("Link info is empty");
        return false;
    }
    if (!ZYROVFS::json::fromString(description, text)) {
        LOG_ERROR("Failed to parse %s", text.c_str());
        return false;
    }
    url = TextOf(description, "downloadUrl");
    if (!url.empty()) {
        return true;
    }
    const std::string link = TextOf(description, "alternateLink");
    if (link.empty()) {
        LOG_ERROR("No invalid url");
        return false;
    }
    url = gdrive::kLinkScheme + link;
    return true;
}

}  // namespace

int ZYROCloud_Cloud_Google_Get_File_Type(const char* path) {
    return GooglePathOf(path);
}

int ZYROCloud_Cloud_Google_Is_First_Folder(const char* path) {
    const GooglePath kind = GooglePathOf(path);
    const std::string text = TextOrEmpty(path);
    return (kind == kGoogleMyDrive || kind == kGoogleStarred) && text.back() != '/' ? 1 : 0;
}

int ZYROCloud_Cloud_Google_List(const char* server_id, ZYROCloud_Cache* cache, const char* path,
                                const char* folder_name, ZYROCloud_ListCallback callback,
                                void* user_data, int* err) {
    if (!AllGiven(SourceLine::Here(), cache, path)) {
        return 0;
    }
    return WithDriver<Drive>(server_id, [&](Drive& drive) {
        const auto is_taken = [&](const std::string& name) {
            return ZYROCloud_Cache_List_Ori_Get(cache, path, name.c_str()) != 0;
        };
        ListRules rules;
        rules.convert = [&](const Json::Value& item, ItemRecord& record) {
            return GoogleRecord(item, is_taken, record);
        };
        return AddFolder(path, folder_name, drive, rules) &&
               ListInto({cache, path, callback, user_data, err}, drive, rules);
    });
}

int ZYROCloud_Cloud_Google_CheckAccount(const char* server_id, const char* json, int* err) {
    return CheckAccount({server_id, json, err}, CLOUD_TYPE_GOOGLE);
}

int ZYROCloud_Cloud_Google_Move(const char* server_id, ZYROCloud_Cache* cache, const char* from,
                                const char* to, const char* to_parent, int* err) {
    if (!AllGiven(SourceLine::Here(), server_id, cache, from, to, to_parent)) {
        return 0;
    }
    return WithDriver<Drive>(server_id, [&](Drive& drive) {
        if (drive.Move(from, to, to_parent)) {
            return true;
        }
        StoreError(drive, err);
        LOG_ERROR("Failed to move a file form %s to %s, err: %s", from, to,
                  ErrorText(drive).c_str());
        return false;
    });
}

int ZYROCloud_Cloud_Google_DeleteStarred(const char* server_id, ZYROCloud_Cache* cache,
                                         const char* id, int* err) {
    if (!AllGiven(SourceLine::Here(), server_id, cache, id)) {
        return 0;
    }
    const auto remove_star = [&](Drive& drive) {
        if (drive.DeleteStarred(id)) {
            return true;
        }
        StoreError(drive, err);
        LOG_ERROR("Failed to delete starred, %s", id);
        return false;
    };
    return WithDriver<Drive>(server_id, remove_star, kNoCloudBy);
}

int ZYROCloud_Cloud_Google_Chmod_MTime(const char* server_id, ZYROCloud_Cache* cache,
                                       const char* id, long mtime, int* err) {
    if (!AllGiven(SourceLine::Here(), server_id, cache, id)) {
        return 0;
    }
    const auto set_date = [&](Drive& drive) {
        std::string date;
        if (ZYROVFS::Utils::ParseEpochToRFC3339(mtime, date) && drive.SetModifiedDate(id, date)) {
            return true;
        }
        StoreError(drive, err);
        // The words of the operation above: whoever watches the log knows these.
        LOG_ERROR("Failed to delete starred, %s", id);
        return false;
    };
    return WithDriver<Drive>(server_id, set_date, kNoCloudBy);
}

long long ZYROCloud_Cloud_Google_Download(ZYROCloud_Handle* handle, const void* p2, const void* p3,
                                          char** dest, long long size, int* err) {
    // A link ends where the driver has no more of its text. The link's own length says less: read
    // in small pieces, the text would be cut short by what stands around the link in it.
    return ReadInto({handle, p2, p3, dest, size, err}, CLOUD_TYPE_GOOGLE, FindUrl);
}
