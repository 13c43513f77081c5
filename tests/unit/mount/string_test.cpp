#include <gtest/gtest.h>

#include <string>

#include "support/seams.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS::Utils {
namespace {

TEST(ConvString, ConvertsBetweenCharacterSets) {
    std::string out;
    EXPECT_TRUE(ConvString(out, "\xE4\xBD\xA0\xE5\xA5\xBD.txt", "UTF-8", "BIG5"));
    EXPECT_EQ(out, "\xA7\x41\xA6\x6E.txt");
    EXPECT_TRUE(ConvString(out, "\xA7\x41\xA6\x6E.txt", "BIG5", "UTF-8"));
    EXPECT_EQ(out, "\xE4\xBD\xA0\xE5\xA5\xBD.txt");
    EXPECT_TRUE(seams::LogLines().empty()) << seams::LogDump();
}

TEST(ConvString, EqualSetsCopyWithoutLookingAtTheBytes) {
    std::string out;
    EXPECT_TRUE(ConvString(out, "\xff\xfe", "UTF-8", "UTF-8"));
    EXPECT_EQ(out, "\xff\xfe");
    EXPECT_TRUE(ConvString(out, "abc", "NO-SUCH-SET", "NO-SUCH-SET"));
    EXPECT_EQ(out, "abc");
    EXPECT_TRUE(ConvString(out, "", "UTF-8", "UTF-8"));
    EXPECT_EQ(out, "");
}

TEST(ConvString, SetsAreComparedOverTheLengthOfTheFirst) {
    std::string out;
    EXPECT_TRUE(ConvString(out, "abc", "UTF-8", "UTF-8-VARIANT"));
    EXPECT_EQ(out, "abc");
    EXPECT_FALSE(ConvString(out, "abc", "UTF-8-VARIANT", "UTF-8"));
}

TEST(ConvString, NullIsRefused) {
    std::string out = "as it was";
    EXPECT_FALSE(ConvString(out, nullptr, "UTF-8", "BIG5"));
    EXPECT_FALSE(ConvString(out, "a", nullptr, "BIG5"));
    EXPECT_FALSE(ConvString(out, "a", "UTF-8", nullptr));
    EXPECT_EQ(out, "as it was");
}

TEST(ConvString, UnknownSetLeavesTheTextUnchanged) {
    std::string out;
    EXPECT_FALSE(ConvString(out, "abc", "UTF-8", "NO-SUCH-SET"));
    EXPECT_EQ(out, "abc");
    EXPECT_TRUE(seams::Logged("Failed exec iconv open from:UTF-8 to:NO-SUCH-SET"))
        << seams::LogDump();
}

TEST(ConvString, TextThatDoesNotConvertIsLeftUnchanged) {
    std::string out;
    EXPECT_FALSE(ConvString(out, "\xE4\xBD\xA0", "UTF-8", "ISO-8859-1"));
    EXPECT_EQ(out, "\xE4\xBD\xA0");
    EXPECT_TRUE(seams::Logged("Failed to convert \xE4\xBD\xA0 from UTF-8 to ISO-8859-1"))
        << seams::LogDump();
    EXPECT_FALSE(ConvString(out, "ab\xE4\xBD", "UTF-8", "BIG5"));
    EXPECT_EQ(out, "ab\xE4\xBD") << "a character that is cut short";
}

TEST(ConvString, ResultOf4096BytesFitsAndOneMoreDoesNot) {
    std::string out;
    const std::string fits(4096, 'a');
    EXPECT_TRUE(ConvString(out, fits.c_str(), "ISO-8859-1", "UTF-8"));
    EXPECT_EQ(out, fits);
    const std::string more(4097, 'a');
    EXPECT_FALSE(ConvString(out, more.c_str(), "ISO-8859-1", "UTF-8"));
    EXPECT_EQ(out, more);
    const std::string grows(2049, '\xE4');
    EXPECT_FALSE(ConvString(out, grows.c_str(), "ISO-8859-1", "UTF-8"));
    EXPECT_EQ(out, grows);
}

TEST(ConvString, TextMayBeConvertedInPlace) {
    std::string text = "\xE4\xBD\xA0";
    EXPECT_TRUE(ConvString(text, text.c_str(), "UTF-8", "BIG5"));
    EXPECT_EQ(text, "\xA7\x41");
    text = std::string(5000, 'x');
    EXPECT_FALSE(ConvString(text, text.c_str(), "UTF-8", "BIG5"));
    EXPECT_EQ(text, std::string(5000, 'x'));
}

TEST(ConvString, ManyFailuresLeakNothing) {
    std::string out;
    for (int i = 0; i < 2000; ++i) {
        EXPECT_FALSE(ConvString(out, "\xff", "UTF-8", "BIG5"));
    }
}

}  // namespace
}  // namespace ZYROVFS::Utils
