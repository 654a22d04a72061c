// The state library: handles, items and walks, and the kernel's switches.
#include "nebpublic/state.h"

#include <gmock/gmock.h>

#include <array>
#include <cstdlib>
#include <optional>
#include <string>
#include <vector>

#include "address_text.h"
#include "configured_switch.h"
#include "nebpublic/data.h"
#include "nebpublic/names.h"
#include "qexapi/switch_properties.h"
#include "trap_globals.h"
#include "vswitch/properties.h"

namespace {

using StateLibrary = ConfiguredSwitch;

TEST_F(StateLibrary, AHandleOfASwitchReadsIt) {
  auto *const handle = DVSState_SwitchFindByAlias("s");
  ASSERT_NE(handle, nullptr);
  EXPECT_EQ(DVSState_SwitchFindByAlias("s"), handle);
  EXPECT_STREQ(DVS_SwitchId(handle), "s-id");
  EXPECT_STREQ(DVS_SwitchName(handle), "s");
  EXPECT_STREQ(DVS_ClassName(handle), "cswitch");
  EXPECT_EQ(DVS_GetMaxPorts(handle), 128);
  EXPECT_EQ(DVS_Version(handle), 200U);
  auto const *const before = DVS_SwitchName(handle);
  ASSERT_EQ(set_global(QEX_NEBPROP_SWITCH_ALIAS, bytes_of_text("renamed")), QEX_OK);
  EXPECT_STREQ(DVS_SwitchName(handle), "renamed");
  EXPECT_STREQ(before, "s") << "a text that was given stays";
}

TEST_F(StateLibrary, AHandleOfAPortReadsIt) {
  auto *const handle = DVSState_PortFind("s-id", "p");
  ASSERT_NE(handle, nullptr);
  EXPECT_STREQ(DVS_PortId(handle), "p");
  EXPECT_EQ(DVS_PortAlias(handle), nullptr);
  ASSERT_EQ(set_port(QEX_NEBPROP_PORT_ALIAS, bytes_of_text("desk")), QEX_OK);
  EXPECT_STREQ(DVS_PortAlias(handle), "desk");
}

TEST_F(StateLibrary, WhatIsNotThereHasNoHandle) {
  EXPECT_EQ(DVSState_SwitchFindByAlias("s-id"), nullptr);
  EXPECT_EQ(DVSState_SwitchFindByAlias(nullptr), nullptr);
  EXPECT_EQ(DVSState_PortFind("s", "p"), nullptr);
  EXPECT_EQ(DVSState_PortFind("s-id", "q"), nullptr);
  EXPECT_EQ(DVSState_PortFind(nullptr, "p"), nullptr);
  EXPECT_EQ(DVSState_PortFind("s-id", nullptr), nullptr);
}

TEST_F(StateLibrary, ANullHandleIsNothing) {
  EXPECT_EQ(DVS_SwitchId(nullptr), nullptr);
  EXPECT_EQ(DVS_SwitchName(nullptr), nullptr);
  EXPECT_EQ(DVS_ClassName(nullptr), nullptr);
  EXPECT_EQ(DVS_GetMaxPorts(nullptr), 0);
  EXPECT_EQ(DVS_Version(nullptr), 0U);
  EXPECT_EQ(DVS_PortId(nullptr), nullptr);
  EXPECT_EQ(DVS_PortAlias(nullptr), nullptr);
  EXPECT_EQ(DVSData_Name(nullptr), nullptr);
  EXPECT_EQ(DVSData_Data(nullptr, nullptr), 0U);
  EXPECT_EQ(DVSData_PropType(nullptr), 0U);
  EXPECT_EQ(raised_by([] { DVSData_Free(nullptr); }), std::nullopt);
}

TEST_F(StateLibrary, AHandleOfNothingSpringsTheTrap) {
  static int mine = 0;
  auto const address = text_of(&mine);
  EXPECT_EQ(raised_by([] { DVS_SwitchId(&mine); }),
            trapped_with("DVS_SwitchId: the host never gave out the switch handle " + address));
  EXPECT_EQ(raised_by([] { DVS_PortAlias(&mine); }),
            trapped_with("DVS_PortAlias: the host never gave out the port handle " + address));
  EXPECT_EQ(raised_by([] { DVSData_Name(&mine); }),
            trapped_with("DVSData_Name: the host never gave out the item " + address));
  EXPECT_EQ(raised_by([] { DVSData_Free(&mine); }),
            trapped_with("DVSData_Free: the host never gave out the list " + address));
  EXPECT_EQ(raised_by([] { DVSData_Update(&mine, "n", nullptr, 0, CONFIG_PROP_TYPE); }),
            trapped_with("DVSData_Update: the host never gave out the list " + address));
  auto *const port = DVSState_PortFind("s-id", "p");
  EXPECT_EQ(raised_by([=] { DVS_Version(port); }),
            trapped_with("DVS_Version: the host never gave out the switch handle " + text_of(port)))
      << "a port is no switch";
}

TEST_F(StateLibrary, AHandleOfWhatIsGoneSpringsTheTrap) {
  auto *const handle = DVSState_SwitchFindByAlias("s");
  auto *const port = DVSState_PortFind("s-id", "p");
  ASSERT_EQ(DVSQEX_StateCleanup(), QEX_OK);
  EXPECT_EQ(
      raised_by([=] { DVS_SwitchName(handle); }),
      trapped_with("DVS_SwitchName: the switch of the handle " + text_of(handle) + " is gone"));
  EXPECT_EQ(raised_by([=] { DVS_PortId(port); }),
            trapped_with("DVS_PortId: the port of the handle " + text_of(port) + " is gone"));
}

TEST_F(StateLibrary, AHandleFromBeforeAResetIsOfNoPortWithItsNumber) {
  char const *const id = "5f0c7a1e-27c4-4b61-9d0e-6a5b8f3d2c10";
  ASSERT_EQ(simhost_reset(), QEX_OK);
  auto *const port = DVSState_PortFind(id, "web-1");
  int number = 0;
  ASSERT_EQ(VSDVS_DvPortIDToPortIDFromDVSID(id, "web-1", &number), QEX_OK);
  ASSERT_EQ(simhost_reset(), QEX_OK);
  int again = 0;
  ASSERT_EQ(VSDVS_DvPortIDToPortIDFromDVSID(id, "web-1", &again), QEX_OK);
  EXPECT_EQ(again, number);
  EXPECT_EQ(raised_by([=] { DVS_PortId(port); }),
            trapped_with("DVS_PortId: the port of the handle " + text_of(port) + " is gone"));
  EXPECT_STREQ(DVS_PortId(DVSState_PortFind(id, "web-1")), "web-1");
}

// Gathers what a walk reaches; ends it when there are `most` of them.
struct Gathered {
  std::vector<std::string> names;
  std::size_t most = 1000;
};

char gather(Gathered &gathered, char const *name) {
  gathered.names.emplace_back(name);
  return static_cast<char>(gathered.names.size() < gathered.most);
}

char gather_switch(void *handle, void *context) {
  return gather(*static_cast<Gathered *>(context), DVS_SwitchName(handle));
}

char gather_port(void *handle, void *context) {
  return gather(*static_cast<Gathered *>(context), DVS_PortId(handle));
}

char gather_item(void *item, void *context) {
  return gather(*static_cast<Gathered *>(context), DVSData_Name(item));
}

TEST_F(StateLibrary, WalksReachAllInTheirOrder) {
  ASSERT_EQ(VSDVS_CreateVSwitch("t", nullptr, nullptr, 0, 1, 0, 0, 0), QEX_OK);
  Gathered switches;
  DVSState_SwitchForEach(gather_switch, &switches);
  EXPECT_THAT(switches.names, testing::ElementsAre("s", "t"));
  auto *const handle = DVSState_SwitchFindByAlias("s");
  Gathered ports;
  DVSState_PortForEach(handle, gather_port, &ports);
  EXPECT_THAT(ports.names, testing::ElementsAre("uplink1", "uplink2", "p"));
  Gathered global_items;
  DVSState_GlobalPropForEach(handle, gather_item, &global_items);
  EXPECT_THAT(global_items.names,
              testing::ElementsAre(QEX_NEBPROP_SWITCH_ALIAS, QEX_NEBPROP_SWITCH_UPLINKPORTS,
                                   QEX_NEBPROP_SWITCH_VERSION, VSPROP_MTU));
  Gathered host_items;
  DVSState_HostPropForEach(handle, gather_item, &host_items);
  EXPECT_THAT(host_items.names,
              testing::ElementsAre(QEX_NEBPROP_HOST_PROXY, QEX_NEBPROP_HOST_UPLINKPORTS));
  Gathered port_items;
  DVSState_PortDataForEach(DVSState_PortFind("s-id", "p"), gather_item, &port_items);
  EXPECT_THAT(port_items.names,
              testing::ElementsAre(QEX_NEBPROP_PORT_CONNECTID, QEX_NEBPROP_PORT_LINK_STATUS,
                                   QEX_NEBPROP_PORT_STATISTICS, QEX_NEBPROP_PORT_STATUS,
                                   QEX_NEBPROP_PORT_VLAN, VSPROP_PORT_MAC_LEARNING_STATS));
}

TEST_F(StateLibrary, AResultOfZeroEndsAWalk) {
  ASSERT_EQ(VSDVS_CreateVSwitch("t", nullptr, nullptr, 0, 1, 0, 0, 0), QEX_OK);
  auto *const handle = DVSState_SwitchFindByAlias("s");
  Gathered switches{.names = {}, .most = 1};
  DVSState_SwitchForEach(gather_switch, &switches);
  EXPECT_THAT(switches.names, testing::ElementsAre("s"));
  Gathered ports{.names = {}, .most = 2};
  DVSState_PortForEach(handle, gather_port, &ports);
  EXPECT_THAT(ports.names, testing::ElementsAre("uplink1", "uplink2"));
  Gathered items{.names = {}, .most = 1};
  DVSState_GlobalPropForEach(handle, gather_item, &items);
  EXPECT_THAT(items.names, testing::ElementsAre(QEX_NEBPROP_SWITCH_ALIAS));
}

char remove_port(void *handle, void *context) {
  auto *const count = static_cast<int *>(context);
  auto const status = VSDVS_RemoveDVPort("s", DVS_PortId(handle));
  *count += status == QEX_OK ? 1 : 0;
  return 1;
}

TEST_F(StateLibrary, ACallbackMayChangeWhatItWalksOver) {
  ASSERT_EQ(VSDVS_AddDVPort("s", "q", 0), QEX_OK);
  int removed = 0;
  DVSState_PortForEach(DVSState_SwitchFindByAlias("s"), remove_port, &removed);
  EXPECT_EQ(removed, 2) << "the uplink ports stay";
  EXPECT_EQ(DVPortExist("s-id", "p"), 0);
}

char destroy_switch(void * /*reached*/, void *context) {
  ++*static_cast<int *>(context);
  VSDVS_DestroyVSwitch("s");
  return 1;
}

char remove_named_port(void * /*item*/, void *context) {
  ++*static_cast<int *>(context);
  VSDVS_RemoveDVPort("s", "p");
  return 1;
}

TEST_F(StateLibrary, AWalkEndsWithWhatItWalksOver) {
  int reached = 0;
  auto *const context = &reached;
  auto *const port = DVSState_PortFind("s-id", "p");
  EXPECT_EQ(raised_by([=] { DVSState_PortDataForEach(port, remove_named_port, context); }),
            std::nullopt);
  EXPECT_EQ(reached, 1);
  auto *const handle = DVSState_SwitchFindByAlias("s");
  EXPECT_EQ(raised_by([=] { DVSState_GlobalPropForEach(handle, destroy_switch, context); }),
            std::nullopt);
  EXPECT_EQ(reached, 2);
  ASSERT_EQ(VSDVS_CreateVSwitch("s", nullptr, nullptr, 0, 1, 0, 0, 0), QEX_OK);
  auto *const again = DVSState_SwitchFindByAlias("s");
  EXPECT_EQ(raised_by([=] { DVSState_HostPropForEach(again, destroy_switch, context); }),
            std::nullopt);
  EXPECT_EQ(reached, 3);
}

int reached_elsewhere = 0;

char call_the_host(void * /*reached*/, void * /*context*/) {
  lead_the_trap_elsewhere();
  ++reached_elsewhere;
  return 1;
}

TEST_F(StateLibrary, AfterACallbackTheTrapIsTheWalksAgain) {
  auto *const handle = DVSState_SwitchFindByAlias("s");
  auto *const port = DVSState_PortFind("s-id", "p");
  auto const misuse = [] { DVS_SwitchId(&reached_elsewhere); };
  auto const keeps = [&](auto const &walk) {
    reached_elsewhere = 0;
    return keeps_the_trap(walk, misuse) && reached_elsewhere > 0;
  };
  EXPECT_TRUE(keeps([] { DVSState_SwitchForEach(call_the_host, nullptr); }));
  EXPECT_TRUE(keeps([=] { DVSState_PortForEach(handle, call_the_host, nullptr); }));
  EXPECT_TRUE(keeps([=] { DVSState_GlobalPropForEach(handle, call_the_host, nullptr); }));
  EXPECT_TRUE(keeps([=] { DVSState_HostPropForEach(handle, call_the_host, nullptr); }));
  EXPECT_TRUE(keeps([=] { DVSState_PortDataForEach(port, call_the_host, nullptr); }));
  EXPECT_FALSE(keeps_the_trap(lead_the_trap_elsewhere, misuse)) << "the detector detects";
}

char release_rubbish(void * /*handle*/, void *context) {
  VSDVS_FreeMemory(context);
  return 1;
}

TEST_F(StateLibrary, ACallbackMayTrap) {
  static int mine = 0;
  for (int round = 0; round < 100; ++round) {
    ASSERT_TRUE(raised_by([] { DVSState_SwitchForEach(release_rubbish, &mine); }).has_value());
    ASSERT_EQ(VSDVS_SetMTU("s", 9000), QEX_OK) << "the host goes on";
  }
}

// What a call raises that a fault waits for.
template <typename Walk>
std::optional<Raised> trapped_by(char const *name, Walk const &walk) {
  EXPECT_EQ(simhost_trap_call(name, 1, 1, "OSError", "gone"), QEX_OK);
  auto raised = raised_by(walk);
  EXPECT_EQ(simhost_clear_faults(name), QEX_OK);
  return raised;
}

TEST_F(StateLibrary, WalksOfNothing) {
  Gathered gathered;
  DVSState_PortForEach(nullptr, gather_port, &gathered);
  DVSState_GlobalPropForEach(nullptr, gather_item, &gathered);
  DVSState_HostPropForEach(nullptr, gather_item, &gathered);
  DVSState_PortDataForEach(nullptr, gather_item, &gathered);
  EXPECT_THAT(gathered.names, testing::IsEmpty());
  EXPECT_EQ(raised_by([] { DVSState_SwitchForEach(nullptr, nullptr); }), std::nullopt);
}

// A walk that has nothing to do is a call all the same, for the faults that wait for one.
TEST_F(StateLibrary, WalksOfNothingAreCalls) {
  auto *const handle = DVSState_SwitchFindByAlias("s");
  auto *const port = DVSState_PortFind("s-id", "p");
  struct {
    char const *name;
    std::optional<Raised> raised;
  } const walks[] = {
      {"DVSState_SwitchForEach",
       trapped_by("DVSState_SwitchForEach", [] { DVSState_SwitchForEach(nullptr, nullptr); })},
      {"DVSState_PortForEach",
       trapped_by("DVSState_PortForEach",
                  [] { DVSState_PortForEach(nullptr, gather_port, nullptr); })},
      {"DVSState_PortForEach",
       trapped_by("DVSState_PortForEach", [=] { DVSState_PortForEach(handle, nullptr, nullptr); })},
      {"DVSState_GlobalPropForEach",
       trapped_by("DVSState_GlobalPropForEach",
                  [] { DVSState_GlobalPropForEach(nullptr, gather_item, nullptr); })},
      {"DVSState_HostPropForEach",
       trapped_by("DVSState_HostPropForEach",
                  [=] { DVSState_HostPropForEach(handle, nullptr, nullptr); })},
      {"DVSState_PortDataForEach",
       trapped_by("DVSState_PortDataForEach",
                  [=] { DVSState_PortDataForEach(port, nullptr, nullptr); })},
  };
  for (auto const &[name, raised] : walks) {
    EXPECT_EQ(raised, (Raised{.type = "OSError", .message = "gone"})) << name;
  }
}

TEST_F(StateLibrary, AnItemIsASnapshot) {
  DVSDataItem item = nullptr;
  ASSERT_EQ(DVSState_GlobalPropLookup("s-id", VSPROP_MTU, &item), QEX_OK);
  EXPECT_STREQ(DVSData_Name(item), VSPROP_MTU);
  EXPECT_EQ(DVSData_PropType(item), static_cast<qex_uint32>(CONFIG_PROP_TYPE));
  void *data = nullptr;
  ASSERT_EQ(DVSData_Data(item, &data), sizeof(qex_uint32));
  ASSERT_EQ(VSDVS_SetMTU("s", 9000), QEX_OK);
  EXPECT_EQ(*static_cast<qex_uint32 *>(data), 1500U) << "until it is looked up again";
  DVSDataItem again = nullptr;
  ASSERT_EQ(DVSState_GlobalPropLookup("s-id", VSPROP_MTU, &again), QEX_OK);
  EXPECT_EQ(again, item);
  ASSERT_EQ(DVSData_Data(item, &data), sizeof(qex_uint32));
  EXPECT_EQ(*static_cast<qex_uint32 *>(data), 9000U);
  EXPECT_EQ(DVSState_GlobalPropLookup("s-id", "com.example.none", &item), QEX_NOT_FOUND);
  EXPECT_EQ(DVSState_GlobalPropLookup("s", VSPROP_MTU, &item), QEX_NOT_FOUND);
  EXPECT_EQ(DVSState_HostPropLookup("s-id", VSPROP_MTU, &item), QEX_NOT_FOUND);
  EXPECT_EQ(DVSState_HostPropLookup("s-id", QEX_NEBPROP_HOST_PROXY, &item), QEX_OK);
  EXPECT_EQ(DVSState_HostPropLookup("s-id", QEX_NEBPROP_HOST_PROXY, nullptr), QEX_BAD_PARAM);
}

TEST_F(StateLibrary, SanitizingDropsWhatIsGone) {
  ASSERT_EQ(VSDVS_AddDVPort("s", "q", 0), QEX_OK);
  ASSERT_EQ(set_port(QEX_NEBPROP_PORT_TYPE, bytes_of(DVSPORT_TYPE_ZOMBIE), "q"), QEX_OK);
  ASSERT_EQ(VSDVS_CreateVSwitch("fleeting", "f", nullptr, 0, 0, 0, 0, 0), QEX_OK);
  EXPECT_EQ(DVSQEX_StateSanitize(), QEX_OK);
  EXPECT_EQ(DVPortExist("s-id", "q"), 0);
  EXPECT_EQ(DVPortExist("s-id", "p"), 1);
  EXPECT_NE(DVSState_SwitchFindByAlias("fleeting"), nullptr) << "it runs";
  ASSERT_EQ(DVSQEX_SwitchDissociate("f"), QEX_OK);
  EXPECT_EQ(DVSQEX_StateSanitize(), QEX_OK);
  EXPECT_EQ(DVSState_SwitchFindByAlias("fleeting"), nullptr);
}

TEST_F(StateLibrary, KernelSwitches) {
  EXPECT_EQ(DVSQEX_SwitchAdd("i", "a", 64, 100), QEX_OK);
  auto *const handle = DVSState_SwitchFindByAlias("a");
  EXPECT_STREQ(DVS_SwitchId(handle), "i");
  EXPECT_EQ(DVS_GetMaxPorts(handle), 64);
  EXPECT_EQ(DVS_Version(handle), 100U);
  EXPECT_EQ(DVSQEX_SwitchAdd("i", "b", 0, 0), QEX_EXISTS);
  EXPECT_EQ(DVSQEX_SwitchAdd("j", "a", 0, 0), QEX_EXISTS);
  EXPECT_EQ(DVSQEX_SwitchAdd("", "b", 0, 0), QEX_BAD_PARAM);
  EXPECT_EQ(DVSQEX_SwitchAdd("j", "", 0, 0), QEX_BAD_PARAM);
  EXPECT_EQ(DVSQEX_SwitchAdd(nullptr, "b", 0, 0), QEX_BAD_PARAM);
  EXPECT_EQ(DVSQEX_SwitchAdd("j", nullptr, 0, 0), QEX_BAD_PARAM);
  EXPECT_EQ(DVSQEX_SwitchSetVersion("i", 0), QEX_BAD_PARAM);
  EXPECT_EQ(DVSQEX_SwitchSetVersion("a", 1), QEX_NOT_FOUND);
  EXPECT_EQ(DVSQEX_SwitchAssociate("a"), QEX_NOT_FOUND);
  EXPECT_EQ(DVSQEX_SwitchDissociate("a"), QEX_NOT_FOUND);
  EXPECT_EQ(DVSQEX_SwitchRemove("a"), QEX_NOT_FOUND);
  EXPECT_EQ(DVSQEX_SwitchRemove("i"), QEX_OK);
  EXPECT_EQ(DVSState_SwitchFindByAlias("a"), nullptr);
}

TEST_F(StateLibrary, NoSwitchHasCommandsOfItsOwn) {
  EXPECT_EQ(DVSQEX_CmdExec("s-id", "anything", nullptr, 0, nullptr, nullptr), QEX_NOT_SUPPORTED);
  EXPECT_EQ(DVSQEX_CmdExec("none", "anything", nullptr, 0, nullptr, nullptr), QEX_NOT_FOUND);
  EXPECT_EQ(DVSQEX_CmdExec("s-id", nullptr, nullptr, 0, nullptr, nullptr), QEX_BAD_PARAM);
}

}  // namespace
