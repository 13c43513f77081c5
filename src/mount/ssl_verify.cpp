#include "mount/ssl_verify.h"

#include <fcntl.h>
#include <openssl/bio.h>
#include <openssl/err.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/ssl.h>
#include <openssl/x509.h>
#include <openssl/x509_vfy.h>
#include <sys/stat.h>

#include <atomic>
#include <cerrno>
#include <cstdlib>
#include <cstring>

#include "core/entry_name.h"
#include "core/fd_io.h"
#include "core/no_throw.h"
#include "core/owned_folder.h"
#include "core/paths.h"
#include "mount/cert_info.h"
#include "mount/curl.h"
#include "zyrovfs/global.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {
namespace {

using UniqueX509 = std::unique_ptr<X509, FreeWith<X509_free>>;
using UniqueBio = std::unique_ptr<BIO, FreeWith<BIO_free_all>>;

/**
 * The chain flag: set by the first check against the CA bundle and never cleared. Drivers of this
 * process install VerifyCertCtxFn long after that check, and rely on it staying in force.
 */
std::atomic<bool> check_chain{false};

/** Far above any bundle. The folder belongs to the user, who may put anything there. */
constexpr size_t kCertFileLimit = 16 * 1024 * 1024;

struct Digest {
    unsigned char bytes[EVP_MAX_MD_SIZE];
    unsigned int length = 0;

    bool operator==(const Digest& other) const {
        return length != 0 && length == other.length && memcmp(bytes, other.bytes, length) == 0;
    }
    std::string Hex() const {
        static const char digits[] = "0123456789ABCDEF";
        std::string text;
        for (unsigned int i = 0; i < length; ++i) {
            text += digits[bytes[i] >> 4];
            text += digits[bytes[i] & 15];
        }
        return text;
    }
};

Digest Fingerprint(const X509* certificate) {
    Digest digest;
    if (certificate == nullptr ||
        X509_digest(certificate, EVP_sha1(), digest.bytes, &digest.length) != 1) {
        digest.length = 0;
    }
    return digest;
}

/** The default would ask for the pass phrase of an enciphered file on the terminal, and wait. */
int NoPassPhrase(char*, int, int, void*) {
    return -1;
}

UniqueX509 ReadPem(const char* text) {
    if (text == nullptr) {
        LOG_ERROR("arg is null");
        return nullptr;
    }
    const UniqueBio bio(BIO_new_mem_buf(text, -1));
    if (bio == nullptr) {
        LOG_ERROR("Failed to BIO_new_mem_buf");
        return nullptr;
    }
    UniqueX509 certificate(PEM_read_bio_X509(bio.get(), nullptr, NoPassPhrase, nullptr));
    if (certificate == nullptr) {
        LOG_ERROR("Failed to read bio to X509");
    }
    return certificate;
}

bool IsSavedCertificate(const X509* peer, const char* text) {
    const UniqueX509 saved = ReadPem(text);
    if (saved == nullptr) {
        return false;
    }
    const Digest shown = Fingerprint(peer);
    const Digest known = Fingerprint(saved.get());
    if (shown == known) {
        return true;
    }
    LOG_ERROR("Fingerprint verify failed, %s %s", shown.Hex().c_str(), known.Hex().c_str());
    return false;
}

/** libcurl names a failed handshake after the oldest error of OpenSSL's queue: what goes wrong
 * while a name or a saved file is read must not stand there before the refusal itself. */
class ErrorsOfItsOwn {
  public:
    ErrorsOfItsOwn() { ERR_set_mark(); }
    ErrorsOfItsOwn(const ErrorsOfItsOwn&) = delete;
    ErrorsOfItsOwn& operator=(const ErrorsOfItsOwn&) = delete;
    ~ErrorsOfItsOwn() { ERR_pop_to_mark(); }
};

int CheckCertificate(X509_STORE_CTX* store, void* saved) noexcept try {
    const ErrorsOfItsOwn errors;
    X509* peer = X509_STORE_CTX_get0_cert(store);
    KeepCertificate(peer);
    if (check_chain) {
        return X509_verify_cert(store);
    }
    if (IsSavedCertificate(peer, static_cast<const char*>(saved))) {
        return 1;
    }
    X509_STORE_CTX_set_error(store, X509_V_ERR_CERT_REJECTED);
    return 0;
} catch (const std::exception& e) {
    LOG_ERROR("Unexpected failure, %s", e.what());
    return 0;
}

/** libcurl leaves the store empty where its own check is off; a chain needs roots to end in. */
void LoadRoots(SSL_CTX* ssl) {
    X509_STORE* store = SSL_CTX_get_cert_store(ssl);
    if (sk_X509_OBJECT_num(X509_STORE_get0_objects(store)) == 0 &&
        X509_STORE_load_file(store, paths::kCaBundle) != 1) {
        LOG_ERROR("Failed to load %s", paths::kCaBundle);
    }
}

bool SetTrust(CURL* curl, const char* cert_path, char* saved) {
    return SetCurlVerification(curl, Utils::isTrustRootCA(cert_path)) &&
           SetCurlOption(curl, CURLOPT_SSL_CTX_FUNCTION, &Utils::VerifyCertCtxFn) &&
           SetCurlOption(curl, CURLOPT_SSL_CTX_DATA, saved) &&
           SetCurlOption(curl, CURLOPT_SSLVERSION, static_cast<long>(CURL_SSLVERSION_TLSv1));
}

}  // namespace

bool Utils::isTrustRootCA(const char* path) {
    if (path == nullptr) {
        return false;
    }
    const EntryPath place = SplitPath(path);
    const OwnedFolder folder = OwnedFolder::Open(place.folder, GetActorUID());
    struct stat info {};
    if (!folder.Stat(place.name, info)) {
        return false;
    }
    if (S_ISREG(info.st_mode)) {
        return strcmp(path, paths::kCaBundle) == 0;
    }
    std::string target;
    return S_ISLNK(info.st_mode) && folder.ReadLink(place.name, target) &&
           target == paths::kCaBundle;
}

char* Utils::GetCertData(const char* path) {
    if (path == nullptr) {
        errno = EINVAL;
        LOG_ERROR("Failed to open [%s], %m", "");
        return nullptr;
    }
    // The one link that means something is read as what it means.
    const EntryPath place = SplitPath(isTrustRootCA(path) ? paths::kCaBundle : path);
    const OwnedFolder folder = OwnedFolder::Open(place.folder, GetActorUID());
    const UniqueFd fd = folder.OpenFile(place.name, O_RDONLY);
    if (!fd && errno != EISDIR) {
        LOG_ERROR("Failed to open [%s], %m", path);
        return nullptr;
    }
    std::string text;
    UniqueCString data(fd && ReadUpTo(fd.Get(), kCertFileLimit, text)
                           ? static_cast<char*>(calloc(text.size() + 1, 1))
                           : nullptr);
    if (data == nullptr) {
        LOG_ERROR("Failed to read data, %m");
        return nullptr;
    }
    text.copy(data.get(), text.size());
    return data.release();
}

CURLcode Utils::VerifyCertCtxFn(CURL*, void* ctx, void* data) noexcept {
    if (ctx == nullptr) {
        return CURLE_SSL_CERTPROBLEM;
    }
    auto* ssl = static_cast<SSL_CTX*>(ctx);
    if (check_chain) {
        LoadRoots(ssl);
    } else {
        SSL_CTX_set_verify_depth(ssl, 1);
    }
    SSL_CTX_set_verify(ssl, SSL_VERIFY_PEER | SSL_VERIFY_FAIL_IF_NO_PEER_CERT, nullptr);
    SSL_CTX_set_cert_verify_callback(ssl, CheckCertificate, data);
    return CURLE_OK;
}

bool Utils::VerifyCert(const char* user, const char* password, const char* url,
                       const char* certPath) {
    if (url == nullptr || certPath == nullptr) {
        LOG_ERROR("Wrong parameters");
        return Fail(VFS_ERR_BAD_PARAM);
    }
    return NoThrow(VFS_ERR_FAILED, [&] {
        KeepCertificate(nullptr);  // never tell the user of another server's certificate
        curl_global_init(CURL_GLOBAL_DEFAULT);
        UniqueCString saved;  // outlives the handle that points to it
        const UniqueCurl curl = NewCurl();
        if (curl == nullptr) {
            return false;
        }
        if (isTrustRootCA(certPath)) {
            check_chain = true;
        }
        saved.reset(GetCertData(certPath));
        if (saved == nullptr) {
            return Fail(VFS_ERR_FAILED);
        }
        return SetTrust(curl.get(), certPath, saved.get()) &&
               SetCurlTarget(curl.get(), user, password, url) && PerformCurl(curl.get(), url);
    });
}

}  // namespace ZYROVFS
