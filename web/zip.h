/**
 * A ZIP archive as it goes out, byte by byte: entries stored as they are, checksums behind them,
 * names in UTF-8, 64-bit forms where 32 bits do not suffice. Its size is known beforehand.
 */
#ifndef ZYROVFS_WEB_ZIP_H
#define ZYROVFS_WEB_ZIP_H

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

namespace web {

struct ZipEntry {
    std::string name;  ///< with slashes between folders, and one behind a folder
    uint64_t size = 0;
    int64_t modified = 0;  ///< epoch seconds

    bool IsFolder() const { return !name.empty() && name.back() == '/'; }
};

/** Bytes of an archive of these. `begin` is where it begins. */
uint64_t ZipSize(const std::vector<ZipEntry>& entries, uint64_t begin = 0);

class Zip {
  public:
    /** Takes bytes; false when there is nobody to take them. */
    using Sink = std::function<bool(const char* data, size_t size)>;

    /** Offsets count from `begin`. */
    explicit Zip(Sink sink, uint64_t begin = 0);

    /** False when the sink takes no more, or when entries and contents do not go together. After
     * that the archive is broken, and no call makes it look whole. */
    bool Begin(const ZipEntry& entry);
    /** A part of the content of the entry that was begun. */
    bool Write(const char* data, size_t size);
    /** False also when other than the announced number of bytes came. */
    bool End();
    bool Finish();

  private:
    struct Stored {
        ZipEntry entry;
        uint64_t offset;
        uint32_t checksum;
    };

    bool Put(const std::string& bytes);

    Sink sink_;
    uint64_t offset_;
    std::vector<Stored> stored_;
    uint64_t left_ = 0;
    bool broken_ = false;
};

}  // namespace web

#endif
