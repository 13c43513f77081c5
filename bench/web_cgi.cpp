// bench_web_cgi: a CGI that does nothing with what passes through it, and the scales for one that
// does. The web server starts it; its own name, a link's, says which of these it is:
//   bare        reads and counts a request's body, or sends as many zeros as QUERY_STRING says
//   weigh-bare  runs that one in a process of its own, and writes what it took to a file
//   weigh       the same for the web layer
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

namespace {

constexpr size_t kPiece = 131072;

void Count() {
    std::vector<char> room(kPiece);
    unsigned long long bytes = 0;
    ssize_t n = 0;
    while ((n = read(STDIN_FILENO, room.data(), room.size())) > 0) {
        bytes += static_cast<unsigned long long>(n);
    }
    std::printf("Content-Type: text/plain\r\n\r\n%llu\n", bytes);
}

void SendZeros(unsigned long long bytes) {
    const std::vector<char> zeros(kPiece);
    std::printf("Content-Type: application/octet-stream\r\nContent-Length: %llu\r\n\r\n", bytes);
    std::fflush(stdout);
    while (bytes > 0) {
        const ssize_t n = write(STDOUT_FILENO, zeros.data(),
                                bytes < kPiece ? static_cast<size_t>(bytes) : kPiece);
        if (n < 0) {
            return;
        }
        bytes -= static_cast<unsigned long long>(n);
    }
}

double Seconds(const timeval& time) {
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) / 1e6;
}

/** Runs another program in this one's place; "CPU seconds, peak KiB" go to a file. */
int Weigh(const char* program) {
    const pid_t child = fork();
    if (child == 0) {
        execl(program, program, nullptr);
        _exit(127);
    }
    int status = 0;
    rusage usage{};
    wait4(child, &status, 0, &usage);
    std::FILE* const out = std::fopen("/run/web-bench/usage", "w");
    if (out != nullptr) {
        std::fprintf(out, "%f %ld\n", Seconds(usage.ru_utime) + Seconds(usage.ru_stime),
                     usage.ru_maxrss);
        std::fclose(out);
    }
    return WIFEXITED(status) ? WEXITSTATUS(status) : 1;
}

}  // namespace

int main(int argc, char** argv) {
    const std::string self = argc > 0 ? argv[0] : "";
    const std::string folder = self.substr(0, self.rfind('/'));
    const std::string name = self.substr(self.rfind('/') + 1);
    if (name == "bare") {
        const char* size = std::getenv("QUERY_STRING");
        size == nullptr || *size == '\0' ? Count() : SendZeros(std::strtoull(size, nullptr, 10));
        return 0;
    }
    return Weigh((folder + (name == "weigh-bare" ? "/bare" : "/zyrovfs-web")).c_str());
}
