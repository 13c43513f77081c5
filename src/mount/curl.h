/** The short libcurl conversations that look at a server's certificate. */
#ifndef ZYROVFS_MOUNT_CURL_H
#define ZYROVFS_MOUNT_CURL_H

#include <curl/curl.h>

#include <memory>
#include <string>

#include "core/error_cell.h"
#include "core/handle.h"
#include "core/log.h"

namespace ZYROVFS {

using UniqueCurl = std::unique_ptr<CURL, FreeWith<curl_easy_cleanup>>;

/** curl_easy_setopt that logs a refusal and gives VFS_ERR_FAILED. A check that could not be set up
 * must not run without it, so the result counts. */
template <typename T>
bool SetCurlOption(CURL* curl, CURLoption option, T value, SourceLine at = SourceLine::Here()) {
    const CURLcode code = curl_easy_setopt(curl, option, value);
    if (code == CURLE_OK) {
        return true;
    }
    LOG_ERROR_AT(at, "Failed to set curl option %d, code=%d, err=%s", static_cast<int>(option),
                 static_cast<int>(code), curl_easy_strerror(code));
    return Fail(VFS_ERR_FAILED, at);
}

/** A handle with what all these conversations share; null with VFS_ERR_FAILED. */
UniqueCurl NewCurl();

/** Turns libcurl's own checks of certificate and host name on, against the CA bundle, or off. */
bool SetCurlVerification(CURL* curl, bool on);

/** URL, escaped where it can be, and the credentials that are not empty or null. */
bool SetCurlTarget(CURL* curl, const char* user, const char* password, const std::string& url);

/**
 * Runs the conversation, whose success is any answer; a name that does not resolve is tried once
 * more over IPv4. False leaves VFS_ERR_CERT_UNTRUSTED with the certificate as detail,
 * VFS_ERR_HOST_UNREACHABLE, VFS_ERR_ACCESS_DENIED or VFS_ERR_FAILED. `url` is for the log.
 */
bool PerformCurl(CURL* curl, const std::string& url);

}  // namespace ZYROVFS

#endif
