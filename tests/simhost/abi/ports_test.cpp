// Ports of switches: how they come, go, are found and counted, and the uplink ports among them.
#include <gmock/gmock.h>

#include <array>
#include <string>
#include <vector>

#include "configured_switch.h"
#include "nebpublic/names.h"
#include "qexapi/switch_properties.h"
#include "vswitch/properties.h"
#include "vswitch/queries.h"

namespace {

using Ports = ConfiguredSwitch;

std::vector<std::string> uplinks(char const *name = "s") {
  VSUplinks *list = nullptr;
  EXPECT_EQ(VSQEX_GetUplinks(name, &list), QEX_OK);
  std::vector<std::string> names;
  for (qex_uint32 at = 0; at < list->numEntries; ++at) {
    names.emplace_back(list->entries[at].name.string);
  }
  VSQEX_FreeMemory(list);
  return names;
}

std::vector<std::string> uplink_ports() {
  VSUplinkPorts *names = nullptr;
  VSUplinkPortIds *ids = nullptr;
  EXPECT_EQ(VSDVS_GetSwitchUplinkPorts("s", &names, &ids), QEX_OK);
  EXPECT_EQ(names->nUplinkPorts, ids->nUplinkPorts);
  std::vector<std::string> all;
  for (qex_uint32 at = 0; at < names->nUplinkPorts; ++at) {
    all.push_back(std::string(text_in(ids, at)) + "=" + text_in(names, at));
  }
  VSDVS_FreeMemory(names);
  VSDVS_FreeMemory(ids);
  return all;
}

// Sets the uplink ports, given as pairs of identifier and name.
QEX_ReturnStatus set_uplink_ports(std::vector<std::pair<std::string, std::string>> const &ports) {
  auto const count = static_cast<qex_uint32>(ports.size());
  auto names = bytes_of(count);
  auto ids = bytes_of(count);
  for (auto const &[id, name] : ports) {
    Bytes name_field(QEX_NEB_NAME_MAX_LEN);
    std::copy_n(name.begin(), std::min(name.size(), name_field.size()), name_field.begin());
    Bytes id_field(QEX_NEB_PORT_ID_MAX_LEN);
    std::copy_n(id.begin(), std::min(id.size(), id_field.size()), id_field.begin());
    names = names + name_field;
    ids = ids + id_field;
  }
  return VSDVS_SetSwitchUplinkPorts("s", reinterpret_cast<VSUplinkPorts *>(names.data()),
                                    reinterpret_cast<VSUplinkPortIds *>(ids.data()));
}

int number_of(char const *port) {
  int number = 0;
  EXPECT_EQ(VSDVS_DvPortIDToPortID("s", port, &number), QEX_OK);
  return number;
}

TEST_F(Ports, ComeAndGo) {
  EXPECT_EQ(DVPortExist("s-id", "q"), 0);
  EXPECT_EQ(VSDVS_AddDVPort("s", "q", 1), QEX_OK);
  EXPECT_EQ(DVPortExist("s-id", "q"), 1);
  EXPECT_EQ(DVSQEX_PortFind("s-id", "q"), QEX_OK);
  EXPECT_EQ(VSDVS_AddDVPort("s", "q", 1), QEX_EXISTS);
  EXPECT_EQ(DVSQEX_PortAdd("s-id", "q", nullptr, 0), QEX_EXISTS);
  EXPECT_EQ(VSDVS_RemoveDVPort("s", "q"), QEX_OK);
  EXPECT_EQ(VSDVS_RemoveDVPort("s", "q"), QEX_NOT_FOUND);
  EXPECT_EQ(DVSQEX_PortFind("s-id", "q"), QEX_NOT_FOUND);
  EXPECT_EQ(DVSQEX_PortAdd("s-id", "q", nullptr, 0), QEX_OK);
  EXPECT_EQ(DVSQEX_PortRemove("s-id", "q"), QEX_OK);
}

TEST_F(Ports, HaveIdentifiersOfBoundedLength) {
  EXPECT_EQ(VSDVS_AddDVPort("s", std::string(47, 'p').c_str(), 0), QEX_OK);
  EXPECT_EQ(VSDVS_AddDVPort("s", std::string(48, 'p').c_str(), 0), QEX_NAME_TOO_LONG);
  EXPECT_EQ(VSDVS_AddDVPort("s", "", 0), QEX_BAD_PARAM);
  EXPECT_EQ(VSDVS_AddDVPort("s", nullptr, 0), QEX_BAD_PARAM);
  EXPECT_EQ(VSDVS_AddDVPort(nullptr, "q", 0), QEX_BAD_PARAM);
  EXPECT_EQ(VSDVS_AddDVPort("s-id", "q", 0), QEX_NOT_FOUND);
  EXPECT_EQ(DVPortExist(nullptr, "p"), 0);
  EXPECT_EQ(DVPortExist("s-id", nullptr), 0);
  EXPECT_EQ(DVPortExist("s", "p"), 0);
}

TEST_F(Ports, HaveNumbersThatAreNeverUsedAgain) {
  auto const first = number_of("p");
  ASSERT_EQ(VSDVS_RemoveDVPort("s", "p"), QEX_OK);
  ASSERT_EQ(VSDVS_AddDVPort("s", "p", 0), QEX_OK);
  EXPECT_GT(number_of("p"), first);
  int by_identifier = 0;
  EXPECT_EQ(VSDVS_DvPortIDToPortIDFromDVSID("s-id", "p", &by_identifier), QEX_OK);
  EXPECT_EQ(by_identifier, number_of("p"));
  EXPECT_EQ(VSDVS_DvPortIDToPortIDFromDVSID("s", "p", &by_identifier), QEX_NOT_FOUND);
}

TEST_F(Ports, OfASwitchThatDoesNotRunHaveNoNumber) {
  auto const before = static_cast<qex_SwitchPortID>(number_of("p"));
  ASSERT_EQ(DVSQEX_SwitchDissociate("s-id"), QEX_OK);
  int number = 0;
  EXPECT_EQ(VSDVS_DvPortIDToPortID("s", "p", &number), QEX_NOT_FOUND);
  qex_Name hint{};
  EXPECT_EQ(VSQEX_PortGetTeamUplinkHint(before, &hint), QEX_NOT_FOUND);
  VSInfo info{};
  EXPECT_EQ(VSQEX_GetVSInfo("s", &info), QEX_NOT_FOUND);
  VSUplinks *list = nullptr;
  EXPECT_EQ(VSQEX_GetUplinks("s", &list), QEX_NOT_FOUND);
  VSMACTable *addresses = nullptr;
  EXPECT_EQ(VSQEX_GetTeamMACTable("s", VS_MAC_ADDR_TYPE_ALL, &addresses), QEX_NOT_FOUND);
  EXPECT_EQ(VSDVS_SetMTU("s", 9000), QEX_OK) << "it can still be configured";
  ASSERT_EQ(DVSQEX_SwitchAssociate("s-id"), QEX_OK);
  EXPECT_EQ(VSDVS_DvPortIDToPortID("s", "p", &number), QEX_OK);
  EXPECT_EQ(VSQEX_PortGetTeamUplinkHint(before, &hint), QEX_OK);
  EXPECT_EQ(VSQEX_GetVSInfo("s", &info), QEX_OK);
}

TEST_F(Ports, AreLimitedWithoutTheUplinkPorts) {
  EXPECT_EQ(DVSQEX_SwitchSetMaxPorts("s-id", 2), QEX_OK);
  EXPECT_EQ(VSDVS_AddDVPort("s", "q", 0), QEX_OK);
  EXPECT_EQ(VSDVS_AddDVPort("s", "r", 0), QEX_LIMIT_EXCEEDED);
  EXPECT_EQ(DVPortExist("s-id", "r"), 0);
  EXPECT_EQ(VSDVS_AddSwitchUplinkPort("s", "nic2"), QEX_OK);
  EXPECT_EQ(DVSQEX_SwitchSetMaxPorts("s-id", 1), QEX_LIMIT_EXCEEDED);
  EXPECT_EQ(DVSQEX_SwitchSetMaxPorts("s-id", 0), QEX_BAD_PARAM);
  EXPECT_EQ(DVSQEX_SwitchSetMaxPorts("s-id", 65536), QEX_BAD_PARAM);
  VSInfo info{};
  ASSERT_EQ(VSQEX_GetVSInfo("s", &info), QEX_OK);
  EXPECT_EQ(info.activePorts, 2U);
  EXPECT_EQ(info.maxPorts, 2U);
}

TEST_F(Ports, OfAnotherSystem) {
  EXPECT_EQ(VSDVS_AddOpaqueDVPort("s", "q", "theirs"), QEX_OK);
  EXPECT_EQ(VSDVS_AddOpaqueDVPort("s", "r", "theirs"), QEX_EXISTS);
  EXPECT_EQ(DVPortExist("s-id", "r"), 0) << "a refused call changes nothing";
  EXPECT_EQ(VSDVS_AddOpaqueDVPort("s", "r", nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSDVS_AddOpaqueDVPort("s", "r", ""), QEX_BAD_PARAM);
  EXPECT_EQ(VSDVS_AddOpaqueDVPort("s", "r", std::string(48, 'x').c_str()), QEX_NAME_TOO_LONG);
  OpaqueDVPortData *data = nullptr;
  ASSERT_EQ(DVSQEX_PortGetByExternalId("s-id", "theirs", &data), QEX_OK);
  EXPECT_STREQ(data->dvPortId, "q");
  EXPECT_STREQ(data->externalId, "theirs");
  DVSQEX_DataFree(data);
  EXPECT_EQ(DVSQEX_PortGetByExternalId("s-id", "q", &data), QEX_NOT_FOUND);
}

TEST_F(Ports, AreListedByType) {
  DVPortList *list = nullptr;
  EXPECT_EQ(DVSQEX_SwitchPortList("s-id", &list, DVSPORT_TYPE_INVALID), QEX_BAD_PARAM);
  EXPECT_EQ(DVSQEX_SwitchPortList("s-id", &list, static_cast<DVSPortType>(5)), QEX_BAD_PARAM);
  ASSERT_EQ(DVSQEX_SwitchPortList("s-id", &list, DVSPORT_TYPE_ZOMBIE), QEX_OK);
  EXPECT_EQ(list->nports, 0);
  EXPECT_STREQ(list->dvPort[0].dvPortId, "");
  DVSQEX_DataFree(list);
}

TEST_F(Ports, ASwitchTakesFreeUplinks) {
  EXPECT_EQ(VSDVS_AddSwitchUplinkPort("s", "nic3"), QEX_OK);
  EXPECT_THAT(uplinks(), testing::ElementsAre("nic0", "nic1", "nic3"));
  EXPECT_THAT(uplink_ports(),
              testing::ElementsAre("uplink1=uplink1", "uplink2=uplink2", "uplink3=uplink3"));
  EXPECT_EQ(VSDVS_AddSwitchUplinkPort("s", "nic3"), QEX_EXISTS);
  EXPECT_EQ(VSDVS_AddSwitchUplinkPort("s", "none"), QEX_NOT_FOUND);
  ASSERT_EQ(VSDVS_CreateVSwitch("t", "t-id", nullptr, 0, 1, 0, 0, 0), QEX_OK);
  EXPECT_EQ(VSDVS_AddSwitchUplinkPort("t", "nic3"), QEX_BUSY);
  EXPECT_EQ(VSDVS_RemoveSwitchUplinkPort("t", "nic3"), QEX_NOT_FOUND);
  EXPECT_EQ(VSDVS_RemoveSwitchUplinkPort("s", "nic3"), QEX_OK);
  EXPECT_EQ(VSDVS_AddSwitchUplinkPort("t", "nic3"), QEX_OK);
  EXPECT_THAT(uplinks("t"), testing::ElementsAre("nic3"));
}

TEST_F(Ports, ARemovedUplinkTakesItsPortAlong) {
  EXPECT_EQ(VSDVS_RemoveSwitchUplinkPort("s", "nic0"), QEX_OK);
  EXPECT_THAT(uplink_ports(), testing::ElementsAre("uplink2=uplink2"));
  EXPECT_EQ(VSDVS_AddSwitchUplinkPort("s", "nic2"), QEX_OK);
  EXPECT_THAT(uplink_ports(), testing::ElementsAre("uplink2=uplink2", "uplink1=uplink1"));
  EXPECT_EQ(VSDVS_ClearSwitchUplinkPorts("s"), QEX_OK);
  EXPECT_THAT(uplink_ports(), testing::IsEmpty());
  EXPECT_THAT(uplinks(), testing::IsEmpty());
}

TEST_F(Ports, AnUplinkPortWithItsUplinkStays) {
  EXPECT_EQ(VSDVS_RemoveDVPort("s", "uplink1"), QEX_BUSY);
  EXPECT_EQ(DVSQEX_PortRemove("s-id", "uplink1"), QEX_BUSY);
}

TEST_F(Ports, TheUplinkPortsAreReplacedByIdentifier) {
  EXPECT_EQ(set_uplink_ports({{"uplink2", "right"}, {"new", "middle"}}), QEX_OK);
  EXPECT_THAT(uplink_ports(), testing::ElementsAre("uplink2=right", "new=middle"));
  EXPECT_THAT(uplinks(), testing::ElementsAre("nic1")) << "what was left out is free";
  EXPECT_EQ(VSDVS_AddSwitchUplinkPort("s", "nic0"), QEX_OK);
  EXPECT_THAT(uplink_ports(), testing::ElementsAre("uplink2=right", "new=middle"))
      << "a port without an uplink takes it";
}

TEST_F(Ports, UplinkPortsThatContradict) {
  EXPECT_EQ(set_uplink_ports({{"a", "x"}, {"a", "y"}}), QEX_EXISTS);
  EXPECT_EQ(set_uplink_ports({{"a", "x"}, {"b", "x"}}), QEX_EXISTS);
  EXPECT_EQ(set_uplink_ports({{"p", "x"}}), QEX_EXISTS) << "a client's port";
  EXPECT_EQ(set_uplink_ports({{"", "x"}}), QEX_BAD_PARAM);
  EXPECT_EQ(set_uplink_ports({{"a", ""}}), QEX_BAD_PARAM);
  EXPECT_EQ(set_uplink_ports({{std::string(48, 'a'), "x"}}), QEX_NAME_TOO_LONG);
  EXPECT_EQ(set_uplink_ports({{"a", std::string(81, 'x')}}), QEX_NAME_TOO_LONG);
  EXPECT_THAT(uplink_ports(), testing::ElementsAre("uplink1=uplink1", "uplink2=uplink2"));
  VSUplinkPorts const names{.nUplinkPorts = 0xFFFFFFFF, .uplinkPortName = {}};
  VSUplinkPortIds const ids{.nUplinkPorts = 0, .uplinkPortId = {}};
  EXPECT_EQ(VSDVS_SetSwitchUplinkPorts("s", &names, &ids), QEX_LIMIT_EXCEEDED);
  EXPECT_EQ(VSDVS_SetSwitchUplinkPorts("s", nullptr, &ids), QEX_BAD_PARAM);
}

TEST_F(Ports, TheAliasOfAnUplinkPortIsItsNameAlone) {
  auto const rename = [](char const *port, char const *alias) {
    return set_port(QEX_NEBPROP_PORT_ALIAS, bytes_of_text(alias), port);
  };
  EXPECT_EQ(rename("uplink1", "uplink2"), QEX_EXISTS);
  EXPECT_EQ(rename("uplink1", ""), QEX_BAD_PARAM);
  EXPECT_EQ(rename("uplink1", "uplink3"), QEX_OK);
  EXPECT_EQ(rename("uplink1", "uplink3"), QEX_OK) << "its own name";
  EXPECT_EQ(rename("uplink2", "uplink1"), QEX_OK);
  EXPECT_EQ(rename("p", "uplink1"), QEX_OK) << "a client's port has no such name";
  EXPECT_EQ(rename("p", ""), QEX_OK);
  EXPECT_EQ(set_uplink_ports({{"uplink1", "uplink1"}, {"uplink2", "uplink3"}}), QEX_OK)
      << "two exchange their names";
  EXPECT_EQ(VSDVS_AddSwitchUplinkPort("s", "nic2"), QEX_OK);
  EXPECT_THAT(uplink_ports(),
              testing::ElementsAre("uplink1=uplink1", "uplink2=uplink3", "uplink4=uplink4"));
}

TEST_F(Ports, NamesOfPortsets) {
  std::array<char, 129> alias{};
  EXPECT_EQ(VSDVS_GetAliasFromPortset("s-ports", alias.data()), QEX_OK);
  EXPECT_STREQ(alias.data(), "s");
  EXPECT_EQ(VSDVS_GetAliasFromPortset("s", alias.data()), QEX_NOT_FOUND);
}

TEST_F(Ports, StartWithTheStateOfAnother) {
  ASSERT_EQ(VSDVS_SetPortNestedVLANTagging("s", "p", 1), QEX_OK);
  ASSERT_EQ(set_port("com.example.soon", {5}, "p", RUNTIME_PROP_TYPE), QEX_OK);
  void *state = nullptr;
  int length = 0;
  ASSERT_EQ(DVSQEX_PortStateGet("s-id", "p", &state, &length), QEX_OK);
  EXPECT_EQ(DVSQEX_PortAdd("s-id", "q", state, length), QEX_OK);
  EXPECT_EQ(port(VSPROP_PORT_VLAN_NESTEDTAG, "q"), Bytes{1});
  EXPECT_EQ(port("com.example.soon", "q"), Bytes{5});
  EXPECT_EQ(port(QEX_NEBPROP_PORT_CONNECTID, "q"), bytes_of(7));
  EXPECT_EQ(DVSQEX_PortAdd("s-id", "r", state, length - 1), QEX_INVALID_METADATA);
  EXPECT_EQ(DVSQEX_PortFind("s-id", "r"), QEX_NOT_FOUND);
  DVSQEX_DataFree(state);
  EXPECT_EQ(DVSQEX_PersistentPortStateGet("s-id", "p", 0, &state, &length), QEX_BAD_PARAM);
  ASSERT_EQ(DVSQEX_PersistentPortStateGet("s-id", "p", 100, &state, &length), QEX_OK);
  EXPECT_EQ(DVSQEX_PortAdd("s-id", "r", state, length), QEX_OK);
  DVSQEX_DataFree(state);
  EXPECT_EQ(port(VSPROP_PORT_VLAN_NESTEDTAG, "r"), Bytes{1});
  EXPECT_EQ(port("com.example.soon", "r"), std::nullopt);
}

TEST_F(Ports, TenThousandOnOneSwitch) {
  ASSERT_EQ(DVSQEX_SwitchSetMaxPorts("s-id", 10001), QEX_OK);
  for (int number = 0; number < 10000; ++number) {
    ASSERT_EQ(VSDVS_AddDVPort("s", ("many-" + std::to_string(number)).c_str(), 0), QEX_OK);
  }
  EXPECT_EQ(VSDVS_AddDVPort("s", "one-more", 0), QEX_LIMIT_EXCEEDED);
  VSInfo info{};
  ASSERT_EQ(VSQEX_GetVSInfo("s", &info), QEX_OK);
  EXPECT_EQ(info.activePorts, 10001U);
  EXPECT_EQ(DVPortExist("s-id", "many-9999"), 1);
}

}  // namespace
