// The queries through the library, on hosts that scenario documents describe.
#include "vswitch/queries.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <cstddef>
#include <cstring>
#include <vector>

#include "queried_host.h"

namespace {

VSMACEntry entry(unsigned char last, VSMACAddrType type = VS_MAC_ADDR_TYPE_USER) {
  VSMACEntry made{};
  made.macAddress[0] = 2;
  made.macAddress[5] = last;
  made.macAddrType = type;
  return made;
}

// What trails a record; its arrays are declared without room.
template <typename Entry, typename Record>
Entry const *trailing(Record const *record) {
  return reinterpret_cast<Entry const *>(reinterpret_cast<std::byte const *>(record) +
                                         sizeof *record);
}

std::vector<int> lasts(VSMACTable *table) {
  std::vector<int> all;
  for (qex_uint32 at = 0; at < table->numEntries; ++at) {
    all.push_back(trailing<VSMACEntry>(table)[at].macAddress[5]);
  }
  EXPECT_EQ(table->totalEntries, table->numEntries);
  VSQEX_FreeMemory(table);
  return all;
}

TEST_F(Queries, MacTablesOfPortsAndOfTheTeam) {
  auto const mine = entry(1);
  ASSERT_EQ(VSQEX_SetPortMACTable("s", "p1", &mine), QEX_OK);
  ASSERT_EQ(simhost_learn("s", "p1", "02:00:00:00:00:02", 0, 0), QEX_OK);
  ASSERT_EQ(simhost_learn("s", nullptr, "02:00:00:00:00:03", 0, 0), QEX_OK);
  VSMACTable *table = nullptr;
  ASSERT_EQ(VSQEX_GetPortMACTable("s", "p1", VS_MAC_ADDR_TYPE_ALL, &table), QEX_OK);
  EXPECT_THAT(lasts(table), testing::ElementsAre(1, 2));
  ASSERT_EQ(VSQEX_GetPortMACTable("s", "p1", VS_MAC_ADDR_TYPE_LEARNED, &table), QEX_OK);
  EXPECT_THAT(lasts(table), testing::ElementsAre(2));
  ASSERT_EQ(VSQEX_GetTeamMACTable("s", VS_MAC_ADDR_TYPE_ALL, &table), QEX_OK);
  EXPECT_THAT(lasts(table), testing::ElementsAre(3));
  ASSERT_EQ(VSQEX_ClearPortMACTable("s", "p1", &mine), QEX_OK);
  EXPECT_EQ(VSQEX_ClearPortMACTable("s", "p1", &mine), QEX_NOT_FOUND);
  ASSERT_EQ(VSQEX_GetPortMACTable("s", "p1", VS_MAC_ADDR_TYPE_USER, &table), QEX_OK);
  EXPECT_THAT(lasts(table), testing::IsEmpty());
}

TEST_F(Queries, LearnedAddressesAgeOnTheHostsClock) {
  ASSERT_EQ(simhost_learn("s", "p1", "02:00:00:00:00:02", 0, 0), QEX_OK);
  VSMACLearningGlobalProps props{.agingTime = 60, .macLimit = 10, .learnStatic = 0};
  ASSERT_EQ(VSQEX_SetGlobalMACLearningProps(&props), QEX_OK);
  props = {};
  ASSERT_EQ(VSQEX_GetGlobalMACLearningProps(&props), QEX_OK);
  EXPECT_EQ(qex_uint32{props.agingTime}, 60U);
  ASSERT_EQ(simhost_clock_step(59999), QEX_OK);
  VSMACTable *table = nullptr;
  ASSERT_EQ(VSQEX_GetPortMACTable("s", "p1", VS_MAC_ADDR_TYPE_ALL, &table), QEX_OK);
  EXPECT_EQ(qex_uint32{trailing<VSMACEntry>(table)->elapsed}, 59U);
  EXPECT_THAT(lasts(table), testing::ElementsAre(2));
  ASSERT_EQ(simhost_clock_step(1), QEX_OK);
  ASSERT_EQ(VSQEX_GetPortMACTable("s", "p1", VS_MAC_ADDR_TYPE_ALL, &table), QEX_OK);
  EXPECT_THAT(lasts(table), testing::IsEmpty());
}

TEST_F(Queries, LearningIsCounted) {
  apply(R"({"switches": [{"alias": "s", "ports": [
            {"id": "p1", "mac_learning": {"learning": true, "limit": 1, "limit_policy": "drop"},
             "counters": {"noLearningAllowedPkts": 18446744073709551615}}]}]})");
  EXPECT_EQ(simhost_learn("s", "p1", "02:00:00:00:00:01", 0, 0), QEX_OK);
  EXPECT_EQ(simhost_learn("s", "p1", "02:00:00:00:00:02", 0, 0), QEX_LIMIT_EXCEEDED);
  EXPECT_EQ(simhost_learn("s", "p2", "02:00:00:00:00:03", 0, 0), QEX_IS_DISABLED);
  VSPMACLearningStats stats{};
  ASSERT_EQ(VSQEX_GetPortMACLearningStats("s", "p1", &stats), QEX_OK);
  EXPECT_EQ(qex_uint32{stats.numMACsLearned}, 1U);
  EXPECT_EQ(qex_uint64{stats.noLearningDroppedPkts}, 1U);
  EXPECT_EQ(qex_uint64{stats.noLearningAllowedPkts}, 18446744073709551615U);
}

TEST_F(Queries, LinksAndWhoSwitchesThem) {
  int state = -1;
  ASSERT_EQ(VSQEX_GetUplinkLinkState("s", "nic0", &state), QEX_OK);
  EXPECT_EQ(state, QEX_LINK_STATE_UP);
  ASSERT_EQ(VSQEX_SetUplinkAdminLinkState("s", "nic0", QEX_LINK_STATE_DOWN), QEX_OK);
  ASSERT_EQ(VSQEX_GetUplinkLinkState("s", "nic0", &state), QEX_OK);
  EXPECT_EQ(state, QEX_LINK_STATE_DOWN);
  ASSERT_EQ(VSQEX_SetUplinkAdminLinkState("s", "nic0", QEX_LINK_STATE_UP), QEX_OK);
  ASSERT_EQ(simhost_set_link("nic0", 0), QEX_OK);
  ASSERT_EQ(VSQEX_GetUplinkLinkState("s", "nic0", &state), QEX_OK);
  EXPECT_EQ(state, QEX_LINK_STATE_DOWN) << "the admin switch plugs no cable in";
  EXPECT_EQ(VSQEX_GetUplinkLinkState("s", "nic2", &state), QEX_NOT_FOUND) << "not at this switch";
  EXPECT_EQ(VSQEX_SetUplinkAdminLinkState("s", "nic0", static_cast<qex_LinkState>(2)),
            QEX_BAD_PARAM);
}

TEST_F(Queries, ASwitchThatDoesNotRunLearnsNothing) {
  apply(R"({"switches": [{"alias": "s", "running": false}]})");
  EXPECT_EQ(simhost_learn("s", nullptr, "02:00:00:00:00:03", 0, 0), QEX_NOT_FOUND);
  EXPECT_STREQ(simhost_error(), "the switch 's' does not run (QEX_NOT_FOUND)");
  apply(R"({"switches": [{"alias": "s", "running": true}]})");
  EXPECT_EQ(simhost_learn("s", nullptr, "02:00:00:00:00:03", 0, 0), QEX_OK);
}

TEST_F(Queries, ThePortOfAnUplink) {
  std::array<char, 49> buffer{};
  ASSERT_EQ(VSQEX_GetUplinkDVPortID("nic1", buffer.data()), QEX_OK);
  EXPECT_STREQ(buffer.data(), "uplink2");
  EXPECT_EQ(VSQEX_GetUplinkDVPortID("nic2", buffer.data()), QEX_IS_DISCONNECTED);
  EXPECT_EQ(VSQEX_GetUplinkDVPortID("nic7", buffer.data()), QEX_NOT_FOUND);
}

TEST_F(Queries, TheHintFollowsTheLinks) {
  qex_Name hint{};
  ASSERT_EQ(VSQEX_PortGetTeamUplinkHint(number("p1"), &hint), QEX_OK);
  EXPECT_STREQ(hint.string, "nic0");
  ASSERT_EQ(simhost_set_link("nic0", 0), QEX_OK);
  ASSERT_EQ(VSQEX_PortGetTeamUplinkHint(number("p1"), &hint), QEX_OK);
  EXPECT_STREQ(hint.string, "nic1");
  ASSERT_EQ(simhost_set_link("nic1", 0), QEX_OK);
  EXPECT_EQ(VSQEX_PortGetTeamUplinkHint(number("p1"), &hint), QEX_ENETDOWN);
  EXPECT_EQ(VSQEX_PortGetTeamUplinkHint(0xFFFFFF, &hint), QEX_NOT_FOUND);
}

TEST_F(Queries, GroupsOfLinksFollowTheirTable) {
  apply(R"({"switches": [{"alias": "s", "lags": [
            {"name": "lag-a", "uplinks": ["nic0", "nic1"]}, {"name": "lag-b", "uplinks": []}]}]})");
  ASSERT_EQ(simhost_set_link("nic0", 0), QEX_OK);
  VSLAGTable *table = nullptr;
  ASSERT_EQ(VSQEX_GetLAGTable("s", &table), QEX_OK);
  ASSERT_EQ(table->numLAGs, 2U);
  auto const *const first = reinterpret_cast<VSLAGStatus const *>(table + 1);
  EXPECT_EQ(first->state, QEX_LINK_STATE_UP);
  EXPECT_STREQ(reinterpret_cast<char const *>(first->name), "lag-a");
  EXPECT_EQ(qex_uint64{first->uplinkLinkupBitmap}, 2U) << "only the second is up";
  ASSERT_EQ(qex_uint32{first->numUplinks}, 2U);
  EXPECT_STREQ(first->uplinkNames[0].string, "nic0");
  EXPECT_STREQ(first->uplinkNames[1].string, "nic1");
  auto const *const second = reinterpret_cast<VSLAGStatus const *>(&first->uplinkNames[2]);
  EXPECT_STREQ(reinterpret_cast<char const *>(second->name), "lag-b");
  EXPECT_EQ(second->state, QEX_LINK_STATE_DOWN);
  EXPECT_EQ(qex_uint32{second->numUplinks}, 0U);
  EXPECT_NE(qex_uint32{first->id}, qex_uint32{second->id});
  VSQEX_FreeMemory(table);
  int state = -1;
  ASSERT_EQ(VSQEX_GetUplinkLACPLinkState("s", "nic1", &state), QEX_OK);
  EXPECT_EQ(state, QEX_LINK_STATE_UP);
  apply(R"({"uplinks": [{"name": "nic1", "lacp": "down"}]})");
  ASSERT_EQ(VSQEX_GetUplinkLACPLinkState("s", "nic1", &state), QEX_OK);
  EXPECT_EQ(state, QEX_LINK_STATE_DOWN);
}

TEST_F(Queries, MulticastFiltersInTheFormOfEachMode) {
  apply(R"({"switches": [{"alias": "s", "multicast": "igmp", "ports": [{"id": "p1", "groups": [
            {"address": "239.1.1.1", "version": 3, "source_mode": "exclude",
             "sources": ["10.0.0.1", "10.0.0.2"], "vni": 77},
            {"address": "ff02::9", "version": 2},
            {"address": "01:00:5e:01:01:01"}, {"address": "01:00:5e:01:01:02"}]}]}]})");
  int mode = -1;
  ASSERT_EQ(VSQEX_GetMcastFilterMode("s", &mode), QEX_OK);
  EXPECT_EQ(mode, VS_MCAST_FILTER_MODE_IGMP);
  ASSERT_EQ(VSQEX_GetMcastFilterMode("other", &mode), QEX_OK);
  EXPECT_EQ(mode, VS_MCAST_FILTER_MODE_LEGACY);

  VSMcastFilters *filters = nullptr;
  ASSERT_EQ(VSQEX_GetMcastFilters("s", number("p1"), VS_MCAST_FILTER_MODE_LEGACY, &filters),
            QEX_OK);
  ASSERT_EQ(qex_uint32{filters->numEntries}, 2U);
  EXPECT_EQ(trailing<qex_EthAddress>(filters)[1][5], 2);
  VSQEX_FreeMemory(filters);
  ASSERT_EQ(VSQEX_GetMcastFilters("s", number("p1"), VS_MCAST_FILTER_MODE_IGMP, &filters), QEX_OK);
  ASSERT_EQ(qex_uint32{filters->totalEntries}, 1U);
  std::array<unsigned char, 4> const ipv4{239, 1, 1, 1};
  EXPECT_EQ(std::memcmp(trailing<qex_IPv4Address>(filters), ipv4.data(), 4), 0);
  VSQEX_FreeMemory(filters);
  ASSERT_EQ(VSQEX_GetMcastFilters("s", number("p1"), VS_MCAST_FILTER_MODE_MLD, &filters), QEX_OK);
  ASSERT_EQ(qex_uint32{filters->numEntries}, 1U);
  EXPECT_EQ(trailing<qex_IPv6Address>(filters)[0][15], 9);
  VSQEX_FreeMemory(filters);
  EXPECT_EQ(VSQEX_GetMcastFilters("s", number("p1"), VS_MCAST_FILTER_MODE_SNOOPING, &filters),
            QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetMcastFilters("other", number("p1"), VS_MCAST_FILTER_MODE_IGMP, &filters),
            QEX_NOT_FOUND)
      << "a port of another switch";

  VSMcastFilterStats *stats = nullptr;
  ASSERT_EQ(
      VSQEX_GetMcastFilterStats("s", number("p1"), VS_MCAST_FILTER_MODE_IGMP, ipv4.data(), &stats),
      QEX_OK);
  EXPECT_EQ(qex_uint32{stats->version}, 3U);
  EXPECT_EQ(qex_uint32{stats->srcIPFilterMode}, qex_uint32{VS_MCAST_SRC_IP_FILTER_MODE_EXCLUDE});
  EXPECT_EQ(qex_uint64{stats->updateTime}, 5000U);
  EXPECT_EQ(qex_uint32{stats->vni}, 77U);
  ASSERT_EQ(qex_uint32{stats->numEntries}, 2U);
  std::array<unsigned char, 8> const sources{10, 0, 0, 1, 10, 0, 0, 2};
  EXPECT_EQ(std::memcmp(trailing<qex_IPv4Address>(stats), sources.data(), sources.size()), 0);
  VSQEX_FreeMemory(stats);
  std::array<unsigned char, 6> const mac{1, 0, 0x5E, 1, 1, 1};
  ASSERT_EQ(
      VSQEX_GetMcastFilterStats("s", number("p1"), VS_MCAST_FILTER_MODE_LEGACY, mac.data(), &stats),
      QEX_OK);
  EXPECT_EQ(qex_uint32{stats->numEntries}, 0U);
  VSQEX_FreeMemory(stats);
  EXPECT_EQ(
      VSQEX_GetMcastFilterStats("s", number("p2"), VS_MCAST_FILTER_MODE_IGMP, ipv4.data(), &stats),
      QEX_NOT_FOUND);
  EXPECT_EQ(
      VSQEX_GetMcastFilterStats("s", number("p1"), VS_MCAST_FILTER_MODE_IGMP, nullptr, &stats),
      QEX_BAD_PARAM);
}

TEST_F(Queries, MirrorSessionsAsTheyRun) {
  apply(R"({"switches": [{"alias": "s",
     "mirror_counters": {"audit": {"mirroredPkts": 7, "failedPkts": 1}},
     "ports": [
       {"id": "p1", "mirror_sessions": [
          {"sid": "audit", "name": "the audit", "to": [{"port": "p2"}]},
          {"sid": "off", "disabled": true}]},
       {"id": "p2", "mirror_sessions": [{"sid": "more"}]}]}]})");
  VSDVMirrorSessionIDs *ids = nullptr;
  ASSERT_EQ(VSQEX_GetDVMirrorSessionIDs("s", &ids), QEX_OK);
  ASSERT_EQ(qex_uint32{ids->numEntries}, 2U);
  EXPECT_STREQ(trailing<DVMirrorSID>(ids)[0], "audit");
  EXPECT_STREQ(trailing<DVMirrorSID>(ids)[1], "more");
  VSQEX_FreeMemory(ids);
  VSDVMirrorSessionStats stats{};
  ASSERT_EQ(VSQEX_GetDVMirrorSessionStats("s", "audit", &stats), QEX_OK);
  EXPECT_EQ(qex_uint64{stats.mirroredPkts}, 7U);
  EXPECT_EQ(qex_uint64{stats.failedPkts}, 1U);
  EXPECT_EQ(qex_uint64{stats.discardedPkts}, 0U);
  EXPECT_STREQ(stats.name, "the audit");
  EXPECT_EQ(VSQEX_GetDVMirrorSessionStats("s", "off", &stats), QEX_IS_DISABLED);
  apply(R"({"switches": [{"alias": "s", "ports": [
     {"id": "p2", "mirror_sessions": [{"sid": "off", "name": "on at this port"}]}]}]})");
  EXPECT_EQ(VSQEX_GetDVMirrorSessionStats("s", "off", &stats), QEX_OK);
  EXPECT_STREQ(stats.name, "on at this port");
  EXPECT_EQ(VSQEX_GetDVMirrorSessionStats("s", "none", &stats), QEX_NOT_FOUND);
  apply(R"({"runtime_options": {"AllowMirrorStats": 0}})");
  EXPECT_EQ(VSQEX_GetDVMirrorSessionStats("s", "audit", &stats), QEX_IS_DISABLED);
}

TEST_F(Queries, PortsThatSeeFramesInPromiscuousMode) {
  apply(R"({"switches": [{"alias": "s", "ports": [
     {"id": "p1", "mirror_sessions": [
        {"sid": "a", "promiscuous": true, "to": [{"port": "p2"}, {"port": "gone"}]},
        {"sid": "b", "to": [{"port": "p3"}]}]},
     {"id": "p2"},
     {"id": "p3", "mirror_sessions": [{"sid": "legacy_promiscuous"}]},
     {"id": "p4", "mirror_sessions": [{"sid": "c", "promiscuous": true, "disabled": true}]}]}]})");
  VSPromiscSessionActiveDsts *ports = nullptr;
  ASSERT_EQ(VSQEX_GetPromiscSessionActiveDsts("s", &ports), QEX_OK);
  ASSERT_EQ(qex_uint32{ports->numEntries}, 2U);
  EXPECT_EQ(trailing<qex_SwitchPortID>(ports)[0], number("p2"));
  EXPECT_EQ(trailing<qex_SwitchPortID>(ports)[1], number("p3"));
  VSQEX_FreeMemory(ports);
  VSPropSecurity const security{.flags = VSPORT_SECURITY_DISALLOW_PROMISC};
  ASSERT_EQ(VSDVS_SetPortSecurity("s", "p2", &security), QEX_OK);
  ASSERT_EQ(VSQEX_GetPromiscSessionActiveDsts("s", &ports), QEX_OK);
  EXPECT_EQ(qex_uint32{ports->numEntries}, 1U);
  VSQEX_FreeMemory(ports);
}

TEST_F(Queries, CountersOfTheTeam) {
  ASSERT_EQ(simhost_set_counter("s", nullptr, nullptr, "rxRpfOverride", 11), QEX_OK);
  ASSERT_EQ(simhost_set_counter("s", nullptr, nullptr, "maxRARPTime", 0xFFFFFFFF), QEX_OK);
  EXPECT_EQ(simhost_set_counter("s", nullptr, nullptr, "maxRARPTime", 0x100000000), QEX_BAD_PARAM);
  EXPECT_EQ(simhost_set_counter("s", nullptr, nullptr, "noSuch", 1), QEX_NOT_FOUND);
  EXPECT_EQ(simhost_set_counter("s", "p1", nullptr, "rxRpfOverride", 1), QEX_NOT_FOUND);
  VSServicePortTeamingStats service{};
  ASSERT_EQ(VSQEX_GetServicePortTeamingStats("s", &service), QEX_OK);
  EXPECT_EQ(service.rxRpfOverride, 11U);
  EXPECT_EQ(service.txErrors, 0U);
  VSRARPStats rarp{};
  ASSERT_EQ(VSQEX_GetRARPStats("s", &rarp), QEX_OK);
  EXPECT_EQ(rarp.maxRARPTime, 0xFFFFFFFFU);
  EXPECT_EQ(rarp.rarpPktsSent, 0U);
}

TEST_F(Queries, NullWhereSomethingIsRequired) {
  int state = 0;
  auto const one = entry(1);
  VSMACTable *macs = nullptr;
  EXPECT_EQ(VSQEX_GetTeamMACTable(nullptr, VS_MAC_ADDR_TYPE_ALL, &macs), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetTeamMACTable("s", VS_MAC_ADDR_TYPE_ALL, nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetTeamMACTable("s", static_cast<VSMACAddrType>(4), &macs), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetPortMACTable("s", nullptr, VS_MAC_ADDR_TYPE_ALL, &macs), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetPortMACTable("s", "p1", VS_MAC_ADDR_TYPE_ALL, nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_SetPortMACTable(nullptr, "p1", &one), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_SetPortMACTable("s", nullptr, &one), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_SetPortMACTable("s", "p1", nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_ClearPortMACTable("s", "p1", nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetPortMACLearningStats("s", "p1", nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetLAGTable("s", nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_SetUplinkAdminLinkState("s", nullptr, QEX_LINK_STATE_UP), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetUplinkLinkState("s", nullptr, &state), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetUplinkLinkState("s", "nic0", nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetUplinkLACPLinkState("s", "nic0", nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetUplinkDVPortID(nullptr, nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetUplinkDVPortID("nic0", nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetMcastFilters("s", number("p1"), VS_MCAST_FILTER_MODE_IGMP, nullptr),
            QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetMcastFilterMode("s", nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetDVMirrorSessionIDs("s", nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetDVMirrorSessionStats("s", nullptr, nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetPromiscSessionActiveDsts("s", nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetServicePortTeamingStats("s", nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetRARPStats("s", nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetRuntimeOptions(nullptr, 0, nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_SetRuntimeOptions(nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_GetGlobalMACLearningProps(nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_SetGlobalMACLearningProps(nullptr), QEX_BAD_PARAM);
  EXPECT_EQ(VSQEX_PortGetTeamUplinkHint(number("p1"), nullptr), QEX_BAD_PARAM);
}

TEST_F(Queries, ARestartTakesWhatWasLearnedAndCounted) {
  apply(R"({"runtime_options": {"IGMPQueries": 7}, "mac_learning": {"aging_time": 9},
            "switches": [{"alias": "brief", "persistent": false},
             {"alias": "s", "counters": {"txErrors": 4}, "ports": [{"id": "p1",
               "addresses": [{"mac": "02:00:00:00:00:01", "type": "static"},
                             {"mac": "02:00:00:00:00:02"}],
               "groups": [{"address": "239.1.1.1"}]}]}]})");
  ASSERT_EQ(simhost_set_link("nic0", 0), QEX_OK);
  ASSERT_EQ(simhost_restart(), QEX_OK);
  VSMACTable *table = nullptr;
  ASSERT_EQ(VSQEX_GetPortMACTable("s", "p1", VS_MAC_ADDR_TYPE_ALL, &table), QEX_OK);
  EXPECT_THAT(lasts(table), testing::ElementsAre(1));
  VSMcastFilters *filters = nullptr;
  ASSERT_EQ(VSQEX_GetMcastFilters("s", number("p1"), VS_MCAST_FILTER_MODE_IGMP, &filters), QEX_OK);
  EXPECT_EQ(qex_uint32{filters->numEntries}, 0U);
  VSQEX_FreeMemory(filters);
  VSServicePortTeamingStats service{};
  ASSERT_EQ(VSQEX_GetServicePortTeamingStats("s", &service), QEX_OK);
  EXPECT_EQ(service.txErrors, 0U);
  VSInfo info{};
  EXPECT_EQ(VSQEX_GetVSInfo("brief", &info), QEX_NOT_FOUND);
  EXPECT_EQ(VSQEX_GetVSInfo("s", &info), QEX_OK);
  VSMACLearningGlobalProps props{};
  ASSERT_EQ(VSQEX_GetGlobalMACLearningProps(&props), QEX_OK);
  EXPECT_EQ(qex_uint32{props.agingTime}, 300U);
  int state = -1;
  ASSERT_EQ(VSQEX_GetUplinkLinkState("s", "nic0", &state), QEX_OK);
  EXPECT_EQ(state, QEX_LINK_STATE_DOWN) << "no restart plugs a cable in";
}

}  // namespace
