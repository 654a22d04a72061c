// Reading what is there once for each connection, and telling no more than what differs.
#include "daemon/bridges.h"

#include <fmt/format.h>

#include <algorithm>
#include <exception>
#include <iterator>
#include <stdexcept>
#include <utility>
#include <variant>

#include "daemon/bridge/bridge_rows.h"
#include "daemon/bridge/cached_flows.h"
#include "daemon/bridge/changes.h"
#include "daemon/bridge/live_ports.h"
#include "daemon/bridge/made_bridge.h"
#include "daemon/bridge/unreached_flows.h"
#include "planes/openvswitch/compile/pipeline.h"
#include "planes/openvswitch/ovsdb/configuration.h"
#include "planes/openvswitch/reconcile/difference.h"
#include "planes/openvswitch/reconcile/present.h"
#include "planes/openvswitch/reconcile/relearning.h"

namespace simhost::daemon {
namespace {

using namespace std::chrono_literals;
using openflow::Flow;
using openflow::FlowCommand;
using openvswitch::Deadline;

constexpr auto kPatience = 5s;
// More for each device at a bridge: a machine that has other work to do takes so long, and another
// attempt would begin at the beginning.
constexpr auto kPatienceForEach = 10ms;
constexpr auto *kLock = "simhostd";
// What Open vSwitch says of its flows is older than that anyway.
constexpr auto kBetweenCounts = 100ms;
// A second and bridge: more than members say, and less than keeps this process from all else.
constexpr std::uint32_t kMostPacketIns = 1000;
// Likewise of one client, of which several may say too much.
constexpr std::uint32_t kMostOfAClient = 100;

Deadline soon(std::size_t devices = 0) {
  return Deadline::clock::now() + kPatience + devices * kPatienceForEach;
}

bool is_marker(openflow::FlowEntry const &entry) {
  return entry.foreign.empty() && entry.flow == openvswitch::generation_marker(entry.flow.cookie);
}

openvswitch::Difference difference_between(openvswitch::Compiled const &present,
                                           openvswitch::Compiled const &wanted) {
  return &present == &wanted
             ? openvswitch::Difference{}
             : openvswitch::difference(present.flows, present.groups, wanted.flows, wanted.groups);
}

// Another client may have come with a device, with an address of its own.
std::vector<openvswitch::LearnedFlows> first_addresses(WantedBridge const &wanted,
                                                       std::set<std::string> const &added) {
  std::vector<openvswitch::LearnedFlows> forgotten;
  for (auto const &[device, port] : wanted.ports) {
    if (added.contains(device)) {
      forgotten.push_back(
          {.table = openvswitch::table::kFirstAddresses,
           .cookie = openvswitch::cookie(openvswitch::Counted::first_address, port)});
    }
  }
  return forgotten;
}

}  // namespace

struct Bridges::Bridge {
  Bridge(WantedBridge const &wanted, std::filesystem::path const &socket, Deadline deadline)
      : key(wanted.key), name(wanted.row.name), connection(socket, deadline) {}

  storage::SwitchKey key;
  std::string name;
  openflow::Connection connection;
  events::Loop::Watch watch;
  Flows flows;    // that it has
  Taught taught;  // by these
  // Flows that nobody here made, before what it has is put right.
  std::vector<openvswitch::LearnedFlows> unplaced;
  std::optional<std::uint64_t> change;  // that is in force
  bool is_altered = false;              // so that those before are none of it any more
  bool has_forgotten = false;           // what it had learned, for a restart of the host
  // Of the flows as they are.
  PortNumbers numbers;
  openvswitch::CountedSessions sessions;
  std::chrono::seconds aging{};
  LivePorts live;
  std::set<std::string> aggregated;  // devices that are in groups
  Deadline counted{};
  std::size_t added_ahead = 0;  // of flows and groups, before what it has was read
  std::set<std::uint32_t> meters;

  void have(Flows now) {
    taught.have(now);
    flows = std::move(now);
  }
};

Bridges::Bridges(events::Loop &loop, std::filesystem::path const &socket, Memory &memory, Told told)
    : loop_(loop),
      folder_(socket.parent_path()),
      memory_(memory),
      told_(std::move(told)),
      database_(socket, "Open_vSwitch", soon()) {
  ovsdb::Selected followed;
  ovsdb::select_configuration(followed);
  openvswitch::select_rows(followed);
  database_.monitor(followed, soon());
  take_ownership();
  database_watch_ = loop_.watch(database_.fd(), [this] { read_database_events(); });
}

Bridges::~Bridges() = default;

openvswitch::PresentRows const &Bridges::present() {
  if (!present_) {
    present_ = openvswitch::present_rows(database_.replica(), told_.host);
  }
  return *present_;
}

std::optional<std::string> Bridges::elsewhere(std::string const &device) {
  auto const found = present().elsewhere.find(device);
  return found == present().elsewhere.end() ? std::nullopt : std::optional(found->second);
}

void Bridges::take_ownership() {
  if (!database_.lock(kLock, soon())) {
    auto const &owner = present().owner;
    throw std::runtime_error(
        fmt::format("{} writes to this Open vSwitch", owner.empty() ? "another one" : owner));
  }
}

void Bridges::read_database_events() {
  try {
    database_.receive();
    bool has_changed = false;
    while (database_.next_event()) {
      has_changed = true;
    }
    if (has_changed) {
      present_.reset();
      told_.changed();
    }
  } catch (std::exception const &) {
    database_watch_.end();
    told_.disturbed();
  }
}

std::set<std::string> Bridges::apply_rows(Wanted const &wanted,
                                          std::vector<openvswitch::BridgeRow> const &rows,
                                          Deadline deadline) {
  // As many as those need that stay as they are, too.
  auto const most_tags =
      wanted.unfit.empty() ? wanted.most_tags : std::max(wanted.most_tags, present().most_tags);
  auto operations = openvswitch::operations(present(), rows, told_.host, told_.owner, most_tags);
  if (operations.empty()) {
    return {};
  }
  auto added = added_devices(present(), rows);
  ovsdb::raise_configuration(operations);
  auto const number = ovsdb::raised_configuration(database_.transact(operations, deadline));
  ovsdb::wait_for_configuration(database_, number, deadline);
  // What others changed meanwhile was told to that wait.
  present_.reset();
  told_.changed();
  return added;
}

Bridges::Bridge &Bridges::connected(WantedBridge const &wanted, Deadline deadline) {
  auto &bridge = bridges_[wanted.key];
  if (bridge == nullptr) {
    auto const socket = folder_ / (wanted.row.name + ".mgmt");
    require_made(wanted, socket);
    auto made = std::make_unique<Bridge>(wanted, socket, deadline);
    have_meters(*made, wanted.flows->flows, deadline);
    made->added_ahead = add_unreached(made->connection, socket, *wanted.flows, deadline);
    read_flows(*made, deadline);
    for (auto const &port : made->connection.ports(deadline)) {
      made->live.follow(port);
    }
    if (!wanted.row.lags.empty()) {
      told_.lived();
    }
    made->numbers = wanted.numbers;
    made->sessions = wanted.sessions;
    // What counted while nobody was here, before any of it is changed.
    count(*made, deadline);
    bridge = std::move(made);
    bridge->watch =
        loop_.watch(bridge->connection.fd(), [this, raw = bridge.get()] { read_events(*raw); });
  }
  return *bridge;
}

// Once it is told of changes, so that none is missed.
void Bridges::read_flows(Bridge &bridge, Deadline deadline) {
  bridge.connection.set_async(
      {.packet_in = true, .port_status = true, .group_and_meter_changes = true}, deadline);
  std::vector<openflow::FlowMonitor> monitors;
  for (std::uint8_t number = 0; number <= openvswitch::table::kCountedSources; ++number) {
    // These are recent for a second, and many.
    if (number != openvswitch::table::kRecentSources) {
      auto const own = openvswitch::table::is_learned(number) ? openflow::OwnChanges::told
                                                              : openflow::OwnChanges::untold;
      monitors.push_back({.number = number + 1U, .filter = {.table = number}, .own = own});
    }
  }
  std::vector<Flow> learned;
  for (auto const &update : bridge.connection.monitor_flows(monitors, deadline)) {
    if (openvswitch::table::is_learned(update.flow.table)) {
      learned.push_back(update.flow);
    }
  }
  auto flows = bridge.connection.flows({}, deadline);
  if (auto const marker = std::ranges::find_if(flows, is_marker); marker != flows.end()) {
    bridge.change = marker->flow.cookie;
    flows.erase(marker);
  }
  auto present = openvswitch::present_of(flows, bridge.connection.groups(deadline));
  bridge.unplaced = std::move(present.unplaced);
  bridge.have(std::make_shared<openvswitch::Compiled const>(openvswitch::Compiled{
      .rows = {}, .flows = std::move(present.flows), .groups = std::move(present.groups)}));
  if (bridge.change) {
    memory_.replace(bridge.key, learned);
  }
}

void Bridges::follow_events(Bridge &bridge) {
  bool is_altered = false;
  bool has_lived = false;
  while (auto const event = bridge.connection.next_event()) {
    if (auto const *const packet = std::get_if<openflow::PacketIn>(&*event)) {
      told_.heard(bridge.key, *packet);
    }
    if (auto const *const status = std::get_if<openflow::PortStatus>(&*event)) {
      bool const is_another = bridge.live.follow(*status);
      has_lived = has_lived || (is_another && bridge.aggregated.contains(status->port.name));
    }
    auto const *const update = std::get_if<openflow::FlowUpdate>(&*event);
    if (update != nullptr && openvswitch::table::is_learned(update->flow.table)) {
      follow_learned(bridge, *update);
    } else if (update != nullptr) {
      is_altered = is_altered || update->event != openflow::FlowUpdate::Event::own;
    } else if (std::holds_alternative<openflow::GroupsOrMetersChanged>(*event)) {
      is_altered = true;
    }
  }
  if (has_lived) {
    told_.lived();
  }
  if (is_altered) {
    note_origin(bridge, Origin::foreign);
  }
}

void Bridges::follow_learned(Bridge &bridge, openflow::FlowUpdate const &update) {
  if (auto const port = memory_.follow(bridge.key, update)) {
    told_.moved(bridge.key, *port);
  }
  if (update.event < openflow::FlowUpdate::Event::own &&
      update.event != openflow::FlowUpdate::Event::removed) {
    note_origin(bridge, bridge.taught.origin_of(update));
  }
}

void Bridges::note_origin(Bridge &bridge, Origin origin) const {
  if (origin == Origin::taught || std::exchange(bridge.is_altered, true)) {
    return;
  }
  if (origin == Origin::foreign) {
    told_.altered(bridge.name);
  } else {
    told_.strayed();
  }
}

// Where so much comes and goes that nobody follows it.
void Bridges::look_for_strays(Bridge &bridge) {
  for (auto const &entry :
       bridge.connection.flows({.table = openvswitch::table::kRecentSources}, soon())) {
    note_origin(bridge, bridge.taught.origin_of(entry));
  }
}

void Bridges::read_events(Bridge &bridge) {
  try {
    bridge.connection.receive();
    follow_events(bridge);
  } catch (std::exception const &) {
    bridge.watch.end();
    told_.disturbed();
  }
}

void Bridges::count(Bridge &bridge, Deadline deadline) {
  told_.counted(bridge.key, totals_of(bridge.connection, bridge.numbers, deadline),
                bridge.sessions);
  bridge.counted = Deadline::clock::now();
  follow_events(bridge);
}

void Bridges::count() {
  for (auto const &[key, bridge] : bridges_) {
    count(*bridge, soon());
    look_for_strays(*bridge);
  }
}

void Bridges::count(storage::SwitchKey key) {
  auto const found = bridges_.find(key);
  if (found != bridges_.end() && found->second->counted + kBetweenCounts < Deadline::clock::now()) {
    count(*found->second, soon());
  }
}

// A client need not speak before it is reached in another VLAN: who it is was learned already.
void Bridges::add_relearned(Bridge &bridge, WantedBridge const &wanted,
                            openvswitch::Difference &difference, Deadline deadline) {
  if (difference.forgotten.empty()) {
    return;
  }
  bridge.connection.receive();
  follow_events(bridge);
  openvswitch::Teachers const teachers(wanted.flows->flows,
                                       {difference.forgotten.begin(), difference.forgotten.end()});
  for (auto const &learned : difference.forgotten) {
    auto const learn = teachers.how_learned(learned);
    if (!learn) {
      continue;
    }
    for (auto const &before : learned_flows(bridge, learned, deadline)) {
      if (auto flow = openvswitch::relearned(*learn, before)) {
        difference.added_flows.push_back(std::move(*flow));
      }
    }
  }
}

// Learning an address once more leaves its flow the timeout that it has.
void Bridges::add_renewed(Bridge &bridge, WantedBridge const &wanted,
                          openvswitch::Difference &difference, Deadline deadline) {
  bridge.aging = wanted.aging;
  age(bridge, deadline);
  auto renewed = memory_.with_other_timeouts(wanted.key, wanted.flows->flows);
  std::ranges::move(renewed, std::back_inserter(difference.added_flows));
}

std::vector<Flow> Bridges::learned_flows(Bridge &bridge, openvswitch::LearnedFlows const &learned,
                                         Deadline deadline) {
  if (learned.table != openvswitch::table::kRecentSources) {
    return memory_.learned(bridge.key, learned);
  }
  std::vector<Flow> flows;
  for (auto &entry : bridge.connection.flows(
           {.table = learned.table, .cookie = learned.cookie, .cookie_mask = ~std::uint64_t{0}},
           deadline)) {
    flows.push_back(std::move(entry.flow));
  }
  return flows;
}

void Bridges::have_meters(Bridge &bridge, std::vector<Flow> const &flows, Deadline deadline) {
  std::map<std::uint32_t, std::uint32_t> rates{{openflow::kControllerMeter, kMostPacketIns}};
  for (auto const meter : meters_of(flows)) {
    bridge.meters.insert(meter);
    rates.emplace(meter, kMostOfAClient);
  }
  bridge.connection.have_meters(rates, deadline);
}

// Before the flows that send frames through them. They stay: another device will have the number.
void Bridges::add_meters(Bridge &bridge, std::vector<Flow> const &flows, Deadline deadline) {
  std::vector<std::uint32_t> added;
  for (auto const meter : meters_of(flows)) {
    if (bridge.meters.insert(meter).second) {
      added.push_back(meter);
    }
  }
  if (!added.empty()) {
    bridge.connection.add_meters(added, kMostOfAClient, deadline);
  }
}

std::size_t Bridges::apply_flows(WantedBridge const &wanted, std::uint64_t change,
                                 std::set<std::string> const &added, Forget const &forget,
                                 Deadline deadline) {
  auto &bridge = connected(wanted, deadline);
  // A bridge without a marker was made just before.
  bool const is_new = !bridge.change;
  memory_.follow_devices(wanted.key, wanted.ports);
  bool const forgets = wanted.forgets && !bridge.has_forgotten;
  bridge.has_forgotten = wanted.forgets;
  openflow::Changes changes;
  if (forgets) {
    memory_.forget(wanted.key);
    add_forgetting(changes);
  }
  auto difference = difference_between(*bridge.flows, *wanted.flows);
  if (!forgets) {
    add_relearned(bridge, wanted, difference, deadline);
  }
  std::ranges::copy(std::exchange(bridge.unplaced, {}), std::back_inserter(difference.forgotten));
  if (is_new) {
    std::ranges::move(memory_.recall(wanted.key, wanted.flows->flows, wanted.aging, seen_now()),
                      std::back_inserter(difference.added_flows));
  } else {
    if (bridge.aging != wanted.aging && !forgets) {
      add_renewed(bridge, wanted, difference, deadline);
    }
    std::ranges::copy(first_addresses(wanted, added), std::back_inserter(difference.forgotten));
  }
  if (bridge.sessions != wanted.sessions || ends_counting(difference)) {
    count(bridge, deadline);
  }
  add_meters(bridge, difference.added_flows, deadline);
  add_changes(difference, changes);
  if (bridge.change != change) {
    changes.emplace_back(openflow::FlowChange{.command = FlowCommand::add,
                                              .flow = openvswitch::generation_marker(change)});
  }
  if (!changes.empty()) {
    auto const forget_it =
        forget ? [&] { return forget(bridge.name, change); } : std::function<bool()>();
    change_and_forget(bridge.connection, changes, bridge.change != change,
                      size_of(difference) > 0 ? forget_it : nullptr, deadline);
    bridge.have(wanted.flows);
    bridge.change = change;
    follow_events(bridge);
  }
  bridge.numbers = wanted.numbers;
  bridge.sessions = wanted.sessions;
  bridge.aging = wanted.aging;
  bridge.aggregated = aggregated_devices(wanted.row);
  return size_of(difference) + std::exchange(bridge.added_ahead, 0);
}

// What is wrong with one switch is no reason to stop the others.
std::size_t Bridges::try_flows(WantedBridge const &wanted, std::uint64_t change,
                               std::set<std::string> const &added, Forget const &forget,
                               Deadline deadline) {
  auto const refuse = [&](std::exception const &why) {
    told_.refused(wanted.alias, why.what());
    if (auto const &bridge = bridges_[wanted.key]) {
      bridge->is_altered = true;  // so that what it has is looked at anew
    } else {
      bridges_.erase(wanted.key);
    }
    return std::size_t{0};
  };
  try {
    return apply_flows(wanted, change, added, forget, deadline);
  } catch (openflow::Refused const &refused) {
    return refuse(refused);
  } catch (std::runtime_error const &) {
    throw;  // of the connection
  } catch (std::exception const &error) {
    return refuse(error);
  }
}

std::optional<bool> Bridges::is_live(storage::SwitchKey key, openflow::Port port) const {
  auto const found = bridges_.find(key);
  return found == bridges_.end() ? std::nullopt : std::optional(found->second->live.contains(port));
}

bool Bridges::send(storage::SwitchKey key, std::vector<openflow::PacketOut> const &frames) {
  auto const found = bridges_.find(key);
  if (found == bridges_.end()) {
    return false;
  }
  auto &connection = found->second->connection;
  for (auto const &frame : frames) {
    connection.send(frame);
  }
  connection.barrier(soon());
  return true;
}

std::vector<Learned> Bridges::learned(storage::SwitchKey key) {
  auto const found = bridges_.find(key);
  if (found == bridges_.end()) {
    return {};
  }
  auto const sources = age(*found->second, soon());
  return learned_of(
      found->second->connection.flows({.table = openvswitch::table::kLearnedAddresses}, soon()),
      sources);
}

Unseen Bridges::age() {
  auto next = kBetweenLooks;
  for (auto const &[key, bridge] : bridges_) {
    next = std::min(next, next_look(age(*bridge, soon()), bridge->aging));
  }
  return next;
}

std::vector<Source> Bridges::age(Bridge &bridge, Deadline deadline) {
  auto const entries =
      bridge.connection.flows({.table = openvswitch::table::kCountedSources}, deadline);
  follow_events(bridge);
  auto sources = memory_.saw(bridge.key, entries, seen_now());
  openflow::Changes changes;
  std::erase_if(sources, [&](Source const &source) {
    bool const goes = is_aged(source.unseen, bridge.aging);
    if (goes) {
      for (auto const &flow : {where_learned(source.flow), source.flow}) {
        changes.emplace_back(
            openflow::FlowChange{.command = FlowCommand::remove_strict, .flow = flow});
      }
    }
    return goes;
  });
  if (!changes.empty()) {
    bridge.connection.change(changes, deadline);
    follow_events(bridge);
  }
  return sources;
}

std::size_t Bridges::apply(Wanted const &wanted, Forget const &forget) {
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
      count(*bridge.second, deadline);
    }
  }
  auto const rows = wanted_rows(wanted, present());
  bool const any_new = has_new(rows, present());
  auto const bare = any_new ? rows_before_flows(rows, present()) : decltype(rows){};
  auto const added = apply_rows(wanted, any_new ? bare : rows, deadline);
  std::erase_if(bridges_, [](auto const &bridge) { return bridge.second->is_altered; });
  std::erase_if(bridges_, goes);
  std::size_t changed = 0;
  for (auto const &bridge : wanted.bridges) {
    changed += try_flows(bridge, wanted.change, added, any_new ? nullptr : forget, deadline);
  }
  if (any_new) {
    apply_rows(wanted, rows, deadline);
    if (changed > 0 && forget) {
      forget(wanted.bridges.front().row.name, wanted.change);
    }
  }
  return changed;
}

}  // namespace simhost::daemon
