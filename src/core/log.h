/**
 * System log lines. Every line begins with the name of the source unit and the line number; the
 * macros add them, so that a format stands in the code as an operator finds it in the log. `%m`
 * works as in syslog: errno is still the caller's.
 */
#ifndef ZYROVFS_CORE_LOG_H
#define ZYROVFS_CORE_LOG_H

#include <syslog.h>

#include <zosplatform/error.h>

#include "core/source_line.h"

namespace ZYROVFS {

/** One line at `priority` (facility and level) in the name of `at`. */
void LogWrite(int priority, SourceLine at, const char* format, ...)
    __attribute__((format(printf, 3, 4)));

}  // namespace ZYROVFS

#define LOG_AT(level, at, ...) ::ZYROVFS::LogWrite((level), (at), __VA_ARGS__)

#define LOG_ERROR(...) LOG_AT(LOG_ERR, ::ZYROVFS::SourceLine::Here(), __VA_ARGS__)
#define LOG_ERROR_AT(at, ...) LOG_AT(LOG_ERR, at, __VA_ARGS__)

/** Identity switching reports to the auth facility. */
#define LOG_AUTH_ERROR(at, ...) LOG_AT(LOG_AUTH | LOG_ERR, at, __VA_ARGS__)
#define LOG_AUTH_INFO(at, ...) LOG_AT(LOG_AUTH | LOG_INFO, at, __VA_ARGS__)
#define LOG_AUTH_CRIT(at, ...) LOG_AT(LOG_AUTH | LOG_CRIT, at, __VA_ARGS__)

/** Quotes the platform error: `LOG_ERROR("Nothing read, " ZYROERR_FORMAT, ZYROERR_ARGS)`. */
#define PLATFORM_ERROR_FORMAT "[0x%04X %s:%d]"
#define ZYROERR_FORMAT "zyroerr=" PLATFORM_ERROR_FORMAT
#define ZYROERR_ARGS ::YLIBCErrGet(), ::YLIBCErrorGetFile(), ::YLIBCErrorGetLine()

#endif
