/** A Google Drive driver before the simulated service. */
#ifndef ZYROVFS_TESTS_GDRIVE_FIXTURE_H
#define ZYROVFS_TESTS_GDRIVE_FIXTURE_H

#include "cloud/gdrive/gdrive.h"
#include "support/driver_fixture.h"

namespace ZYROCloud {

inline constexpr const char* kServerId = "google://amy@example.com";

class GDriveTest : public DriverFixture<GDrive, cloudsim::GDrive> {
  protected:
    GDriveTest() : DriverFixture("google") {}

    std::map<std::string, std::string> Hosts() const override {
        return {{"GoogleApiHost", service.ApiHost()},
                {"GoogleAccountsHost", service.AccountsHost()}};
    }
};

}  // namespace ZYROCloud

#endif
