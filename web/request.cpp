#include "request.h"

#include <strings.h>

#include <charconv>
#include <cstdlib>
#include <sstream>

#include "body.h"
#include "failure.h"
#include "input.h"

namespace web {
namespace {

constexpr long long kMostJson = 65536;
constexpr size_t kMostQuery = 32768;

std::string Environment(const char* name) {
    const char* value = getenv(name);
    return value == nullptr ? "" : value;
}

int HexDigit(char c) {
    const char* digits = "0123456789abcdef";
    const char lower = static_cast<char>(c >= 'A' && c <= 'F' ? c + ('a' - 'A') : c);
    for (int i = 0; i < 16; ++i) {
        if (digits[i] == lower) {
            return i;
        }
    }
    throw Failure(400, "The address has a broken escape.");
}

std::multimap<std::string, std::string> ReadQuery(const std::string& text) {
    if (text.size() > kMostQuery) {
        throw Failure(414, "The address is too long.");
    }
    std::multimap<std::string, std::string> query;
    std::istringstream parts(text);
    for (std::string part; std::getline(parts, part, '&');) {
        const size_t equals = part.find('=');
        if (equals != std::string::npos) {
            query.emplace(Unescape(part.substr(0, equals)), Unescape(part.substr(equals + 1)));
        }
    }
    return query;
}

long long ReadLength(const std::string& text) {
    long long length = -1;
    if (text.empty()) {
        return length;
    }
    const char* end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, length);
    if (error != std::errc() || stop != end || length < 0) {
        throw Failure(400, "The request has no length that can be.");
    }
    return length;
}

std::string ReadBody(size_t size) {
    std::string body(size, '\0');
    for (size_t at = 0; at < size;) {
        at += ReadInput(&body[at], size - at);
    }
    return body;
}

}  // namespace

std::string Unescape(const std::string& text) {
    std::string plain;
    for (size_t i = 0; i < text.size(); ++i) {
        char c = text[i];
        if (c == '+') {
            c = ' ';
        } else if (c == '%') {
            if (i + 2 >= text.size()) {
                throw Failure(400, "The address has a broken escape.");
            }
            c = static_cast<char>(HexDigit(text[i + 1]) * 16 + HexDigit(text[i + 2]));
            i += 2;
        }
        if (c == '\0') {
            throw Failure(400, "The address has a NUL byte.");
        }
        plain += c;
    }
    return plain;
}

const std::string& Request::Parameter(const std::string& name) const {
    const auto found = query.find(name);
    if (found == query.end()) {
        throw Failure(400, "The request lacks \"" + name + "\".");
    }
    return found->second;
}

std::string Request::Parameter(const std::string& name, const std::string& otherwise) const {
    const auto found = query.find(name);
    return found == query.end() ? otherwise : found->second;
}

std::vector<std::string> Request::Parameters(const std::string& name) const {
    std::vector<std::string> values;
    const auto [begin, end] = query.equal_range(name);
    for (auto value = begin; value != end; ++value) {
        values.push_back(value->second);
    }
    return values;
}

Request ReadRequest() {
    Request request;
    request.method = Environment("REQUEST_METHOD");
    request.path = Environment("PATH_INFO");
    request.content_type = Environment("CONTENT_TYPE");
    request.range = Environment("HTTP_RANGE");
    request.query = ReadQuery(Environment("QUERY_STRING"));
    request.length = ReadLength(Environment("CONTENT_LENGTH"));
    return request;
}

void CheckOrigin() {
    const std::string scheme = Environment("REQUEST_SCHEME");
    const bool secure = scheme == "https" || strcasecmp(Environment("HTTPS").c_str(), "on") == 0;
    const std::string own =
        std::string(secure ? "https" : "http") + "://" + Environment("HTTP_HOST");
    if (Environment("HTTP_HOST").empty() || Environment("HTTP_ORIGIN") != own ||
        Environment("HTTP_X_ZYROVFS_REQUEST") != "1") {
        throw Failure(403, "The request does not come from this page.");
    }
}

Json::Value ReadJson(const Request& request) {
    if (request.length < 0 || request.length > kMostJson) {
        throw Failure(413, "The request is too large.");
    }
    Json::Value value = ParseObject(ReadBody(static_cast<size_t>(request.length)));
    if (value.isNull()) {
        throw Failure(400, "The request is not what this program reads.");
    }
    return value;
}

}  // namespace web
