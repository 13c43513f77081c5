/**
 * Whether a user trusts the server of a TLS connection. The one place that says so: the check
 * before a mount, transfers and the questions of the backends ask here.
 *
 * What the user has decided stands in the user's ssl folder, a file for each server: a copy of its
 * certificate, or a link to the CA bundle.
 */
#ifndef ZYROVFS_MOUNT_SERVER_TRUST_H
#define ZYROVFS_MOUNT_SERVER_TRUST_H

#include <sys/types.h>

#include <string>

#include "core/owned_folder.h"

namespace ZYROVFS {

/** dav is http under another name, and davs https. Schemes are compared without case. */
std::string WebUrl(const std::string& url);

/**
 * The name under which a user's trust in the server of a URL is kept: host and port, an IPv6
 * address without its brackets. False, logged, for a URL that names none.
 */
bool ServerFileName(const std::string& url, std::string& name);

/** How a user trusts one server. */
struct ServerTrust {
    enum Kind {
        kUndecided,  ///< nothing is saved
        kPinned,     ///< its certificate must be the saved one
        kBundle,     ///< a chain to the CA bundle, and the server's name in the certificate
    };
    Kind kind = kUndecided;
    std::string file;         ///< path of what is saved, or would be
    std::string certificate;  ///< the saved one as PEM
};

/** Reads what is saved as `trust.file`, for the acting user. False, logged, when there is nothing
 * to read. */
bool ReadTrust(const std::string& file, ServerTrust& trust);

/** What is saved in a user's ssl folder for the server of this name, now. */
ServerTrust TrustOfServer(uid_t user, const std::string& name);

/** Whether an entry can say whom to trust: a file, or a link to the bundle. What else a FIFO or a
 * link may be for, it is no certificate. */
bool IsSaved(const OwnedFolder& folder, const std::string& name);

/**
 * The entry of the folder that decides about a server, `name` itself when there is none. Addresses
 * of IPv6 may stand there in brackets, too, as people have written them.
 */
std::string SavedEntry(const OwnedFolder& folder, const std::string& name);

/** Removes all that stands for a server. False with errno when something stays. */
bool RemoveSaved(const OwnedFolder& folder, const std::string& name);

}  // namespace ZYROVFS

#endif
