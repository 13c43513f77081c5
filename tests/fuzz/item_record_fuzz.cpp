// Items of any bytes behind a first one that picks the service: whatever a service lists, what
// passes for an item of the tree has a name of its own folder, and texts that all programs around
// the tree can read.
#include <json/value.h>

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <iterator>
#include <string>

#include "bridge/gvfs_box_item.h"
#include "bridge/gvfs_dropbox_item.h"
#include "bridge/gvfs_gdrive_item.h"
#include "bridge/gvfs_onedrive_item.h"
#include "core/json.h"
#include "zyrovfs/zyrocloud.h"

using namespace ZYROCloud;
using namespace ZYROCloud::gvfs;

namespace {

constexpr const char* kFolder = "/docs";

void Check(bool holds) {
    if (!holds) {
        abort();
    }
}

ZYROCloud_Cache* MakeCache() {
    ZYROCloud_Cache* cache = nullptr;
    Check(ZYROCloud_Cache_Init(&cache) == 1);
    return cache;
}

ZYROCloud_Cache* Cache() {
    static ZYROCloud_Cache* const cache = MakeCache();
    return cache;
}

bool Google(const Json::Value& item, ItemRecord& record) {
    const auto is_taken = [](const std::string& name) {
        return ZYROCloud_Cache_List_Ori_Get(Cache(), kFolder, name.c_str()) != 0;
    };
    return GoogleRecord(item, is_taken, record);
}

bool BoxOfAmy(const Json::Value& item, ItemRecord& record) {
    return BoxRecord(item, "17", record);
}

constexpr bool (*kServices[])(const Json::Value&, ItemRecord&) = {Google, BoxOfAmy, DropboxRecord,
                                                                  OneDriveRecord};

bool IsText(const char* text) {
    return text != nullptr && g_utf8_validate(text, -1, nullptr) != FALSE;
}

void CheckInfo(GFileInfo* info) {
    const char* const name = g_file_info_get_name(info);
    Check(IsText(name) && strlen(name) > 0 && strlen(name) < 256 && strchr(name, '/') == nullptr);
    Check(strcmp(name, ".") != 0 && strcmp(name, "..") != 0);
    Check(IsText(g_file_info_get_display_name(info)));
    Check(g_file_info_get_size(info) >= 0);
    Check(IsText(AttrText(info, kAttrFileId)) && strlen(AttrText(info, kAttrFileId)) > 0);
    Check(IsText(AttrText(info, kAttrDescription)));
}

void Store(const ItemRecord& record) {
    const UniqueFileInfo info = ToFileInfo(record);
    GFileInfo* found = nullptr;
    CheckInfo(info.get());
    Check(ZYROCloud_Cache_Entry_Add(Cache(), kFolder, info.get()) == 1);
    Check(ZYROCloud_Cache_List_Add(Cache(), kFolder, record.keeps_display_name, info.get()) == 1);
    Check(ZYROCloud_Cache_Entry_Get(Cache(), (std::string(kFolder) + "/" + record.name).c_str(),
                                    &found) == 1);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    Json::Value items;
    if (size == 0 || !ZYROVFS::json::fromString(
                         items, std::string(reinterpret_cast<const char*>(data + 1), size - 1))) {
        return 0;
    }
    const auto convert = kServices[data[0] % std::size(kServices)];
    if (!items.isArray()) {
        Json::Value one;
        one.append(items);
        items.swap(one);
    }
    for (const Json::Value& item : items) {
        ItemRecord record;
        if (convert(item, record) && HasFitTexts(record) && HasFitName(record, kFolder)) {
            Store(record);
        }
    }
    ZYROCloud_Cache_List_Remove(Cache(), kFolder);
    return 0;
}
