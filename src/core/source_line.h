/** A place in the source, so that a shared helper can report for its caller. */
#ifndef ZYROVFS_CORE_SOURCE_LINE_H
#define ZYROVFS_CORE_SOURCE_LINE_H

namespace ZYROVFS {

struct SourceLine {
    const char* file;  ///< name of the source unit without directories, a literal
    int line;

    /** As a default argument: the place of the call. */
    static constexpr SourceLine Here(const char* file = __builtin_FILE(),
                                     int line = __builtin_LINE()) {
        const char* name = file;
        for (const char* p = file; *p != '\0'; ++p) {
            if (*p == '/') {
                name = p + 1;
            }
        }
        return {name, line};
    }
};

}  // namespace ZYROVFS

#endif
