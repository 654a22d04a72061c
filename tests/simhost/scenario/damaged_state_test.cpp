// A state whose tables are a state's and whose values are not: what a description of the host says.
#include <SQLiteCpp/Database.h>
#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <filesystem>
#include <span>
#include <string>

#include "faults/faults.h"
#include "model/lookup.h"
#include "model/plane.h"
#include "model/properties/properties.h"
#include "model/state/images.h"
#include "model/switches/properties.h"
#include "nebpublic/property_types.h"
#include "planes/stored/stored_plane.h"
#include "scenario/scenario.h"
#include "scenario/texts.h"
#include "storage/store.h"
#include "temporary_folder.h"
#include "vswitch/mac_learning.h"
#include "vswitch/port_mac_policies.h"
#include "vswitch/port_policies.h"
#include "vswitch/private_vlans.h"
#include "vswitch/properties.h"
#include "vswitch/teaming.h"

namespace {

using simhost::storage::ChangingTransaction;
using simhost::storage::PropertyOwner;
using simhost::storage::Store;
using simhost::storage::UnusableState;

/// Something in every table.
void populate(auto &transaction) {
  simhost::run_on(simhost::stored::plane());
  simhost::scenario::apply(transaction, R"({
    "uplinks": [{"name": "nic0"}, {"name": "nic1", "link": "down"}],
    "switches": [{
      "alias": "s", "mtu": 9000, "uplinks": ["nic0", "nic1"],
      "lags": [{"name": "lag0", "uplinks": ["nic0"]}],
      "counters": {"txErrors": 3},
      "ports": [{
        "id": "p",
        "addresses": [{"mac": "02:00:00:00:00:01"}],
        "groups": [{"address": "239.1.1.1", "version": 3, "source_mode": "include",
                    "sources": ["192.0.2.7"]}]
      }]
    }],
    "faults": [{"call": "VSDVS_SetMTU", "exception": "OSError", "message": "gone"}]
  })");
}

void damage(std::filesystem::path const &file, std::string const &sql) {
  SQLite::Database database(file.string(), SQLite::OPEN_READWRITE);
  database.exec("PRAGMA ignore_check_constraints = ON");
  database.exec(sql);
  ASSERT_NE(database.getTotalChanges(), 0) << sql;
}

/// What a question finds wrong with the host once `sql` has been at it; empty if nothing is.
template <typename Ask>
std::string complaint_after(std::string const &sql, Ask const &ask) {
  TemporaryFolder const folder;
  auto const file = folder.file("host.db");
  {
    Store const store(file, [](auto &transaction) { populate(transaction); });
  }
  damage(file, sql);
  Store store(file, [](auto &) {});
  try {
    ChangingTransaction transaction(store);
    ask(transaction);
    return "";
  } catch (UnusableState const &error) {
    auto const named = "the state file " + file.string() + " cannot be used: ";
    EXPECT_THAT(error.what(), testing::StartsWith(named));
    return std::string(error.what()).substr(named.size());
  }
}

std::string complaint_after(std::string const &sql) {
  return complaint_after(
      sql, [](ChangingTransaction &transaction) { simhost::scenario::description(transaction); });
}

struct Damage {
  char const *sql;
  char const *complaint;
};

TEST(DamagedState, SaysWhatIsWrongWithIt) {
  for (auto const &[sql, complaint] : {
           Damage{"UPDATE fault SET exception = 'Nonsense'",
                  "the column 'exception' holds 'Nonsense'"},
           {"UPDATE fault SET first = 0", "the column 'first' holds 0"},
           {"UPDATE fault SET last = first - 1", "the column 'last' holds 0"},
           {"UPDATE fault SET delay = -1", "the column 'delay' holds -1"},
           {"UPDATE fault SET status = -1", "the column 'status' holds -1"},
           {"UPDATE fault SET message = CAST(x'610062' AS TEXT)",
            "the column 'message' holds a text with a NUL in it"},
           {"UPDATE mcast_source SET address = x'C0'",
            "the column 'address' holds 1 bytes instead of 4"},
           {"UPDATE mcast_source SET address = x'20010DB8000000000000000000000007'",
            "the column 'address' holds 16 bytes instead of 4"},
           {"UPDATE mcast_group SET version = 4", "the column 'version' holds 4"},
           {"UPDATE mcast_group SET source_mode = 3", "the column 'source_mode' holds 3"},
           {"UPDATE address SET mac = x'0200'", "the column 'mac' holds 2 bytes instead of 6"},
           {"UPDATE address SET type = 3", "the column 'type' holds 3"},
           {"UPDATE address SET vid = 4095", "the column 'vid' holds 4095"},
           {"UPDATE address SET vni = 16777216", "the column 'vni' holds 16777216"},
           {"UPDATE address SET seen = 9223372036854775807",
            "the column 'seen' holds 9223372036854775807"},
           {"UPDATE clock SET stopped = 2", "the column 'stopped' holds 2"},
           {"UPDATE clock SET value = 9223372036854775807",
            "the column 'value' holds 9223372036854775807"},
           {"DELETE FROM clock", "a row is missing in it that every state has"},
           {"UPDATE link SET errors = 101", "the column 'errors' holds 101"},
           {"UPDATE link SET speed = 4294967296", "the column 'speed' holds 4294967296"},
           {"UPDATE property SET type = 3", "the column 'type' holds 3"},
           {"UPDATE switch SET max_ports = 0", "the column 'max_ports' holds 0"},
           {"UPDATE switch SET max_ports = 65536", "the column 'max_ports' holds 65536"},
           {"UPDATE switch SET alias = '' WHERE key = 1", "the column 'alias' holds no name"},
           {"UPDATE switch SET identifier = '' WHERE key = 1",
            "the column 'identifier' holds no name"},
           {"UPDATE port SET identifier = '' WHERE number = 1",
            "the column 'identifier' holds no name"},
           {"UPDATE uplink SET name = '' WHERE position = 1", "the column 'name' holds no name"},
       }) {
    EXPECT_EQ(complaint_after(sql), complaint) << sql;
  }
}

TEST(DamagedState, SaysWhichSettingOfTheHostNoCallCouldHaveSet) {
  for (auto const &[name, value, holds] : {
           std::array{"IGMPVersion", "4", "4"},
           {"IGMPVersion", "4294967297", "4294967297"},
           {"IGMPVersion", "'3'", "no integer"},
           {"IGMPQueryInterval", "0", "0"},
           {"IGMPRouterIP", "'::1'", "'::1'"},
           {"IGMPRouterIP", "x'7F000001'", "no text"},
           {"MLDRouterIP", "'192.0.2.1'", "'192.0.2.1'"},
           {"macLearning.agingTime", "0", "0"},
           {"macLearning.agingTime", "1000001", "1000001"},
           {"macLearning.macLimit", "-1", "-1"},
           {"macLearning.learnStatic", "2", "2"},
       }) {
    EXPECT_EQ(
        complaint_after(fmt::format("INSERT INTO host_setting VALUES ('{}', {})", name, value)),
        fmt::format("the setting '{}' holds {}", name, holds));
  }
}

TEST(DamagedState, WithWhatNothingRefersToIsRead) {
  EXPECT_EQ(complaint_after("UPDATE switch SET version = 7"), "");
}

// Whose property: its scope and its port.
constexpr char const *kOfSwitch = "0, NULL";
constexpr char const *kOfHost = "1, NULL";
constexpr char const *kOfPort = "2, (SELECT number FROM port WHERE identifier = 'p')";

// Sets a property past all checks.
std::string set_to(char const *owner, char const *key, std::string const &hex) {
  return fmt::format(
      "INSERT OR REPLACE INTO property (switch, scope, port, name, type, value)"
      " VALUES (1, {}, '{}', {}, x'{}')",
      owner, key, static_cast<int>(CONFIG_PROP_TYPE), hex);
}

template <typename Record>
std::string hex_of(Record const &record) {
  return simhost::scenario::hex_text(std::as_bytes(std::span(&record, 1)));
}

std::string no_value(char const *key) {
  return fmt::format("the property '{}' holds what is no value of it", key);
}

VSTeamPolicy policy_of_more_names_than_there_is_room_for() {
  VSTeamPolicy policy{};
  policy.numActive = policy.numStandby = UINT32_MAX;
  for (std::size_t at = 0; at < std::size(policy.uplinkPortName); ++at) {
    fmt::format_to(&policy.uplinkPortName[at][0], "uplink{}", at);
  }
  return policy;
}

VSTeamPolicy policy_of_a_name_without_end() {
  VSTeamPolicy policy{};
  policy.numActive = 1;
  std::memset(&policy.uplinkPortName[0][0], 'u', sizeof policy.uplinkPortName[0]);
  return policy;
}

VSExtraEthFilter filter_of_more_addresses_than_there_is_room_for() {
  VSExtraEthFilter filter{};
  filter.numMulticastAddrs = UINT16_MAX;
  std::memset(&filter.multicastAddrs, 1, sizeof filter.multicastAddrs);
  return filter;
}

VSPvlanMapEntry entry_of_no_vlan() {
  VSPvlanMapEntry entry{};
  entry.primaryVID = entry.secondaryVID = 4095;
  entry.pvlanType = VSPORT_PVLAN_TYPE_PROMISC;
  return entry;
}

VSPortVlanPolicy policy_of_a_range_that_is_not_there() {
  VSPortVlanPolicy policy{};
  policy.numRanges = 1;
  return policy;
}

TEST(DamagedState, SaysWhichPropertyHoldsNoValue) {
  VSMACLearning learning{};
  learning.reserved = 1;
  VSPMACManagement management{};
  management.portMACLearning.macLimit = VSPORT_MAC_LEARNING_LIMIT_ENTRIES_MAX + 1;
  struct Planted {
    char const *owner;
    char const *key;
    std::string hex;
  };
  for (auto const &[owner, key, hex] : {
           Planted{kOfSwitch, VSPROP_MTU, "DC"},
           {kOfSwitch, VSPROP_MTU, "FF040000"},
           {kOfSwitch, VSPROP_MULTICAST_FILTER, "04000000"},
           {kOfSwitch, VSPROP_SWITCH_FORWARDING_DISABLED, "02"},
           {kOfSwitch, VSPROP_SWITCH_MAC_LEARNING, hex_of(learning)},
           {kOfSwitch, VSPROP_SWITCH_TEAMING,
            hex_of(policy_of_more_names_than_there_is_room_for())},
           {kOfSwitch, VSPROP_SWITCH_UPLINK_MIRROR_SESSIONS, "00"},
           {kOfSwitch, VSPROP_PVLAN_MAP, hex_of(entry_of_no_vlan())},
           {kOfHost, QEX_NEBPROP_HOST_STATUS, "03000000"},
           {kOfPort, VSPROP_PORT_SECURITY, "000000FF"},
           {kOfPort, VSPROP_PORT_TEAMING_POLICY, hex_of(policy_of_a_name_without_end())},
           {kOfPort, VSPROP_PORT_TEAMING_OVERRIDE, "75"},
           {kOfPort, VSPROP_PORT_VLAN, hex_of(policy_of_a_range_that_is_not_there())},
           {kOfPort, VSPROP_PORT_PRIORITY, "08000000"},
           {kOfPort, VSPROP_PORT_EXTRA_ETH_FRP,
            hex_of(filter_of_more_addresses_than_there_is_room_for())},
           {kOfPort, VSPROP_PORT_MAC_MANAGEMENT, hex_of(management)},
           {kOfPort, QEX_NEBPROP_PORT_ALIAS, std::string(std::size_t{2} * 81, '7') + "00"},
           {kOfPort, QEX_NEBPROP_PORT_QEXNIC_VLANID, "FF0F"},
           {kOfPort, QEX_NEBPROP_PORT_LINK_STATUS, "02000000"},
       }) {
    EXPECT_EQ(complaint_after(set_to(owner, key, hex)), no_value(key)) << hex;
  }
}

TEST(DamagedState, KeepsBytesThatAreAnyAndKeysWithoutAMeaning) {
  for (auto const *const key : {QEX_NEBPROP_PORT_PORTGROUP, "com.example.note"}) {
    EXPECT_EQ(complaint_after(set_to(kOfPort, key, "00FF")), "") << key;
  }
}

// A map may lose an entry while ports are in its private VLANs.
TEST(DamagedState, IsNoneForAValueThatNoLongerGoesWithTheRest) {
  VSPortVlanPolicy policy{};
  policy.flags = VSPORT_VLAN_PVLAN_ENABLED;
  policy.vlanID = 100;
  EXPECT_EQ(complaint_after(set_to(kOfPort, VSPROP_PORT_VLAN, hex_of(policy))), "");
}

TEST(DamagedState, IsFoundByEveryWayToReadAProperty) {
  auto const of_switch = [](ChangingTransaction &transaction) {
    return PropertyOwner::global(simhost::get_switch(transaction, "s").key);
  };
  auto const of_mtu = set_to(kOfSwitch, VSPROP_MTU, "DC");
  EXPECT_EQ(complaint_after(of_mtu,
                            [&](ChangingTransaction &transaction) {
                              simhost::effective(transaction, simhost::switches::mtu,
                                                 of_switch(transaction));
                            }),
            no_value(VSPROP_MTU));
  EXPECT_EQ(complaint_after(of_mtu,
                            [&](ChangingTransaction &transaction) {
                              simhost::find_property(transaction, of_switch(transaction),
                                                     VSPROP_MTU);
                            }),
            no_value(VSPROP_MTU));
  EXPECT_EQ(complaint_after(of_mtu,
                            [&](ChangingTransaction &transaction) {
                              simhost::list_properties(transaction, of_switch(transaction));
                            }),
            no_value(VSPROP_MTU));
  EXPECT_EQ(complaint_after(of_mtu,
                            [](ChangingTransaction &transaction) {
                              simhost::state_image(transaction, simhost::Extent::whole);
                            }),
            no_value(VSPROP_MTU));
  EXPECT_EQ(complaint_after(of_mtu,
                            [&](ChangingTransaction &transaction) {
                              simhost::clear(transaction, simhost::switches::mtu,
                                             of_switch(transaction));
                            }),
            "")
      << "what is damaged can be cleared";
  // A link that changes moves ports, which are all looked at.
  EXPECT_EQ(complaint_after(set_to(kOfPort, VSPROP_PORT_TEAMING_OVERRIDE, "75"),
                            [](ChangingTransaction &transaction) {
                              simhost::get_wires().change_link(transaction, "nic0",
                                                               {.carrier = false});
                            }),
            no_value(VSPROP_PORT_TEAMING_OVERRIDE));
}

TEST(DamagedState, MissesWhatIsReferredTo) {
  EXPECT_EQ(complaint_after("PRAGMA foreign_keys = OFF; UPDATE switch SET key = 99"),
            "it has no switch 1, which is referred to");
}

}  // namespace
