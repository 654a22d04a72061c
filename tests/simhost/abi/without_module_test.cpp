// The host in a process without the module: nothing can be raised, so a trap ends the process.
#include <gtest/gtest.h>

#include <csignal>
#include <cstdlib>

#include "vswitch/configuration.h"
#include "vswitch/queries.h"

namespace {

struct WithoutModule : testing::Test {
  WithoutModule() {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    unsetenv("SIMHOST_STATE");
  }
};

using WithoutModuleDeathTest = WithoutModule;

TEST_F(WithoutModule, CallsWork) {
  ASSERT_EQ(VSDVS_CreateVSwitch("s", nullptr, nullptr, 0, 1, 0, 0, 0), QEX_OK);
  EXPECT_EQ(VSDVS_SetMTU("s", 9191), QEX_BAD_PARAM);
  EXPECT_EQ(VSDVS_DestroyVSwitch("s"), QEX_OK);
}

TEST_F(WithoutModuleDeathTest, ATrapAborts) {
  EXPECT_EXIT(
      {
        int mine = 0;
        VSQEX_FreeMemory(&mine);
      },
      testing::KilledBySignal(SIGABRT),
      "^simulated host: VSQEX_FreeMemory: the host never gave out the memory at 0x[0-9a-f]+\n$");
}

TEST_F(WithoutModuleDeathTest, AnUnusableStateFileIsNamed) {
  EXPECT_EXIT(
      {
        setenv("SIMHOST_STATE", "/dev/null/host.db", 1);
        VSDVS_SetMTU("s", 1500);
      },
      testing::KilledBySignal(SIGABRT),
      "^simulated host: VSDVS_SetMTU: the state file /dev/null/host.db cannot be used: Not a "
      "directory\n$");
}

}  // namespace
