// Flows of the tables that count, and statistics of ports.
#include "daemon/counting/bridge_totals.h"

#include <algorithm>
#include <limits>
#include <vector>

#include "planes/openvswitch/compile/pipeline.h"

namespace simhost::daemon {
namespace {

using openvswitch::Counted;

bool counts(openflow::Flow const &flow) {
  auto const kind = openvswitch::kind_of(flow.cookie);
  return kind != Counted::nothing && kind != Counted::port &&
         std::ranges::find(openvswitch::kCountingTables, flow.table) !=
             openvswitch::kCountingTables.end();
}

void add_flow(openflow::FlowEntry const &entry, openvswitch::Totals &totals) {
  if (counts(entry.flow)) {
    auto &total = totals[entry.flow.cookie];
    total.packets += entry.traffic.packets;
    total.bytes += entry.traffic.bytes;
  }
}

void add_device(openflow::PortStatistics const &statistics, std::uint32_t number,
                openvswitch::Totals &totals) {
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

}  // namespace

std::vector<openflow::FlowEntry> counting_flows(openflow::Connection &connection,
                                                openvswitch::Deadline deadline) {
  std::vector<openflow::FlowFilter> counting;
  counting.reserve(openvswitch::kCountingTables.size());
  for (auto const table : openvswitch::kCountingTables) {
    counting.push_back({.table = table});
  }
  return connection.flows_of(counting, deadline);
}

openvswitch::Totals totals_of(std::span<openflow::FlowEntry const> flows,
                              std::span<openflow::PortStatistics const> ports,
                              PortNumbers const &numbers) {
  openvswitch::Totals totals;
  for (auto const &entry : flows) {
    add_flow(entry, totals);
  }
  for (auto const &statistics : ports) {
    auto const known = numbers.find(statistics.port);
    if (known != numbers.end()) {
      add_device(statistics, known->second, totals);
    }
  }
  return totals;
}

}  // namespace simhost::daemon
