/**
 * Server ids as URIs. An id has its user as it is, and an account may be called "amy@example.org",
 * or have a '/', '?' or '#' in its name: read as a URI, that would be another server.
 */
#ifndef ZYROVFS_MOUNT_SERVER_URI_H
#define ZYROVFS_MOUNT_SERVER_URI_H

#include <libsoup/soup.h>

#include <string>

namespace ZYROVFS {

/** `user` with these four escaped, as it may stand in a URI. */
std::string EscapeUser(const std::string& user);

/**
 * A server id, also one with a path behind it, as a URI that reads as it is meant. The user ends
 * with the last '@' in front of the path. One with a '/', '?' or '#' in it is known in an id
 * without a path only: there the text ends with '@', host and port. URLs of http and https
 * are no ids and have no such user. Other text is given back as it is.
 */
std::string ReadableUri(const std::string& id);

/** A readable URI without its user. */
std::string WithoutUser(const std::string& uri);

/** A URI as GIO is told of it: without escapes, but for those that the user needs. */
std::string GioUri(SoupURI* uri);

}  // namespace ZYROVFS

#endif
