#include "cloud/pkce.h"

#include <openssl/evp.h>
#include <openssl/rand.h>

#include <algorithm>

namespace ZYROCloud {
namespace {

constexpr size_t kBytes = 32;

/** Base64 in the alphabet of addresses, without padding. */
std::string Base64Url(const unsigned char* bytes, size_t size) {
    std::string text(4 * ((size + 2) / 3) + 1, '\0');
    const int length = EVP_EncodeBlock(reinterpret_cast<unsigned char*>(text.data()), bytes,
                                       static_cast<int>(size));
    text.resize(static_cast<size_t>(length));
    text.resize(std::min(text.find('='), text.size()));
    std::replace(text.begin(), text.end(), '+', '-');
    std::replace(text.begin(), text.end(), '/', '_');
    return text;
}

}  // namespace

std::string RandomVerifier() {
    unsigned char bytes[kBytes];
    return RAND_bytes(bytes, sizeof bytes) == 1 ? Base64Url(bytes, sizeof bytes) : "";
}

std::string ChallengeOf(const std::string& verifier) {
    unsigned char digest[EVP_MAX_MD_SIZE];
    unsigned int length = 0;
    if (EVP_Digest(verifier.data(), verifier.size(), digest, &length, EVP_sha256(), nullptr) != 1) {
        return "";
    }
    return Base64Url(digest, length);
}

}  // namespace ZYROCloud
