// Faults on demand, and the ledger's sum at the end of a process.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <chrono>
#include <cstdlib>

#include "queried_host.h"
#include "trap_globals.h"

namespace {

struct Faults : Queries {
  ~Faults() override { EXPECT_EQ(simhost_clear_faults(nullptr), QEX_OK); }
  Faults() = default;
  Faults(Faults const &) = delete;
  Faults &operator=(Faults const &) = delete;
};

TEST_F(Faults, TheNthCallReturnsAStatus) {
  ASSERT_EQ(simhost_fail_call("VSDVS_SetMTU", 2, 2, QEX_NO_MEMORY), QEX_OK);
  EXPECT_EQ(VSDVS_SetMTU("s", 2000), QEX_OK);
  EXPECT_EQ(VSDVS_SetMTU("s", 3000), QEX_NO_MEMORY);
  EXPECT_EQ(VSDVS_SetMTU("nowhere", 3000), QEX_NO_MEMORY);
  qex_uint32 mtu = 0;
  EXPECT_EQ(VSDVS_GetMTU("s", &mtu), QEX_OK) << "another function";
  EXPECT_EQ(mtu, 2000U) << "a call that fails does nothing";
  EXPECT_EQ(VSDVS_SetMTU("s", 4000), QEX_OK);
}

TEST_F(Faults, MayHitAllCallsUntilTheyAreCleared) {
  ASSERT_EQ(simhost_fail_call("VSDVS_GetMTU", 1, 0, QEX_BUSY), QEX_OK);
  qex_uint32 mtu = 0;
  for (int round = 0; round < 5; ++round) {
    EXPECT_EQ(VSDVS_GetMTU("s", &mtu), QEX_BUSY);
  }
  ASSERT_EQ(simhost_clear_faults("VSDVS_SetMTU"), QEX_OK);
  EXPECT_EQ(VSDVS_GetMTU("s", &mtu), QEX_BUSY) << "another function was cleared";
  ASSERT_EQ(simhost_clear_faults("VSDVS_GetMTU"), QEX_OK);
  EXPECT_EQ(VSDVS_GetMTU("s", &mtu), QEX_OK);
}

TEST_F(Faults, PanicWithTypeAndText) {
  ASSERT_EQ(simhost_trap_call("VSQEX_FreeMemory", 1, 1, "ValueError", "out of %s"), QEX_OK);
  EXPECT_EQ(raised_by([] { VSQEX_FreeMemory(nullptr); }),
            (Raised{.type = "ValueError", .message = "out of %s"}));
  EXPECT_EQ(raised_by([] { VSQEX_FreeMemory(nullptr); }), std::nullopt);
}

TEST_F(Faults, Delay) {
  ASSERT_EQ(simhost_delay_call("VSDVS_SetMTU", 1, 1, 60), QEX_OK);
  auto const before = std::chrono::steady_clock::now();
  EXPECT_EQ(VSDVS_SetMTU("s", 2000), QEX_OK);
  EXPECT_GE(std::chrono::steady_clock::now() - before, std::chrono::milliseconds(60));
}

TEST_F(Faults, AreChecked) {
  EXPECT_EQ(simhost_fail_call("VSDVS_Nothing", 1, 1, QEX_BUSY), QEX_NOT_FOUND);
  EXPECT_STREQ(simhost_error(), "there is no call 'VSDVS_Nothing' (QEX_NOT_FOUND)");
  EXPECT_EQ(simhost_clear_faults("VSDVS_Nothing"), QEX_NOT_FOUND);
  EXPECT_STREQ(simhost_error(), "there is no call 'VSDVS_Nothing' (QEX_NOT_FOUND)");
  EXPECT_EQ(simhost_fail_call("Panic", 1, 1, QEX_BUSY), QEX_NOT_SUPPORTED);
  EXPECT_EQ(simhost_trap_call("Panic", 1, 1, "OSError", ""), QEX_NOT_SUPPORTED);
  EXPECT_EQ(simhost_delay_call("Panic", 1, 1, 1), QEX_NOT_SUPPORTED);
  EXPECT_STREQ(simhost_error(), "no fault can hit Panic (QEX_NOT_SUPPORTED)");
  EXPECT_EQ(simhost_fail_call("VSQEX_FreeMemory", 1, 1, QEX_BUSY), QEX_NOT_SUPPORTED)
      << "it has no status";
  EXPECT_STREQ(simhost_error(), "VSQEX_FreeMemory returns no status (QEX_NOT_SUPPORTED)");
  EXPECT_EQ(simhost_fail_call("VSDVS_SetMTU", 0, 1, QEX_BUSY), QEX_BAD_PARAM);
  EXPECT_STREQ(simhost_error(), "the first call that is hit is 1 or later (QEX_BAD_PARAM)");
  EXPECT_EQ(simhost_fail_call("VSDVS_SetMTU", 1, 1, QEX_OK), QEX_BAD_PARAM);
  EXPECT_STREQ(simhost_error(), "a fault needs a status, an exception or a delay (QEX_BAD_PARAM)");
  EXPECT_EQ(simhost_delay_call("VSDVS_SetMTU", 1, 1, 3600001), QEX_BAD_PARAM);
  EXPECT_STREQ(simhost_error(), "a delay is an hour at most (QEX_BAD_PARAM)");
  EXPECT_EQ(simhost_trap_call("VSDVS_SetMTU", 1, 1, "NoError", ""), QEX_BAD_PARAM);
  EXPECT_STREQ(simhost_error(),
               "'NoError' is none of the exception types RuntimeError, OSError, ConnectionError, "
               "IndexError, KeyError, MemoryError, NotImplementedError, PermissionError, "
               "SystemError, TimeoutError, TypeError, ValueError (QEX_BAD_PARAM)");
  EXPECT_EQ(simhost_fail_call(nullptr, 1, 1, QEX_BUSY), QEX_BAD_PARAM);
  EXPECT_STREQ(simhost_error(), "a text is null (QEX_BAD_PARAM)");
  EXPECT_EQ(simhost_apply(R"({"faults": [{"call": "VSDVS_SetMTU", "status": "QEX_BUSY",
                                          "exception": "OSError"}]})"),
            QEX_BAD_PARAM);
  EXPECT_STREQ(simhost_error(),
               "faults[0]: the host refuses it: a call has a status or an exception, not both "
               "(QEX_BAD_PARAM)");
}

TEST_F(Faults, TheLedgerSumsUpByCallAndSize) {
  std::array<VSUplinks *, 2> lists{};
  for (auto *&list : lists) {
    ASSERT_EQ(VSQEX_GetUplinks("s", &list), QEX_OK);
  }
  std::array<char, 128> summary{};
  simhost_ledger_summary(summary.data(), summary.size());
  EXPECT_STREQ(summary.data(), "2 x 80 bytes from VSQEX_GetUplinks\n");
  for (auto *const list : lists) {
    VSQEX_FreeMemory(list);
  }
}

TEST(LedgerDeathTest, ReportsAtTheEndWhenAsked) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  EXPECT_EXIT(
      {
        unsetenv("SIMHOST_STATE");
        setenv("SIMHOST_LEDGER", "1", 1);
        VSUplinks *list = nullptr;
        VSQEX_GetUplinks("vswitch0", &list);
        std::exit(0);
      },
      testing::ExitedWithCode(0),
      "^simulated host: not given back:\n1 x 80 bytes from VSQEX_GetUplinks\n$");
}

}  // namespace
