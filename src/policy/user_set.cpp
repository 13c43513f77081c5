#include <zosplatform/file.h>

#include "core/identity.h"
#include "core/no_throw.h"
#include "core/paths.h"
#include "policy/user_settings.h"
#include "zyrovfs/cfg.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS::Cfg {
namespace {

/** What a change of the type brings with it; what is not listed brings nothing. */
struct TypeChange {
    const char* from;
    const char* to;
    bool apply_settings;
    enum { kNobody, kNonAdmins, kDisabled } shut_out;
};

constexpr TypeChange kTypeChanges[] = {
    {kAll, kAdmin, false, TypeChange::kNonAdmins},
    {kCustom, kAdmin, false, TypeChange::kNonAdmins},
    {kAdmin, kCustom, true, TypeChange::kNobody},
    {kAll, kCustom, true, TypeChange::kDisabled},
};

const TypeChange* FindChange(const std::string& from, const std::string& to) {
    for (const TypeChange& change : kTypeChanges) {
        if (from == change.from && to == change.to) {
            return &change;
        }
    }
    return nullptr;
}

bool IsSetting(const Json::Value& element, const char* id) {
    if (!element.isObject()) {
        return false;
    }
    const Json::Value& number = Member(element, id);
    const Json::Value& enabled = Member(element, kEnabled);
    // Null converts to anything: a setting that was left out would count as a no, and shut out.
    return !number.isNull() && number.isConvertibleTo(Json::stringValue) && !enabled.isNull() &&
           enabled.isConvertibleTo(Json::booleanValue);
}

/** Takes over all elements, or none when one of them is no setting. */
bool Apply(const Json::Value& elements, const char* id, const char* key, Json::Value& value) {
    if (!elements.isArray() && !elements.isNull()) {
        LOG_ERROR("Bad parameter: %s should be an array", key);
        return Fail(VFS_ERR_BAD_PARAM);
    }
    for (const Json::Value& element : elements) {
        if (!IsSetting(element, id)) {
            LOG_ERROR("Bad parameter: element of %s is no setting", key);
            return Fail(VFS_ERR_BAD_PARAM);
        }
    }
    Json::Value& settings = ObjectMember(value, key);
    for (const Json::Value& element : elements) {
        ObjectMember(settings, element[id].asString())[kEnabled] = element[kEnabled].asBool();
    }
    return true;
}

}  // namespace

bool VFSUser::ApplyConf(const Json::Value& conf) {
    return NoThrow(VFS_ERR_BAD_PARAM, [&] {
        return Apply(Member(conf, settings_.key), "uid", settings_.key, value_);
    });
}

bool VFSGroup::ApplyConf(const Json::Value& conf) {
    return NoThrow(VFS_ERR_BAD_PARAM, [&] {
        return Apply(Member(conf, settings_.key), "gid", settings_.key, value_);
    });
}

/** The folder that the destructor will write to; then the change counts. */
bool VFSEntityCfg::KeepChange() {
    if (!YLIBCFileCheckDir(paths::kConfigRoot) &&
        Utils::MkdirP(paths::kConfigRoot, nullptr, true, -1, -1, -1) != 0) {
        LOG_ERROR("Failed to mkdir %s, %m", paths::kConfigRoot);
        return Fail(VFS_ERR_CONFIG_WRITE);
    }
    dirty_ = true;
    return true;
}

/**
 * Settings that come with the type that is in force already stay unapplied, as they do with the
 * very first type of a machine: callers that mean the settings leave the type out.
 */
bool VFSEntityCfg::ChangeType(const Json::Value& conf) {
    const std::string type = conf[kType].asString();
    const std::string old = Text(Member(value_, kType));
    if (type != kAll && type != kAdmin && type != kCustom) {
        LOG_ERROR("Bad parameter: Unknown enabled user type: %s", type.c_str());
        return Fail(VFS_ERR_BAD_PARAM);
    }
    value_[kType] = type;
    const TypeChange* change = FindChange(old, type);
    if (change == nullptr) {
        return true;
    }
    if (change->apply_settings && !ApplyConf(conf)) {
        return false;
    }
    if (change->shut_out == TypeChange::kDisabled) {
        DisConnDisabledConf();
    }
    return change->shut_out != TypeChange::kNonAdmins || FilterNonAdminEntities();
}

bool VFSEntityCfg::Set(Json::Value& conf) {
    bool done = false;
    ENTERCriticalSection;
    done = NoThrow(VFS_ERR_BAD_PARAM, [&] {
        if (!conf.isObject()) {
            LOG_ERROR("Bad parameter: conf should be an object");
            return Fail(VFS_ERR_BAD_PARAM);
        }
        const Json::Value before = value_;
        const bool type_given = conf.isMember(kType);
        const bool changed = type_given ? ChangeType(conf) : ApplyConf(conf);
        if (changed && !type_given) {
            DisConnDisabledConf();
        }
        if (!changed || !KeepChange()) {
            value_ = before;
            return false;
        }
        return true;
    });
    LEAVECriticalSection;
    return done;
}

bool VFSEntityCfg::Delete(Json::Value& ids) {
    return NoThrow(VFS_ERR_BAD_PARAM, [&] {
        if (!ids.isArray()) {
            LOG_ERROR("Bad parameter: jsonUsers should be an array");
            return Fail(VFS_ERR_BAD_PARAM);
        }
        if (!value_.isMember(settings_.key)) {
            return true;
        }
        Json::Value& settings = ObjectMember(value_, settings_.key);
        for (const Json::Value& id : ids) {
            if (!id.isConvertibleTo(Json::stringValue)) {
                LOG_ERROR("Bad parameter: jsonUser's element should be convertible to string");
                return Fail(VFS_ERR_BAD_PARAM);
            }
            settings.removeMember(id.asString());
        }
        return KeepChange();
    });
}

}  // namespace ZYROVFS::Cfg
