// Scenario documents: what they make of a host, what is refused and how it is told.
#include "scenario/scenario.h"

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstddef>
#include <cstdlib>
#include <fstream>
#include <functional>
#include <ostream>
#include <string>

#include "abi/fresh_host.h"
#include "faults/faults.h"
#include "model/lookup.h"
#include "model/ports/ports.h"
#include "model/properties/properties.h"
#include "model/switches/switches.h"
#include "planes/stored/stored_plane.h"
#include "qexapi/switch_properties.h"
#include "scenario/lifecycle.h"
#include "storage/store.h"
#include "temporary_folder.h"
#include "vswitch/lags.h"
#include "vswitch/mirror.h"
#include "vswitch/properties.h"

namespace {

using simhost::scenario::DocumentError;
using simhost::storage::ChangingTransaction;

void populate_nothing(ChangingTransaction &) {}

struct Scenario : testing::Test {
  Scenario() { simhost::run_on(simhost::stored::plane()); }

  simhost::storage::Store store{std::nullopt, populate_nothing};

  /// What is wrong with a document; empty if nothing is. Nothing of it lasts.
  std::string refusal(std::string const &document) {
    ChangingTransaction transaction(store);
    try {
      simhost::scenario::apply(transaction, document);
      return "";
    } catch (DocumentError const &error) {
      return error.what();
    }
  }
  std::string refusal_in_switch(std::string const &members) {
    return refusal(R"({"uplinks": [{"name": "nic0"}], "switches": [{"alias": "s", )" + members +
                   "}]}");
  }
  std::string refusal_in_port(std::string const &members) {
    return refusal_in_switch(R"("ports": [{"id": "p", )" + members + "}]");
  }
};

TEST_F(Scenario, ErrorsHaveThePathOfTheKey) {
  EXPECT_EQ(refusal("{}"), "");
  EXPECT_EQ(refusal("[]"), "the document: must be an object");
  EXPECT_EQ(refusal(R"({"switchs": []})"), "switchs: unknown key");
  EXPECT_EQ(refusal(R"({"switches": {}})"), "switches: must be an array");
  EXPECT_EQ(refusal(R"({"switches": [{}]})"), "switches[0]: 'alias' is missing");
  EXPECT_EQ(refusal(R"({"switches": [{"alias": "s"}, {"alias": 1}]})"),
            "switches[1].alias: must be a text");
  EXPECT_EQ(refusal_in_switch(R"("mtu": 99)"), "switches[0].mtu: 99 is below 1280");
  EXPECT_EQ(refusal_in_switch(R"("mtu": 9191)"), "switches[0].mtu: 9191 is above 9190");
  EXPECT_EQ(refusal_in_switch(R"("mtu": 18446744073709551615)"),
            "switches[0].mtu: 18446744073709551615 is above 9190");
  EXPECT_EQ(refusal_in_switch(R"("mtu": 1500.5)"), "switches[0].mtu: must be a whole number");
  EXPECT_EQ(refusal_in_switch(R"("persistent": 1)"),
            "switches[0].persistent: must be true or false");
  EXPECT_EQ(refusal_in_switch(R"("multicast": "some")"),
            "switches[0].multicast: 'some' is none of legacy, snooping, igmp, mld");
  EXPECT_EQ(refusal_in_port(R"("addresses": [{"mac": "2"}])"),
            "switches[0].ports[0].addresses[0].mac: must be six bytes such as 02:00:00:00:00:01");
  EXPECT_EQ(refusal_in_port(R"("groups": [{"address": "here"}])"),
            "switches[0].ports[0].groups[0].address: must be an address of Ethernet, IPv4 or IPv6");
  EXPECT_EQ(refusal_in_port(R"("counters": {"numMACsMoved": -1})"),
            "switches[0].ports[0].counters.numMACsMoved: must be a whole number, 0 or more");
  EXPECT_EQ(
      refusal_in_port(R"("properties": {"a.b": {"type": "config", "hex": "0"}})"),
      "switches[0].ports[0].properties.a.b.hex: must be hexadecimal digits, two for each byte");
  EXPECT_EQ(refusal(R"({"clock": {"now": "noon"}})"), "clock.now: must be a number of seconds");
  EXPECT_EQ(refusal(R"({"runtime_options": {"IGMPVersion": 4}})"),
            "runtime_options.IGMPVersion: 4 is above 3");
  EXPECT_EQ(refusal(R"({"runtime_options": {"IGMPVersion": "3"}})"),
            "runtime_options.IGMPVersion: must be a whole number");
  EXPECT_EQ(refusal(R"({"runtime_options": {"IGMPRouterIP": 5}})"),
            "runtime_options.IGMPRouterIP: must be a text");
  EXPECT_EQ(refusal(R"({"runtime_options": {"Speed": 4}})"),
            "runtime_options.Speed: unknown option");
  EXPECT_EQ(refusal(R"({"faults": [{"call": "VSDVS_SetMTU", "status": "QEX_ODD"}]})"),
            "faults[0].status: 'QEX_ODD' is the name of no status");
}

TEST_F(Scenario, WhatTheHostRefusesIsToldLikewise) {
  EXPECT_EQ(refusal_in_switch(R"("uplinks": ["nic0", "nic9"])"),
            "switches[0].uplinks[1]: the host refuses it: there is no uplink 'nic9' "
            "(QEX_NOT_FOUND)");
  EXPECT_EQ(refusal_in_port(R"("addresses": [{"mac": "01:00:00:00:00:01"}])"),
            "switches[0].ports[0].addresses[0]: the host refuses it: Invalid address "
            "(QEX_INVALID_ADDRESS)");
  std::string groups;
  for (int number = 0; number < VS_MAX_LAGS; ++number) {
    groups += fmt::format(R"({{"name": "{}", "uplinks": []}}, )", number);
  }
  EXPECT_EQ(refusal_in_switch(R"("lags": [)" + groups + R"({"name": "0", "uplinks": []}])"), "");
  EXPECT_EQ(refusal_in_switch(R"("lags": [)" + groups + R"({"name": "more", "uplinks": []}])"),
            "switches[0].lags[32]: the host refuses it: Limit exceeded (QEX_LIMIT_EXCEEDED)");
  EXPECT_EQ(refusal_in_port(R"("counters": {"txErrors": 1})"),
            "switches[0].ports[0].counters.txErrors: the host refuses it: there is no counter "
            "'txErrors' of a port (QEX_NOT_FOUND)");
  EXPECT_EQ(refusal(R"({"runtime_options": {"IGMPRouterIP": "::"}})"),
            "runtime_options.IGMPRouterIP: the host refuses it: Invalid address "
            "(QEX_INVALID_ADDRESS)");
  EXPECT_EQ(refusal(R"({"faults": [{"call": "Panic", "delay": 1}]})"),
            "faults[0]: the host refuses it: no fault can hit Panic (QEX_NOT_SUPPORTED)");
}

TEST_F(Scenario, UplinkPortsHaveOneUplinkEach) {
  EXPECT_EQ(refusal_in_switch(R"("uplink_ports": [{"id": "u", "uplink": "nic0"}])"), "");
  EXPECT_EQ(refusal_in_switch(R"("uplink_ports": [{"id": "u", "uplink": "nic0"},
                                                  {"id": "u", "uplink": "nic0"}])"),
            "")
      << "it has it already";
  EXPECT_EQ(refusal_in_switch(R"("uplink_ports": [{"id": "u"}, {"id": "v", "name": "u"}])"),
            "switches[0].uplink_ports[1].name: the host refuses it: another uplink port is called "
            "'u' (QEX_EXISTS)");
  EXPECT_EQ(refusal_in_switch(R"("uplink_ports": [{"id": "u", "uplink": "nic9"}])"),
            "switches[0].uplink_ports[0].uplink: the host refuses it: there is no uplink 'nic9' "
            "(QEX_NOT_FOUND)");
  EXPECT_EQ(refusal_in_switch(R"("uplink_ports": [{"id": "u", "uplink": "nic0"},
                                                  {"id": "v", "uplink": "nic0"}])"),
            "switches[0].uplink_ports[1].uplink: the host refuses it: the uplink 'nic0' is at "
            "another port (QEX_BUSY)");
  EXPECT_EQ(refusal(R"({"uplinks": [{"name": "nic0"}, {"name": "nic1"}],
                        "switches": [{"alias": "s", "uplink_ports": [
                          {"id": "u", "uplink": "nic0"}, {"id": "u", "uplink": "nic1"}]}]})"),
            "switches[0].uplink_ports[1].uplink: the host refuses it: the port has the uplink "
            "'nic0' (QEX_BUSY)");
  EXPECT_EQ(refusal(R"({"switches": [{"alias": "s", "ports": [{"id": "p"}]},
                                     {"alias": "s", "uplink_ports": [{"id": "p"}]}]})"),
            "switches[1].uplink_ports[0].id: is a port that is no uplink port");
}

TEST_F(Scenario, TextsThatAreNoJson) {
  EXPECT_THAT(refusal("{"), testing::StartsWith("no JSON: "));
  EXPECT_THAT(refusal(""), testing::StartsWith("no JSON: "));
  EXPECT_THAT(refusal("\xFF"), testing::StartsWith("no JSON: "));
  EXPECT_EQ(refusal("1e999"), "no JSON: number overflow parsing '1e999'");
  EXPECT_EQ(refusal(R"({"switches": [{"alias": "a", "alias": "b"}]})"),
            "the key 'alias' is there twice");
}

TEST_F(Scenario, WhatExistsIsChangedAndTheRestIsLeftAlone) {
  ChangingTransaction transaction(store);
  simhost::scenario::apply(transaction, R"({"uplinks": [{"name": "nic0", "speed": 1000}],
      "switches": [{"alias": "s", "mtu": 9000, "uplinks": ["nic0"], "ports": [{"id": "p"}]}]})");
  auto const before = simhost::scenario::host_to_json(transaction);
  simhost::scenario::apply(transaction, R"({"uplinks": [{"name": "nic0", "link": "down"}],
      "switches": [{"alias": "s", "uplinks": ["nic0"], "ports": [{"id": "q"}]}]})");
  auto const after = simhost::scenario::host_to_json(transaction);
  EXPECT_EQ(after["uplinks"][0]["link"], "down");
  EXPECT_EQ(after["uplinks"][0]["speed"], 1000);
  EXPECT_EQ(after["switches"].size(), 1U);
  EXPECT_EQ(after["switches"][0]["mtu"], 9000);
  EXPECT_EQ(after["switches"][0]["id"], before["switches"][0]["id"]);
  EXPECT_EQ(after["switches"][0]["ports"].size(), 2U);
}

TEST_F(Scenario, WhatASwitchWasMadeWithStays) {
  ChangingTransaction transaction(store);
  constexpr auto kMade = R"({"switches": [{
    "alias": "s", "id": "i", "portset": "p", "max_ports": 5, "persistent": false, "version": 7,
    "running": false}]})";
  simhost::scenario::apply(transaction, kMade);
  simhost::scenario::apply(transaction, kMade);
  for (auto const &[key, value] : {std::pair{"id", R"("j")"},
                                   {"portset", R"("q")"},
                                   {"max_ports", "6"},
                                   {"persistent", "true"},
                                   {"version", "200"}}) {
    try {
      simhost::scenario::apply(
          transaction, fmt::format(R"({{"switches": [{{"alias": "s", "{}": {}}}]}})", key, value));
      ADD_FAILURE() << key << " changed";
    } catch (DocumentError const &error) {
      EXPECT_EQ(error.what(),
                fmt::format("switches[0].{}: cannot change while the switch exists", key));
    }
  }
  // Whether it runs can change, and stays where a document does not say it.
  simhost::scenario::apply(transaction, R"({"switches": [{"alias": "s", "mtu": 9000}]})");
  EXPECT_FALSE(simhost::get_switch(transaction, "s").row.associated);
  simhost::scenario::apply(transaction, R"({"switches": [{"alias": "s", "running": true}]})");
  EXPECT_TRUE(simhost::get_switch(transaction, "s").row.associated);
}

// Everything that a document can say, so that nothing is lost on the way there and back.
constexpr char const *kEverything = R"({
  "clock": {"stopped": true, "now": 1234.5},
  "uplinks": [{"name": "nic0", "link": "down", "admin": "up", "lacp": "down", "speed": 1000,
               "duplex": "half"}, {"name": "nic1", "admin": "down"}, {"name": "nic2"}],
  "runtime_options": {"TeamPolicyUpDelay": 250, "MLDRouterIP": "fe80::1"},
  "mac_learning": {"aging_time": 60, "limit": 100, "learn_static": true},
  "switches": [
    {"alias": "s", "id": "the-id", "portset": "the-ports", "max_ports": 10, "persistent": false,
     "version": 100, "mtu": 9000, "uplinks": ["nic0", "nic1"],
     "lags": [{"name": "lag1", "uplinks": ["nic1"], "rate": "fast"}],
     "teaming": {"balance": "explicit", "criteria": ["lacp", "link"], "flags": ["rolling"],
                 "speed": 100, "full_duplex": true, "active": ["lag1"], "standby": ["uplink1"]},
     "mac_learning": {"aging_time": 30, "limit": 20, "learn_static": true},
     "multicast": "mld", "counters": {"txErrors": 18446744073709551615},
     "mirror_counters": {"m": {"failedPkts": 3}},
     "addresses": [{"mac": "02:00:00:00:00:09", "vlan": 7, "age": 3}],
     "running": false,
     "properties": {"com.example.note": {"type": "policy", "hex": "00ff"}},
     "host_properties": {"com.example.here": {"type": "config", "hex": "07"}},
     "uplink_ports": [{"id": "left", "name": "Left", "uplink": "nic0", "blocked": true,
                       "properties": {"com.example.wire": {"type": "policy", "hex": "01"}}},
                      {"id": "vacant"}],
     "ports": [
       {"id": "p", "external_id": "theirs", "uplink": "uplink2",
        "teaming": {"balance": "port", "active": ["uplink1"]},
        "mac_learning": {"learning": true, "flooding": true, "limit": 3, "limit_policy": "drop",
                         "mac_change": true},
        "mirror_sessions": [{"sid": "m", "name": "n", "type": "mixed", "snap_length": 64,
          "sampling_rate": 2, "disabled": true, "promiscuous": true,
          "to": [{"port": "p"}, {"ip": "10.0.0.1"}, {"ip": "fe80::1"}],
          "received_by": [{"uplink": "nic0"}, {"vlan": 5}], "sent_by": [{"number": 4}]}],
        "addresses": [{"mac": "02:00:00:00:00:01", "type": "static"},
                      {"mac": "02:00:00:00:00:02", "type": "user", "vni": 9, "ages": true}],
        "groups": [{"address": "239.1.1.1", "version": 3, "source_mode": "include",
                    "sources": ["10.0.0.1"], "vni": 4}, {"address": "ff02::1"},
                   {"address": "01:00:5e:00:00:01"}],
        "counters": {"numMACsMoved": 5},
        "properties": {"com.example.more": {"type": "volatile", "text": "hello"}}}]}],
  "faults": [{"call": "VSDVS_GetMTU", "nth": 2, "times": 0, "status": "QEX_BUSY"},
             {"call": "VSDVS_SetMTU", "exception": "OSError", "message": "no", "delay": 0.25}]
})";

TEST_F(Scenario, ADescribedHostDescribesTheSameHost) {
  ChangingTransaction transaction(store);
  simhost::scenario::apply(transaction, kEverything);
  auto const first = simhost::scenario::host_to_json(transaction);
  simhost::scenario::empty_host(transaction);
  EXPECT_TRUE(simhost::scenario::host_to_json(transaction)["switches"].empty());
  simhost::scenario::apply(transaction, first.dump());
  EXPECT_EQ(simhost::scenario::host_to_json(transaction), first)
      << "with the numbers of ports and groups";
}

TEST_F(Scenario, WhatADescriptionAddsIsReadOverWhereverItIs) {
  auto const observed = R"("observed": {"anything": [1, {"alias": 2}]})";
  EXPECT_EQ(refusal(fmt::format(R"({{{0},
    "uplinks": [{{"name": "nic0", {0}}}, {{"name": "nic1"}}],
    "mac_learning": {{"limit": 7}},
    "switches": [{{"alias": "s", {0}, "uplink_ports": [{{"id": "up", "uplink": "nic0", {0}}}],
      "uplinks": ["nic1"], "lags": [{{"name": "lag", "uplinks": ["nic0"], {0}}}],
      "addresses": [{{"mac": "02:00:00:00:00:01", {0}}}],
      "ports": [{{"id": "p", {0}, "groups": [{{"address": "239.1.1.1", {0}}}]}}]}}],
    "faults": [{{"call": "VSDVS_SetMTU", "status": "QEX_BUSY", {0}}}]}})",
                                observed)),
            "");
}

TEST_F(Scenario, AnUplinkPortIsSetAndDescribedByNames) {
  ChangingTransaction transaction(store);
  auto const document = nlohmann::ordered_json::parse(R"({"clock": {"stopped": true}, "switches": [{
      "alias": "s", "uplink_ports": [{
        "id": "left", "name": "Left", "blocked": true, "nested_tag": true,
        "vlan": {"id": 5, "trunk": ["10-12", 20], "priority": 3,
                 "guest_tagging": true}}]}]})");
  simhost::scenario::apply(transaction, document.dump());
  auto const port =
      simhost::get_port(transaction, simhost::get_switch(transaction, "s").key, "left");
  auto const owner = simhost::owner_of(port);
  EXPECT_EQ(simhost::find_property(transaction, owner, QEX_NEBPROP_PORT_BLOCK).value().value,
            simhost::Bytes{std::byte{1}});
  auto const described = simhost::scenario::host_to_json(transaction);
  auto const &said = described["switches"][0]["uplink_ports"][0];
  for (auto const &[name, value] : document["switches"][0]["uplink_ports"][0].items()) {
    EXPECT_EQ(said[name], value) << name;
  }
  EXPECT_TRUE(said["properties"].empty()) << said["properties"];
  simhost::scenario::empty_host(transaction);
  simhost::scenario::apply(transaction, described.dump());
  EXPECT_EQ(simhost::scenario::host_to_json(transaction), described);
}

TEST_F(Scenario, AnUplinkPortMayBeInThePrivateVlansOfItsSwitch) {
  EXPECT_EQ(refusal_in_switch(R"("private_vlans": [
      {"primary": 100, "secondary": 101, "type": "isolated"}],
    "uplink_ports": [{"id": "up", "vlan": {"id": 101, "private": true}}])"),
            "");
}

TEST_F(Scenario, AnUplinkPortHasNotWhatOtherPortsHave) {
  auto const refusal_in_uplink_port = [&](std::string const &member) {
    return refusal_in_switch(R"("uplink_ports": [{"id": "left", )" + member + "}]");
  };
  for (auto const *const member :
       {"teaming", "mac_learning", "forbids", "ethernet_filter", "mirror_sessions", "connection",
        "transmit_uplink", "addresses", "groups", "counters", "external_id"}) {
    EXPECT_EQ(refusal_in_uplink_port(fmt::format(R"("{}": null)", member)),
              fmt::format("switches[0].uplink_ports[0].{}: uplink ports have none", member));
  }
  EXPECT_EQ(refusal_in_uplink_port(R"("alias": "Left")"),
            "switches[0].uplink_ports[0].alias: uplink ports call it 'name'");
  EXPECT_EQ(refusal_in_uplink_port(R"("blockd": true)"),
            "switches[0].uplink_ports[0].blockd: unknown key");
}

TEST_F(Scenario, WhatAMemberCannotSayIsDescribedByItsBytesToo) {
  ChangingTransaction transaction(store);
  simhost::scenario::apply(transaction, R"({"switches": [{"alias": "s", "teaming": {"speed": 5},
      "ports": [{"id": "p", "teaming": {"speed": 6}, "mac_learning": {"limit": 3},
                 "mirror_sessions": [{"sid": "m"}]}]}]})");
  auto const owner_of_p = [&] {
    return simhost::owner_of(
        simhost::get_port(transaction, simhost::get_switch(transaction, "s").key, "p"));
  };
  auto const property = [&](char const *key) {
    return simhost::find_property(transaction, owner_of_p(), key).value();
  };
  auto table = property(VSPROP_PORT_MIRROR_SESSIONS).value;
  // Padding, for which documents have no word.
  table.at(sizeof(DVMirrorSessionTable) + offsetof(DVMirrorSession, pad2)) = std::byte{7};
  simhost::set_property(transaction, owner_of_p(), VSPROP_PORT_MIRROR_SESSIONS, table);
  simhost::set_property(transaction, owner_of_p(), VSPROP_PORT_TEAMING_POLICY,
                        property(VSPROP_PORT_TEAMING_POLICY).value,
                        simhost::storage::PropertyType::runtime);
  auto const no_utf8 = simhost::bytes_of_text("\xFF");
  simhost::set_property(transaction, owner_of_p(), VSPROP_PORT_TEAMING_OVERRIDE, no_utf8);

  auto const described = simhost::scenario::host_to_json(transaction)["switches"][0];
  EXPECT_TRUE(described["properties"].empty()) << "its teaming and MTU are said whole";
  auto const &port = described["ports"][0];
  EXPECT_EQ(port["mirror_sessions"][0]["sid"], "m");
  EXPECT_EQ(port["teaming"]["speed"], 6);
  EXPECT_EQ(port["properties"][VSPROP_PORT_TEAMING_POLICY]["type"], "runtime");
  EXPECT_EQ(port["properties"][VSPROP_PORT_TEAMING_OVERRIDE]["hex"], "ff00");
  EXPECT_EQ(port["properties"].size(), 3U) << "not the MAC learning";

  auto const document = simhost::scenario::description(transaction);
  simhost::scenario::empty_host(transaction);
  simhost::scenario::apply(transaction, document);
  EXPECT_EQ(property(VSPROP_PORT_MIRROR_SESSIONS).value, table);
  EXPECT_EQ(property(VSPROP_PORT_TEAMING_POLICY).type, simhost::storage::PropertyType::runtime);
  EXPECT_EQ(property(VSPROP_PORT_TEAMING_OVERRIDE).value, no_utf8);
}

// Each named form, and the bytes that it stands for; nothing of it is left for raw bytes.
struct Said {
  char const *members;
  char const *key;
  char const *hex;

  friend void PrintTo(Said const &said, std::ostream *stream) { *stream << said.members; }
};

struct NamedForms : Scenario, testing::WithParamInterface<Said> {
  simhost::scenario::Json only_switch(ChangingTransaction &transaction) {
    return simhost::scenario::host_to_json(transaction)["switches"][0];
  }
};

struct NamedFormsOfPorts : NamedForms {};
struct NamedFormsOfSwitches : NamedForms {};

TEST_P(NamedFormsOfPorts, SayTheBytesWhole) {
  auto const &[members, key, hex] = GetParam();
  auto const map = R"("private_vlans": [
      {"primary": 100, "secondary": 100, "type": "promiscuous"},
      {"primary": 100, "secondary": 101, "type": "isolated"}])";
  auto const document = [&](std::string const &port) {
    return fmt::format(R"({{"switches": [{{"alias": "s", {}, "ports": [{{"id": "p", {}}}]}}]}})",
                       map, port);
  };
  ChangingTransaction transaction(store);
  simhost::scenario::apply(
      transaction,
      document(fmt::format(R"("properties": {{"{}": {{"type": "{}", "hex": "{}"}}}})", key,
                           std::string_view(key).find("vswitch") == std::string_view::npos &&
                                   std::string_view(key) != QEX_NEBPROP_PORT_BLOCK
                               ? "config"
                               : "policy",
                           hex)));
  auto const by_bytes = only_switch(transaction)["ports"][0];
  EXPECT_TRUE(by_bytes["properties"].empty()) << by_bytes["properties"];
  simhost::scenario::empty_host(transaction);
  simhost::scenario::apply(transaction, document(members));
  auto by_name = only_switch(transaction)["ports"][0];
  EXPECT_TRUE(by_name["properties"].empty()) << by_name["properties"];
  by_name["observed"] = by_bytes["observed"];
  EXPECT_EQ(by_name, by_bytes);
  auto const said = simhost::scenario::parsed(fmt::format("{{{}}}", members));
  EXPECT_EQ(by_name[said.begin().key()], said.front()) << "as it was said";
}

INSTANTIATE_TEST_SUITE_P(
    EachOfThem, NamedFormsOfPorts,
    testing::Values(
        Said{R"("vlan": 100)", VSPROP_PORT_VLAN, "0000640000000000"},
        Said{R"("vlan": {"id": 100, "trunk": ["10-12", 20]})", VSPROP_PORT_VLAN,
             "00006400000002000a000c0014001400"},
        Said{R"("vlan": {"id": 101, "private": true})", VSPROP_PORT_VLAN, "0200650000000000"},
        Said{R"("vlan": {"guest_tagging": true})", VSPROP_PORT_VLAN, "0100000000000000"},
        Said{R"("forbids": ["promiscuous", "forged_transmits"])", VSPROP_PORT_SECURITY, "05000000"},
        Said{R"("blocked": true)", QEX_NEBPROP_PORT_BLOCK, "01"},
        Said{R"("nested_tag": true)", VSPROP_PORT_VLAN_NESTEDTAG, "01"},
        Said{R"("transmit_uplink": true)", VSPROP_PORT_TX_UPLINK, "01"},
        Said{R"("alias": "desk")", QEX_NEBPROP_PORT_ALIAS, "6465736b00"},
        Said{R"("connection": 7)", QEX_NEBPROP_PORT_CONNECTID, "07000000"}));

TEST_P(NamedFormsOfSwitches, SayTheBytesWhole) {
  auto const &[members, key, hex] = GetParam();
  auto const document = [&](std::string const &given) {
    return fmt::format(R"({{"switches": [{{"alias": "s", "id": "i", "portset": "p", {}}}]}})",
                       given);
  };
  ChangingTransaction transaction(store);
  simhost::scenario::apply(
      transaction, document(fmt::format(
                       R"("properties": {{"{}": {{"type": "config", "hex": "{}"}}}})", key, hex)));
  auto const by_bytes = only_switch(transaction);
  EXPECT_TRUE(by_bytes["properties"].empty()) << by_bytes["properties"];
  simhost::scenario::empty_host(transaction);
  simhost::scenario::apply(transaction, document(members));
  EXPECT_EQ(only_switch(transaction), by_bytes);
  auto const said = simhost::scenario::parsed(fmt::format("{{{}}}", members));
  EXPECT_EQ(by_bytes[said.begin().key()], said.front()) << "as it was said";
}

INSTANTIATE_TEST_SUITE_P(
    EachOfThem, NamedFormsOfSwitches,
    testing::Values(Said{R"("disabled": true)", VSPROP_SWITCH_FORWARDING_DISABLED, "01"},
                    Said{R"("mtu": 4660)", VSPROP_MTU, "34120000"},
                    Said{R"("multicast": "igmp")", VSPROP_MULTICAST_FILTER, "02000000"},
                    Said{R"("private_vlans": [
                          {"primary": 100, "secondary": 100, "type": "promiscuous"},
                          {"primary": 100, "secondary": 101, "type": "isolated"}])",
                         VSPROP_PVLAN_MAP, "64006400010000006400650002000000"}));

TEST_F(Scenario, AVlanReplacesTheWholeValueItsPriorityToo) {
  ChangingTransaction transaction(store);
  auto const vlan = [&](std::string const &said) {
    simhost::scenario::apply(
        transaction,
        R"({"switches": [{"alias": "s", "ports": [{"id": "p", "vlan": )" + said + "}]}]}");
    auto const port = simhost::scenario::host_to_json(transaction)["switches"][0]["ports"][0];
    EXPECT_TRUE(port["properties"].empty()) << port["properties"];
    return port["vlan"].dump();
  };
  auto const stored = [&](char const *key) {
    auto const port =
        simhost::get_port(transaction, simhost::get_switch(transaction, "s").key, "p");
    return simhost::storage::find_property(transaction, simhost::owner_of(port), key);
  };
  EXPECT_EQ(vlan(R"({"id": 100, "trunk": ["10-12", 20], "priority": 5})"),
            R"({"id":100,"trunk":["10-12",20],"priority":5})");
  EXPECT_EQ(stored(VSPROP_PORT_PRIORITY)->value, simhost::copied(simhost::bytes_of(5)));
  EXPECT_EQ(vlan(R"({"priority": 0})"), R"({"priority":0})");
  EXPECT_EQ(vlan("100"), "100");
  EXPECT_FALSE(stored(VSPROP_PORT_PRIORITY).has_value());
}

TEST_F(Scenario, AMemberThatIsNotGivenIsWhatItIsWhileTheSettingIsNotSet) {
  ChangingTransaction transaction(store);
  simhost::scenario::apply(transaction, R"({"switches": [{"alias": "s", "teaming": {},
      "mac_learning": {}, "ports": [{"id": "p", "mac_learning": {}, "ethernet_filter": {}}]}]})");
  auto const key = simhost::get_switch(transaction, "s").key;
  auto const of_switch = simhost::storage::PropertyOwner::global(key);
  auto const of_port = simhost::owner_of(simhost::get_port(transaction, key, "p"));
  for (auto const &[owner, name] : {std::pair{of_switch, VSPROP_SWITCH_TEAMING},
                                    std::pair{of_switch, VSPROP_SWITCH_MAC_LEARNING},
                                    std::pair{of_port, VSPROP_PORT_MAC_MANAGEMENT},
                                    std::pair{of_port, VSPROP_PORT_EXTRA_ETH_FRP}}) {
    auto const given = simhost::storage::find_property(transaction, owner, name).value().value;
    EXPECT_EQ(given, simhost::find_descriptor(name)->default_bytes()) << name;
  }
}

TEST_F(Scenario, AnEncapsulatedSessionIsSaidWhole) {
  constexpr auto kSession = R"({"sid": "far", "name": "", "type": "encapsulated",
      "snap_length": 0, "sampling_rate": 0, "disabled": false, "promiscuous": false,
      "to": [{"ip": "192.0.2.1"}], "received_by": [], "sent_by": [],
      "encapsulation": {"type": "erspan2", "key": 9, "vlan": 30, "id": 4, "cos": 1,
                        "granularity": 2},
      "encapsulates": true, "keeps_vlan": true, "no_output": true, "no_input": true,
      "mirrors_uplinks": true, "uplink_filter": "vxlan", "received_from": ["uplinks"],
      "sent_from": ["vmm", "test"], "stack": true})";
  ChangingTransaction transaction(store);
  simhost::scenario::apply(
      transaction, fmt::format(R"({{"switches": [{{"alias": "s", "uplink_mirror_sessions": [{}],
                                  "ports": [{{"id": "p", "mirror_sessions": [{}]}}]}}]}})",
                               kSession, kSession));
  auto const described = simhost::scenario::host_to_json(transaction)["switches"][0];
  auto const said = simhost::scenario::parsed(kSession);
  EXPECT_EQ(described["ports"][0]["mirror_sessions"][0], said);
  EXPECT_TRUE(described["ports"][0]["properties"].empty());
  EXPECT_EQ(described["uplink_mirror_sessions"][0], said);
  EXPECT_TRUE(described["properties"].empty());
  auto const port = simhost::get_port(transaction, simhost::get_switch(transaction, "s").key, "p");
  auto const table = simhost::storage::find_property(transaction, simhost::owner_of(port),
                                                     VSPROP_PORT_MIRROR_SESSIONS)
                         .value()
                         .value;
  auto const session = simhost::record_at<DVMirrorSession>(
      simhost::BytesView(table).subspan(sizeof(DVMirrorSessionTable)));
  EXPECT_EQ(DVMirrorEncapType{session.encapType}, DVMIRROR_ENCAP_ERSPAN2);
  EXPECT_EQ(qex_uint32{session.greKey}, 9U);
  EXPECT_EQ(qex_uint16{session.encapVlan}, 30);
  EXPECT_EQ(qex_uint16{session.erspanID}, 4);
  EXPECT_EQ(session.erspanCOS, 1);
  EXPECT_EQ(session.erspanGra, 2);
  EXPECT_EQ(qex_uint32{session.flags}, 1U | 2U | 4U | 8U | 64U);
  EXPECT_EQ(qex_uint16{session.wildIn}, VS_DVMIRROR_WILDCARD_PNIC);
  EXPECT_EQ(qex_uint16{session.wildOut}, VS_DVMIRROR_WILDCARD_VMM | VS_DVMIRROR_WILDCARD_TEST);
  EXPECT_EQ(session.uplinkFilter, MIRROR_UPLINK_FILTER_VXLAN);
  EXPECT_EQ(session.stack, 1);
}

TEST_F(Scenario, WhatANamedFormCannotBeIsToldByItsPath) {
  EXPECT_EQ(refusal_in_port(R"("vlan": 4095)"), "switches[0].ports[0].vlan: 4095 is above 4094");
  EXPECT_EQ(refusal_in_port(R"("vlan": {"trunk": ["12"]})"),
            "switches[0].ports[0].vlan.trunk[0]: must be a number or a range such as \"10-12\", 0 "
            "to 4094");
  EXPECT_EQ(refusal_in_port(R"("vlan": {"trunk": [20, "10-12"]})"),
            "switches[0].ports[0].vlan: the host refuses it: Bad parameter (QEX_BAD_PARAM)");
  EXPECT_EQ(refusal_in_port(R"("vlan": {"id": 9, "private": true})"),
            "switches[0].ports[0].vlan: the host refuses it: Bad VLAN id "
            "(QEX_BAD_VLANID)");
  EXPECT_EQ(refusal_in_port(R"("vlan": {"tag": 9})"), "switches[0].ports[0].vlan.tag: unknown key");
  EXPECT_EQ(refusal_in_port(R"("forbids": ["all"])"),
            "switches[0].ports[0].forbids[0]: 'all' is none of promiscuous, mac_changes, "
            "forged_transmits");
  EXPECT_EQ(refusal_in_switch(R"("private_vlans": [{"primary": 1, "secondary": 1}])"),
            "switches[0].private_vlans[0]: 'type' is missing");
  EXPECT_EQ(refusal_in_port(R"("ethernet_filter": {"addresses": ["10.0.0.1"]})"),
            "switches[0].ports[0].ethernet_filter.addresses[0]: must be six bytes such as "
            "02:00:00:00:00:01");
  EXPECT_EQ(refusal_in_port(R"("alias": ")" + std::string(81, 'x') + "\""),
            "switches[0].ports[0].alias: has more than 80 bytes");
}

// Nothing gets a name that no document could say.
TEST_F(Scenario, NamesAreUtf8) {
  ChangingTransaction transaction(store);
  std::string const name = "\xC3";
  auto const refused = [](auto const &change) {
    try {
      change();
      return false;
    } catch (simhost::Refused const &refusal) {
      return refusal.status() == QEX_INVALID_NAME;
    }
  };
  EXPECT_TRUE(refused([&] { simhost::create_switch(transaction, {.alias = name}); }));
  EXPECT_TRUE(
      refused([&] { simhost::create_switch(transaction, {.alias = "s", .identifier = name}); }));
  EXPECT_TRUE(
      refused([&] { simhost::create_switch(transaction, {.alias = "s", .portset = name}); }));
  auto const key = simhost::create_switch(transaction, {.alias = "\xC3\xA4"});
  EXPECT_TRUE(refused([&] { simhost::add_client_port(transaction, key, name); }));
  auto const port = simhost::add_client_port(transaction, key, "\xE2\x82\xAC");
  EXPECT_TRUE(refused([&] { simhost::set_external_id(transaction, port, name); }));
  auto const owner = simhost::storage::PropertyOwner::global(key);
  EXPECT_TRUE(refused([&] {
    simhost::set_property(transaction, owner, "com.example." + name, {},
                          simhost::storage::PropertyType::config);
  }));
  EXPECT_TRUE(refused([&] {
    simhost::add_fault(transaction,
                       {.function = "VSDVS_GetMTU", .exception = "OSError", .message = name});
  }));
  auto const described = simhost::scenario::description(transaction);
  EXPECT_THAT(described, testing::HasSubstr("\xC3\xA4"));
  EXPECT_THAT(described, testing::HasSubstr("\xE2\x82\xAC"));
}

TEST_F(Scenario, EverythingOfADocumentIsInItsDescription) {
  ChangingTransaction transaction(store);
  simhost::scenario::apply(transaction, kEverything);
  auto const host = simhost::scenario::host_to_json(transaction);
  // Each key of the document, wherever it stands, is found with its value.
  std::function<void(simhost::scenario::Json const &, simhost::scenario::Json const &,
                     std::string const &)> const compare = [&](auto const &said, auto const &shown,
                                                               std::string const &path) {
    if (said.is_object() && !said.contains("text")) {
      for (auto const &[key, value] : said.items()) {
        ASSERT_TRUE(shown.contains(key)) << path << "." << key;
        compare(value, shown[key], fmt::format("{}.{}", path, key));
      }
    } else if (said.is_array() && path.find("groups") == std::string::npos) {
      ASSERT_EQ(said.size(), shown.size()) << path;
      for (std::size_t at = 0; at < said.size(); ++at) {
        compare(said[at], shown[at], fmt::format("{}[{}]", path, at));
      }
    } else if (!said.is_array() && !said.is_object()) {
      EXPECT_EQ(said, shown) << path;
    }
  };
  compare(simhost::scenario::parsed(kEverything), host, "");
  EXPECT_EQ(host["switches"][0]["ports"][0]["properties"]["com.example.more"]["hex"],
            "68656c6c6f00");
  EXPECT_EQ(host["switches"][0]["ports"][0]["groups"].size(), 3U);
}

TEST_F(Scenario, ARestartedHostLosesWhatIsVolatile) {
  ChangingTransaction transaction(store);
  simhost::scenario::apply(transaction, R"({"switches": [{"alias": "s", "properties": {
      "com.example.keep": {"type": "policy", "text": "x"},
      "com.example.go": {"type": "volatile", "text": "x"},
      "com.example.gone": {"type": "runtime", "text": "x"}}}]})");
  simhost::scenario::restart_host(transaction);
  auto const host = simhost::scenario::host_to_json(transaction);
  auto const &properties = host["switches"][0]["properties"];
  EXPECT_TRUE(properties.contains("com.example.keep"));
  EXPECT_FALSE(properties.contains("com.example.go"));
  EXPECT_FALSE(properties.contains("com.example.gone"));
}

struct FreshHost : Scenario {
  ~FreshHost() override { unsetenv("SIMHOST_SCENARIO"); }
  FreshHost() = default;
  FreshHost(FreshHost const &) = delete;
  FreshHost &operator=(FreshHost const &) = delete;
};

TEST_F(FreshHost, IsWorthPlayingWith) {
  unsetenv("SIMHOST_SCENARIO");
  ChangingTransaction transaction(store);
  simhost::populate_fresh_host(transaction);
  auto const host = simhost::scenario::host_to_json(transaction);
  EXPECT_GE(simhost::storage::free_uplinks(transaction).size(), 2U);
  ASSERT_EQ(host["switches"].size(), 1U);
  EXPECT_GE(host["switches"][0]["ports"].size(), 2U);
  EXPECT_FALSE(host["switches"][0]["addresses"].empty());
}

TEST_F(FreshHost, IsWhatADocumentSays) {
  TemporaryFolder const folder;
  auto const file = folder.file("host.json");
  std::ofstream(file) << "{}";
  setenv("SIMHOST_SCENARIO", file.c_str(), 1);
  ChangingTransaction transaction(store);
  simhost::populate_fresh_host(transaction);
  auto const host = simhost::scenario::host_to_json(transaction);
  EXPECT_TRUE(host["switches"].empty());
  EXPECT_TRUE(host["uplinks"].empty());
}

TEST_F(FreshHost, NamesTheDocumentThatCannotBeUsed) {
  TemporaryFolder const folder;
  auto const file = folder.file("host.json");
  setenv("SIMHOST_SCENARIO", file.c_str(), 1);
  ChangingTransaction transaction(store);
  auto const refused = [&]() -> std::string {
    try {
      simhost::populate_fresh_host(transaction);
      return "";
    } catch (DocumentError const &error) {
      return error.what();
    }
  };
  EXPECT_EQ(refused(), "the scenario " + file.string() + " cannot be used: it cannot be read");
  std::ofstream(file) << R"({"switches": [{"alias": "s", "mtu": 99}]})";
  EXPECT_EQ(refused(),
            "the scenario " + file.string() + " cannot be used: switches[0].mtu: 99 is below 1280");
}

}  // namespace
