/** What a command says: results on standard output, failures on standard error. */
#ifndef ZYROVFS_TOOLS_REPORT_H
#define ZYROVFS_TOOLS_REPORT_H

#include <json/value.h>
#include <zyrovfs/error.h>

#include <string>

namespace tool {

/** Exit statuses of the program. */
enum ExitStatus { kSuccess = 0, kFailure = 1, kBadUsage = 2 };

/** A JSON document in plain ASCII, so that it is harmless on a terminal too. */
void PrintJson(const Json::Value& value);

/** One sentence for people; its texts from elsewhere are to be made printable by the caller. */
void Say(const std::string& sentence);

/**
 * A failed call of the library: what was tried, the code's name, number and meaning, and what the
 * server showed, if the user has to decide about that. With `json` an object with "error" on
 * standard output. Answers kFailure.
 */
int ReportFailure(const std::string& what, bool json);

/** The same for a driver's code. Answers `status`. */
int ReportCode(const std::string& what, ZYROVFS::__tag_vfs_err_ code, int status, bool json);

/** A failure of the tool's own. */
int ReportProblem(const std::string& sentence, bool json);

}  // namespace tool

#endif
