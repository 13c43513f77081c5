#include <gtest/gtest.h>
#include <zosplatform/text.h>

#include <string>
#include <vector>

namespace {

int Sign(int value) {
    return (value > 0) - (value < 0);
}

int Compare(const char* a, const char* b) {
    const int order = Sign(YLIBCUnicodeUTF8StrCaseCmp(a, b));
    EXPECT_EQ(Sign(YLIBCUnicodeUTF8StrCaseCmp(b, a)), -order) << a << " " << b;
    return order;
}

TEST(StrTok, CutsAtRunsOfDelimiters) {
    char text[] = "\tjob\t\t12\n";
    char* rest = nullptr;
    EXPECT_STREQ(YLIBCStrTok(text, "\t\n", &rest), "job");
    EXPECT_STREQ(YLIBCStrTok(nullptr, "\t\n", &rest), "12");
    EXPECT_EQ(YLIBCStrTok(nullptr, "\t\n", &rest), nullptr);
    EXPECT_EQ(YLIBCStrTok(nullptr, "\t\n", &rest), nullptr);
}

TEST(StrTok, NothingToCutGivesNothing) {
    char text[] = "";
    char* rest = nullptr;
    EXPECT_EQ(YLIBCStrTok(nullptr, "\t", &rest), nullptr);
    EXPECT_EQ(YLIBCStrTok(text, "\t", &rest), nullptr);
    EXPECT_EQ(YLIBCStrTok(text, nullptr, &rest), nullptr);
    EXPECT_EQ(YLIBCStrTok(text, "\t", nullptr), nullptr);
}

TEST(UTF8StrCaseCmp, IgnoresCaseOfAllLetters) {
    EXPECT_EQ(Compare("FileServer", "fILEsERVER"), 0);
    EXPECT_EQ(Compare("\xc3\x89t\xc3\xa9", "\xc3\xa9T\xc3\x89"), 0);  // Ete
    EXPECT_EQ(Compare("\xce\xa3", "\xcf\x83"), 0);                    // sigma
    EXPECT_EQ(Compare("stra\xc3\x9f"
                      "e",
                      "STRASSE"),
              0);                                                   // sharp s
    EXPECT_EQ(Compare("\xf0\x90\x90\x80", "\xf0\x90\x90\xa8"), 0);  // Deseret
}

TEST(UTF8StrCaseCmp, OrdersTexts) {
    EXPECT_EQ(Compare("a", "B"), -1);
    EXPECT_EQ(Compare("A", "b"), -1);
    EXPECT_EQ(Compare("ab", "a"), 1);
    EXPECT_EQ(Compare("", "a"), -1);
    EXPECT_EQ(Compare("", ""), 0);
    EXPECT_EQ(Compare("z", "\xc3\xa9"), -1);
}

TEST(UTF8StrCaseCmp, NullSortsFirst) {
    EXPECT_EQ(Compare(nullptr, ""), -1);
    EXPECT_EQ(Compare(nullptr, nullptr), 0);
}

TEST(UTF8StrCaseCmp, BytesThatAreNoUtf8CompareAsBytes) {
    EXPECT_EQ(Compare("\xff", "\xfe"), 1);
    EXPECT_EQ(Compare("a\xff", "A\xff"), 0);
    EXPECT_EQ(Compare("\xc3", "\xc3\xa9"), -1);
    EXPECT_EQ(Compare("a\xffZ", "a\xffz"), 0);
}

TEST(UTF8StrCaseCmp, IsAnOrderOverTextsOfAllKinds) {
    const std::vector<const char*> texts = {
        "",  "Z",    "a\xff",        "b",         "M\xff", "\xff", "a", "\xc3\xa9", "\xc3\x89\xfe",
        "B", "\xc3", "\xed\xa0\x80", "a\xc3\xa9", "AB"};
    for (const char* a : texts) {
        for (const char* b : texts) {
            for (const char* c : texts) {
                if (Compare(a, b) <= 0 && Compare(b, c) <= 0) {
                    EXPECT_LE(Compare(a, c), 0) << a << " " << b << " " << c;
                }
            }
        }
    }
}

TEST(UTF8StrCaseCmp, LargeTexts) {
    const std::string large(1 << 20, 'x');
    EXPECT_EQ(Compare((large + "\xc3\x89").c_str(), (large + "\xc3\xa9").c_str()), 0);
    EXPECT_EQ(Compare((large + "a").c_str(), (large + "B").c_str()), -1);
}

}  // namespace
