// Dropbox as its gvfs backend sees it.
#include <json/value.h>

#include <string>

#include "bridge/gvfs_dropbox_item.h"
#include "bridge/gvfs_flow_account.h"
#include "bridge/gvfs_flow_list.h"
#include "bridge/gvfs_flow_read.h"
#include "bridge/gvfs_utils.h"
#include "bridge/handle.h"
#include "cloud/dropbox/dropbox.h"
#include "core/log.h"
#include "zyrovfs/zyrocloud.h"

using namespace ZYROCloud;
using namespace ZYROCloud::gvfs;
using ZYROVFS::SourceLine;

int ZYROCloud_Cloud_Dropbox_List(const char* server_id, ZYROCloud_Cache* cache, const char* path,
                                 ZYROCloud_ListCallback callback, void* user_data, int* err) {
    if (!AllGiven(SourceLine::Here(), cache, path)) {
        return 0;
    }
    return WithDriver<Dropbox>(server_id, [&](Dropbox& dropbox) {
        const ListCall call{cache, path, callback, user_data, err};
        std::string cached_id;
        ListRules rules;
        rules.id = path;
        rules.convert = DropboxRecord;
        return FindInCache(call, cached_id) && ListInto(call, dropbox, rules);
    });
}

int ZYROCloud_Cloud_Dropbox_Get(const char* server_id, ZYROCloud_Cache* cache, const char* dir,
                                const char* path, int* err) {
    if (!AllGiven(SourceLine::Here(), server_id, cache, dir, path)) {
        return 0;
    }
    return WithDriver<Dropbox>(server_id, [&](Dropbox& dropbox) {
        Json::Value item;
        if (!dropbox.GetFileInfo(path, Json::Value(Json::objectValue), item)) {
            StoreError(dropbox, err);
            LOG_ERROR("Failed to list folder %s err: %s", path, ErrorText(dropbox).c_str());
            return false;
        }
        ItemRecord record;
        if (DropboxRecord(item, record) && HasFitTexts(record) && HasFitName(record, dir)) {
            ZYROCloud_Cache_Entry_Add(cache, dir, ToFileInfo(record).get());
        }
        return true;
    });
}

int ZYROCloud_Cloud_Dropbox_CheckAccount(const char* server_id, const char* json, int* err) {
    return CheckAccount({server_id, json, err}, CLOUD_TYPE_DROPBOX);
}

long long ZYROCloud_Cloud_Dropbox_Download(ZYROCloud_Handle* handle, const char* prefix,
                                           const void* p3, char** dest, long long size, int* err) {
    // What the driver takes for a URL is a share path: the prefix is the server id.
    const auto find_url = [prefix](const ZYROCloud_Handle& opened, std::string& url) {
        const std::string path =
            opened.path.empty() ? AttrText(opened.info.get(), kAttrFileId) : opened.path;
        if (path.empty()) {
            LOG_ERROR("File ID is empty");
            return false;
        }
        url = prefix + path;
        return true;
    };
    return ReadInto({handle, prefix, p3, dest, size, err}, CLOUD_TYPE_DROPBOX, find_url);
}
