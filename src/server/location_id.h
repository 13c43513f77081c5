/** To which profile a location belongs. */
#ifndef ZYROVFS_SERVER_LOCATION_ID_H
#define ZYROVFS_SERVER_LOCATION_ID_H

#include <json/value.h>

#include <string>

#include "zyrovfs/server.h"

namespace ZYROVFS::Server {

/**
 * The id of a profile, of which `uri` is a location: the text in front of the path. Where an
 * account has a '/' in its name, the path begins later, and the profiles tell where.
 */
std::string IdOfLocation(unsigned int uid, VFS_CONFIG_MODE mode, const std::string& uri);

/**
 * The acting user's connection of a location. `id` and `rest` are what Utils::GetURIParts made of
 * it; they become the parts before and behind the connection's own id. VFS_ERR_CONFIG_READ,
 * VFS_ERR_CONFIG_NOT_FOUND, and then both are left alone.
 */
bool FindConnection(const std::string& uri, std::string& id, std::string& rest,
                    Json::Value& connection);

}  // namespace ZYROVFS::Server

#endif
