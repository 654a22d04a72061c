// A bridge of an Open vSwitch over a connection of its own: what it has is read once, and it is
// told no more than what differs.
#pragma once

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <optional>
#include <set>
#include <span>
#include <string>
#include <vector>

#include "daemon/bridge/live_ports.h"
#include "daemon/bridge/meters.h"
#include "daemon/learned/ageing.h"
#include "daemon/learned/mac_table.h"
#include "daemon/learned/memory.h"
#include "daemon/learned/taught.h"
#include "daemon/wanted.h"
#include "events/loop.h"
#include "planes/openvswitch/openflow/connection.h"
#include "planes/openvswitch/reconcile/difference.h"

namespace simhost::daemon {

/// Where an Open vSwitch is.
struct Place {
  std::filesystem::path folder;  ///< of its sockets
  openvswitch::Lives lives;      ///< see openvswitch::Stream
};

/// What goes wrong with it is thrown as std::runtime_error, and then it is of no more use.
class RunningBridge {
 public:
  struct Told {
    /// What it counted, and for which mirror sessions; see Tally.
    std::function<void(storage::SwitchKey, openvswitch::Totals const &,
                       openvswitch::CountedSessions const &)>
        counted;
    /// An address moved to a port, or beyond the uplinks (0).
    std::function<void(storage::SwitchKey, std::uint32_t port)> moved;
    /// Somebody else changed flows or groups of the bridge of that name.
    std::function<void(std::string const &)> altered;
    /// It has learned what its flows do not teach, or not any more.
    std::function<void()> strayed;
    /// Uplinks, or devices in groups, are live, or are not any more; see is_live().
    std::function<void()> lived;
    /// A flow sent up a frame.
    std::function<void(storage::SwitchKey, openflow::PacketIn const &)> heard;
    /// The connection ended, or is of no more use.
    std::function<void(std::string const &why)> disturbed;
  };

  /// Makes what is remembered of flows be forgotten, as forget_cached_flows(). Throws nothing.
  using Forget = std::function<bool(std::string const &bridge, std::uint64_t generation)>;

  /// Connects to it, by its socket in that place. Those that are referred to outlive it.
  RunningBridge(events::Loop &loop, Place const &place, Memory &memory, Told const &told,
                WantedBridge const &wanted, openvswitch::Deadline deadline);
  RunningBridge(RunningBridge const &) = delete;
  RunningBridge &operator=(RunningBridge const &) = delete;

  /// Whether what is known of it may be wrong: its owner makes another one before the next change.
  [[nodiscard]] bool is_altered() const { return is_altered_; }
  void doubt() { is_altered_ = true; }
  [[nodiscard]] std::chrono::seconds aging() const { return aging_; }
  /// See Bridges::is_live().
  [[nodiscard]] bool is_live(openflow::Port port) const { return live_.contains(port); }

  /// Makes it as it is wanted, of that change and with these devices that it did not have before.
  /// Returns how many flows and groups that changed.
  std::size_t apply(WantedBridge const &wanted, std::uint64_t change,
                    std::set<std::string> const &added, Forget const &forget,
                    openvswitch::Deadline deadline);
  void send(std::vector<openflow::PacketOut> const &frames, openvswitch::Deadline deadline);
  /// Tells what it counted.
  void count(Devices devices, openvswitch::Deadline deadline);
  /// Likewise, unless that was told just before.
  void count_anew(openvswitch::Deadline deadline);
  /// Looks for what strayed where so much comes and goes that nobody follows it.
  void look_for_strays(openvswitch::Deadline deadline);
  std::vector<Learned> learned(openvswitch::Deadline deadline);
  /// Takes out what is learned of an address in a VLAN at a port (0: beyond the uplinks). Returns
  /// whether anything is.
  bool forget_learned(std::uint32_t port, KnownAddress const &address,
                      openvswitch::Deadline deadline);
  /// Returns when the addresses that stay were seen last; the others are taken out.
  std::vector<Source> age(openvswitch::Deadline deadline);

 private:
  // What is there once it is told of changes, so that none is missed.
  void take(openflow::Contents contents);
  void tell_counted(openvswitch::Totals const &totals);
  void add_relearned(WantedBridge const &wanted, openvswitch::Difference &difference,
                     openvswitch::Deadline deadline);
  void add_renewed(WantedBridge const &wanted, openvswitch::Difference &difference,
                   openvswitch::Deadline deadline);
  [[nodiscard]] std::vector<openflow::Flow> learned_elsewhere(
      openvswitch::Difference const &difference) const;
  std::vector<openflow::Flow> learned_flows(openvswitch::LearnedFlows const &learned,
                                            openvswitch::Deadline deadline);
  // Who did what the switch tells of.
  enum class Doer { others, this_connection };
  void read_events();
  void follow_events(Doer doer = Doer::others);
  void follow_learned(openflow::FlowUpdate const &update, Doer doer);
  void note_origin(Origin origin);
  void have(Flows flows);

  events::Loop &loop_;
  Memory &memory_;
  Told const &told_;
  storage::SwitchKey key_;
  std::string name_;
  openflow::Connection connection_;
  Flows flows_;    // that it has
  Taught taught_;  // by these
  // Flows that nobody here made, before what it has is put right.
  std::vector<openvswitch::LearnedFlows> unplaced_;
  std::optional<std::uint64_t> change_;  // that is in force
  bool is_altered_ = false;              // so that those before are none of it any more
  bool has_forgotten_ = false;           // what it had learned, for a restart of the host
  // Of the flows as they are.
  PortNumbers numbers_;
  openvswitch::CountedSessions sessions_;
  std::chrono::seconds aging_{};
  LivePorts live_;
  std::set<std::string> aggregated_;  // devices that are in groups
  std::set<openflow::Port> uplinks_;  // that are chosen from by their links
  BridgeTotals totals_;
  openvswitch::Deadline counted_{};
  std::size_t added_ahead_ = 0;  // of flows and groups, before what it has was read
  bool is_closed_ = false;       // by gate()
  Meters meters_;
  events::Loop::Watch watch_;
  events::Loop::Timer next_events_;
};

}  // namespace simhost::daemon
