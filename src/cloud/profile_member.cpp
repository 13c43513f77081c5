#include "cloud/profile_member.h"

#include "core/log.h"

namespace ZYROCloud {

std::string ProfileMember(const Json::Value& profile, const char* key, const char* missing,
                          ZYROVFS::SourceLine at) {
    if (!profile.isObject() || !profile.isMember(key)) {
        return missing;
    }
    const Json::Value& value = profile[key];
    if (!value.isConvertibleTo(Json::stringValue)) {
        LOG_ERROR_AT(at, "Wrong type of %s in a profile", key);
        return missing;
    }
    return value.asString();
}

}  // namespace ZYROCloud
