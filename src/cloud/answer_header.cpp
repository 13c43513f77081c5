#include "cloud/answer_header.h"

#include <strings.h>

#include "http/error_handler_table.h"

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

int AnswerStatus(const APIHandler& api) {
    const Json::Value error = api.GetError();
    const Json::Value& status = MemberOf(error, "response_code");
    return status.isInt() ? status.asInt() : 0;
}

bool IsStored(const APIHandler& api) {
    return AnswerStatus(api) / 100 == 2;
}

}  // namespace ZYROCloud
