/** The part of a rig that follows from the types of driver and simulated service. */
#ifndef ZYROVFS_TESTS_DRIVER_SUITE_RIG_OF_H
#define ZYROVFS_TESTS_DRIVER_SUITE_RIG_OF_H

#include <memory>
#include <string>

#include "support/checked_driver.h"
#include "support/driver_suite.h"

namespace driver_suite {

template <typename Driver, typename Service>
class RigOf : public Rig {
  public:
    cloudsim::Service& Sim() override { return sim_; }
    std::unique_ptr<PublicCloud> NewDriver(unsigned uid, const Json::Value& profile) override {
        return std::make_unique<checked_driver::Checked<Driver>>(uid, profile);
    }
    std::string ItemName(const Json::Value& item) override { return item["name"].asString(); }

  protected:
    template <typename... Options>
    explicit RigOf(const Options&... options) : sim_(options...) {}

    static Driver& Of(PublicCloud& cloud) { return static_cast<Driver&>(cloud); }
    cloudsim::Item ItemAt(const std::string& path) const { return amy->Get(amy->Find(path)); }

    Service sim_;
};

/** Of a driver that can tell of a description what it is. */
template <typename Driver, typename Service>
class KnowingRigOf : public RigOf<Driver, Service> {
  public:
    std::string ItemId(PublicCloud& cloud, const Json::Value& item) override {
        return this->Of(cloud).GetFileID(item);
    }
    bool IsFolder(PublicCloud& cloud, const Json::Value& item) override {
        return this->Of(cloud).IsDir(item);
    }

  protected:
    using RigOf<Driver, Service>::RigOf;
};

}  // namespace driver_suite

#endif
