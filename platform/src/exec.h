/** Running a program to its end. */
#ifndef ZOSPLATFORM_SRC_EXEC_H
#define ZOSPLATFORM_SRC_EXEC_H

namespace zos {

/** What a program may still write to: its standard error, or nothing. */
enum class Output { kErrors, kNone };

/** As YLIBCExecv. */
int Run(const char* path, const char* const argv[], Output output);

}  // namespace zos

#endif
