/** The catalogue: which protocols this installation offers, read from the .mount files of gvfs. */
#ifndef ZYROVFS_PROTOCOL_H
#define ZYROVFS_PROTOCOL_H

#include <json/value.h>

#include <string>

#include "zyrovfs/export.h"

namespace ZYROVFS::Protocol {

/**
 * One protocol as an object with "protocol", "name", "api" (items separated by commas) and
 * "enable_curl" (the text "true" or "false"). VFS_ERR_FAILED when there is no such file,
 * VFS_ERR_OUT_OF_MEMORY.
 */
ZYROVFS_API bool GetProtocol(const char* protocol, Json::Value& out);

/** One raw key of one protocol's file; a key that the file lacks gives "". Codes as GetProtocol. */
ZYROVFS_API bool GetByKey(const char* protocol, const char* key, std::string& value);

/**
 * All protocols, sorted by name without regard to case, each with the keys of GetProtocol and
 * "default_port". One unreadable file fails the list: VFS_ERR_FAILED, VFS_ERR_OUT_OF_MEMORY.
 */
ZYROVFS_API bool ListProtocol(Json::Value& out);

/** ListProtocol with "has_server" in each: whether the user has a saved profile of the protocol. */
ZYROVFS_API bool ListProtocolByUID(unsigned int uid, Json::Value& out);

}  // namespace ZYROVFS::Protocol

#endif
