/** The check of a server's certificate inside a TLS handshake of libcurl. */
#ifndef ZYROVFS_MOUNT_SSL_VERIFY_H
#define ZYROVFS_MOUNT_SSL_VERIFY_H

#include <curl/curl.h>

namespace ZYROVFS::Utils {

/**
 * For CURLOPT_SSL_CTX_FUNCTION; CURLOPT_SSL_CTX_DATA is the text of a saved certificate in PEM form
 * and must outlive the transfer. The handshake then goes through only with that certificate, or,
 * once this process has checked a server against the CA bundle, only with a chain to a known CA.
 */
CURLcode VerifyCertCtxFn(CURL* curl, void* ctx, void* data) noexcept;

}  // namespace ZYROVFS::Utils

#endif
