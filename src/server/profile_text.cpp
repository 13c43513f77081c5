#include "server/profile_text.h"

#include <glib.h>

#include <cstring>

#include "core/log.h"

namespace ZYROVFS::Server {
namespace {

/** Why a value is refused, null when it is fine. */
const char* WhyNotText(const Json::Value& value, const TextRule& rule) {
    const char* begin = nullptr;
    const char* end = nullptr;
    if (!value.isString() || !value.getString(&begin, &end)) {
        return "not a text";
    }
    const auto size = static_cast<size_t>(end - begin);
    if (size > rule.longest) {
        return "too long";
    }
    if (size > 0 && memchr(begin, '\0', size) != nullptr) {
        return "a NUL in it";
    }
    if (rule.utf8 && !g_utf8_validate(begin, static_cast<gssize>(size), nullptr)) {
        return "not UTF-8";
    }
    return nullptr;
}

}  // namespace

bool IsProfileText(const char* key, const Json::Value& value, const TextRule& rule, SourceLine at) {
    const char* why = WhyNotText(value, rule);
    if (why != nullptr) {
        LOG_ERROR_AT(at, "Wrong value of %s in the profile, %s", key, why);
    }
    return why == nullptr;
}

bool IsOptionalText(const char* key, const Json::Value& value, const TextRule& rule,
                    SourceLine at) {
    return value.isNull() || IsProfileText(key, value, rule, at);
}

bool IsProfileNumber(const char* key, const Json::Value& value, SourceLine at) {
    if (!value.isUInt()) {
        LOG_ERROR_AT(at, "Wrong value of %s in the profile, not a number", key);
        return false;
    }
    return true;
}

bool IsOptionalNumber(const char* key, const Json::Value& value, SourceLine at) {
    return value.isNull() || IsProfileNumber(key, value, at);
}

}  // namespace ZYROVFS::Server
