#include "cloud/conflict.h"
#include "cloud/guard.h"
#include "cloud/onedrive/onedrive_api.h"
#include "core/json_member.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud::Utils {
namespace {

using ZYROVFS::json::TextOf;

constexpr const char* kQuote =
    "This service's driver sends a double quote in a name in another form; rename the file first.";
constexpr const char* kOtherFolder =
    "The name of the file stands in the path of its folder, too, and the file would land in "
    "another folder of OneDrive; copy it under another name.";
constexpr const char* kFolderGoes =
    "A folder of that name stands there, and an upload would delete it with all that is in it; "
    "move it away or take another name.";
constexpr const char* kNotAsked = "The service did not tell what stands at the target.";

struct Transfer {
    Cloud& cloud;
    const std::string& uri;
    const std::string path;
    bool upload;
    long long size;
};

/** Which names a driver escapes although the request escapes them again. */
bool IsQuoteMangled(const Transfer& transfer) {
    const std::string name = NameAtEnd(transfer.path);
    switch (transfer.cloud.GetCloudType()) {
        case CLOUD_TYPE_DROPBOX:
            return transfer.path.find('"') != std::string::npos;
        case CLOUD_TYPE_BOX:
        case CLOUD_TYPE_GOOGLE:
            return transfer.upload && name.find('"') != std::string::npos;
        default:
            return false;
    }
}

/** Fragments go by the whole path, files of one request by a search for the name in it. */
bool IsFolderMistaken(const Transfer& transfer) {
    const _tag_cloud_type type = transfer.cloud.GetCloudType();
    const bool onedrive = type == CLOUD_TYPE_ONEDRIVE || type == CLOUD_TYPE_ONEDRIVE_SHORT;
    return onedrive && transfer.upload && transfer.size <= onedrive::kMostAtOnce &&
           transfer.path.find(NameAtEnd(transfer.path)) != transfer.path.rfind('/') + 1;
}

/** The folder of the target is listed: the mounted tree may not know yet of what others made. */
bool IsFolderInTheWay(const Transfer& transfer, std::string& why) {
    Json::Value meta;
    Json::Value items;
    if (!transfer.upload || transfer.cloud.GetCloudType() != CLOUD_TYPE_BOX ||
        !transfer.cloud.GetMetaDataByURI(transfer.uri, meta, "Upload")) {
        return false;  // nothing is sent without
    }
    if (!transfer.cloud.ListFolder(TextOf(meta, "parent_id"), Json::Value(Json::objectValue),
                                   items)) {
        why = kNotAsked;
        return true;
    }
    for (const Json::Value& item : items) {
        if (TextOf(item, "type") == "folder" && IsNamed(item, TextOf(meta, "name"))) {
            why = kFolderGoes;
            return true;
        }
    }
    return false;
}

}  // namespace

bool IsTransferSafe(Cloud* cloud, const std::string& uri, bool upload, long long size,
                    std::string& why) {
    why = kNotAsked;
    // An answer of no is no failure of the driver, and leaves no code.
    return cloud != nullptr && Barrier(*cloud, [&] {
               const Transfer transfer{*cloud, uri, cloud->GetServerPathBySharePath(uri), upload,
                                       size};
               if (IsQuoteMangled(transfer)) {
                   why = kQuote;
               } else if (IsFolderMistaken(transfer)) {
                   why = kOtherFolder;
               } else if (!IsFolderInTheWay(transfer, why)) {
                   why.clear();
                   return true;
               }
               return false;
           });
}

}  // namespace ZYROCloud::Utils
