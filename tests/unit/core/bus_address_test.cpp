#include "core/bus_address.h"

#include <gtest/gtest.h>

#include <cstdlib>

#include "zyrovfs/global.h"

namespace ZYROVFS {
namespace {

constexpr const char* kVariable = "DBUS_SESSION_BUS_ADDRESS";

TEST(BusAddress, IsInTheEnvironmentAndKnownForItsUserAlone) {
    ASSERT_TRUE(SetBusAddress(4001, "unix:path=/amys"));
    EXPECT_STREQ(getenv(kVariable), "unix:path=/amys");
    EXPECT_EQ(ToldBusAddress(4001), "unix:path=/amys");
    EXPECT_EQ(ToldBusAddress(4002), "");
}

TEST(BusAddress, ThatSomebodyPutIntoTheEnvironmentIsNotKnown) {
    ASSERT_TRUE(SetBusAddress(4001, "unix:path=/amys"));
    setenv(kVariable, "unix:path=/tmp/trap", 1);
    EXPECT_EQ(ToldBusAddress(4001), "");
    unsetenv(kVariable);
    EXPECT_EQ(ToldBusAddress(4001), "");
}

TEST(BusAddress, OfInitEnvIsKnown) {
    ASSERT_TRUE(InitEnv("4003", "unix:path=/told"));
    EXPECT_EQ(ToldBusAddress(4003), "unix:path=/told");
}

}  // namespace
}  // namespace ZYROVFS
