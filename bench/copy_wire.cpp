// A server on loopback whose two links have a fixed rate, and which keeps nothing:
//   bench_copy_wire PORT BYTES_PER_SECOND
// GET /SIZE answers with that many bytes, PUT takes what comes. A rate of 0 is as fast as it goes.
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <thread>
#include <vector>

namespace {

using Clock = std::chrono::steady_clock;

constexpr size_t kPiece = 128 * 1024;

/** Lets bytes through at a rate, as a link does: in even pieces, and nothing saved up. */
class Link {
  public:
    explicit Link(double rate) : rate_(rate), free_(Clock::now()) {}

    void Pass(size_t size) {
        if (rate_ > 0) {
            const std::chrono::duration<double> time(static_cast<double>(size) / rate_);
            // A sleep that lasted too long is made up for; a side that had nothing to send is not.
            free_ = std::max(free_, Clock::now() - std::chrono::milliseconds(20)) +
                    std::chrono::duration_cast<Clock::duration>(time);
            std::this_thread::sleep_until(free_);
        }
    }

  private:
    double rate_;
    Clock::time_point free_;
};

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

bool Serve(int fd, unsigned long long size, double rate) {
    const std::vector<char> piece(kPiece, 'x');
    Link link(rate);
    if (!SendText(fd, "HTTP/1.1 200 OK\r\nContent-Length: " + std::to_string(size) + "\r\n\r\n")) {
        return false;
    }
    for (unsigned long long left = size; left > 0;) {
        const size_t n = static_cast<size_t>(std::min<unsigned long long>(left, kPiece));
        link.Pass(n);
        if (!SendAll(fd, piece.data(), n)) {
            return false;
        }
        left -= n;
    }
    return true;
}

bool Swallow(int fd, unsigned long long size, double rate) {
    std::vector<char> piece(kPiece);
    Link link(rate);
    for (unsigned long long left = size; left > 0;) {
        const ssize_t n = recv(fd, piece.data(), std::min<unsigned long long>(left, kPiece), 0);
        if (n <= 0) {
            return false;
        }
        link.Pass(static_cast<size_t>(n));
        left -= static_cast<unsigned long long>(n);
    }
    return SendText(fd, "HTTP/1.1 201 Created\r\nContent-Length: 0\r\n\r\n");
}

/** Up to the empty line. */
bool ReadHead(int fd, std::string& head) {
    char byte = 0;
    head.clear();
    while (recv(fd, &byte, 1, 0) == 1) {
        head += byte;
        if (head.size() >= 4 && head.compare(head.size() - 4, 4, "\r\n\r\n") == 0) {
            return true;
        }
    }
    return false;
}

unsigned long long NumberBehind(const std::string& head, const char* mark) {
    const size_t at = head.find(mark);
    return at == std::string::npos ? 0 : strtoull(head.c_str() + at + strlen(mark), nullptr, 10);
}

void Converse(int fd, double rate) {
    std::string head;
    bool alive = true;
    while (alive && ReadHead(fd, head)) {
        if (head.compare(0, 5, "GET /") == 0) {
            alive = Serve(fd, NumberBehind(head, "GET /"), rate);
        } else {
            alive = (head.find("Expect: 100") == std::string::npos ||
                     SendText(fd, "HTTP/1.1 100 Continue\r\n\r\n")) &&
                    Swallow(fd, NumberBehind(head, "Content-Length: "), rate);
        }
    }
    close(fd);
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 3) {
        fprintf(stderr, "usage: %s PORT BYTES_PER_SECOND\n", argv[0]);
        return 2;
    }
    const int listener = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    const int on = 1;
    setsockopt(listener, SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(static_cast<uint16_t>(atoi(argv[1])));
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    if (bind(listener, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0 ||
        listen(listener, 16) != 0) {
        perror("copy_wire");
        return 1;
    }
    for (;;) {
        const int fd = accept4(listener, nullptr, nullptr, SOCK_CLOEXEC);
        if (fd >= 0) {
            std::thread(Converse, fd, atof(argv[2])).detach();
        }
    }
}
