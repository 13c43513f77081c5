/** What drivers of services are made of that differ in the meaning of refusals alone. */
#ifndef ZYROVFS_CLOUD_DRIVER_OF_H
#define ZYROVFS_CLOUD_DRIVER_OF_H

#include <json/value.h>

#include <new>

#include "cloud/public_cloud.h"
#include "http/api_handler.h"
#include "http/error_handler.h"

namespace ZYROCloud {

/** `Errors` is the error handler of the service. */
template <typename Errors>
class DriverOf : public PublicCloud {
  public:
    DriverOf() { DriverOf::Init(); }
    DriverOf(unsigned int owner, const Json::Value& profile) : PublicCloud(owner, profile) {
        DriverOf::Init();
    }

    /** Refusals are told apart by the body of the answer, so that is wanted with any status. */
    bool Init() override {
        return DriverOf::SetAPIErrorHandler(api) && api->SetReturnOnError(false);
    }
    bool SetAPIErrorHandler(APIHandler* handler) override {
        return handler != nullptr && handler->SetErrorHandler(new (std::nothrow) Errors);
    }
};

}  // namespace ZYROCloud

#endif
