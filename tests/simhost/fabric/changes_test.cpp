// What transactions change of what hosts share is seen, whoever makes them: only what they touched
// is looked at, and that is held to a look at everything.
#include <gmock/gmock.h>

#include <fmt/format.h>

#include <random>

#include "fabric/shared/settings.h"
#include "model/fabric/fabric.h"
#include "model/ports/ports.h"
#include "model/ports/properties.h"
#include "model/properties/properties.h"
#include "model/state/images.h"
#include "model/switches/switches.h"
#include "scenario/scenario.h"
#include "scenario/settings.h"
#include "sharing_host.h"
#include "storage/running/devices.h"

namespace simhost::fabric {
namespace {

using storage::ChangingTransaction;
using storage::PropertyOwner;
using testing::Contains;

using WhatChanges = SharingHost;

TEST_F(WhatChanges, IsNothingOfWhatIsTheHostsOwn) {
  auto const changes = changes_by([](ChangingTransaction &transaction) {
    scenario::apply(transaction, R"({"switches": [{"alias": "lab", "uplinks": ["nic0"]},
                                                  {"alias": "own", "mtu": 9000}]})");
    auto const port = *port_in(transaction, "a");
    set_property(transaction, PropertyOwner::port(port.switch_key, port.number), "x.y", {},
                 storage::PropertyType::runtime);
  });
  EXPECT_EQ(changes, Json::array());
}

TEST_F(WhatChanges, IsNoPortThatOnlyThisHostHasNoUseFor) {
  auto const changes = changes_by([](ChangingTransaction &transaction) {
    add_vacant_uplink_port(transaction, found_in(transaction)->key, "up");
    for (auto const *const name : {"a", "up"}) {
      auto const port = *port_in(transaction, name);
      set(transaction, ports::type, PropertyOwner::port(port.switch_key, port.number),
          DVSPORT_TYPE_ZOMBIE);
    }
    sanitize_state(transaction);
  });
  EXPECT_EQ(changes, Json::array());
  ChangingTransaction transaction(store);
  EXPECT_TRUE(port_in(transaction, "a"));
  EXPECT_FALSE(port_in(transaction, "up")) << "it is the host's own";
}

TEST_F(WhatChanges, IsAPortThatOnlyOthersBelieveToBeConnectedHere) {
  auto const record_at = [](char const *host) {
    return Json{{"host", host}, {"settings", Json::object()}};
  };
  for (auto const *const host : {"there", "here"}) {
    ChangingTransaction transaction(store);
    News const news{
        .names = {{port_name("a")}}, .records = {{port_name("a"), record_at(host)}}, .counts = {}};
    bool const is_here = host == membership.host;
    EXPECT_EQ(follow(transaction, membership, news, {}).is_left, is_here);
    auto const expected =
        is_here ? Json::array({Change{port_name("a"), record_at(host), record_at("")}})
                : Json::array();
    EXPECT_EQ(in_json(settle(transaction)), expected);
  }
  EXPECT_EQ(changes_by([](ChangingTransaction &) {}), Json::array());
}

TEST_F(WhatChanges, IsSeenWhoeverHasCommittedIt) {
  {
    ChangingTransaction transaction(store);
    scenario::apply(transaction, R"({"switches": [{"alias": "lab", "mtu": 9000}]})");
    transaction.commit();
  }
  auto const changes = changes_by([](ChangingTransaction &) {});
  ASSERT_EQ(changes.size(), 1U);
  EXPECT_EQ(changes[0]["now"]["settings"]["mtu"], "9000");
  EXPECT_EQ(changes_by([](ChangingTransaction &) {}), Json::array());
}

bool sets(ChangingTransaction &transaction, Descriptor const &descriptor,
          PropertyOwner const &owner, Bytes const &value) {
  try {
    set_property(transaction, owner, descriptor.key, value, storage::PropertyType::config);
    return true;
  } catch (Refused const &) {
    return false;
  }
}

// The default, and where that says nothing new another value.
std::vector<Bytes> values_of(Descriptor const &descriptor) {
  auto const usual = descriptor.default_bytes();
  auto other = usual;
  if (!other.empty()) {
    other.front() = std::byte(std::to_integer<unsigned>(other.front()) + 1);
  }
  return {usual, other};
}

template <typename Owner>
void check_is_seen(ChangingTransaction &transaction, Descriptor const &descriptor,
                   PropertyOwner const &owner, Owner const &shared, SharedName const &name,
                   std::set<std::string> &seen) {
  for (auto const &value : values_of(descriptor)) {
    reset_property(transaction, owner, descriptor.key);
    storage::forget_touched(transaction);
    auto const before = settings_of(transaction, shared);
    auto const image = image_of(transaction, shared);
    if (!sets(transaction, descriptor, owner, value)) {
      continue;
    }
    for (auto const &[member, text] : settings_of(transaction, shared)) {
      auto const known = before.find(member);
      if (known == before.end() || known->second != text) {
        seen.insert(member);
        EXPECT_NE(image_of(transaction, shared), image) << descriptor.key;
        EXPECT_THAT(storage::touched(transaction), Contains(name)) << descriptor.key;
      }
    }
  }
}

TEST_F(WhatChanges, IsSeenOfEachSettingThatThereIs) {
  std::set<std::string> of_switch;
  std::set<std::string> of_port;
  for (auto const *const descriptor : descriptors()) {
    ChangingTransaction transaction(store);
    auto const found = *found_in(transaction);
    auto const port = *port_in(transaction, "a");
    if (descriptor->scope == storage::PropertyScope::global) {
      check_is_seen(transaction, *descriptor, PropertyOwner::global(found.key), found,
                    port_name(""), of_switch);
    } else if (descriptor->scope == storage::PropertyScope::port) {
      check_is_seen(transaction, *descriptor, PropertyOwner::port(found.key, port.number), port,
                    port_name("a"), of_port);
    }
  }
  for (auto const name : scenario::setting_names(scenario::SettingOwner::of_switch)) {
    EXPECT_THAT(of_switch, Contains(std::string(name)));
  }
  for (auto const name : scenario::setting_names(scenario::SettingOwner::of_port)) {
    EXPECT_THAT(of_port, Contains(std::string(name)));
  }
}

// Beside those.
TEST_F(WhatChanges, IsSeenOfEachSettingThatIsNoProperty) {
  auto const changed = [&](std::string const &name, auto const &work) {
    auto const changes = changes_by(work);
    ASSERT_EQ(changes.size(), 1U) << name;
    EXPECT_EQ(changes[0]["port"], name);
    EXPECT_NE(changes[0]["was"], changes[0]["now"]);
  };
  changed("", [](auto &transaction) {
    storage::rename_switch(transaction, found_in(transaction)->key, "renamed");
  });
  changed("",
          [](auto &transaction) { change_max_ports(transaction, found_in(transaction)->key, 7); });
  changed("", [](auto &transaction) {
    change_version(transaction, found_in(transaction)->key, kDefaultVersion + 1);
  });
  auto const set_tunnels = [](auto &transaction, FabricSpec const &spec) {
    set_fabric(transaction, found_in(transaction)->key, spec);
  };
  changed("", [&](auto &transaction) { set_tunnels(transaction, {.key = 7}); });
  changed("", [&](auto &transaction) { set_tunnels(transaction, {.key = 8}); });
  changed("", [&](auto &transaction) {
    set_tunnels(transaction, {.encapsulation = storage::Encapsulation::geneve, .key = 8});
  });
  FabricSpec tunnels{.key = 8, .peers = {host_address(1)}};
  changed("", [&](auto &transaction) { set_tunnels(transaction, tunnels); });
  changed("", [&](auto &transaction) {
    set_tunnels(transaction, {.key = 8, .peers = {host_address(2)}});
  });
  changed("", [](auto &transaction) {
    storage::remove_fabric(transaction, found_in(transaction)->key);
  });
  changed("a", [](auto &transaction) {
    set_external_id(transaction, *port_in(transaction, "a"), "vm-7");
  });
  changed("a", [](auto &transaction) {
    storage::put_device(transaction, port_in(transaction, "a")->number, "eth1", std::nullopt);
  });
  changed("a", [](auto &transaction) {
    storage::remove_device(transaction, port_in(transaction, "a")->number);
  });
  changed("b",
          [](auto &transaction) { add_client_port(transaction, found_in(transaction)->key, "b"); });
  changed("b", [](auto &transaction) {
    storage::remove_port(transaction, port_in(transaction, "b")->number);
  });
}

// One after the other, by chance, in transactions of which some look and some do not.
class History : public SharingHost, public testing::WithParamInterface<unsigned> {
 protected:
  void step(ChangingTransaction &transaction) {
    auto const found = found_in(transaction);
    if (!found) {
      begin_again(transaction);
      return;
    }
    auto const name = std::string(1, static_cast<char>('a' + below(4)));
    auto const port = storage::find_port(transaction, found->key, name);
    switch (below(14)) {
      case 0:
        return set(transaction, fmt::format(R"("mtu": {})", 1500 + below(3)));
      case 1:
        change_version(transaction, found->key, 1 + below(3));
        return change_max_ports(transaction, found->key, 10 + below(3));
      case 2:
        return set(transaction,
                   fmt::format(R"("ports": [{{"id": "{}", "vlan": {}}}])", name, 1 + below(3)));
      case 3:
        return clear_vlan(transaction, port);
      case 4:
        return set_address(transaction, *found, port);
      case 5:
        return remove_addresses(transaction, *found, port);
      case 6:
        storage::rename_switch(transaction, found->key, fmt::format("lab{}", below(3)));
        return;
      case 7:
        return below(8) == 0 ? destroy_switch(transaction, found->key) : void();
      case 8:
        return below(2) == 0 ? follow_another_host(transaction, name) : void();
      case 9:
        return set_tunnels(transaction, found->key);
      default:
        return change_port(transaction, *found, name, port);
    }
  }

  unsigned below(unsigned limit) { return static_cast<unsigned>(chance_() % limit); }

 private:
  static void set(ChangingTransaction &transaction, std::string const &members) {
    auto const alias = found_in(transaction)->row.alias;
    scenario::apply(transaction, R"({"switches": [{"alias": ")" + alias + "\", " + members + "}]}");
  }

  static void clear_vlan(ChangingTransaction &transaction,
                         std::optional<storage::Port> const &port) {
    for (auto const *const descriptor : descriptors()) {
      if (port && descriptor->scope == storage::PropertyScope::port && descriptor->name == "vlan") {
        clear(transaction, *descriptor, PropertyOwner::port(port->switch_key, port->number));
      }
    }
  }

  void begin_again(ChangingTransaction &transaction) {
    if (storage::is_shared(transaction, kSwitch)) {
      create_switch(transaction, {.alias = "again", .identifier = kSwitch});
      if (below(2) == 0) {
        add_client_port(transaction, found_in(transaction)->key, "a");
      }
    } else {
      begin(transaction);
    }
  }

  void set_tunnels(ChangingTransaction &transaction, storage::SwitchKey key) {
    if (below(3) == 0) {
      return storage::remove_fabric(transaction, key);
    }
    FabricSpec spec{.uplink = below(4) == 0 ? "mesh" : "", .key = below(2)};
    for (unsigned number = 1; number <= 2; ++number) {
      if (below(2) == 0) {
        spec.peers.push_back(host_address(number));
      }
    }
    set_fabric(transaction, key, spec);
  }

  void set_address(ChangingTransaction &transaction, storage::FoundSwitch const &found,
                   std::optional<storage::Port> const &port) {
    VSMACEntry entry{};
    entry.macAddress[0] = 2;
    entry.macAddress[5] = static_cast<unsigned char>(below(3));
    entry.macAddrType = below(2) == 0 ? VS_MAC_ADDR_TYPE_STATIC : VS_MAC_ADDR_TYPE_USER;
    running_plane().put_address(transaction, place_of(found, port), entry);
  }

  static void remove_addresses(ChangingTransaction &transaction, storage::FoundSwitch const &found,
                               std::optional<storage::Port> const &port) {
    for (auto const &address : storage::fixed_addresses(transaction, place_of(found, port))) {
      storage::remove_address(transaction,
                              storage::find_address(transaction, found.key, address.name)->row);
    }
  }

  static Place place_of(storage::FoundSwitch const &found,
                        std::optional<storage::Port> const &port) {
    return {.switch_key = found.key, .port = port ? std::optional(port->number) : std::nullopt};
  }

  void change_port(ChangingTransaction &transaction, storage::FoundSwitch const &found,
                   std::string const &name, std::optional<storage::Port> const &port) {
    if (!port) {
      below(4) == 0 ? add_vacant_uplink_port(transaction, found.key, name)
                    : add_client_port(transaction, found.key, name);
    } else if (port->kind == storage::PortKind::uplink || below(4) == 0) {
      storage::remove_port(transaction, port->number);
    } else if (below(3) == 0) {
      storage::set_external_id(transaction, port->number, fmt::format("vm-{}", below(3)));
    } else if (storage::device_of(transaction, port->number)) {
      storage::remove_device(transaction, port->number);
    } else {
      storage::put_device(transaction, port->number, "eth-" + name, std::nullopt);
    }
  }

  // Which has a port that this one has otherwise.
  void follow_another_host(ChangingTransaction &transaction, std::string const &name) const {
    News news{.names = std::set{port_name(name)}, .records = {}, .counts = {}};
    auto const row = storage::find_shared(transaction, port_name(name));
    auto const port = port_in(transaction, name);
    if (row && port && port->kind == storage::PortKind::client) {
      auto record = Json::parse(row->fabric);
      record["settings"]["vlan"] = "77";
      record["host"] = "there";
      news.records.emplace(port_name(name), std::move(record));
      follow(transaction, membership, news, {});
    }
  }

  std::mt19937 chance_{GetParam()};
};

TEST_P(History, IsSeenLikeByALookAtEverything) {
  std::size_t changes = 0;
  for (int round = 0; round < 300; ++round) {
    ChangingTransaction transaction(store);
    try {
      for (auto left = 1 + below(3); left > 0; --left) {
        step(transaction);
      }
    } catch (Refused const &) {
      // What was done before that counts.
    } catch (Unborne const &) {
      continue;
    }
    if (below(4) == 0) {
      transaction.commit();
      continue;
    }
    auto const seen = in_json(changes_of(transaction, membership));
    ASSERT_EQ(seen, whole_look(transaction)) << "in round " << round;
    changes += seen.size();
    if (below(4) != 0) {
      settle(transaction);
    }
  }
  EXPECT_GT(changes, 100U);
}

INSTANTIATE_TEST_SUITE_P(Chances, History, testing::Range(1U, 6U));

}  // namespace
}  // namespace simhost::fabric
