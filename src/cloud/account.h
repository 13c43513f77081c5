/**
 * The account of a cloud profile, asked from its service. Profiles need this one answer of a
 * driver, while drivers read and rewrite profiles; this header is all that profiles see of them.
 */
#ifndef ZYROVFS_CLOUD_ACCOUNT_H
#define ZYROVFS_CLOUD_ACCOUNT_H

#include <json/value.h>

#include "zyrovfs/cloud.h"

namespace ZYROCloud {

/**
 * Asks with the plain-text credentials of `profile`; tokens that had to be renewed on the way are
 * written into it, since a refresh token works once. False leaves the driver's error record in
 * `error`, or a null `error` when there was no driver.
 */
bool AskAccount(_tag_cloud_type type, unsigned int uid, Json::Value& profile,
                const Json::Value& params, Json::Value& out, Json::Value& error);

}  // namespace ZYROCloud

#endif
