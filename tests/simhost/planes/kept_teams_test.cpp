// What is kept of a team against what is worked out anew: after whatever change, by whichever
// process.
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <functional>
#include <random>
#include <string>
#include <vector>

#include "base/outcomes.h"
#include "clock/clock.h"
#include "model/lookup.h"
#include "model/options/runtime_options.h"
#include "model/ports/ports.h"
#include "model/properties/properties.h"
#include "model/switches/switches.h"
#include "model/uplinks/lags.h"
#include "planes/stored/counters.h"
#include "planes/stored/links.h"
#include "planes/stored/stored_plane.h"
#include "planes/stored/teaming.h"
#include "qexapi/switch_properties.h"
#include "storage/running/host_settings.h"
#include "storage/store.h"
#include "temporary_folder.h"
#include "vswitch/properties.h"

namespace {

using simhost::Link;
using simhost::storage::ChangingTransaction;
using simhost::storage::PropertyOwner;
using simhost::storage::ReadingTransaction;
using simhost::storage::Store;
using simhost::storage::Transaction;
using simhost::stored::Teaming;

constexpr std::array kUplinks{"nic0", "nic1", "nic2", "nic3"};
constexpr auto kSent = simhost::counter_in(&VSRARPStats::rarpPktsSent);

// A process: its connection, and what it keeps.
struct Process {
  explicit Process(std::filesystem::path const &file)
      : store(file, [](ChangingTransaction &transaction) {
          for (auto const *uplink : kUplinks) {
            simhost::storage::add_uplink(transaction, uplink);
          }
        }) {}

  Store store;
  Teaming teaming;
};

std::string uplink_or_refusal(Teaming &teaming, Transaction &transaction,
                              simhost::storage::Port const &port) {
  try {
    return teaming.uplink_of(transaction, port);
  } catch (simhost::Refused const &refused) {
    return std::to_string(refused.status());
  }
}

// Changes of a switch "s", each with what is drawn for it.
class Changes {
 public:
  explicit Changes(std::uint32_t seed) : random_(seed) {}

  /// Makes one change; tells how many announcements it must have made.
  std::uint64_t make(ChangingTransaction &transaction, Teaming &teaming) {
    auto const key = simhost::get_switch(transaction, "s").key;
    try {
      return any(transaction, teaming, key);
    } catch (simhost::Refused const &) {
      return 0;
    }
  }

  std::uint32_t below(std::uint32_t bound) { return random_() % bound; }

 private:
  std::uint64_t any(ChangingTransaction &transaction, Teaming &teaming,
                    simhost::storage::SwitchKey key) {
    auto const of_switch = PropertyOwner::global(key);
    switch (below(14)) {
      case 0:
      case 1:
      case 2:
      case 12:
      case 13:
        return change_link(transaction, teaming, key);
      case 3:
        simhost::set_property(transaction, of_switch, VSPROP_SWITCH_TEAMING, policy());
        return 0;
      case 4:
        simhost::reset_property(transaction, of_switch, VSPROP_SWITCH_TEAMING);
        return 0;
      case 5:
        simhost::set_property(transaction, client(transaction, key), VSPROP_PORT_TEAMING_POLICY,
                              policy());
        return 0;
      case 6:
        simhost::set_property(transaction, client(transaction, key), VSPROP_PORT_TEAMING_OVERRIDE,
                              simhost::bytes_of_text(uplink()));
        return 0;
      case 7:
        simhost::reset_property(
            transaction, client(transaction, key),
            below(2) == 0 ? VSPROP_PORT_TEAMING_POLICY : VSPROP_PORT_TEAMING_OVERRIDE);
        return 0;
      case 8:
        change_uplink_ports(transaction, key);
        return 0;
      case 9:
        change_group(transaction, key);
        return 0;
      case 10:
        change_ports(transaction, key);
        return 0;
      default:
        change_host(transaction);
        return 0;
    }
  }

  std::uint64_t change_link(ChangingTransaction &transaction, Teaming &teaming,
                            simhost::storage::SwitchKey key) {
    auto const name = uplink();
    auto link = simhost::stored::link_of(transaction, name);
    std::array<bool Link::*, 4> const flags{&Link::carrier, &Link::admin, &Link::partner,
                                            &Link::driver};
    auto const flag = flags.at(below(flags.size()));
    link.*flag = !(link.*flag);
    auto const before = carriers(transaction, key);
    teaming.change_link(transaction, name, link);
    auto const after = carriers(transaction, key);
    auto const at = simhost::storage::find_uplink(transaction, name)->port;
    if (!at || simhost::get_port(transaction, *at).switch_key != key) {
      return 0;
    }
    std::uint64_t moved = 0;
    for (std::size_t port = 0; port < after.size(); ++port) {
      bool const carried = after[port].uplink.find("nic") == 0;
      moved += carried && after[port].announces && after[port].uplink != before[port].uplink;
    }
    return std::min<std::uint64_t>(moved, static_cast<std::uint64_t>(simhost::runtime_number(
                                              transaction, VS_RT_OPT_MAX_RARPS_PER_INTERVAL)));
  }

  struct Carried {
    std::string uplink;
    bool announces;
  };

  static bool announces(Transaction &transaction, PropertyOwner const &switch_owner,
                        PropertyOwner const &port) {
    auto property = simhost::find_property(transaction, port, VSPROP_PORT_TEAMING_POLICY);
    if (!property) {
      property = simhost::find_property(transaction, switch_owner, VSPROP_SWITCH_TEAMING);
    }
    // Out of the box, moves are announced.
    return !property || (simhost::record_of<VSTeamPolicy>(property->value).flags &
                         TEAM_FRP_FLAG_NOTIFY_SWITCH) != 0;
  }

  static std::vector<Carried> carriers(Transaction &transaction, simhost::storage::SwitchKey key) {
    Teaming anew;
    std::vector<Carried> all;
    for (auto const number : simhost::storage::client_numbers(transaction, key)) {
      auto const port = simhost::get_port(transaction, number);
      all.push_back({.uplink = uplink_or_refusal(anew, transaction, port),
                     .announces = announces(transaction, PropertyOwner::global(key),
                                            simhost::owner_of(port))});
    }
    return all;
  }

  void change_uplink_ports(ChangingTransaction &transaction, simhost::storage::SwitchKey key) {
    auto const ports = simhost::storage::uplink_ports_of(transaction, key);
    auto const free = simhost::storage::free_uplinks(transaction);
    if (!ports.empty() && below(3) == 0) {
      auto const &port = ports[below(static_cast<std::uint32_t>(ports.size()))];
      bool const block = below(2) == 0;
      simhost::set_property(transaction, simhost::owner_of(port), QEX_NEBPROP_PORT_BLOCK,
                            simhost::bytes_of(qex_Bool{block}));
    } else if (!free.empty() && below(2) == 0) {
      simhost::add_uplink_port(transaction, key, free.front());
    } else if (!free.empty() && below(3) != 0) {
      attach(transaction, key, free.front());
    } else {
      simhost::remove_uplink_port(transaction, key, uplink());
    }
  }

  // A port without an uplink gets one, or such a port is made.
  void attach(ChangingTransaction &transaction, simhost::storage::SwitchKey key,
              std::string const &name) {
    for (auto const &port : simhost::storage::uplink_ports_of(transaction, key)) {
      if (!simhost::storage::uplink_at(transaction, port.number)) {
        simhost::storage::attach_uplink(transaction, name, port.number);
        return;
      }
    }
    simhost::add_vacant_uplink_port(transaction, key, "vacant" + std::to_string(below(1000)));
  }

  void change_group(ChangingTransaction &transaction, simhost::storage::SwitchKey key) {
    std::vector<std::string> members;
    for (auto const *name : kUplinks) {
      if (below(2) == 0) {
        members.emplace_back(name);
      }
    }
    simhost::put_lag(transaction, key, "lag", members);
  }

  void change_ports(ChangingTransaction &transaction, simhost::storage::SwitchKey key) {
    auto const numbers = simhost::storage::client_numbers(transaction, key);
    if (numbers.size() < 3 || below(2) == 0) {
      simhost::add_client_port(transaction, key, "p" + std::to_string(below(1000)));
    } else {
      auto const number = numbers.at(below(static_cast<std::uint32_t>(numbers.size())));
      simhost::remove_port(transaction, simhost::get_port(transaction, number));
    }
  }

  void change_host(ChangingTransaction &transaction) {
    switch (below(4)) {
      case 3:
        simhost::storage::remove_host_settings(transaction);
        break;
      case 0:
        simhost::step_clock(transaction, std::chrono::milliseconds(below(100)));
        break;
      case 1:
        simhost::set_runtime_option(transaction, VS_RT_OPT_TEAM_POLICY_UP_DELAY,
                                    static_cast<std::int32_t>(below(3) * 50));
        break;
      default:
        simhost::set_runtime_option(transaction, VS_RT_OPT_MAX_RARPS_PER_INTERVAL,
                                    static_cast<std::int32_t>(below(4) * 2));
    }
  }

  std::string uplink() { return kUplinks.at(below(kUplinks.size())); }

  PropertyOwner client(ChangingTransaction &transaction, simhost::storage::SwitchKey key) {
    auto const numbers = simhost::storage::client_numbers(transaction, key);
    auto const number = numbers.at(below(static_cast<std::uint32_t>(numbers.size())));
    return PropertyOwner::port(key, number);
  }

  simhost::Bytes policy() {
    VSTeamPolicy made{};
    made.loadBalance = below(2) == 0 ? TEAM_FRP_TYPE_LB_SRCID : TEAM_FRP_TYPE_FO_EXPLICIT;
    made.linkCriteria = TEAM_FRP_CRIT_LINK_STATE;
    made.linkCriteria |= below(2) == 0 ? TEAM_FRP_CRIT_PORT_BLOCKED : TEAM_FRP_CRIT_DRV_PRESENT;
    made.flags = (below(2) == 0 ? TEAM_FRP_FLAG_NOTIFY_SWITCH : 0) |
                 (below(3) == 0 ? TEAM_FRP_FLAG_ROLLING : 0);
    std::array<char const *, 5> names{"nic0", "nic1", "nic2", "nic3", "lag"};
    std::ranges::shuffle(names, random_);
    made.numActive = below(3);
    made.numStandby = below(3);
    for (std::size_t name = 0; name < made.numActive + made.numStandby; ++name) {
      std::string(names.at(name)).copy(made.uplinkPortName[name], sizeof made.uplinkPortName[name]);
    }
    return simhost::copied(simhost::bytes_of(made));
  }

  std::mt19937 random_;
};

struct KeptTeams : testing::TestWithParam<std::uint32_t> {
  KeptTeams() {
    simhost::run_on(simhost::stored::plane());
    ChangingTransaction transaction(one.store);
    simhost::stop_clock(transaction);
    simhost::create_switch(transaction, {.alias = "s", .uplink_count = 2});
    auto const key = simhost::get_switch(transaction, "s").key;
    for (auto const *port : {"a", "b", "c", "d", "e"}) {
      simhost::add_client_port(transaction, key, port);
    }
    transaction.commit();
  }

  // A process that keeps what it knows says the same as one that knows nothing.
  static void compare(Process &process) {
    ReadingTransaction transaction(process.store);
    auto const key = simhost::get_switch(transaction, "s").key;
    Teaming anew;
    for (auto const &port : simhost::storage::ports_of(transaction, key)) {
      ASSERT_EQ(uplink_or_refusal(process.teaming, transaction, port),
                uplink_or_refusal(anew, transaction, port))
          << port.identifier;
    }
  }

  static std::uint64_t sent(Transaction &transaction) {
    auto const key = simhost::get_switch(transaction, "s").key;
    return simhost::stored::counters_of(transaction, {.switch_key = key}).of(kSent);
  }

  TemporaryFolder folder;
  Process one{folder.file("host.db")};
  Process other{folder.file("host.db")};
};

TEST_P(KeptTeams, AreAsIfWorkedOutAnew) {
  constexpr int kChanges = 300;
  Changes changes(GetParam());
  std::uint64_t announced = 0;
  for (int change = 0; change < kChanges; ++change) {
    SCOPED_TRACE(change);
    auto &process = changes.below(2) == 0 ? one : other;
    {
      ChangingTransaction transaction(process.store);
      auto const before = sent(transaction);
      auto const expected = changes.make(transaction, process.teaming);
      ASSERT_EQ(sent(transaction) - before, expected);
      if (changes.below(4) != 0) {
        transaction.commit();
        announced += expected;
      }
    }
    compare(one);
    compare(other);
    if (HasFatalFailure()) {
      return;
    }
  }
  EXPECT_GT(announced, 0U) << "the changes are to move something";
}

INSTANTIATE_TEST_SUITE_P(Seeds, KeptTeams, testing::Range(1U, 7U));

}  // namespace
