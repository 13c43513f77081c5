/** Making drivers, text helpers that they share, logging in, and the OAuth clients that tokens are
 * made and renewed with. */
#ifndef ZYROVFS_CLOUD_UTILS_H
#define ZYROVFS_CLOUD_UTILS_H

#include <json/value.h>

#include <string>

#include "zyrovfs/cloud.h"
#include "zyrovfs/export.h"
#include "zyrovfs/server.h"

namespace ZYROCloud::Utils {

// --- drivers. The caller owns what it gets; null is a failure, told by a log line. -------------

/** The driver of a kind, for a profile with its credentials in plain text and its "server_id". */
ZYROVFS_API Cloud* CreateCloudByConfig(_tag_cloud_type type, unsigned int uid,
                                       const Json::Value& config);
/** The driver of a stored profile or connection. */
ZYROVFS_API Cloud* CreateCloudByServerID(unsigned int uid, const std::string& server_id,
                                         ZYROVFS::Server::VFS_CONFIG_MODE mode);
/** The same for any location below a server id. */
ZYROVFS_API Cloud* CreateCloudByURI(unsigned int uid, const std::string& uri,
                                    ZYROVFS::Server::VFS_CONFIG_MODE mode);

// --- accounts -----------------------------------------------------------------------------------

/** What a service tells of an account; -1 for sizes that it does not tell. */
struct AccountSummary {
    std::string name;
    std::string email;
    long long used = -1;   ///< bytes
    long long total = -1;  ///< bytes
};

/** Asks the service of a driver for its account. False leaves the cause in the driver's record:
 * VFS_ERR_NOT_SUPPORTED for a driver of servers, which have no accounts in this sense. */
ZYROVFS_API bool GetAccountSummary(Cloud* cloud, AccountSummary& out);

// --- text ---------------------------------------------------------------------------------------

/** By the text in front of "://"; text without it is CLOUD_TYPE_UNKNOWN. */
ZYROVFS_API _tag_cloud_type GetCloudTypeFromURI(const std::string& uri);

/** A backslash in front of each quote. A backslash of the text itself stays single. */
ZYROVFS_API std::string EscapeSingleQuote(const std::string& text);
ZYROVFS_API std::string EscapeDoubleQuote(const std::string& text);

// --- logging in ---------------------------------------------------------------------------------

/** A login that has begun. Whoever ends it needs all of it; `verifier` is a secret. */
struct Login {
    std::string service;
    std::string client_id;
    std::string redirect_uri;
    std::string state;
    std::string verifier;
    std::string address;  ///< to be opened in a browser: the service's own page
};

/**
 * Begins to get tokens for an account of `service` ("box", "dropbox", "google", "onedrive"): an
 * authorization code with PKCE. `client_id` is one of those that AddClient has stored; empty for
 * the only one, and for OneDrive, whose renewals know one client alone. The service sends the
 * browser to `redirect_uri`, which must be registered with the client. VFS_ERR_BAD_PARAM for an
 * unknown service or client, VFS_ERR_CONFIG_READ, VFS_ERR_FAILED.
 */
ZYROVFS_API bool BeginLogin(const std::string& service, const std::string& client_id,
                            const std::string& redirect_uri, Login& out);

/** Why a login did not end well, in the service's words; both may be empty. */
struct LoginRefusal {
    std::string error;  ///< a word of RFC 6749, such as "access_denied"
    std::string description;
};

/**
 * Ends it. `answer` is where the service sent the browser: the whole address, or what follows its
 * question mark. `profile` becomes what Server::Add wants for a saved profile, tokens in plain
 * text. Needs Cloud::InitCurlGlobal. VFS_ERR_BAD_PARAM for what is no answer to this login, and
 * nothing is sent then; VFS_ERR_ACCESS_DENIED for a person who refused; the code of a request that
 * failed; VFS_ERR_CLOUD_FAILED for an answer without tokens.
 */
ZYROVFS_API bool FinishLogin(const Login& login, const std::string& answer, Json::Value& profile,
                             LoginRefusal& refusal);

// --- OAuth clients of this installation ---------------------------------------------------------

/**
 * Deciphers a client secret into `out`, which is cleared over its `size` first. 1, or 0 for a text
 * that this machine did not encipher or that does not fit with its NUL.
 */
ZYROVFS_API int Decrypt(char* in, char* out, int size);

/**
 * The OAuth clients in the service configuration, by service ("box", "dropbox", "google",
 * "onedrive") and client id. For root. Adding replaces the secret of a known id; removing what is
 * not there is a success. Secrets are kept enciphered and never given back. `out` becomes an object
 * of arrays of client ids. VFS_ERR_BAD_PARAM, VFS_ERR_CONFIG_READ, VFS_ERR_CONFIG_WRITE.
 */
ZYROVFS_API bool AddClient(const std::string& service, const std::string& client_id,
                           const std::string& secret);
ZYROVFS_API bool RemoveClient(const std::string& service, const std::string& client_id);
ZYROVFS_API bool ListClients(Json::Value& out);

}  // namespace ZYROCloud::Utils

#endif
