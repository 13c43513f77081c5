#include "zosplatform/credential.h"

#include <openssl/crypto.h>
#include <openssl/evp.h>
#include <openssl/rand.h>

#include <climits>
#include <cstring>
#include <memory>
#include <string_view>

#include "machine_key.h"
#include "support.h"

/*
 * A text is "$1$" and the base64 of nonce, cipher text and tag of AES-256-GCM. The version in front
 * is authenticated too, so a text cannot be passed off as one of another version.
 */
namespace {

constexpr std::string_view kVersion = "$1$";
constexpr size_t kNonceSize = 12;
constexpr size_t kTagSize = 16;
/** The cipher and the base64 of its text are counted in int. */
constexpr size_t kMaxText = INT_MAX / 2;
constexpr size_t kMaxPlain = kMaxText / 2;

struct FreeContext {
    void operator()(EVP_CIPHER_CTX* context) const { EVP_CIPHER_CTX_free(context); }
};
using Context = std::unique_ptr<EVP_CIPHER_CTX, FreeContext>;

/** Plain text in memory of ours, wiped when it goes. */
struct Secret {
    explicit Secret(size_t size) : text(size, '\0') {}
    Secret(const Secret&) = delete;
    Secret& operator=(const Secret&) = delete;
    ~Secret() { OPENSSL_cleanse(text.data(), text.size()); }

    std::string text;
};

unsigned char* Bytes(std::string& text) {
    return reinterpret_cast<unsigned char*>(text.data());
}
const unsigned char* Bytes(std::string_view text) {
    return reinterpret_cast<const unsigned char*>(text.data());
}

/** A cipher that has its key and nonce and has taken in the version. */
Context Begin(const zos::MachineKey& key, const unsigned char* nonce, bool encipher) {
    Context context(EVP_CIPHER_CTX_new());
    int length = 0;
    if (!context ||
        EVP_CipherInit_ex(context.get(), EVP_aes_256_gcm(), nullptr, key.Bytes(), nonce,
                          encipher ? 1 : 0) != 1 ||
        EVP_CipherUpdate(context.get(), nullptr, &length, Bytes(kVersion), kVersion.size()) != 1) {
        return nullptr;
    }
    return context;
}

/** Nonce, cipher text, tag; empty on failure. */
std::string Seal(const zos::MachineKey& key, std::string_view plain) {
    std::string sealed(kNonceSize + plain.size() + kTagSize, '\0');
    unsigned char* nonce = Bytes(sealed);
    unsigned char* body = nonce + kNonceSize;
    if (RAND_bytes(nonce, kNonceSize) != 1) {
        return {};
    }
    const Context context = Begin(key, nonce, true);
    int length = 0;
    if (!context ||
        EVP_CipherUpdate(context.get(), body, &length, Bytes(plain),
                         static_cast<int>(plain.size())) != 1 ||
        EVP_CipherFinal_ex(context.get(), body + plain.size(), &length) != 1 ||
        EVP_CIPHER_CTX_ctrl(context.get(), EVP_CTRL_GCM_GET_TAG, kTagSize, body + plain.size()) !=
            1) {
        return {};
    }
    return sealed;
}

/** False when the text was changed or sealed under another key. `plain` has the size to fill. */
bool Unseal(const zos::MachineKey& key, std::string& sealed, std::string& plain) {
    unsigned char* body = Bytes(sealed) + kNonceSize;
    const Context context = Begin(key, Bytes(sealed), false);
    int length = 0;
    return context &&
           EVP_CIPHER_CTX_ctrl(context.get(), EVP_CTRL_GCM_SET_TAG, kTagSize,
                               body + plain.size()) == 1 &&
           EVP_CipherUpdate(context.get(), Bytes(plain), &length, body,
                            static_cast<int>(plain.size())) == 1 &&
           EVP_CipherFinal_ex(context.get(), Bytes(plain) + plain.size(), &length) == 1;
}

size_t Base64Size(size_t bytes) {
    return (bytes + 2) / 3 * 4;
}

std::string ToBase64(std::string_view bytes) {
    std::string text(Base64Size(bytes.size()) + 1, '\0');
    EVP_EncodeBlock(Bytes(text), Bytes(bytes), static_cast<int>(bytes.size()));
    text.pop_back();
    return text;
}

/**
 * Only what ToBase64 writes: the decoder skips blanks and ignores the spare bits of the last
 * character, so several texts would stand for the same bytes. Empty when the text is none.
 */
std::string FromBase64(std::string_view text) {
    std::string bytes(text.size() / 4 * 3, '\0');
    const size_t padding = text.size() - (text.find_last_not_of('=') + 1);
    if (text.empty() || padding > 2 ||
        EVP_DecodeBlock(Bytes(bytes), Bytes(text), static_cast<int>(text.size())) !=
            static_cast<int>(bytes.size())) {
        return {};
    }
    bytes.resize(bytes.size() - padding);
    return ToBase64(bytes) == text ? bytes : std::string();
}

int Refuse(unsigned int code, int line = __builtin_LINE()) {
    YLIBCErrSetEx(code, __FILE_NAME__, line);
    return 0;
}

int Encrypt(std::string_view plain, char* out, size_t size) {
    if (plain.size() > kMaxPlain) {
        return Refuse(ZOS_ERR_BAD_PARAMETER);
    }
    if (kVersion.size() + Base64Size(kNonceSize + plain.size() + kTagSize) >= size) {
        return Refuse(ZOS_ERR_BUFFER_TOO_SMALL);
    }
    zos::MachineKey key;
    if (!key.Load(true)) {
        return Refuse(ZOS_ERR_OPEN_FAILED);
    }
    const std::string sealed = Seal(key, plain);
    if (sealed.empty()) {
        return Refuse(ZOS_ERR_SYSTEM);
    }
    const std::string text = std::string(kVersion) + ToBase64(sealed);
    std::memcpy(out, text.c_str(), text.size() + 1);
    return 1;
}

int Decrypt(std::string_view cipher, char* out, size_t size) {
    if (cipher.size() > kMaxText || cipher.substr(0, kVersion.size()) != kVersion) {
        return Refuse(ZOS_ERR_BAD_CIPHER_TEXT);
    }
    std::string sealed = FromBase64(cipher.substr(kVersion.size()));
    if (sealed.size() < kNonceSize + kTagSize) {
        return Refuse(ZOS_ERR_BAD_CIPHER_TEXT);
    }
    Secret plain(sealed.size() - kNonceSize - kTagSize);
    if (plain.text.size() >= size) {
        return Refuse(ZOS_ERR_BUFFER_TOO_SMALL);
    }
    zos::MachineKey key;
    if (!key.Load(false)) {
        return Refuse(ZOS_ERR_OPEN_FAILED);
    }
    if (!Unseal(key, sealed, plain.text)) {
        return Refuse(ZOS_ERR_BAD_CIPHER_TEXT);
    }
    std::memcpy(out, plain.text.c_str(), plain.text.size() + 1);
    return 1;
}

template <typename Work>
int Convert(const char* text, char* out, unsigned int size, Work work) {
    if (text == nullptr || out == nullptr || size == 0) {
        if (out != nullptr) {
            std::memset(out, 0, size);
        }
        return Refuse(ZOS_ERR_BAD_PARAMETER);
    }
    const int done = zos::OrOutOfMemory(0, [&] { return work(text, out, size); });
    if (done == 0) {
        std::memset(out, 0, size);
    }
    return done;
}

}  // namespace

int YLIBCCryptSzEncrypt(const char* plain, char* out, unsigned int size) {
    return Convert(plain, out, size, Encrypt);
}

int YLIBCCryptSzDecrypt(const char* cipher, char* out, unsigned int size) {
    return Convert(cipher, out, size, Decrypt);
}
