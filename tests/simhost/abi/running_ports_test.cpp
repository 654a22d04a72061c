// The runtime state of a port by the raw calls: the plane's values and nothing that was stored.
#include <gmock/gmock.h>

#include <string>

#include "configured_switch.h"
#include "nebpublic/data.h"
#include "qexapi/links.h"
#include "qexapi/switch_ports.h"
#include "qexapi/switch_properties.h"
#include "vswitch/mac_tables.h"
#include "vswitch/port_mac_policies.h"
#include "vswitch/properties.h"
#include "vswitch/queries.h"

namespace {

struct RunningPorts : ConfiguredSwitch {
  ~RunningPorts() override { EXPECT_EQ(simhost_reset(), QEX_OK); }

  static qex_uint32 link(char const *name) {
    return as<qex_uint32>(port(QEX_NEBPROP_PORT_LINK_STATUS, name).value());
  }
  static qex_uint64 flags(char const *name) {
    return as<qex_NEBPortStatus>(port(QEX_NEBPROP_PORT_STATUS, name).value()).flags;
  }
  static std::string uplink_at(char const *name) {
    int number = 0;
    EXPECT_EQ(VSDVS_DvPortIDToPortID("s", name, &number), QEX_OK);
    VSUplinks *uplinks = nullptr;
    EXPECT_EQ(VSQEX_GetUplinks("s", &uplinks), QEX_OK);
    std::string found;
    for (qex_uint32 at = 0; at < uplinks->numEntries; ++at) {
      auto const &entry = uplinks->entries[at];
      if (entry.portID == static_cast<qex_uint32>(number)) {
        found = entry.name.string;
      }
    }
    VSQEX_FreeMemory(uplinks);
    return found;
  }
};

constexpr qex_uint32 kUp = QEX_LINK_STATE_UP;
constexpr qex_uint32 kDown = QEX_LINK_STATE_DOWN;

TEST_F(RunningPorts, TheStatusFollowsWhatIsAttached) {
  EXPECT_EQ(flags("p"), 0U);
  EXPECT_EQ(flags("uplink1"), QEX_NEBPORT_STATUS_INUSE | QEX_NEBPORT_STATUS_LINKUP);
  ASSERT_EQ(set_port(QEX_NEBPROP_PORT_VNIC_CONNECTEE, bytes_of_text("vm")), QEX_OK);
  EXPECT_EQ(flags("p"), QEX_NEBPORT_STATUS_INUSE | QEX_NEBPORT_STATUS_LINKUP);
  ASSERT_EQ(set_port(QEX_NEBPROP_PORT_BLOCK, {1}), QEX_OK);
  ASSERT_EQ(set_port(QEX_NEBPROP_PORT_LINK_STATUS, bytes_of(kDown)), QEX_OK);
  EXPECT_EQ(flags("p"), QEX_NEBPORT_STATUS_INUSE | QEX_NEBPORT_STATUS_BLOCKED);
  ASSERT_EQ(set_port(QEX_NEBPROP_PORT_ALIAS, bytes_of_text("desk")), QEX_OK);
  auto const status = as<qex_NEBPortStatus>(port(QEX_NEBPROP_PORT_STATUS).value());
  EXPECT_STREQ(status.displayStr, "desk");
  int number = 0;
  ASSERT_EQ(VSDVS_DvPortIDToPortID("s", "p", &number), QEX_OK);
  EXPECT_EQ(status.portID, static_cast<qex_uint32>(number));
  EXPECT_EQ(set_port(QEX_NEBPROP_PORT_STATUS, bytes_of(status)), QEX_READ_ONLY);
}

TEST_F(RunningPorts, TheLinkOfAnUplinkPortIsItsUplinks) {
  auto const uplink = uplink_at("uplink1");
  EXPECT_EQ(link("uplink1"), kUp);
  ASSERT_EQ(simhost_set_link(uplink.c_str(), 0), QEX_OK);
  EXPECT_EQ(link("uplink1"), kDown);
  EXPECT_EQ(flags("uplink1"), qex_uint64{QEX_NEBPORT_STATUS_INUSE});
  EXPECT_EQ(link("uplink2"), kUp);
  ASSERT_EQ(simhost_set_link(uplink.c_str(), 1), QEX_OK);
  ASSERT_EQ(VSQEX_SetUplinkAdminLinkState("s", uplink.c_str(), QEX_LINK_STATE_DOWN), QEX_OK);
  EXPECT_EQ(link("uplink1"), kDown);
  EXPECT_EQ(set_port(QEX_NEBPROP_PORT_LINK_STATUS, bytes_of(kUp), "uplink1"), QEX_READ_ONLY);
}

TEST_F(RunningPorts, TheLinkOfAnotherPortNeedsAClientThatIsUp) {
  EXPECT_EQ(link("p"), kDown);
  ASSERT_EQ(set_port(QEX_NEBPROP_PORT_LINK_STATUS, bytes_of(kUp)), QEX_OK);
  EXPECT_EQ(link("p"), kDown) << "nobody is there";
  ASSERT_EQ(set_port(QEX_NEBPROP_PORT_VNIC_CONNECTEE, bytes_of_text("vm")), QEX_OK);
  EXPECT_EQ(link("p"), kUp);
  ASSERT_EQ(set_port(QEX_NEBPROP_PORT_LINK_STATUS, bytes_of(kDown)), QEX_OK);
  EXPECT_EQ(link("p"), kDown);
  EXPECT_EQ(set_port(QEX_NEBPROP_PORT_LINK_STATUS, bytes_of(qex_uint32{2})), QEX_BAD_PARAM);
  EXPECT_EQ(DVSQEX_PortDataClear("s-id", "p", QEX_NEBPROP_PORT_LINK_STATUS), QEX_READ_ONLY);
}

struct Seen {
  int links = 0;
};
char count_links(void *item, void *context) {
  if (std::string(DVSData_Name(item)) == QEX_NEBPROP_PORT_LINK_STATUS) {
    ++static_cast<Seen *>(context)->links;
  }
  return 1;
}

TEST_F(RunningPorts, AWalkMeetsTheLinkOnce) {
  ASSERT_EQ(set_port(QEX_NEBPROP_PORT_LINK_STATUS, bytes_of(kDown)), QEX_OK);
  Seen seen;
  DVSState_PortDataForEach(DVSState_PortFind("s-id", "p"), count_links, &seen);
  EXPECT_EQ(seen.links, 1);
}

TEST_F(RunningPorts, StatisticsAreWhatIsCounted) {
  constexpr auto kKey = QEX_NEBPROP_PORT_STATISTICS;
  EXPECT_EQ(port(kKey), Bytes(sizeof(qex_NEBPortStatistics), 0));
  // In the order of the record, so that each name is seen to reach its own field.
  char const *const names[] = {
      "pktsInUnicast",    "bytesInUnicast",    "pktsInMulticast",  "bytesInMulticast",
      "pktsInBroadcast",  "bytesInBroadcast",  "pktsOutUnicast",   "bytesOutUnicast",
      "pktsOutMulticast", "bytesOutMulticast", "pktsOutBroadcast", "bytesOutBroadcast",
      "pktsInDropped",    "pktsOutDropped",    "pktsInException",  "pktsOutException"};
  Bytes expected;
  qex_uint64 value = ~qex_uint64{0};
  for (auto const *name : names) {
    ASSERT_EQ(simhost_set_counter("s", "p", nullptr, name, value), QEX_OK) << name;
    expected = expected + bytes_of(value--);
  }
  EXPECT_EQ(port(kKey), expected);
  EXPECT_EQ(port(kKey, "uplink1"), Bytes(sizeof(qex_NEBPortStatistics), 0));
  EXPECT_EQ(set_port(kKey, expected), QEX_READ_ONLY);
  EXPECT_EQ(DVSQEX_PortDataClear("s-id", "p", kKey), QEX_READ_ONLY);
  ASSERT_EQ(simhost_restart(), QEX_OK);
  EXPECT_EQ(port(kKey), Bytes(sizeof(qex_NEBPortStatistics), 0));
}

TEST_F(RunningPorts, LearningStatisticsAreThoseOfTheQuery) {
  constexpr auto kKey = VSPROP_PORT_MAC_LEARNING_STATS;
  VSPMACLearning learning{};
  learning.learning = 1;
  learning.macLimit = 1;
  learning.macLimitPolicy = VSPORT_MAC_LEARNING_LIMIT_POLICY_DROP;
  ASSERT_EQ(VSDVS_SetPortMACLearning("s", "p", &learning), QEX_OK);
  ASSERT_EQ(simhost_learn("s", "p", "02:00:00:00:00:01", 0, 0), QEX_OK);
  ASSERT_EQ(simhost_learn("s", "p", "02:00:00:00:00:02", 0, 0), QEX_LIMIT_EXCEEDED);
  auto const raw = as<VSPMACLearningStats>(port(kKey).value());
  EXPECT_EQ(qex_uint32{raw.numMACsLearned}, 1U);
  EXPECT_EQ(qex_uint64{raw.noLearningDroppedPkts}, 1U);
  VSPMACLearningStats typed{};
  ASSERT_EQ(VSQEX_GetPortMACLearningStats("s", "p", &typed), QEX_OK);
  EXPECT_EQ(bytes_of(typed), port(kKey));
  EXPECT_EQ(set_port(kKey, bytes_of(typed)), QEX_READ_ONLY);
}

}  // namespace
