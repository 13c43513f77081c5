/** The least that a driver has to be, for tests of what all drivers inherit. */
#ifndef ZYROVFS_TESTS_BARE_DRIVER_H
#define ZYROVFS_TESTS_BARE_DRIVER_H

#include <string>

#include "cloud/public_cloud.h"
#include "http/api_handler.h"
#include "http/error_handler.h"

namespace bare {

/** Supplies every operation of a service, each of which fails. Base is Cloud or PublicCloud. */
template <typename Base>
class Driver : public Base {
  public:
    using Base::Base;

    ZYROCloud::_tag_cloud_type GetCloudType() override { return ZYROCloud::CLOUD_TYPE_BOX; }
    bool GetAccountInfo(const Json::Value&, Json::Value&) override { return false; }
    bool GetFileInfo(const std::string&, const Json::Value&, Json::Value&) override {
        return false;
    }
    bool ListFolder(const std::string&, const Json::Value&, Json::Value&) override { return false; }
    bool CreateFolder(const std::string&, const std::string&, const Json::Value&) override {
        return false;
    }
    bool Delete(const std::string&) override { return false; }
    bool Rename(const std::string&, const std::string&) override { return false; }
    bool Copy(const std::string&, const std::string&) override { return false; }
    bool Move(const std::string&, const std::string&) override { return false; }
    bool UploadProcess(ZYROCloud::XferData*, const Json::Value&) override { return false; }
    bool DownloadProcess(ZYROCloud::XferData*, const Json::Value&) override { return false; }
    bool Init() override { return SetAPIErrorHandler(this->GetAPIHandler()); }
    bool SetAPIErrorHandler(ZYROCloud::APIHandler* handler) override {
        return handler != nullptr && handler->SetErrorHandler(new ZYROCloud::BoxErrorHandler);
    }
};

class PlainDriver : public Driver<ZYROCloud::Cloud> {
  public:
    using Driver::Driver;
};

/** Asks for tokens at `token_url`, as services want it: a form with the grant. */
class TokenDriver : public Driver<ZYROCloud::PublicCloud> {
  public:
    TokenDriver(unsigned int owner, const Json::Value& profile) : Driver(owner, profile) {
        Init();
        if (GetAPIHandler() != nullptr) {
            GetAPIHandler()->SetReturnOnError(false);
        }
    }

    bool SetRefreshTokenParam(ZYROCloud::APIHandler* handler) override {
        return handler != nullptr && !token_url.empty() &&
               handler->AddPostParam("grant_type", "refresh_token") &&
               handler->AddPostParam("refresh_token", token_.refresh_token) &&
               handler->SetURL(token_url, false);
    }
    bool GetAccountInfo(const Json::Value& params, Json::Value& out) override {
        asked_with = params;
        out = account;
        return account_known;
    }
    using ZYROCloud::PublicCloud::UpdateAccountInfoWith;
    const Json::Value& Account() const { return account_info_; }
    unsigned int Owner() const { return uid; }

    std::string token_url;
    Json::Value account, asked_with;
    bool account_known = true;
};

}  // namespace bare

#endif
