#include "mount/ssl_verify.h"

#include <openssl/bio.h>
#include <openssl/err.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/ssl.h>
#include <openssl/x509.h>
#include <openssl/x509_vfy.h>
#include <strings.h>

#include <cstring>
#include <list>

#include "core/no_throw.h"
#include "core/paths.h"
#include "mount/cert_info.h"
#include "mount/curl.h"
#include "zyrovfs/global.h"
#include "zyrovfs/utils.h"

namespace ZYROVFS {
namespace {

using UniqueX509 = std::unique_ptr<X509, FreeWith<X509_free>>;
using UniqueBio = std::unique_ptr<BIO, FreeWith<BIO_free_all>>;

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

int CheckCopy(X509_STORE_CTX* store, void* saved) noexcept try {
    const ErrorsOfItsOwn errors;
    X509* peer = X509_STORE_CTX_get0_cert(store);
    KeepCertificate(peer);
    if (IsSavedCertificate(peer, static_cast<const char*>(saved))) {
        return 1;
    }
    X509_STORE_CTX_set_error(store, X509_V_ERR_CERT_REJECTED);
    return 0;
} catch (const std::exception& e) {
    LOG_ERROR("Unexpected failure, %s", e.what());
    return 0;
}

int CheckChain(X509_STORE_CTX* store, void*) noexcept try {
    const ErrorsOfItsOwn errors;
    KeepCertificate(X509_STORE_CTX_get0_cert(store));
    return X509_verify_cert(store);
} catch (const std::exception& e) {
    LOG_ERROR("Unexpected failure, %s", e.what());
    return 0;
}

/** The handshake goes on in any case: the user has said yes. */
int SaveCopy(X509_STORE_CTX* store, void* data) noexcept try {
    const ErrorsOfItsOwn errors;
    auto& check = *static_cast<ServerCheck*>(data);
    check.saved = check.save(X509_STORE_CTX_get0_cert(store));
    return 1;
} catch (const std::exception& e) {
    LOG_ERROR("Unexpected failure, %s", e.what());
    return 1;
}

void Install(SSL_CTX* ssl, int (*check)(X509_STORE_CTX*, void*), void* data) {
    SSL_CTX_set_verify(ssl, SSL_VERIFY_PEER | SSL_VERIFY_FAIL_IF_NO_PEER_CERT, nullptr);
    SSL_CTX_set_cert_verify_callback(ssl, check, data);
}

/** libcurl leaves the store empty where its own check is off; a chain needs roots to end in. */
void LoadRoots(SSL_CTX* ssl) {
    X509_STORE* store = SSL_CTX_get_cert_store(ssl);
    if (sk_X509_OBJECT_num(X509_STORE_get0_objects(store)) == 0 &&
        X509_STORE_load_file(store, paths::kCaBundle) != 1) {
        LOG_ERROR("Failed to load %s", paths::kCaBundle);
    }
}

/** A server as libcurl reads its URL: what is checked must be what it connects to. */
struct Peer {
    std::string host;  ///< an IPv6 address without its brackets
    std::string port;

    bool operator==(const Peer& other) const {
        return strcasecmp(host.c_str(), other.host.c_str()) == 0 && port == other.port;
    }
};

std::string PartOf(CURLU* url, CURLUPart part) {
    char* text = nullptr;
    curl_url_get(url, part, &text, CURLU_DEFAULT_PORT);
    const std::unique_ptr<char, FreeWith<curl_free>> owned(text);
    return text == nullptr ? "" : text;
}

/** The one that a handle is about to shake hands with. */
Peer CurrentPeer(CURL* curl) {
    const char* text = nullptr;
    curl_easy_getinfo(curl, CURLINFO_EFFECTIVE_URL, &text);
    const std::unique_ptr<CURLU, FreeWith<curl_url_cleanup>> url(curl_url());
    if (url == nullptr || text == nullptr ||
        curl_url_set(url.get(), CURLUPART_URL, text, CURLU_NON_SUPPORT_SCHEME) != CURLUE_OK) {
        return {};
    }
    std::string host = PartOf(url.get(), CURLUPART_HOST);
    if (host.size() > 2 && host.front() == '[') {
        host = host.substr(1, host.size() - 2);
    }
    return {host, PartOf(url.get(), CURLUPART_PORT)};
}

bool IsRedirected(CURL* curl) {
    long redirects = 0;
    return curl_easy_getinfo(curl, CURLINFO_REDIRECT_COUNT, &redirects) != CURLE_OK ||
           redirects != 0;
}

/** One conversation: the server asked for, and those to which it leads. */
struct Handshakes {
    ServerCheck& check;
    Peer asked;
    std::list<std::string> pins;  ///< of the others, for as long as the handle

    CURLcode CheckAsked(CURL* curl, SSL_CTX* ssl);
    CURLcode CheckOther(CURL* curl, SSL_CTX* ssl, const Peer& peer);
};

CURLcode Handshakes::CheckAsked(CURL* curl, SSL_CTX* ssl) {
    if (check.save) {
        SSL_CTX_set_verify_depth(ssl, 1);
        Install(ssl, SaveCopy, &check);
        return CURLE_OK;
    }
    if (check.trust.kind == ServerTrust::kBundle) {
        LoadRoots(ssl);
        Install(ssl, CheckChain, nullptr);
        return CURLE_OK;
    }
    return Utils::VerifyCertCtxFn(curl, ssl, check.trust.certificate.data());
}

/** As it would be checked if it had been asked for. libcurl looks at names in one conversation for
 * all servers or for none, so a name is looked at here, too. */
CURLcode Handshakes::CheckOther(CURL* curl, SSL_CTX* ssl, const Peer& peer) {
    const ServerTrust trust = TrustOfServer(GetActorUID(), peer.host + ":" + peer.port);
    if (trust.kind == ServerTrust::kPinned) {
        pins.push_back(trust.certificate);
        return Utils::VerifyCertCtxFn(curl, ssl, pins.back().data());
    }
    X509_VERIFY_PARAM* param = SSL_CTX_get0_param(ssl);
    if (peer.host.empty() ||
        (X509_VERIFY_PARAM_set1_ip_asc(param, peer.host.c_str()) != 1 &&
         X509_VERIFY_PARAM_set1_host(param, peer.host.c_str(), peer.host.size()) != 1)) {
        return CURLE_PEER_FAILED_VERIFICATION;
    }
    LoadRoots(ssl);
    Install(ssl, CheckChain, nullptr);
    return CURLE_OK;
}

CURLcode CheckCtxFn(CURL* curl, void* ctx, void* data) noexcept try {
    if (ctx == nullptr) {
        return CURLE_SSL_CERTPROBLEM;
    }
    auto* ssl = static_cast<SSL_CTX*>(ctx);
    auto& handshakes = *static_cast<Handshakes*>(data);
    const Peer peer = CurrentPeer(curl);
    const bool redirected = IsRedirected(curl);
    if (!redirected) {
        handshakes.asked = peer;
    }
    handshakes.check.led_on = redirected && (peer.host.empty() || !(peer == handshakes.asked));
    return handshakes.check.led_on ? handshakes.CheckOther(curl, ssl, peer)
                                   : handshakes.CheckAsked(curl, ssl);
} catch (const std::exception&) {
    return CURLE_OUT_OF_MEMORY;
}

}  // namespace

CURLcode Utils::VerifyCertCtxFn(CURL*, void* ctx, void* data) noexcept {
    if (ctx == nullptr) {
        return CURLE_SSL_CERTPROBLEM;
    }
    auto* ssl = static_cast<SSL_CTX*>(ctx);
    SSL_CTX_set_verify_depth(ssl, 1);
    Install(ssl, CheckCopy, data);
    return CURLE_OK;
}

bool CheckServer(const char* user, const char* password, const std::string& url,
                 ServerCheck& check) {
    KeepCertificate(nullptr);  // never tell the user of another server's certificate
    curl_global_init(CURL_GLOBAL_DEFAULT);
    Handshakes handshakes{check, {}, {}};  // outlive the handle that points to them
    const UniqueCurl curl = NewCurl();
    return curl != nullptr &&
           SetCurlVerification(curl.get(),
                               !check.save && check.trust.kind == ServerTrust::kBundle) &&
           SetCurlOption(curl.get(), CURLOPT_SSL_CTX_FUNCTION, &CheckCtxFn) &&
           SetCurlOption(curl.get(), CURLOPT_SSL_CTX_DATA, &handshakes) &&
           SetCurlOption(curl.get(), CURLOPT_SSLVERSION,
                         static_cast<long>(CURL_SSLVERSION_TLSv1)) &&
           SetCurlTarget(curl.get(), user, password, url) && PerformCurl(curl.get(), url);
}

bool Utils::VerifyCert(const char* user, const char* password, const char* url,
                       const char* certPath) {
    if (url == nullptr || certPath == nullptr) {
        LOG_ERROR("Wrong parameters");
        return Fail(VFS_ERR_BAD_PARAM);
    }
    return NoThrow(VFS_ERR_FAILED, [&] {
        ServerCheck check;
        return ReadTrust(certPath, check.trust) ? CheckServer(user, password, url, check)
                                                : Fail(VFS_ERR_FAILED);
    });
}

}  // namespace ZYROVFS
