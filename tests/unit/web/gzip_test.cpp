#include "gzip.h"

#include <gtest/gtest.h>
#include <zlib.h>

namespace web {
namespace {

std::string Unpacked(const std::string& packed, size_t size) {
    z_stream stream{};
    std::string text(size + 1, '\0');
    EXPECT_EQ(Z_OK, inflateInit2(&stream, 15 + 16));
    stream.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(packed.data()));
    stream.avail_in = static_cast<uInt>(packed.size());
    stream.next_out = reinterpret_cast<Bytef*>(text.data());
    stream.avail_out = static_cast<uInt>(text.size());
    EXPECT_EQ(Z_STREAM_END, inflate(&stream, Z_FINISH));
    text.resize(stream.total_out);
    inflateEnd(&stream);
    return text;
}

TEST(Gzip, OfAnyTextIsThatTextAgain) {
    std::string mixed;
    for (unsigned state = 1; mixed.size() < 300000; state = state * 1103515245 + 12345) {
        mixed += static_cast<char>(state >> 16);
    }
    for (const std::string& text :
         {std::string(), std::string("{}"), std::string(1000000, 'x'), mixed}) {
        const std::string packed = Gzip(text);
        EXPECT_NE("", packed);
        EXPECT_TRUE(Unpacked(packed, text.size()) == text) << text.size();
    }
    EXPECT_LT(Gzip(std::string(1000000, 'x')).size(), 10000U);
}

TEST(Gzip, IsForThoseWhoTakeIt) {
    EXPECT_TRUE(TakesGzip("gzip"));
    EXPECT_TRUE(TakesGzip("br, gzip, deflate"));
    EXPECT_FALSE(TakesGzip(nullptr));
    EXPECT_FALSE(TakesGzip(""));
    EXPECT_FALSE(TakesGzip("br"));
    EXPECT_FALSE(TakesGzip("identity, gzip;q=0"));
}

}  // namespace
}  // namespace web
