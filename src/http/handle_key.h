/** What the connections in a libcurl handle stand for. */
#ifndef ZYROVFS_HTTP_HANDLE_KEY_H
#define ZYROVFS_HTTP_HANDLE_KEY_H

#include <string>

namespace ZYROCloud {

/**
 * All that decides whether a connection, a TLS session or parsed roots may serve another request,
 * and that libcurl does not compare by itself. Equal keys may use the same handle; plain data.
 */
struct HandleKey {
    unsigned int user = 0;    ///< on whose behalf
    std::string trust;        ///< how servers are checked, and what that depends on, as it is now
    std::string credentials;  ///< of the account, as a digest: some are proved once a connection
    std::string route;        ///< proxies, their credentials included
    const void* share = nullptr;  ///< the store that its TLS sessions are in; null for its own

    bool operator==(const HandleKey& other) const;
    bool operator!=(const HandleKey& other) const { return !(*this == other); }
    /** The certificate must be the one that the user has saved. */
    bool IsPinned() const;
};

namespace handle_key {

/** For the services: the acting user, the CA bundle, no account, the environment's proxies. */
HandleKey ForServices(const void* share = nullptr);

/** `trust` for exactly the certificate `text`, saved as `path`; null for none, which no server
 * fits. */
std::string Pin(const std::string& path, const char* text);
/** `trust` for the keys of SSH hosts in a file, which may be missing. */
std::string KnownHosts(const std::string& path);
/** `route` past all proxies. */
std::string Direct();
std::string Credentials(const std::string& user, const std::string& password);
/** One word for a key, by which keys can be told apart. */
std::string Label(const HandleKey& key);

}  // namespace handle_key

}  // namespace ZYROCloud

#endif
