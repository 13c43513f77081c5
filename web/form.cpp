#include "form.h"

#include <strings.h>

#include <algorithm>

#include "failure.h"
#include "input.h"

namespace web {
namespace {

constexpr size_t kMostHeaders = 16384;
constexpr size_t kLongestBoundary = 70;

/** One byte at a time: what is read too much is lost to the relay. */
char ReadByte() {
    char c = 0;
    ReadInput(&c, 1);
    return c;
}

bool EndsWith(const std::string& text, const std::string& end) {
    return text.size() >= end.size() &&
           text.compare(text.size() - end.size(), end.size(), end) == 0;
}

}  // namespace

std::string BoundaryOf(const std::string& content_type) {
    constexpr const char* kForm = "multipart/form-data";
    constexpr const char* kKey = "boundary=";
    const size_t at = content_type.find(kKey);
    if (strncasecmp(content_type.c_str(), kForm, std::string(kForm).size()) != 0 ||
        at == std::string::npos) {
        throw Failure(400, "The request is no form with a file.");
    }
    std::string boundary = content_type.substr(at + std::string(kKey).size());
    const bool quoted = !boundary.empty() && boundary[0] == '"';
    boundary = quoted ? boundary.substr(1, boundary.find('"', 1) - 1)
                      : boundary.substr(0, boundary.find_first_of("; \t"));
    if (boundary.empty() || boundary.size() > kLongestBoundary) {
        throw Failure(400, "The request has no boundary that can be.");
    }
    return boundary;
}

Form ReadForm(const std::string& content_type) {
    Form form;
    form.boundary = "--" + BoundaryOf(content_type);
    const std::string first = form.boundary + "\r\n";
    std::string head;
    while (!EndsWith(head, "\r\n\r\n")) {
        if (head.size() == kMostHeaders) {
            throw Failure(413, "The form's headers are too long.");
        }
        head += ReadByte();
        const size_t known = std::min(head.size(), first.size());
        if (head.compare(0, known, first, 0, known) != 0) {
            throw Failure(400, "The request is no form with a file.");
        }
    }
    form.read = head.size();
    return form;
}

}  // namespace web
