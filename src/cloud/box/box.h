/**
 * Driver for Box. Items are known by id, not by path; the item ids of this driver have their kind
 * in front, as "files/12" and "folders/34", and the root is "folders/0". A path becomes an id by
 * the mounted tree, which is fast, or by a walk down the remote tree.
 */
#ifndef ZYROVFS_CLOUD_BOX_H
#define ZYROVFS_CLOUD_BOX_H

#include <json/value.h>

#include <string>
#include <vector>

#include "cloud/driver_of.h"

namespace ZYROCloud {

class Box : public DriverOf<BoxErrorHandler> {
  public:
    using DriverOf::DriverOf;

    // --- account and metadata ------------------------------------------------------------------

    bool GetMetaDataByURI(const std::string& uri, Json::Value& meta,
                          const std::string& action) override;
    bool CanFileUpload(unsigned long long size) override;
    _tag_cloud_type GetCloudType() override { return CLOUD_TYPE_BOX; }
    bool GetAccountInfo(const Json::Value& params, Json::Value& out) override;
    bool GetFileInfo(const std::string& id, const Json::Value& params, Json::Value& out) override;
    /** All items of a folder but those with hidden names. The id may be bare; "" is the root. */
    bool ListFolder(const std::string& id, const Json::Value& params, Json::Value& out) override;
    /** One page from `*offset` on, which moves on. */
    bool ListFolder(const std::string& id, const Json::Value& params, Json::Value& out,
                    unsigned int* offset);
    /** Items anywhere in the account whose name matches, as the service understands that. */
    bool SearchFile(const std::string& name, Json::Value& out);
    bool IsDir(const Json::Value& item);
    /** Item id of a description. */
    std::string GetFileID(const Json::Value& item);

    bool UpdateAccountInfo() override;
    bool SetRefreshTokenParam(APIHandler* handler) override;

    // --- from a server path to an item id ------------------------------------------------------

    /** "" when the mounted tree does not know it. */
    std::string GetFileIDByPathFromFuse(const std::string& path);
    /** The same, with the root's id for "" and "/". */
    std::string GetFileIDByPath(const std::string& path);
    /**
     * Item ids of a name in a folder, or, with `search`, anywhere. "NAME - OWNER" also finds NAME
     * of that owner, as the tree shows items of equal names. `kind` is not read.
     */
    bool GetFileIDByNameFromServer(const std::string& parent_id, const std::string& name,
                                   const std::string& kind, bool search,
                                   std::vector<std::string>& out);
    /** True without an id when a folder of the path has namesakes, none with the rest below it. */
    bool GetFileIDByPathFromServerRecursive(const std::string& parent_id, const std::string& path,
                                            const std::string& kind, const std::string& hint,
                                            std::string& out);
    /** VFS_ERR_NOT_FOUND. Only `path` is read. */
    bool GetFileIDByPathFromServer(const std::string& root, const std::string& path,
                                   const std::string& kind, const std::string& hint,
                                   std::string& out);
    bool GetFileInfoByPathFromServer(const std::string& root, const std::string& path,
                                     const Json::Value& params, const std::string& hint,
                                     Json::Value& out);

    // --- changes -------------------------------------------------------------------------------

    bool CreateFolder(const std::string& parent, const std::string& name,
                      const Json::Value& params) override;
    /** A folder goes with all that is in it. */
    bool Delete(const std::string& id) override;
    bool Rename(const std::string& id, const std::string& new_name) override;
    /** Server paths; a file in the way is replaced. The copy keeps its source's name. */
    bool Copy(const std::string& from, const std::string& to) override;
    /** VFS_ERR_IS_DIRECTORY for a folder in the way, VFS_ERR_NOT_FOUND. */
    bool DoCopy(const std::string& from, const std::string& to, bool overwrite);
    /** Never moves: this service moves by ids. */
    bool Move(const std::string& from, const std::string& to) override;
    /** Item `id` into the folder `new_parent`; `old_parent` is not read. VFS_ERR_NOT_FOUND. */
    bool Move(const std::string& old_parent, const std::string& id, const std::string& new_parent);
    /** The service has no call for it; always true. */
    bool SetModifiedDate(const std::string& id, const std::string& date);

    // --- contents ------------------------------------------------------------------------------

    /**
     * Asks whether an upload would be taken. What stands in its way under the same name, file or
     * folder, is deleted, and the cached entry of the full path `path` dropped. `id` is that of the
     * file whose content is replaced, "" for a new one.
     */
    bool PreflightCheck(const std::string& id, const std::string& name,
                        const std::string& parent_id, const std::string& path,
                        unsigned long long size);
    bool UploadProcess(XferData* xfer, const Json::Value& meta) override;
    /** One request, whatever the size. */
    bool DirectUpload(XferData* xfer, const Json::Value& meta);
    bool DownloadProcess(XferData* xfer, const Json::Value& meta) override;

  private:
    bool DescribeDownload(const std::string& server_path, Json::Value& meta);
    bool DescribeUpload(const std::string& server_path, Json::Value& meta);
    bool ClearTheWay(const std::string& path);
    bool SendForm(XferData* xfer, const Json::Value& meta);
};

}  // namespace ZYROCloud

#endif
