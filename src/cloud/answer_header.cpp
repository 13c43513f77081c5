#include "cloud/answer_header.h"

#include <strings.h>

namespace ZYROCloud {

std::string AnswerHeader(const APIHandler& api, const char* name) {
    const Json::Value headers = api.GetHeaderResponse();
    for (auto header = headers.begin(); header != headers.end(); ++header) {
        if (strcasecmp(header.name().c_str(), name) == 0) {
            return header->asString();
        }
    }
    return "";
}

}  // namespace ZYROCloud
