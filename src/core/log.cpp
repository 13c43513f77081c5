#include "core/log.h"

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>

namespace ZYROVFS {

void LogWrite(int priority, SourceLine at, const char* format, ...) {
    const int saved = errno;
    char* text = nullptr;
    va_list args;
    va_start(args, format);
    const int length = vasprintf(&text, format, args);
    va_end(args);
    if (length >= 0) {
        syslog(priority, "%s:%d %s", at.file, at.line, text);
        std::free(text);
    }
    errno = saved;
}

}  // namespace ZYROVFS
