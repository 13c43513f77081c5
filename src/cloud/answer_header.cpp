#include "cloud/answer_header.h"

#include <curl/curl.h>
#include <strings.h>

#include <algorithm>
#include <vector>

#include "http/error_handler_table.h"

namespace ZYROCloud {

std::string AnswerHeader(APIHandler& api, const char* name) {
    const std::vector<std::string> names = api.GetHeaderResponse().getMemberNames();
    const bool given = std::any_of(names.begin(), names.end(), [name](const std::string& other) {
        return strcasecmp(other.c_str(), name) == 0;
    });
    // The handler keeps what all answers of a request said; libcurl knows them apart, but not that
    // the handler has forgotten them.
    curl_header* header = nullptr;
    if (!given ||
        curl_easy_header(api.GetCurlHandler(), name, 0, CURLH_HEADER, -1, &header) != CURLHE_OK) {
        return "";
    }
    const std::string text = header->value;
    return text.substr(0, text.find('\r'));  // libcurl leaves it behind an empty value
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
