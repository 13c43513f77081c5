#include "support/seams.h"

#include <dlfcn.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <sys/syscall.h>
#include <sys/types.h>
#include <syslog.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <map>
#include <mutex>
#include <optional>

namespace {

struct Failure {
    int error;
    int after;
};

struct Entry {
    enum Kind { kSleep, kMicroSleep, kLog, kIdentity } kind;
    int number;  ///< time, or priority of a line
    std::string text;
};

/** Records of this process and its children, in memory that fork does not copy. */
class Journal {
  public:
    static Journal& Get() {
        static Journal* journal = new (mmap(nullptr, sizeof(Journal), PROT_READ | PROT_WRITE,
                                            MAP_SHARED | MAP_ANONYMOUS, -1, 0)) Journal;
        return *journal;
    }

    void Clear() {
        for (Line& line : lines_) {
            line.complete = false;
        }
        used_ = 0;
    }

    void Add(const Entry& entry) {
        const size_t at = used_.fetch_add(1);
        if (at < kLines) {
            lines_[at].kind = entry.kind;
            lines_[at].number = entry.number;
            strncpy(lines_[at].text, entry.text.c_str(), sizeof lines_[at].text - 1);
            lines_[at].complete = true;
        }
    }

    std::vector<Entry> Entries() const {
        std::vector<Entry> entries;
        for (size_t i = 0; i < std::min<size_t>(used_, kLines); ++i) {
            if (lines_[i].complete) {
                entries.push_back({lines_[i].kind, lines_[i].number, lines_[i].text});
            }
        }
        return entries;
    }

  private:
    static constexpr size_t kLines = 8192;
    struct Line {
        Entry::Kind kind;
        int number;
        char text[240];
        std::atomic<bool> complete;
    };
    std::atomic<size_t> used_;
    Line lines_[kLines];
};

struct Records {
    std::vector<Entry> entries;
    std::map<std::string, Failure> failures;
    bool pretend = false;
    bool watch_children = false;
    std::function<void()> on_micro_sleep;
    std::optional<time_t> now;
    std::atomic<long> slept{0};  ///< microseconds of all usleep()
    std::function<void()> on_sleep;
};

Records& Get() {
    static Records records;
    return records;
}

/** Units under test may report from several threads. */
std::mutex& KeepMutex() {
    static std::mutex mutex;
    return mutex;
}

void Keep(Entry entry) {
    const std::lock_guard<std::mutex> guard(KeepMutex());
    if (Get().watch_children) {
        Journal::Get().Add(entry);
    } else {
        Get().entries.push_back(std::move(entry));
    }
}

/** All entries of one kind, each turned into what the caller wants of it. */
template <typename Convert>
auto Collect(Entry::Kind kind, Convert convert) {
    std::vector<decltype(convert(Entry()))> found;
    std::vector<Entry> entries = Get().entries;
    if (Get().watch_children) {
        const std::vector<Entry> shared = Journal::Get().Entries();
        entries.insert(entries.end(), shared.begin(), shared.end());
    }
    for (const Entry& entry : entries) {
        if (entry.kind == kind) {
            found.push_back(convert(entry));
        }
    }
    return found;
}

void KeepLine(int priority, const char* format, va_list args) {
    char* text = nullptr;
    if (vasprintf(&text, format, args) >= 0) {
        Keep({Entry::kLog, priority, text});
        free(text);
    }
}

/** Records one identity call; true when the real one is still to be made. */
bool Record(const char* function, const std::string& arguments, int& result) {
    Records& records = Get();
    const std::string call = std::string(function) + "(" + arguments + ")";
    Keep({Entry::kIdentity, 0, call});
    const auto exact = records.failures.find(call);
    const auto failure = exact != records.failures.end() ? exact : records.failures.find(function);
    if (failure != records.failures.end() && failure->second.after-- <= 0) {
        errno = failure->second.error;
        result = -1;
        return false;
    }
    result = 0;
    return !records.pretend;
}

template <typename... Ids>
std::string Join(Ids... ids) {
    std::string text;
    ((text += (text.empty() ? "" : ", ") + std::to_string(static_cast<int>(ids))), ...);
    return text;
}

template <typename... Ids>
int Identity(const char* function, Ids... ids) {
    int result = 0;
    if (!Record(function, Join(ids...), result)) {
        return result;
    }
    using Real = int (*)(Ids...);
    return reinterpret_cast<Real>(dlsym(RTLD_NEXT, function))(ids...);
}

class ResetBeforeEachTest : public testing::EmptyTestEventListener {
    void OnTestStart(const testing::TestInfo&) override { seams::Reset(); }
};

const bool kInstalled = [] {
    testing::UnitTest::GetInstance()->listeners().Append(new ResetBeforeEachTest);
    return true;
}();

}  // namespace

extern "C" {

unsigned sleep(unsigned seconds) {
    Keep({Entry::kSleep, static_cast<int>(seconds), ""});
    if (Get().on_sleep) {
        Get().on_sleep();
    }
    return 0;
}

time_t time(time_t* out) {
    timespec real{};
    clock_gettime(CLOCK_REALTIME, &real);
    const time_t now = Get().now.value_or(real.tv_sec);
    if (now == -1) {
        errno = EOVERFLOW;
    }
    if (out != nullptr) {
        *out = now;
    }
    return now;
}

/** The coarse clock is the one by which waits are bounded: here it goes on with the pauses alone.
 */
int clock_gettime(clockid_t clock, timespec* out) {
    if (clock != CLOCK_MONOTONIC_COARSE) {
        return static_cast<int>(syscall(SYS_clock_gettime, clock, out));
    }
    *out = {Get().slept / 1000000, Get().slept % 1000000 * 1000};
    return 0;
}

int usleep(useconds_t microseconds) {
    Get().slept += microseconds;
    Keep({Entry::kMicroSleep, static_cast<int>(microseconds), ""});
    if (Get().on_micro_sleep) {
        Get().on_micro_sleep();
    }
    return 0;
}

void syslog(int priority, const char* format, ...) {
    va_list args;
    va_start(args, format);
    KeepLine(priority, format, args);
    va_end(args);
}

void __syslog_chk(int priority, int, const char* format, ...) {
    va_list args;
    va_start(args, format);
    KeepLine(priority, format, args);
    va_end(args);
}

int setresuid(uid_t r, uid_t e, uid_t s) {
    return Identity("setresuid", r, e, s);
}
int setresgid(gid_t r, gid_t e, gid_t s) {
    return Identity("setresgid", r, e, s);
}
int seteuid(uid_t e) {
    return Identity("seteuid", e);
}
int setegid(gid_t e) {
    return Identity("setegid", e);
}
int setreuid(uid_t r, uid_t e) {
    return Identity("setreuid", r, e);
}
int setregid(gid_t r, gid_t e) {
    return Identity("setregid", r, e);
}

}  // extern "C"

namespace seams {

void Reset() {
    Records& records = Get();
    records.~Records();
    new (&records) Records;
}

void WatchChildren() {
    Journal::Get().Clear();
    Get().watch_children = true;
}

std::vector<unsigned> Sleeps() {
    return Collect(Entry::kSleep, [](const Entry& e) { return static_cast<unsigned>(e.number); });
}
std::vector<unsigned> MicroSleeps() {
    return Collect(Entry::kMicroSleep,
                   [](const Entry& e) { return static_cast<unsigned>(e.number); });
}

std::vector<LogLine> LogLines() {
    return Collect(Entry::kLog, [](const Entry& e) { return LogLine{e.number, e.text}; });
}

bool Logged(const std::string& text) {
    for (const LogLine& line : LogLines()) {
        const size_t blank = line.text.find(' ');
        if (blank != std::string::npos &&
            line.text.compare(blank + 1, std::string::npos, text) == 0) {
            return true;
        }
    }
    return false;
}

bool LoggedPart(const std::string& part) {
    for (const LogLine& line : LogLines()) {
        if (line.text.find(part) != std::string::npos) {
            return true;
        }
    }
    return false;
}

std::string LogDump() {
    std::string dump;
    for (const LogLine& line : LogLines()) {
        dump += line.text + "\n";
    }
    return dump;
}

std::vector<std::string> IdentityCalls() {
    return Collect(Entry::kIdentity, [](const Entry& e) { return e.text; });
}

void FailIdentity(const std::string& function, int error, int after) {
    Get().failures[function] = {error, after};
}

void PassTime(long microseconds) {
    Get().slept += microseconds;
}

void SetTime(time_t now) {
    Get().now = now;
}

void OnMicroSleep(std::function<void()> hook) {
    Get().on_micro_sleep = std::move(hook);
}

void OnSleep(std::function<void()> hook) {
    Get().on_sleep = std::move(hook);
}

void PretendIdentity(bool on) {
    Get().pretend = on;
}

}  // namespace seams
