#include "cloud/onedrive/fragment_cursor.h"

#include <algorithm>

namespace ZYROCloud::onedrive {

long long OffsetBehind(long long offset, long long length, long long received) {
    return std::min(offset + length, received);
}

void FragmentCursor::BeginFragment(long long length) {
    begin_ = start_ = offset_;
    end_ = std::min(offset_ + length, total_);
}

long long FragmentCursor::BeginAttempt(long long length) {
    if (offset_ >= end_) {
        return 0;
    }
    // What the service has of a failed attempt it keeps, and a repeat goes that much further.
    const long long size = std::min(length, total_ - offset_);
    start_ = offset_;
    position_ = offset_ + size;
    return size;
}

void FragmentCursor::AdoptServerOffset(long long received) {
    offset_ = std::max(offset_, std::min(received, end_));
}

long long FragmentCursor::RestOfFragment(long long received) {
    if (start_ >= begin_) {
        return 0;
    }
    // What went out was the start of the file, which the service knows.
    AdoptServerOffset(received);
    return offset_ < begin_ || offset_ >= end_ ? 0 : end_ - offset_;
}

}  // namespace ZYROCloud::onedrive
