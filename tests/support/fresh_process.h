/** For what a process does once and cannot undo: each question is asked in a child of its own. */
#ifndef ZYROVFS_TESTS_FRESH_PROCESS_H
#define ZYROVFS_TESTS_FRESH_PROCESS_H

#include <json/value.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <functional>
#include <string>

#include "core/json.h"
#include "support/seams.h"
#include "zyrovfs/error.h"

namespace fresh {

struct Answer {
    bool finished = false;  ///< false: killed by a signal, or by an exception
    bool ok = false;
    int code = -1;
    Json::Value detail;
    std::string log;

    bool Logged(const std::string& part) const { return log.find(part) != std::string::npos; }
};

inline std::ostream& operator<<(std::ostream& out, const Answer& answer) {
    return out << (answer.finished ? "" : "not finished, ") << (answer.ok ? "true" : "false")
               << ", code " << answer.code << ", detail " << ZYROVFS::json::toString(answer.detail)
               << ", log:\n"
               << answer.log;
}

/** Runs `body` in a child process, and tells its result, the error cell and the log lines. */
inline Answer Ask(const std::function<bool()>& body) {
    int ends[2];
    if (pipe(ends) != 0) {
        return {};
    }
    fflush(nullptr);
    const pid_t pid = fork();
    if (pid == 0) {
        seams::Reset();
        ZYROVFS::ResetError();
        Json::Value told;
        told["ok"] = body();
        told["code"] = ZYROVFS::GetError();
        ZYROVFS::VFSGetJson(told["detail"]);
        told["log"] = seams::LogDump();
        const std::string text = ZYROVFS::json::toString(told);
        _exit(write(ends[1], text.data(), text.size()) == static_cast<ssize_t>(text.size()) ? 0
                                                                                            : 1);
    }
    close(ends[1]);
    std::string text;
    char buffer[4096];
    for (ssize_t n = 0; (n = read(ends[0], buffer, sizeof buffer)) > 0;) {
        text.append(buffer, static_cast<size_t>(n));
    }
    close(ends[0]);
    int status = 0;
    waitpid(pid, &status, 0);
    Json::Value told;
    if (status != 0 || !ZYROVFS::json::fromString(told, text)) {
        return {};
    }
    return {true, told["ok"].asBool(), told["code"].asInt(), told["detail"],
            told["log"].asString()};
}

}  // namespace fresh

#endif
