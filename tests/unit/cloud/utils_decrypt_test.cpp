#include <dlfcn.h>
#include <gmock/gmock.h>
#include <sys/stat.h>

#define OPENSSL_SUPPRESS_DEPRECATED
#include <openssl/evp.h>
#include <openssl/md5.h>

#include "cloud/service_config.h"
#include "cloud/service_document.h"
#include "core/json.h"
#include "core/paths.h"
#include "support/profiles.h"
#include "support/seams.h"
#include "zyrovfs/cloud_utils.h"

namespace {

/** Name of the step of OpenSSL that fails. */
std::string failing_step;
/** The platform deciphers this installation's passphrase before; these calls are its own. */
int platform_updates = 0;

template <typename Function>
Function Real(const char* name) {
    return reinterpret_cast<Function>(dlsym(RTLD_NEXT, name));
}

bool Fails(const char* name) {
    return failing_step == name;
}

}  // namespace

extern "C" int MD5_Init(MD5_CTX* context) {
    return Fails("MD5_Init") ? 0 : Real<int (*)(MD5_CTX*)>("MD5_Init")(context);
}
extern "C" int MD5_Update(MD5_CTX* context, const void* data, size_t size) {
    return Fails("MD5_Update")
               ? 0
               : Real<int (*)(MD5_CTX*, const void*, size_t)>("MD5_Update")(context, data, size);
}
extern "C" int MD5_Final(unsigned char* digest, MD5_CTX* context) {
    return Fails("MD5_Final")
               ? 0
               : Real<int (*)(unsigned char*, MD5_CTX*)>("MD5_Final")(digest, context);
}
extern "C" int EVP_CipherUpdate(EVP_CIPHER_CTX* cipher, unsigned char* out, int* length,
                                const unsigned char* in, int size) {
    if (Fails("EVP_CipherUpdate") && out != nullptr && platform_updates-- <= 0) {
        return 0;
    }
    return Real<int (*)(EVP_CIPHER_CTX*, unsigned char*, int*, const unsigned char*, int)>(
        "EVP_CipherUpdate")(cipher, out, length, in, size);
}

namespace ZYROCloud {
namespace {

using namespace ZYROVFS;

class Decrypt : public testing::Test {
  protected:
    void SetUp() override {
        failing_step = "";
        std::filesystem::remove(paths::kServiceConfig);
        ASSERT_TRUE(Utils::AddClient("box", "id", "s3cret text"));
        ASSERT_TRUE(FindClientSecret("box", "id", text_));
        seams::Reset();
        memset(out_, 'x', sizeof out_);
    }
    void TearDown() override {
        failing_step = "";
        EXPECT_FALSE(seams::LoggedPart("s3cret")) << seams::LogDump();
    }

    int Run(int size = sizeof out_) { return Utils::Decrypt(text_.data(), out_, size); }
    /** The buffer is cleared over its size and not beyond. */
    bool Cleared(size_t size = sizeof out_) const {
        return std::string(out_, size) == std::string(size, '\0') &&
               (size == sizeof out_ || out_[size] == 'x');
    }
    /** Refused with this line and no other, the buffer cleared. */
    void ExpectRefused(const std::string& line) {
        memset(out_, 'x', sizeof out_);
        seams::Reset();
        EXPECT_EQ(Run(), 0);
        EXPECT_TRUE(Cleared());
        EXPECT_TRUE(seams::Logged(line)) << text_ << ": " << seams::LogDump();
        EXPECT_EQ(seams::LogLines().size(), 1U) << seams::LogDump();
    }

    std::string text_;
    char out_[1024];
};

TEST_F(Decrypt, GivesTheTextWithItsNulAndTheRestOfTheBufferCleared) {
    EXPECT_EQ(Run(), 1);
    EXPECT_EQ(std::string(out_, sizeof out_),
              "s3cret text" + std::string(sizeof out_ - strlen("s3cret text"), '\0'));
    EXPECT_EQ(seams::LogDump(), "");
}

TEST_F(Decrypt, ResultThatEqualsOrExceedsTheSizeIsRefused) {
    // What comes out is the text and the byte that its NUL replaces.
    EXPECT_EQ(Run(13), 1);
    EXPECT_STREQ(out_, "s3cret text");
    for (const int size : {12, 11, 1}) {
        memset(out_, 'x', sizeof out_);
        EXPECT_EQ(Run(size), 0);
        EXPECT_TRUE(Cleared(static_cast<size_t>(size)));
        EXPECT_TRUE(seams::Logged("output len [12] >= given len [" + std::to_string(size) + "]"));
    }
}

TEST_F(Decrypt, PlainTextFailsAtInit) {
    for (const char* plain :
         {"", "s3cret", "$c1$", "$c1$00", "$c1$zz", "$1$AAAA", "$c2$0011", "$c1$001"}) {
        text_ = plain;
        ExpectRefused("Failed to decrypt init");
    }
    EXPECT_EQ(Utils::Decrypt(nullptr, out_, sizeof out_), 0);
}

TEST_F(Decrypt, ChangedTextIsRefusedWhereverItWasChanged) {
    const std::string whole = text_;
    for (size_t at = strlen("$c1$"); at < whole.size(); ++at) {
        text_ = whole;
        text_[at] = text_[at] == '0' ? '1' : '0';
        ExpectRefused("Failed to decrypt final");
    }
    for (const std::string& odd : {whole + "0", whole + " ", whole.substr(0, whole.size() - 1)}) {
        text_ = odd;
        ExpectRefused("Failed to decrypt init");
    }
    text_ = whole + "00";
    ExpectRefused("Failed to decrypt final");
    text_ = whole;
    text_[4] = static_cast<char>(toupper(text_[4]));
    text_ += "AB";
    ExpectRefused("Failed to decrypt init");
}

TEST_F(Decrypt, TextUnderAnotherKeyIsRefused) {
    std::filesystem::remove(paths::kServiceConfig);
    ASSERT_TRUE(Utils::AddClient("box", "id", "other"));
    ExpectRefused("Failed to decrypt final");
}

TEST_F(Decrypt, WithoutAKeyOfThisMachineThereIsNoTextToDigest) {
    Json::Value document;
    ASSERT_TRUE(json::fromFile(document, paths::kServiceConfig));
    for (const char* key : {"", "plain", "$1$AAAA"}) {
        document["key"] = key;
        ASSERT_TRUE(json::toFile(document, paths::kServiceConfig, 0640));
        ExpectRefused("Bad paramter: szIn is NULL");
    }
    document["key"] = 7;
    ASSERT_TRUE(json::toFile(document, paths::kServiceConfig, 0640));
    ExpectRefused("Bad paramter: szIn is NULL");
    document.removeMember("key");
    ASSERT_TRUE(json::toFile(document, paths::kServiceConfig, 0640));
    ExpectRefused("Bad paramter: szIn is NULL");
    std::filesystem::remove(paths::kServiceConfig);
    ExpectRefused("Bad paramter: szIn is NULL");
}

TEST_F(Decrypt, EachStepOfTheDigestHasItsLineAndNoOtherFollows) {
    for (const char* step : {"MD5_Init", "MD5_Update", "MD5_Final"}) {
        failing_step = step;
        ExpectRefused(std::string("Failed to ") + step);
    }
}

TEST_F(Decrypt, AFailedStepOfTheCipherIsAnUpdateFailure) {
    failing_step = "EVP_CipherUpdate";
    platform_updates = 1;
    ExpectRefused("Failed to decrypt update");
}

TEST_F(Decrypt, WithoutABufferIsRefused) {
    EXPECT_EQ(Utils::Decrypt(text_.data(), nullptr, 10), 0);
    EXPECT_EQ(Run(0), 0);
    EXPECT_EQ(Run(-1), 0);
    EXPECT_EQ(out_[0], 'x');
}

TEST_F(Decrypt, TheKeyIsTheDigestsDigitsOfThePassphrase) {
    // MD5 of "abc", as every implementation has it.
    const std::string sealed = service_document::Encipher("abc", "s3cret");
    const std::string key = "900150983cd24fb0d6963f7d28e17f72";
    std::string bytes;
    for (size_t i = strlen("$c1$"); i < sealed.size(); i += 2) {
        bytes += static_cast<char>(std::stoi(sealed.substr(i, 2), nullptr, 16));
    }
    const auto* raw = reinterpret_cast<unsigned char*>(bytes.data());
    unsigned char plain[7];
    int length = 0;
    EVP_CIPHER_CTX* cipher = EVP_CIPHER_CTX_new();
    EVP_DecryptInit_ex(cipher, EVP_aes_256_gcm(), nullptr,
                       reinterpret_cast<const unsigned char*>(key.data()), raw);
    EVP_DecryptUpdate(cipher, plain, &length, raw + 12, sizeof plain);
    EVP_CIPHER_CTX_free(cipher);
    EXPECT_STREQ(reinterpret_cast<char*>(plain), "s3cret");
}

}  // namespace
}  // namespace ZYROCloud
