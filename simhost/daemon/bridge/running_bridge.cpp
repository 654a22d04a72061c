// What it tells by itself comes between its replies, and is followed after each of them.
#include "daemon/bridge/running_bridge.h"

#include <algorithm>
#include <exception>
#include <iterator>
#include <memory>
#include <utility>
#include <variant>

#include "daemon/bridge/bridge_rows.h"
#include "daemon/bridge/cached_flows.h"
#include "daemon/bridge/changes.h"
#include "daemon/bridge/made_bridge.h"
#include "daemon/bridge/patience.h"
#include "daemon/bridge/restoring.h"
#include "daemon/bridge/unreached_flows.h"
#include "planes/openvswitch/compile/pipeline.h"
#include "planes/openvswitch/reconcile/present.h"
#include "planes/openvswitch/reconcile/relearning.h"

namespace simhost::daemon {
namespace {

using namespace std::chrono_literals;
using openflow::Flow;
using openflow::FlowCommand;
using openvswitch::Deadline;

// What Open vSwitch says of its flows is older than that anyway.
constexpr auto kCountsLast = 100ms;

std::filesystem::path socket_of(WantedBridge const &wanted, std::filesystem::path const &folder) {
  return folder / (wanted.row.name + ".mgmt");
}

openflow::Connection connected(WantedBridge const &wanted, Place const &place, Deadline deadline) {
  auto const socket = socket_of(wanted, place.folder);
  require_made(wanted, socket);
  return {socket, deadline, place.lives};
}

bool is_gate(openflow::FlowEntry const &entry) {
  return entry.foreign.empty() && entry.flow == gate();
}

// All that add_unreached() adds, and nothing else, unless somebody replaced some of it since.
bool has_what_was_added(openflow::Contents const &contents, openvswitch::Compiled const &wanted) {
  return contents.flow_count == wanted.flows.size() + 1 &&
         openvswitch::present_of({}, contents.groups).groups == wanted.groups;
}

// Of all tables but one: what is there is recent for a second, and much.
std::vector<openflow::FlowMonitor> monitors() {
  using openflow::OwnChanges;
  using openflow::PresentFlows;
  std::vector<openflow::FlowMonitor> monitors;
  for (std::uint8_t number = 0; number <= openvswitch::kLastReached; ++number) {
    if (number != openvswitch::table::kRecentSources) {
      bool const is_learned = openvswitch::table::is_learned(number);
      monitors.push_back({.number = number + 1U,
                          .filter = {.table = number},
                          .own = is_learned ? OwnChanges::told : OwnChanges::untold,
                          .present = is_learned ? PresentFlows::told : PresentFlows::untold});
    }
  }
  return monitors;
}

openvswitch::Difference difference_between(openvswitch::Compiled const &present,
                                           openvswitch::Compiled const &wanted) {
  return &present == &wanted
             ? openvswitch::Difference{}
             : openvswitch::difference(present.flows, present.groups, wanted.flows, wanted.groups);
}

// Of ports that are said to have a first address, and have none: their clients could send nothing.
std::vector<openvswitch::LearnedFlows> without_first_address(std::span<Flow const> learned) {
  std::set<std::uint32_t> have;
  for (auto const &flow : learned) {
    if (flow.table == openvswitch::table::kFirstAddresses) {
      have.insert(openvswitch::number_of(flow.cookie));
    }
  }
  std::vector<openvswitch::LearnedFlows> without;
  for (auto const &flow : learned) {
    if (flow.table == openvswitch::table::kPortsWithFirst &&
        !have.contains(openvswitch::number_of(flow.cookie))) {
      without.push_back({.table = flow.table, .cookie = flow.cookie});
    }
  }
  return without;
}

// Another client may have come with a device, with an address of its own.
std::vector<openvswitch::LearnedFlows> first_addresses(WantedBridge const &wanted,
                                                       std::set<std::string> const &added) {
  std::vector<openvswitch::LearnedFlows> forgotten;
  for (auto const &[device, port] : wanted.ports) {
    if (added.contains(device)) {
      using openvswitch::Counted;
      forgotten.push_back({.table = openvswitch::table::kFirstAddresses,
                           .cookie = openvswitch::cookie(Counted::first_address, port)});
      forgotten.push_back({.table = openvswitch::table::kPortsWithFirst,
                           .cookie = openvswitch::cookie(Counted::port_with_first, port)});
    }
  }
  return forgotten;
}

}  // namespace

RunningBridge::RunningBridge(events::Loop &loop, Place const &place, Memory &memory,
                             Told const &told, WantedBridge const &wanted, Deadline deadline)
    : loop_(loop),
      memory_(memory),
      told_(told),
      key_(wanted.key),
      name_(wanted.row.name),
      connection_(connected(wanted, place, deadline)),
      numbers_(wanted.numbers),
      sessions_(wanted.sessions) {
  meters_.replace(connection_, wanted.flows->flows, deadline);
  added_ahead_ = add_unreached(connection_, socket_of(wanted, place.folder), *wanted.flows,
                               deadline, place.lives);
  // To be told so many flows takes a part of what it takes to add them.
  bool const are_added = added_ahead_ > 0;
  auto contents = connection_.follow(
      {.packet_in = true, .port_status = true, .group_and_meter_changes = true}, monitors(),
      are_added ? openflow::PresentFlows::untold : openflow::PresentFlows::told, deadline);
  // What counted while nobody was here, before any of it is changed.
  tell_counted(totals_of(contents.flows, contents.port_statistics, numbers_));
  for (auto const &port : contents.ports) {
    live_.follow(port);
  }
  if (!wanted.row.lags.empty()) {
    told_.lived();
  }
  if (are_added && has_what_was_added(contents, *wanted.flows)) {
    is_closed_ = true;
    have(wanted.flows);
  } else {
    if (are_added) {
      contents.flows = connection_.flows({}, deadline);
    }
    take(std::move(contents));
  }
  follow_events();
  watch_ = loop.watch(connection_.fd(), [this] { read_events(); });
}

void RunningBridge::have(Flows flows) {
  taught_.have(flows);
  flows_ = std::move(flows);
}

void RunningBridge::take(openflow::Contents contents) {
  auto &flows = contents.flows;
  if (auto const marker = std::ranges::find_if(flows, is_marker); marker != flows.end()) {
    change_ = marker->flow.cookie;
    flows.erase(marker);
  }
  is_closed_ = std::erase_if(flows, is_gate) > 0;
  auto present = openvswitch::present_of(flows, contents.groups);
  unplaced_ = std::move(present.unplaced);
  have(std::make_shared<openvswitch::Compiled const>(openvswitch::Compiled{
      .rows = {}, .flows = std::move(present.flows), .groups = std::move(present.groups)}));
  if (change_) {
    std::vector<Flow> learned;
    for (auto &update : contents.monitored) {
      learned.push_back(std::move(update.flow));
    }
    memory_.replace(key_, learned);
    std::ranges::copy(without_first_address(learned), std::back_inserter(unplaced_));
  }
}

void RunningBridge::read_events() {
  try {
    connection_.receive();
    follow_events();
  } catch (std::exception const &error) {
    watch_.end();
    told_.disturbed(error.what());
  }
}

void RunningBridge::follow_events(Doer doer) {
  bool is_altered = false;
  bool has_lived = false;
  while (auto const event = connection_.next_event()) {
    if (auto const *const packet = std::get_if<openflow::PacketIn>(&*event)) {
      told_.heard(key_, *packet);
    }
    if (auto const *const status = std::get_if<openflow::PortStatus>(&*event)) {
      bool const is_another = live_.follow(*status);
      has_lived = has_lived || (is_another && (aggregated_.contains(status->port.name) ||
                                               uplinks_.contains(status->port.port)));
    }
    auto const *const update = std::get_if<openflow::FlowUpdate>(&*event);
    if (update != nullptr && openvswitch::table::is_learned(update->flow.table)) {
      follow_learned(*update, doer);
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
    note_origin(Origin::foreign);
  }
}

void RunningBridge::follow_learned(openflow::FlowUpdate const &update, Doer doer) {
  bool const is_taken = update.event == openflow::FlowUpdate::Event::removed &&
                        update.reason == openflow::FlowRemoved::Reason::removed &&
                        doer == Doer::others;
  if (is_taken) {
    if (memory_.miss(key_, update.flow)) {
      note_origin(Origin::foreign);
    }
    return;
  }
  if (auto const port = memory_.follow(key_, update)) {
    told_.moved(key_, *port);
  }
  if (update.event < openflow::FlowUpdate::Event::own &&
      update.event != openflow::FlowUpdate::Event::removed) {
    note_origin(taught_.origin_of(update));
  }
}

void RunningBridge::note_origin(Origin origin) {
  if (origin == Origin::taught || std::exchange(is_altered_, true)) {
    return;
  }
  if (origin == Origin::foreign) {
    told_.altered(name_);
  } else {
    told_.strayed();
  }
}

void RunningBridge::look_for_strays(Deadline deadline) {
  if (!totals_.has_recent_sources()) {
    return;
  }
  for (auto const &entry :
       connection_.flows({.table = openvswitch::table::kRecentSources}, deadline)) {
    note_origin(taught_.origin_of(entry));
  }
  follow_events();
}

void RunningBridge::tell_counted(openvswitch::Totals const &totals) {
  told_.counted(key_, totals, sessions_);
  counted_ = Deadline::clock::now();
}

void RunningBridge::count(Devices devices, Deadline deadline) {
  tell_counted(totals_.ask(connection_, devices, numbers_, deadline));
  follow_events();
}

void RunningBridge::count_anew(Deadline deadline) {
  if (counted_ + kCountsLast < Deadline::clock::now()) {
    count(Devices::always, deadline);
  }
}

// A client need not speak before it is reached in another VLAN: who it is was learned already.
void RunningBridge::add_relearned(WantedBridge const &wanted, openvswitch::Difference &difference,
                                  Deadline deadline) {
  if (difference.forgotten.empty()) {
    return;
  }
  openvswitch::Teachers const teachers(wanted.flows->flows,
                                       {difference.forgotten.begin(), difference.forgotten.end()});
  for (auto const &learned : difference.forgotten) {
    auto const learn = teachers.how_learned(learned);
    if (!learn) {
      continue;
    }
    for (auto const &before : learned_flows(learned, deadline)) {
      if (auto flow = openvswitch::relearned(*learn, before)) {
        difference.added_flows.push_back(std::move(*flow));
      }
    }
  }
}

// Learning an address once more leaves its flow the timeout that it has.
void RunningBridge::add_renewed(WantedBridge const &wanted, openvswitch::Difference &difference,
                                Deadline deadline) {
  aging_ = wanted.aging;
  age(deadline);
  auto renewed = memory_.with_other_timeouts(key_, wanted.flows->flows);
  std::ranges::move(renewed, std::back_inserter(difference.added_flows));
}

std::vector<Flow> RunningBridge::learned_flows(openvswitch::LearnedFlows const &learned,
                                               Deadline deadline) {
  if (learned.table != openvswitch::table::kRecentSources) {
    return memory_.learned(key_, learned);
  }
  std::vector<Flow> flows;
  for (auto &entry : connection_.flows(
           {.table = learned.table, .cookie = learned.cookie, .cookie_mask = ~std::uint64_t{0}},
           deadline)) {
    flows.push_back(std::move(entry.flow));
  }
  return flows;
}

// What is put somewhere is not where it was learned, and not there again when it is taken away.
std::vector<Flow> RunningBridge::learned_elsewhere(
    openvswitch::Difference const &difference) const {
  std::vector<Flow> learned;
  for (auto const &flow : difference.added_flows) {
    if (flow.table == openvswitch::table::kFixedAddresses) {
      if (auto const known = find_known_address(flow.match, openflow::Field::eth_dst)) {
        std::ranges::move(memory_.learned_of(key_, known->first, known->second),
                          std::back_inserter(learned));
      }
    }
  }
  return learned;
}

std::size_t RunningBridge::apply(WantedBridge const &wanted, std::uint64_t change,
                                 std::set<std::string> const &added, Forget const &forget,
                                 Deadline deadline) {
  // What others did is told before what is done here.
  connection_.receive();
  follow_events();
  // A bridge without a marker was made just before.
  bool const is_new = !change_;
  memory_.follow_devices(key_, wanted.ports);
  bool const forgets = wanted.forgets && !has_forgotten_;
  has_forgotten_ = wanted.forgets;
  openflow::Changes changes;
  if (forgets) {
    memory_.forget(key_);
    add_forgetting(changes);
  }
  auto difference = difference_between(*flows_, *wanted.flows);
  if (!forgets) {
    add_relearned(wanted, difference, deadline);
  }
  std::ranges::copy(std::exchange(unplaced_, {}), std::back_inserter(difference.forgotten));
  if (is_new) {
    std::ranges::move(memory_.recall(key_, wanted.flows->flows, wanted.aging, seen_now()),
                      std::back_inserter(difference.added_flows));
  } else {
    if (aging_ != wanted.aging && !forgets) {
      add_renewed(wanted, difference, deadline);
    }
    std::ranges::move(memory_.missed(key_, wanted.flows->flows),
                      std::back_inserter(difference.added_flows));
    std::ranges::copy(first_addresses(wanted, added), std::back_inserter(difference.forgotten));
  }
  if (sessions_ != wanted.sessions || ends_counting(difference)) {
    count(Devices::always, deadline);
  }
  meters_.add(connection_, difference.added_flows, deadline);
  if (!is_new) {
    add_removals(learned_elsewhere(difference), changes);
  }
  add_changes(difference, changes);
  if (change_ != change) {
    changes.emplace_back(openflow::FlowChange{.command = FlowCommand::add,
                                              .flow = openvswitch::generation_marker(change)});
  }
  if (std::exchange(is_closed_, false)) {
    changes.emplace_back(
        openflow::FlowChange{.command = FlowCommand::remove_strict, .flow = gate()});
  }
  totals_.forget();
  if (!changes.empty()) {
    auto const forget_it = forget ? [&] { return forget(name_, change); } : std::function<bool()>();
    try {
      change_and_forget(connection_, changes, change_ != change,
                        size_of(difference) > 0 ? forget_it : nullptr, deadline);
    } catch (openflow::HalfMade const &) {
      // Of the change's own time there may be too little left, and what is half would stay.
      restore(connection_, *flows_, change_.value_or(0), soon());
      if (forget) {
        forget(name_, change_.value_or(0));
      }
      throw;
    }
    have(wanted.flows);
    change_ = change;
    follow_events(Doer::this_connection);
  }
  numbers_ = wanted.numbers;
  sessions_ = wanted.sessions;
  aging_ = wanted.aging;
  aggregated_ = aggregated_devices(wanted.row);
  uplinks_ = chosen_uplinks(wanted);
  return size_of(difference) + std::exchange(added_ahead_, 0);
}

void RunningBridge::send(std::vector<openflow::PacketOut> const &frames, Deadline deadline) {
  for (auto const &frame : frames) {
    connection_.send(frame);
  }
  connection_.barrier(deadline);
  // Not here: this may be what follows from one of them.
  next_events_ = loop_.after(0ms, [this] { read_events(); });
}

std::vector<Learned> RunningBridge::learned(Deadline deadline) {
  auto const sources = age(deadline);
  auto const flows = connection_.flows({.table = openvswitch::table::kLearnedAddresses}, deadline);
  follow_events();
  return learned_of(flows, sources);
}

bool RunningBridge::forget_learned(std::uint32_t port, KnownAddress const &address,
                                   Deadline deadline) {
  connection_.receive();
  follow_events();
  auto const flows = memory_.learned_of(key_, address.first, address.second);
  auto const is_there = [&](Flow const &flow) {
    return flow.table == openvswitch::table::kLearnedAddresses &&
           openvswitch::number_of(flow.cookie) == port;
  };
  if (std::ranges::none_of(flows, is_there)) {
    return false;
  }
  openflow::Changes changes;
  add_removals(flows, changes);
  connection_.change(changes, deadline);
  follow_events(Doer::this_connection);
  return true;
}

std::vector<Source> RunningBridge::age(Deadline deadline) {
  auto const entries = connection_.flows({.table = openvswitch::table::kCountedSources}, deadline);
  follow_events();
  auto sources = memory_.saw(key_, entries, seen_now());
  openflow::Changes changes;
  std::erase_if(sources, [&](Source const &source) {
    bool const goes = is_aged(source.unseen, aging_);
    if (goes) {
      add_removals({where_learned(source.flow), source.flow}, changes);
    }
    return goes;
  });
  if (!changes.empty()) {
    connection_.change(changes, deadline);
    follow_events(Doer::this_connection);
  }
  return sources;
}

}  // namespace simhost::daemon
