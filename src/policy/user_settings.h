/**
 * Reading a policy that anybody may have damaged: a member of the wrong type counts as one that is
 * not there, and a setting that is no truth value as not enabled. Nothing here throws.
 */
#ifndef ZYROVFS_POLICY_USER_SETTINGS_H
#define ZYROVFS_POLICY_USER_SETTINGS_H

#include <json/value.h>

#include <string>

namespace ZYROVFS::Cfg {

inline constexpr const char* kType = "user_enabled_type";
inline constexpr const char* kEnabled = "enabled";

inline constexpr const char* kAll = "all";
inline constexpr const char* kAdmin = "admin";
inline constexpr const char* kCustom = "custom";

/** Null for what is no object and for a member that is missing. */
inline const Json::Value& Member(const Json::Value& object, const std::string& key) {
    return object.isObject() ? object[key] : Json::Value::nullSingleton();
}

inline bool IsTruth(const Json::Value& value) {
    return value.isConvertibleTo(Json::booleanValue) && value.asBool();
}

inline bool IsEnabled(const Json::Value& entry) {
    return IsTruth(Member(entry, kEnabled));
}

/** Empty for what cannot be read as text. */
inline std::string Text(const Json::Value& value) {
    return value.isConvertibleTo(Json::stringValue) ? value.asString() : std::string();
}

/** `object[key]` as an object, made one if it is anything else. */
inline Json::Value& ObjectMember(Json::Value& object, const std::string& key) {
    if (!object.isObject()) {
        object = Json::Value(Json::objectValue);
    }
    Json::Value& member = object[key];
    if (!member.isObject()) {
        member = Json::Value(Json::objectValue);
    }
    return member;
}

}  // namespace ZYROVFS::Cfg

#endif
