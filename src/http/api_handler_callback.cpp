#include <algorithm>
#include <stdexcept>

#include "http/api_handler.h"

namespace ZYROCloud {
namespace {

/** From a write function: libcurl ends the transfer. An empty chunk, for which this would be its
 * size, does not occur. */
constexpr size_t kNotTaken = 0;

}  // namespace

size_t APIHandler::WriteToStrBuf(char* data, size_t size, size_t count, std::string* out) noexcept {
    const size_t length = size * count;
    if (length > kLongestAnswer - std::min(out->size(), kLongestAnswer)) {
        return kNotTaken;
    }
    try {
        out->append(data, length);
    } catch (const std::exception&) {
        return kNotTaken;  // no memory for it
    }
    return length;
}

bool APIHandler::IsRefusal() {
    constexpr long kFirstFailure = 400;
    long status = 0;
    return curl_easy_getinfo(curl_, CURLINFO_RESPONSE_CODE, &status) == CURLE_OK &&
           status >= kFirstFailure;
}

/** As libcurl itself ends a refusal, but with the body at hand. */
CURLcode APIHandler::Refused(CURLcode code) {
    return code == CURLE_OK && keeps_refusal_ && IsRefusal() ? CURLE_HTTP_RETURNED_ERROR : code;
}

/** For libcurl, `handler` is the APIHandler. */
size_t APIHandler::WriteOrKeepRefusal(char* data, size_t size, size_t count,
                                      void* handler) noexcept {
    auto& self = *static_cast<APIHandler*>(handler);
    return self.IsRefusal() ? WriteToStrBuf(data, size, count, &self.response_)
                            : self.sink_.function(data, size, count, self.sink_.data);
}

size_t APIHandler::MutedWriteCallback(void*, size_t size, size_t count, void*) noexcept {
    return size * count;
}

size_t APIHandler::WriteHeaderToJsonValue(char* line, size_t size, size_t count, Json::Value* out) {
    constexpr size_t kLineEnd = 2;
    const std::string whole(line, size * count);
    const size_t colon = whole.find(':');
    if (colon == std::string::npos) {
        return whole.size();
    }
    const std::string text = whole.substr(0, whole.size() - std::min(whole.size(), kLineEnd));
    // What follows the colon is a blank, and nobody asks.
    (*out)[text.substr(0, colon)] = text.substr(colon + 2);
    return whole.size();
}

int APIHandler::WriteToDebugStr(CURL*, curl_infotype type, char* text, size_t size,
                                std::string* out) {
    static constexpr const char* kLabels[] = {"<= Recv header", "=> Send header", "<= Recv data",
                                              "=> Send data"};
    if (type == CURLINFO_TEXT) {
        out->append(text, size);
    } else if (type >= CURLINFO_HEADER_IN && type <= CURLINFO_DATA_OUT) {
        out->append(kLabels[type - CURLINFO_HEADER_IN]);
    } else {
        return 0;
    }
    out->append("\n");
    return 0;
}

}  // namespace ZYROCloud
