#include "cloud/relay_tail.h"

#include <gmock/gmock.h>
#include <zosplatform/error.h>

#include <algorithm>
#include <cstring>
#include <string>
#include <vector>

#include "support/relay_input.h"
#include "support/seams.h"

namespace ZYROCloud {
namespace {

using relay_input::Closing;
using relay_input::kBoundary;

constexpr size_t kTail = RelayTail::kSize;
const std::string kLine = std::string("\r\n") + kBoundary;

/** Gives `bytes` in pieces, then the end of the input, or a failure. */
class Request {
  public:
    explicit Request(std::string bytes, size_t piece = kTail, bool fails = false)
        : bytes_(std::move(bytes)), piece_(piece), fails_(fails) {}

    RelayTail::Reader Reader() {
        return [this](char* data, size_t size) -> ssize_t {
            const size_t n = std::min({size, piece_, bytes_.size() - at_});
            if (n == 0 && fails_) {
                return -1;
            }
            memcpy(data, bytes_.data() + at_, n);
            at_ += n;
            return static_cast<ssize_t>(n);
        };
    }
    size_t Taken() const { return at_; }

  private:
    const std::string bytes_;
    const size_t piece_;
    const bool fails_;
    size_t at_ = 0;
};

std::string TakeAll(RelayTail& tail, size_t want) {
    std::string file;
    std::string room(want, '\0');
    for (size_t n = 1; n > 0;) {
        n = tail.Take(room.data(), room.size());
        file.append(room, 0, n);
    }
    return file;
}

class RelayTails : public testing::Test {
  protected:
    void SetUp() override {
        seams::Reset();
        YLIBCErrSetEx(0, "test", 1);
    }
    RelayTail tail_;
};

TEST_F(RelayTails, TheFileEndsAtTheFirstBoundaryWhereverThatIs) {
    const std::string x(kTail - Closing().size(), 'x');
    const std::string half(kTail / 2, 'h');
    const struct {
        const char* what;
        std::string bytes;
        std::string file;
    } rows[] = {
        {"an empty file", Closing(), ""},
        {"one byte", "a" + Closing(), "a"},
        {"the closing line only begun", "abc" + kLine, "abc"},
        {"exactly as much as fits", x + Closing(), x},
        {"a boundary as its last bytes", std::string(kTail - kLine.size(), 'y') + kLine,
         std::string(kTail - kLine.size(), 'y')},
        {"fields behind the file", half + kLine + relay_input::Field("size", "7"), half},
        {"the boundary's text in the file", "abc" + kLine + "def" + Closing(), "abc"},
        {"the text without its line break", std::string("abc") + kBoundary + Closing(),
         std::string("abc") + kBoundary},
        {"half a boundary in front of a whole one", kLine.substr(0, 9) + Closing(),
         kLine.substr(0, 9)},
        {"line breaks in front", "a\r\n\r\n" + Closing(), "a\r\n\r\n"},
        {"NUL bytes", std::string("a\0b", 3) + Closing(), std::string("a\0b", 3)},
    };
    for (const auto& row : rows) {
        for (const size_t piece : {kTail, size_t{1000}, size_t{7}}) {
            Request request(row.bytes, piece);
            RelayTail tail;
            ASSERT_TRUE(tail.Load(row.bytes.size(), request.Reader())) << row.what;
            ASSERT_TRUE(tail.CutAt(kLine)) << row.what << seams::LogDump();
            EXPECT_EQ(tail.Left(), row.file.size()) << row.what;
            EXPECT_EQ(tail.Behind(), row.bytes.size() - row.file.size()) << row.what;
            EXPECT_TRUE(TakeAll(tail, 4096) == row.file) << row.what;
            EXPECT_EQ(tail.Left(), 0U);
        }
    }
}

TEST_F(RelayTails, WithoutTheBoundaryIsRefused) {
    const std::vector<std::string> rows = {"", "abc", kLine.substr(0, kLine.size() - 1),
                                           "\n" + std::string(kBoundary), std::string(kTail, '\r')};
    for (const std::string& bytes : rows) {
        seams::Reset();
        Request request(bytes);
        RelayTail tail;
        ASSERT_TRUE(tail.Load(bytes.size(), request.Reader()));
        EXPECT_FALSE(tail.CutAt(kLine)) << bytes.substr(0, 100);
        EXPECT_TRUE(seams::Logged("Can NOT find boundary(" + kLine + ")")) << seams::LogDump();
    }
}

TEST_F(RelayTails, CharactersOfPatternsInABoundaryMeanThemselves) {
    const std::string odd = "\r\n--.*[a-z]+(x|y)?\\d{2}^$";
    const std::string bytes = "\r\n--abc" + odd + "--\r\n";
    Request request(bytes);
    ASSERT_TRUE(tail_.Load(bytes.size(), request.Reader()));
    ASSERT_TRUE(tail_.CutAt(odd));
    EXPECT_EQ(TakeAll(tail_, 100), "\r\n--abc");
}

TEST_F(RelayTails, IsNotReadBeyondItsSize) {
    Request request(std::string(10, 'a') + Closing() + "the next request");
    ASSERT_TRUE(tail_.Load(10 + Closing().size(), request.Reader()));
    EXPECT_EQ(request.Taken(), 10 + Closing().size());
    RelayTail large;
    Request endless(std::string(3 * kTail, 'a'));
    ASSERT_TRUE(large.Load(2 * kTail, endless.Reader()));
    EXPECT_EQ(endless.Taken(), kTail);
    EXPECT_EQ(large.Left(), kTail);
}

TEST_F(RelayTails, ThatEndsEarlyIsRefusedEvenWithABoundaryInIt) {
    for (const size_t missing : {size_t{1}, size_t{5000}}) {
        seams::Reset();
        Request request("abc" + Closing());
        RelayTail tail;
        EXPECT_FALSE(tail.Load(3 + Closing().size() + missing, request.Reader()));
        EXPECT_TRUE(seams::Logged("The request ended " + std::to_string(missing) +
                                  " bytes before its length"))
            << seams::LogDump();
        EXPECT_EQ(YLIBCErrGet(), 0x3b00U);
        EXPECT_TRUE(tail.IsLoaded()) << "it is not tried again";
    }
}

TEST_F(RelayTails, ThatCannotBeReadIsRefused) {
    Request request(std::string(10, 'a'), kTail, true);
    EXPECT_FALSE(tail_.Load(100, request.Reader()));
    EXPECT_EQ(request.Taken(), 10U);
}

TEST_F(RelayTails, IsTakenInPiecesOfAnySize) {
    const std::string file = "0123456789";
    Request request(file + Closing());
    ASSERT_TRUE(tail_.Load(10 + Closing().size(), request.Reader()) && tail_.CutAt(kLine));
    char room[16] = "";
    EXPECT_EQ(tail_.Take(room, 0), 0U);
    EXPECT_EQ(tail_.Take(room, 3), 3U);
    EXPECT_EQ(tail_.Left(), 7U);
    EXPECT_EQ(std::string(room, 3), "012");
    EXPECT_EQ(tail_.Take(room, sizeof room), 7U);
    EXPECT_EQ(std::string(room, 7), "3456789");
    EXPECT_EQ(tail_.Take(room, sizeof room), 0U);
}

}  // namespace
}  // namespace ZYROCloud
