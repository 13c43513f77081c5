/**
 * Driver for OneDrive's Live REST interface. Items are known by id; the root has one, too, and is
 * asked for. Names are unique in a folder without regard to case, so that a path leads to one item:
 * by the mounted tree, which is fast, or by a walk down the remote tree. Large files go another way
 * than all else, to the owner's storage host in the fragments of a BITS session.
 */
#ifndef ZYROVFS_CLOUD_ONEDRIVE_H
#define ZYROVFS_CLOUD_ONEDRIVE_H

#include <json/value.h>

#include <string>
#include <vector>

#include "cloud/driver_of.h"

namespace ZYROCloud {

class OneDrive : public DriverOf<OneDriveErrorHandler> {
  public:
    using DriverOf::DriverOf;

    // --- account and metadata ------------------------------------------------------------------

    /** "server_path" and "url" for a transfer; `action` begins with "Download" or "Upload". */
    bool GetMetaDataByURI(const std::string& uri, Json::Value& meta,
                          const std::string& action) override;
    /** What the service says of the content, without fetching it; 0 when it does not say. */
    bool GetFileSize(const std::string& uri, long long* size) override;
    /** VFS_ERR_FILE_TOO_LARGE above 10 GiB. */
    bool CanFileUpload(unsigned long long size) override;
    _tag_cloud_type GetCloudType() override { return CLOUD_TYPE_ONEDRIVE; }
    bool GetAccountInfo(const Json::Value& params, Json::Value& out) override;
    /** "quota" and "available", in bytes. */
    bool GetQuota(Json::Value& out);
    /** "" is the root. `params` are not sent. */
    bool GetFileInfo(const std::string& id, const Json::Value& params, Json::Value& out) override;
    /** All items of a folder, hidden names too; "" is the root. `params` are not sent. */
    bool ListFolder(const std::string& id, const Json::Value& params, Json::Value& out) override;
    /** Items anywhere in the account whose name matches, as the service understands that. */
    bool SearchFile(const std::string& name, Json::Value& out);
    bool IsDir(const Json::Value& item);
    /** Id of a description; "" when it has none. */
    std::string GetFileID(const Json::Value& item);
    /** Asked anew each time; "" on failure. */
    std::string GetRootFileID();

    bool UpdateAccountInfo() override;
    /** Takes the one OAuth client of this service, whatever the profile says. */
    bool SetRefreshTokenParam(APIHandler* handler) override;

    // --- from a server path to an item id ------------------------------------------------------

    /** "" when the mounted tree does not know it. */
    std::string GetFileIDByPathFromFuse(const std::string& path);
    /** The same, with the root's id, for one request, for "" and "/". */
    std::string GetFileIDByPath(const std::string& path);
    /** Ids of a name, in any case, in a folder (the first one) or, with `search`, anywhere (all).
     * `kind` is not read. */
    bool GetFileIDByNameFromServer(const std::string& parent_id, const std::string& name,
                                   const std::string& kind, bool search,
                                   std::vector<std::string>& out);
    /** False when a part of the path is not there. */
    bool GetFileIDByPathFromServerRecursive(const std::string& parent_id, const std::string& path,
                                            const std::string& kind, const std::string& hint,
                                            std::string& out);
    /** VFS_ERR_NOT_FOUND. Only `path` is read. */
    bool GetFileIDByPathFromServer(const std::string& root, const std::string& path,
                                   const std::string& kind, const std::string& hint,
                                   std::string& out);
    bool GetFileInfoByPathFromServer(const std::string& path, const std::string& kind,
                                     const Json::Value& params, const std::string& hint,
                                     Json::Value& out);

    // --- changes -------------------------------------------------------------------------------

    /** "" and "root" are the root. `params` are not sent. */
    bool CreateFolder(const std::string& parent, const std::string& name,
                      const Json::Value& params) override;
    bool Delete(const std::string& id) override;
    bool Rename(const std::string& id, const std::string& new_name) override;
    /** Server paths; the item keeps its name, whatever `to` ends in. VFS_ERR_NOT_FOUND. */
    bool Move(const std::string& from, const std::string& to) override;
    /** Item `id` into the folder `new_parent`; `old_parent` is not read. VFS_ERR_NOT_FOUND. */
    bool Move(const std::string& old_parent, const std::string& id, const std::string& new_parent);
    /** Server paths; a file in the way is replaced. The copy keeps its source's name. */
    bool Copy(const std::string& from, const std::string& to) override;
    /** VFS_ERR_IS_DIRECTORY for a folder in the way, VFS_ERR_NOT_FOUND. */
    bool DoCopy(const std::string& from, const std::string& to, bool overwrite);
    /** The service has no call for it; always true. */
    bool SetModifiedDate(const std::string& id, const std::string& date);

    // --- contents ------------------------------------------------------------------------------

    bool UploadProcess(XferData* xfer, const Json::Value& meta) override;
    /** One request to the REST interface, up to 32 MiB. */
    bool DirectUpload(XferData* xfer, const Json::Value& meta);
    /** A BITS session with the storage host, in fragments of up to 32 MiB. */
    bool ChunkedUpload(XferData* xfer, const Json::Value& meta);
    bool StartUploadSession(const std::string& url, std::string& session);
    /**
     * The fragment of `length` bytes at `*offset` of a file of `total`. However it ends, `*offset`
     * becomes the number of bytes that the service says it has, at most the fragment's end; 0 when
     * it says nothing.
     */
    bool StartUpload(XferData* xfer, const std::string& url, const std::string& session,
                     long long* offset, long long length, long long total);
    bool CloseUploadSession(const std::string& url, const std::string& session);
    bool DownloadProcess(XferData* xfer, const Json::Value& meta) override;

  private:
    bool SendWhole(XferData& xfer, const Json::Value& meta, const std::string& url);
    /** Whether the last request's status says so. VFS_ERR_TRANSFER_ABORTED. */
    bool HasTaken();
    bool SendFragment(XferData* xfer, const std::string& url, long long length);
};

}  // namespace ZYROCloud

#endif
