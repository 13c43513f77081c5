/** The document of a profile file: where it is, and what stands in it, whatever that may be. */
#ifndef ZYROVFS_SERVER_CONFIG_DOCUMENT_H
#define ZYROVFS_SERVER_CONFIG_DOCUMENT_H

#include <json/value.h>

#include <cstring>
#include <string>

#include "zyrovfs/server.h"

namespace ZYROVFS::Server {

/** The path of a user's document, which may be missing. */
std::string DocumentPath(unsigned int uid, VFS_CONFIG_MODE mode);

/** The profiles by server id; null, and so without members, when the document has no such object.
 */
inline const Json::Value& ServersOf(const Json::Value& doc) {
    const bool present = doc.isObject() && doc["servers"].isObject();
    return present ? doc["servers"] : Json::Value::nullSingleton();
}

/** True when a profile's member `key` is this text (up to its first NUL). */
inline bool HasText(const Json::Value& profile, const char* key, const char* text) {
    return profile.isObject() && profile[key].isString() &&
           std::strcmp(profile[key].asCString(), text) == 0;
}

}  // namespace ZYROVFS::Server

#endif
