/** Which server type stands behind a protocol. */
#ifndef ZYROVFS_SERVER_SERVER_FACTORY_H
#define ZYROVFS_SERVER_SERVER_FACTORY_H

#include <memory>
#include <string>

#include "server/server_base.h"

namespace ZYROVFS::Server {

/** A fresh object for one operation, null when it cannot be had. */
using ServerFactory = std::unique_ptr<ServerBase> (*)(const std::string& protocol);

/**
 * The type of a protocol. A protocol that no row names is one that gvfs mounts by its URI, and the
 * mount finds out whether it can.
 */
std::unique_ptr<ServerBase> NewServer(const std::string& protocol);

/** What ServerMgr asks: NewServer, unless a test stands in for the remote side. */
extern ServerFactory server_factory;

}  // namespace ZYROVFS::Server

#endif
