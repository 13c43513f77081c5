#include "bridge/gvfs_gdrive_item.h"

#include <cstring>
#include <string_view>

#include "bridge/gvfs_utils.h"
#include "cloud/gdrive/gdrive_api.h"
#include "cloud/gdrive/gdrive_types.h"
#include "core/json.h"
#include "core/json_member.h"

namespace ZYROCloud::gvfs {

using ZYROVFS::json::MemberOf;
using ZYROVFS::json::TextOf;

namespace {

constexpr std::string_view kMyDrive = "My Drive";
constexpr std::string_view kStarred = "Starred";

/** What follows `folder` and a slash in `path`; false for a path that is not below it. */
bool IsBelow(std::string_view path, std::string_view folder, std::string_view& rest) {
    if (path.substr(0, folder.size()) != folder || path.size() <= folder.size() ||
        path[folder.size()] != '/') {
        return false;
    }
    rest = path.substr(folder.size() + 1);
    return true;
}

/** Documents are shown with the extension of their kind, of which the service knows nothing. */
void AddExtension(const std::string& type, ItemRecord& record) {
    const gdrive::DocumentType* document = gdrive::FindDocumentByType(type);
    if (document != nullptr && gdrive::ExtensionOf(record.name) != document->extension) {
        record.name += document->extension;
    }
}

/** The service lets items of one folder share a name; a path has to lead to one of them. */
void TellApart(const std::string& created, std::string& name) {
    const size_t dot = name.rfind('.');
    name.insert(dot == std::string::npos ? name.size() : dot, " - " + created);
}

/** A document has no bytes, but reads as a text with its link. */
long long SizeOfFile(const Json::Value& item) {
    if (!MemberOf(item, "fileSize").isNull() || MemberOf(item, "alternateLink").isNull()) {
        return SizeOf(item, "fileSize");
    }
    Json::Value link;
    link["url"] = MemberOf(item, "alternateLink");
    return static_cast<long long>(ZYROVFS::json::toString(link).size());
}

}  // namespace

GooglePath GooglePathOf(const char* path) {
    if (path == nullptr) {
        return kGoogleOther;
    }
    std::string_view rest;
    const std::string_view place = path + strspn(path, "/");
    if (place.empty()) {
        return kGoogleTop;
    }
    if (place == kMyDrive || (IsBelow(place, kMyDrive, rest) && rest.empty())) {
        return kGoogleMyDrive;
    }
    if (IsBelow(place, kMyDrive, rest)) {
        return kGoogleInMyDrive;
    }
    if (place == kStarred || (IsBelow(place, kStarred, rest) && rest.empty())) {
        return kGoogleStarred;
    }
    if (IsBelow(place, kStarred, rest)) {
        return rest.find('/') == std::string_view::npos ? kGoogleInStarred : kGoogleDeepInStarred;
    }
    return kGoogleOther;
}

std::string PathInMyDrive(const char* path) {
    std::string_view rest;
    return IsBelow(path + strspn(path, "/"), kMyDrive, rest) && !rest.empty()
               ? "/" + std::string(rest)
               : "";
}

bool GoogleRecord(const Json::Value& item, const IsTaken& is_taken, ItemRecord& record) {
    if (item.isNull()) {
        return false;
    }
    const std::string type = TextOf(item, "mimeType");
    record.id = TextOf(item, "id");
    record.is_dir = type == gdrive::kFolderType;
    record.name = TextOf(item, "title");
    if (record.name.empty()) {
        record.name = TextOf(item, "originalFilename");
    }
    AddExtension(type, record);
    record.display_name = record.name;
    record.keeps_display_name = true;
    if (is_taken(record.display_name)) {
        TellApart(TextOf(item, "createdDate"), record.name);
    }
    record.size = record.is_dir ? 0 : SizeOfFile(item);
    record.modified = TimeOf(item, "modifiedDate");
    record.access = TimeOf(item, "lastViewedByMeDate");
    if (record.access.tv_sec == 0) {
        record.access = record.modified;
    }
    record.created = TimeOf(item, "createdDate");
    record.description =
        TextOfMembers(item, {"downloadUrl", "alternateLink", "exportLinks", "mimeType"});
    return true;
}

}  // namespace ZYROCloud::gvfs
