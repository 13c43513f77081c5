/** Addresses, limits and argument headers of the Dropbox HTTP interface, version 2. */
#ifndef ZYROVFS_CLOUD_DROPBOX_API_H
#define ZYROVFS_CLOUD_DROPBOX_API_H

#include <string>

#include "cloud/request.h"
#include "cloud/service_config.h"

namespace ZYROCloud::dropbox {

/** What a request about items or the account looks like, and one that carries contents. */
inline constexpr FrameRules kFrame{false, "application/json", false, true};
inline constexpr FrameRules kContentFrame{false, "application/octet-stream", false, false};

inline constexpr unsigned long long kLargestFile = 10737418240ULL;  // 10 GiB
/** Up to this size a file goes in one request; beyond it, in pieces of this size. */
inline constexpr unsigned long long kLargestDirect = 33554432ULL;  // 32 MiB

/** Header that carries what a content request is about, as JSON. */
inline constexpr const char* kArgument = "Dropbox-API-Arg";

inline std::string Api(const std::string& what) {
    return DropboxApiHost() + "/2/" + what;
}

inline std::string Content(const std::string& what) {
    return DropboxContentHost() + "/2/files/" + what;
}

}  // namespace ZYROCloud::dropbox

#endif
