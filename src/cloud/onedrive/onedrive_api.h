/** Addresses, texts and limits of the Live REST interface, version 5.0, and of BITS uploads. */
#ifndef ZYROVFS_CLOUD_ONEDRIVE_API_H
#define ZYROVFS_CLOUD_ONEDRIVE_API_H

#include <json/value.h>

#include <string>

#include "cloud/request.h"
#include "cloud/service_config.h"
#include "http/error_handler_table.h"

namespace ZYROCloud::onedrive {

/** What a request of this service looks like. */
inline constexpr FrameRules kFrame{true, nullptr, true, false};

inline constexpr const char* kVersion = "/v5.0/";
inline constexpr const char* kAccount = "me";
inline constexpr const char* kRoot = "me/skydrive";

inline constexpr unsigned long long kLargestFile = 10737418240ULL;  // 10 GiB
/** Up to this size a file goes in one request, and a larger one in fragments of it. */
inline constexpr long long kMostAtOnce = 33554432;  // 32 MiB

inline constexpr const char* kBitsMethod = "BITS_POST";
inline constexpr const char* kBitsProtocol = "7df0354d-249b-430f-820d-3d2a9bef4931";
inline constexpr const char* kPacketType = "BITS-Packet-Type";
inline constexpr const char* kSessionId = "BITS-Session-Id";
inline constexpr const char* kSupportedProtocols = "BITS-Supported-Protocols";
inline constexpr const char* kReceived = "BITS-Received-Content-Range";

/** Address of an item or an action. */
inline std::string Api(const std::string& what) {
    return LiveApiHost() + kVersion + what;
}

/** Address of an item by id; "" is the root. */
inline std::string ItemUrl(const std::string& id) {
    return Api(id.empty() ? kRoot : id);
}

/** Where an account's storage takes the content of a file. */
inline std::string StorageUrl(const std::string& account, const std::string& path) {
    const std::string api = LiveApiHost();
    return api.substr(0, api.find("://")) + "://cid-" + account + LiveStorageDomain() +
           "/users/0x" + account + "/LiveFolders" + path;
}

/** Text of a member that may be missing or a number; "" for what has no text. */
inline std::string Text(const Json::Value& item, const char* key) {
    const Json::Value& member = MemberOf(item, key);
    return member.isConvertibleTo(Json::stringValue) ? member.asString() : "";
}

}  // namespace ZYROCloud::onedrive

#endif
