/** The check of a server's certificate inside a TLS handshake of libcurl. */
#ifndef ZYROVFS_MOUNT_SSL_VERIFY_H
#define ZYROVFS_MOUNT_SSL_VERIFY_H

#include <curl/curl.h>
#include <openssl/x509.h>

#include <functional>
#include <string>

#include "mount/server_trust.h"

namespace ZYROVFS {

/** How to check a server, and what came of it. */
struct ServerCheck {
    ServerTrust trust;
    /** Instead of `trust`: any certificate of the server is accepted and handed over here. */
    std::function<bool(X509*)> save;

    bool saved = false;   ///< what the last call of `save` answered
    bool led_on = false;  ///< the last handshake was with a server to which the first one led
};

/**
 * Asks for `url` once. The handshake decides, not what the server answers; one to which it leads is
 * checked for itself, by what the acting user has saved for it or by the CA bundle. Codes as
 * Utils::SSLVerifyPeer.
 */
bool CheckServer(const char* user, const char* password, const std::string& url,
                 ServerCheck& check);

namespace Utils {

/**
 * For CURLOPT_SSL_CTX_FUNCTION; CURLOPT_SSL_CTX_DATA is the text of a saved certificate in PEM form
 * and must outlive the handle's connections. The handshake then goes through only with that
 * certificate.
 */
CURLcode VerifyCertCtxFn(CURL* curl, void* ctx, void* data) noexcept;

}  // namespace Utils

}  // namespace ZYROVFS

#endif
