// The host through its two libraries, in a process that has a call trap.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <array>
#include <cstdlib>
#include <cstring>
#include <string>
#include <thread>
#include <vector>

#include "abi/simhost_api/simhost.h"
#include "address_text.h"
#include "nebpublic/data.h"
#include "nebpublic/kernel_state.h"
#include "nebpublic/names.h"
#include "nebpublic/state.h"
#include "trap_globals.h"
#include "vswitch/configuration.h"
#include "vswitch/queries.h"
#include "vswitch/status_text.h"

namespace {

QEX_ReturnStatus create(char const *alias, qex_uint32 uplinks = 0) {
  return VSDVS_CreateVSwitch(alias, nullptr, nullptr, 0, 1, 0, 0, uplinks);
}

// A switch "s" with two uplinks, in memory.
struct Boundary : testing::Test {
  Boundary() {
    unsetenv("SIMHOST_STATE");
    EXPECT_EQ(VSDVS_CreateVSwitch("s", "s-id", "s-ports", 0, 1, 0, 0, 2), QEX_OK);
  }
  ~Boundary() override { EXPECT_EQ(VSDVS_DestroyVSwitch("s"), QEX_OK); }
  Boundary(Boundary const &) = delete;
  Boundary &operator=(Boundary const &) = delete;

  static VSUplinks *uplinks() {
    VSUplinks *list = nullptr;
    EXPECT_EQ(VSQEX_GetUplinks("s", &list), QEX_OK);
    return list;
  }
};

TEST_F(Boundary, SetAndReadTheMtu) {
  qex_uint32 mtu = 0;
  EXPECT_EQ(VSDVS_GetMTU("s", &mtu), QEX_OK);
  EXPECT_EQ(mtu, 1500U);
  EXPECT_EQ(VSDVS_SetMTU("s", 9000), QEX_OK);
  EXPECT_EQ(VSDVS_GetMTU("s", &mtu), QEX_OK);
  EXPECT_EQ(mtu, 9000U);
  VSInfo info{};
  EXPECT_EQ(VSQEX_GetVSInfo("s", &info), QEX_OK);
  EXPECT_EQ(info.mtu, 9000U);
  EXPECT_STREQ(reinterpret_cast<char const *>(info.dvsName), "s");
  EXPECT_STREQ(reinterpret_cast<char const *>(info.nebID), "s-id");
}

TEST_F(Boundary, EmptyNamesLeaveTheChoiceToTheHost) {
  EXPECT_EQ(VSDVS_CreateVSwitch("e", "", "", 0, 0, 0, 0, 0), QEX_OK);
  std::array<char, 64> identifier{};
  EXPECT_EQ(DVSAliasToSwitchId("e", identifier.data()), QEX_OK);
  EXPECT_EQ(std::strlen(identifier.data()), 36U);
  EXPECT_EQ(VSDVS_DestroyVSwitch("e"), QEX_OK);
}

TEST_F(Boundary, EveryArgumentOfACreationArrives) {
  EXPECT_EQ(VSDVS_CreateVSwitch("x", "s-id", nullptr, 0, 0, 0, 0, 0), QEX_EXISTS);
  EXPECT_EQ(VSDVS_CreateVSwitch("x", nullptr, "s-ports", 0, 0, 0, 0, 0), QEX_EXISTS);
  EXPECT_EQ(VSDVS_CreateVSwitch("x", nullptr, nullptr, 65536, 0, 0, 0, 0), QEX_BAD_PARAM);
  EXPECT_EQ(VSDVS_CreateVSwitch("x", nullptr, nullptr, 0, 0, 0, 9191, 0), QEX_BAD_PARAM);
  EXPECT_EQ(VSDVS_CreateVSwitch("x", nullptr, nullptr, 0, 0, 0, 0, 3), QEX_NO_RESOURCES);
  EXPECT_EQ(VSDVS_DestroyVSwitch("x"), QEX_NOT_FOUND);
}

TEST_F(Boundary, NullWhereSomethingIsRequired) {
  qex_uint32 mtu = 0;
  VSInfo info{};
  VSUplinks *list = nullptr;
  std::array<char, 129> name{};
  EXPECT_EQ(create(nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSDVS_DestroyVSwitch(nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSDVS_SetMTU(nullptr, 1500), QEX_BAD_PARAM);
  EXPECT_EQ(VSDVS_GetMTU(nullptr, &mtu), QEX_BAD_PARAM);
  EXPECT_EQ(VSDVS_GetMTU("s", nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetVSInfo(nullptr, &info), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetVSInfo("s", nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetUplinks(nullptr, &list), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetUplinks("s", nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(DVSAliasToSwitchId(nullptr, name.data()), QEX_BAD_PARAM);
  EXPECT_EQ(DVSAliasToSwitchId("s", nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(DVSAliasToPortsetName(nullptr, name.data()), QEX_BAD_PARAM);
  EXPECT_EQ(DVSAliasToPortsetName("s", nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(DVSPortsetNameToAlias(nullptr, name.data()), QEX_BAD_PARAM);
  EXPECT_EQ(DVSPortsetNameToAlias("s-ports", nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(simhost_ledger_count(), 0U);
}

TEST_F(Boundary, ARefusedCallLeavesTheOutputsAlone) {
  qex_uint32 mtu = 7;
  EXPECT_EQ(VSDVS_GetMTU("unknown", &mtu), QEX_NOT_FOUND);
  EXPECT_EQ(mtu, 7U);
  VSInfo info{};
  info.mtu = 7;
  EXPECT_EQ(VSQEX_GetVSInfo("unknown", &info), QEX_NOT_FOUND);
  EXPECT_EQ(info.mtu, 7U);
  auto *list = reinterpret_cast<VSUplinks *>(&info);
  EXPECT_EQ(VSQEX_GetUplinks("unknown", &list), QEX_NOT_FOUND);
  EXPECT_EQ(list, reinterpret_cast<VSUplinks *>(&info));
}

TEST_F(Boundary, TranslateNames) {
  std::array<char, 129> name{};
  EXPECT_EQ(DVSAliasToSwitchId("s", name.data()), QEX_OK);
  EXPECT_STREQ(name.data(), "s-id");
  EXPECT_EQ(DVSAliasToPortsetName("s", name.data()), QEX_OK);
  EXPECT_STREQ(name.data(), "s-ports");
  EXPECT_EQ(DVSPortsetNameToAlias("s-ports", name.data()), QEX_OK);
  EXPECT_STREQ(name.data(), "s");
  EXPECT_EQ(DVSPortsetNameToAlias("s", name.data()), QEX_NOT_FOUND);
}

TEST_F(Boundary, AllocateTheUplinks) {
  auto *const list = uplinks();
  EXPECT_EQ(list->totalEntries, 2U);
  ASSERT_EQ(list->numEntries, 2U);
  EXPECT_STREQ(list->entries[0].name.string, "nic0");
  EXPECT_STREQ(list->entries[1].name.string, "nic1");
  EXPECT_NE(list->entries[0].portID, 0U);
  EXPECT_NE(list->entries[0].portID, list->entries[1].portID);
  EXPECT_EQ(raised_by([=] { VSQEX_FreeMemory(list); }), std::nullopt);
}

TEST_F(Boundary, AllocateAnEmptyListOfUplinks) {
  ASSERT_EQ(create("bare"), QEX_OK);
  VSUplinks *list = nullptr;
  EXPECT_EQ(VSQEX_GetUplinks("bare", &list), QEX_OK);
  ASSERT_NE(list, nullptr);
  EXPECT_EQ(list->numEntries, 0U);
  VSQEX_FreeMemory(list);
  EXPECT_EQ(VSDVS_DestroyVSwitch("bare"), QEX_OK);
}

TEST_F(Boundary, TheLedgerKnowsWhatIsOut) {
  auto *const list = uplinks();
  EXPECT_EQ(simhost_ledger_count(), 1U);
  std::array<char, 128> report{};
  auto const line = text_of(list) + " 80 bytes from VSQEX_GetUplinks\n";
  EXPECT_EQ(simhost_ledger_report(report.data(), report.size()), line.size());
  EXPECT_EQ(report.data(), line);
  EXPECT_EQ(simhost_ledger_report(nullptr, 0), line.size());
  VSDVS_FreeMemory(list);
  EXPECT_EQ(simhost_ledger_count(), 0U);
}

TEST_F(Boundary, NullIsReleasedForNothing) {
  EXPECT_EQ(raised_by([] { VSQEX_FreeMemory(nullptr); }), std::nullopt);
  EXPECT_EQ(raised_by([] { VSDVS_FreeMemory(nullptr); }), std::nullopt);
}

TEST_F(Boundary, MemoryGivenBackTwiceSpringsTheTrap) {
  auto *const list = uplinks();
  VSQEX_FreeMemory(list);
  EXPECT_EQ(raised_by([=] { VSQEX_FreeMemory(list); }),
            trapped_with("VSQEX_FreeMemory: the memory at " + text_of(list) +
                         " is given back twice: VSQEX_GetUplinks gave it out, "
                         "VSQEX_FreeMemory took it back"));
  EXPECT_EQ(exception_status, 1);
}

TEST_F(Boundary, TheOtherDeallocatorKnowsItToo) {
  auto *const list = uplinks();
  VSQEX_FreeMemory(list);
  EXPECT_EQ(raised_by([=] { VSDVS_FreeMemory(list); }),
            trapped_with("VSDVS_FreeMemory: the memory at " + text_of(list) +
                         " is given back twice: VSQEX_GetUplinks gave it out, "
                         "VSQEX_FreeMemory took it back"));
}

TEST_F(Boundary, TheThirdDeallocatorReleasesMemoryToo) {
  auto *const list = uplinks();
  EXPECT_EQ(raised_by([=] { DVSQEX_DataFree(list); }), std::nullopt);
  EXPECT_EQ(simhost_ledger_count(), 0U);
  EXPECT_EQ(raised_by([=] { DVSQEX_DataFree(list); }),
            trapped_with("DVSQEX_DataFree: the memory at " + text_of(list) +
                         " is given back twice: VSQEX_GetUplinks gave it out, "
                         "DVSQEX_DataFree took it back"));
}

TEST_F(Boundary, MemoryOfTheCallerSpringsTheTrap) {
  VSInfo info{};
  EXPECT_EQ(
      raised_by([&] { VSQEX_FreeMemory(&info); }),
      trapped_with("VSQEX_FreeMemory: the host never gave out the memory at " + text_of(&info)));
}

TEST_F(Boundary, AfterTheTrapTheHostGoesOn) {
  for (int round = 0; round < 1000; ++round) {
    int mine = 0;
    ASSERT_TRUE(raised_by([&] { VSDVS_FreeMemory(&mine); }).has_value());
    ASSERT_EQ(VSDVS_SetMTU("s", 1280 + static_cast<qex_uint32>(round)), QEX_OK);
  }
  qex_uint32 mtu = 0;
  EXPECT_EQ(VSDVS_GetMTU("s", &mtu), QEX_OK);
  EXPECT_EQ(mtu, 1280U + 999U);
}

TEST_F(Boundary, ThreadsTakeTurns) {
  std::vector<std::thread> threads;
  threads.reserve(4);
  for (int thread = 0; thread < 4; ++thread) {
    threads.emplace_back([thread] {
      for (int at = 0; at < 25; ++at) {
        auto const alias = "t" + std::to_string(thread) + "-" + std::to_string(at);
        EXPECT_EQ(create(alias.c_str()), QEX_OK);
        EXPECT_EQ(VSDVS_SetMTU(alias.c_str(), 9000), QEX_OK);
        qex_uint32 mtu = 0;
        EXPECT_EQ(VSDVS_GetMTU(alias.c_str(), &mtu), QEX_OK);
        EXPECT_EQ(mtu, 9000U);
        EXPECT_EQ(VSDVS_DestroyVSwitch(alias.c_str()), QEX_OK);
      }
    });
  }
  for (auto &thread : threads) {
    thread.join();
  }
}

TEST(StateFile, ThatCannotBeOpenedSpringsTheTrap) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");  // starts over, so that no state is open yet
  EXPECT_EXIT(
      {
        setenv("SIMHOST_STATE", "/nowhere/host.db", 1);
        auto const raised = raised_by([] { VSDVS_DestroyVSwitch("s"); });
        std::fprintf(stderr, "%s: %s.", raised.value().type.c_str(), raised->message.c_str());
        std::exit(0);
      },
      testing::ExitedWithCode(0),
      "^OSError: VSDVS_DestroyVSwitch: the state file /nowhere/host.db cannot be used: No such "
      "file or directory\\.$");
}

TEST(StateFile, ThatCannotBeOpenedSpringsTheTrapOfACallWithoutStatus) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  EXPECT_EXIT(
      {
        setenv("SIMHOST_STATE", "/nowhere/host.db", 1);
        auto const raised = raised_by([] { DVSState_SwitchFindByAlias("s"); });
        std::fprintf(stderr, "%s: %s.", raised.value().type.c_str(), raised->message.c_str());
        std::exit(0);
      },
      testing::ExitedWithCode(0),
      "^OSError: DVSState_SwitchFindByAlias: the state file /nowhere/host.db cannot be used: "
      "No such file or directory\\.$");
}

TEST(StateFile, InAFolderThatIsGoneSpringsTheTrap) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  EXPECT_EXIT(
      {
        auto folder = testing::TempDir() + "gone-XXXXXX";
        if (mkdtemp(folder.data()) == nullptr || chdir(folder.c_str()) != 0 ||
            rmdir(folder.c_str()) != 0) {
          std::exit(1);
        }
        setenv("SIMHOST_STATE", "host.db", 1);
        auto const raised = raised_by([] { VSDVS_DestroyVSwitch("s"); });
        std::fprintf(stderr, "%s: %s.", raised.value().type.c_str(), raised->message.c_str());
        std::exit(0);
      },
      testing::ExitedWithCode(0),
      "^OSError: VSDVS_DestroyVSwitch: the state file host.db cannot be used: the current folder: "
      "No such file or directory\\.$");
}

TEST(StateFile, AnEmptyNameMeansMemory) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  EXPECT_EXIT(
      {
        setenv("SIMHOST_STATE", "", 1);
        std::exit(create("s") == QEX_OK ? 0 : 1);
      },
      testing::ExitedWithCode(0), "");
}

TEST(StatusText, OfSuccessAndOfFailures) {
  EXPECT_STREQ(QEX_ReturnStatusToString(QEX_OK), "Success");
  EXPECT_STREQ(QEX_ReturnStatusToString(QEX_NOT_FOUND), "Not found");
  EXPECT_STREQ(QEX_ReturnStatusToString(QEX_BAD_PARAM), "Bad parameter");
  EXPECT_STREQ(QEX_ReturnStatusToString(QEX_BAD_VLANID), "Bad VLAN id");
  EXPECT_STREQ(QEX_ReturnStatusToString(QEX_ENETDOWN), "Network is down");
  EXPECT_STREQ(QEX_ReturnStatusToString(QEX_GENERIC_LINUX_ERROR), "Generic linux error");
}

TEST(StatusText, EveryStatusOfTheRunHasOne) {
  for (int status = QEX_FAILURE; status <= QEX_LAST_ERR; ++status) {
    char const *const text = QEX_ReturnStatusToString(static_cast<QEX_ReturnStatus>(status));
    ASSERT_NE(text, nullptr) << std::hex << status;
    EXPECT_STRNE(text, "") << std::hex << status;
  }
}

TEST(StatusText, NoneForOtherCodes) {
  for (int const status : {1, QEX_FAILURE - 1, QEX_LAST_ERR + 1, QEX_GENERIC_LINUX_ERROR + 1}) {
    EXPECT_EQ(QEX_ReturnStatusToString(static_cast<QEX_ReturnStatus>(status)), nullptr)
        << std::hex << status;
  }
}

TEST(HostPanicCall, WritesItsTextAndReturns) {
  testing::internal::CaptureStderr();
  EXPECT_EQ(raised_by([] { Panic("%s%n is only text", nullptr); }), std::nullopt);
  EXPECT_EQ(testing::internal::GetCapturedStderr(), "%s%n is only text\n");
}

TEST(HostPanicCall, TakesNullForNothing) {
  testing::internal::CaptureStderr();
  EXPECT_EQ(raised_by([] { Panic(nullptr); }), std::nullopt);
  EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
}

TEST(Simulated, TellsThatItsStateIsInMemory) {
  std::string text = "anything";
  EXPECT_EQ(simhost_state_file(text.data(), text.size()), 0);
  EXPECT_EQ(text[0], '\0');
  EXPECT_STREQ(simhost_error(), "");
  EXPECT_EQ(simhost_state_file(nullptr, 0), 0);
}

TEST(Simulated, HasAVersion) {
  EXPECT_THAT(simhost_version(), testing::MatchesRegex("[0-9]+\\.[0-9]+\\.[0-9]+"));
}

}  // namespace
