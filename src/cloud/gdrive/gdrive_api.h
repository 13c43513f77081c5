/** Addresses, texts and limits of the Google Drive REST interface, version 2. */
#ifndef ZYROVFS_CLOUD_GDRIVE_API_H
#define ZYROVFS_CLOUD_GDRIVE_API_H

#include <json/value.h>

#include <string>

#include "cloud/request.h"
#include "cloud/service_config.h"

namespace ZYROCloud::gdrive {

/** What a request of this service looks like. */
inline constexpr FrameRules kFrame{true, nullptr, false, false};

inline constexpr const char* kRoot = "root";
inline constexpr const char* kFolderType = "application/vnd.google-apps.folder";

inline constexpr unsigned long long kLargestFile = 5497558138880ULL;  // 5 TiB
/** Up to this size a file goes in one request. */
inline constexpr unsigned long long kLargestDirect = 33554432ULL;  // 32 MiB

/** In place of a URL, for a document that has no bytes. */
inline constexpr const char* kLinkScheme = "alternateLink://";

inline std::string About() {
    return GoogleApiHost() + "/drive/v2/about";
}

/** Address of the collection of all items, or, with "/" and more, of an item or an action. */
inline std::string Files(const std::string& what = "") {
    return GoogleApiHost() + "/drive/v2/files" + what;
}

inline std::string Upload(const std::string& what = "") {
    return GoogleApiHost() + "/upload/drive/v2/files" + what;
}

/** `params` as they are; Json::LogicError when they are no object. A null would ask for nothing,
 * where the caller is to say that it wants nothing. */
inline const Json::Value& NeedObject(const Json::Value& params) {
    if (!params.isObject()) {
        Json::throwLogicError("the parameters are no object");
    }
    return params;
}

}  // namespace ZYROCloud::gdrive

#endif
