/** How the library's own units set the error cell: with their name and line. */
#ifndef ZYROVFS_CORE_ERROR_CELL_H
#define ZYROVFS_CORE_ERROR_CELL_H

#include <zosplatform/error.h>

#include "core/source_line.h"
#include "zyrovfs/error.h"

namespace ZYROVFS {

/** Sets the cell for the calling line, or for the place that a shared helper was given. */
inline void SetErr(__tag_vfs_err_ code, SourceLine at = SourceLine::Here()) {
    VFSSetErrEx(code, at.file, at.line);
}

/** SetErr for the common `return Fail(code)`. */
inline bool Fail(__tag_vfs_err_ code, SourceLine at = SourceLine::Here()) {
    SetErr(code, at);
    return false;
}

/** Sets the platform's cell for the calling line. */
inline void SetPlatformErr(unsigned int code, SourceLine at = SourceLine::Here()) {
    YLIBCErrSetEx(code, at.file, at.line);
}

/** Puts code and place of the cell back at the end of a scope, for what leaves no failure there. */
class ErrorCellKept {
  public:
    ErrorCellKept() = default;
    ErrorCellKept(const ErrorCellKept&) = delete;
    ErrorCellKept& operator=(const ErrorCellKept&) = delete;
    ~ErrorCellKept() {
        if (armed_) {
            VFSSetErrEx(code_, file_, line_);
        }
    }
    /** What the scope has set stays. */
    void Dismiss() { armed_ = false; }

  private:
    const __tag_vfs_err_ code_ = GetError();
    const char* const file_ = GetErrorFile();
    const int line_ = GetErrorLine();
    bool armed_ = true;
};

}  // namespace ZYROVFS

#endif
