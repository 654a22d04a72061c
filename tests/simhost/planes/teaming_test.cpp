// Links, groups of links, and which of them a port uses.
#include <gmock/gmock.h>

#include <cstddef>
#include <initializer_list>
#include <set>
#include <string>
#include <vector>

#include "model/options/runtime_options.h"
#include "model/uplinks/lags.h"
#include "plane.h"
#include "qexapi/switch_properties.h"
#include "vswitch/lags.h"
#include "vswitch/properties.h"
#include "vswitch/teaming.h"

namespace {

using simhost::Link;
using testing::ElementsAre;

struct Teams : Plane {
  static constexpr auto kSent = simhost::counter_in(&VSRARPStats::rarpPktsSent);
  static constexpr auto kTime = simhost::counter_in(&VSRARPStats::rarpTime);

  std::string hint(simhost::storage::Port const &port) {
    return simhost::running_plane().team_uplink(transaction, port);
  }
  void change(char const *uplink, void (*how)(Link &)) {
    auto link = simhost::get_wires().link_of(transaction, uplink);
    how(link);
    simhost::get_wires().change_link(transaction, uplink, link);
  }
  void down(char const *uplink) {
    change(uplink, [](Link &link) { link.carrier = false; });
  }
  void up(char const *uplink) {
    change(uplink, [](Link &link) { link.carrier = true; });
  }
  std::uint64_t counted(simhost::Counter const &counter) {
    return simhost::running_plane().counters(transaction, {.switch_key = key}).of(counter);
  }
};

VSTeamPolicy policy(std::initializer_list<char const *> active,
                    std::initializer_list<char const *> standby = {},
                    qex_uint32 balance = TEAM_FRP_TYPE_FO_EXPLICIT) {
  VSTeamPolicy made{};
  made.loadBalance = balance;
  made.linkCriteria = TEAM_FRP_CRIT_LINK_STATE;
  for (auto const *list : {&active, &standby}) {
    for (auto const *name : *list) {
      std::string(name).copy(made.uplinkPortName[made.numActive + made.numStandby], 80);
      ++(list == &active ? made.numActive : made.numStandby);
    }
  }
  return made;
}

TEST_F(Teams, WithoutAPolicyPortsSpreadOverAllUplinks) {
  std::set<std::string> used{hint(p1), hint(p2)};
  for (auto const *name : {"p3", "p4"}) {
    used.insert(hint(simhost::add_client_port(transaction, key, name)));
  }
  EXPECT_THAT(used, ElementsAre("nic0", "nic1", "nic2"));
}

TEST_F(Teams, TheSwitchsPolicyHoldsForAllPorts) {
  set_policy(of_switch(), VSPROP_SWITCH_TEAMING, policy({"uplink2"}, {"uplink1"}));
  EXPECT_EQ(hint(p1), "nic1");
  EXPECT_EQ(hint(p2), "nic1");
}

TEST_F(Teams, APortsOwnPolicyComesFirst) {
  set_policy(of_switch(), VSPROP_SWITCH_TEAMING, policy({"uplink2"}));
  set_policy(of(p1), VSPROP_PORT_TEAMING_POLICY, policy({"uplink3"}));
  EXPECT_EQ(hint(p1), "nic2");
  EXPECT_EQ(hint(p2), "nic1");
}

TEST_F(Teams, AStandbyUplinkStepsInAndBack) {
  set_policy(of_switch(), VSPROP_SWITCH_TEAMING, policy({"uplink1"}, {"uplink2", "uplink3"}));
  EXPECT_EQ(hint(p1), "nic0");
  down("nic0");
  EXPECT_EQ(hint(p1), "nic1");
  down("nic1");
  EXPECT_EQ(hint(p1), "nic2");
  up("nic0");
  EXPECT_EQ(hint(p1), "nic0");
}

TEST_F(Teams, ARollingTeamStaysWhereItIs) {
  auto rolling = policy({"uplink1"}, {"uplink2"});
  rolling.flags = TEAM_FRP_FLAG_ROLLING;
  set_policy(of_switch(), VSPROP_SWITCH_TEAMING, rolling);
  EXPECT_EQ(hint(p1), "nic0");
  simhost::step_clock(transaction, std::chrono::seconds(1));
  down("nic0");
  EXPECT_EQ(hint(p1), "nic1");
  simhost::step_clock(transaction, std::chrono::seconds(1));
  up("nic0");
  EXPECT_EQ(hint(p1), "nic1") << "nothing moves until it must";
  down("nic1");
  EXPECT_EQ(hint(p1), "nic0");
}

TEST_F(Teams, TheAdminSwitchTakesALinkDown) {
  set_policy(of_switch(), VSPROP_SWITCH_TEAMING, policy({"uplink1"}, {"uplink2"}));
  simhost::running_plane().set_admin_state(transaction, "nic0", false);
  EXPECT_FALSE(simhost::running_plane().link_is_up(transaction, "nic0"));
  EXPECT_EQ(hint(p1), "nic1");
  simhost::running_plane().set_admin_state(transaction, "nic0", true);
  EXPECT_TRUE(simhost::running_plane().link_is_up(transaction, "nic0"));
  EXPECT_EQ(hint(p1), "nic0");
}

TEST_F(Teams, AnUplinkIsUsedOnlyAfterTheUpDelay) {
  set_policy(of_switch(), VSPROP_SWITCH_TEAMING, policy({"uplink1"}, {"uplink2"}));
  simhost::set_runtime_option(transaction, VS_RT_OPT_TEAM_POLICY_UP_DELAY, 500);
  down("nic0");
  up("nic0");
  simhost::step_clock(transaction, std::chrono::milliseconds(499));
  EXPECT_EQ(hint(p1), "nic1");
  simhost::step_clock(transaction, std::chrono::milliseconds(1));
  EXPECT_EQ(hint(p1), "nic0");
}

TEST_F(Teams, CriteriaTakeUplinksOut) {
  auto fast = policy({"uplink1"}, {"uplink2"});
  fast.linkCriteria = TEAM_FRP_CRIT_LINK_SPEED_GTE;
  fast.speed = 10000;
  set_policy(of_switch(), VSPROP_SWITCH_TEAMING, fast);
  EXPECT_EQ(hint(p1), "nic0");
  change("nic0", [](Link &link) { link.speed = 1000; });
  EXPECT_EQ(hint(p1), "nic1");
  fast.linkCriteria = TEAM_FRP_CRIT_LINK_SPEED;
  fast.speed = 1000;
  set_policy(of_switch(), VSPROP_SWITCH_TEAMING, fast);
  EXPECT_EQ(hint(p1), "nic0");
  fast.linkCriteria = TEAM_FRP_CRIT_LINK_DUPLEX;
  fast.fullDuplex = 1;
  change("nic0", [](Link &link) { link.full_duplex = false; });
  set_policy(of_switch(), VSPROP_SWITCH_TEAMING, fast);
  EXPECT_EQ(hint(p1), "nic1");
}

// Each criterion takes an uplink out for its own reason, and only where a policy names it.
TEST_F(Teams, CriteriaLookAtWhatAnUplinkIsLike) {
  struct {
    qex_uint32 criterion;
    void (*spoil)(Link &);
  } const cases[] = {
      {TEAM_FRP_CRIT_BEACON_STATE, [](Link &link) { link.beacons = false; }},
      {TEAM_FRP_CRIT_LINK_ERR, [](Link &link) { link.error_percent = 6; }},
      {TEAM_FRP_CRIT_DRV_PRESENT, [](Link &link) { link.driver = false; }},
  };
  for (auto const &[criterion, spoil] : cases) {
    auto careful = policy({"uplink1"}, {"uplink2"});
    careful.percentError = 5;
    change("nic0", spoil);
    set_policy(of_switch(), VSPROP_SWITCH_TEAMING, careful);
    EXPECT_EQ(hint(p1), "nic0") << "criterion " << criterion << " is not asked for";
    careful.linkCriteria |= criterion;
    set_policy(of_switch(), VSPROP_SWITCH_TEAMING, careful);
    EXPECT_EQ(hint(p1), "nic1") << "criterion " << criterion;
    change("nic0", [](Link &link) { link = Link{}; });
    EXPECT_EQ(hint(p1), "nic0") << "criterion " << criterion;
  }
}

TEST_F(Teams, AnUplinkFailsWithMoreErrorsThanThePolicyBears) {
  auto careful = policy({"uplink1"}, {"uplink2"});
  careful.linkCriteria = TEAM_FRP_CRIT_LINK_ERR;
  careful.percentError = 5;
  set_policy(of_switch(), VSPROP_SWITCH_TEAMING, careful);
  change("nic0", [](Link &link) { link.error_percent = 5; });
  EXPECT_EQ(hint(p1), "nic0");
  change("nic0", [](Link &link) { link.error_percent = 6; });
  EXPECT_EQ(hint(p1), "nic1");
}

TEST_F(Teams, ABlockedUplinkPortIsNotUsedWhereItIsACriterion) {
  auto const uplink_port = simhost::get_port(transaction, key, "uplink1");
  set_policy(of_switch(), VSPROP_SWITCH_TEAMING, policy({"uplink1"}, {"uplink2"}));
  simhost::set_property(transaction, of(uplink_port), QEX_NEBPROP_PORT_BLOCK,
                        std::vector{std::byte{1}});
  EXPECT_EQ(hint(p1), "nic0");
  auto careful = policy({"uplink1"}, {"uplink2"});
  careful.linkCriteria = TEAM_FRP_CRIT_PORT_BLOCKED;
  set_policy(of_switch(), VSPROP_SWITCH_TEAMING, careful);
  EXPECT_EQ(hint(p1), "nic1");
}

TEST_F(Teams, APolicyNamesUplinkPortsByTheirNames) {
  auto const uplink_port = simhost::get_port(transaction, key, "uplink2");
  simhost::set_property(transaction, of(uplink_port), QEX_NEBPROP_PORT_ALIAS,
                        simhost::bytes_of_text("right"));
  for (auto const *name : {"right", "uplink2", "nic1"}) {
    set_policy(of_switch(), VSPROP_SWITCH_TEAMING, policy({name}));
    EXPECT_EQ(hint(p1), "nic1") << name;
  }
}

TEST_F(Teams, AnOverrideBindsAPort) {
  set_policy(of_switch(), VSPROP_SWITCH_TEAMING, policy({"uplink1"}));
  simhost::set_property(transaction, of(p1), VSPROP_PORT_TEAMING_OVERRIDE,
                        simhost::bytes_of_text("uplink3"));
  EXPECT_EQ(hint(p1), "nic2");
  EXPECT_EQ(hint(p2), "nic0");
  down("nic2");
  EXPECT_EQ(status_of([&] { hint(p1); }), QEX_ENETDOWN) << "whatever its teaming says";
}

TEST_F(Teams, TheStatusSaysWhyThereIsNoUplink) {
  for (auto const *uplink : {"nic0", "nic1", "nic2"}) {
    down(uplink);
  }
  EXPECT_EQ(status_of([&] { hint(p1); }), QEX_ENETDOWN);
  simhost::create_switch(transaction, {.alias = "alone"});
  auto const port =
      simhost::add_client_port(transaction, simhost::get_switch(transaction, "alone").key, "p");
  EXPECT_EQ(status_of([&] { hint(port); }), QEX_ENETUNREACH);
  EXPECT_EQ(status_of([&] { hint(simhost::get_port(transaction, key, "uplink1")); }),
            QEX_NOT_SUPPORTED);
}

TEST_F(Teams, MovesAreAnnounced) {
  auto notifying = policy({"uplink1"}, {"uplink2"});
  notifying.flags = TEAM_FRP_FLAG_NOTIFY_SWITCH;
  set_policy(of_switch(), VSPROP_SWITCH_TEAMING, notifying);
  set_policy(of(p2), VSPROP_PORT_TEAMING_POLICY, policy({"uplink1"}, {"uplink2"}));
  down("nic0");
  EXPECT_EQ(counted(kSent), 1U) << "the policy of p2 does not ask for it";
  EXPECT_EQ(counted(kTime), 1000000U);
  down("nic2");
  EXPECT_EQ(counted(kSent), 1U) << "nothing moved";
  up("nic0");
  EXPECT_EQ(counted(kSent), 2U);
  simhost::set_runtime_option(transaction, VS_RT_OPT_MAX_RARPS_PER_INTERVAL, 0);
  down("nic0");
  EXPECT_EQ(counted(kSent), 2U);
}

TEST_F(Teams, ASwitchThatDoesNotRunAnnouncesNothing) {
  auto notifying = policy({"uplink1"}, {"uplink2"});
  notifying.flags = TEAM_FRP_FLAG_NOTIFY_SWITCH;
  set_policy(of_switch(), VSPROP_SWITCH_TEAMING, notifying);
  simhost::change_running(transaction, key, false);
  down("nic0");
  EXPECT_EQ(counted(kSent), 0U);
  EXPECT_EQ(hint(p1), "nic1");
}

struct Lags : Teams {
  std::vector<simhost::Lag> lags() { return simhost::lags_of(transaction, key); }
  QEX_ReturnStatus put(std::string const &name, std::vector<std::string> const &uplinks) {
    return status_of([&] { simhost::put_lag(transaction, key, name, uplinks); });
  }
};

TEST_F(Lags, AreUpWhileAnUplinkIs) {
  ASSERT_EQ(put("lag1", {"nic0", "nic1"}), QEX_OK);
  EXPECT_TRUE(simhost::running_plane().lacp_is_up(transaction, "nic0"));
  EXPECT_FALSE(simhost::running_plane().lacp_is_up(transaction, "nic2")) << "it is in no group";
  down("nic0");
  EXPECT_TRUE(lags().at(0).up());
  EXPECT_FALSE(lags().at(0).members.at(0).up);
  EXPECT_TRUE(lags().at(0).members.at(1).up);
  change("nic1", [](Link &link) { link.partner = false; });
  EXPECT_FALSE(lags().at(0).up());
  EXPECT_TRUE(simhost::running_plane().link_is_up(transaction, "nic1"));
  EXPECT_FALSE(simhost::running_plane().lacp_is_up(transaction, "nic1"));
}

TEST_F(Lags, MayBeInATeam) {
  ASSERT_EQ(put("lag1", {"nic1", "nic2"}), QEX_OK);
  set_policy(of_switch(), VSPROP_SWITCH_TEAMING, policy({"lag1"}, {"uplink1"}));
  EXPECT_THAT((std::set<std::string>{hint(p1), hint(p2)}), ElementsAre("nic1", "nic2"));
  down("nic1");
  EXPECT_EQ(hint(p1), "nic2");
  EXPECT_EQ(hint(p2), "nic2");
  down("nic2");
  EXPECT_EQ(hint(p1), "nic0");
}

TEST_F(Lags, AreChecked) {
  EXPECT_EQ(put("", {}), QEX_BAD_PARAM);
  EXPECT_EQ(put(std::string(67, 'l'), {}), QEX_OK);
  EXPECT_EQ(put(std::string(68, 'l'), {}), QEX_NAME_TOO_LONG);
  EXPECT_EQ(put("lag1", {"nic3"}), QEX_NOT_FOUND) << "it is not at this switch";
  EXPECT_EQ(put("lag1", {"nic0"}), QEX_OK);
  EXPECT_EQ(put("lag2", {"nic0"}), QEX_BUSY);
  EXPECT_EQ(put("lag1", {"nic0", "nic1"}), QEX_OK) << "a group may get other uplinks";
}

TEST_F(Lags, AreLimited) {
  for (int number = 0; number < VS_MAX_LAGS; ++number) {
    ASSERT_EQ(put("lag" + std::to_string(number), {}), QEX_OK);
  }
  EXPECT_EQ(put("one more", {}), QEX_LIMIT_EXCEEDED);
  EXPECT_EQ(put("lag0", {"nic0"}), QEX_OK);
}

TEST_F(Lags, LoseTheUplinksThatLeaveTheSwitch) {
  ASSERT_EQ(put("lag1", {"nic0", "nic1"}), QEX_OK);
  simhost::remove_uplink_port(transaction, key, "nic0");
  ASSERT_EQ(lags().at(0).members.size(), 1U);
  EXPECT_EQ(lags().at(0).members.at(0).uplink, "nic1");
}

}  // namespace
