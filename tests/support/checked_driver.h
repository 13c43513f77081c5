/**
 * A driver whose every operation is looked at when it ends: it is false if and only if it leaves a
 * failure code. The assertion stands here, so that no test of a driver has to think of it.
 */
#ifndef ZYROVFS_TESTS_CHECKED_DRIVER_H
#define ZYROVFS_TESTS_CHECKED_DRIVER_H

#include <gtest/gtest.h>
#include <json/value.h>

#include <initializer_list>
#include <string>

#include "core/json.h"
#include "zyrovfs/cloud.h"

namespace checked_driver {

using ZYROCloud::Cloud;
using ZYROCloud::XferData;

/** An operation as it runs. Those that it calls itself are its own business. */
class Operation {
  public:
    Operation(Cloud& cloud, int& depth, const char* name)
        : cloud_(cloud), depth_(depth), name_(name), before_(cloud.GetErrorCode()) {
        ++depth_;
    }
    Operation(const Operation&) = delete;
    Operation& operator=(const Operation&) = delete;
    ~Operation() { --depth_; }

    /** `remains`: the code that a success may leave although it is its own. */
    bool End(bool done, ZYROVFS::__tag_vfs_err_ remains = ZYROVFS::VFS_ERR_NONE) const {
        const ZYROVFS::__tag_vfs_err_ code = cloud_.GetErrorCode();
        if (depth_ > 1) {
            return done;
        }
        if (!done) {
            EXPECT_NE(code, ZYROVFS::VFS_ERR_NONE) << name_ << " failed without a code";
        } else if (code != remains) {
            EXPECT_EQ(code, before_) << name_ << " went through and left a code of its own, "
                                     << ZYROVFS::json::toString(cloud_.GetError());
        }
        return done;
    }

  private:
    Cloud& cloud_;
    int& depth_;
    const char* const name_;
    const ZYROVFS::__tag_vfs_err_ before_;
};

/** A transfer of a driver by one of the functions that are none of its own. */
class Transfer {
  public:
    Transfer(Cloud& cloud, const char* name) : operation_(cloud, depth_, name) {}
    bool End(bool done) const { return operation_.End(done); }

  private:
    int depth_ = 0;
    Operation operation_;
};

template <typename Driver>
class Checked : public Driver {
  public:
    using Driver::Driver;

    /** The description of a transfer. That a driver knows nothing of an item may be told without a
     * code: callers go on, and what is missing shows when it is used. */
    bool GetMetaDataByURI(const std::string& uri, Json::Value& out,
                          const std::string& operation) override {
        const Operation description = In("GetMetaDataByURI");
        return Driver::GetMetaDataByURI(uri, out, operation) && description.End(true);
    }
    bool GetFileSize(const std::string& uri, long long* size) override {
        return In("GetFileSize").End(Driver::GetFileSize(uri, size));
    }
    bool GetAccountInfo(const Json::Value& params, Json::Value& out) override {
        return In("GetAccountInfo").End(Driver::GetAccountInfo(params, out));
    }
    bool GetFileInfo(const std::string& id, const Json::Value& params, Json::Value& out) override {
        return In("GetFileInfo").End(Driver::GetFileInfo(id, params, out));
    }
    bool ListFolder(const std::string& id, const Json::Value& params, Json::Value& out) override {
        return In("ListFolder").End(Driver::ListFolder(id, params, out));
    }
    bool CreateFolder(const std::string& parent, const std::string& name,
                      const Json::Value& params) override {
        return In("CreateFolder").End(Driver::CreateFolder(parent, name, params));
    }
    /** What was gone before counts as deleted, and callers may read that it was. */
    bool Delete(const std::string& id) override {
        return In("Delete").End(Driver::Delete(id), ZYROVFS::VFS_ERR_NOT_FOUND);
    }
    bool Rename(const std::string& id, const std::string& new_name) override {
        return In("Rename").End(Driver::Rename(id, new_name));
    }
    bool Copy(const std::string& from, const std::string& to) override {
        return In("Copy").End(Driver::Copy(from, to));
    }
    bool Move(const std::string& from, const std::string& to) override {
        return In("Move").End(Driver::Move(from, to));
    }
    bool UploadProcess(XferData* xfer, const Json::Value& meta) override {
        return In("UploadProcess").End(Driver::UploadProcess(xfer, meta));
    }
    bool DownloadProcess(XferData* xfer, const Json::Value& meta) override {
        return In("DownloadProcess").End(Driver::DownloadProcess(xfer, meta));
    }

  private:
    /** Made before the operation runs: arguments of End come later. */
    Operation In(const char* name) { return Operation(*this, depth_, name); }

    int depth_ = 0;
};

}  // namespace checked_driver

#endif
