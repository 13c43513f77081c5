/** Addresses in log lines: those that services hand out often are all that is needed to use them.
 */
#ifndef ZYROVFS_CORE_LOGGABLE_URL_H
#define ZYROVFS_CORE_LOGGABLE_URL_H

#include <string>

namespace ZYROVFS {

/**
 * A URL without user, password, query and fragment, and with "***" in place of each part of its
 * path that is long and opaque, as the keys are that stand in pre-authorised addresses. A path of a
 * file, which begins with a slash, stays as it is.
 */
std::string LoggableUrl(const std::string& url);

}  // namespace ZYROVFS

#endif
