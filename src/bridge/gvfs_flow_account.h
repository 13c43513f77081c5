/** Asking a service whether it accepts the credentials of a mount. */
#ifndef ZYROVFS_BRIDGE_GVFS_FLOW_ACCOUNT_H
#define ZYROVFS_BRIDGE_GVFS_FLOW_ACCOUNT_H

#include <json/value.h>

#include "core/source_line.h"
#include "zyrovfs/cloud.h"

namespace ZYROCloud::gvfs {

/** What the entry points for accounts take. */
struct AccountCall {
    const char* server_id;
    const char* json;  ///< credentials of the mount
    int* err;
};

/** The stored connection; false when there is none. */
bool FindConnection(const AccountCall& call, Json::Value& profile);

/** The credentials as an object. A text that is none is logged, as far as it shows no token. */
bool ParseCredentials(const AccountCall& call, Json::Value& out,
                      ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

/** The same line for credentials that can be read, but lack something. */
void LogCredentials(const AccountCall& call, ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

/** Lays the credentials over a connection, for a driver. */
void Merge(const AccountCall& call, const Json::Value& credentials, Json::Value& profile);

/** Has the service tell the account of `profile`, and the stored connection keep it. */
bool UpdateAccount(const AccountCall& call, _tag_cloud_type type, const Json::Value& profile,
                   ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

/** The account check: true also without a stored connection, when there is nothing to compare.
 * Log lines are those of the caller. */
int CheckAccount(const AccountCall& call, _tag_cloud_type type,
                 ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

}  // namespace ZYROCloud::gvfs

#endif
