// Box as its gvfs backend sees it.
#include <json/value.h>

#include <cstring>
#include <string>

#include "bridge/gvfs_box_item.h"
#include "bridge/gvfs_flow_account.h"
#include "bridge/gvfs_flow_list.h"
#include "bridge/gvfs_flow_move.h"
#include "bridge/gvfs_flow_read.h"
#include "bridge/gvfs_utils.h"
#include "bridge/handle.h"
#include "cloud/box/box.h"
#include "cloud/box/box_api.h"
#include "core/json.h"
#include "core/json_member.h"
#include "core/log.h"
#include "zyrovfs/zyrocloud.h"

using namespace ZYROCloud;
using namespace ZYROCloud::gvfs;
using ZYROVFS::SourceLine;
using ZYROVFS::json::TextOf;

namespace {

constexpr const char* kAccount = "account_info";

/** Gives the caller the id of an account. */
bool GiveId(const Json::Value& account, char** account_id) {
    *account_id = strdup(TextOf(account, "id").c_str());
    return *account_id != nullptr;
}

/** The account that the credentials are for, as they tell it. */
bool ParseAccount(const AccountCall& call, const Json::Value& credentials, Json::Value& account) {
    if (!credentials.isMember(kAccount)) {
        LogCredentials(call);
        return false;
    }
    if (!ZYROVFS::json::fromString(account, TextOf(credentials, kAccount))) {
        LOG_ERROR("Failed to parse account info");
        return false;
    }
    return true;
}

bool CheckBox(const AccountCall& call, char** account_id) {
    Json::Value credentials;
    Json::Value account;
    Json::Value profile;
    if (!ParseCredentials(call, credentials) || !ParseAccount(call, credentials, account)) {
        return false;
    }
    if (!FindConnection(call, profile)) {
        return GiveId(account, account_id);
    }
    Merge(call, credentials, profile);
    // What the credentials say of the account now stands in the profile.
    if (TextOf(account, "id").empty()) {
        LOG_ERROR("No account info");
        return false;
    }
    return UpdateAccount(call, CLOUD_TYPE_BOX, profile) && GiveId(account, account_id);
}

bool FindUrl(const ZYROCloud_Handle& handle, std::string& url) {
    const std::string id = AttrText(handle.info.get(), kAttrFileId);
    if (id.empty()) {
        LOG_ERROR("File ID is empty");
        return false;
    }
    url = box::Api(id + "/content");
    return true;
}

}  // namespace

int ZYROCloud_Cloud_Box_List(const char* account_id, const char* server_id, ZYROCloud_Cache* cache,
                             const char* path, const char* folder_name,
                             ZYROCloud_ListCallback callback, void* user_data, int* err) {
    if (!AllGiven(SourceLine::Here(), server_id, cache, path)) {
        return 0;
    }
    return WithDriver<Box>(server_id, [&](Box& box) {
        ListRules rules;
        if (strcmp(path, "/") == 0) {
            rules.id = "";
        }
        rules.find = [&](std::string& id) {
            return box.GetFileIDByPathFromServer("", path, "", TextOrEmpty(folder_name), id);
        };
        rules.finds_again = true;
        rules.convert = [&](const Json::Value& item, ItemRecord& record) {
            return account_id != nullptr && BoxRecord(item, account_id, record);
        };
        return ListInto({cache, path, callback, user_data, err}, box, rules);
    });
}

int ZYROCloud_Cloud_Box_CheckAccount(const char* server_id, const char* json, char** account_id,
                                     int* err) {
    const SourceLine here = SourceLine::Here();
    const auto check = [&] {
        return AllGiven(here, server_id, json, account_id) &&
               CheckBox({server_id, json, err}, account_id);
    };
    return ZYROVFS::NoThrow(ZYROVFS::VFS_ERR_FAILED, check) ? 1 : 0;
}

int ZYROCloud_Cloud_Box_Move(const char* server_id, ZYROCloud_Cache* cache, const char* from,
                             const char* to, const char* to_path, int* err) {
    if (!AllGiven(SourceLine::Here(), server_id, cache, from, to, to_path)) {
        return 0;
    }
    return WithDriver<Box>(server_id, [&](Box& box) {
        const auto find = [&](Json::Value& item) {
            return box.GetFileInfoByPathFromServer("", to_path, Json::Value(Json::objectValue), "",
                                                   item);
        };
        return MoveOver(box, {from, to, to_path, err}, find);
    });
}

long long ZYROCloud_Cloud_Box_Download(ZYROCloud_Handle* handle, const void* p2, const void* p3,
                                       char** dest, long long size, int* err) {
    return ReadInto({handle, p2, p3, dest, size, err}, CLOUD_TYPE_BOX, FindUrl);
}
