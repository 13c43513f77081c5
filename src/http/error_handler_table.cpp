#include "http/error_handler_table.h"

namespace ZYROCloud {

using namespace ZYROVFS;

const Verdict* FindVerdict(const StatusTable& table, int status, const DetailOf& detail) {
    std::string text;
    bool asked = false;
    for (const StatusRow* row = table.rows; row != table.rows + table.count; ++row) {
        if (row->status != status) {
            continue;
        }
        if (row->detail != nullptr && !asked && detail != nullptr) {
            text = detail();
            asked = true;
        }
        if (row->detail == nullptr || text == row->detail) {
            return &row->verdict;
        }
    }
    return nullptr;
}

namespace {

constexpr int kFirstServerError = 500;

Verdict Otherwise(int status) {
    return status >= kFirstServerError ? Verdict{kPlatformService, VFS_ERR_SERVER_ERROR}
                                       : Verdict{kPlatformNetwork, VFS_ERR_UNKNOWN};
}

Verdict TokenVerdict(ErrorHandler& handler) {
    return handler.GetErrorCodeFromBadReq() == "invalid_grant"
               ? Verdict{kPlatformNoPermission, VFS_ERR_UNAUTHORIZED}
               : Verdict{kPlatformService, VFS_ERR_TOKEN_REVOKED};
}

}  // namespace

Verdict CloudVerdict(ErrorHandler& handler, const StatusTable& table, int status,
                     const DetailOf& detail) {
    const Verdict* verdict = FindVerdict(table, status, detail);
    if (verdict == nullptr) {
        return Otherwise(status);
    }
    return verdict->code == kTokenRule.code ? TokenVerdict(handler) : *verdict;
}

void Apply(const Verdict& verdict, __tag_vfs_err_* code, SourceLine at) {
    SetPlatformErr(verdict.platform, at);
    if (code != nullptr) {
        *code = verdict.code;
    }
}

bool Succeed(__tag_vfs_err_* code, SourceLine at) {
    Apply({kPlatformNone, VFS_ERR_NONE}, code, at);
    return true;
}

}  // namespace ZYROCloud
