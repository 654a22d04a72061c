// Lists of named items: those of callers with their allocators, those of properties, and the
// ledger.
#include "nebpublic/data.h"

#include <gmock/gmock.h>

#include <array>
#include <cstdlib>
#include <string>
#include <utility>

#include "address_text.h"
#include "configured_switch.h"
#include "qexapi/switch_properties.h"
#include "trap_globals.h"
#include "vswitch/properties.h"

namespace {

using DataLists = ConfiguredSwitch;

// An allocator that counts what is out and can run dry.
int blocks_out = 0;
int blocks_left = 0;

void *counted_alloc(size_t size) {
  if (blocks_left == 0) {
    return nullptr;
  }
  --blocks_left;
  ++blocks_out;
  return std::malloc(size);
}

void counted_free(void *memory) {
  --blocks_out;
  std::free(memory);
}

TEST_F(DataLists, UseTheCallersAllocator) {
  blocks_left = 1000;
  DVSDataHandle list = nullptr;
  ASSERT_EQ(DVSData_Alloc(&list, counted_alloc, counted_free), QEX_OK);
  EXPECT_GT(blocks_out, 0);
  std::array<unsigned char, 100> data{1, 2, 3};
  EXPECT_EQ(DVSData_Update(list, "com.example.a", data.data(), data.size(), POLICY_PROP_TYPE),
            QEX_OK);
  EXPECT_EQ(DVSData_Update(list, "com.example.a", nullptr, 0, CONFIG_PROP_TYPE), QEX_OK);
  void *bytes = nullptr;
  qex_uint32 length = 0;
  ASSERT_EQ(DVSData_Serialize(list, &bytes, &length, 200), QEX_OK);
  EXPECT_GT(length, 0U);
  EXPECT_EQ(simhost_ledger_count(), 1U) << "the list; the block is the caller's own";
  counted_free(bytes);
  EXPECT_EQ(raised_by([=] { DVSData_Free(list); }), std::nullopt);
  EXPECT_EQ(blocks_out, 0);
  EXPECT_EQ(raised_by([=] { DVSData_Free(list); }),
            trapped_with("DVSData_Free: the list " + text_of(list) + " is freed already"));
}

TEST_F(DataLists, AnAllocatorMayRunDry) {
  bool done = false;
  for (int room = 0; !done; ++room) {
    ASSERT_LT(room, 20);
    blocks_left = room;
    DVSDataHandle list = nullptr;
    std::array<unsigned char, 100> data{};
    auto status = DVSData_Alloc(&list, counted_alloc, counted_free);
    if (status == QEX_OK) {
      status = DVSData_Update(list, "com.example.a.name.that.is.long", data.data(), data.size(),
                              CONFIG_PROP_TYPE);
      done = status == QEX_OK;
      DVSData_Free(list);
    }
    EXPECT_EQ(status, done ? QEX_OK : QEX_NO_MEMORY);
    EXPECT_EQ(blocks_out, 0);
  }
}

// Allocators that call the host, or worse.
void *alloc_and_call_the_host(size_t size) {
  lead_the_trap_elsewhere();
  return std::malloc(size);
}

void free_and_call_the_host(void *memory) {
  lead_the_trap_elsewhere();
  std::free(memory);
}

TEST_F(DataLists, AfterAnAllocatorTheTrapIsTheCallsAgain) {
  static DVSDataHandle list = nullptr;
  static void *bytes = nullptr;
  static qex_uint32 length = 0;
  auto const misuse = [] { DVSData_Name(&length); };
  EXPECT_TRUE(keeps_the_trap(
      [] { DVSData_Alloc(&list, alloc_and_call_the_host, free_and_call_the_host); }, misuse));
  auto const update = [] { DVSData_Update(list, "n", &length, 4, CONFIG_PROP_TYPE); };
  EXPECT_TRUE(keeps_the_trap(update, misuse));
  EXPECT_TRUE(keeps_the_trap(update, misuse)) << "which frees what it replaces";
  EXPECT_TRUE(keeps_the_trap([] { DVSData_Serialize(list, &bytes, &length, 200); }, misuse));
  std::free(bytes);
  EXPECT_TRUE(keeps_the_trap([] { DVSData_Free(list); }, misuse));
  EXPECT_EQ(simhost_ledger_count(), 0U);
}

// What an allocator does next, once, to the list that memory is wanted for.
DVSDataHandle meddled_with = nullptr;
void (*meddle)() = nullptr;

void *alloc_and_meddle(size_t size) {
  if (auto const once = std::exchange(meddle, nullptr)) {
    raised_by([=] { once(); });
  }
  return counted_alloc(size);
}

struct MeddlingAllocator : DataLists {
  MeddlingAllocator() {
    blocks_left = 1000;
    EXPECT_EQ(DVSData_Alloc(&meddled_with, alloc_and_meddle, counted_free), QEX_OK);
  }
};

QEX_ReturnStatus update_meddled_with(char const *name) {
  return DVSData_Update(meddled_with, name, &meddled_with, 8, CONFIG_PROP_TYPE);
}

TEST_F(MeddlingAllocator, MayChangeTheListThatItAllocatesFor) {
  meddle = [] { EXPECT_EQ(update_meddled_with("inner"), QEX_OK); };
  EXPECT_EQ(update_meddled_with("outer"), QEX_OK);
  void *bytes = nullptr;
  qex_uint32 length = 0;
  meddle = [] { EXPECT_EQ(update_meddled_with("more"), QEX_OK); };
  EXPECT_EQ(DVSData_Serialize(meddled_with, &bytes, &length, 200), QEX_BUSY);
  ASSERT_EQ(DVSData_Serialize(meddled_with, &bytes, &length, 200), QEX_OK);
  EXPECT_THAT(std::string(static_cast<char *>(bytes), length),
              testing::AllOf(testing::HasSubstr("inner"), testing::HasSubstr("outer"),
                             testing::HasSubstr("more")));
  counted_free(bytes);
  DVSData_Free(meddled_with);
  EXPECT_EQ(blocks_out, 0);
}

TEST_F(MeddlingAllocator, MayFreeTheListThatItAllocatesFor) {
  meddle = [] { DVSData_Free(meddled_with); };
  EXPECT_EQ(
      raised_by([] { update_meddled_with("n"); }),
      trapped_with("DVSData_Update: the list " + text_of(meddled_with) + " is freed already"));
  EXPECT_EQ(std::exchange(blocks_out, 0), 1) << "what it allocated for a list that was gone";
}

void *alloc_and_jump(size_t /*size*/) {
  DVSData_Name(&meddled_with);
  return nullptr;
}

TEST_F(DataLists, AnAllocatorMayTrap) {
  for (int round = 0; round < 100; ++round) {
    ASSERT_TRUE(
        raised_by([] { DVSData_Alloc(&meddled_with, alloc_and_jump, counted_free); }).has_value());
    ASSERT_EQ(VSDVS_SetMTU("s", 9000), QEX_OK) << "the host goes on";
  }
}

TEST_F(DataLists, InTheHostsMemory) {
  DVSDataHandle list = nullptr;
  EXPECT_EQ(DVSData_Alloc(nullptr, nullptr, nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(DVSData_Alloc(&list, counted_alloc, nullptr), QEX_BAD_PARAM);
  ASSERT_EQ(DVSData_Alloc(&list, nullptr, nullptr), QEX_OK);
  EXPECT_EQ(DVSData_Update(list, nullptr, nullptr, 0, CONFIG_PROP_TYPE), QEX_BAD_PARAM);
  EXPECT_EQ(DVSData_Update(list, "", nullptr, 0, CONFIG_PROP_TYPE), QEX_BAD_PARAM);
  EXPECT_EQ(DVSData_Update(list, "n", nullptr, 1, CONFIG_PROP_TYPE), QEX_BAD_PARAM);
  EXPECT_EQ(DVSData_Update(list, "n", nullptr, 0, 3), QEX_BAD_PARAM);
  EXPECT_EQ(DVSData_Update(nullptr, "n", nullptr, 0, CONFIG_PROP_TYPE), QEX_BAD_PARAM);
  void *bytes = nullptr;
  qex_uint32 length = 0;
  EXPECT_EQ(DVSData_Serialize(list, &bytes, &length, 0), QEX_BAD_PARAM);
  ASSERT_EQ(DVSData_Serialize(list, &bytes, &length, 200), QEX_OK);
  EXPECT_EQ(raised_by([=] { DVSQEX_DataFree(bytes); }), std::nullopt);
  DVSData_Free(list);
}

// The serialised form of a list that a call makes; it tells lists apart and is released at once.
std::string listed(QEX_ReturnStatus status, DVSDataHandle list) {
  if (status != QEX_OK) {
    return "";
  }
  void *bytes = nullptr;
  qex_uint32 length = 0;
  EXPECT_EQ(DVSData_Serialize(list, &bytes, &length, 200), QEX_OK);
  std::string text(static_cast<char const *>(bytes), length);
  DVSQEX_DataFree(bytes);
  DVSData_Free(list);
  return text;
}

TEST_F(DataLists, OfPropertiesByFamilyAndType) {
  ASSERT_EQ(set_global("com.example.mine", {1}, POLICY_PROP_TYPE), QEX_OK);
  ASSERT_EQ(set_host("com.example.host", {1}, VOLATILE_PROP_TYPE), QEX_OK);
  ASSERT_EQ(set_port("com.example.port", {1}), QEX_OK);
  ASSERT_EQ(set_port(VSPROP_PORT_TX_UPLINK, {1}), QEX_OK);
  ASSERT_EQ(set_host(VSPROP_SWITCH_STATUS, bytes_of(1)), QEX_OK);
  using testing::AllOf;
  using testing::HasSubstr;
  using testing::Not;
  DVSDataHandle list = nullptr;
  auto const all = static_cast<qex_uint32>(ALL_PROP_TYPE);
  auto status = DVSQEX_VendorGlobalPropList("s-id", &list, all);
  EXPECT_THAT(listed(status, list), AllOf(HasSubstr(VSPROP_MTU), Not(HasSubstr("com.example"))));
  status = DVSQEX_VendorGlobalPropList("s-id", &list, POLICY_PROP_TYPE);
  EXPECT_THAT(listed(status, list), Not(HasSubstr(VSPROP_MTU)));
  status = DVSQEX_VendorHostPropList("s-id", &list, all);
  EXPECT_THAT(listed(status, list),
              AllOf(HasSubstr(VSPROP_SWITCH_STATUS), Not(HasSubstr(QEX_NEBPROP_HOST_PROXY))));
  status = DVSQEX_VendorPortPropList("s-id", "p", &list, all);
  EXPECT_THAT(listed(status, list),
              AllOf(HasSubstr(VSPROP_PORT_TX_UPLINK), Not(HasSubstr(QEX_NEBPROP_PORT_CONNECTID))));
  status = DVSQEX_ExtraConfigPropList("s-id", &list, all);
  EXPECT_THAT(listed(status, list),
              AllOf(HasSubstr("com.example.mine"), HasSubstr("com.example.host"),
                    Not(HasSubstr(VSPROP_MTU)), Not(HasSubstr("com.example.port"))));
  status = DVSQEX_ExtraConfigPropList("s-id", &list, POLICY_PROP_TYPE);
  EXPECT_THAT(listed(status, list),
              AllOf(HasSubstr("com.example.mine"), Not(HasSubstr("com.example.host"))));
  status = DVSQEX_ExtraConfigPortPropList("s-id", "p", &list, all);
  EXPECT_THAT(listed(status, list),
              AllOf(HasSubstr("com.example.port"), Not(HasSubstr(VSPROP_PORT_TX_UPLINK))));
  EXPECT_EQ(DVSQEX_VendorGlobalPropList("s-id", &list, 0), QEX_BAD_PARAM);
  EXPECT_EQ(DVSQEX_VendorGlobalPropList("s-id", &list, 1), QEX_BAD_PARAM);
  EXPECT_EQ(DVSQEX_VendorGlobalPropList("s-id", nullptr, all), QEX_BAD_PARAM);
  EXPECT_EQ(DVSQEX_VendorGlobalPropList("s", &list, all), QEX_NOT_FOUND);
}

// "<count> x <size> bytes from <call>" of the one thing that is out; the size is the second.
struct Out {
  std::string call;
  std::size_t size;
};
Out only_one_out() {
  std::array<char, 128> text{};
  simhost_ledger_summary(text.data(), text.size());
  std::array<char, 64> call{};
  std::size_t size = 0;
  EXPECT_EQ(std::sscanf(text.data(), "1 x %zu bytes from %63s\n", &size, call.data()), 2)
      << text.data();
  return {.call = call.data(), .size = size};
}

TEST_F(DataLists, AreInTheLedgerWithAllThatTheyHold) {
  DVSDataHandle list = nullptr;
  ASSERT_EQ(DVSData_Alloc(&list, nullptr, nullptr), QEX_OK);
  EXPECT_EQ(simhost_ledger_count(), 1U);
  auto const empty = only_one_out();
  EXPECT_EQ(empty.call, "DVSData_Alloc");
  EXPECT_GT(empty.size, 0U);
  std::array<unsigned char, 1000> data{};
  ASSERT_EQ(DVSData_Update(list, "n", data.data(), data.size(), CONFIG_PROP_TYPE), QEX_OK);
  auto const full = only_one_out().size;
  EXPECT_GE(full, empty.size + data.size());
  ASSERT_EQ(DVSData_Update(list, "n", nullptr, 0, CONFIG_PROP_TYPE), QEX_OK);
  EXPECT_EQ(only_one_out().size, full - data.size());
  DVSData_Free(list);
  EXPECT_EQ(simhost_ledger_count(), 0U);
}

TEST_F(DataLists, OfPropertiesAreInTheLedgerByTheCallThatMadeThem) {
  struct {
    char const *call;
    QEX_ReturnStatus (*make)(DVSDataHandle *, qex_uint32);
  } const makers[] = {
      {"DVSQEX_VendorGlobalPropList",
       [](DVSDataHandle *list, qex_uint32 types) {
         return DVSQEX_VendorGlobalPropList("s-id", list, types);
       }},
      {"DVSQEX_VendorHostPropList",
       [](DVSDataHandle *list, qex_uint32 types) {
         return DVSQEX_VendorHostPropList("s-id", list, types);
       }},
      {"DVSQEX_VendorPortPropList",
       [](DVSDataHandle *list, qex_uint32 types) {
         return DVSQEX_VendorPortPropList("s-id", "p", list, types);
       }},
      {"DVSQEX_ExtraConfigPropList",
       [](DVSDataHandle *list, qex_uint32 types) {
         return DVSQEX_ExtraConfigPropList("s-id", list, types);
       }},
      {"DVSQEX_ExtraConfigPortPropList",
       [](DVSDataHandle *list, qex_uint32 types) {
         return DVSQEX_ExtraConfigPortPropList("s-id", "p", list, types);
       }},
  };
  for (auto const &[call, make] : makers) {
    DVSDataHandle list = nullptr;
    ASSERT_EQ(make(&list, ALL_PROP_TYPE), QEX_OK);
    EXPECT_EQ(only_one_out().call, call);
    DVSData_Free(list);
    EXPECT_EQ(make(&list, 0), QEX_BAD_PARAM);
    EXPECT_EQ(simhost_ledger_count(), 0U) << "a refused call allocates nothing";
  }
}

TEST_F(DataLists, AreReleasedByTheirOwnDeallocatorOnly) {
  DVSDataHandle list = nullptr;
  ASSERT_EQ(DVSData_Alloc(&list, nullptr, nullptr), QEX_OK);
  EXPECT_EQ(raised_by([=] { DVSQEX_DataFree(list); }),
            trapped_with("DVSQEX_DataFree: DVSData_Alloc gave out what is at " + text_of(list) +
                         ", and DVSData_Free takes it back"));
  EXPECT_EQ(simhost_ledger_count(), 1U);
  void *bytes = nullptr;
  qex_uint32 length = 0;
  ASSERT_EQ(DVSData_Serialize(list, &bytes, &length, 200), QEX_OK);
  EXPECT_EQ(raised_by([=] { DVSData_Free(bytes); }),
            trapped_with("DVSData_Free: the host never gave out the list " + text_of(bytes)));
  DVSQEX_DataFree(bytes);
  DVSData_Free(list);
}

TEST(DataListsDeathTest, AreReportedAtTheEndWhenAsked) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  EXPECT_EXIT(
      {
        unsetenv("SIMHOST_STATE");
        setenv("SIMHOST_LEDGER", "1", 1);
        DVSDataHandle list = nullptr;
        DVSData_Alloc(&list, nullptr, nullptr);
        std::exit(0);
      },
      testing::ExitedWithCode(0),
      "^simulated host: not given back:\n1 x [0-9]+ bytes from DVSData_Alloc\n$");
}

}  // namespace
