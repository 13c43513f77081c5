#include <stdexcept>

#include "unit/http/http_fixture.h"

namespace ZYROCloud {
namespace {

size_t Store(std::string line, Json::Value& headers) {
    return APIHandler::WriteHeaderToJsonValue(line.data(), 1, line.size(), &headers);
}

TEST(Callback, AHeaderLineIsNameAndTheTextTwoBehindTheColonWithoutItsEnd) {
    Json::Value headers(Json::objectValue);
    EXPECT_EQ(Store("Name: value\r\n", headers), 13U);
    EXPECT_EQ(Store("Tab:\tvalue: more\r\n", headers), 18U);
    EXPECT_EQ(Store("NoBlank:value\r\n", headers), 15U);
    EXPECT_EQ(Store("Empty: \r\n", headers), 9U);
    EXPECT_EQ(Store("One:x\r\n", headers), 7U);
    EXPECT_EQ(Store(": nameless\r\n", headers), 12U);
    EXPECT_EQ(headers, Parsed(R"({"Name":"value","Tab":"value: more","NoBlank":"alue","Empty":"",
                                  "One":"","":"nameless"})"));
}

TEST(Callback, ALineWithoutAColonStoresNothing) {
    Json::Value headers(Json::objectValue);
    for (const std::string line : {"HTTP/1.1 200 OK\r\n", "\r\n", "", "x"}) {
        EXPECT_EQ(Store(line, headers), line.size());
    }
    EXPECT_TRUE(headers.empty());
}

TEST(Callback, ANameAndAColonWithNothingBehindIsOutOfRange) {
    Json::Value headers(Json::objectValue);
    for (const char* line : {"Name:\r\n", ":\r\n", "Name:\n", "Name:", ":", "a:b", "a:bc"}) {
        EXPECT_THROW(Store(line, headers), std::out_of_range) << line;
    }
    EXPECT_TRUE(headers.empty());
}

TEST(Callback, BytesOfANameAndOfAValueStayAsTheyAre) {
    Json::Value headers(Json::objectValue);
    const std::string line("N\0\xff: \0\xfe\x01\r\n", 10);
    EXPECT_EQ(Store(line, headers), 10U);
    EXPECT_EQ(headers.getMemberNames(), std::vector<std::string>{std::string("N\0\xff", 3)});
    EXPECT_EQ(headers[std::string("N\0\xff", 3)].asString(), std::string("\0\xfe\x01", 3));
}

TEST(Callback, BodiesAreAppendedOrDropped) {
    std::string body = "a";
    char piece[] = "bcd";
    EXPECT_EQ(APIHandler::WriteToStrBuf(piece, 1, 3, &body), 3U);
    EXPECT_EQ(APIHandler::WriteToStrBuf(piece, 3, 1, &body), 3U);
    EXPECT_EQ(body, "abcdbcd");
    EXPECT_EQ(APIHandler::MutedWriteCallback(piece, 2, 7, nullptr), 14U);
}

TEST(Callback, ABodyThatWouldGrowBeyondTheLongestAnswerEndsTheTransfer) {
    std::string body(kLongestAnswer - 3, 'x');
    char piece[] = "bcd";
    EXPECT_EQ(APIHandler::WriteToStrBuf(piece, 1, 3, &body), 3U);
    EXPECT_EQ(APIHandler::WriteToStrBuf(piece, 1, 1, &body), 0U);
    EXPECT_EQ(body.size(), kLongestAnswer);
    body += "more";
    EXPECT_EQ(APIHandler::WriteToStrBuf(piece, 1, 1, &body), 0U);
}

TEST(Callback, TheDebugSinkKeepsTextAndNamesTheOthers) {
    std::string out;
    char text[] = "told";
    for (int type = CURLINFO_TEXT; type <= CURLINFO_SSL_DATA_OUT; ++type) {
        EXPECT_EQ(
            APIHandler::WriteToDebugStr(nullptr, static_cast<curl_infotype>(type), text, 4, &out),
            0);
    }
    EXPECT_EQ(out, "told\n<= Recv header\n=> Send header\n<= Recv data\n=> Send data\n");
}

}  // namespace
}  // namespace ZYROCloud
