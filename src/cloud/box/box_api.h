/** Addresses, fields and limits of the Box REST interface, version 2.0. */
#ifndef ZYROVFS_CLOUD_BOX_API_H
#define ZYROVFS_CLOUD_BOX_API_H

#include <string>

#include "cloud/request.h"
#include "cloud/service_config.h"

namespace ZYROCloud::box {

/** What a request of this service looks like. */
inline constexpr FrameRules kFrame{true, nullptr, false, false};

inline constexpr const char* kAccountFields =
    "id,name,login,space_used,space_amount,max_upload_size";
inline constexpr const char* kItemFields = "id,name,size,created_at,modified_at,parent,owned_by";
inline constexpr unsigned int kPageSize = 1000;

inline constexpr unsigned long long kLargestFile = 5368709120ULL;  // 5 GiB
/** Beyond this an account's own limit may be lower than that of the service: it is asked. */
inline constexpr unsigned long long kAskedFrom = 262144000ULL;  // 250 MiB

/** Item ids carry their kind, as "files/12" or "folders/34", and are part of the address. */
inline constexpr const char* kFiles = "files/";
inline constexpr const char* kFolders = "folders/";
inline constexpr const char* kRoot = "folders/0";

/** Address of an item, a collection or a service call. */
inline std::string Api(const std::string& what) {
    return BoxApiHost() + "/2.0/" + what;
}

/** What follows the last slash: the id without its kind. */
inline std::string StripIdPrefix(const std::string& id) {
    return id.substr(id.rfind('/') + 1);
}

}  // namespace ZYROCloud::box

#endif
