/** Signals that a test answers itself. For one test program: it defines kill() of its own. */
#ifndef ZYROVFS_TESTS_KILL_SEAM_H
#define ZYROVFS_TESTS_KILL_SEAM_H

#include <dlfcn.h>
#include <sys/types.h>

#include <csignal>
#include <functional>

namespace kill_seam {

/** In place of the system call, if set. */
inline std::function<int(pid_t, int)> instead;

/** The function that a test program's own one stands before. */
template <typename Function>
Function* Real(const char* name) {
    return reinterpret_cast<Function*>(dlsym(RTLD_NEXT, name));
}

}  // namespace kill_seam

extern "C" int kill(pid_t pid, int signal) noexcept {
    return kill_seam::instead ? kill_seam::instead(pid, signal)
                              : kill_seam::Real<int(pid_t, int)>("kill")(pid, signal);
}

#endif
