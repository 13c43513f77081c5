#include "server/config_compare.h"

#include <zosplatform/text.h>

#include <cstring>

namespace ZYROVFS::Server {
namespace {

using Info = _tag_VFS_CONFIG_INFO_;

struct Row {
    const char* key;
    std::string Info::*field;
};

constexpr Row kFields[] = {
    {"port", nullptr},       {"protocol", &Info::protocol}, {"hostname", &Info::hostname},
    {"alias", &Info::alias}, {"account", &Info::account},   {"codepage", &Info::codepage},
    {"uri", &Info::uri},
};

}  // namespace

ConfigCompare::ConfigCompare(const char* key) : field_(&Info::protocol) {
    for (const Row& row : kFields) {
        if (std::strcmp(key, row.key) == 0) {
            field_ = row.field;
        }
    }
}

bool ConfigCompare::operator()(const Info& a, const Info& b) const {
    if (field_ == nullptr) {
        return a.port < b.port;
    }
    return YLIBCUnicodeUTF8StrCaseCmp((a.*field_).c_str(), (b.*field_).c_str()) < 0;
}

}  // namespace ZYROVFS::Server
