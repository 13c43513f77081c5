#include "bridge/gvfs_flow_list.h"

#include "bridge/cache_hold.h"
#include "bridge/gvfs_cache.h"
#include "bridge/gvfs_utils.h"
#include "core/log.h"

namespace ZYROCloud::gvfs {

using namespace ZYROVFS;

namespace {

bool Find(const ListCall& call, const Cloud& cloud, const ListRules& rules, std::string& id,
          SourceLine at) {
    if (rules.find(id)) {
        return true;
    }
    StoreError(cloud, call.err);
    LOG_ERROR_AT(at, "Failed to find the path, %s, %d", call.path, cloud.GetErrorCode());
    return false;
}

bool FindFolder(const ListCall& call, const Cloud& cloud, const ListRules& rules, std::string& id,
                SourceLine at) {
    if (rules.id) {
        id = *rules.id;
        return true;
    }
    return FindInCache(call, id, at) && (!id.empty() || Find(call, cloud, rules, id, at));
}

bool Ask(const ListCall& call, Cloud& cloud, const ListRules& rules, std::string id,
         Json::Value& items, SourceLine at) {
    if (cloud.ListFolder(id, rules.query, items)) {
        return true;
    }
    if (rules.finds_again && cloud.GetErrorCode() == VFS_ERR_NOT_FOUND) {
        items = Json::Value();
        if (!Find(call, cloud, rules, id, at)) {
            return false;
        }
        if (cloud.ListFolder(id, rules.query, items)) {
            return true;
        }
    }
    StoreError(cloud, call.err);
    LOG_ERROR_AT(at, "Failed to list folder %s err: %s", call.path, ErrorText(cloud).c_str());
    return false;
}

void Add(const ListCall& call, const ItemRecord& record) {
    UniqueFileInfo info = ToFileInfo(record);
    // Callbacks change what they get: gvfs takes away what its client did not ask for.
    const UniqueFileInfo shown(call.callback == nullptr ? nullptr : g_file_info_dup(info.get()));
    ZYROCloud_Cache_List_Add(call.cache, call.path, record.keeps_display_name, info.get());
    AddEntry(*call.cache, call.path, std::move(info));
    if (call.callback != nullptr) {
        call.callback(shown.get(), call.user_data);
    }
}

void Fill(const ListCall& call, const ListRules& rules, Json::Value& items, SourceLine at) {
    const CacheHold hold(call.cache);
    ZYROCloud_Cache_List_Remove(call.cache, call.path);
    for (Json::Value& slot : items) {
        // The JSON of an item is several times what is kept of it, and goes as soon as that stands.
        Json::Value item;
        item.swap(slot);
        ItemRecord record;
        if (rules.convert(item, record) && HasFitTexts(record, at) &&
            HasFitName(record, call.path, at)) {
            Add(call, record);
        }
    }
}

}  // namespace

bool FindInCache(const ListCall& call, std::string& id, SourceLine at) {
    const CacheHold hold(call.cache);
    GFileInfo* info = nullptr;
    id.clear();
    if (ZYROCloud_Cache_Entry_Get(call.cache, call.path, &info) == 0) {
        return true;
    }
    if (g_file_info_get_file_type(info) != G_FILE_TYPE_DIRECTORY) {
        StoreError(G_IO_ERROR_NOT_DIRECTORY, call.err);
        LOG_ERROR_AT(at, "The file is not a directory %s", call.path);
        return false;
    }
    id = AttrText(info, kAttrFileId);
    return true;
}

bool ListInto(const ListCall& call, Cloud& cloud, const ListRules& rules, SourceLine at) {
    std::string id;
    Json::Value items;
    if (!FindFolder(call, cloud, rules, id, at) || !Ask(call, cloud, rules, id, items, at) ||
        !items.isArray()) {
        return false;
    }
    Fill(call, rules, items, at);
    return true;
}

}  // namespace ZYROCloud::gvfs
