/** What the page can ask for. Each answers by itself, or throws a Failure before it has. */
#ifndef ZYROVFS_WEB_ACTION_H
#define ZYROVFS_WEB_ACTION_H

#include "identity.h"
#include "request.h"

namespace web {

/** "connections": the user's own, with "connect_status". */
void ListConnections(const User& user, const Request& request);
/** "entries" of the folder "path" of "connection": "name", "folder", "size", "modified". "left_out"
 * counts those whose names cannot be shown, and those beyond the bound. */
void ListFolder(const User& user, const Request& request);
/** Bodies: "connection", "path", and for a rename the new "name". */
void MakeFolder(const User& user, const Request& request);
void Rename(const User& user, const Request& request);
/** A folder only when it is empty, or with "recursive" true. */
void Delete(const User& user, const Request& request);
/** A form with one file, to "path" of "connection"; "size" of the file when the page knows it. */
void Upload(const User& user, const Request& request);
/** The file at "path" of "connection", or the part that a header "Range" names. */
void Download(const User& user, const Request& request);

}  // namespace web

#endif
