/** Local ends of transfers: made-up files, and a user who changes his mind. */
#ifndef ZYROVFS_TESTS_DRIVER_SUITE_SOURCE_H
#define ZYROVFS_TESTS_DRIVER_SUITE_SOURCE_H

#include <functional>
#include <string>

#include "core/handle.h"
#include "support/cloudsim/content.h"

namespace driver_suite {

inline constexpr long long kMiB = 1024 * 1024;
inline constexpr long long kChunk = 32 * kMiB;

/** A file to send. */
struct Source {
    explicit Source(long long bytes);
    explicit Source(const std::string& text);

    ZYROVFS::UniqueFd file;
    long long size;  ///< as the service is told; may be made another
    std::string sum;
};

/** A browser's request with a made-up file in it, from the file's first byte on. */
struct BrowserFile {
    explicit BrowserFile(long long bytes, const std::string& behind = "--\r\n");

    static constexpr const char* kBoundary = "--a-boundary-of-the-browser";
    ZYROVFS::UniqueFd request;
    long long size;            ///< of the file
    unsigned long long total;  ///< of the request
    std::string sum;
};

/** A file to receive into. */
struct Target {
    Target();
    std::string Text() const;
    std::string Sum() const;
    /** Empties it. */
    void Clear();

    ZYROVFS::UniqueFd file;
};

/** Whether the user wants to stop now, asked with every piece; and how far the transfer is. */
struct User {
    static int Cancel();
    static int Progress(unsigned long long chunk, unsigned long long done);
    static void Reset();

    static inline std::function<bool()> wants_to_stop;
    static inline int asked = 0;
    static inline unsigned long long done = 0;
};

}  // namespace driver_suite

#endif
