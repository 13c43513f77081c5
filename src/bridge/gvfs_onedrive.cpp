// OneDrive as its gvfs backend sees it.
#include <json/value.h>

#include <cstring>
#include <string>

#include "bridge/cache_hold.h"
#include "bridge/gvfs_cache.h"
#include "bridge/gvfs_flow_account.h"
#include "bridge/gvfs_flow_list.h"
#include "bridge/gvfs_flow_move.h"
#include "bridge/gvfs_flow_read.h"
#include "bridge/gvfs_onedrive_item.h"
#include "bridge/gvfs_utils.h"
#include "bridge/handle.h"
#include "cloud/onedrive/onedrive.h"
#include "cloud/onedrive/onedrive_api.h"
#include "core/log.h"
#include "zyrovfs/zyrocloud.h"

using namespace ZYROCloud;
using namespace ZYROCloud::gvfs;
using ZYROVFS::SourceLine;

namespace {

bool FindUrl(const ZYROCloud_Handle& handle, std::string& url) {
    const std::string id = AttrText(handle.info.get(), kAttrFileId);
    if (id.empty()) {
        LOG_ERROR("File ID is empty");
        return false;
    }
    url = onedrive::ItemUrl(id) + "/content";
    return true;
}

/** The account's root, which the tree has under "/". */
UniqueFileInfo AskRoot(OneDrive& drive, int* err) {
    Json::Value item;
    ItemRecord record;
    if (!drive.GetFileInfo("", Json::Value(Json::objectValue), item)) {
        StoreError(drive, err);
        LOG_ERROR("Failed to get root info err: %s", ErrorText(drive).c_str());
        return nullptr;
    }
    if (!OneDriveRecord(item, record) || !HasFitTexts(record)) {
        LOG_ERROR("Failed to parse root");
        return nullptr;
    }
    UniqueFileInfo info = ToFileInfo(record);
    if (info == nullptr) {
        LOG_ERROR("Failed to allocate info");
    }
    return info;
}

}  // namespace

int ZYROCloud_Cloud_OneDrive_GetRoot(const char* server_id, ZYROCloud_Cache* cache,
                                     ZYROCloud_ListCallback callback, void* user_data, int* err) {
    if (!AllGiven(SourceLine::Here(), server_id, cache)) {
        return 0;
    }
    return WithDriver<OneDrive>(server_id, [&](OneDrive& drive) {
        const UniqueFileInfo info = AskRoot(drive, err);
        if (info == nullptr) {
            return false;
        }
        const CacheHold hold(cache);
        AddEntry(*cache, "/", UniqueFileInfo(g_file_info_dup(info.get())));
        if (callback != nullptr) {
            callback(info.get(), user_data);
        }
        return true;
    });
}

int ZYROCloud_Cloud_OneDrive_List(const char* server_id, ZYROCloud_Cache* cache, const char* path,
                                  const char* folder_name, ZYROCloud_ListCallback callback,
                                  void* user_data, int* err) {
    if (!AllGiven(SourceLine::Here(), server_id, cache, path)) {
        return 0;
    }
    return WithDriver<OneDrive>(server_id, [&](OneDrive& drive) {
        ListRules rules;
        if (strcmp(path, "/") == 0) {
            rules.id = "";
        }
        rules.find = [&](std::string& id) {
            return drive.GetFileIDByPathFromServer("", path, "", TextOrEmpty(folder_name), id);
        };
        rules.finds_again = true;
        rules.convert = OneDriveRecord;
        return ListInto({cache, path, callback, user_data, err}, drive, rules);
    });
}

int ZYROCloud_Cloud_OneDrive_CheckAccount(const char* server_id, const char* json, int* err) {
    return CheckAccount({server_id, json, err}, CLOUD_TYPE_ONEDRIVE);
}

int ZYROCloud_Cloud_OneDrive_Move(const char* server_id, ZYROCloud_Cache* cache, const char* from,
                                  const char* to, const char* to_path, int* err) {
    if (!AllGiven(SourceLine::Here(), server_id, cache, from, to, to_path)) {
        return 0;
    }
    return WithDriver<OneDrive>(server_id, [&](OneDrive& drive) {
        const auto find = [&](Json::Value& item) {
            return drive.GetFileInfoByPathFromServer(to_path, "", Json::Value(Json::objectValue),
                                                     "", item);
        };
        return MoveOver(drive, {from, to, to_path, err}, find);
    });
}

long long ZYROCloud_Cloud_OneDrive_Download(ZYROCloud_Handle* handle, const void* p2,
                                            const void* p3, char** dest, long long size, int* err) {
    return ReadInto({handle, p2, p3, dest, size, err}, CLOUD_TYPE_ONEDRIVE, FindUrl);
}
