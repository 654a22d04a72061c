// MAC tables: what is learned, what ages when, what has no room.
#include <gmock/gmock.h>

#include <cstring>
#include <vector>

#include "model/options/host_settings.h"
#include "plane.h"
#include "vswitch/mac_learning.h"
#include "vswitch/port_mac_policies.h"
#include "vswitch/properties.h"

namespace {

using simhost::Place;
using simhost::Sighting;
using std::chrono::milliseconds;
using std::chrono::seconds;

Sighting learn(simhost::storage::ChangingTransaction &transaction, Place const &place,
               VSMACEntry const &source) {
  return simhost::get_wires().learn(transaction, place, source);
}

VSMACEntry entry(unsigned char last, VSMACAddrType type = VS_MAC_ADDR_TYPE_USER,
                 qex_VlanID vid = 0) {
  VSMACEntry made{};
  made.macAddress[0] = 0x02;
  made.macAddress[5] = last;
  made.macAddrType = type;
  made.vid = vid;
  return made;
}

struct MacTables : Plane {
  MacTables() {
    at1 = {.switch_key = key, .port = p1.number};
    at2 = {.switch_key = key, .port = p2.number};
    team = {.switch_key = key, .port = std::nullopt};
    set_learning(p1, 4096, VSPORT_MAC_LEARNING_LIMIT_POLICY_ALLOW);
    set_learning(p2, 4096, VSPORT_MAC_LEARNING_LIMIT_POLICY_ALLOW);
  }

  void set_learning(simhost::storage::Port const &port, qex_uint32 limit,
                    VSPortMACLearningLimitPolicy limit_policy, bool on = true) {
    VSPMACManagement management{};
    management.portMACLearning.learning = static_cast<qex_Bool>(on);
    management.portMACLearning.macLimit = limit;
    management.portMACLearning.macLimitPolicy = limit_policy;
    set_policy(of(port), VSPROP_PORT_MAC_MANAGEMENT, management);
  }
  void set_switch_learning(unsigned aging, qex_uint32 limit, unsigned learn_static = 0) {
    VSMACLearning learning{};
    learning.agingTime = aging & 0xFFFFFFU;
    learning.learnStatic = learn_static & 1U;
    learning.macLimit = limit;
    set_policy(of_switch(), VSPROP_SWITCH_MAC_LEARNING, learning);
  }

  /// The last bytes of the addresses at a place.
  std::vector<int> at(Place const &place, VSMACAddrType type = VS_MAC_ADDR_TYPE_ALL) {
    std::vector<int> lasts;
    for (auto const &found : simhost::running_plane().addresses(transaction, place, type)) {
      lasts.push_back(found.macAddress[5]);
    }
    return lasts;
  }
  QEX_ReturnStatus put(Place const &place, VSMACEntry const &wanted) {
    return status_of([&] { simhost::running_plane().put_address(transaction, place, wanted); });
  }
  QEX_ReturnStatus remove(Place const &place, VSMACEntry const &wanted) {
    return status_of([&] { simhost::running_plane().remove_address(transaction, place, wanted); });
  }

  Place at1;
  Place at2;
  Place team;
};

using testing::ElementsAre;
using testing::IsEmpty;

TEST_F(MacTables, LearnWhereAnAddressIs) {
  EXPECT_EQ(learn(transaction, at1, entry(1)), Sighting::learned);
  EXPECT_EQ(learn(transaction, at1, entry(1)), Sighting::refreshed);
  EXPECT_EQ(learn(transaction, team, entry(9)), Sighting::learned);
  EXPECT_THAT(at(at1), ElementsAre(1));
  EXPECT_THAT(at(at2), IsEmpty());
  EXPECT_THAT(at(team), ElementsAre(9));
}

TEST_F(MacTables, EntriesSayWhatIsKnown) {
  learn(transaction, at1, entry(1, VS_MAC_ADDR_TYPE_LEARNED, 42));
  simhost::step_clock(transaction, milliseconds(2999));
  auto const found =
      simhost::running_plane().addresses(transaction, at1, VS_MAC_ADDR_TYPE_ALL).at(0);
  EXPECT_EQ(std::memcmp(found.macAddress, entry(1).macAddress, sizeof found.macAddress), 0);
  EXPECT_EQ(found.macAddrType, VS_MAC_ADDR_TYPE_LEARNED);
  EXPECT_EQ(found.aging, 1);
  EXPECT_EQ(qex_VlanID{found.vid}, 42);
  EXPECT_EQ(qex_uint32{found.elapsed}, 2U);
}

TEST_F(MacTables, VlansAndNetworksAreApart) {
  learn(transaction, at1, entry(1, VS_MAC_ADDR_TYPE_LEARNED, 1));
  EXPECT_EQ(learn(transaction, at2, entry(1, VS_MAC_ADDR_TYPE_LEARNED, 2)), Sighting::learned);
  auto overlay = entry(1, VS_MAC_ADDR_TYPE_LEARNED, 1);
  overlay.vni = 7;
  EXPECT_EQ(learn(transaction, at2, overlay), Sighting::learned);
  EXPECT_THAT(at(at2), ElementsAre(1, 1));
}

TEST_F(MacTables, AgeToTheMillisecond) {
  learn(transaction, at1, entry(1));
  simhost::step_clock(transaction, seconds(300) - milliseconds(1));
  EXPECT_THAT(at(at1), ElementsAre(1));
  simhost::step_clock(transaction, milliseconds(1));
  EXPECT_THAT(at(at1), IsEmpty());
  EXPECT_EQ(static_cast<qex_uint64>(
                simhost::running_plane().learning_stats(transaction, at1).numMACsLearned),
            0U);
  EXPECT_EQ(learn(transaction, at1, entry(1)), Sighting::learned) << "it is new again";
}

TEST_F(MacTables, AFrameMakesAnAddressYoung) {
  learn(transaction, at1, entry(1));
  simhost::step_clock(transaction, seconds(299));
  learn(transaction, at1, entry(1));
  simhost::step_clock(transaction, seconds(299));
  EXPECT_THAT(at(at1), ElementsAre(1));
}

TEST_F(MacTables, AgeByTheSwitchsTimeBeforeTheHosts) {
  learn(transaction, at1, entry(1));
  simhost::set_global_mac_learning(transaction,
                                   {.agingTime = 20, .macLimit = 10, .learnStatic = 0});
  simhost::step_clock(transaction, seconds(19));
  EXPECT_THAT(at(at1), ElementsAre(1));
  simhost::step_clock(transaction, seconds(1));
  EXPECT_THAT(at(at1), IsEmpty());
  set_switch_learning(21, 10);
  EXPECT_THAT(at(at1), ElementsAre(1)) << "nobody had looked";
  simhost::step_clock(transaction, seconds(1));
  EXPECT_THAT(at(at1), IsEmpty());
}

TEST_F(MacTables, WhatDoesNotAgeStays) {
  ASSERT_EQ(put(at1, entry(1)), QEX_OK);
  auto ageing = entry(2);
  ageing.aging = 1;
  ASSERT_EQ(put(at1, ageing), QEX_OK);
  simhost::step_clock(transaction, seconds(300));
  EXPECT_THAT(at(at1), ElementsAre(1));
}

TEST_F(MacTables, AskForOneTypeOrAll) {
  put(at1, entry(1, VS_MAC_ADDR_TYPE_STATIC));
  put(at1, entry(2, VS_MAC_ADDR_TYPE_USER));
  learn(transaction, at1, entry(3));
  EXPECT_THAT(at(at1, VS_MAC_ADDR_TYPE_STATIC), ElementsAre(1));
  EXPECT_THAT(at(at1, VS_MAC_ADDR_TYPE_USER), ElementsAre(2));
  EXPECT_THAT(at(at1, VS_MAC_ADDR_TYPE_LEARNED), ElementsAre(3));
  EXPECT_THAT(at(at1), ElementsAre(1, 2, 3));
}

TEST_F(MacTables, MovesAreCountedWhereTheyGo) {
  learn(transaction, at1, entry(1));
  EXPECT_EQ(learn(transaction, at2, entry(1)), Sighting::moved);
  EXPECT_THAT(at(at1), IsEmpty());
  EXPECT_THAT(at(at2), ElementsAre(1));
  EXPECT_EQ(static_cast<qex_uint64>(
                simhost::running_plane().learning_stats(transaction, at1).numMACsMoved),
            0U);
  EXPECT_EQ(static_cast<qex_uint64>(
                simhost::running_plane().learning_stats(transaction, at2).numMACsMoved),
            1U);
  EXPECT_EQ(learn(transaction, team, entry(1)), Sighting::moved);
  EXPECT_EQ(learn(transaction, at2, entry(1)), Sighting::moved);
  EXPECT_EQ(static_cast<qex_uint64>(
                simhost::running_plane().learning_stats(transaction, at2).numMACsMoved),
            2U);
}

TEST_F(MacTables, AUsersAddressDoesNotMove) {
  put(at1, entry(1, VS_MAC_ADDR_TYPE_USER));
  EXPECT_EQ(learn(transaction, at2, entry(1)), Sighting::fixed_elsewhere);
  EXPECT_EQ(learn(transaction, at1, entry(1)), Sighting::refreshed);
  EXPECT_THAT(at(at1, VS_MAC_ADDR_TYPE_USER), ElementsAre(1));
}

TEST_F(MacTables, AStaticAddressMovesIfTheSwitchLearnsStaticOnes) {
  put(at1, entry(1, VS_MAC_ADDR_TYPE_STATIC));
  EXPECT_EQ(learn(transaction, at2, entry(1)), Sighting::fixed_elsewhere);
  set_switch_learning(300, 100, 1);
  EXPECT_EQ(learn(transaction, at2, entry(1)), Sighting::moved);
  EXPECT_THAT(at(at2, VS_MAC_ADDR_TYPE_LEARNED), ElementsAre(1));
}

TEST_F(MacTables, APortThatDoesNotLearn) {
  set_learning(p1, 4096, VSPORT_MAC_LEARNING_LIMIT_POLICY_ALLOW, false);
  EXPECT_EQ(learn(transaction, at1, entry(1)), Sighting::learning_off);
  EXPECT_THAT(at(at1), IsEmpty());
}

TEST_F(MacTables, AFullPortFollowsItsPolicy) {
  set_learning(p1, 2, VSPORT_MAC_LEARNING_LIMIT_POLICY_ALLOW);
  learn(transaction, at1, entry(1));
  learn(transaction, at1, entry(2));
  EXPECT_EQ(learn(transaction, at1, entry(3)), Sighting::let_through);
  EXPECT_EQ(learn(transaction, at1, entry(2)), Sighting::refreshed);
  set_learning(p1, 2, VSPORT_MAC_LEARNING_LIMIT_POLICY_DROP);
  EXPECT_EQ(learn(transaction, at1, entry(3)), Sighting::dropped);
  EXPECT_EQ(learn(transaction, at1, entry(4)), Sighting::dropped);
  EXPECT_THAT(at(at1), ElementsAre(1, 2));
  auto const stats = simhost::running_plane().learning_stats(transaction, at1);
  EXPECT_EQ(stats.numMACsLearned, 2U);
  EXPECT_EQ(qex_uint64{stats.noLearningAllowedPkts}, 1U);
  EXPECT_EQ(qex_uint64{stats.noLearningDroppedPkts}, 2U);
}

TEST_F(MacTables, AgeingMakesRoom) {
  set_learning(p1, 1, VSPORT_MAC_LEARNING_LIMIT_POLICY_DROP);
  learn(transaction, at1, entry(1));
  simhost::step_clock(transaction, seconds(300));
  EXPECT_EQ(learn(transaction, at1, entry(2)), Sighting::learned);
}

TEST_F(MacTables, TheSwitchHasALimitForAllItsPlaces) {
  set_switch_learning(300, 2);
  learn(transaction, at1, entry(1));
  learn(transaction, team, entry(2));
  EXPECT_EQ(learn(transaction, at2, entry(3)), Sighting::let_through);
  EXPECT_EQ(learn(transaction, team, entry(3)), Sighting::let_through);
  EXPECT_EQ(learn(transaction, at2, entry(1)), Sighting::moved) << "it takes no more room there";
}

// The counts are kept beside the addresses, so every way in which one comes, goes or changes
// counts.
TEST_F(MacTables, CountsFollowEveryChange) {
  auto const counted = [&](Place const &place) {
    return qex_uint32{simhost::running_plane().learning_stats(transaction, place).numMACsLearned};
  };
  auto const learned = [&](std::initializer_list<unsigned char> lasts, Place const &place) {
    for (auto const last : lasts) {
      learn(transaction, place, entry(last));
    }
  };
  learned({1, 2, 3}, at1);
  learned({4}, team);
  EXPECT_EQ(counted(at1), 3U);
  EXPECT_EQ(counted(team), 1U);
  learned({3}, at2);
  EXPECT_EQ(counted(at1), 2U) << "one moved";
  EXPECT_EQ(counted(at2), 1U);
  put(at1, entry(1, VS_MAC_ADDR_TYPE_STATIC));
  EXPECT_EQ(counted(at1), 1U) << "one became static";
  put(at1, entry(4, VS_MAC_ADDR_TYPE_USER));
  EXPECT_EQ(counted(team), 0U) << "one gave way";
  remove(at1, entry(2, VS_MAC_ADDR_TYPE_LEARNED));
  EXPECT_EQ(counted(at1), 0U) << "one was removed";
  simhost::step_clock(transaction, seconds(299));
  learned({5}, at2);
  simhost::step_clock(transaction, seconds(1));
  EXPECT_EQ(counted(at2), 1U) << "one is too old and still in the table";
  learned({5}, at2);
  EXPECT_EQ(counted(at2), 1U) << "and then it is not";
  set_switch_learning(300, 1);
  EXPECT_NE(learn(transaction, at2, entry(6)), Sighting::learned) << "the switch has its one";
  simhost::remove_port(transaction, p2);
  EXPECT_EQ(learn(transaction, at1, entry(6)), Sighting::learned) << "it went with its port";
  simhost::running_plane().restart(transaction);
  EXPECT_EQ(counted(at1), 0U);
  EXPECT_EQ(learn(transaction, at1, entry(7)), Sighting::learned);
}

TEST_F(MacTables, AUserPutsAndTakesAddresses) {
  EXPECT_EQ(put(at1, entry(1)), QEX_OK);
  EXPECT_EQ(put(at1, entry(1)), QEX_OK);
  EXPECT_EQ(put(at2, entry(1)), QEX_EXISTS);
  learn(transaction, at2, entry(2));
  EXPECT_EQ(put(at1, entry(2)), QEX_OK) << "a learned address gives way";
  EXPECT_THAT(at(at1), ElementsAre(1, 2));
  EXPECT_EQ(remove(at2, entry(1)), QEX_NOT_FOUND);
  EXPECT_EQ(remove(at1, entry(1, VS_MAC_ADDR_TYPE_STATIC)), QEX_NOT_FOUND);
  EXPECT_EQ(remove(at1, entry(1)), QEX_OK);
  EXPECT_EQ(remove(at1, entry(1)), QEX_NOT_FOUND);
  EXPECT_EQ(remove(at1, entry(2, VS_MAC_ADDR_TYPE_ALL)), QEX_OK);
  learn(transaction, at1, entry(3));
  EXPECT_EQ(remove(at1, entry(3, VS_MAC_ADDR_TYPE_LEARNED)), QEX_OK);
}

TEST_F(MacTables, AddressesAreChecked) {
  auto const bad = [](auto const &spoil) {
    auto made = entry(1);
    spoil(made);
    return made;
  };
  EXPECT_EQ(put(at1, bad([](auto &e) { e.macAddress[0] = 0x01; })), QEX_INVALID_ADDRESS);
  EXPECT_EQ(put(at1, bad([](auto &e) { std::memset(e.macAddress, 0, 6); })), QEX_INVALID_ADDRESS);
  EXPECT_EQ(put(at1, bad([](auto &e) { e.vid = 4094; })), QEX_OK);
  EXPECT_EQ(put(at1, bad([](auto &e) { e.vid = 4095; })), QEX_BAD_VLANID);
  EXPECT_EQ(put(at1, bad([](auto &e) { e.vni = 0xFFFFFF; })), QEX_OK);
  EXPECT_EQ(put(at1, bad([](auto &e) { e.vni = 0x1000000; })), QEX_BAD_PARAM);
  EXPECT_EQ(put(at1, entry(1, VS_MAC_ADDR_TYPE_LEARNED)), QEX_BAD_PARAM);
  EXPECT_EQ(put(at1, entry(1, VS_MAC_ADDR_TYPE_ALL)), QEX_BAD_PARAM);
}

TEST_F(MacTables, GoWithTheirPort) {
  learn(transaction, at1, entry(1));
  simhost::remove_port(transaction, p1);
  EXPECT_EQ(learn(transaction, at2, entry(1)), Sighting::learned);
}

TEST_F(MacTables, GlobalPropertiesAreChecked) {
  EXPECT_EQ(status_of([&] {
              simhost::set_global_mac_learning(transaction,
                                               {.agingTime = 0, .macLimit = 1, .learnStatic = 0});
            }),
            QEX_BAD_PARAM);
  EXPECT_EQ(status_of([&] {
              simhost::set_global_mac_learning(
                  transaction, {.agingTime = 1000001, .macLimit = 1, .learnStatic = 0});
            }),
            QEX_BAD_PARAM);
  auto const props = simhost::global_mac_learning(transaction);
  EXPECT_EQ(qex_uint32{props.agingTime}, 300U);
  EXPECT_EQ(qex_uint32{props.macLimit}, 65536U);
  EXPECT_EQ(props.learnStatic, 0);
}

}  // namespace
