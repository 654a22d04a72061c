// One look at the state and the devices at a time, however many told of a change meanwhile.
#include "daemon/daemon.h"

#include <fmt/format.h>
#include <unistd.h>

#include <algorithm>
#include <exception>
#include <set>
#include <utility>
#include <vector>

#include "abi/fresh_host.h"
#include "base/utf8.h"
#include "daemon/bridge/cached_flows.h"
#include "daemon/devices/packet_sizes.h"
#include "daemon/only_one.h"
#include "daemon/wanted.h"
#include "model/plane.h"
#include "planes/stored/stored_plane.h"
#include "storage/running/devices.h"
#include "storage/running/frames.h"
#include "storage/running/generations.h"

namespace simhost::daemon {
namespace {

using namespace std::chrono_literals;

// Between two attempts to connect: frames wait for the one that succeeds.
constexpr events::Clock::duration kFirstPause = 50ms;
constexpr events::Clock::duration kLongestPause = 200ms;

std::filesystem::path beside(std::filesystem::path file, char const *suffix) {
  file += suffix;
  return file;
}

storage::Store opened(std::filesystem::path const &state) {
  run_on(stored::plane());
  return {state, populate_fresh_host};
}

}  // namespace

Daemon::Daemon(events::Loop &loop, Options options, Say say)
    : loop_(loop),
      options_(std::move(options)),
      say_(std::move(say)),
      troubles_(say_),
      lock_(lock(beside(options_.state, "-simhostd.lock"))),
      store_(opened(options_.state)),
      host_(in_utf8(options_.state.string())),
      state_watch_(loop, store_, options_.state, [this] { look_at_commits(); }),
      devices_(loop, [this] { sync_soon(); }),
      client_addresses_(loop, [this] { sync_soon(); }),
      server_(loop, openvswitch::socket_of(options_.state), questions()),
      memory_(store_, [this] { remember_soon(); }),
      announcer_(loop, [this](auto key, auto const &clients) { announce(key, clients); }),
      beacons_(loop, {.send = [this](auto key, auto const &frames) { send(key, frames); },
                      .changed = [this] { sync_soon(); }}),
      members_(loop, {.send = [this](auto key, auto const &frames) { send(key, frames); },
                      .changed = [this] { follow_members(); }}),
      links_(
          loop, store_, devices_,
          [this](auto key, auto const &device) { return heard_at(key, device); },
          [this] { sync_soon(); }),
      counting_(store_),
      announced_(store_),
      load_balance_(store_),
      underlay_(
          loop, lock_.number(),
          [this] {
            if (bridges_) {
              simhost::daemon::forget_cached_flows(options_.database.parent_path(), lives_);
            }
          },
          [this](std::string const &why) { troubles_.add(why); }),
      collectors_(loop, devices_, [this] { sync_soon(); }) {}

void Daemon::begin() {
  storage::ChangingTransaction transaction(store_);
  storage::take_frames(transaction);
  transaction.commit();
  count_from_now_on();
}

void Daemon::leave_devices() {
  try {
    devices_.refresh();
    underlay_.end(devices_);
  } catch (std::exception const &error) {
    say_(error.what());
  }
}

void Daemon::disconnect() {
  next_connect_.end();
  bridges_.reset();
  lives_.clear();
}

void Daemon::connect(openvswitch::Lives lives) {
  disconnect();
  lives_ = std::move(lives);
  connect_anew();
}

void Daemon::connect_anew() {
  bridges_.reset();
  follows_members_ = false;
  shortest_aging_ = std::chrono::seconds::max();  // so that ageing begins again
  attempt([this] {
    bridges_.emplace(
        loop_, options_.database, lives_, memory_,
        Bridges::Told{.owner = fmt::format("simhostd of {}, process {}", host_, getpid()),
                      .host = host_,
                      .changed = [this] { sync_soon(); },
                      .disturbed = [this](std::string const &why) { reconnect(why); },
                      .of_bridges = told_by_bridges()});
    sync();
  });
}

RunningBridge::Told Daemon::told_by_bridges() {
  return {.counted =
              [this](auto key, auto const &totals, auto const &sessions) {
                counting_.count(key, totals, sessions);
                load_balance_.count(key, totals);
              },
          .moved =
              [this](auto key, auto port) {
                if (port != 0) {
                  counting_.count_move(key, port);
                }
              },
          .altered =
              [this](std::string const &bridge) {
                say_(fmt::format("somebody else changed flows or groups of the bridge {}", bridge));
                mend_soon();
              },
          .strayed = [this] { mend_soon(); },
          .lived = [this] { sync_soon(); },
          .heard =
              [this](auto key, auto const &packet) {
                if (!beacons_.receive(key, packet)) {
                  members_.receive(key, packet);
                }
              },
          .disturbed = [this](std::string const &why) { reconnect(why); }};
}

void Daemon::connect_later() {
  pause_ = std::clamp(2 * pause_, kFirstPause, kLongestPause);
  next_connect_ = loop_.after(pause_, [this] { connect_anew(); });
}

// Whoever goes on changing what is ours shall not keep this busy.
void Daemon::mend_soon() {
  constexpr events::Clock::duration kLeastPause = 1s;
  auto const now = events::Clock::now();
  auto const due = std::max(now, mended_ + kLeastPause);
  next_mend_ = loop_.after(due - now, [this, due] {
    mended_ = due;
    sync_soon();
  });
}

void Daemon::attempt(std::function<void()> const &work) {
  troubles_.look_again();
  try {
    work();
    pause_ = {};
  } catch (std::exception const &error) {
    fail(error.what());
  }
  compiler_.forget_others();
}

// Whoever waits for a change has told of it already, most of the time.
void Daemon::look_at_commits() {
  try {
    storage::ReadingTransaction transaction(store_);
    if (storage::commits_of_others(transaction) != commits_) {
      sync_soon();
    }
  } catch (std::exception const &) {
    sync_soon();  // which says what is wrong with the state
  }
}

void Daemon::fail(std::string const &why) {
  bridges_.reset();
  reconnect(why);
}

void Daemon::reconnect(std::string const &why) {
  troubles_.add(why);
  connect_later();
}

// A query that is lost comes again.
bool Daemon::send(storage::SwitchKey key, std::vector<openflow::PacketOut> const &frames) try {
  return bridges_ && bridges_->send(key, frames);
} catch (std::exception const &error) {
  reconnect(error.what());
  return false;
}

// Which is told to nobody: it is no change of what is configured.
void Daemon::follow_members() {
  bool const is_only_reason = !next_sync_ || follows_members_;
  sync_soon();
  follows_members_ = is_only_reason;
}

void Daemon::sync_soon() {
  follows_members_ = false;
  if (!next_sync_) {
    next_sync_ = loop_.after(0ms, [this] {
      if (bridges_) {
        attempt([this] { sync(); });
      }
    });
  }
}

void Daemon::sync_after(std::optional<ClockTime> const &wait) {
  next_settling_.end();
  if (wait) {
    next_settling_ = loop_.after(*wait, [this] { sync_soon(); });
  }
}

Heard Daemon::heard_at(storage::SwitchKey key, storage::Device const &device) const {
  return {.partner = bridges_ ? bridges_->is_live(key, device.number) : std::nullopt,
          .beacons = beacons_.arrive_at(key, device.number),
          .error_percent = wires_.damaged_percent(device.name)};
}

void Daemon::follow_devices() {
  devices_.refresh();
  {
    storage::ReadingTransaction transaction(store_);
    auto const say = [this](std::string const &why) { troubles_.add(why); };
    switch_devices(transaction, devices_, say);
    raise_packet_sizes(sizes_to_raise(transaction, devices_), devices_, say);
  }
  devices_.refresh();
  next_sync_.end();  // what was told so far is looked at here
  wires_.leave_lost(devices_);
  if (auto const why = links_.follow()) {
    troubles_.add(*why);
  }
}

// Without which a change is in force for most frames only. Where it cannot be, to try once more is
// of no use.
bool Daemon::forget_cached_flows(std::string const &bridge, std::uint64_t generation) {
  try {
    return simhost::daemon::forget_cached_flows(options_.database.parent_path(), bridge, generation,
                                                lives_);
  } catch (std::exception const &error) {
    troubles_.add(
        fmt::format("frames may go on for a while as they went before a change: {}", error.what()));
    return true;
  }
}

void Daemon::sync() {
  follow_devices();
  // What devices changed meanwhile is told all the same.
  bool const follows_members = std::exchange(follows_members_, false);
  storage::ReadingTransaction transaction(store_);
  commits_ = storage::commits_of_others(transaction);
  auto const is_there = [this](std::string const &name) {
    auto const device = devices_.find(name);
    if (!device) {
      troubles_.add(fmt::format("there is no device {}", name));
    } else if (!device->has_ethernet) {
      troubles_.add(fmt::format("the device {} carries no frames of Ethernet", name));
    }
    return device && device->has_ethernet;
  };
  client_addresses_.begin();
  auto const address_at = [this](std::string const &name) {
    auto const device = devices_.find(name);
    return device ? client_addresses_.at(device->index) : std::nullopt;
  };
  collectors_.begin();
  auto const complete = [&](storage::SwitchKey key, openvswitch::Network &network) {
    members_.follow(transaction, key, network);
    load_balance_.follow(transaction, key, network);
    beacons_.follow(key, network);
    collectors_.follow(network);
  };
  auto all =
      wanted_of(transaction, host_, options_.datapath, is_there, address_at, compiler_, complete);
  bool const counts_anew = counting_.follow(transaction);
  if (counts_anew) {
    announced_.follow(transaction);
  }
  transaction.commit();
  if (counts_anew) {
    bridges_->count(Devices::always);
  }
  // What was committed since members were heard is told all the same.
  bool const is_told = !follows_members || all.change != in_force_;
  Bridges::Forget forget;
  if (is_told) {
    forget = [this](std::string const &bridge, std::uint64_t generation) {
      return forget_cached_flows(bridge, generation);
    };
  }
  std::size_t changed = 0;
  if (auto const others = at_bridges_.without_new(all, devices_)) {
    changed = bridges_->apply(*others, forget).changed;
  }
  auto const applied = bridges_->apply(all, forget);
  changed += applied.changed;
  // As they were known before Open vSwitch opened them: one that was made anew meanwhile is another
  // one at the next look. Those of a switch whose flows are refused are at its bridge all the same.
  at_bridges_.follow(all, devices_);
  all.leave_out(applied.refused);
  if (changed > 0 && is_told) {
    say_(fmt::format("change {} is in force: {} flows and groups changed", all.change, changed));
  }
  follow_tunnels(all);
  // What follows from a change is for others than those who wait for it.
  in_force_ = all.change;
  reply_to_waiting();
  announcer_.follow(all, memory_, [this](auto key, auto port) {
    return bridges_->is_live(key, port).value_or(false);
  });
  settle(all);
  try {
    counting_.save_new();
  } catch (std::exception const &error) {
    keep_nothing(error.what());
  }
  tell_settled();
}

void Daemon::follow_tunnels(Wanted const &wanted) {
  devices_.refresh();
  auto const is_at_bridge = [&](std::string const &device) {
    return options_.datapath == "system" || bridges_->elsewhere(device).has_value();
  };
  for (auto const &why : underlay_.follow(wanted, devices_, is_at_bridge)) {
    troubles_.add(why);
  }
  for (auto const &why : collectors_.look(wanted.underlay)) {
    troubles_.add(why);
  }
}

// From a timer, too, so that nothing is thrown.
void Daemon::announce(storage::SwitchKey key, std::vector<openvswitch::Announced> const &clients) {
  std::vector<openflow::PacketOut> frames;
  frames.reserve(clients.size());
  for (auto const &client : clients) {
    frames.push_back(openvswitch::announcement(client));
  }
  if (send(key, frames)) {
    announced_.add(key, clients.size());
    remember_soon();
  }
}

void Daemon::settle(Wanted const &wanted) {
  for (auto const &bridge : wanted.bridges) {
    for (auto const &[name, number] : bridge.row.devices) {
      if (auto const other = bridges_->elsewhere(name)) {
        troubles_.add(
            fmt::format("the device {} is at the bridge {} of somebody else", name, *other));
      }
    }
  }
  wires_.follow(at_bridges_.uplinks());
  for (auto const &[device, error] : bridges_->errors()) {
    troubles_.add(fmt::format("Open vSwitch cannot use the device {}: {}", device, error));
  }
  std::set<storage::SwitchKey> keys;
  for (auto const &bridge : wanted.bridges) {
    keys.insert(bridge.key);
    multicast_modes_[bridge.key] = bridge.multicast_mode;
  }
  for (auto const &unfit : wanted.unfit) {
    keys.insert(unfit.key);
  }
  memory_.keep(wanted.switches);
  members_.keep(keys);
  std::erase_if(multicast_modes_, [&](auto const &one) { return !keys.contains(one.first); });
  load_balance_.keep(keys);
  beacons_.keep(keys);
  for (auto const &bridge : wanted.bridges) {
    if (beacons_.has_too_few(bridge.key)) {
      troubles_.add(
          fmt::format("the switch '{}' asks for beacons, but of fewer than three links nobody can "
                      "tell which one is cut off",
                      bridge.alias));
    }
  }
  age_by(wanted);
  sync_after(wanted.lasts);
  for (auto const &unfit : wanted.unfit) {
    troubles_.add(fmt::format("the switch '{}' cannot be run: {}", unfit.alias, unfit.why));
  }
  if (!why_nothing_is_kept_.empty()) {
    troubles_.add(why_nothing_is_kept_);
  }
  if (auto const ready = std::exchange(ready_, nullptr)) {
    ready();
  }
}

void Daemon::reply_to_waiting() {
  while (!waiting_.empty() && waiting_.begin()->first <= in_force_) {
    waiting_.begin()->second({{"change", in_force_}});
    waiting_.erase(waiting_.begin());
  }
}

}  // namespace simhost::daemon
