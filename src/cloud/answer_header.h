/** Status and headers of a service's answer. */
#ifndef ZYROVFS_CLOUD_ANSWER_HEADER_H
#define ZYROVFS_CLOUD_ANSWER_HEADER_H

#include <string>

#include "http/api_handler.h"

namespace ZYROCloud {

/** Text of a header of the last answer, "" when it has none; what a redirection before it said does
 * not count. The case of the name does not matter: what stands between here and the service may
 * change it. */
std::string AnswerHeader(APIHandler& api, const char* name);

/** HTTP status of the last request, 0 for none. */
int AnswerStatus(const APIHandler& api);

/** Whether an upload was taken: a status below 400 is no failure to the handler, but a file is
 * stored with 2xx alone. */
bool IsStored(const APIHandler& api);

}  // namespace ZYROCloud

#endif
