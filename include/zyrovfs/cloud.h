/**
 * Remote storage that the library speaks to by itself: one driver object for one connection, and
 * moving file contents through it.
 *
 * A driver belongs to whoever made it and is used by one thread at a time. Operations answer bool
 * and leave the cause of a failure in the driver's own error record, not in the error cell; a true
 * result leaves the record as it was.
 *
 * Three forms of a path: a server path is the path inside the remote account and begins with a
 * slash; a share path (`uri`) is the server id with the server path behind it; a full path is where
 * the item stands on the local mount.
 */
#ifndef ZYROVFS_CLOUD_H
#define ZYROVFS_CLOUD_H

#include <json/value.h>

#include <string>

#include "zyrovfs/error.h"
#include "zyrovfs/export.h"

namespace ZYROCloud {

class APIHandler;

using ZYROVFS::__tag_vfs_err_;

/** Kinds of remote storage, as GetCloudType tells them. */
enum _tag_cloud_type : int {
    CLOUD_TYPE_UNKNOWN = 0,
    CLOUD_TYPE_VFS = 1,
    CLOUD_TYPE_GOOGLE = 2,
    CLOUD_TYPE_DROPBOX = 3,
    CLOUD_TYPE_ONEDRIVE = 4,
    CLOUD_TYPE_ONEDRIVE_SHORT = 5,
    CLOUD_TYPE_BOX = 6,
    CLOUD_TYPE_HUBIC = 7,
    CLOUD_TYPE_AWSS3 = 8,
};

/** Asks whether to stop: anything but 0 ends the transfer as cancelled. */
using CancelCallback = int (*)();
/** Told after each piece: its bytes, and all bytes so far. The answer is not looked at. */
using ProgressCallback = int (*)(unsigned long long chunk, unsigned long long done);
/** Asked before each piece of `chunk` bytes: how many bytes to take next, for a limited rate. */
using SpeedCallback = long long (*)(unsigned long long chunk, unsigned long long done);

/** Told after each piece of a relayed upload: bytes of the request so far, and all of them. */
using RelayProgressCallback = void (*)(unsigned long long current, unsigned long long total);
/** Asked before each piece of a relayed upload, with the size of the last one: how many bytes to
 * take next, for a limited rate; 0 or more than fit is as many as fit. */
using RelaySpeedCallback = long long (*)(unsigned long long last, unsigned long long current,
                                         unsigned long long total);

/** A read or write function as libcurl calls it. */
using CurlCallback = size_t (*)(char* data, size_t size, size_t count, void* context);

/** Where the bytes of one transfer come from or go to. */
struct XferContext {
    int fd = -1;  ///< not owned; -1 is a stream, which cannot be read again from the start
    char* buffer = nullptr;
    unsigned long long buffer_used = 0;
    bool limited = false;  ///< reading stops at `chunk_left`
    unsigned int chunk_size = 0;
    unsigned int chunk_left = 0;
    bool can_retry = true;  ///< false once a byte was written
    void* curl = nullptr;   ///< easy handle of the driver, set by Upload and Download
};

/** One transfer as a driver gets it. */
struct XferData {
    CurlCallback callback;
    int direction;  ///< 0 download, `callback` writes; 1 upload, `callback` reads
    XferContext* context;
};

/** A multipart upload: text parts, then the bytes of `xfer` in the part `name`. */
struct FormUploadData {
    XferData* xfer;
    std::string name;
    unsigned long long size;  ///< all ones is a size not known: the form goes out in chunks
    Json::Value params;
};

/** A browser's request that carries a file, shared with the web layer, whose own record may go on
 * behind these members. */
struct _tag_cgi_upload_progress_ {
    unsigned long long current;  ///< bytes of the request consumed so far
    unsigned long long total;    ///< the request's content length
    /** 0; what GetUploadErrorCode says of the driver; -7 when the browser sent nothing for an hour
     * or its bytes cannot be waited for; -9 for the rest. */
    int error;
};

class ZYROVFS_API Cloud {
  public:
    Cloud();
    Cloud(unsigned int uid, const std::string& server_id);
    virtual ~Cloud();
    Cloud(const Cloud&) = delete;
    Cloud& operator=(const Cloud&) = delete;

    // --- what a driver offers. `id` is the driver's own way of naming an item. ----------------

    /** What a transfer of `uri` needs to know; `action` is "Download" or "Upload". */
    virtual bool GetMetaDataByURI(const std::string& uri, Json::Value& meta,
                                  const std::string& action);
    /** Size in bytes of the item at `uri`. */
    virtual bool GetFileSize(const std::string& uri, long long* size);
    /** Files that a move or copy leaves out, such as "desktop.ini". */
    virtual bool IsSkipMVCPFile(const std::string& path);
    /** Whether the service takes a file of this size; all ones is a size not known.
     * VFS_ERR_FILE_TOO_LARGE. */
    virtual bool CanFileUpload(unsigned long long size);
    virtual _tag_cloud_type GetCloudType() = 0;
    virtual bool GetAccountInfo(const Json::Value& params, Json::Value& out) = 0;
    virtual bool GetFileInfo(const std::string& id, const Json::Value& params,
                             Json::Value& out) = 0;
    virtual bool ListFolder(const std::string& id, const Json::Value& params, Json::Value& out) = 0;
    virtual bool CreateFolder(const std::string& parent, const std::string& name,
                              const Json::Value& params) = 0;
    virtual bool Delete(const std::string& id) = 0;
    virtual bool Rename(const std::string& id, const std::string& new_name) = 0;
    virtual bool Copy(const std::string& from, const std::string& to) = 0;
    virtual bool Move(const std::string& from, const std::string& to) = 0;
    virtual bool UploadProcess(XferData* xfer, const Json::Value& meta) = 0;
    virtual bool DownloadProcess(XferData* xfer, const Json::Value& meta) = 0;
    virtual bool Init() = 0;
    virtual bool SetAPIErrorHandler(APIHandler* handler) = 0;

    // --- paths --------------------------------------------------------------------------------

    bool GetFullPathByURI(const std::string& uri, std::string& out);
    std::string GetSharePathByServerPath(const std::string& path);
    bool GetFullPathByServerPath(const std::string& path, std::string& out);
    /** What follows the first occurrence of the server id; empty when there is none. */
    std::string GetServerPathBySharePath(const std::string& uri);
    /** Names that the file tree does not show. */
    static bool IsHiddenFilePath(const std::string& path, const std::string& name);

    // --- error record: members "code" and "msg", and those of the service's answer -------------

    void SetError(const Json::Value& error);
    void SetError(__tag_vfs_err_ code, const std::string& msg);
    Json::Value GetError() const;
    /**
     * VFS_ERR_NONE for a new driver. An operation that fails sets a code; one that succeeds leaves
     * what was there before it, since nothing clears the code between operations. Delete of what
     * was gone already may answer true and leave VFS_ERR_NOT_FOUND.
     */
    __tag_vfs_err_ GetErrorCode() const;
    /** The code as a value of GIOErrorEnum. */
    int GetGIOError() const;
    /** What the last request's failure asks for. */
    bool IsNeedRetry();
    unsigned int GetRetrySleepTime();

    APIHandler* GetAPIHandler();
    std::string GetServerID() const;

    // --- moving file contents. One transfer per process at a time. Callbacks may be null. ------

    /**
     * Copies `size` bytes from one driver to another through memory; each works on a thread of its
     * own. False leaves the platform error; the source's failure is reported before the target's.
     */
    static bool CopyFile(Cloud* src, Cloud* dst, const std::string& src_uri,
                         const std::string& dst_uri, long long size, ProgressCallback progress,
                         CancelCallback cancel, SpeedCallback speed);
    /** Sends `size` bytes from the descriptor's position; a retry begins at its position 0. -1 is a
     * size not known: that of a regular file is found out, anything else is sent to its end. */
    static bool UploadFile(Cloud* cloud, const std::string& uri, int fd, long long size,
                           ProgressCallback progress, CancelCallback cancel, SpeedCallback speed);
    /** Receives into the descriptor, from its position on; what broke off goes on where it stopped,
     * as long as each pass gains a MiB. */
    static bool DownloadFile(Cloud* cloud, const std::string& uri, int fd, long long size,
                             ProgressCallback progress, CancelCallback cancel, SpeedCallback speed);
    /**
     * Receives `len` bytes from `from` on. `buffer` must have room for len + 1 bytes: services are
     * asked for one byte more than is wanted. `*got` counts what came.
     */
    static bool DownloadFileToBuffer(Cloud* cloud, const std::string& uri, char* buffer,
                                     long long from, long long len, long long* got,
                                     ProgressCallback progress, CancelCallback cancel,
                                     SpeedCallback speed);
    /** Exit status of an upload program, negative, by the driver's code; -9 for the rest. */
    static int GetUploadErrorCode(Cloud* cloud);

    // --- relay between a browser and a driver, for a CGI program: no temporary file. One relay per
    // process at a time; it is a transfer, too. The pointers must outlive the relay.
    // ----------------

    /**
     * Prepares the upload of a file that the program's standard input brings: the multipart body
     * of a request, positioned at the first byte of the file's content, `progress->current` bytes
     * of `progress->total` consumed. `boundary` is the text that closes the part, its leading
     * dashes included, of which the first 253 bytes count. `size` is the file's, -1 when it is not
     * known; one that does not go with the request makes RelayUploadFile fail. `transferred`, if
     * given, is added the bytes of the file. `cancel`, `relay_progress` and `speed` may be null.
     * False, with `progress->error` set to -9, for a null argument, an empty boundary, and without
     * a standard input.
     */
    static bool RelayUploadInit(Cloud* cloud, const char* uri, _tag_cgi_upload_progress_* progress,
                                const char* boundary, RelayProgressCallback relay_progress,
                                CancelCallback cancel, RelaySpeedCallback speed,
                                unsigned long long* transferred, long long size);
    /**
     * Sends what RelayUploadInit has prepared, up to the first place in the last 131072 bytes of
     * the request where the boundary begins a line: what follows the file in the request must be
     * shorter than that. False leaves `progress->error` and the driver's record; a file that did
     * not come whole, or not of the size that was told, is a failure. Needs a RelayUploadInit of
     * its own each time. The rest of a request that failed is left in standard input.
     */
    static bool RelayUploadFile();
    /**
     * Prepares downloads of `path`, a share path. `mime`, if not empty, asks for a document in this
     * format, where the service has formats. False for a null `cloud` or `path`.
     */
    static bool RelayDownloadInit(Cloud* cloud, const char* path, SpeedCallback speed,
                                  const std::string& mime);
    /** `mime` as it was given, with the file's size, or with 0 in its place when a format was asked
     * for: that size is not known beforehand. */
    static bool RelayDownloadGetFileSizeAndMimeType(long long* size, std::string& mime);
    /**
     * Receives into `fd`. Services are asked for the bytes from `from` up to and with the one at
     * `to`; equal numbers ask for the whole file, and one byte cannot be asked for alone. May be
     * called again for another part. False when not all of it came, and for numbers out of order.
     */
    static bool RelayDownloadFile(int fd, long long from, long long to);

    bool Upload(XferData* xfer, const Json::Value& meta);
    bool Download(XferData* xfer, const Json::Value& meta);
    /** Gives callback and context to the handler; false only for null. */
    bool InitXferData(XferData* xfer);

    // --- libcurl for the whole process, before any thread and after the last -------------------

    static void InitCurlGlobal();
    static void CleanupCurlGlobal();

    static void* _gShare_handle;
    static void* _glockarray;
    static bool _gblInitCurlGlobal;

  protected:
    unsigned int uid;
    std::string server_id;
    APIHandler* api;  ///< owned; null when memory ran out
    Json::Value error;
};

}  // namespace ZYROCloud

#endif
