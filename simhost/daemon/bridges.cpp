// The rows of all switches at once, then the flows of one after the other.
#include "daemon/bridges.h"

#include <fmt/format.h>

#include <algorithm>
#include <chrono>
#include <exception>
#include <stdexcept>
#include <utility>
#include <variant>

#include "daemon/bridge/bridge_rows.h"
#include "daemon/bridge/patience.h"
#include "planes/openvswitch/ovsdb/configuration.h"

namespace simhost::daemon {
namespace {

using openvswitch::Deadline;

using namespace std::chrono_literals;

constexpr auto *kLock = "simhostd";
// For as long as a data path is there, Open vSwitch takes it to tell as many tags apart as it did
// itself when the first bridge of it came, or when it started: of frames with more it would count
// what becomes of others.
constexpr std::uint32_t kTellingAll = 2;

ovsdb::Json while_owner() {
  return {{"op", "assert"}, {"lock", kLock}};
}

}  // namespace

Bridges::Bridges(events::Loop &loop, std::filesystem::path const &socket, openvswitch::Lives lives,
                 Memory &memory, Told told)
    : loop_(loop),
      place_{.folder = socket.parent_path(), .lives = std::move(lives)},
      memory_(memory),
      told_(std::move(told)),
      database_(socket, "Open_vSwitch", soon(), place_.lives) {
  bool const is_owner = database_.lock(kLock, soon());
  ovsdb::Selected followed;
  ovsdb::select_configuration(followed);
  openvswitch::select_rows(followed);
  database_.begin_monitor(std::move(followed));
  if (!is_owner) {
    fail_as_another_owns_it();
  }
  database_watch_ = loop_.watch(database_.fd(), [this] { read_database_events(); });
}

openvswitch::PresentRows const &Bridges::present() {
  if (!present_) {
    database_.end_monitor(soon());
    present_ = openvswitch::present_rows(database_.replica(), told_.host);
  }
  return *present_;
}

void Bridges::forget_rows() {
  present_.reset();
  rows_made_.reset();
}

std::optional<std::string> Bridges::elsewhere(std::string const &device) {
  auto const found = present().elsewhere.find(device);
  return found == present().elsewhere.end() ? std::nullopt : std::optional(found->second);
}

void Bridges::fail_as_another_owns_it() {
  auto const &owner = present().owner;
  if (owner == told_.owner) {
    // The server may hear of a new connection before it hears that the one of before has ended.
    throw std::runtime_error(
        "another one writes to this Open vSwitch, or this daemon's connection of before has not "
        "ended yet");
  }
  throw std::runtime_error(
      fmt::format("{} writes to this Open vSwitch", owner.empty() ? "another one" : owner));
}

// Returns whether there were any.
bool Bridges::take_database_events() {
  bool any = false;
  while (auto const event = database_.next_event()) {
    if (std::holds_alternative<ovsdb::LockLost>(*event)) {
      throw std::runtime_error("somebody took the right to write to this Open vSwitch away");
    }
    any = true;
  }
  return any;
}

void Bridges::read_database_events() {
  try {
    database_.end_monitor(soon());
    database_.receive();
    if (take_database_events()) {
      forget_rows();
      told_.changed();
    }
  } catch (std::exception const &error) {
    database_watch_.end();
    told_.disturbed(error.what());
  }
}

// Open vSwitch is not asked to do that: to find that it has nothing to do takes it long. What was
// asked of it before may not be done yet, if whoever did so ended.
void Bridges::sign(Deadline deadline) {
  database_.transact(ovsdb::Json::array({while_owner(), openvswitch::signature(told_.owner)}),
                     deadline);
  ovsdb::wait_for_configuration(database_, ovsdb::wanted_configuration(database_.replica()),
                                deadline);
  next_database_events_ = loop_.after(0ms, [this] { read_database_events(); });
}

std::uint32_t Bridges::most_tags(Wanted const &wanted) {
  if (place_.lives.empty()) {
    // It may start anew when nobody of us is there.
    return kTellingAll;
  }
  // As many as those need that stay as they are, too.
  return wanted.unfit.empty() ? wanted.most_tags : std::max(wanted.most_tags, present().most_tags);
}

std::set<std::string> Bridges::apply_rows(std::vector<openvswitch::BridgeRow> const &rows,
                                          std::uint32_t most_tags, Deadline deadline) {
  RowsMade made{.rows = rows, .most_tags = most_tags};
  if (rows_made_ == made) {
    return {};
  }
  auto operations = openvswitch::operations(present(), rows, told_.host, most_tags);
  if (operations.empty()) {
    if (!is_signed()) {
      sign(deadline);
    }
    rows_made_ = std::move(made);
    return {};
  }
  operations.insert(operations.begin(), while_owner());
  if (!is_signed()) {
    operations.push_back(openvswitch::signature(told_.owner));
  }
  auto added = added_devices(present(), rows);
  ovsdb::raise_configuration(operations);
  auto const number = ovsdb::raised_configuration(database_.transact(operations, deadline));
  ovsdb::wait_for_configuration(database_, number, deadline);
  // What others changed meanwhile was told to that wait.
  take_database_events();
  forget_rows();
  told_.changed();
  return added;
}

RunningBridge &Bridges::connected(WantedBridge const &wanted, Deadline deadline) {
  if (auto *const bridge = find(wanted.key)) {
    return *bridge;
  }
  auto made =
      std::make_unique<RunningBridge>(loop_, place_, memory_, told_.of_bridges, wanted, deadline);
  return *bridges_.emplace(wanted.key, std::move(made)).first->second;
}

RunningBridge *Bridges::find(storage::SwitchKey key) const {
  auto const found = bridges_.find(key);
  return found == bridges_.end() ? nullptr : found->second.get();
}

void Bridges::count(Devices devices) {
  for (auto const &[key, bridge] : bridges_) {
    bridge->count(devices, soon());
    bridge->look_for_strays(soon());
  }
}

void Bridges::count(storage::SwitchKey key) {
  if (auto *const bridge = find(key)) {
    bridge->count_anew(soon());
  }
}

// What is wrong with one switch is no reason to stop the others.
void Bridges::try_flows(WantedBridge const &wanted, std::uint64_t change,
                        std::set<std::string> const &added, Forget const &forget, Deadline deadline,
                        Applied &applied) {
  auto const refuse = [&](std::exception const &why) {
    applied.refused.push_back(unfit(wanted, why));
    if (auto *const bridge = find(wanted.key)) {
      bridge->doubt();
    }
  };
  try {
    applied.changed += connected(wanted, deadline).apply(wanted, change, added, forget, deadline);
  } catch (openflow::Refused const &refused) {
    refuse(refused);
  } catch (std::runtime_error const &) {
    throw;  // of the connection
  } catch (std::exception const &error) {
    refuse(error);
  }
}

std::optional<bool> Bridges::is_live(storage::SwitchKey key, openflow::Port port) const {
  auto const *const bridge = find(key);
  return bridge == nullptr ? std::nullopt : std::optional(bridge->is_live(port));
}

bool Bridges::send(storage::SwitchKey key, std::vector<openflow::PacketOut> const &frames) {
  auto *const bridge = find(key);
  if (bridge != nullptr) {
    bridge->send(frames, soon());
  }
  return bridge != nullptr;
}

std::vector<Learned> Bridges::learned(storage::SwitchKey key) {
  auto *const bridge = find(key);
  return bridge == nullptr ? std::vector<Learned>() : bridge->learned(soon());
}

bool Bridges::forget_learned(storage::SwitchKey key, std::uint32_t port,
                             KnownAddress const &address) {
  auto *const bridge = find(key);
  return bridge != nullptr && bridge->forget_learned(port, address, soon());
}

Unseen Bridges::age() {
  auto next = kBetweenLooks;
  for (auto const &[key, bridge] : bridges_) {
    next = std::min(next, next_look(bridge->age(soon()), bridge->aging()));
  }
  return next;
}

Bridges::Applied Bridges::apply(Wanted const &wanted, Forget const &forget) {
  std::size_t devices = 0;
  for (auto const &bridge : wanted.bridges) {
    devices += bridge.row.devices.size();
  }
  auto const deadline = soon(devices);
  auto const goes = [&](auto const &bridge) {
    auto const is_it = [&](auto const &one) { return one.key == bridge.first; };
    return std::ranges::none_of(wanted.bridges, is_it) && std::ranges::none_of(wanted.unfit, is_it);
  };
  for (auto const &bridge : bridges_) {
    if (goes(bridge)) {
      bridge.second->count(Devices::always, deadline);
    }
  }
  auto const rows = wanted_rows(wanted, present());
  auto const tags = most_tags(wanted);
  bool const any_new = has_new(rows, present());
  auto const bare = any_new ? rows_before_flows(rows, present()) : decltype(rows){};
  auto const added =
      any_new ? apply_rows(bare, kTellingAll, deadline) : apply_rows(rows, tags, deadline);
  std::erase_if(bridges_, [](auto const &bridge) { return bridge.second->is_altered(); });
  std::erase_if(bridges_, goes);
  Applied applied;
  for (auto const &bridge : wanted.bridges) {
    try_flows(bridge, wanted.change, added, any_new ? nullptr : forget, deadline, applied);
  }
  if (any_new) {
    apply_rows(rows, tags, deadline);
    if (applied.changed > 0 && forget) {
      forget(wanted.bridges.front().row.name, wanted.change);
    }
  }
  return applied;
}

}  // namespace simhost::daemon
