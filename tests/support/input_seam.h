/**
 * Waiting for standard input at a test's pace: a program that includes this in its one source file
 * defines poll and fileno itself. Both do what they always do unless a test has set an answer.
 */
#ifndef ZYROVFS_TESTS_INPUT_SEAM_H
#define ZYROVFS_TESTS_INPUT_SEAM_H

#include <dlfcn.h>
#include <poll.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <functional>
#include <vector>

namespace input_seam {

/** What poll answers for a wait on one descriptor, in place of waiting. */
using Answer = std::function<int(pollfd&)>;
inline std::vector<Answer> answers;  ///< one call each, then poll works again
inline std::vector<int> waits;       ///< milliseconds that such calls would have waited at most
inline bool no_stdin = false;

inline Answer Silence() {
    return [](pollfd&) { return 0; };
}

inline Answer Fails(int error) {
    return [error](pollfd&) {
        errno = error;
        return -1;
    };
}

inline void Reset() {
    answers.clear();
    waits.clear();
    no_stdin = false;
}

}  // namespace input_seam

extern "C" __attribute__((visibility("default"))) int poll(pollfd* fds, nfds_t count,
                                                           int milliseconds) {
    using Real = int (*)(pollfd*, nfds_t, int);
    static const Real real = reinterpret_cast<Real>(dlsym(RTLD_NEXT, "poll"));
    if (count != 1 || input_seam::answers.empty()) {
        return real(fds, count, milliseconds);
    }
    const input_seam::Answer answer = input_seam::answers.front();
    input_seam::answers.erase(input_seam::answers.begin());
    input_seam::waits.push_back(milliseconds);
    return answer(*fds);
}

extern "C" __attribute__((visibility("default"))) int fileno(FILE* file) noexcept {
    using Real = int (*)(FILE*);
    static const Real real = reinterpret_cast<Real>(dlsym(RTLD_NEXT, "fileno"));
    if (input_seam::no_stdin) {
        errno = EBADF;
        return -1;
    }
    return real(file);
}

#endif
