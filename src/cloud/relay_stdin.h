/** The browser's bytes as they come in through standard input. */
#ifndef ZYROVFS_CLOUD_RELAY_STDIN_H
#define ZYROVFS_CLOUD_RELAY_STDIN_H

#include <sys/types.h>

#include <cstddef>

namespace ZYROCloud {

/** `error` of a progress record when the browser is silent. */
inline constexpr int kSilentInput = -7;

/**
 * Up to `size` bytes, 0 at the end of the input. Waits for them as long as an hour. -1, logged: on
 * silence with `*error` set, on a failed read with the platform error, on a cancel that a signal
 * brought with that of a cancel.
 */
ssize_t RelayStdinRead(int fd, char* data, size_t size, int* error);

}  // namespace ZYROCloud

#endif
