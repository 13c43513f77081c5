/**
 * Driver for servers of a standard protocol. It moves the content of one file straight through
 * libcurl, past the mounted tree; listing and changing such a server is the mount's job, so the
 * other operations log a line and fail.
 */
#ifndef ZYROVFS_CLOUD_VFS_CLOUD_H
#define ZYROVFS_CLOUD_VFS_CLOUD_H

#include <json/value.h>

#include <string>

#include "zyrovfs/cloud.h"

struct curl_slist;

namespace ZYROCloud {

class VFSCloud : public Cloud {
  public:
    VFSCloud();
    /** Takes "account", "password", "codepage", "protocol" and "server_id" from a profile. */
    VFSCloud(unsigned int uid, const Json::Value& config);

    /** Sets "url" to the server's own address of a location below a live connection. */
    bool GetMetaDataByURI(const std::string& uri, Json::Value& out,
                          const std::string& operation) override;
    _tag_cloud_type GetCloudType() override { return CLOUD_TYPE_VFS; }
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
    /** False for null and when memory ran out. */
    bool SetAPIErrorHandler(APIHandler* handler) override;

    /** Whether the server can do extended passive mode: true unless the mounted tree knows better.
     * `url` is not read. */
    bool isSetFTPEPSV(const std::string& url);

  private:
    bool Prepare(XferData* xfer);
    struct Login {
        std::string user, password;
    };
    Login LogInAs() const;
    bool SetUpFTP(const std::string& url, curl_slist** commands);
    bool Send(const std::string& url);
    bool Receive(XferData* xfer, const std::string& url);
    bool FailLocally();

    std::string account_;
    std::string password_;
    std::string code_page_;
    std::string protocol_;
};

}  // namespace ZYROCloud

#endif
