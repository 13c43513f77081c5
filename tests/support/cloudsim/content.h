/** What files hold: bytes in memory, a file, a made-up pattern, or nothing but size and hash. */
#ifndef ZYROVFS_TESTS_CLOUDSIM_CONTENT_H
#define ZYROVFS_TESTS_CLOUDSIM_CONTENT_H

#include <cstdint>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

namespace cloudsim {

/** Never changes once made; any thread may read. */
class Content {
  public:
    virtual ~Content() = default;
    virtual uint64_t Size() const = 0;
    /** Reads up to `size` bytes, 0 at the end; -1 when the content cannot be read (any more). */
    virtual int64_t Read(uint64_t offset, char* to, size_t size) const = 0;
    /** Hex. */
    virtual std::string Sha1() const = 0;

    std::string Bytes() const;
};
using ContentPtr = std::shared_ptr<const Content>;

/** Takes the bytes of an upload. What is not finished leaves nothing behind. */
class Sink {
  public:
    virtual ~Sink() = default;
    virtual bool Write(const char* data, size_t size) = 0;
    virtual ContentPtr Finish() = 0;
};

/** What becomes of uploaded bytes. */
struct Storage {
    enum class Kind { kMemory, kFolder, kCountOnly };
    Kind kind = Kind::kMemory;
    std::string folder;  ///< for kFolder: unnamed files in it hold the bytes
};
/** Without `hash` the sum is made when it is asked for; one that only counts has none then. */
std::unique_ptr<Sink> MakeSink(const Storage& storage, bool hash = true);

ContentPtr MakeBytes(std::string bytes);
/**
 * Takes no memory: 8 bytes of block number at the start of each MiB, and between them bytes that
 * depend on place and `seed`, so that no two places of a file look alike.
 */
ContentPtr MakePattern(uint64_t size, unsigned seed = 0);
/** Reads from an open file; keeps a descriptor of its own. Null when it isn't a regular file. */
ContentPtr MakeFile(int fd);
ContentPtr MakeFile(const std::string& path);
/** One after the other. */
ContentPtr MakeJoined(std::vector<ContentPtr> pieces);

}  // namespace cloudsim

#endif
