#include "bridge/gvfs_flow_item.h"

#include <cstring>

#include "core/json.h"
#include "core/json_member.h"
#include "core/log.h"
#include "zyrovfs/utils.h"

namespace ZYROCloud::gvfs {

using namespace ZYROVFS;
using namespace ZYROVFS::json;

namespace {

constexpr size_t kLongestName = 255;
constexpr size_t kLongestPath = 4096;

/** A text with a NUL in it is none, either: it would end there for everybody else. */
bool IsUtf8(const std::string& text) {
    return g_utf8_validate(text.data(), static_cast<gssize>(text.size()), nullptr) != FALSE;
}

/** One component of a path, and no other place than that. */
bool IsComponent(const std::string& name) {
    return !name.empty() && name != "." && name != ".." && name.find('/') == std::string::npos;
}

}  // namespace

timeval TimeOf(const Json::Value& item, const char* key) {
    timeval time{};
    const std::string text = TextOf(item, key);
    if (!text.empty()) {
        ZYROVFS::Utils::ParseRFC3339ToTime(text, time);
    }
    return time;
}

long long SizeOf(const Json::Value& item, const char* key) {
    int64_t size = 0;
    return json::toInt64(MemberOf(item, key), size) && size > 0 ? size : 0;
}

std::string TextOfMembers(const Json::Value& item, std::initializer_list<const char*> keys) {
    Json::Value members(Json::objectValue);
    for (const char* key : keys) {
        const Json::Value& member = MemberOf(item, key);
        if (!member.isNull()) {
            members[key] = member;
        }
    }
    const std::string text = json::toString(members);
    return IsUtf8(text) ? text : json::toAscii(members);
}

bool HasFitTexts(const ItemRecord& record, SourceLine at) {
    if (record.id.empty()) {
        LOG_ERROR_AT(at, "Item without an id, %s", record.name.c_str());
        return false;
    }
    if (!IsUtf8(record.id) || !IsUtf8(record.name)) {
        LOG_ERROR_AT(at, "Item with a text that is no UTF-8, %s", record.id.c_str());
        return false;
    }
    return true;
}

bool HasFitName(const ItemRecord& record, const char* path, SourceLine at) {
    if (!IsComponent(record.name)) {
        LOG_ERROR_AT(at, "File name is none, %s -> %s", path, record.name.c_str());
        return false;
    }
    if (record.name.size() > kLongestName) {
        LOG_ERROR_AT(at, "File name is too long, %s -> %s", path, record.name.c_str());
        return false;
    }
    if (record.name.size() + 1 + strlen(path) > kLongestPath) {
        LOG_ERROR_AT(at, "File path is too long, %s -> %s", path, record.name.c_str());
        return false;
    }
    return true;
}

UniqueFileInfo ToFileInfo(const ItemRecord& record) {
    UniqueFileInfo info = NewGFileInfo();
    GFileInfo* filled = info.get();
    const char* description = record.description.empty() ? nullptr : record.description.c_str();
    SetGFileInfo(&filled, record.id.c_str(), record.is_dir, record.display_name.c_str(),
                 record.name.c_str(), record.size, record.modified, record.access, record.created,
                 record.created, description);
    return info;
}

}  // namespace ZYROCloud::gvfs
