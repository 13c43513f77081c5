#include "support/driver_suite/source.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <unistd.h>

#include <utility>
#include <vector>

namespace driver_suite {
namespace {

ZYROVFS::UniqueFd MakeFile(const cloudsim::Content& content) {
    ZYROVFS::UniqueFd file(memfd_create("source", 0));
    std::vector<char> piece(1 << 20);
    uint64_t offset = 0;
    int64_t got = 0;
    while ((got = content.Read(offset, piece.data(), piece.size())) > 0) {
        EXPECT_EQ(write(file.Get(), piece.data(), static_cast<size_t>(got)), got);
        offset += static_cast<uint64_t>(got);
    }
    lseek(file.Get(), 0, SEEK_SET);
    return file;
}

}  // namespace

Source::Source(long long bytes) : size(bytes) {
    const auto content = cloudsim::MakePattern(static_cast<uint64_t>(bytes), 7);
    file = MakeFile(*content);
    sum = content->Sha1();
}

Source::Source(const std::string& text) : size(static_cast<long long>(text.size())) {
    const auto content = cloudsim::MakeBytes(text);
    file = MakeFile(*content);
    sum = content->Sha1();
}

BrowserFile::BrowserFile(long long bytes, const std::string& behind) : size(bytes) {
    Source file(bytes);
    const std::string rest = std::string("\r\n") + kBoundary + behind;
    EXPECT_EQ(pwrite(file.file.Get(), rest.data(), rest.size(), bytes),
              static_cast<ssize_t>(rest.size()));
    request = std::move(file.file);
    total = static_cast<unsigned long long>(bytes) + rest.size();
    sum = file.sum;
}

Target::Target() : file(memfd_create("target", 0)) {}

std::string Target::Text() const {
    return cloudsim::MakeFile(file.Get())->Bytes();
}

std::string Target::Sum() const {
    return cloudsim::MakeFile(file.Get())->Sha1();
}

void Target::Clear() {
    EXPECT_EQ(ftruncate(file.Get(), 0), 0);
    lseek(file.Get(), 0, SEEK_SET);
}

int User::Cancel() {
    asked++;
    return wants_to_stop && wants_to_stop() ? 1 : 0;
}

int User::Progress(unsigned long long, unsigned long long so_far) {
    done = so_far;
    return 0;
}

void User::Reset() {
    wants_to_stop = nullptr;
    asked = 0;
    done = 0;
}

}  // namespace driver_suite
