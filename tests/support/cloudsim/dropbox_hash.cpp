#include "support/cloudsim/dropbox_hash.h"

#include <openssl/sha.h>

#include <array>
#include <vector>

namespace cloudsim::dropbox {
namespace {

constexpr size_t kBlock = 4 * 1024 * 1024;

using Sum = std::array<unsigned char, SHA256_DIGEST_LENGTH>;

Sum SumOf(const char* data, size_t size) {
    Sum sum{};
    SHA256(reinterpret_cast<const unsigned char*>(data), size, sum.data());
    return sum;
}

/** Fills as much of the block as there is; false when reading fails. */
bool ReadBlock(const Content& content, uint64_t offset, std::vector<char>& block) {
    const uint64_t left = content.Size() - offset;
    block.resize(left < kBlock ? left : kBlock);
    for (size_t done = 0; done < block.size();) {
        const int64_t got = content.Read(offset + done, block.data() + done, block.size() - done);
        if (got <= 0) {
            return false;
        }
        done += static_cast<size_t>(got);
    }
    return true;
}

}  // namespace

std::string ContentHash(const Content& content) {
    static const char kDigits[] = "0123456789abcdef";
    std::string sums;
    std::vector<char> block;
    for (uint64_t offset = 0; offset < content.Size(); offset += block.size()) {
        if (!ReadBlock(content, offset, block)) {
            return "";
        }
        const Sum sum = SumOf(block.data(), block.size());
        sums.append(sum.begin(), sum.end());
    }
    std::string hex;
    for (const unsigned char byte : SumOf(sums.data(), sums.size())) {
        hex += {kDigits[byte >> 4], kDigits[byte & 15]};
    }
    return hex;
}

}  // namespace cloudsim::dropbox
