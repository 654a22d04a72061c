// What is chosen by load stays chosen, for whoever comes next too.
#include "daemon/load/load_balance.h"

#include <gmock/gmock.h>

#include "memory_state.h"
#include "named_switch.h"
#include "planes/openvswitch/compile/pipeline.h"
#include "storage/running/counters.h"
#include "storage/running/readings.h"
#include "temporary_folder.h"

namespace {

using namespace simhost;
using daemon::LoadBalance;
using storage::ChangingTransaction;
using storage::ReadingTransaction;

struct PortsByLoad : testing::Test {
  static constexpr std::uint64_t kMegabyte = 1'000'000;

  PortsByLoad() {
    run_on(stored::plane());
    ChangingTransaction transaction(store);
    key = storage::add_switch(transaction, named("s")).value();
    storage::put_readings(transaction, key, {});
    for (auto const *name : {"p0", "p1", "p2", "p3"}) {
      numbers.push_back(static_cast<std::uint32_t>(
          *storage::add_port(transaction, key, name, storage::PortKind::client)));
    }
    transaction.commit();
  }

  // Which of the two uplinks each port uses.
  std::vector<std::uint32_t> followed(LoadBalance &load) {
    openvswitch::Network network;
    network.teams.push_back({.balance = openvswitch::Balance::share,
                             .in_use = {{1}, {2}},
                             .standby = {},
                             .goes_by_load = true});
    for (auto const number : numbers) {
      openvswitch::Port port;
      port.number = number;
      port.share = 0;
      port.team = 0;
      network.ports.push_back(port);
    }
    ReadingTransaction transaction(store);
    load.follow(transaction, key, network);
    std::vector<std::uint32_t> shares;
    for (auto const &port : network.ports) {
      shares.push_back(port.share % 2);
    }
    return shares;
  }

  // Each port has sent so much in all.
  void count(LoadBalance &load, std::uint64_t bytes) const {
    openvswitch::Totals totals;
    for (auto const number : numbers) {
      totals[openvswitch::cookie(openvswitch::Counted::in_unicast, number)] = {.packets = 1,
                                                                               .bytes = bytes};
    }
    load.count(key, totals);
  }

  // All send as much by one uplink, and then some by the other.
  void move_some(LoadBalance &load) {
    followed(load);
    count(load, 0);
    load.choose();
    count(load, kMegabyte);
    ASSERT_TRUE(load.choose());
  }

  storage::SwitchKey key{};
  std::vector<std::uint32_t> numbers;
  TemporaryFolder folder;
  // In a file, so that somebody else can write to it.
  storage::Store store{folder.file("host.db"), MemoryState::populate};
};

TEST_F(PortsByLoad, KeepWhatWasChosen) {
  LoadBalance load(store);
  EXPECT_THAT(followed(load), testing::Each(0));
  move_some(load);
  auto const chosen = followed(load);
  EXPECT_THAT(chosen, testing::Contains(1));
  EXPECT_TRUE(load.save());
  EXPECT_EQ(followed(load), chosen);
  LoadBalance next(store);
  EXPECT_EQ(followed(next), chosen);
}

TEST_F(PortsByLoad, AreNotMovedForWhatWasCountedBefore) {
  LoadBalance load(store);
  followed(load);
  count(load, 9 * kMegabyte);
  EXPECT_FALSE(load.choose());
  count(load, 9 * kMegabyte);
  EXPECT_FALSE(load.choose());
  count(load, 10 * kMegabyte);
  EXPECT_TRUE(load.choose());
}

TEST_F(PortsByLoad, BeginAnewWhenTheHostDoes) {
  LoadBalance load(store);
  move_some(load);
  EXPECT_TRUE(load.save());
  ChangingTransaction transaction(store);
  storage::remove_chosen_shares(transaction);
  transaction.commit();
  EXPECT_THAT(followed(load), testing::Each(0));
}

TEST_F(PortsByLoad, AreNotGivenWhatWasChosenBeforeTheHostBeganAnew) {
  LoadBalance load(store);
  move_some(load);
  {
    ChangingTransaction transaction(store);
    storage::remove_counters(transaction);
    transaction.commit();
  }
  EXPECT_TRUE(load.save());
  EXPECT_THAT(followed(load), testing::Each(0));
}

TEST_F(PortsByLoad, AreMovedOnWhileTheStateIsWritten) {
  LoadBalance load(store);
  move_some(load);
  {
    storage::Store other(folder.file("host.db"), MemoryState::populate);
    ChangingTransaction const writing(other);
    EXPECT_FALSE(load.save()) << "nobody waits for that";
    EXPECT_THAT(followed(load), testing::Contains(1));
  }
  EXPECT_TRUE(load.save());
  LoadBalance another(store);
  EXPECT_THAT(followed(another), testing::Contains(1));
}

}  // namespace
