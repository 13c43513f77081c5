// Header lines of any bytes: each is stored as a name and a text, or refused by the one exception
// that the transfer is guarded against.
#include <cstdint>
#include <cstdlib>
#include <stdexcept>
#include <string>

#include "http/api_handler.h"

using ZYROCloud::APIHandler;

namespace {

void Check(bool holds) {
    if (!holds) {
        abort();
    }
}

void Store(std::string line, Json::Value& headers) {
    const bool has_colon = line.find(':') != std::string::npos;
    const auto before = headers.size();
    try {
        Check(APIHandler::WriteHeaderToJsonValue(line.data(), 1, line.size(), &headers) ==
              line.size());
        Check(has_colon ? headers.size() >= 1 : headers.size() == before);
    } catch (const std::out_of_range&) {
        Check(has_colon && headers.size() == before);
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    const std::string text(reinterpret_cast<const char*>(data), size);
    Json::Value headers(Json::objectValue);
    Store(text, headers);
    for (size_t at = 0; at < text.size();) {
        const size_t end = text.find('\n', at);
        const size_t next = end == std::string::npos ? text.size() : end + 1;
        Store(text.substr(at, next - at), headers);
        at = next;
    }
    for (const std::string& name : headers.getMemberNames()) {
        Check(name.find(':') == std::string::npos && headers[name].isString());
    }
    return 0;
}
