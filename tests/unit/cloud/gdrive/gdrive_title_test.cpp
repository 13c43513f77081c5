#include "cloud/gdrive/gdrive_title.h"

#include <gtest/gtest.h>

#include "core/json.h"
#include "support/seams.h"

namespace ZYROCloud::gdrive {
namespace {

const std::string kDate = "2015-03-02T10:11:12.000Z";
const std::string kWhole = "2015-03-02T10:11:12Z";

Json::Value Item(const std::string& title, const std::string& created = "") {
    Json::Value item;
    item["title"] = title;
    item["id"] = "1";
    if (!created.empty()) {
        item["createdDate"] = created;
    }
    return item;
}

TEST(GDriveTitle, ANameWithADateSearchesForBothAndTakesOnlyTheItemOfThatCreationTime) {
    const ShownTitle wanted("a - " + kDate + ".txt");
    EXPECT_EQ(wanted.Query(""), "title='a - " + kDate + ".txt' or title='a.txt'");
    EXPECT_TRUE(wanted.Means(Item("a.txt", kDate)));
    EXPECT_FALSE(wanted.Means(Item("a.txt", "2015-03-02T10:11:12.001Z")));
    EXPECT_FALSE(wanted.Means(Item("a.txt")));
    EXPECT_FALSE(wanted.Means(Item("a - " + kDate + ".txt")));
    EXPECT_FALSE(wanted.Means(Item("a - " + kDate + ".txt", kDate)));
}

TEST(GDriveTitle, ADocumentWithoutADateIsSearchedPlainTooButTakenOnlyWithoutACreationTime) {
    const ShownTitle wanted("Report.gdoc");
    EXPECT_EQ(wanted.Query(""), "title='Report.gdoc' or title='Report'");
    EXPECT_FALSE(wanted.Means(Item("Report", kDate)));
    EXPECT_TRUE(wanted.Means(Item("Report")));
    EXPECT_TRUE(wanted.Means(Item("Report.gdoc", kDate)));
}

TEST(GDriveTitle, ADocumentWithADateWithoutAFractionIsFoundByIt) {
    const ShownTitle wanted("Report - " + kWhole + ".gdoc");
    EXPECT_EQ(wanted.Query(""), "title='Report - " + kWhole + ".gdoc' or title='Report'");
    EXPECT_TRUE(wanted.Means(Item("Report", kWhole)));
    EXPECT_FALSE(wanted.Means(Item("Report - " + kWhole + ".gdoc")));
}

TEST(GDriveTitle, ADocumentWithAFractionInItsDateTakesTheFractionForTheExtension) {
    const ShownTitle wanted("Report - " + kDate + ".gdoc");
    EXPECT_EQ(wanted.Date(), "");
    EXPECT_EQ(wanted.Other(), "Report - " + kDate);
    EXPECT_EQ(wanted.Query(""),
              "title='Report - " + kDate + ".gdoc' or title='Report - " + kDate + "'");
    EXPECT_FALSE(wanted.Means(Item("Report", kDate)));
    EXPECT_TRUE(wanted.Means(Item("Report - " + kDate + ".gdoc", kDate)));
}

TEST(GDriveTitle, AnExtraConditionIsPutBehindBothTitlesWithoutBrackets) {
    EXPECT_EQ(ShownTitle("a.gform").Query("mimeType = 'x'"),
              "title='a.gform' or title='a' and (mimeType = 'x') and trashed=false");
    EXPECT_EQ(ShownTitle("a").Query("mimeType = 'x'"),
              "title='a' and (mimeType = 'x') and trashed=false");
    EXPECT_EQ(ShownTitle("a").Query(""), "title='a'");
}

TEST(GDriveTitle, ASingleQuoteIsSentEscapedAndADoubleQuoteComparesEscaped) {
    EXPECT_EQ(ShownTitle("it's").Query(""), "title='it\\'s'");
    EXPECT_TRUE(ShownTitle("it's").Means(Item("it's")));
    EXPECT_EQ(ShownTitle("a\"b").Query(""), "title='a\"b'");
    EXPECT_TRUE(ShownTitle("a\"b").Means(Item("a\\\"b")));
    EXPECT_FALSE(ShownTitle("a\"b").Means(Item("a\"b")));
    EXPECT_TRUE(ShownTitle("a\"b - " + kWhole + ".txt").Means(Item("a\\\"b.txt", kWhole)));
    EXPECT_EQ(ShownTitle("a\\b").Query(""), "title='a\\b'");
    EXPECT_TRUE(ShownTitle("a\\b").Means(Item("a\\b")));
}

TEST(GDriveTitle, TheFirstDashParts) {
    EXPECT_EQ(ShownTitle("a - b - " + kWhole).Other(), "");
    EXPECT_EQ(ShownTitle("a - " + kWhole + " - b").Other(), "");
    EXPECT_EQ(ShownTitle("a -" + kWhole).Other(), "");
    EXPECT_EQ(ShownTitle(" - " + kWhole + ".txt").Other(), "") << "nothing in front";
    EXPECT_EQ(ShownTitle(" - " + kWhole + ".gdoc").Other(), " - " + kWhole);
    EXPECT_EQ(ShownTitle("a - .txt").Other(), "");
    EXPECT_EQ(ShownTitle("a - ").Other(), "");
}

TEST(GDriveTitle, AnExtensionThatBeginsBeforeTheDateLeavesNoDate) {
    EXPECT_EQ(ShownTitle("v1.2 - " + kWhole).Other(), "");
    EXPECT_EQ(ShownTitle("v1.2 - " + kWhole + ".gdoc").Other(), "v1.2 - " + kWhole);
    EXPECT_EQ(ShownTitle("v1.2 - " + kWhole + ".txt").Other(), "v1.2.txt");
    EXPECT_EQ(ShownTitle(". - x").Other(), "");
}

TEST(GDriveTitle, ATitleThatEndsInADotIsFoundByItsDate) {
    const ShownTitle wanted("a - " + kWhole + ".");
    EXPECT_EQ(wanted.Other(), "a.");
    EXPECT_TRUE(wanted.Means(Item("a.", kWhole)));
}

TEST(GDriveTitle, DatesOfEveryMalformedKindAreNone) {
    for (const std::string& date : {std::string("yesterday"),
                                    std::string("2015"),
                                    std::string("2015-03-02"),
                                    std::string("2015-03-02T10:11:12"),
                                    std::string("2015-03-02 10:11:12Z"),
                                    std::string("2015-13-02T10:11:12Z"),
                                    std::string("2015-03-32T10:11:12Z"),
                                    std::string("2015-03-02T25:11:12Z"),
                                    std::string("2015-03-02T10:61:12Z"),
                                    std::string("2015-03-02T10:11:12z"),
                                    std::string("2015-03-02T10:11:12ZZ"),
                                    std::string("2015-03-02T10:11:12+24:00"),
                                    std::string("2015-03-02T10:11:12+"),
                                    std::string("-2015-03-02T10:11:12Z"),
                                    std::string("1425291072"),
                                    std::string("\xff\xfe"),
                                    std::string("2015-03-02T10:11:12Z\0", 21),
                                    std::string("\0", 1),
                                    std::string(4096, '9'),
                                    std::string("2015-03-02T10:11:12%s%nZ")}) {
        seams::Reset();
        const ShownTitle wanted("a - " + date + ".txt");
        EXPECT_EQ(wanted.Date(), "") << date;
        EXPECT_EQ(wanted.Other(), "") << date;
        EXPECT_TRUE(wanted.Means(Item("a - " + date + ".txt", "2015"))) << date;
        EXPECT_TRUE(seams::LoggedPart("Failed to parse ")) << date;
    }
}

TEST(GDriveTitle, DatesWithAnOffsetAreComparedAsTheServiceWroteThem) {
    const ShownTitle wanted("a - 2015-03-02T11:11:12+01:00.txt");
    EXPECT_TRUE(wanted.Means(Item("a.txt", "2015-03-02T11:11:12+01:00")));
    EXPECT_FALSE(wanted.Means(Item("a.txt", kWhole))) << "the same moment, another text";
}

TEST(GDriveTitle, ComparesExactly) {
    EXPECT_FALSE(ShownTitle("a").Means(Item("A")));
    EXPECT_FALSE(ShownTitle("a").Means(Item("a ")));
    EXPECT_FALSE(ShownTitle("\xc3\xa9").Means(Item("e\xcc\x81")));
    EXPECT_FALSE(ShownTitle("a").Means(Item("")));
    EXPECT_TRUE(ShownTitle("").Means(Item("")));
    for (const std::string& name :
         {std::string("\xff\xfe\x80"), std::string("\xf0\x9f\x98\x80 \xe2\x80\x8f"),
          std::string(4096, 'x'), std::string("a\0b", 3), std::string("%s%n.txt")}) {
        EXPECT_TRUE(ShownTitle(name).Means(Item(name))) << name;
        EXPECT_EQ(ShownTitle(name).Query(""), "title='" + name + "'");
    }
}

TEST(GDriveTitle, ValuesOfTheWrongTypeAreToldByException) {
    const ShownTitle wanted("a - " + kWhole + ".txt");
    for (const char* text : {R"({"title":{}})", R"({"title":[]})",
                             R"({"title":"a.txt","createdDate":{"x":1}})", "7", "[]"}) {
        Json::Value item;
        ASSERT_TRUE(ZYROVFS::json::fromString(item, text));
        EXPECT_THROW(wanted.Means(item), Json::Exception) << text;
    }
    Json::Value number;
    ASSERT_TRUE(ZYROVFS::json::fromString(number, R"({"title":7})"));
    EXPECT_TRUE(ShownTitle("7").Means(number));
}

}  // namespace
}  // namespace ZYROCloud::gdrive
