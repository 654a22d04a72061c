// What a bridge and its devices have counted, asked of it again and again: of flows that have
// counted nothing since it takes Open vSwitch far less to say no more than that.
#pragma once

#include <array>
#include <cstdint>
#include <map>
#include <optional>
#include <span>
#include <vector>

#include "planes/openvswitch/compile/pipeline.h"
#include "planes/openvswitch/counting/tally.h"
#include "planes/openvswitch/openflow/connection.h"

namespace simhost::daemon {

/// Ports by the numbers that the bridge has for them.
using PortNumbers = std::map<openflow::Port, std::uint32_t>;

/// Open vSwitch adds to a flow what its data path counted half a second later at most; devices
/// count at once. Flows that do not count may be among them.
openvswitch::Totals totals_of(std::span<openflow::FlowEntry const> flows,
                              std::span<openflow::PortStatistics const> ports,
                              PortNumbers const &numbers);

/// Whether devices are asked where nothing says that they counted: it takes as long for each of
/// them as it does for its flows.
enum class Devices { always, now_and_then };

class BridgeTotals {
 public:
  /// Returns all that was counted until now: by devices, until some seconds ago if that is enough
  /// and no flow counted since. Throws what a Connection does.
  openvswitch::Totals ask(openflow::Connection &connection, Devices devices,
                          PortNumbers const &numbers, openvswitch::Deadline deadline);
  /// Flows and ports may be others than they were.
  void forget();
  /// Whether there were addresses in table::kRecentSources when it was asked last.
  [[nodiscard]] bool has_recent_sources() const { return has_recent_sources_; }

 private:
  struct OfFlow {
    std::uint64_t cookie;
    openflow::Traffic traffic;
  };
  struct OfTable {
    std::optional<openflow::Aggregate> sum;  // none of flows that may be others
    std::vector<OfFlow> flows;
  };

  [[nodiscard]] bool are_ports_due(Devices devices) const;
  bool ask_for_flows(openflow::Connection &connection, std::vector<openflow::Aggregate> const &sums,
                     openvswitch::Deadline deadline);

  std::array<OfTable, openvswitch::kCountingTables.size()> tables_;
  std::vector<openflow::PortStatistics> ports_;
  std::optional<openvswitch::Deadline> asked_ports_;  // if they are these yet
  bool has_counted_ = false;                          // a flow, when it was asked last
  bool has_recent_sources_ = true;
};

}  // namespace simhost::daemon
