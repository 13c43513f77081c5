#include "support/seams.h"

#include <dlfcn.h>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/types.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <map>

namespace {

struct Failure {
    int error;
    int after;
};

struct Records {
    std::vector<unsigned> sleeps;
    std::vector<unsigned> micro_sleeps;
    std::vector<seams::LogLine> log;
    std::vector<std::string> identity;
    std::map<std::string, Failure> failures;
    bool pretend = false;
};

Records& Get() {
    static Records records;
    return records;
}

/** Where forked processes leave their lines: an unnamed file that all of them append to. */
const int kChildLog = [] {
    const int fd = memfd_create("log", MFD_CLOEXEC);
    fcntl(fd, F_SETFL, O_APPEND);
    return fd;
}();
const pid_t kTestProcess = getpid();

void KeepChildLine(const std::string& line) {
    if (getpid() != kTestProcess && write(kChildLog, line.data(), line.size()) < 0) {
        abort();
    }
}

void KeepLine(int priority, const char* format, va_list args) {
    char* text = nullptr;
    if (vasprintf(&text, format, args) >= 0) {
        Get().log.push_back({priority, text});
        KeepChildLine(std::string(text) + "\n");
        free(text);
    }
}

/** Records one identity call; true when the real one is still to be made. */
bool Record(const char* function, const std::string& arguments, int& result) {
    Records& records = Get();
    records.identity.push_back(std::string(function) + "(" + arguments + ")");
    const auto failure = records.failures.find(function);
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
    Get().sleeps.push_back(seconds);
    return 0;
}

int usleep(useconds_t microseconds) {
    Get().micro_sleeps.push_back(microseconds);
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
    Get() = Records();
    if (ftruncate(kChildLog, 0) != 0) {
        abort();
    }
}

std::vector<unsigned> Sleeps() {
    return Get().sleeps;
}
std::vector<unsigned> MicroSleeps() {
    return Get().micro_sleeps;
}

const std::vector<LogLine>& LogLines() {
    return Get().log;
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

std::string ChildLogDump() {
    struct stat info {};
    fstat(kChildLog, &info);
    std::string lines(static_cast<size_t>(info.st_size), '\0');
    const ssize_t length = pread(kChildLog, lines.data(), lines.size(), 0);
    lines.resize(length < 0 ? 0 : static_cast<size_t>(length));
    return lines;
}

bool ChildLogged(const std::string& text) {
    return ("\n" + ChildLogDump()).find(" " + text + "\n") != std::string::npos;
}

std::string LogDump() {
    std::string dump;
    for (const LogLine& line : LogLines()) {
        dump += line.text + "\n";
    }
    return dump;
}

const std::vector<std::string>& IdentityCalls() {
    return Get().identity;
}

void FailIdentity(const std::string& function, int error, int after) {
    Get().failures[function] = {error, after};
}

void PretendIdentity(bool on) {
    Get().pretend = on;
}

}  // namespace seams
