#include "cloud/onedrive/fragment_cursor.h"

#include <gmock/gmock.h>

#include <utility>
#include <vector>

namespace ZYROCloud::onedrive {
namespace {

using Ranges = std::vector<std::pair<long long, long long>>;

/** What the service says of an attempt: the bytes that it has (0 for no word), and whether it
 * took the attempt. */
struct Said {
    long long received;
    bool taken;
};

struct Row {
    const char* what;
    long long has;  ///< before the fragment
    long long length;
    std::vector<Said> said;
    Ranges sent;  ///< first byte and count of each attempt
    long long offset;
    bool elsewhere;  ///< whether the source has to be read again from there
};

constexpr long long kTotal = 100;

/** The attempts of one fragment, as the driver makes them. */
class Conversation {
  public:
    explicit Conversation(const Row& row) : row_(row), cursor_(kTotal) {
        cursor_.MoveTo(row.has);
        cursor_.SourceIsAtOffset();
        cursor_.BeginFragment(row.length);
    }

    void Run() {
        Repeat(row_.length);
        const long long rest = cursor_.RestOfFragment(last_);
        if (rest != 0) {
            cursor_.SourceIsAtOffset();
            Repeat(rest);
        }
    }

    Ranges sent;
    const FragmentCursor& Cursor() const { return cursor_; }

  private:
    void Repeat(long long length) {
        while (next_ < row_.said.size()) {
            const long long size = cursor_.BeginAttempt(length);
            if (size == 0) {
                return;
            }
            const Said said = row_.said[next_++];
            sent.emplace_back(cursor_.Offset(), size);
            last_ = said.received;
            cursor_.MoveTo(OffsetBehind(cursor_.Offset(), size, said.received));
            if (said.taken) {
                return;
            }
            cursor_.AdoptServerOffset(said.received);
            cursor_.SourceIsAtOffset();
        }
    }

    const Row& row_;
    FragmentCursor cursor_;
    size_t next_ = 0;
    long long last_ = 0;
};

const Row kRows[] = {
    {"the first", 0, 40, {{40, true}}, {{0, 40}}, 40, false},
    {"one in the middle", 40, 40, {{80, true}}, {{40, 40}}, 80, false},
    {"the last, which is shorter", 80, 40, {{100, true}}, {{80, 20}}, 100, false},
    {"stored short", 40, 40, {{50, true}}, {{40, 40}}, 50, true},
    {"stored short of what was there before", 40, 40, {{30, true}}, {{40, 40}}, 30, true},
    {"a claim of more than was sent", 40, 40, {{81, true}}, {{40, 40}}, 80, false},
    {"no receipt", 40, 40, {{0, true}}, {{40, 40}}, 0, true},
    {"failed where it began", 40, 40, {{40, false}, {80, true}}, {{40, 40}, {40, 40}}, 80, false},
    {"failed half-way: the repeat goes further",
     40,
     40,
     {{50, false}, {90, true}},
     {{40, 40}, {50, 40}},
     90,
     false},
    {"failed half-way at the end of the file",
     80,
     20,
     {{90, false}, {100, true}},
     {{80, 20}, {90, 10}},
     100,
     false},
    {"failed, and all is there", 40, 40, {{80, false}}, {{40, 40}}, 80, false},
    {"a wrong range: the service is further back",
     40,
     40,
     {{35, false}, {75, true}},
     {{40, 40}, {35, 40}},
     75,
     false},
    {"without a word: again from the start, then the fragment",
     40,
     40,
     {{0, false}, {40, true}, {80, true}},
     {{40, 40}, {0, 40}, {40, 40}},
     80,
     false},
    {"without a word, and half is there",
     40,
     40,
     {{0, false}, {60, true}, {80, true}},
     {{40, 40}, {0, 40}, {60, 20}},
     80,
     false},
    {"without a word, and all is there",
     40,
     40,
     {{0, false}, {80, true}},
     {{40, 40}, {0, 40}},
     80,
     true},
    {"without a word, and then a claim of more than the fragment",
     40,
     40,
     {{0, false}, {99, true}},
     {{40, 40}, {0, 40}},
     80,
     true},
    {"without a word, and nothing is there",
     40,
     40,
     {{0, false}, {0, true}},
     {{40, 40}, {0, 40}},
     0,
     true},
};

TEST(FragmentCursor, SendsWhatTheServiceLacksAndNothingBeyondTheFile) {
    for (const Row& row : kRows) {
        Conversation talk(row);
        talk.Run();
        EXPECT_EQ(talk.sent, row.sent) << row.what;
        EXPECT_EQ(talk.Cursor().Offset(), row.offset) << row.what;
        EXPECT_EQ(talk.Cursor().IsSourceElsewhere(), row.elsewhere) << row.what;
        EXPECT_EQ(talk.Cursor().IsWhole(), row.offset >= kTotal) << row.what;
    }
}

TEST(FragmentCursor, OfAnEmptyFileIsWholeFromTheStart) {
    FragmentCursor cursor(0);
    EXPECT_TRUE(cursor.IsWhole());
    cursor.BeginFragment(40);
    EXPECT_EQ(cursor.BeginAttempt(40), 0);
}

}  // namespace
}  // namespace ZYROCloud::onedrive
