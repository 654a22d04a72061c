// Flows of the tables that count, and statistics of ports.
#include "daemon/counting/bridge_totals.h"

#include <limits>
#include <vector>

#include "planes/openvswitch/compile/pipeline.h"

namespace simhost::daemon {
namespace {

using openvswitch::Counted;

void add_flow(openflow::FlowEntry const &entry, openvswitch::Totals &totals) {
  auto const kind = openvswitch::kind_of(entry.flow.cookie);
  if (kind != Counted::nothing && kind != Counted::port) {
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

openvswitch::Totals totals_of(openflow::Connection &connection, PortNumbers const &numbers,
                              openvswitch::Deadline deadline) {
  openvswitch::Totals totals;
  std::vector<openflow::FlowFilter> counting;
  for (auto const table : openvswitch::kCountingTables) {
    counting.push_back({.table = table});
  }
  for (auto const &entry : connection.flows_of(counting, deadline)) {
    add_flow(entry, totals);
  }
  for (auto const &statistics : connection.port_statistics(openflow::kAnyPort, deadline)) {
    auto const known = numbers.find(statistics.port);
    if (known != numbers.end()) {
      add_device(statistics, known->second, totals);
    }
  }
  return totals;
}

}  // namespace simhost::daemon
