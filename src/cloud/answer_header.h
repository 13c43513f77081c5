/** Headers of a service's answer. */
#ifndef ZYROVFS_CLOUD_ANSWER_HEADER_H
#define ZYROVFS_CLOUD_ANSWER_HEADER_H

#include <string>

#include "http/api_handler.h"

namespace ZYROCloud {

/** Text of a header of the last answer, "" when it has none. The case of the name does not matter:
 * what stands between here and the service may change it. */
std::string AnswerHeader(const APIHandler& api, const char* name);

}  // namespace ZYROCloud

#endif
