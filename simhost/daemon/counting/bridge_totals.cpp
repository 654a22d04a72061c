// A table whose sum is what it was has counted nothing: then its flows are not asked for.
#include "daemon/counting/bridge_totals.h"

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <limits>
#include <utility>
#include <vector>

#include "planes/openvswitch/compile/pipeline.h"

namespace simhost::daemon {
namespace {

using openvswitch::Counted;

using openvswitch::kCountingTables;
using openvswitch::Totals;

// So long nobody is told of frames that a device lost and no flow had.
constexpr std::chrono::seconds kBetweenPorts{10};

bool counts(openflow::Flow const &flow) {
  auto const kind = openvswitch::kind_of(flow.cookie);
  return kind != Counted::nothing && kind != Counted::port &&
         std::ranges::find(kCountingTables, flow.table) != kCountingTables.end();
}

void add_traffic(std::uint64_t cookie, openflow::Traffic const &traffic, Totals &totals) {
  auto &total = totals[cookie];
  total.packets += traffic.packets;
  total.bytes += traffic.bytes;
}

// All ones is what nobody knows.
bool is_same(openflow::Aggregate const &sum, std::optional<openflow::Aggregate> const &before) {
  constexpr auto kUnknown = std::numeric_limits<std::uint64_t>::max();
  return sum == before && sum.traffic.packets != kUnknown && sum.traffic.bytes != kUnknown;
}

void add_device(openflow::PortStatistics const &statistics, std::uint32_t number, Totals &totals) {
  auto const add = [&](Counted kind, std::uint64_t frames) {
    if (frames != std::numeric_limits<std::uint64_t>::max()) {
      // An uplink may be several tunnels.
      totals[openvswitch::cookie(kind, number)].packets += frames;
    }
  };
  // Among those that it dropped on their way in, a device of Linux has all frames that were for
  // nobody but Open vSwitch.
  add(Counted::out_lost, statistics.sent_dropped);
  add(Counted::in_damaged, statistics.received_errors);
  add(Counted::out_damaged, statistics.sent_errors);
}

void add_devices(std::span<openflow::PortStatistics const> ports, PortNumbers const &numbers,
                 Totals &totals) {
  for (auto const &statistics : ports) {
    auto const known = numbers.find(statistics.port);
    if (known != numbers.end()) {
      add_device(statistics, known->second, totals);
    }
  }
}

}  // namespace

Totals totals_of(std::span<openflow::FlowEntry const> flows,
                 std::span<openflow::PortStatistics const> ports, PortNumbers const &numbers) {
  Totals totals;
  for (auto const &entry : flows) {
    if (counts(entry.flow)) {
      add_traffic(entry.flow.cookie, entry.traffic, totals);
    }
  }
  add_devices(ports, numbers, totals);
  return totals;
}

Totals BridgeTotals::ask(openflow::Connection &connection, Devices devices,
                         PortNumbers const &numbers, openvswitch::Deadline deadline) {
  std::vector<openflow::FlowFilter> filters;
  filters.reserve(kCountingTables.size() + 1);
  for (auto const table : kCountingTables) {
    filters.push_back({.table = table});
  }
  filters.push_back({.table = openvswitch::table::kRecentSources});
  bool const are_ports_asked = are_ports_due(devices);
  auto sums = connection.sums_of(filters, are_ports_asked, deadline);
  if (are_ports_asked) {
    ports_ = std::move(sums.ports);
    asked_ports_ = openvswitch::Deadline::clock::now();
  }
  has_recent_sources_ = sums.flows.back().flows != 0;
  has_counted_ = ask_for_flows(connection, sums.flows, deadline);
  Totals totals;
  for (auto const &table : tables_) {
    for (auto const &flow : table.flows) {
      add_traffic(flow.cookie, flow.traffic, totals);
    }
  }
  add_devices(ports_, numbers, totals);
  return totals;
}

// When a flow counts, what devices make of it may follow.
bool BridgeTotals::are_ports_due(Devices devices) const {
  return devices == Devices::always || !asked_ports_ || has_counted_ ||
         openvswitch::Deadline::clock::now() - *asked_ports_ >= kBetweenPorts;
}

// Returns whether any may have counted. What they count meanwhile makes the sum another one the
// next time.
bool BridgeTotals::ask_for_flows(openflow::Connection &connection,
                                 std::vector<openflow::Aggregate> const &sums,
                                 openvswitch::Deadline deadline) {
  std::vector<openflow::FlowFilter> filters;
  for (std::size_t place = 0; place < tables_.size(); ++place) {
    auto &table = tables_[place];
    if (!is_same(sums[place], table.sum)) {
      filters.push_back({.table = kCountingTables[place]});
      table = {};
    }
  }
  if (filters.empty()) {
    return false;
  }
  for (auto const &entry : connection.flows_of(filters, deadline)) {
    if (counts(entry.flow)) {
      auto const place = std::ranges::find(kCountingTables, entry.flow.table);
      tables_[static_cast<std::size_t>(place - kCountingTables.begin())].flows.push_back(
          {.cookie = entry.flow.cookie, .traffic = entry.traffic});
    }
  }
  for (std::size_t place = 0; place < tables_.size(); ++place) {
    tables_[place].sum = sums[place];
  }
  return true;
}

void BridgeTotals::forget() {
  *this = {};
}

}  // namespace simhost::daemon
