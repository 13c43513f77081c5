#include "bridge/file_info.h"

namespace ZYROCloud {

namespace {

struct TimeAttributes {
    const char* seconds;
    const char* microseconds;
};

void SetTime(GFileInfo* info, TimeAttributes names, const timeval& time) {
    g_file_info_set_attribute_uint64(info, names.seconds, static_cast<guint64>(time.tv_sec));
    g_file_info_set_attribute_uint32(info, names.microseconds, static_cast<guint32>(time.tv_usec));
}

constexpr const char* kAllowed[] = {
    G_FILE_ATTRIBUTE_ACCESS_CAN_READ,   G_FILE_ATTRIBUTE_ACCESS_CAN_WRITE,
    G_FILE_ATTRIBUTE_ACCESS_CAN_DELETE, G_FILE_ATTRIBUTE_ACCESS_CAN_EXECUTE,
    G_FILE_ATTRIBUTE_ACCESS_CAN_TRASH,  G_FILE_ATTRIBUTE_ACCESS_CAN_RENAME,
};

}  // namespace

void SetGFileInfo(GFileInfo** info, const char* id, bool is_dir, const char* display_name,
                  const char* name, long long size, const timeval& modified, const timeval& access,
                  const timeval& changed, const timeval& created, const char* description) {
    if (info == nullptr || *info == nullptr) {
        return;
    }
    GFileInfo* const record = *info;
    if (id != nullptr) {
        g_file_info_set_attribute_string(record, kAttrFileId, id);
    }
    g_file_info_set_file_type(record, is_dir ? G_FILE_TYPE_DIRECTORY : G_FILE_TYPE_REGULAR);
    if (name != nullptr) {
        g_file_info_set_name(record, name);
    }
    if (display_name != nullptr) {
        g_file_info_set_display_name(record, display_name);
    }
    g_file_info_set_size(record, size);
    SetTime(record, {G_FILE_ATTRIBUTE_TIME_MODIFIED, G_FILE_ATTRIBUTE_TIME_MODIFIED_USEC},
            modified);
    SetTime(record, {G_FILE_ATTRIBUTE_TIME_ACCESS, G_FILE_ATTRIBUTE_TIME_ACCESS_USEC}, access);
    SetTime(record, {G_FILE_ATTRIBUTE_TIME_CHANGED, G_FILE_ATTRIBUTE_TIME_CHANGED_USEC}, changed);
    SetTime(record, {G_FILE_ATTRIBUTE_TIME_CREATED, G_FILE_ATTRIBUTE_TIME_CREATED_USEC}, created);
    for (const char* right : kAllowed) {
        g_file_info_set_attribute_boolean(record, right, TRUE);
    }
    if (description != nullptr) {
        g_file_info_set_attribute_string(record, kAttrDescription, description);
    }
}

UniqueFileInfo NewGFileInfo() {
    static GFileInfo* const model = [] {
        GFileInfo* info = g_file_info_new();
        SetGFileInfo(&info, "", false, "", "", 0, {}, {}, {}, {}, nullptr);
        return info;
    }();
    return UniqueFileInfo(g_file_info_dup(model));
}

const char* InfoName(GFileInfo* info) {
    return info == nullptr
               ? nullptr
               : g_file_info_get_attribute_byte_string(info, G_FILE_ATTRIBUTE_STANDARD_NAME);
}

const char* InfoDisplayName(GFileInfo* info) {
    return info == nullptr
               ? nullptr
               : g_file_info_get_attribute_string(info, G_FILE_ATTRIBUTE_STANDARD_DISPLAY_NAME);
}

const char* AttrText(GFileInfo* info, const char* attribute) {
    const char* text =
        info == nullptr ? nullptr : g_file_info_get_attribute_string(info, attribute);
    return text == nullptr ? "" : text;
}

}  // namespace ZYROCloud
