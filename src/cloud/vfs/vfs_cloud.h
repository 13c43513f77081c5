/** File contents of FTP, SFTP and WebDAV servers through libcurl, past the mounted tree. */
#ifndef ZYROVFS_CLOUD_VFS_VFS_CLOUD_H
#define ZYROVFS_CLOUD_VFS_VFS_CLOUD_H

#include <json/value.h>

#include <string>

#include "core/source_line.h"
#include "zyrovfs/cloud.h"

struct curl_slist;

namespace ZYROCloud {

/**
 * Uploads and downloads one file. All else that a driver offers happens through the mount for these
 * servers; the operations are there to fill the interface, and fail.
 */
class VFSCloud : public Cloud {
  public:
    VFSCloud();
    /** "account", "password", "codepage" and "protocol" of a connection, and its "server_id". */
    VFSCloud(unsigned int uid, const Json::Value& config);

    bool GetMetaDataByURI(const std::string& uri, Json::Value& out,
                          const std::string& operation) override;
    _tag_cloud_type GetCloudType() override;
    bool GetAccountInfo(const Json::Value& params, Json::Value& out) override;
    bool GetFileInfo(const std::string& id, const Json::Value& params, Json::Value& out) override;
    bool ListFolder(const std::string& id, const Json::Value& params, Json::Value& out) override;
    bool CreateFolder(const std::string& parent, const std::string& name,
                      const Json::Value& params) override;
    bool Delete(const std::string& id) override;
    bool Rename(const std::string& id, const std::string& new_name) override;
    bool Copy(const std::string& from, const std::string& to) override;
    bool Move(const std::string& from, const std::string& to) override;
    bool UploadProcess(XferData* xfer, const Json::Value& meta) override;
    bool DownloadProcess(XferData* xfer, const Json::Value& meta) override;
    bool Init() override;
    bool SetAPIErrorHandler(APIHandler* handler) override;

    /** Whether the server takes extended passive mode; true unless the mount says otherwise. */
    bool isSetFTPEPSV(const std::string& url);

  private:
    bool Prepare(XferData& xfer, const std::string& url, const Json::Value* range,
                 curl_slist** commands);
    bool SetUpFTP(const std::string& url, curl_slist** commands);
    bool Check(bool step);

    std::string account_;
    std::string password_;
    std::string code_page_;
    std::string protocol_;
};

}  // namespace ZYROCloud

#endif
