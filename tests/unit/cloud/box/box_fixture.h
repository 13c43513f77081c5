/** A Box driver before the simulated service. */
#ifndef ZYROVFS_TESTS_BOX_FIXTURE_H
#define ZYROVFS_TESTS_BOX_FIXTURE_H

#include "cloud/box/box.h"
#include "support/driver_fixture.h"

namespace ZYROCloud {

inline constexpr const char* kServerId = "box://amy@example.com";

class BoxTest : public DriverFixture<Box, cloudsim::BoxService> {
  protected:
    BoxTest() : DriverFixture("box") {}

    std::map<std::string, std::string> Hosts() const override {
        return {{"BoxApiHost", service.ApiHost()}, {"BoxUploadHost", service.UploadHost()}};
    }

    std::unique_ptr<Box>& box = drive;
};

}  // namespace ZYROCloud

#endif
