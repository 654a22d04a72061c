// Fabrics and the underlay: what documents say of them, and what is refused.
#include "model/fabric/fabric.h"

#include <gmock/gmock.h>

#include <string>

#include "clock/clock.h"
#include "memory_state.h"
#include "model/lookup.h"
#include "model/ports/ports.h"
#include "model/switches/switches.h"
#include "scenario/scenario.h"
#include "storage/switches.h"

namespace {

using simhost::get_uplink;
using simhost::storage::ChangingTransaction;
using simhost::storage::fabric_of;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;
using testing::StrEq;

struct Fabrics : MemoryState {
  Fabrics() {
    simhost::create_switch(transaction, {.alias = "s"});
    simhost::create_switch(transaction, {.alias = "other"});
    key = simhost::get_switch(transaction, "s").key;
  }

  void apply(std::string const &document) { simhost::scenario::apply(transaction, document); }
  void set_fabric(std::string const &members, std::string const &alias = "s") {
    apply(R"({"switches": [{"alias": ")" + alias + R"(", "fabric": {)" + members + "}}]}");
  }
  std::string refusal(std::string const &members, std::string const &alias = "s") {
    try {
      set_fabric(members, alias);
    } catch (std::exception const &error) {
      return error.what();
    }
    return {};
  }
  std::string underlay_refusal(std::string const &members) {
    try {
      apply(R"({"underlay": {)" + members + "}}");
    } catch (std::exception const &error) {
      return error.what();
    }
    return {};
  }
  std::vector<std::uint16_t> numbers() {
    std::vector<std::uint16_t> numbers;
    auto const fabric = fabric_of(transaction, key);
    for (auto const &tunnel : fabric->tunnels) {
      numbers.push_back(tunnel.number);
    }
    return numbers;
  }

  ChangingTransaction transaction{store};
  simhost::storage::SwitchKey key{};
};

constexpr auto *kMembers =
    R"("encapsulation": "geneve", "key": 4711, "peers": ["192.0.2.2", "2001:db8::2"])";
constexpr auto *kUnderlay =
    R"("device": "eth1", "address": "192.0.2.1/24", "gateway": "192.0.2.254")";

TEST_F(Fabrics, AreAnUplinkOfTheirSwitchThatGoesWithThem) {
  set_fabric(kMembers);
  auto const uplink = get_uplink(transaction, key, "fabric0");
  EXPECT_EQ(simhost::get_port(transaction, *uplink.port).identifier, "uplink1");
  set_fabric("");
  EXPECT_FALSE(fabric_of(transaction, key));
  EXPECT_FALSE(simhost::storage::find_uplink(transaction, "fabric0"));
  set_fabric(kMembers);
  simhost::storage::remove_switch(transaction, key);
  EXPECT_FALSE(simhost::storage::find_uplink(transaction, "fabric0"));
}

TEST_F(Fabrics, AreDescribedAsTheyAreRead) {
  apply(R"({"underlay": {)" + std::string(kUnderlay) + "}}");
  set_fabric(std::string(kMembers) + R"(, "uplink": "mesh")");
  auto const described = simhost::scenario::description(transaction);
  EXPECT_THAT(described, HasSubstr(R"("uplink": "mesh")"));
  EXPECT_THAT(described, HasSubstr(R"("gateway": "192.0.2.254")"));
  EXPECT_THAT(described, Not(HasSubstr(R"("name": "mesh")")));
  for (auto const &known : simhost::storage::all_switches(transaction)) {
    simhost::storage::remove_switch(transaction, known.key);
  }
  apply(R"({"underlay": {}})");
  EXPECT_FALSE(simhost::storage::underlay_of(transaction));
  apply(R"({"clock": {"stopped": false}})");
  apply(described);
  // But for the clock, which runs.
  auto const without_clock = [](std::string const &text) { return text.substr(text.find(']')); };
  EXPECT_EQ(without_clock(simhost::scenario::description(transaction)), without_clock(described));
}

TEST_F(Fabrics, KeepTheNumbersOfPeersThatStay) {
  set_fabric(R"("encapsulation": "vxlan", "key": 1, "peers": ["192.0.2.2", "192.0.2.3"])");
  EXPECT_THAT(numbers(), ElementsAre(0xFEC0, 0xFEC1));
  set_fabric(R"("encapsulation": "vxlan", "key": 1, "peers": ["192.0.2.4", "192.0.2.3"])");
  EXPECT_THAT(numbers(), ElementsAre(0xFEC0, 0xFEC1));
  EXPECT_EQ(std::to_integer<int>(fabric_of(transaction, key)->tunnels[1].peer[3]), 3);
}

TEST_F(Fabrics, ThatCannotBeAreRefused) {
  EXPECT_EQ(refusal(R"("encapsulation": "gre", "key": 1, "peers": [])"),
            "switches[0].fabric.encapsulation: 'gre' is none of vxlan, geneve");
  EXPECT_EQ(refusal(R"("encapsulation": "vxlan", "key": 16777216, "peers": [])"),
            "switches[0].fabric.key: 16777216 is above 16777215");
  EXPECT_EQ(refusal(R"("encapsulation": "vxlan", "key": -1, "peers": [])"),
            "switches[0].fabric.key: -1 is below 0");
  EXPECT_EQ(refusal(R"("encapsulation": "vxlan", "peers": [])"),
            "switches[0].fabric: 'key' is missing");
  EXPECT_EQ(refusal(R"("encapsulation": "vxlan", "key": 1, "peers": [], "port": 1)"),
            "switches[0].fabric.port: unknown key");
  EXPECT_EQ(refusal(R"("encapsulation": "vxlan", "key": 1, "peers": ["there"])"),
            "switches[0].fabric.peers[0]: must be an IPv4 or IPv6 address");
  EXPECT_EQ(refusal(R"("encapsulation": "vxlan", "key": 1, "peers": ["239.0.0.1"])"),
            "switches[0].fabric: the host refuses it: 239.0.0.1 is the address of no host"
            " (QEX_INVALID_ADDRESS)");
  EXPECT_EQ(refusal(R"("encapsulation": "vxlan", "key": 1, "peers": ["::1"])"),
            "switches[0].fabric: the host refuses it: ::1 is the address of no host"
            " (QEX_INVALID_ADDRESS)");
  EXPECT_EQ(
      refusal(R"("encapsulation": "vxlan", "key": 1, "peers": ["192.0.2.2", "192.0.2.2"])"),
      "switches[0].fabric: the host refuses it: the peer 192.0.2.2 is there twice (QEX_EXISTS)");
  EXPECT_EQ(refusal(R"("encapsulation": "vxlan", "key": 1, "peers": [], "uplink": "nic0")"),
            "switches[0].fabric: the host refuses it: the uplink 'nic0' is another one of this host"
            " (QEX_EXISTS)");
}

TEST_F(Fabrics, OfTwoSwitchesHaveTwoKeys) {
  set_fabric(kMembers);
  EXPECT_EQ(
      refusal(kMembers, "other"),
      "switches[0].fabric: the host refuses it: the switch 's' has the key 4711 (QEX_EXISTS)");
  EXPECT_EQ(refusal(R"("encapsulation": "vxlan", "key": 4711, "peers": [])", "other"), "");
}

TEST_F(Fabrics, LeadToOtherHosts) {
  auto const last_bytes = [&] {
    std::vector<int> all;
    auto const fabric = fabric_of(transaction, key);
    for (auto const &peer : fabric->peers) {
      all.push_back(std::to_integer<int>(peer.back()));
    }
    return all;
  };
  set_fabric(
      R"("encapsulation": "vxlan", "key": 1, "peers": ["192.0.2.3", "192.0.2.1", "192.0.2.2"])");
  EXPECT_THAT(numbers(), ElementsAre(0xFEC0, 0xFEC1, 0xFEC2));
  apply(R"({"underlay": {)" + std::string(kUnderlay) + "}}");
  EXPECT_THAT(numbers(), ElementsAre(0xFEC0, 0xFEC2));
  EXPECT_THAT(last_bytes(), ElementsAre(1, 2, 3));
  apply(R"({"underlay": {"device": "eth1", "address": "192.0.2.3/24"}})");
  EXPECT_THAT(numbers(), ElementsAre(0xFEC1, 0xFEC2));
  set_fabric(
      R"("encapsulation": "vxlan", "key": 1, "peers": ["192.0.2.4", "192.0.2.3", "192.0.2.2"])");
  EXPECT_THAT(numbers(), ElementsAre(0xFEC1, 0xFEC2)) << "the place of this host is taken";
  EXPECT_THAT(last_bytes(), ElementsAre(2, 3, 4));
  set_fabric(R"("encapsulation": "vxlan", "key": 1, "peers": ["192.0.2.3"])");
  EXPECT_THAT(numbers(), ElementsAre());
  apply(R"({"underlay": {}})");
  EXPECT_THAT(numbers(), ElementsAre(0xFEC0));
}

TEST_F(Fabrics, HaveAnUplinkThatIsNoWire) {
  set_fabric(kMembers);
  auto const refused = [&](std::string const &document) {
    try {
      apply(document);
    } catch (std::exception const &error) {
      return std::string(error.what());
    }
    return std::string();
  };
  EXPECT_THAT(refused(R"({"uplinks": [{"name": "fabric0", "link": "down"}]})"),
              HasSubstr("the uplink 'fabric0' is tunnels: what comes over it cannot be set"));
  EXPECT_THAT(refused(R"({"uplinks": [{"name": "fabric0", "device": "eth2"}]})"),
              HasSubstr("the uplink 'fabric0' is tunnels, and has no device"));
  EXPECT_THAT(refused(R"({"clock": {"stopped": true}})"),
              HasSubstr("the frames of the tunnels 'fabric0' go by real time"));
  EXPECT_THAT(
      refused(R"({"switches": [{"alias": "s", "lags": [{"name": "l", "uplinks": ["fabric0"]}]}]})"),
      HasSubstr("tunnels are aggregated with nothing"));
  simhost::remove_uplink_port(transaction, key, "fabric0");
  EXPECT_THAT(refused(R"({"switches": [{"alias": "other", "uplinks": ["fabric0"]}]})"),
              HasSubstr("the uplink 'fabric0' is the tunnels of another switch"));
}

TEST_F(Fabrics, AreNoneOfTheUplinksThatANewSwitchTakes) {
  set_fabric(kMembers);
  simhost::remove_uplink_port(transaction, key, "fabric0");
  EXPECT_THAT(simhost::storage::free_uplinks(transaction),
              Not(testing::Contains(StrEq("fabric0"))));
}

TEST_F(Fabrics, TakeAnUnderlayThatCanBe) {
  EXPECT_EQ(underlay_refusal(R"("device": "eth1", "address": "192.0.2.1")"),
            "underlay.address: must be an address and the bits of its network, such as"
            " 192.0.2.1/24");
  EXPECT_EQ(underlay_refusal(R"("device": "eth1", "address": "192.0.2.1/33")"),
            "underlay.address: must be an address and the bits of its network, such as"
            " 192.0.2.1/24");
  EXPECT_EQ(underlay_refusal(R"("device": "eth1", "address": "192.0.2.1/24", "gateway": "there")"),
            "underlay.gateway: must be an IPv4 or IPv6 address");
  EXPECT_EQ(
      underlay_refusal(R"("device": "eth1", "address": "192.0.2.1/24", "gateway": "2001:db8::1")"),
      "underlay: the host refuses it: the gateway has an address of the other kind"
      " (QEX_INVALID_ADDRESS)");
  EXPECT_EQ(underlay_refusal(R"("device": "eth 1", "address": "192.0.2.1/24")"),
            "underlay: the host refuses it: 'eth 1' is no name of a network device"
            " (QEX_INVALID_NAME)");
  EXPECT_EQ(underlay_refusal(kUnderlay), "");
  try {
    apply(R"({"uplinks": [{"name": "nic0", "device": "eth1"}]})");
    FAIL();
  } catch (std::exception const &error) {
    EXPECT_THAT(error.what(), HasSubstr("the device eth1 is at the underlay"));
  }
}

}  // namespace
