#include "cloud/relay_tail.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>

#include "cloud/transfer.h"
#include "core/error_cell.h"
#include "core/log.h"

namespace ZYROCloud {

using namespace ZYROVFS;

bool RelayTail::Load(size_t size, const Reader& read) {
    constexpr unsigned int kPlatformNoMemory = 0x200;
    loaded_ = true;
    buffer_.reset(static_cast<char*>(malloc(kSize)));
    if (buffer_ == nullptr) {
        LOG_ERROR("malloc failed");
        SetPlatformErr(kPlatformNoMemory);
        return false;
    }
    const size_t wanted = std::min(size, kSize);
    while (read_ < wanted) {
        const ssize_t n = read(buffer_.get() + read_, wanted - read_);
        if (n < 0) {
            return false;
        }
        if (n == 0) {
            LOG_ERROR("The request ended %zu bytes before its length", wanted - read_);
            SetPlatformErr(kPlatformShort);
            return false;
        }
        read_ += static_cast<size_t>(n);
    }
    length_ = read_;
    return true;
}

bool RelayTail::CutAt(const std::string& boundary) {
    const void* found = memmem(buffer_.get(), read_, boundary.data(), boundary.size());
    if (found == nullptr) {
        LOG_ERROR("Can NOT find boundary(%s)", boundary.c_str());
        return false;
    }
    length_ = static_cast<size_t>(static_cast<const char*>(found) - buffer_.get());
    return true;
}

size_t RelayTail::Take(char* data, size_t want) {
    const size_t n = std::min(want, Left());
    memcpy(data, buffer_.get() + offset_, n);
    offset_ += n;
    return n;
}

}  // namespace ZYROCloud
