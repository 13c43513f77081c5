/** The two ends of a transfer as a driver is given them, without the engine. */
#ifndef ZYROVFS_TESTS_TRANSFER_BYTES_H
#define ZYROVFS_TESTS_TRANSFER_BYTES_H

#include <curl/curl.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <unistd.h>
#include <zosplatform/error.h>

#include <algorithm>
#include <string>

#include "core/handle.h"
#include "zyrovfs/cloud.h"

namespace ZYROCloud {

/** The bytes of one upload or download, and a callback that behaves as a test wants. */
struct Bytes {
    explicit Bytes(int direction, const std::string& content = "")
        : file(memfd_create("bytes", 0)),
          xfer{direction == 1 ? &Bytes::Read : &Bytes::Write, direction, &context} {
        now = this;
        EXPECT_EQ(write(file.Get(), content.data(), content.size()),
                  static_cast<ssize_t>(content.size()));
        lseek(file.Get(), 0, SEEK_SET);
        context.fd = file.Get();
    }

    static size_t Read(char* data, size_t size, size_t count, void*) {
        if (now->cancel_at >= 0 && now->calls++ >= now->cancel_at) {
            YLIBCErrSetEx(0xa600, "test", 1);
            return CURL_READFUNC_ABORT;
        }
        const size_t want = now->context.limited
                                ? std::min<size_t>(size * count, now->context.chunk_left)
                                : size * count;
        const auto got = static_cast<size_t>(read(now->file.Get(), data, want));
        if (now->context.limited) {
            now->context.chunk_left -= static_cast<unsigned int>(got);
        }
        return got;
    }

    static size_t Write(char* data, size_t size, size_t count, void*) {
        now->context.can_retry = false;
        if (now->cancel_at >= 0 && now->calls++ >= now->cancel_at) {
            YLIBCErrSetEx(0xa600, "test", 1);
            return 0;
        }
        if (now->impatient != nullptr) {
            // The next second of silence is one too many.
            curl_easy_setopt(now->impatient, CURLOPT_LOW_SPEED_LIMIT, 1000L);
            curl_easy_setopt(now->impatient, CURLOPT_LOW_SPEED_TIME, 1L);
        }
        now->received.append(data, size * count);
        return size * count;
    }

    static inline Bytes* now = nullptr;
    ZYROVFS::UniqueFd file;
    std::string received;
    XferContext context;
    XferData xfer;
    int cancel_at = -1;  ///< number of the call that the user's cancel meets
    int calls = 0;
    CURL* impatient = nullptr;
};

}  // namespace ZYROCloud

#endif
