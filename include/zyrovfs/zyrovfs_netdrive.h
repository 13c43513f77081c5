/** Everything that a C++ caller of libzyrovfs.so.6 may use. */
#ifndef ZYROVFS_NETDRIVE_H
#define ZYROVFS_NETDRIVE_H

#include "zyrovfs/cfg.h"
#include "zyrovfs/cloud.h"
#include "zyrovfs/cloud_utils.h"
#include "zyrovfs/error.h"
#include "zyrovfs/global.h"
#include "zyrovfs/protocol.h"
#include "zyrovfs/server.h"
#include "zyrovfs/task.h"
#include "zyrovfs/utils.h"
#include "zyrovfs/vfs.h"

#endif
