/** What the page can ask for. Each answers by itself, or throws a Failure before it has. */
#ifndef ZYROVFS_WEB_ACTION_H
#define ZYROVFS_WEB_ACTION_H

#include "identity.h"
#include "request.h"

namespace web {

// --- what there is

/** "user" and "connections", each with its "state". */
void ListConnections(const User& user, const Request& request);
/** Saved profiles that are not connected. */
void ListProfiles(const User& user, const Request& request);
/** What the catalogue offers, with the fields of a form for each. */
void ListProtocols(const User& user, const Request& request);
/** "entries" of the folder "path" of "connection". "left_out" counts those whose names cannot be
 * shown, and those beyond the bound. */
void ListFolder(const User& user, const Request& request);

// --- connections

/** Bodies: "connection"; for a new one the fields of its form, or a "profile" that is saved. */
void Connect(const User& user, const Request& request);
void Add(const User& user, const Request& request);
void Disconnect(const User& user, const Request& request);
void Forget(const User& user, const Request& request);

// --- changes

/** Bodies: "connection", "path"; a new "name"; the "folder" that an item is moved to. */
void MakeFolder(const User& user, const Request& request);
void Rename(const User& user, const Request& request);
void Move(const User& user, const Request& request);
/** A folder only when it is empty, or with "recursive" true. */
void Delete(const User& user, const Request& request);

// --- contents

/** A form with one file, to "path" of "connection"; "size" of the file when the page knows it. */
void Upload(const User& user, const Request& request);
/** How far the upload "id" is. */
void ShowProgress(const User& user, const Request& request);
void CancelUpload(const User& user, const Request& request);
/** The file at "path" of "connection", or the part that a header "Range" names; a document in the
 * format "export". */
void Download(const User& user, const Request& request);
/** What is at each "path" of "connection" as one ZIP. */
void SendArchive(const User& user, const Request& request);

// --- copies in the background

/** Body: "from" with "connection" and "paths", "to" with "connection" and "path". */
void StartCopy(const User& user, const Request& request);
void ListTasks(const User& user, const Request& request);
void CancelTask(const User& user, const Request& request);
void RemoveTask(const User& user, const Request& request);

}  // namespace web

#endif
