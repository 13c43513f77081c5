#include "bridge/gvfs_flow_move.h"

#include <zosplatform/text.h>

#include "zyrovfs/cloud_utils.h"

namespace ZYROCloud::gvfs {

bool HasNameOf(const Json::Value& item, const std::string& path) {
    const std::string name = ZYROVFS::json::TextOf(item, "name");
    const std::string wanted = path.substr(path.rfind('/') + 1);
    // Uploads write quotes in names with a backslash in front of them.
    return YLIBCUnicodeUTF8StrCaseCmp(wanted.c_str(), name.c_str()) == 0 ||
           YLIBCUnicodeUTF8StrCaseCmp(Utils::EscapeDoubleQuote(wanted).c_str(), name.c_str()) == 0;
}

}  // namespace ZYROCloud::gvfs
