#include "support/cloudsim/fault.h"

namespace cloudsim {

Fault Fault::On(const std::string& method, const std::string& path) {
    Fault fault;
    fault.method = method;
    fault.path = path;
    return fault;
}

Fault& Fault::AtHost(const std::string& role) {
    host = role;
    return *this;
}

Fault& Fault::After(int count) {
    after = count;
    return *this;
}

Fault& Fault::Times(int count) {
    times = count;
    return *this;
}

Fault& Fault::Answer(int code, const std::string& text, const Headers& lines) {
    without_effect = true;
    status = code;
    body = text;
    headers.insert(headers.end(), lines.begin(), lines.end());
    return *this;
}

Fault& Fault::Body(const std::string& text) {
    body = text;
    return *this;
}

Fault& Fault::Status(int code) {
    status = code;
    return *this;
}

Fault& Fault::Header(const std::string& name, const std::string& value) {
    headers.emplace_back(name, value);
    return *this;
}

Fault& Fault::HeaderLine(const std::string& line) {
    header_lines.push_back(line);
    return *this;
}

Fault& Fault::Raw(const std::string& bytes) {
    without_effect = true;
    raw = bytes;
    return *this;
}

Fault& Fault::Delay(double seconds) {
    delay = seconds;
    return *this;
}

Fault& Fault::Throttle(uint64_t bytes_a_second) {
    answer_rate = bytes_a_second;
    return *this;
}

Fault& Fault::ThrottleUpload(uint64_t bytes_a_second) {
    upload_rate = bytes_a_second;
    return *this;
}

Fault& Fault::Pause(uint64_t body_bytes, double seconds) {
    pause_answer = body_bytes;
    pause = seconds;
    return *this;
}

Fault& Fault::PauseUpload(uint64_t body_bytes, double seconds) {
    pause_upload = body_bytes;
    pause = seconds;
    return *this;
}

Fault& Fault::CutAnswer(uint64_t body_bytes) {
    cut_answer = body_bytes;
    return *this;
}

Fault& Fault::CutUpload(uint64_t body_bytes) {
    cut_upload = body_bytes;
    return *this;
}

Fault& Fault::ShortUpload(uint64_t body_bytes) {
    short_upload = body_bytes;
    return *this;
}

Fault& Fault::Reset() {
    reset = true;
    return *this;
}

Fault& Fault::Close(Break when) {
    close = when;
    return *this;
}

Fault& Fault::CloseAfterAnswer() {
    close_after_answer = true;
    return *this;
}

Fault& Fault::Range(RangeFault kind) {
    range = kind;
    return *this;
}

Fault& Fault::ExpireToken() {
    expire_token = true;
    return *this;
}

}  // namespace cloudsim
