#include "support/cloudsim/multipart.h"

#include <algorithm>

#include "support/cloudsim/http.h"

namespace cloudsim {
namespace {

constexpr size_t kHeadersLimit = 64 * 1024;

/** Value of `name="..."` or `name=...` in a header. */
bool Parameter(const std::string& header, const std::string& name, std::string& value) {
    size_t at = 0;
    while ((at = header.find(';', at)) != std::string::npos) {
        at = header.find_first_not_of("; \t", at);
        if (at == std::string::npos) {
            return false;
        }
        if (!SameText(header.substr(at, name.size() + 1), name + "=")) {
            continue;
        }
        at += name.size() + 1;
        const bool quoted = at < header.size() && header[at] == '"';
        const size_t end = header.find(quoted ? '"' : ';', at + (quoted ? 1 : 0));
        at += quoted ? 1 : 0;
        value = header.substr(at, end == std::string::npos ? end : end - at);
        return true;
    }
    return false;
}

}  // namespace

Multipart::Multipart(const std::string& content_type, std::function<void(const Part&)> begin,
                     OnData data, const std::string& kind)
    : begin_(std::move(begin)), data_(std::move(data)) {
    std::string boundary;
    if (!SameText(content_type.substr(0, kind.size()), kind) ||
        !Parameter(content_type, "boundary", boundary) || boundary.empty()) {
        state_ = State::kBroken;
    }
    boundary_ = "\r\n--" + boundary;
    buffer_ = "\r\n";  // so that the first boundary looks like the others
}

void Multipart::Feed(const char* data, size_t size) {
    if (state_ != State::kEnd && state_ != State::kBroken) {
        buffer_.append(data, size);
        while (Step()) {
        }
    }
}

bool Multipart::Step() {
    switch (state_) {
        case State::kPreamble:
        case State::kBody:
            return StepBody();
        case State::kBoundary:
            return StepBoundary();
        case State::kHeaders:
            return StepHeaders();
        default:
            return false;
    }
}

bool Multipart::StepBoundary() {
    if (buffer_.size() < 2) {
        return false;
    }
    const std::string after = buffer_.substr(0, 2);
    state_ = after == "--" ? State::kEnd : after == "\r\n" ? State::kHeaders : State::kBroken;
    // A part without headers begins with an empty line, so this line break stays.
    return state_ == State::kHeaders;
}

bool Multipart::StepHeaders() {
    const size_t end = buffer_.find("\r\n\r\n");
    if (end == std::string::npos) {
        state_ = buffer_.size() > kHeadersLimit ? State::kBroken : state_;
        return false;
    }
    part_ = {};
    size_t start = 0;
    while (start < end) {
        const size_t next = std::min(buffer_.find("\r\n", start + 2), end);
        const std::string line = buffer_.substr(start + 2, next - start - 2);
        if (SameText(line.substr(0, 20), "Content-Disposition:")) {
            Parameter(line, "name", part_.name);
            part_.file = Parameter(line, "filename", part_.file_name);
        } else if (SameText(line.substr(0, 13), "Content-Type:")) {
            part_.type = line.substr(std::min(line.find_first_not_of(" \t", 13), line.size()));
        }
        start = next;
    }
    buffer_.erase(0, end + 4);
    begin_(part_);
    state_ = State::kBody;
    return true;
}

bool Multipart::StepBody() {
    const size_t found = buffer_.find(boundary_);
    const size_t keep = boundary_.size() - 1;
    const size_t ready =
        found != std::string::npos ? found : buffer_.size() - std::min(buffer_.size(), keep);
    if (state_ == State::kBody && ready > 0) {
        data_(part_, buffer_.data(), ready);
    }
    if (found == std::string::npos) {
        buffer_.erase(0, ready);
        return false;
    }
    buffer_.erase(0, found + boundary_.size());
    state_ = State::kBoundary;
    return true;
}

}  // namespace cloudsim
