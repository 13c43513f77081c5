#include "zip.h"

#include <zlib.h>

#include <algorithm>
#include <ctime>
#include <utility>

namespace web {
namespace {

// Numbers of the format, as its description names them.
constexpr uint32_t kLocalHeader = 0x04034b50;
constexpr uint32_t kDescriptor = 0x08074b50;
constexpr uint32_t kCentralHeader = 0x02014b50;
constexpr uint32_t kEnd64 = 0x06064b50;
constexpr uint32_t kLocator64 = 0x07064b50;
constexpr uint32_t kEnd = 0x06054b50;
constexpr uint16_t kVersion = 20;
constexpr uint16_t kVersion64 = 45;
constexpr uint16_t kUnix = 3 << 8;  // who made it
constexpr uint16_t kUtf8 = 1 << 11;
constexpr uint16_t kSizesBehind = 1 << 3;
constexpr uint16_t kExtra64 = 0x0001;
constexpr uint16_t kExtraTime = 0x5455;
constexpr uint32_t kFileMode = 0100644U << 16;
constexpr uint32_t kFolderMode = 040755U << 16;
/** The number itself says that the 64-bit form has the value. */
constexpr uint64_t kMost32 = 0xffffffff;
constexpr uint64_t kMost16 = 0xffff;

/** Little-endian numbers. */
class Bytes {
  public:
    Bytes& U16(uint64_t value) { return Number(value, 2); }
    Bytes& U32(uint64_t value) { return Number(value, 4); }
    Bytes& U64(uint64_t value) { return Number(value, 8); }
    Bytes& Add(const std::string& text) {
        text_ += text;
        return *this;
    }
    const std::string& Text() const { return text_; }

  private:
    Bytes& Number(uint64_t value, int size) {
        for (int i = 0; i < size; ++i) {
            text_ += static_cast<char>(value >> (8 * i));
        }
        return *this;
    }
    std::string text_;
};

bool IsLarge(const ZipEntry& entry) {
    return entry.size >= kMost32;
}

/** Date and time as a number of two halves, from 1980 on, in the box's own time. */
uint32_t DosTime(int64_t seconds) {
    constexpr uint32_t kFirst = (1U << 5 | 1U) << 16;
    const auto moment = static_cast<time_t>(seconds);
    tm parts{};
    if (localtime_r(&moment, &parts) == nullptr || parts.tm_year < 80) {
        return kFirst;
    }
    const auto date = static_cast<uint32_t>(std::min(parts.tm_year - 80, 127) << 9 |
                                            (parts.tm_mon + 1) << 5 | parts.tm_mday);
    const auto time =
        static_cast<uint32_t>(parts.tm_hour << 11 | parts.tm_min << 5 | parts.tm_sec / 2);
    return date << 16 | time;
}

/** A name leads to no place but below where the archive is unpacked: to some a backslash is a
 * slash. */
std::string Harmless(std::string name) {
    std::replace(name.begin(), name.end(), '\\', '_');
    return name;
}

std::string TimeExtra(const ZipEntry& entry) {
    constexpr int64_t kLast = 0x7fffffff;
    const int64_t moment = std::clamp<int64_t>(entry.modified, 0, kLast);
    return Bytes().U16(kExtraTime).U16(5).Add("\x01").U32(static_cast<uint64_t>(moment)).Text();
}

uint16_t Flags(const ZipEntry& entry) {
    return entry.IsFolder() ? kUtf8 : kUtf8 | kSizesBehind;
}

std::string LocalHeader(const ZipEntry& entry) {
    std::string extra = TimeExtra(entry);
    if (IsLarge(entry)) {
        extra += Bytes().U16(kExtra64).U16(16).U64(0).U64(0).Text();
    }
    const uint64_t size = IsLarge(entry) ? kMost32 : 0;
    return Bytes()
        .U32(kLocalHeader)
        .U16(IsLarge(entry) ? kVersion64 : kVersion)
        .U16(Flags(entry))
        .U16(0)  // stored
        .U32(DosTime(entry.modified))
        .U32(0)
        .U32(size)
        .U32(size)
        .U16(entry.name.size())
        .U16(extra.size())
        .Add(entry.name)
        .Add(extra)
        .Text();
}

/** What could not be told in front of the content. */
std::string Descriptor(const ZipEntry& entry, uint32_t checksum) {
    Bytes bytes;
    if (entry.IsFolder()) {
        return "";
    }
    bytes.U32(kDescriptor).U32(checksum);
    return (IsLarge(entry) ? bytes.U64(entry.size).U64(entry.size)
                           : bytes.U32(entry.size).U32(entry.size))
        .Text();
}

std::string CentralHeader(const ZipEntry& entry, uint64_t offset, uint32_t checksum) {
    Bytes large;
    if (IsLarge(entry)) {
        large.U64(entry.size).U64(entry.size);
    }
    if (offset >= kMost32) {
        large.U64(offset);
    }
    std::string extra = TimeExtra(entry);
    if (!large.Text().empty()) {
        extra += Bytes().U16(kExtra64).U16(large.Text().size()).Add(large.Text()).Text();
    }
    const uint16_t version = large.Text().empty() ? kVersion : kVersion64;
    return Bytes()
        .U32(kCentralHeader)
        .U16(kUnix | version)
        .U16(version)
        .U16(Flags(entry))
        .U16(0)
        .U32(DosTime(entry.modified))
        .U32(checksum)
        .U32(std::min(entry.size, kMost32))
        .U32(std::min(entry.size, kMost32))
        .U16(entry.name.size())
        .U16(extra.size())
        .U16(0)  // comment
        .U16(0)  // disk
        .U16(0)  // internal attributes
        .U32(entry.IsFolder() ? kFolderMode | 0x10 : kFileMode)
        .U32(std::min(offset, kMost32))
        .Add(entry.name)
        .Add(extra)
        .Text();
}

/** The end of an archive whose list of `count` entries takes `size` bytes from `offset` on. */
std::string Trailer(uint64_t count, uint64_t size, uint64_t offset) {
    Bytes bytes;
    if (count >= kMost16 || size >= kMost32 || offset >= kMost32) {
        bytes.U32(kEnd64).U64(44).U16(kUnix | kVersion64).U16(kVersion64).U32(0).U32(0);
        bytes.U64(count).U64(count).U64(size).U64(offset);
        bytes.U32(kLocator64).U32(0).U64(offset + size).U32(1);
    }
    return bytes.U32(kEnd)
        .U16(0)
        .U16(0)
        .U16(std::min(count, kMost16))
        .U16(std::min(count, kMost16))
        .U32(std::min(size, kMost32))
        .U32(std::min(offset, kMost32))
        .U16(0)
        .Text();
}

}  // namespace

uint64_t ZipSize(const std::vector<ZipEntry>& entries, uint64_t begin) {
    uint64_t offset = begin;
    uint64_t central = 0;
    for (const ZipEntry& entry : entries) {
        central += CentralHeader(entry, offset, 0).size();
        offset += LocalHeader(entry).size() + entry.size + Descriptor(entry, 0).size();
    }
    return offset - begin + central + Trailer(entries.size(), central, offset).size();
}

Zip::Zip(Sink sink, uint64_t begin) : sink_(std::move(sink)), offset_(begin) {}

bool Zip::Put(const std::string& bytes) {
    broken_ = broken_ || !sink_(bytes.data(), bytes.size());
    offset_ += bytes.size();
    return !broken_;
}

bool Zip::Begin(const ZipEntry& entry) {
    stored_.push_back({entry, offset_, 0});
    stored_.back().entry.name = Harmless(entry.name);
    left_ = entry.size;
    return Put(LocalHeader(stored_.back().entry));
}

bool Zip::Write(const char* data, size_t size) {
    if (broken_ || stored_.empty() || size > left_) {
        broken_ = true;
        return false;
    }
    uint32_t& checksum = stored_.back().checksum;
    checksum = static_cast<uint32_t>(
        crc32_z(checksum, reinterpret_cast<const unsigned char*>(data), size));
    left_ -= size;
    offset_ += size;
    broken_ = !sink_(data, size);
    return !broken_;
}

bool Zip::End() {
    broken_ = broken_ || stored_.empty() || left_ > 0;
    return !broken_ && Put(Descriptor(stored_.back().entry, stored_.back().checksum));
}

bool Zip::Finish() {
    const uint64_t begin = offset_;
    for (const Stored& stored : stored_) {
        if (broken_ || !Put(CentralHeader(stored.entry, stored.offset, stored.checksum))) {
            return false;
        }
    }
    return !broken_ && Put(Trailer(stored_.size(), offset_ - begin, begin));
}

}  // namespace web
