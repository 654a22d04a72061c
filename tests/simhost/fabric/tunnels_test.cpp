// The tunnels of a switch are shared with it: what hosts have in common of them, and what each has
// for itself.
#include <gmock/gmock.h>

#include <algorithm>
#include <optional>
#include <string>
#include <vector>

#include "fabric/shared/records.h"
#include "model/fabric/fabric.h"
#include "model/ports/ports.h"
#include "scenario/scenario.h"
#include "sharing_host.h"
#include "storage/tunnels/fabrics.h"

namespace simhost::fabric {
namespace {

using storage::ChangingTransaction;
using WhatChangesOfTunnels = SharingHost;

TEST_F(WhatChangesOfTunnels, IsNotWhatEachHostHasForItself) {
  FabricSpec tunnels{.key = 7, .peers = {host_address(1), host_address(2)}};
  changes_by([&](auto &transaction) {
    set_fabric(transaction, found_in(transaction)->key, tunnels);
    attach_fabric(transaction, found_in(transaction)->key);
  });
  EXPECT_EQ(changes_by([&](auto &transaction) {
              auto const key = found_in(transaction)->key;
              remove_uplink_port(transaction, key, "fabric0");
              std::ranges::reverse(tunnels.peers);
              tunnels.uplink = "mesh";
              set_fabric(transaction, key, tunnels);
              set_underlay(transaction, {.device = "eth1", .address = host_address(1)});
            }),
            Json::array());
}

struct WhatIsFollowed : SharingHost {
  // By a record of the switch. Returns what this host cannot bear of it.
  std::string follow_tunnels(std::string const &said) {
    ChangingTransaction transaction(store);
    auto record = Json::parse(storage::find_shared(transaction, port_name(""))->fabric);
    auto &settings = record["settings"];
    settings.erase("fabric");
    if (!said.empty()) {
      settings["fabric"] = said;
    }
    News const news{.names = {{port_name("")}}, .records = {{port_name(""), record}}, .counts = {}};
    try {
      EXPECT_TRUE(follow(transaction, membership, news, {}).is_other);
    } catch (Unborne const &why) {
      return why.what();
    }
    EXPECT_EQ(in_json(settle(transaction)), Json::array());
    return {};
  }
  std::optional<storage::Fabric> fabric() {
    storage::ReadingTransaction transaction(store);
    return storage::fabric_of(transaction, found_in(transaction)->key);
  }
};

TEST_F(WhatIsFollowed, HasTheTunnelsOfAllHosts) {
  EXPECT_EQ(follow_tunnels(
                R"({"encapsulation": "geneve", "key": 7, "peers": ["192.0.2.2", "192.0.2.1"]})"),
            "");
  ASSERT_TRUE(fabric());
  EXPECT_EQ(fabric()->peers, (std::vector{host_address(1), host_address(2)}));
  auto const is_attached = [&] {
    storage::ReadingTransaction transaction(store);
    return storage::find_uplink(transaction, "fabric0")->port.has_value();
  };
  EXPECT_TRUE(is_attached());
  changes_by([](auto &transaction) {
    remove_uplink_port(transaction, found_in(transaction)->key, "fabric0");
  });
  EXPECT_EQ(follow_tunnels(R"({"encapsulation": "vxlan", "key": 8, "peers": ["192.0.2.2"]})"), "");
  EXPECT_EQ(fabric()->encapsulation, storage::Encapsulation::vxlan);
  EXPECT_EQ(fabric()->key, 8U);
  EXPECT_FALSE(is_attached()) << "which the host has decided for itself";
  EXPECT_EQ(follow_tunnels(""), "");
  EXPECT_FALSE(fabric());
}

TEST_F(WhatIsFollowed, HasNoTunnelsThatThisHostCannotBear) {
  changes_by([](auto &transaction) {
    scenario::apply(transaction, R"({"switches": [{"alias": "own",
        "fabric": {"encapsulation": "vxlan", "key": 7, "peers": []}}]})");
  });
  EXPECT_EQ(follow_tunnels(R"({"encapsulation": "vxlan", "key": 7, "peers": []})"),
            "fabric: the host refuses it: the switch 'own' has the key 7 (QEX_EXISTS)");
  EXPECT_EQ(
      follow_tunnels(R"({"encapsulation": "vxlan", "key": 8, "peers": [], "uplink": "mesh"})"),
      "fabric.uplink: each host has its own");
  EXPECT_EQ(follow_tunnels(R"({"encapsulation": "gre", "key": 8, "peers": []})"),
            "fabric.encapsulation: 'gre' is none of vxlan, geneve");
  EXPECT_EQ(follow_tunnels("8"), "fabric: must be an object");
  EXPECT_FALSE(fabric());
}

}  // namespace
}  // namespace simhost::fabric
