#include "input.h"

#include <poll.h>
#include <unistd.h>

#include <cerrno>

#include "failure.h"

namespace web {

size_t ReadInput(char* data, size_t size) {
    pollfd input{STDIN_FILENO, POLLIN, 0};
    for (;;) {
        const int ready = poll(&input, 1, kPatienceSeconds * 1000);
        if (ready == 0) {
            throw Failure(408, "Nothing came from the browser for too long.");
        }
        const ssize_t n = ready < 0 ? -1 : read(STDIN_FILENO, data, size);
        if (n > 0) {
            return static_cast<size_t>(n);
        }
        if (n == 0 || errno != EINTR) {
            throw Failure(400, "The request ended early.");
        }
    }
}

}  // namespace web
