/**
 * Driver for Dropbox. The service names items by path, so a server path is all that an operation
 * needs. Tokens are not renewed here: one that the service refuses is reported as it is.
 */
#ifndef ZYROVFS_CLOUD_DROPBOX_H
#define ZYROVFS_CLOUD_DROPBOX_H

#include <json/value.h>

#include <functional>
#include <string>

#include "cloud/driver_of.h"

namespace ZYROCloud {

struct SentBytes;

class Dropbox : public DriverOf<DropboxErrorHandler> {
  public:
    using DriverOf::DriverOf;

    // --- account and metadata ------------------------------------------------------------------

    /** "server_path", and "url", which is empty for an action other than these two. */
    bool GetMetaDataByURI(const std::string& uri, Json::Value& meta,
                          const std::string& action) override;
    /** The service refuses some names of its own beside those of desktops. */
    bool IsSkipMVCPFile(const std::string& path) override;
    bool CanFileUpload(unsigned long long size) override;
    _tag_cloud_type GetCloudType() override { return CLOUD_TYPE_DROPBOX; }
    /** `params` is not read. */
    bool GetAccountInfo(const Json::Value& params, Json::Value& out) override;
    /** "used", and "allocated" in "allocation", in bytes. */
    bool GetSpaceUsage(Json::Value& out);
    /** VFS_ERR_NOT_FOUND for what lies in the trash, too. "" is the root. */
    bool GetFileInfo(const std::string& path, const Json::Value& params, Json::Value& out) override;
    /** All items of a folder, hidden names among them; "" and "/" are the root. */
    bool ListFolder(const std::string& path, const Json::Value& params, Json::Value& out) override;
    /** Appends the pages from `cursor` on. */
    bool ListMoreFolder(Json::Value& entries, const std::string& cursor);
    bool IsDir(const Json::Value& item);
    std::string GetFileID(const Json::Value& item);

    /** Never: there is nothing to renew a token with. */
    bool SetRefreshTokenParam(APIHandler* handler) override;

    // --- changes -------------------------------------------------------------------------------

    bool CreateFolder(const std::string& parent, const std::string& name,
                      const Json::Value& params) override;
    /** What is not there counts as deleted. */
    bool Delete(const std::string& path) override;
    /** Never takes another item's place: VFS_ERR_CONFLICT. */
    bool Rename(const std::string& path, const std::string& new_name) override;
    /** A file in the way is replaced; VFS_ERR_IS_DIRECTORY for a folder. Move does the same. */
    bool Copy(const std::string& from, const std::string& to) override;
    bool Move(const std::string& from, const std::string& to) override;
    /** `from` of another account becomes `to` of this one, without its bytes coming here. */
    bool CopyFromRef(const std::string& from, const std::string& to, Dropbox* source);
    /** What another account needs to take a copy of the item. False for an empty path. */
    bool GetCopyRef(const std::string& path, std::string& out);
    /** `action` is "copy", "copy_ref", "rename", and a move for all else. */
    bool MVCP(const std::string& from, const std::string& to, const std::string& action,
              const std::string& copy_ref, bool overwrite);

    // --- contents ------------------------------------------------------------------------------

    /** One request up to 32 MiB, an upload session for more, and when there is no telling. */
    bool UploadProcess(XferData* xfer, const Json::Value& meta) override;
    /** A name that is taken gives a file under a changed one. */
    bool DirectUpload(XferData* xfer, const Json::Value& meta);
    bool ChunkedUpload(XferData* xfer, const Json::Value& meta);
    bool StartChunkUploadSession(std::string& out);
    /** Sends up to `size` bytes as those from `*offset` on, which moves on by what was sent, also
     * for a place that the service refuses (VFS_ERR_RANGE_FAILED): then by all. */
    bool StartChunkUpload(XferData* xfer, const std::string& session, unsigned long long* offset,
                          unsigned long long size);
    bool CommitChunkUpload(const std::string& session, const std::string& path,
                           unsigned long long total);
    bool DownloadProcess(XferData* xfer, const Json::Value& meta) override;

  private:
    /** A move or copy, as MVCP takes it. */
    struct Change {
        std::string from, to, action, copy_ref;
    };
    /** Whether an item in the way is the very one that is moved or copied. */
    using IsSource = std::function<bool(const Json::Value& item)>;
    bool SendChange(const Change& what, bool overwrite, const IsSource& is_source);
    bool ReplaceTarget(const Change& what, const IsSource& is_source);
    bool AskCopyRef(const std::string& path, Json::Value& out);
    bool MayShareAccount(const Dropbox& other) const;
    /** The offset moves on by what the source had, told in `sent`. */
    bool SendChunk(XferData* xfer, const std::string& session, const std::string& path,
                   unsigned long long* offset, unsigned long long size, SentBytes& sent);
    bool SendAt(XferData* xfer, const std::string& session, unsigned long long* offset,
                unsigned long long size, SentBytes& sent);
    bool SendToEnd(XferData* xfer, const std::string& session, const std::string& path);
    bool IsThere(const std::string& path);
    bool PrepareDownload(XferData* xfer, const Json::Value& meta, const std::string& path);
};

}  // namespace ZYROCloud

#endif
