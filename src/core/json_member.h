/** Members of JSON values that were made elsewhere and may have any shape. Nothing here throws. */
#ifndef ZYROVFS_CORE_JSON_MEMBER_H
#define ZYROVFS_CORE_JSON_MEMBER_H

#include <json/value.h>

#include <string>

namespace ZYROVFS::json {

/** A member that may be missing, of a value that may be no object: null then. */
inline const Json::Value& MemberOf(const Json::Value& value, const char* key) {
    return value.isObject() ? value[key] : Json::Value::nullSingleton();
}

/** Its text; "" for a member that is no text. */
inline std::string TextOf(const Json::Value& value, const char* key) {
    const Json::Value& member = MemberOf(value, key);
    return member.isString() ? member.asString() : "";
}

}  // namespace ZYROVFS::json

#endif
