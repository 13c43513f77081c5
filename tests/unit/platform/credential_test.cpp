#include <gmock/gmock.h>
#include <zosplatform/credential.h>
#include <zosplatform/error.h>

#include <algorithm>
#include <cctype>
#include <vector>

#include "support/scratch.h"

namespace {

using testing::Each;
using testing::StartsWith;

constexpr const char* kKeyDir = "/usr/zyro/etc/private";
constexpr const char* kKeyFile = "/usr/zyro/etc/private/zyrovfs.key";
constexpr size_t kMega = 1024 * 1024;
constexpr char kDirt = '#';

using Convert = int (*)(const char*, char*, unsigned int);

/** A buffer full of dirt with a fence of dirt behind it. */
struct Buffer {
    explicit Buffer(size_t bytes) : size(bytes), memory(bytes + 8, kDirt) {}

    int Take(Convert convert, const std::string& text) {
        return convert(text.c_str(), memory.data(), static_cast<unsigned int>(size));
    }
    std::string Text() const { return memory.data(); }
    std::vector<char> Inside() const { return {memory.begin(), memory.end() - 8}; }
    std::vector<char> Fence() const { return {memory.end() - 8, memory.end()}; }

    size_t size;
    std::vector<char> memory;
};

class Credential : public testing::Test {
  protected:
    void SetUp() override {
        std::filesystem::remove_all(kKeyDir);
        YLIBCErrSetEx(0, "", 0);
    }

    static std::string Encrypt(const std::string& plain) {
        Buffer out(plain.size() * 4 / 3 + 100);
        EXPECT_EQ(out.Take(YLIBCCryptSzEncrypt, plain), 1);
        return out.Text();
    }
    static std::string Decrypt(const std::string& cipher) {
        Buffer out(cipher.size() + 1);
        EXPECT_EQ(out.Take(YLIBCCryptSzDecrypt, cipher), 1);
        return out.Text();
    }
    /** True when the text is refused as none of this machine, and nothing is left in the buffer. */
    static bool IsRefused(const std::string& cipher) {
        YLIBCErrSetEx(0, "", 0);
        Buffer out(cipher.size() + 100);
        return out.Take(YLIBCCryptSzDecrypt, cipher) == 0 && IsCleared(out) &&
               YLIBCErrGet() == ZOS_ERR_BAD_CIPHER_TEXT;
    }
    static bool IsCleared(const Buffer& buffer) {
        const std::vector<char> inside = buffer.Inside();
        return std::all_of(inside.begin(), inside.end(), [](char c) { return c == '\0'; });
    }
};

TEST_F(Credential, ComesBackAsItWas) {
    for (const std::string plain :
         {"p", "secret", "with blank and \"quotes\"\n", "\xc3\xa4\xe2\x82\xac", "\xff\xfe\x01"}) {
        EXPECT_EQ(Decrypt(Encrypt(plain)), plain);
    }
}

TEST_F(Credential, EveryLengthComesBack) {
    std::string plain;
    for (int i = 0; i < 100; ++i) {
        EXPECT_EQ(Decrypt(Encrypt(plain)), plain);
        plain += static_cast<char>('a' + i % 26);
    }
}

TEST_F(Credential, EmptyOneIsEncipheredToo) {
    const std::string cipher = Encrypt("");
    EXPECT_THAT(cipher, StartsWith("$1$"));
    EXPECT_GT(cipher.size(), 3U);
    EXPECT_EQ(Decrypt(cipher), "");
    EXPECT_TRUE(IsRefused("")) << "no text is not an enciphered empty one";
}

TEST_F(Credential, OfAMegabyteComesBack) {
    std::string plain(kMega, 'x');
    for (size_t i = 0; i < plain.size(); i += 17) {
        plain[i] = static_cast<char>(1 + i % 255);
    }
    EXPECT_TRUE(Decrypt(Encrypt(plain)) == plain);
}

TEST_F(Credential, TextIsPrintableAndVersioned) {
    const std::string cipher = Encrypt("\x01\xff\n secret");
    EXPECT_THAT(cipher, StartsWith("$1$"));
    EXPECT_TRUE(std::all_of(cipher.begin(), cipher.end(), [](char c) {
        return isgraph(static_cast<unsigned char>(c));
    })) << cipher;
    EXPECT_EQ(cipher.find("secret"), std::string::npos);
}

TEST_F(Credential, SameOneGivesAnotherTextEachTime) {
    const std::string first = Encrypt("secret");
    const std::string second = Encrypt("secret");
    EXPECT_NE(first.substr(3, 16), second.substr(3, 16)) << "the nonce stands in front";
    EXPECT_NE(first.substr(19), second.substr(19));
    EXPECT_EQ(Decrypt(first), Decrypt(second));
}

TEST_F(Credential, AnyChangedByteIsRefused) {
    for (const std::string plain : {"s", "se", "sec"}) {  // each padding of the text
        const std::string cipher = Encrypt(plain);
        for (size_t at = 0; at < cipher.size(); ++at) {
            for (int byte = 1; byte < 256; ++byte) {
                std::string changed = cipher;
                changed[at] = static_cast<char>(byte);
                if (changed != cipher) {
                    ASSERT_TRUE(IsRefused(changed)) << changed << ", byte " << at;
                }
            }
        }
        EXPECT_EQ(Decrypt(cipher), plain);
    }
}

TEST_F(Credential, ShortenedOrLengthenedTextIsRefused) {
    const std::string cipher = Encrypt("secret");
    for (size_t length = 0; length < cipher.size(); ++length) {
        EXPECT_TRUE(IsRefused(cipher.substr(0, length))) << length;
    }
    for (const char* more : {"A", "=", "====", "AAAA", "\n", " "}) {
        EXPECT_TRUE(IsRefused(cipher + more)) << more;
        EXPECT_TRUE(IsRefused(more + cipher)) << more;
    }
}

TEST_F(Credential, PlainTextIsRefused) {
    for (const std::string text : {"secret", "$1$", "$1$secret", "$2$AAAA", "$1$====", "$1$=AAA"}) {
        EXPECT_TRUE(IsRefused(text)) << text;
    }
    EXPECT_TRUE(IsRefused("$1$" + std::string(36, 'A')));
    EXPECT_TRUE(IsRefused(std::string(kMega, 'A')));
}

TEST_F(Credential, TextOfAnotherMachineIsRefused) {
    const std::string cipher = Encrypt("secret");
    const std::string key = scratch::Text(kKeyFile);
    std::filesystem::remove_all(kKeyDir);
    Encrypt("the first one makes another key");
    ASSERT_NE(scratch::Text(kKeyFile), key);
    EXPECT_TRUE(IsRefused(cipher));
}

TEST_F(Credential, TextWithoutAKeyIsNotReadAndMakesNone) {
    const std::string cipher = Encrypt("secret");
    std::filesystem::remove_all(kKeyDir);
    Buffer out(100);
    EXPECT_EQ(out.Take(YLIBCCryptSzDecrypt, cipher), 0);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_OPEN_FAILED);
    EXPECT_STREQ(YLIBCErrorGetFile(), "credential.cpp");
    EXPECT_TRUE(IsCleared(out));
    EXPECT_FALSE(std::filesystem::exists(kKeyDir));
}

/** `size` bytes do for this text, one less does not. */
void ExpectFit(Convert convert, const std::string& text, size_t size) {
    Buffer exact(size);
    EXPECT_EQ(exact.Take(convert, text), 1);
    EXPECT_EQ(exact.Text().size(), size - 1);
    EXPECT_THAT(exact.Fence(), Each(kDirt));
    Buffer small(size - 1);
    EXPECT_EQ(small.Take(convert, text), 0);
    EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BUFFER_TOO_SMALL);
    EXPECT_THAT(small.Inside(), Each('\0'));
    EXPECT_THAT(small.Fence(), Each(kDirt));
}

TEST_F(Credential, EncipheredTextHasToFitWithItsEnd) {
    for (const std::string plain : {"", "s", "se", "sec", "a longer credential"}) {
        ExpectFit(YLIBCCryptSzEncrypt, plain, Encrypt(plain).size() + 1);
    }
}

TEST_F(Credential, PlainTextHasToFitWithItsEnd) {
    for (const std::string plain : {"s", "se", "sec", "a longer credential"}) {
        ExpectFit(YLIBCCryptSzDecrypt, Encrypt(plain), plain.size() + 1);
    }
    Buffer one(1);
    EXPECT_EQ(one.Take(YLIBCCryptSzDecrypt, Encrypt("")), 1);
    EXPECT_EQ(one.Text(), "");
}

TEST_F(Credential, BuffersOfTheCallersHoldThreeThousandBytes) {
    constexpr size_t kLongest = 3041;
    const std::string plain(kLongest, 'x');
    Buffer cipher(4096);
    EXPECT_EQ(cipher.Take(YLIBCCryptSzEncrypt, plain + "x"), 0);
    ASSERT_EQ(cipher.Take(YLIBCCryptSzEncrypt, plain), 1);
    Buffer back(4097);
    EXPECT_EQ(back.Take(YLIBCCryptSzDecrypt, cipher.Text()), 1);
    EXPECT_EQ(back.Text(), plain);
}

TEST_F(Credential, MayBeConvertedInPlace) {
    char text[100] = "secret";
    ASSERT_EQ(YLIBCCryptSzEncrypt(text, text, sizeof text), 1);
    EXPECT_THAT(text, StartsWith("$1$"));
    ASSERT_EQ(YLIBCCryptSzDecrypt(text, text, sizeof text), 1);
    EXPECT_STREQ(text, "secret");
}

TEST_F(Credential, NullArgumentsAreRefused) {
    for (const Convert convert : {YLIBCCryptSzEncrypt, YLIBCCryptSzDecrypt}) {
        YLIBCErrSetEx(0, "", 0);
        char out[] = "####";
        EXPECT_EQ(convert(nullptr, out, 4), 0);
        EXPECT_EQ(YLIBCErrGet(), ZOS_ERR_BAD_PARAMETER);
        EXPECT_THAT(std::vector<char>(out, out + 4), Each('\0'));
        EXPECT_EQ(convert("secret", nullptr, 4), 0);
        char none = kDirt;
        EXPECT_EQ(convert("secret", &none, 0), 0);
        EXPECT_EQ(none, kDirt);
    }
    EXPECT_FALSE(std::filesystem::exists(kKeyDir));
}

}  // namespace
