/** The body of the request, in standard input. */
#ifndef ZYROVFS_WEB_INPUT_H
#define ZYROVFS_WEB_INPUT_H

#include <cstddef>

namespace web {

/** A browser that sends nothing for this long has gone. */
constexpr int kPatienceSeconds = 3600;

/**
 * Reads up to `size` bytes, at least one. Failure with status 400 at the end of what is sent, 408
 * for a silent browser.
 */
size_t ReadInput(char* data, size_t size);

}  // namespace web

#endif
