/**
 * Driver for Google Drive. Items are known by ids that say nothing; the root is "root". A name may
 * stand several times in a folder, and a folder in several others, so a path may mean several
 * items. Documents of the service's own editors have no bytes: they are shown under an extension of
 * their kind, and read through an export or as a small text with their link.
 */
#ifndef ZYROVFS_CLOUD_GDRIVE_H
#define ZYROVFS_CLOUD_GDRIVE_H

#include <json/value.h>

#include <string>
#include <vector>

#include "cloud/driver_of.h"

namespace ZYROCloud {

class GDrive : public DriverOf<GDriveErrorHandler> {
  public:
    using DriverOf::DriverOf;

    // --- account and metadata ------------------------------------------------------------------

    /** `operation` is "Download", with "=" and the type of an export behind it, or "Upload". */
    bool GetMetaDataByURI(const std::string& uri, Json::Value& out,
                          const std::string& operation) override;
    bool CanFileUpload(unsigned long long size) override;
    _tag_cloud_type GetCloudType() override { return CLOUD_TYPE_GOOGLE; }
    bool GetAccountInfo(const Json::Value& params, Json::Value& out) override;
    /** VFS_ERR_NOT_FOUND also for an item in the trash. */
    bool GetFileInfo(const std::string& id, const Json::Value& params, Json::Value& out) override;
    /** All items of a folder but those with hidden names; "" lists across the account. The query of
     * the service may stand in `params` as "q". */
    bool ListFolder(const std::string& folder_id, const Json::Value& params,
                    Json::Value& out) override;
    /** One page of that, as the service answers; "" is the first. */
    bool ListFolder(const std::string& folder_id, const Json::Value& params, Json::Value& out,
                    const std::string& page_token);

    bool UpdateAccountInfo() override;
    bool SetRefreshTokenParam(APIHandler* handler) override;

    // --- from a server path to an item id ------------------------------------------------------

    /** Id of the deepest folder of `path` that the mounted tree knows, "" for none; `found_path` is
     * where that is. */
    std::string FindListStartID(const std::string& path, std::string& found_path);
    /** "" when the mounted tree does not know it. */
    std::string GetFileIDByPathFromFuse(const std::string& path);
    /** The same, with the root's id for "" and "/". */
    std::string GetFileIDByPath(const std::string& path);
    /**
     * Appends the ids of a name in a folder. "NAME - DATE.EXT" means the NAME.EXT that was created
     * then, as the tree shows items of equal names. `query` narrows the search.
     */
    bool GetFileIDByNameFromServer(const std::string& parent_id, const std::string& name,
                                   const std::string& query, std::vector<std::string>& ids);
    /** Of several folders, the one that holds an item of this name; true without an id for none. */
    bool GetFileIDFromListByName(const std::string& name, std::vector<std::string>& ids,
                                 std::string& id);
    /** True without an id when no folder of these names holds the rest of the path. */
    bool GetFileIDByPathFromServerRecursive(const std::string& parent_id, const std::string& path,
                                            const std::string& query, const std::string& name,
                                            std::string& id);
    /** VFS_ERR_NOT_FOUND. `root` is not read: the first name is looked for in all the account. */
    bool GetFileIDByPathFromServer(const std::string& root, const std::string& path,
                                   const std::string& query, const std::string& name,
                                   std::string& id);
    bool GetFileInfoByPathFromServer(const std::string& path, const std::string& query,
                                     const Json::Value& params, const std::string& name,
                                     Json::Value& out);

    // --- changes -------------------------------------------------------------------------------

    bool CreateFolder(const std::string& parent_id, const std::string& name,
                      const Json::Value& params) override;
    /** Into the trash; what is gone already counts as deleted. */
    bool Delete(const std::string& id) override;
    /** Takes the star away; what is gone has none. */
    bool DeleteStarred(const std::string& id);
    bool Rename(const std::string& id, const std::string& name) override;
    /** Server paths. Beside what has that name already, nothing is replaced. VFS_ERR_NOT_FOUND. */
    bool Copy(const std::string& from, const std::string& to) override;
    /** Server paths; the name stays, whatever `to` says. VFS_ERR_NOT_FOUND. */
    bool Move(const std::string& from, const std::string& to) override;
    /** Item `id` from one folder into another. VFS_ERR_NOT_FOUND. */
    bool Move(const std::string& old_parent, const std::string& id, const std::string& new_parent);
    /** `date` in the form of RFC 3339. An empty id is false, without an error. */
    bool SetModifiedDate(const std::string& id, const std::string& date);

    // --- contents ------------------------------------------------------------------------------

    /** Where the bytes of `uri` are to be had, from what the mounted tree knows of it. A document
     * without a form of type `link_attr` gives "alternateLink://" and its link. */
    bool GetFileDownloadURL(const std::string& uri, const std::string& link_attr, std::string& url);
    bool UploadProcess(XferData* xfer, const Json::Value& meta) override;
    /** One request with description and bytes. */
    bool DirectUpload(XferData* xfer, const Json::Value& meta);
    /** A session that survives broken connections. */
    bool ResumableUpload(XferData* xfer, const Json::Value& meta);
    bool StartResumableUpload(const std::string& url, const std::string& method,
                              const Json::Value& body, std::string& session_uri);
    /** How many bytes have arrived in a session. */
    bool GetResumableStartByte(const std::string& session_uri, unsigned long long* start);
    /** Sends the bytes from `start` on, from the source's position. */
    bool StartUpload(const std::string& session_uri, XferData* xfer, unsigned long long start,
                     unsigned long long total);
    bool DownloadProcess(XferData* xfer, const Json::Value& meta) override;

  private:
    bool DescribeDownload(const std::string& uri, const std::string& link_attr, Json::Value& meta,
                          std::string& url);
    bool DescribeUpload(const std::string& server_path, const std::string& id, Json::Value& meta,
                        std::string& url);
    bool SendForm(XferData& xfer, const Json::Value& meta, const std::string& url);
    bool SendRest(const XferData& xfer, const std::string& session_uri);
    bool RenewURL(const std::string& path, const std::string& uri, const std::string& link_attr,
                  std::string& url);
    bool GiveLink(XferData* xfer, std::string text);
};

}  // namespace ZYROCloud

#endif
