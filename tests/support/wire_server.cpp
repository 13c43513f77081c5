#include "support/wire_server.h"

#include <netinet/in.h>
#include <poll.h>
#include <strings.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>

namespace wire {
namespace {

int Listen(int& port) {
    const int fd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t size = sizeof address;
    if (fd < 0 || bind(fd, reinterpret_cast<sockaddr*>(&address), size) != 0 ||
        listen(fd, 16) != 0 || getsockname(fd, reinterpret_cast<sockaddr*>(&address), &size) != 0) {
        perror("wire server");
        abort();
    }
    port = ntohs(address.sin_port);
    return fd;
}

bool More(int fd, std::string& buffer) {
    char piece[65536];
    const ssize_t n = recv(fd, piece, sizeof piece, 0);
    if (n <= 0) {
        return false;
    }
    buffer.append(piece, static_cast<size_t>(n));
    return true;
}

bool SendAll(int fd, const char* data, size_t size) {
    while (size > 0) {
        const ssize_t n = send(fd, data, size, MSG_NOSIGNAL);
        if (n <= 0) {
            return false;
        }
        data += n;
        size -= static_cast<size_t>(n);
    }
    return true;
}

bool SendText(int fd, const std::string& text) {
    return SendAll(fd, text.data(), text.size());
}

/** Cuts `size` bytes, or up to the end of `mark`, off the front; reads what is missing. */
bool Take(int fd, std::string& buffer, size_t size, std::string& taken) {
    while (buffer.size() < size) {
        if (!More(fd, buffer)) {
            return false;
        }
    }
    taken += buffer.substr(0, size);
    buffer.erase(0, size);
    return true;
}

bool TakeUntil(int fd, std::string& buffer, const std::string& mark, std::string& taken) {
    size_t at = 0;
    while ((at = buffer.find(mark)) == std::string::npos) {
        if (!More(fd, buffer)) {
            return false;
        }
    }
    return Take(fd, buffer, at + mark.size(), taken);
}

/** Value of a header line of a request, "" when there is none. */
std::string HeaderOf(const std::string& head, const std::string& name) {
    for (size_t at = head.find("\r\n"); at != std::string::npos; at = head.find("\r\n", at + 2)) {
        const char* line = head.c_str() + at + 2;
        if (strncasecmp(line, name.c_str(), name.size()) == 0 && line[name.size()] == ':') {
            const std::string rest = line + name.size() + 1;
            const size_t begin = std::min(rest.find_first_not_of(' '), rest.size());
            return rest.substr(begin, rest.find("\r\n") - begin);
        }
    }
    return "";
}

bool TakeChunked(int fd, std::string& buffer, std::string& taken) {
    size_t size = 0;
    do {
        std::string line;
        if (!TakeUntil(fd, buffer, "\r\n", line)) {
            return false;
        }
        size = strtoul(line.c_str(), nullptr, 16);
        taken += line;
    } while (Take(fd, buffer, size + strlen("\r\n"), taken) && size > 0);
    return size == 0;
}

bool TakeRequest(int fd, std::string& buffer, std::string& taken) {
    if (!TakeUntil(fd, buffer, "\r\n\r\n", taken)) {
        return false;
    }
    const std::string head = taken;
    if (!HeaderOf(head, "Expect").empty() && !SendText(fd, "HTTP/1.1 100 Continue\r\n\r\n")) {
        return false;
    }
    if (HeaderOf(head, "Transfer-Encoding") == "chunked") {
        return TakeChunked(fd, buffer, taken);
    }
    return Take(fd, buffer, strtoul(HeaderOf(head, "Content-Length").c_str(), nullptr, 10), taken);
}

bool SendSlowly(int fd, const Step& step) {
    for (size_t at = 0; at < step.bytes.size(); at += step.number) {
        poll(nullptr, 0, step.milliseconds);
        if (!SendAll(fd, step.bytes.data() + at, std::min(step.number, step.bytes.size() - at))) {
            return false;
        }
    }
    return true;
}

}  // namespace

Step ReadRequest() {
    return {Step::kReadRequest, "", 0, 0};
}
Step ReadHead() {
    return {Step::kReadHead, "", 0, 0};
}
Step ReadLine() {
    return {Step::kReadLine, "", 0, 0};
}
Step ReadBytes(size_t number) {
    return {Step::kReadBytes, "", number, 0};
}
Step ReadAll() {
    return {Step::kReadAll, "", 0, 0};
}
Step Send(const std::string& bytes) {
    return {Step::kSend, bytes, 0, 0};
}
Step Drip(const std::string& bytes, size_t piece, int milliseconds) {
    return {Step::kDrip, bytes, piece, milliseconds};
}
Step Stall() {
    return {Step::kStall, "", 0, 0};
}
Step Reset() {
    return {Step::kReset, "", 0, 0};
}

std::string Answer(int status, const std::string& body, const std::string& headers) {
    return "HTTP/1.1 " + std::to_string(status) + " Told\r\n" + headers +
           "Content-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body;
}

WireServer::WireServer(std::vector<Script> scripts)
    : scripts_(std::move(scripts)),
      listener_(Listen(port_)),
      acceptor_(&WireServer::Accept, this) {}

WireServer::~WireServer() {
    shutdown(listener_, SHUT_RDWR);
    acceptor_.join();
    {
        const std::lock_guard<std::mutex> lock(mutex_);
        for (const int fd : open_) {
            shutdown(fd, SHUT_RDWR);
        }
    }
    for (std::thread& conversation : conversations_) {
        conversation.join();
    }
    close(listener_);
}

void WireServer::Accept() {
    for (;;) {
        const int fd = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
        if (fd < 0) {
            return;
        }
        const std::lock_guard<std::mutex> lock(mutex_);
        const size_t number = connections_++;
        if (number >= scripts_.size()) {
            close(fd);
            continue;
        }
        open_.push_back(fd);
        conversations_.emplace_back(&WireServer::Converse, this, fd, number);
    }
}

void WireServer::Converse(int fd, size_t number) {
    std::string buffer;
    const Script& script = scripts_[number];
    const bool done = std::all_of(script.begin(), script.end(),
                                  [&](const Step& step) { return Carry(fd, step, buffer); });
    {
        const std::lock_guard<std::mutex> lock(mutex_);
        finished_ += done ? 1 : 0;
        changed_.notify_all();
    }
    if (script.empty() || script.back().kind != Step::kReset) {
        // Bytes that nobody read would turn the close into a reset.
        shutdown(fd, SHUT_WR);
        while (More(fd, buffer)) {
        }
    }
    const std::lock_guard<std::mutex> lock(mutex_);
    open_.erase(std::find(open_.begin(), open_.end(), fd));
    close(fd);
}

bool WireServer::Carry(int fd, const Step& step, std::string& buffer) {
    std::string taken;
    switch (step.kind) {
        case Step::kSend:
            return SendText(fd, step.bytes);
        case Step::kDrip:
            return SendSlowly(fd, step);
        case Step::kStall:
            while (More(fd, buffer)) {
            }
            return true;
        case Step::kReset: {
            const linger at_once = {1, 0};
            return setsockopt(fd, SOL_SOCKET, SO_LINGER, &at_once, sizeof at_once) == 0;
        }
        case Step::kReadAll:
            while (More(fd, buffer)) {
            }
            Keep(buffer);
            return true;
        case Step::kReadBytes:
        case Step::kReadLine:
        case Step::kReadHead:
        case Step::kReadRequest: {
            const bool read = step.kind == Step::kReadBytes  ? Take(fd, buffer, step.number, taken)
                              : step.kind == Step::kReadLine ? TakeUntil(fd, buffer, "\n", taken)
                              : step.kind == Step::kReadHead
                                  ? TakeUntil(fd, buffer, "\r\n\r\n", taken)
                                  : TakeRequest(fd, buffer, taken);
            Keep(taken);
            return read;
        }
    }
    return false;
}

void WireServer::Keep(const std::string& bytes) {
    const std::lock_guard<std::mutex> lock(mutex_);
    received_.push_back(bytes);
    changed_.notify_all();
}

std::string WireServer::Url(const std::string& path, const std::string& scheme) const {
    return scheme + "://127.0.0.1:" + std::to_string(port_) + path;
}

std::vector<std::string> WireServer::Received() const {
    const std::lock_guard<std::mutex> lock(mutex_);
    return received_;
}

std::string WireServer::ReceivedText() const {
    std::string text;
    for (const std::string& piece : Received()) {
        text += piece;
    }
    return text;
}

size_t WireServer::Connections() const {
    const std::lock_guard<std::mutex> lock(mutex_);
    return connections_;
}

bool WireServer::Finished() const {
    std::unique_lock<std::mutex> lock(mutex_);
    return changed_.wait_for(lock, std::chrono::seconds(5),
                             [this] { return finished_ == scripts_.size(); });
}

}  // namespace wire
