#include "response.h"

#include <json/writer.h>
#include <poll.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdlib>

#include "gzip.h"

namespace web {
namespace {

bool answered = false;

const char* Reason(int status) {
    switch (status) {
        case 200:
            return "OK";
        case 206:
            return "Partial Content";
        case 403:
            return "Forbidden";
        case 404:
            return "Not Found";
        default:
            return status < 400 ? "Done" : "Failed";
    }
}

}  // namespace

bool Write(const char* data, size_t size) {
    answered = true;
    while (size > 0) {
        const ssize_t n = write(STDOUT_FILENO, data, size);
        if (n < 0 && errno != EINTR) {
            return false;
        }
        data += n > 0 ? n : 0;
        size -= n > 0 ? static_cast<size_t>(n) : 0;
    }
    return true;
}

bool HasAnswered() {
    return answered;
}

std::string Head(int status, const std::string& type, const std::string& headers) {
    return "Status: " + std::to_string(status) + " " + Reason(status) +
           "\r\nContent-Type: " + type +
           "\r\nX-Content-Type-Options: nosniff"
           "\r\nContent-Security-Policy: default-src 'none'; frame-ancestors 'none'; sandbox"
           "\r\nReferrer-Policy: no-referrer"
           "\r\nCache-Control: no-store\r\n" +
           headers + "\r\n";
}

void AnswerJson(int status, const Json::Value& value) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    const std::string text = Json::writeString(builder, value) + "\n";
    constexpr size_t kWorthIt = 1024;
    const bool packs = text.size() >= kWorthIt && TakesGzip(getenv("HTTP_ACCEPT_ENCODING"));
    const std::string packed = packs ? Gzip(text) : "";
    Write(Head(status, "application/json; charset=utf-8",
               packed.empty() ? "" : "Content-Encoding: gzip\r\n") +
          (packed.empty() ? text : packed));
}

void AnswerDone() {
    AnswerJson(200, Json::Value(Json::objectValue));
}

void DrainInput() {
    constexpr size_t kMost = 64UL << 20;
    constexpr int kPatience = 2000;  // milliseconds
    std::array<char, 65536> room{};
    pollfd input{STDIN_FILENO, POLLIN, 0};
    for (size_t drained = 0; drained < kMost && poll(&input, 1, kPatience) > 0;) {
        const ssize_t n = read(STDIN_FILENO, room.data(), room.size());
        if (n <= 0) {
            return;
        }
        drained += static_cast<size_t>(n);
    }
}

}  // namespace web
