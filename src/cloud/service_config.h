/**
 * What the owner of an installation supplies: base addresses of the services and OAuth clients. One
 * protected JSON document, "hosts" and "clients"; it is ignored, with a log line, when anyone but
 * its owner may write it.
 */
#ifndef ZYROVFS_CLOUD_SERVICE_CONFIG_H
#define ZYROVFS_CLOUD_SERVICE_CONFIG_H

#include <string>

namespace ZYROCloud {

/**
 * Base addresses, scheme and authority without a slash at the end; the services' public ones unless
 * the document's "hosts" has another under the function's name. Read anew on each call: a driver
 * lives for a few requests, and the document is short.
 */
std::string BoxApiHost();
std::string BoxUploadHost();
std::string BoxAccountHost();
std::string DropboxApiHost();
std::string DropboxContentHost();
std::string DropboxWebHost();
std::string GoogleApiHost();
std::string GoogleAccountsHost();
std::string LiveApiHost();
std::string LiveLoginHost();
/** Domain with port that follows "cid-ID": it begins with a dot. */
std::string LiveStorageDomain();

/** The enciphered secret of a service's OAuth client; false when there is none. */
bool FindClientSecret(const std::string& service, const std::string& client_id,
                      std::string& enciphered);

/** The first client id of a service that has one fixed client; empty when there is none. */
std::string FixedClientId(const std::string& service);

}  // namespace ZYROCloud

#endif
