#include "transfer_progress.h"

#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <chrono>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <iterator>
#include <limits>
#include <thread>

#include "text.h"

namespace tool {
namespace {

using Clock = std::chrono::steady_clock;
using std::chrono::duration;
using std::chrono::milliseconds;

volatile std::sig_atomic_t cancelled = 0;
std::atomic<long long> moved{0};    // what a speed limit counts
std::atomic<long long> arrived{0};  // what is there: a retry begins again
std::atomic<long long> base{0};     // what was there when the piece under way began
std::atomic<Progress*> shown{nullptr};
std::atomic<long long> limit{0};
Clock::time_point begin;
Clock::time_point drawn;  // by the one thread that reports progress

constexpr auto kRedraw = milliseconds(100);
constexpr auto kLongestPause = milliseconds(200);

size_t Columns() {
    winsize size{};
    return ioctl(STDERR_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_col > 0 ? size.ws_col : 80;
}

}  // namespace

Progress::Progress(std::string name, long long total, long long rate, bool bar, long long already)
    : name_(std::move(name)), total_(total), rate_(rate), bar_(bar), already_(already) {
    moved = arrived = base = 0;
    begin = drawn = Clock::now();
    limit = rate_;
    shown = this;
}

Progress::~Progress() {
    shown = nullptr;
    if (bar_) {
        std::fprintf(stderr, "\r\033[K");
    }
}

void Progress::CatchSignals() {
    struct sigaction action {};
    action.sa_handler = [](int signal) {
        // A transfer hears of it within a second; what else may be under way is left by the second.
        if (cancelled != 0) {
            std::signal(signal, SIG_DFL);
            std::raise(signal);
        }
        cancelled = 1;
    };
    sigaction(SIGINT, &action, nullptr);
    sigaction(SIGTERM, &action, nullptr);
    std::signal(SIGPIPE, SIG_IGN);
}

long long Progress::Bytes() const {
    return arrived;
}

void Progress::BeginAt(long long bytes) {
    base = bytes;
}

double Progress::Seconds() const {
    return duration<double>(Clock::now() - begin).count();
}

bool Progress::Cancelled() {
    return cancelled != 0;
}

int Progress::OnCancel() {
    return cancelled;
}

int Progress::OnProgress(unsigned long long chunk, unsigned long long done) {
    moved += static_cast<long long>(chunk);
    arrived = base + static_cast<long long>(done);
    Progress* progress = shown;
    if (progress != nullptr && progress->bar_ && Clock::now() - drawn >= kRedraw) {
        drawn = Clock::now();
        progress->Draw();
    }
    return 0;
}

long long Progress::OnSpeed(unsigned long long chunk, unsigned long long /*done*/) {
    const long long rate = limit;
    const auto due = begin + std::chrono::duration_cast<Clock::duration>(duration<double>(
                                 static_cast<double>(moved) / static_cast<double>(rate)));
    while (cancelled == 0 && Clock::now() < due) {
        std::this_thread::sleep_for(
            std::min<Clock::duration>(due - Clock::now(), Clock::duration(kLongestPause)));
    }
    // Pieces of a tenth of a second keep a low rate even.
    const long long piece = std::max(rate / 10, 1LL);
    return std::min(static_cast<long long>(chunk), piece);
}

void Progress::Draw() const {
    const double seconds = std::max(Seconds(), 0.001);
    const double rate = static_cast<double>(moved) / seconds;
    const auto have = static_cast<double>(already_ + arrived);
    std::string text = HumanBytes(have);
    double part = -1;
    if (total_ > 0) {
        part = std::min(1.0, have / static_cast<double>(total_));
        text += " of " + HumanBytes(static_cast<double>(total_));
    }
    text += "  " + HumanBytes(rate) + "/s";
    if (part >= 0 && rate > 0) {
        text += "  " + HumanTime((static_cast<double>(total_) - have) / rate) + " left";
    }
    const size_t columns = Columns();
    std::string line = Printable(name_);
    if (line.size() > columns / 3) {
        line.resize(columns / 3);
    }
    const size_t taken = line.size() + text.size() + 8;
    if (part >= 0 && columns > taken + 10) {
        const size_t width = std::min<size_t>(columns - taken, 40);
        const auto full = static_cast<size_t>(part * static_cast<double>(width));
        line += "  [" + std::string(full, '#') + std::string(width - full, '.') + "]";
    }
    line += "  " + text;
    if (line.size() >= columns) {
        line.resize(columns - 1);
    }
    std::fprintf(stderr, "\r\033[K%s", line.c_str());
    std::fflush(stderr);
}

std::string HumanBytes(double bytes) {
    constexpr const char* kUnits[] = {"B", "KiB", "MiB", "GiB", "TiB"};
    size_t unit = 0;
    while (bytes >= 1024 && unit + 1 < std::size(kUnits)) {
        bytes /= 1024;
        ++unit;
    }
    char text[32];
    std::snprintf(text, sizeof text, unit == 0 ? "%.0f %s" : "%.1f %s", bytes, kUnits[unit]);
    return text;
}

std::string HumanTime(double seconds) {
    const long long whole = seconds < 1e9 ? std::llround(std::max(seconds, 0.0)) : 999999999LL;
    char text[48];
    if (whole >= 3600) {
        std::snprintf(text, sizeof text, "%lld:%02lld:%02lld", whole / 3600, whole / 60 % 60,
                      whole % 60);
    } else {
        std::snprintf(text, sizeof text, "%lld:%02lld", whole / 60, whole % 60);
    }
    return text;
}

bool ParseRate(const std::string& text, long long& rate) {
    if (text.empty() || text[0] < '0' || text[0] > '9') {
        return false;
    }
    char* end = nullptr;
    errno = 0;
    rate = std::strtoll(text.c_str(), &end, 10);
    const std::string unit = end;
    int shift = 0;
    if (unit == "K" || unit == "k") {
        shift = 10;
    } else if (unit == "M" || unit == "m") {
        shift = 20;
    } else if (unit == "G" || unit == "g") {
        shift = 30;
    } else if (!unit.empty()) {
        return false;
    }
    if (errno != 0 || rate <= 0 || rate > std::numeric_limits<long long>::max() >> shift) {
        return false;
    }
    rate <<= shift;
    return true;
}

}  // namespace tool
