// MD5 is kept for the form of the key alone; nothing rests on its strength.
#define OPENSSL_SUPPRESS_DEPRECATED
#include <openssl/evp.h>
#include <openssl/md5.h>
#include <openssl/rand.h>

#include <climits>
#include <cstring>
#include <memory>

#include "cloud/service_document.h"
#include "core/handle.h"
#include "core/log.h"
#include "zyrovfs/cloud_utils.h"

/*
 * An enciphered secret is "$c1$" and, as hexadecimal digits, nonce, cipher text and tag of
 * AES-256-GCM. What was enciphered is the secret and its NUL. The key is the digest's 32 digits of
 * the document's passphrase. The version in front is authenticated too.
 */
namespace ZYROCloud {

using namespace ZYROVFS;

namespace {

constexpr char kVersion[] = "$c1$";
constexpr size_t kVersionSize = sizeof kVersion - 1;
constexpr size_t kNonceSize = 12;
constexpr size_t kTagSize = 16;
constexpr size_t kMd5HexSize = 2 * MD5_DIGEST_LENGTH + 1;
constexpr char kDigits[] = "0123456789abcdef";

using Cipher = std::unique_ptr<EVP_CIPHER_CTX, FreeWith<EVP_CIPHER_CTX_free>>;
using Bytes = std::basic_string<unsigned char>;

/** The digits of a key, wiped when they go. */
struct Key {
    Key() = default;
    Key(const Key&) = delete;
    Key& operator=(const Key&) = delete;
    ~Key() { explicit_bzero(hex, sizeof hex); }
    const unsigned char* Data() const { return reinterpret_cast<const unsigned char*>(hex); }

    char hex[kMd5HexSize] = "";
};

std::string ToHex(const unsigned char* bytes, size_t count) {
    std::string text;
    for (size_t i = 0; i < count; ++i) {
        text += kDigits[bytes[i] >> 4];
        text += kDigits[bytes[i] & 0xf];
    }
    return text;
}

/** False for anything but what ToHex writes. */
bool FromHex(const char* text, Bytes& bytes) {
    for (; *text != '\0'; text += 2) {
        const char* high = strchr(kDigits, text[0]);
        const char* low = text[1] == '\0' ? nullptr : strchr(kDigits, text[1]);
        if (high == nullptr || low == nullptr) {
            return false;
        }
        bytes += static_cast<unsigned char>((high - kDigits) << 4 | (low - kDigits));
    }
    return true;
}

int Md5Hex(const char* text, char* out) {
    MD5_CTX context;
    unsigned char digest[MD5_DIGEST_LENGTH];
    if (text == nullptr) {
        LOG_ERROR("Bad paramter: szIn is NULL");
        return -1;
    }
    if (MD5_Init(&context) != 1) {
        LOG_ERROR("Failed to MD5_Init");
        return -1;
    }
    if (MD5_Update(&context, text, strlen(text)) != 1) {
        LOG_ERROR("Failed to MD5_Update");
        return -1;
    }
    if (MD5_Final(digest, &context) != 1) {
        LOG_ERROR("Failed to MD5_Final");
        return -1;
    }
    const std::string hex = ToHex(digest, sizeof digest);
    memcpy(out, hex.c_str(), kMd5HexSize);
    return 0;
}

/** The key of this installation's secrets. */
bool LoadKey(Key& key) {
    Json::Value document;
    std::string passphrase;
    service_document::Read(document);
    const bool known = service_document::Passphrase(document, passphrase);
    const bool made = Md5Hex(known ? passphrase.c_str() : nullptr, key.hex) == 0;
    explicit_bzero(passphrase.data(), passphrase.size());
    return made;
}

/** A cipher with key and nonce that has taken in the version; null on failure. */
Cipher Begin(const Key& key, const unsigned char* nonce, int encipher) {
    Cipher cipher(EVP_CIPHER_CTX_new());
    int length = 0;
    if (cipher == nullptr ||
        EVP_CipherInit_ex(cipher.get(), EVP_aes_256_gcm(), nullptr, key.Data(), nonce, encipher) !=
            1 ||
        EVP_CipherUpdate(cipher.get(), nullptr, &length,
                         reinterpret_cast<const unsigned char*>(kVersion), kVersionSize) != 1) {
        return nullptr;
    }
    return cipher;
}

/** Nonce, cipher text and tag of a text that this installation may have written. */
bool TakeApart(const char* in, Bytes& sealed) {
    return in != nullptr && strlen(in) < INT_MAX && strncmp(in, kVersion, kVersionSize) == 0 &&
           FromHex(in + kVersionSize, sealed) && sealed.size() > kNonceSize + kTagSize;
}

/** The enciphered bytes into `plain`, each failed step with its line. */
bool Unseal(const Key& key, const char* in, Bytes& plain) {
    Bytes sealed;
    const Cipher cipher = TakeApart(in, sealed) ? Begin(key, sealed.data(), 0) : nullptr;
    const size_t size = cipher == nullptr ? 0 : sealed.size() - kNonceSize - kTagSize;
    unsigned char* body = sealed.data() + (cipher == nullptr ? 0 : kNonceSize);
    if (cipher == nullptr ||
        EVP_CIPHER_CTX_ctrl(cipher.get(), EVP_CTRL_GCM_SET_TAG, kTagSize, body + size) != 1) {
        LOG_ERROR("Failed to decrypt init");
        return false;
    }
    int length = 0;
    plain.resize(size);
    if (EVP_CipherUpdate(cipher.get(), plain.data(), &length, body, static_cast<int>(size)) != 1) {
        LOG_ERROR("Failed to decrypt update");
        return false;
    }
    if (EVP_CipherFinal_ex(cipher.get(), plain.data() + size, &length) != 1) {
        LOG_ERROR("Failed to decrypt final");
        return false;
    }
    return true;
}

int DecryptInto(const char* in, char* out, int size) {
    Key key;
    Bytes plain;
    if (!LoadKey(key)) {
        return 0;
    }
    const ScopeExit wipe([&plain] { explicit_bzero(plain.data(), plain.size()); });
    if (!Unseal(key, in, plain)) {
        return 0;
    }
    const int length = static_cast<int>(plain.size());
    if (length >= size) {
        LOG_ERROR("output len [%d] >= given len [%d]", length, size);
        return 0;
    }
    memcpy(out, plain.data(), plain.size());
    out[length - 1] = '\0';
    return 1;
}

}  // namespace

int Utils::Decrypt(char* in, char* out, int size) try {
    if (out == nullptr || size <= 0) {
        return 0;
    }
    memset(out, 0, static_cast<size_t>(size));
    return DecryptInto(in, out, size);
} catch (const std::exception& e) {
    LOG_ERROR("Unexpected failure, %s", e.what());
    return 0;
}

std::string service_document::Encipher(const std::string& passphrase, const std::string& secret) {
    Key key;
    const size_t size = secret.size() + 1;
    Bytes sealed(kNonceSize + size + kTagSize, 0);
    unsigned char* body = sealed.data() + kNonceSize;
    if (size > INT_MAX / 4 || Md5Hex(passphrase.c_str(), key.hex) != 0 ||
        RAND_bytes(sealed.data(), kNonceSize) != 1) {
        return "";
    }
    const Cipher cipher = Begin(key, sealed.data(), 1);
    int length = 0;
    if (cipher == nullptr ||
        EVP_CipherUpdate(cipher.get(), body, &length,
                         reinterpret_cast<const unsigned char*>(secret.c_str()),
                         static_cast<int>(size)) != 1 ||
        EVP_CipherFinal_ex(cipher.get(), body + size, &length) != 1 ||
        EVP_CIPHER_CTX_ctrl(cipher.get(), EVP_CTRL_GCM_GET_TAG, kTagSize, body + size) != 1) {
        return "";
    }
    return kVersion + ToHex(sealed.data(), sealed.size());
}

}  // namespace ZYROCloud
