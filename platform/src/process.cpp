#include "zosplatform/process.h"

#include <fcntl.h>

#include <charconv>
#include <cstdio>
#include <cstring>
#include <optional>
#include <string_view>

#include "support.h"

namespace {

/** The kernel's folder of one process. Held open it goes on meaning that process and no other. */
zos::Fd OpenProcess(pid_t pid) {
    char path[32];
    std::snprintf(path, sizeof path, "/proc/%d", pid);
    return zos::Fd(pid > 0 ? open(path, O_PATH | O_DIRECTORY | O_CLOEXEC) : -1);
}

std::optional<std::string> ReadFile(const zos::Fd& process, const char* name) {
    const zos::Fd fd(openat(process.Get(), name, O_RDONLY | O_CLOEXEC));
    std::string text;
    if (!fd || !zos::ReadAll(fd.Get(), text)) {
        return std::nullopt;
    }
    return text;
}

/** What follows "KEY:\t" in /proc/PID/status. A name cannot fake a line: it is escaped there. */
std::string_view Field(std::string_view status, std::string_view key) {
    const std::string wanted = "\n" + std::string(key) + ":\t";
    const size_t at = status.find(wanted);
    if (at == std::string_view::npos) {
        return {};
    }
    const std::string_view rest = status.substr(at + wanted.size());
    return rest.substr(0, rest.find('\n'));
}

template <typename Number>
bool ParseNumber(std::string_view text, Number& number) {
    return std::from_chars(text.data(), text.data() + text.size(), number).ec == std::errc();
}

/** A thread has a folder under its own number too, and is no process of that number. */
bool IsProcess(std::string_view status, pid_t pid) {
    pid_t group = 0;
    return ParseNumber(Field(status, "Tgid"), group) && group == pid;
}

bool HasEnded(std::string_view status) {
    const std::string_view state = Field(status, "State");
    if (state.empty() || state.front() == 'X') {
        return true;
    }
    // A first thread that has ended looks like this too while others of its process go on.
    int threads = 0;
    return state.front() == 'Z' && (!ParseNumber(Field(status, "Threads"), threads) || threads < 2);
}

bool Describe(pid_t pid, YLIBCPROC& record) {
    const zos::Fd process = OpenProcess(pid);
    const auto status = ReadFile(process, "status");
    const auto name = ReadFile(process, "comm");
    if (!status || !name || !IsProcess(*status, pid)) {
        return false;
    }
    const std::string_view ids = Field(*status, "Uid");
    const size_t effective = ids.find('\t');
    if (effective == std::string_view::npos ||
        !ParseNumber(ids.substr(effective + 1), record.uid)) {
        return false;
    }
    record.pid = pid;
    const size_t length = name->empty() ? 0 : name->size() - 1;  // without the final newline
    name->copy(record.name, std::min(length, sizeof record.name - 1));
    return true;
}

}  // namespace

pid_t YLIBCProcFork() {
    return fork();
}

int YLIBCProcAlive(pid_t pid) {
    return zos::OrOutOfMemory(0, [pid] {
        const auto status = ReadFile(OpenProcess(pid), "status");
        return status && IsProcess(*status, pid) && !HasEnded(*status) ? 1 : 0;
    });
}

PYLIBCPROC YLIBCProcGetByPid(pid_t pid) {
    return zos::OrOutOfMemory(PYLIBCPROC(nullptr), [pid]() -> PYLIBCPROC {
        YLIBCPROC record{};
        if (!Describe(pid, record)) {
            SET_PLATFORM_ERROR(ZOS_ERR_NOT_FOUND);
            return nullptr;
        }
        return new YLIBCPROC(record);
    });
}

void YLIBCProcFree(PYLIBCPROC proc) {
    delete proc;
}

int ZYRODZOSIsPrivilegedMode() {
    return 1;
}
