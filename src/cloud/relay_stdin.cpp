#include "cloud/relay_stdin.h"

#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>

#include "cloud/transfer.h"
#include "core/log.h"

namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

using Clock = std::chrono::steady_clock;

constexpr std::chrono::seconds kLongestSilence(3600);

/** poll(2), which knows descriptors of any number. A signal does not end the wait, nor does it
 * begin the hour anew; it may have brought a cancel. */
int WaitForInput(pollfd& input) {
    const auto deadline = Clock::now() + kLongestSilence;
    for (;;) {
        const auto left =
            std::chrono::duration_cast<std::chrono::milliseconds>(deadline - Clock::now());
        const int ready = poll(&input, 1, static_cast<int>(std::max<long long>(left.count(), 0)));
        if (ready >= 0 || errno != EINTR) {
            return ready;
        }
        if (IsStopAsked()) {
            errno = ECANCELED;
            return -1;
        }
    }
}

}  // namespace

ssize_t RelayStdinRead(int fd, char* data, size_t size, int* error) {
    pollfd input{fd, POLLIN, 0};
    const int ready = WaitForInput(input);
    if (ready < 0 && errno == ECANCELED) {
        return -1;
    }
    if (ready <= 0) {
        const int cause = ready == 0 ? ETIMEDOUT : errno;
        *error = kSilentInput;
        LOG_ERROR("(pid=%d) NO data within %d seconds, return=%d, errno=%s", getpid(),
                  static_cast<int>(kLongestSilence.count()), ready, strerror(cause));
        return -1;
    }
    if ((input.revents & (POLLIN | POLLHUP | POLLERR)) == 0) {
        *error = kSilentInput;  // no open descriptor
        LOG_ERROR("failed to wait for the change of file descriptor, errno=%s", strerror(EBADF));
        return -1;
    }
    return ReadSource(fd, data, size);
}

}  // namespace ZYROCloud
