/** Texts of a profile, which may have been written by anybody. */
#ifndef ZYROVFS_CLOUD_PROFILE_MEMBER_H
#define ZYROVFS_CLOUD_PROFILE_MEMBER_H

#include <json/value.h>

#include <string>

#include "core/source_line.h"

namespace ZYROCloud {

/** Text of a member, `missing` when there is none. What has no text is logged and counts as
 * missing. */
std::string ProfileMember(const Json::Value& profile, const char* key, const char* missing = "",
                          ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

}  // namespace ZYROCloud

#endif
