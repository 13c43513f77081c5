/** What the six error handlers share: rows of their tables, and how a row is found. */
#ifndef ZYROVFS_HTTP_ERROR_HANDLER_TABLE_H
#define ZYROVFS_HTTP_ERROR_HANDLER_TABLE_H

#include <json/value.h>

#include <cstddef>
#include <functional>
#include <string>

#include "core/error_cell.h"
#include "core/json_member.h"
#include "http/error_handler.h"

namespace ZYROCloud {

/** Values of the platform error that transfers leave behind. */
enum PlatformCode : unsigned int {
    kPlatformNone = 0,
    kPlatformNoPermission = 0x300,
    kPlatformNotFound = 0x600,
    kPlatformExists = 0x800,
    kPlatformUnreachable = 0x1100,
    kPlatformQuota = 0x2400,
    kPlatformNoSpace = 0x2900,
    kPlatformTimeout = 0x6400,
    kPlatformRemote = 0x6c00,
    kPlatformNetwork = 0x8100,
    kPlatformTooLarge = 0x8200,
    kPlatformConflict = 0xa300,
    kPlatformCancelled = 0xa600,  ///< set by a callback that ends a transfer on a user's wish
    kPlatformBadName = 0xbe00,
    kPlatformNameTooLong = 0xc300,
    kPlatformService = 0xd100,
    kPlatformCommand = 0xd900,
};

struct Verdict {
    PlatformCode platform;
    __tag_vfs_err_ code;
};

/** In a row: the body of a refused token request decides. */
inline constexpr Verdict kTokenRule = {kPlatformNone, ZYROVFS::VFS_ERR_NONE};

struct StatusRow {
    int status;
    const char* detail;  ///< null: whatever the detail
    Verdict verdict;
};

/** The first row that fits counts, so rows with a detail stand before the one without. */
struct StatusTable {
    const StatusRow* rows;
    size_t count;

    template <size_t N>
    constexpr StatusTable(const StatusRow (&table)[N]) : rows(table), count(N) {}
};

/** Gives the detail of a failure; asked only for a status whose rows tell details apart. */
using DetailOf = std::function<std::string()>;

/** Null when no row fits. */
const Verdict* FindVerdict(const StatusTable& table, int status, const DetailOf& detail = nullptr);

/** The verdict on a status of 400 or more that a cloud service gave. */
Verdict CloudVerdict(ErrorHandler& handler, const StatusTable& table, int status,
                     const DetailOf& detail);

/** Leaves a verdict in `*code` and, for the calling line, in the platform error. */
void Apply(const Verdict& verdict, __tag_vfs_err_* code,
           ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

/** For a status that is no failure; always true. */
bool Succeed(__tag_vfs_err_* code, ZYROVFS::SourceLine at = ZYROVFS::SourceLine::Here());

inline constexpr int kFirstHttpFailure = 400;
inline constexpr unsigned int kRetrySleep = 3;
inline constexpr unsigned int kBusySleep = 5;

/** The service asks to be left alone for a while. */
inline bool IsBusy(int code) {
    return code == ZYROVFS::VFS_ERR_RATE_LIMITED || code == ZYROVFS::VFS_ERR_SERVER_ERROR;
}

using ZYROVFS::json::MemberOf;
using ZYROVFS::json::TextOf;

}  // namespace ZYROCloud

#endif
