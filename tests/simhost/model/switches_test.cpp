// Switches: what is accepted and refused, at each bound and one past it.
#include "model/switches/switches.h"

#include "model/lookup.h"
#include "model/properties/properties.h"
#include "model/switches/properties.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <string>
#include <vector>

#include "memory_state.h"
#include "storage/switches.h"
#include "vswitch/mirror.h"

namespace {

using simhost::SwitchSpec;
using simhost::storage::ChangingTransaction;
using simhost::storage::ReadingTransaction;
using simhost::storage::SwitchName;

struct Switches : MemoryState {
  QEX_ReturnStatus create(SwitchSpec const &spec) {
    return status_of([&] {
      ChangingTransaction transaction(store);
      simhost::create_switch(transaction, spec);
      transaction.commit();
    });
  }
  QEX_ReturnStatus set_mtu(std::string_view alias, std::uint32_t mtu) {
    return status_of([&] {
      ChangingTransaction transaction(store);
      auto const key = simhost::get_switch(transaction, alias).key;
      simhost::set(transaction, simhost::switches::mtu,
                   simhost::storage::PropertyOwner::global(key), mtu);
      transaction.commit();
    });
  }
  QEX_ReturnStatus destroy(std::string_view alias) {
    return status_of([&] {
      ChangingTransaction transaction(store);
      simhost::destroy_switch(transaction, alias);
      transaction.commit();
    });
  }
  VSInfo info(std::string_view alias) {
    ReadingTransaction transaction(store);
    return simhost::switch_info(transaction, alias);
  }
  simhost::storage::Switch row(std::string_view alias) {
    ReadingTransaction transaction(store);
    return simhost::storage::find_switch(transaction, SwitchName::alias, alias).value().row;
  }
  std::vector<std::string> uplinks(std::string_view alias) {
    ReadingTransaction transaction(store);
    std::vector<std::string> names;
    for (auto const &uplink : simhost::uplinks_of(transaction, alias)) {
      names.push_back(uplink.name);
    }
    return names;
  }
  std::size_t free_uplinks() {
    ReadingTransaction transaction(store);
    return simhost::storage::free_uplinks(transaction).size();
  }
};

std::string text(qex_uint8 const *field) {
  return reinterpret_cast<char const *>(field);
}

TEST_F(Switches, ZerosAndEmptyNamesLeaveTheChoiceToTheHost) {
  ASSERT_EQ(create({.alias = "first"}), QEX_OK);
  auto const made = row("first");
  EXPECT_EQ(made.max_ports, 128U);
  EXPECT_EQ(made.version, VS_YKT_NEB_VERSION_20);
  EXPECT_EQ(made.portset, "portset-0");
  EXPECT_THAT(made.identifier,
              testing::MatchesRegex("[0-9a-f]{8}-[0-9a-f]{4}-4[0-9a-f]{3}-[89ab][0-9a-f]{3}-"
                                    "[0-9a-f]{12}"));
  EXPECT_FALSE(made.persistent);
  EXPECT_EQ(info("first").mtu, 1500U);
  EXPECT_TRUE(uplinks("first").empty());
}

TEST_F(Switches, KeepWhatTheyWereMadeWith) {
  ASSERT_EQ(create({.alias = "first",
                    .identifier = "id",
                    .portset = "ports",
                    .max_ports = 7,
                    .persistent = true,
                    .version = 100,
                    .mtu = 9000,
                    .uplink_count = 2}),
            QEX_OK);
  auto const made = row("first");
  EXPECT_EQ(made.identifier, "id");
  EXPECT_EQ(made.portset, "ports");
  EXPECT_EQ(made.max_ports, 7U);
  EXPECT_TRUE(made.persistent);
  EXPECT_EQ(made.version, 100U);
  EXPECT_EQ(info("first").mtu, 9000U);
  EXPECT_THAT(uplinks("first"), testing::ElementsAre("nic0", "nic1"));
}

TEST_F(Switches, TellAboutThemselves) {
  ASSERT_EQ(create({.alias = "first", .identifier = "id", .max_ports = 64, .uplink_count = 1}),
            QEX_OK);
  auto const told = info("first");
  EXPECT_EQ(text(told.dvsName), "first");
  EXPECT_EQ(text(told.nebID), "id");
  EXPECT_EQ(told.maxPorts, 64U);
  EXPECT_EQ(told.activePorts, 0U) << "uplink ports do not count";
  EXPECT_EQ(told.minValidVlan, 1);
  EXPECT_EQ(told.maxValidVlan, 4094);
}

TEST_F(Switches, CountTheirPorts) {
  ASSERT_EQ(create({.alias = "first"}), QEX_OK);
  {
    ChangingTransaction transaction(store);
    auto const key = simhost::storage::find_switch(transaction, SwitchName::alias, "first")->key;
    simhost::storage::add_port(transaction, key, "p1", simhost::storage::PortKind::client);
    simhost::storage::add_port(transaction, key, "p2", simhost::storage::PortKind::client);
    transaction.commit();
  }
  EXPECT_EQ(info("first").activePorts, 2U);
}

TEST_F(Switches, NeedAnAlias) {
  EXPECT_EQ(create({.alias = ""}), QEX_BAD_PARAM);
}

TEST_F(Switches, NamesAreBounded) {
  auto const name = [](std::size_t length) { return std::string(length, 'n'); };
  EXPECT_EQ(create({.alias = name(128)}), QEX_NAME_TOO_LONG);
  EXPECT_EQ(create({.alias = "a", .identifier = name(64)}), QEX_NAME_TOO_LONG);
  EXPECT_EQ(create({.alias = "a", .portset = name(128)}), QEX_NAME_TOO_LONG);
  EXPECT_EQ(create({.alias = name(127), .identifier = name(63), .portset = name(127)}), QEX_OK);
  EXPECT_EQ(text(info(name(127)).dvsName), name(127));
  EXPECT_EQ(text(info(name(127)).nebID), name(63));
}

TEST_F(Switches, PortLimitIsBounded) {
  EXPECT_EQ(create({.alias = "most", .max_ports = 65535}), QEX_OK);
  EXPECT_EQ(create({.alias = "more", .max_ports = 65536}), QEX_BAD_PARAM);
}

TEST_F(Switches, MtuIsBoundedAtCreation) {
  EXPECT_EQ(create({.alias = "a", .mtu = 1279}), QEX_BAD_PARAM);
  EXPECT_EQ(create({.alias = "a", .mtu = 9191}), QEX_BAD_PARAM);
  EXPECT_EQ(create({.alias = "a", .mtu = 1280}), QEX_OK);
  EXPECT_EQ(create({.alias = "b", .mtu = 9190}), QEX_OK);
}

TEST_F(Switches, MtuIsBoundedLater) {
  ASSERT_EQ(create({.alias = "a"}), QEX_OK);
  EXPECT_EQ(set_mtu("a", 1280), QEX_OK);
  EXPECT_EQ(set_mtu("a", 9190), QEX_OK);
  for (std::uint32_t const mtu : {0U, 1279U, 9191U, 0xFFFFFFFFU}) {
    EXPECT_EQ(set_mtu("a", mtu), QEX_BAD_PARAM) << mtu;
  }
  EXPECT_EQ(info("a").mtu, 9190U) << "a refused call changes nothing";
}

TEST_F(Switches, EveryNameIsUnique) {
  ASSERT_EQ(create({.alias = "a", .identifier = "i", .portset = "p"}), QEX_OK);
  EXPECT_EQ(create({.alias = "a"}), QEX_EXISTS);
  EXPECT_EQ(create({.alias = "b", .identifier = "i"}), QEX_EXISTS);
  EXPECT_EQ(create({.alias = "b", .portset = "p"}), QEX_EXISTS);
  EXPECT_EQ(create({.alias = "b", .identifier = "a", .portset = "a"}), QEX_OK)
      << "the kinds of name do not exclude each other";
}

TEST_F(Switches, TheHostsOwnPortsetNamesAvoidThoseInUse) {
  ASSERT_EQ(create({.alias = "a", .portset = "portset-0"}), QEX_OK);
  ASSERT_EQ(create({.alias = "b"}), QEX_OK);
  EXPECT_EQ(row("b").portset, "portset-1");
}

TEST_F(Switches, TheHostsOwnIdentifiersDiffer) {
  ASSERT_EQ(create({.alias = "a"}), QEX_OK);
  ASSERT_EQ(create({.alias = "b"}), QEX_OK);
  EXPECT_NE(row("a").identifier, row("b").identifier);
}

TEST_F(Switches, AFreshHostKeepsTwoUplinksFree) {
  EXPECT_GE(free_uplinks(), 2U);
}

TEST_F(Switches, UplinksAreSharedOutAndReleased) {
  ASSERT_EQ(create({.alias = "a", .uplink_count = 1}), QEX_OK);
  ASSERT_EQ(create({.alias = "b", .uplink_count = 3}), QEX_OK);
  EXPECT_THAT(uplinks("b"), testing::ElementsAre("nic1", "nic2", "nic3"));
  EXPECT_EQ(free_uplinks(), 0U);
  ASSERT_EQ(destroy("b"), QEX_OK);
  EXPECT_EQ(free_uplinks(), 3U);
  ASSERT_EQ(create({.alias = "c", .uplink_count = 2}), QEX_OK);
  EXPECT_THAT(uplinks("c"), testing::ElementsAre("nic1", "nic2"));
}

TEST_F(Switches, MoreUplinksThanAreFreeLeaveNothingBehind) {
  EXPECT_EQ(create({.alias = "a", .uplink_count = 5}), QEX_NO_RESOURCES);
  EXPECT_EQ(free_uplinks(), 4U);
  EXPECT_EQ(create({.alias = "a", .uplink_count = 4}), QEX_OK) << "the alias is still free";
}

TEST_F(Switches, UplinkPortsHaveNumbersOfTheirOwn) {
  ASSERT_EQ(create({.alias = "a", .uplink_count = 2}), QEX_OK);
  ASSERT_EQ(create({.alias = "b", .uplink_count = 2}), QEX_OK);
  ReadingTransaction transaction(store);
  std::vector<std::uint32_t> numbers{0};
  for (auto const *alias : {"a", "b"}) {
    for (auto const &uplink : simhost::uplinks_of(transaction, alias)) {
      numbers.push_back(static_cast<std::uint32_t>(uplink.port));
    }
  }
  std::sort(numbers.begin(), numbers.end());
  EXPECT_EQ(std::adjacent_find(numbers.begin(), numbers.end()), numbers.end());
  EXPECT_EQ(numbers.size(), 5U);
}

TEST_F(Switches, ADestroyedSwitchIsUnknown) {
  ASSERT_EQ(create({.alias = "a", .mtu = 9000}), QEX_OK);
  ASSERT_EQ(destroy("a"), QEX_OK);
  EXPECT_EQ(destroy("a"), QEX_NOT_FOUND);
  EXPECT_EQ(set_mtu("a", 1500), QEX_NOT_FOUND);
  EXPECT_EQ(status_of([&] { info("a"); }), QEX_NOT_FOUND);
  ASSERT_EQ(create({.alias = "a"}), QEX_OK);
  EXPECT_EQ(info("a").mtu, 1500U) << "nothing of the first one is left";
}

TEST_F(Switches, OtherKindsOfNameAreNoAlias) {
  ASSERT_EQ(create({.alias = "a", .identifier = "i", .portset = "p"}), QEX_OK);
  EXPECT_EQ(status_of([&] { info("i"); }), QEX_NOT_FOUND);
  EXPECT_EQ(status_of([&] { info("p"); }), QEX_NOT_FOUND);
  EXPECT_EQ(status_of([&] { info("A"); }), QEX_NOT_FOUND);
}

TEST_F(Switches, NamesTranslate) {
  ASSERT_EQ(create({.alias = "a", .identifier = "i", .portset = "p"}), QEX_OK);
  ReadingTransaction transaction(store);
  EXPECT_EQ(simhost::identifier_of(transaction, "a"), "i");
  EXPECT_EQ(simhost::portset_of(transaction, "a"), "p");
  EXPECT_EQ(simhost::alias_of_portset(transaction, "p"), "a");
  EXPECT_EQ(status_of([&] { simhost::alias_of_portset(transaction, "a"); }), QEX_NOT_FOUND);
}

}  // namespace
