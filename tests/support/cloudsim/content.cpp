#include "support/cloudsim/content.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <vector>

#include "support/cloudsim/sha1.h"

namespace cloudsim {
namespace {

constexpr size_t kPiece = 128 * 1024;
constexpr uint64_t kBlock = 1024 * 1024;

/** The sum is made when it is first asked for, or taken from who made the content. */
class Summed : public Content {
  public:
    explicit Summed(std::string sum = "") : sum_(std::move(sum)) {}
    std::string Sha1() const override {
        const std::lock_guard<std::mutex> lock(mutex_);
        if (sum_.empty()) {
            sum_ = Compute();
        }
        return sum_;
    }

  private:
    std::string Compute() const {
        class Sha1 sum;
        std::vector<char> piece(kPiece);
        uint64_t offset = 0;
        int64_t got = 0;
        while ((got = Read(offset, piece.data(), piece.size())) > 0) {
            sum.Add(piece.data(), static_cast<size_t>(got));
            offset += static_cast<uint64_t>(got);
        }
        return sum.Hex();
    }

    mutable std::mutex mutex_;
    mutable std::string sum_;
};

class MemoryContent : public Summed {
  public:
    MemoryContent(std::string bytes, std::string sum)
        : Summed(std::move(sum)), bytes_(std::move(bytes)) {}
    uint64_t Size() const override { return bytes_.size(); }
    int64_t Read(uint64_t offset, char* to, size_t size) const override {
        return offset >= bytes_.size() ? 0 : static_cast<int64_t>(bytes_.copy(to, size, offset));
    }

  private:
    const std::string bytes_;
};

class PatternContent : public Summed {
  public:
    PatternContent(uint64_t size, unsigned seed) : size_(size), block_(Block(seed)) {}
    uint64_t Size() const override { return size_; }
    int64_t Read(uint64_t offset, char* to, size_t size) const override {
        size_t done = 0;
        size = offset < size_ ? std::min<uint64_t>(size, size_ - offset) : 0;
        while (done < size) {
            const uint64_t place = offset + done, within = place % kBlock;
            const size_t part = std::min<uint64_t>(size - done, kBlock - within);
            memcpy(to + done, block_->data() + within, part);
            if (within < sizeof place) {
                const uint64_t number = place / kBlock;
                memcpy(to + done, reinterpret_cast<const char*>(&number) + within,
                       std::min<size_t>(part, sizeof number - within));
            }
            done += part;
        }
        return static_cast<int64_t>(size);
    }

  private:
    using Bytes = std::vector<char>;
    static std::shared_ptr<const Bytes> Block(unsigned seed) {
        static std::mutex mutex;
        static std::vector<std::pair<unsigned, std::shared_ptr<const Bytes>>> made;
        const std::lock_guard<std::mutex> lock(mutex);
        for (const auto& [of, block] : made) {
            if (of == seed) {
                return block;
            }
        }
        auto block = std::make_shared<Bytes>(kBlock);
        uint64_t state = seed * 0x9e3779b97f4a7c15U + 1;
        for (char& byte : *block) {
            state = state * 6364136223846793005U + 1442695040888963407U;
            byte = static_cast<char>(state >> 56);
        }
        made.emplace_back(seed, block);
        return block;
    }

    const uint64_t size_;
    const std::shared_ptr<const Bytes> block_;
};

class FileContent : public Summed {
  public:
    FileContent(int fd, uint64_t size, std::string sum)
        : Summed(std::move(sum)), fd_(fd), size_(size) {}
    FileContent(const FileContent&) = delete;
    FileContent& operator=(const FileContent&) = delete;
    ~FileContent() override { close(fd_); }
    uint64_t Size() const override { return size_; }
    int64_t Read(uint64_t offset, char* to, size_t size) const override {
        return pread(fd_, to, size, static_cast<off_t>(offset));
    }

  private:
    const int fd_;
    const uint64_t size_;
};

class JoinedContent : public Summed {
  public:
    explicit JoinedContent(std::vector<ContentPtr> pieces) : pieces_(std::move(pieces)) {
        for (const ContentPtr& piece : pieces_) {
            ends_.push_back(Size() + piece->Size());
        }
    }
    uint64_t Size() const override { return ends_.empty() ? 0 : ends_.back(); }
    int64_t Read(uint64_t offset, char* to, size_t size) const override {
        const auto end = std::upper_bound(ends_.begin(), ends_.end(), offset);
        if (end == ends_.end()) {
            return 0;
        }
        const Content& piece = *pieces_[static_cast<size_t>(end - ends_.begin())];
        return piece.Read(offset - (*end - piece.Size()), to, size);
    }

  private:
    const std::vector<ContentPtr> pieces_;
    std::vector<uint64_t> ends_;
};

class CountedContent : public Content {
  public:
    CountedContent(uint64_t size, std::string sum) : size_(size), sum_(std::move(sum)) {}
    uint64_t Size() const override { return size_; }
    int64_t Read(uint64_t, char*, size_t) const override { return -1; }
    std::string Sha1() const override { return sum_; }

  private:
    const uint64_t size_;
    const std::string sum_;
};

class CountingSink : public Sink {
  public:
    explicit CountingSink(bool hash) : hash_(hash) {}
    bool Write(const char* data, size_t size) override {
        if (hash_) {
            sum_.Add(data, size);
        }
        size_ += size;
        return true;
    }
    ContentPtr Finish() override { return std::make_shared<CountedContent>(size_, Sum()); }

  protected:
    std::string Sum() { return hash_ ? sum_.Hex() : ""; }
    uint64_t size_ = 0;

  private:
    const bool hash_;
    Sha1 sum_;
};

class MemorySink : public CountingSink {
  public:
    using CountingSink::CountingSink;
    bool Write(const char* data, size_t size) override {
        bytes_.append(data, size);
        return CountingSink::Write(data, size);
    }
    ContentPtr Finish() override {
        return std::make_shared<MemoryContent>(std::move(bytes_), Sum());
    }

  private:
    std::string bytes_;
};

class FolderSink : public CountingSink {
  public:
    FolderSink(const std::string& folder, bool hash) : CountingSink(hash) {
        std::string name = folder + "/.upload-XXXXXX";
        fd_ = mkostemp(name.data(), O_CLOEXEC);
        if (fd_ >= 0) {
            unlink(name.c_str());
        }
    }
    FolderSink(const FolderSink&) = delete;
    FolderSink& operator=(const FolderSink&) = delete;
    ~FolderSink() override {
        if (fd_ >= 0) {
            close(fd_);
        }
    }
    bool Write(const char* data, size_t size) override {
        size_t done = 0;
        while (fd_ >= 0 && done < size) {
            const ssize_t wrote = write(fd_, data + done, size - done);
            if (wrote <= 0) {
                return false;
            }
            done += static_cast<size_t>(wrote);
        }
        return fd_ >= 0 && CountingSink::Write(data, size);
    }
    ContentPtr Finish() override {
        const int fd = fd_;
        fd_ = -1;
        return fd < 0 ? nullptr : std::make_shared<FileContent>(fd, size_, Sum());
    }

  private:
    int fd_;
};

}  // namespace

Sha1::Sha1() : context_(EVP_MD_CTX_new(), EVP_MD_CTX_free) {
    if (context_ == nullptr || EVP_DigestInit_ex(context_.get(), EVP_sha1(), nullptr) != 1) {
        abort();
    }
}

void Sha1::Add(const char* data, size_t size) {
    EVP_DigestUpdate(context_.get(), data, size);
}

std::string Sha1::Hex() {
    static const char kDigits[] = "0123456789abcdef";
    std::array<unsigned char, EVP_MAX_MD_SIZE> sum{};
    unsigned length = 0;
    EVP_DigestFinal_ex(context_.get(), sum.data(), &length);
    std::string hex;
    for (unsigned i = 0; i < length; i++) {
        hex += {kDigits[sum[i] >> 4], kDigits[sum[i] & 15]};
    }
    return hex;
}

std::string Content::Bytes() const {
    std::string bytes(Size(), '\0');
    size_t done = 0;
    int64_t got = 0;
    while (done < bytes.size() &&
           (got = Read(done, bytes.data() + done, bytes.size() - done)) > 0) {
        done += static_cast<size_t>(got);
    }
    bytes.resize(done);
    return bytes;
}

std::unique_ptr<Sink> MakeSink(const Storage& storage, bool hash) {
    switch (storage.kind) {
        case Storage::Kind::kMemory:
            return std::make_unique<MemorySink>(hash);
        case Storage::Kind::kFolder:
            return std::make_unique<FolderSink>(storage.folder, hash);
        default:
            return std::make_unique<CountingSink>(hash);
    }
}

ContentPtr MakeBytes(std::string bytes) {
    return std::make_shared<MemoryContent>(std::move(bytes), "");
}

ContentPtr MakePattern(uint64_t size, unsigned seed) {
    return std::make_shared<PatternContent>(size, seed);
}

ContentPtr MakeFile(int fd) {
    struct stat status {};
    const int copy = fcntl(fd, F_DUPFD_CLOEXEC, 0);
    if (copy < 0 || fstat(copy, &status) != 0 || !S_ISREG(status.st_mode)) {
        close(copy);
        return nullptr;
    }
    return std::make_shared<FileContent>(copy, static_cast<uint64_t>(status.st_size), "");
}

ContentPtr MakeFile(const std::string& path) {
    const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
    if (fd < 0) {
        return nullptr;
    }
    ContentPtr content = MakeFile(fd);
    close(fd);
    return content;
}

ContentPtr MakeJoined(std::vector<ContentPtr> pieces) {
    return pieces.size() == 1 ? pieces.front() : std::make_shared<JoinedContent>(std::move(pieces));
}

}  // namespace cloudsim
