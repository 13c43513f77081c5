#include "cloud/conflict.h"

#include <zosplatform/text.h>

#include "core/json_member.h"
#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud {

using ZYROVFS::json::TextOf;

namespace {

/** In front of the owner that a path shows behind the name of a namesake. */
constexpr const char* kOwnerMark = " - ";

bool AreEqual(const std::string& a, const std::string& b) {
    return YLIBCUnicodeUTF8StrCaseCmp(a.c_str(), b.c_str()) == 0;
}

}  // namespace

std::string NameAtEnd(const std::string& path) {
    return path.substr(path.rfind('/') + 1);
}

bool IsNamed(const Json::Value& item, const std::string& name) {
    const std::string own = TextOf(item, "name");
    return AreEqual(name, own) || AreEqual(Utils::EscapeDoubleQuote(name), own);
}

bool HasNameOf(Cloud& cloud, const Json::Value& item, const std::string& source,
               const std::string& shown) {
    if (shown.find(kOwnerMark) == std::string::npos) {
        return IsNamed(item, shown);
    }
    Json::Value info;
    return cloud.GetFileInfo(source, Json::Value(Json::objectValue), info) &&
           !TextOf(info, "name").empty() && AreEqual(TextOf(info, "name"), TextOf(item, "name"));
}

}  // namespace ZYROCloud
