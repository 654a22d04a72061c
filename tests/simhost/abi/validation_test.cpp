// What the host refuses as a setting, and with which status.
#include <gmock/gmock.h>

#include <array>
#include <limits>
#include <string>

#include "configured_switch.h"
#include "qexapi/switch_properties.h"
#include "vswitch/properties.h"

namespace {

using Validation = ConfiguredSwitch;

QEX_ReturnStatus set_vlan(qex_uint16 vlan, int priority = -1, bool private_vlan = false,
                          std::vector<qex_NEBPortVIDRange> ranges = {}) {
  return VSDVS_SetPortVLANPolicy("s", "p", vlan, priority, 0, static_cast<qex_Bool>(private_vlan),
                                 ranges.data(), static_cast<qex_uint16>(ranges.size()));
}

TEST_F(Validation, VlansEndAt4094) {
  EXPECT_EQ(set_vlan(0), QEX_OK);
  EXPECT_EQ(set_vlan(4094), QEX_OK);
  EXPECT_EQ(set_vlan(4095), QEX_BAD_VLANID);
  EXPECT_EQ(set_vlan(65535), QEX_BAD_VLANID);
  EXPECT_EQ(set_vlan(0, -1, false, {{0, 4094}}), QEX_OK);
  EXPECT_EQ(set_vlan(0, -1, false, {{1, 4095}}), QEX_BAD_VLANID);
}

TEST_F(Validation, VlanRangesRise) {
  EXPECT_EQ(set_vlan(0, -1, false, {{1, 5}, {6, 6}, {9, 12}}), QEX_OK);
  EXPECT_EQ(set_vlan(0, -1, false, {{5, 1}}), QEX_BAD_PARAM) << "its ends";
  EXPECT_EQ(set_vlan(0, -1, false, {{6, 9}, {1, 5}}), QEX_BAD_PARAM) << "one after the other";
  EXPECT_EQ(set_vlan(0, -1, false, {{1, 5}, {5, 9}}), QEX_BAD_PARAM) << "sharing a VLAN";
  EXPECT_EQ(VSDVS_SetPortVLANPolicy("s", "p", 0, -1, 0, 0, nullptr, 1), QEX_BAD_PARAM);
}

TEST_F(Validation, PrioritiesAreOfThreeBits) {
  EXPECT_EQ(set_vlan(1, 0), QEX_OK);
  EXPECT_EQ(set_vlan(1, 7), QEX_OK);
  EXPECT_EQ(set_vlan(1, 8), QEX_BAD_PARAM);
  EXPECT_EQ(set_vlan(1, -2), QEX_BAD_PARAM);
  EXPECT_EQ(set_port(VSPROP_PORT_PRIORITY, bytes_of(8)), QEX_BAD_PARAM);
  EXPECT_EQ(port(VSPROP_PORT_PRIORITY), bytes_of(7)) << "refused calls change nothing";
}

VSPvlanMapEntry entry(qex_uint16 primary, qex_uint16 secondary, qex_uint8 type) {
  return {.primaryVID = primary, .secondaryVID = secondary, .pvlanType = type, .pad = {}};
}

QEX_ReturnStatus set_map(std::vector<VSPvlanMapEntry> const &map) {
  auto const status = VSDVS_SetPrivateVLANMap("s", map.data(), static_cast<int>(map.size()));
  Bytes bytes;
  for (auto const &one : map) {
    bytes = bytes + bytes_of(one);
  }
  EXPECT_EQ(Validation::set_global(VSPROP_PVLAN_MAP, bytes), status) << "the calls agree";
  return status;
}

constexpr qex_uint8 kPromiscuous = VSPORT_PVLAN_TYPE_PROMISC;
constexpr qex_uint8 kIsolated = VSPORT_PVLAN_TYPE_ISOLATED;
constexpr qex_uint8 kCommunity = VSPORT_PVLAN_TYPE_COMMUNITY;

TEST_F(Validation, PrivateVlanMapsThatHold) {
  EXPECT_EQ(set_map({}), QEX_OK);
  EXPECT_EQ(
      set_map({entry(10, 10, kPromiscuous), entry(10, 11, kIsolated), entry(10, 12, kCommunity),
               entry(10, 13, kCommunity), entry(20, 20, kPromiscuous), entry(20, 21, kIsolated)}),
      QEX_OK);
}

TEST_F(Validation, PrivateVlanMapsThatContradict) {
  EXPECT_EQ(set_map({entry(10, 11, kPromiscuous)}), QEX_BAD_PARAM);
  EXPECT_EQ(set_map({entry(10, 10, kIsolated)}), QEX_BAD_PARAM);
  EXPECT_EQ(set_map({entry(10, 11, 0)}), QEX_BAD_PARAM);
  EXPECT_EQ(set_map({entry(10, 11, 4)}), QEX_BAD_PARAM);
  EXPECT_EQ(set_map({entry(10, 11, kCommunity), entry(20, 11, kCommunity)}), QEX_BAD_PARAM)
      << "a secondary VLAN of two primary ones";
  EXPECT_EQ(set_map({entry(10, 11, kCommunity), entry(11, 12, kCommunity)}), QEX_BAD_PARAM)
      << "secondary and primary";
  EXPECT_EQ(set_map({entry(10, 11, kIsolated), entry(10, 12, kIsolated)}), QEX_BAD_PARAM)
      << "two isolated VLANs";
  EXPECT_EQ(set_map({entry(0, 11, kCommunity)}), QEX_BAD_VLANID);
  EXPECT_EQ(set_map({entry(10, 4095, kCommunity)}), QEX_BAD_VLANID);
  EXPECT_EQ(VSDVS_SetPrivateVLANMap("s", nullptr, 1), QEX_BAD_PARAM);
  auto const good = entry(10, 10, kPromiscuous);
  EXPECT_EQ(VSDVS_SetPrivateVLANMap("s", &good, -1), QEX_BAD_PARAM);
  EXPECT_EQ(VSDVS_SetPrivateVLANMap("s", &good, std::numeric_limits<int>::max()), QEX_BAD_PARAM)
      << "nothing is read";
  EXPECT_EQ(global(VSPROP_PVLAN_MAP), std::nullopt) << "refused calls change nothing";
}

TEST_F(Validation, APrivateVlanOfAPortIsInTheMap) {
  ASSERT_EQ(set_map({entry(10, 10, kPromiscuous), entry(10, 11, kIsolated)}), QEX_OK);
  EXPECT_EQ(set_vlan(11, -1, true), QEX_OK);
  EXPECT_EQ(set_vlan(12, -1, true), QEX_BAD_VLANID);
  EXPECT_EQ(set_vlan(11, -1, true, {{1, 2}}), QEX_BAD_PARAM);
}

// The typed and the raw call refuse the record, each with that status, and neither stores anything.
template <typename Record, typename Set>
void expect_refused(char const *key, Record const &record, Set set, QEX_ReturnStatus status) {
  auto const of_port = std::string_view(key).find(".port.") != std::string_view::npos;
  EXPECT_EQ(set(&record), status) << key;
  EXPECT_EQ(of_port ? Validation::set_port(key, bytes_of(record))
                    : Validation::set_global(key, bytes_of(record)),
            status)
      << key;
  EXPECT_EQ(of_port ? Validation::port(key) : Validation::global(key), std::nullopt) << key;
}

template <typename Change>
void expect_team_refused(Change change, QEX_ReturnStatus status) {
  VSTeamPolicy policy{};
  change(policy);
  expect_refused(
      VSPROP_SWITCH_TEAMING, policy,
      [](VSTeamPolicy const *record) { return VSDVS_SetTeamingPolicy("s", record); }, status);
  expect_refused(
      VSPROP_PORT_TEAMING_POLICY, policy,
      [](VSTeamPolicy const *record) { return VSDVS_SetPortTeamingPolicy("s", "p", record); },
      status);
}

TEST_F(Validation, Teaming) {
  expect_team_refused([](VSTeamPolicy &p) { p.loadBalance = 6; }, QEX_BAD_PARAM);
  expect_team_refused([](VSTeamPolicy &p) { p.linkCriteria = 0x10; }, QEX_BAD_PARAM);
  expect_team_refused([](VSTeamPolicy &p) { p.flags = 0x80; }, QEX_BAD_PARAM);
  expect_team_refused([](VSTeamPolicy &p) { p.percentError = 101; }, QEX_BAD_PARAM);
  expect_team_refused([](VSTeamPolicy &p) { p.numActive = 33; }, QEX_LIMIT_EXCEEDED);
  expect_team_refused(
      [](VSTeamPolicy &p) {
        p.numActive = std::numeric_limits<qex_uint32>::max();
        p.numStandby = 1;
      },
      QEX_LIMIT_EXCEEDED);
  expect_team_refused([](VSTeamPolicy &p) { p.numStandby = 1; }, QEX_BAD_PARAM);  // no name
  expect_team_refused(
      [](VSTeamPolicy &p) {
        p.numActive = 2;
        p.uplinkPortName[0][0] = p.uplinkPortName[1][0] = 'u';
      },
      QEX_BAD_PARAM);
  expect_team_refused(
      [](VSTeamPolicy &p) {
        p.numActive = 1;
        std::memset(p.uplinkPortName[0], 'u', sizeof p.uplinkPortName[0]);
      },
      QEX_NAME_TOO_LONG);
}

TEST_F(Validation, TeamingOverride) {
  EXPECT_EQ(VSDVS_SetPortTeamingOverride("s", "p", std::string(81, 'u').c_str()), QEX_OK);
  EXPECT_EQ(VSDVS_SetPortTeamingOverride("s", "p", std::string(82, 'u').c_str()),
            QEX_NAME_TOO_LONG);
  EXPECT_EQ(set_port(VSPROP_PORT_TEAMING_OVERRIDE, {'u', 0, 'v', 0}), QEX_BAD_PARAM);
}

TEST_F(Validation, MacLearning) {
  VSMACLearning learning{};
  learning.agingTime = VS_MAC_LEARNING_AGING_TIME_MAX + 1;
  auto const set = [](VSMACLearning const *record) { return VSDVS_SetMACLearning("s", record); };
  expect_refused(VSPROP_SWITCH_MAC_LEARNING, learning, set, QEX_BAD_PARAM);
  learning.agingTime = VS_MAC_LEARNING_AGING_TIME_MAX;
  learning.reserved = 1;
  expect_refused(VSPROP_SWITCH_MAC_LEARNING, learning, set, QEX_BAD_PARAM);
  learning.reserved = 0;
  EXPECT_EQ(set(&learning), QEX_OK);
}

TEST_F(Validation, PortMacLearning) {
  VSPMACLearning learning{};
  learning.macLimit = VSPORT_MAC_LEARNING_LIMIT_ENTRIES_MAX + 1;
  EXPECT_EQ(VSDVS_SetPortMACLearning("s", "p", &learning), QEX_LIMIT_EXCEEDED);
  learning.macLimit = VSPORT_MAC_LEARNING_LIMIT_ENTRIES_MAX;
  learning.macLimitPolicy = static_cast<VSPortMACLearningLimitPolicy>(2);
  EXPECT_EQ(VSDVS_SetPortMACLearning("s", "p", &learning), QEX_BAD_PARAM);
  learning.macLimitPolicy = VSPORT_MAC_LEARNING_LIMIT_POLICY_DROP;
  EXPECT_EQ(VSDVS_SetPortMACLearning("s", "p", &learning), QEX_OK);
}

TEST_F(Validation, SecurityAndFilters) {
  expect_refused(
      VSPROP_PORT_SECURITY, VSPropSecurity{.flags = 8},
      [](VSPropSecurity const *record) { return VSDVS_SetPortSecurity("s", "p", record); },
      QEX_BAD_PARAM);
  auto const set = [](VSExtraEthFilter const *record) {
    return VSDVS_SetExtraEthFilter("s", "p", record);
  };
  VSExtraEthFilter filter{};
  filter.flags = 0x40;
  expect_refused(VSPROP_PORT_EXTRA_ETH_FRP, filter, set, QEX_BAD_PARAM);
  filter.flags = 0;
  filter.numMulticastAddrs = 33;
  expect_refused(VSPROP_PORT_EXTRA_ETH_FRP, filter, set, QEX_LIMIT_EXCEEDED);
  filter.numMulticastAddrs = 1;
  filter.multicastAddrs[0][0] = 0x02;
  expect_refused(VSPROP_PORT_EXTRA_ETH_FRP, filter, set, QEX_BAD_PARAM);
  EXPECT_EQ(VSDVS_SetMcastFilterMode("s", static_cast<VSMcastFilterMode>(4)), QEX_BAD_PARAM);
  EXPECT_EQ(VSDVS_SetMcastFilterMode("s", static_cast<VSMcastFilterMode>(-1)), QEX_BAD_PARAM);
}

// A table of one session and two entities, for a test to spoil.
struct MirrorTable {
  DVMirrorSessionTable header;
  DVMirrorSession session;
  std::array<DVMirrorEntity, 2> entities;
};

MirrorTable good_table(char const *sid = "a") {
  MirrorTable table{};
  table.header.magicNum = VS_DVMIRROR_MAGIC_NUM;
  table.header.version = VS_DVMIRROR_VERSION_V1;
  table.header.numSessions = 1;
  table.header.numEntities = 2;
  std::strncpy(table.session.sid, sid, sizeof table.session.sid - 1);
  table.session.numDstEntities = 1;
  table.session.numSrcInEntities = 1;
  table.entities[0].type = MIRROR_ENTTYPE_DVPORT;
  table.entities[1].type = MIRROR_ENTTYPE_PORT;
  table.entities[1].portId = 9;
  return table;
}

QEX_ReturnStatus append(MirrorTable table) {
  return VSDVS_AppendDVMirrorSessions("s", "p", &table.header);
}

template <typename Change>
void expect_table_refused(Change change, QEX_ReturnStatus status) {
  auto table = good_table();
  change(table);
  EXPECT_EQ(append(table), status);
  EXPECT_EQ(Validation::set_port(VSPROP_PORT_MIRROR_SESSIONS, bytes_of(table)), status);
  EXPECT_EQ(Validation::port(VSPROP_PORT_MIRROR_SESSIONS), std::nullopt);
}

TEST_F(Validation, MirrorSessionTables) {
  static_assert(sizeof(MirrorTable) == 20 + 232 + (2 * 52));
  auto const number = [](auto value) { return static_cast<qex_uint32>(value); };
  expect_table_refused([](MirrorTable &t) { t.header.magicNum = 1; }, QEX_BAD_PARAM);
  expect_table_refused([](MirrorTable &t) { t.header.version = static_cast<DVMirrorVersion>(0); },
                       QEX_VERSION_MISMATCH_MAJOR);
  expect_table_refused([](MirrorTable &t) { t.header.version = VS_DVMIRROR_VERSION_UNSUPPORTED; },
                       QEX_VERSION_MISMATCH_MAJOR);
  expect_table_refused([&](MirrorTable &t) { t.header.numSessions = number(-1); },
                       QEX_LIMIT_EXCEEDED);
  expect_table_refused([&](MirrorTable &t) { t.header.numEntities = number(-1); },
                       QEX_LIMIT_EXCEEDED);
  expect_table_refused([](MirrorTable &t) { t.session.startIdx = 1; }, QEX_BAD_PARAM);
  expect_table_refused([&](MirrorTable &t) { t.session.startIdx = number(-1); }, QEX_BAD_PARAM);
  expect_table_refused([&](MirrorTable &t) { t.session.numSrcOutEntities = number(-1); },
                       QEX_BAD_PARAM);
  expect_table_refused([](MirrorTable &t) { t.session.sid[0] = '\0'; }, QEX_BAD_PARAM);
  expect_table_refused(
      [](MirrorTable &t) { std::memset(t.session.sid, 'x', sizeof t.session.sid); },
      QEX_NAME_TOO_LONG);
  expect_table_refused(
      [](MirrorTable &t) { std::memset(t.session.dname, 'x', sizeof t.session.dname); },
      QEX_NAME_TOO_LONG);
  expect_table_refused([](MirrorTable &t) { t.session.type = static_cast<DVMirrorSessionType>(5); },
                       QEX_BAD_PARAM);
  expect_table_refused([](MirrorTable &t) { t.session.flags = 128; }, QEX_BAD_PARAM);
  expect_table_refused([](MirrorTable &t) { t.session.wildIn = 32; }, QEX_BAD_PARAM);
  expect_table_refused([](MirrorTable &t) { t.session.encapVlan = 4095; }, QEX_BAD_VLANID);
  expect_table_refused(
      [](MirrorTable &t) { t.session.uplinkFilter = MIRROR_UPLINK_FILTER_TYPE_MAX; },
      QEX_BAD_PARAM);
  expect_table_refused([](MirrorTable &t) { t.session.encapType = DVMIRROR_ENCAP_TYPE_MAX; },
                       QEX_BAD_PARAM);
  expect_table_refused(
      [](MirrorTable &t) { t.entities[1].type = static_cast<DVMirrorEntityType>(7); },
      QEX_BAD_PARAM);
  expect_table_refused(
      [](MirrorTable &t) {
        t.entities[1].type = MIRROR_ENTTYPE_VLAN;
        t.entities[1].vlan = 4095;
      },
      QEX_BAD_VLANID);
  EXPECT_EQ(append(good_table()), QEX_OK);
}

TEST_F(Validation, MirrorSessionsByTheirIdentifiers) {
  ASSERT_EQ(append(good_table("a")), QEX_OK);
  EXPECT_EQ(append(good_table("a")), QEX_EXISTS);
  ASSERT_EQ(append(good_table("b")), QEX_OK);
  EXPECT_EQ(VSDVS_RemoveDVMirrorSession("s", "p", "c"), QEX_NOT_FOUND);
  EXPECT_EQ(VSDVS_RemoveDVMirrorSession("s", "p", "a"), QEX_OK);
  DVMirrorSessionTable *table = nullptr;
  ASSERT_EQ(VSDVS_GetDVMirrorSessions("s", "p", &table), QEX_OK);
  ASSERT_EQ(table->numSessions, 1U);
  EXPECT_EQ(table->numEntities, 2U);
  EXPECT_STREQ(table->sessions[0].sid, "b");
  EXPECT_EQ(table->sessions[0].startIdx, 0U);
  VSDVS_FreeMemory(table);
  EXPECT_EQ(VSDVS_RemoveDVMirrorSession("s", "p", "b"), QEX_OK);
  EXPECT_EQ(port(VSPROP_PORT_MIRROR_SESSIONS), std::nullopt);
}

TEST_F(Validation, SessionsKeepTheirOwnEntities) {
  ASSERT_EQ(append(good_table("a")), QEX_OK);
  auto second = good_table("b");
  second.entities[1].portId = 10;
  ASSERT_EQ(append(second), QEX_OK);
  DVMirrorSessionTable *table = nullptr;
  ASSERT_EQ(VSDVS_GetDVMirrorSessions("s", "p", &table), QEX_OK);
  ASSERT_EQ(table->numSessions, 2U);
  ASSERT_EQ(table->numEntities, 4U);
  auto const *const entities = reinterpret_cast<DVMirrorEntity const *>(&table->sessions[2]);
  EXPECT_EQ(entities[table->sessions[0].startIdx + 1].portId, 9U);
  EXPECT_EQ(entities[table->sessions[1].startIdx + 1].portId, 10U);
  VSDVS_FreeMemory(table);
}

TEST_F(Validation, RawPropertyCalls) {
  EXPECT_EQ(set_global("", {1}), QEX_BAD_PARAM);
  EXPECT_EQ(set_global(std::string(256, 'k').c_str(), {1}), QEX_NAME_TOO_LONG);
  EXPECT_EQ(set_global("com.example.note", {1}, 0), QEX_BAD_PARAM);
  EXPECT_EQ(set_global("com.example.note", {1}, ALL_PROP_TYPE), QEX_BAD_PARAM);
  EXPECT_EQ(set_host(VSPROP_MTU, bytes_of(9000)), QEX_BAD_PARAM) << "a key of the whole switch";
  EXPECT_EQ(set_port(VSPROP_MTU, bytes_of(9000)), QEX_BAD_PARAM);
  EXPECT_EQ(DVSQEX_GlobalPropSet("s-id", "com.example.note", nullptr, 1, CONFIG_PROP_TYPE),
            QEX_BAD_PARAM);
  Bytes byte{1};
  EXPECT_EQ(DVSQEX_GlobalPropSet("s-id", "com.example.note", byte.data(), -1, CONFIG_PROP_TYPE),
            QEX_BAD_PARAM);
  EXPECT_EQ(DVSQEX_GlobalPropSet("s", "com.example.note", byte.data(), 1, CONFIG_PROP_TYPE),
            QEX_NOT_FOUND)
      << "the alias is no identifier";
  EXPECT_EQ(DVSQEX_GlobalPropSet("s-id", "com.example.note", nullptr, 0, CONFIG_PROP_TYPE), QEX_OK);
  EXPECT_EQ(global("com.example.note"), Bytes());
  void *data = &byte;
  int length = 5;
  EXPECT_EQ(DVSQEX_GlobalPropGet("s-id", "com.example.none", &data, &length), QEX_NOT_FOUND);
  EXPECT_EQ(data, &byte);
  EXPECT_EQ(length, 5);
  EXPECT_EQ(DVSQEX_GlobalPropGet("s-id", nullptr, &data, &length), QEX_BAD_PARAM);
  EXPECT_EQ(DVSQEX_GlobalPropGet("s-id", VSPROP_MTU, nullptr, &length), QEX_BAD_PARAM);
  EXPECT_EQ(DVSQEX_GlobalPropGet("s-id", VSPROP_MTU, &data, nullptr), QEX_BAD_PARAM);
}

}  // namespace
