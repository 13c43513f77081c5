/**
 * Helpers that the library shares with its callers: the mount lock, processes, files, dates, URIs,
 * certificates and local paths. A function that answers bool logs its failure; it sets a failure
 * code only where its comment says so. Functions "of the user" act for GetActorUID().
 */
#ifndef ZYROVFS_UTILS_H
#define ZYROVFS_UTILS_H

#include <sys/time.h>
#include <sys/types.h>

#include <string>

#include "zyrovfs/export.h"

namespace ZYROVFS::Utils {

// --- mount lock of the user, across processes -------------------------------------------------

/**
 * Takes the lock, waiting up to 110 seconds. Locks nest and count; a shared lock cannot be turned
 * into an exclusive one, which fails at once (platform error 0x400, as a wait that ran out).
 */
ZYROVFS_API bool LockMnt(bool exclusive);

/** Releases one level. 0, or -1 when the system call failed (0x500). Harmless when nothing is held.
 */
ZYROVFS_API int UnLockMnt();
ZYROVFS_API int ForceUnLockMnt();

// --- processes --------------------------------------------------------------------------------

/** True when `pid` lives, is called exactly `name` and belongs to `uid`. */
ZYROVFS_API bool IsProcAlive(int pid, const char* name, unsigned int uid);

/**
 * Ends a process by SIGTERM, if it is still the one meant; one that is not counts as ended. With
 * `wait`, waits up to 30 seconds for it to go, and answers true whether it went or not.
 */
ZYROVFS_API bool KillProc(int pid, const char* name, unsigned int uid, bool wait);

/**
 * Ends the background tasks of a user that move files of the connection `uri`: those whose
 * property "data" has "is_vfs" true and an object "vfs_uri" with the member `uri`. "pid" tells the
 * process, "proc_name" (may be left out) the program that it must still be. Waits up to 3 seconds
 * for each. True also when some could not be ended. VFS_ERR_BAD_PARAM for a null argument,
 * VFS_ERR_FAILED.
 */
ZYROVFS_API bool KillProcByUsername(const char* uri, const char* user);
ZYROVFS_API bool KillProcByUID(const char* uri, unsigned int uid);

// --- folders and files ------------------------------------------------------------------------

/**
 * Makes every missing folder of `path`. `replaceNonDir` removes what stands in the way and is no
 * folder. `uid` and `gid` own what is made (both -1: left alone; one -1: the effective id). `mode`
 * -1 means 0777 under the umask, any other mode is taken as it is. `stop`, if given, points into
 * `path` at the end of the last component that the walk came to: the last one on success, the one
 * in question on failure. 0, or -1 with errno and the platform error telling why.
 */
ZYROVFS_API int MkdirP(const char* path, char** stop, int replaceNonDir, unsigned int uid,
                       unsigned int gid, unsigned int mode);

/** MkdirP as root (effective or saved). */
ZYROVFS_API bool CreateFolder(const char* path, char** stop, bool replaceNonDir, unsigned int uid,
                              unsigned int gid, unsigned int mode);

/** Writes one line to a file (mode 0600), its folders made. True without writing when another
 * process holds the file locked; a symbolic link in the file's place is refused. */
ZYROVFS_API bool CreateFile(const char* path, const char* text);

/** CreateFile with the decimal pid. */
ZYROVFS_API bool CreatePidFile(const char* path, int pid);

/** First line without its newline; false when there is none or it is empty. */
ZYROVFS_API bool GetFileLine(const char* path, std::string& out);

/** Owner, group and mode of a file as GIO tells them. Always 0; look at the outputs. */
ZYROVFS_API int GetFileInfo(const char* path, std::string& owner, std::string& group,
                            unsigned int& mode);

// --- text and dates ---------------------------------------------------------------------------

/** Converts between character sets; false leaves `text` unchanged in `out`. At most 4096 bytes. */
ZYROVFS_API bool ConvString(std::string& out, const char* text, const char* from, const char* to);

/** RFC 3339 with up to six digits of a second and any offset. */
ZYROVFS_API bool ParseRFC3339ToTime(const std::string& text, timeval& time);
/** UTC, with ".000Z" for whole seconds and six digits otherwise. */
ZYROVFS_API bool ParseTimeToRFC3339(const timeval* time, std::string& text);
ZYROVFS_API bool ParseEpochToRFC3339(long seconds, std::string& text);
/** "Sat, 21 Aug 2010 22:31:20 +0000" to epoch seconds; the clock time is taken as local time. */
ZYROVFS_API bool ParseDropboxTimeToEcho(const std::string& text, long& seconds);

// --- URIs -------------------------------------------------------------------------------------

/** Percent escapes undone, and one trailing slash dropped from a text longer than two characters.
 */
ZYROVFS_API std::string DecodeURI(const char* text);

/**
 * Server id (scheme, user, host, port) and what stands behind it. The user may have an '@' in it; a
 * '/', '?' or '#' only where nothing stands behind. The second is cut at the length
 * of the first, so `uri` must begin with exactly that text: escapes in user or host shift the cut.
 */
ZYROVFS_API bool GetURIParts(const char* uri, std::string& base, std::string& rest);
ZYROVFS_API bool GetBaseURI(const char* uri, std::string& base, bool withUser);
ZYROVFS_API bool GetProtocol(const char* uri, std::string& out);
/** Host, and ":port" when the URI or its scheme (http, https) has one. */
ZYROVFS_API bool GetHostWithPort(const char* uri, std::string& out);
/** dav:// to http://, davs:// to https://; other text unchanged. Always true. */
ZYROVFS_API bool ConvDavProtocol(const std::string& in, std::string& out);

// --- certificates of the user -----------------------------------------------------------------

/**
 * Decides whether the certificate of a dav:// or davs:// server is trusted: by the user's saved
 * copy, or by the CA bundle. `force` saves the certificate that the server shows now. What the
 * server answers behind the handshake, a refused password for one, does not matter. One to which it
 * leads is checked for itself, and nothing is saved for it. False leaves
 * VFS_ERR_CERT_UNTRUSTED with the certificate in the error detail, VFS_ERR_HOST_UNREACHABLE,
 * VFS_ERR_ACCESS_DENIED or VFS_ERR_FAILED.
 */
ZYROVFS_API bool SSLVerifyPeer(const char* user, const char* password, const char* url, bool force);

/** One check against `certPath` (a saved certificate, or the CA bundle), whatever was checked
 * before. Codes as SSLVerifyPeer. */
ZYROVFS_API bool VerifyCert(const char* user, const char* password, const char* url,
                            const char* certPath);

/** Saves the certificate that the server shows. Codes as SSLVerifyPeer. */
ZYROVFS_API bool DownloadCert(const char* user, const char* password, const char* url,
                              const char* certPath);

/** True when `path` is the CA bundle or a symbolic link to it. */
ZYROVFS_API bool isTrustRootCA(const char* path);

/** A whole file, NUL-terminated, to be released with free(); null on failure. */
ZYROVFS_API char* GetCertData(const char* path);

/** Escapes each part of a URL's path. */
ZYROVFS_API bool CurlURLEscape(const std::string& url, std::string& out);

// --- local paths of remote locations ----------------------------------------------------------

/** Password of the connection that `uri` belongs to, as it stands in the file (enciphered). */
ZYROVFS_API bool GetPasswordByConfig(const char* uri, std::string& out);

/** Local path from the connection's record; a connection that is missing is made first. */
ZYROVFS_API bool GetFullPathByConfig(const char* uri, std::string& base, std::string& rest,
                                     std::string& full);
ZYROVFS_API bool GetFullPathByConfig(const char* uri, std::string& full);

/** Local path as GIO tells it, else from the connection's record. Needs the user's session bus. */
ZYROVFS_API bool GetFullPath(const char* uri, std::string& full);

/**
 * The same for a path below a connection, asked in a child process that is the user. `uriOut`
 * becomes the remote path in the connection's code page, if there is one. A path with a newline in
 * it comes back torn between the two outputs. False only when the child could not be run to its
 * end: a location without a local path gives true and an empty `fullOut`.
 */
ZYROVFS_API bool GetFullPath(unsigned int uid, const char* serverId, const char* path,
                             const char* codepage, std::string& uriOut, std::string& fullOut);

}  // namespace ZYROVFS::Utils

#endif
