// The bridges of an Open vSwitch, made as they are wanted: rows by its database, flows and groups
// by a connection to each bridge.
#pragma once

#include <cstdint>
#include <filesystem>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "daemon/bridge/running_bridge.h"
#include "daemon/learned/ageing.h"
#include "daemon/learned/mac_table.h"
#include "daemon/learned/memory.h"
#include "daemon/wanted.h"
#include "events/loop.h"
#include "planes/openvswitch/ovsdb/client.h"
#include "planes/openvswitch/rows/rows.h"

namespace simhost::daemon {

/// Whatever goes wrong with an Open vSwitch is thrown, and what is known of it is of no more use:
/// its owner makes another one.
class Bridges {
 public:
  struct Told {
    std::string
        owner;  ///< how this process is called in words, for another one that wants to write
    std::string host;
    /// The database has rows that are others than before, whoever changed them.
    std::function<void()> changed;
    /// The connection to the database ended, or is of no more use.
    std::function<void(std::string const &why)> disturbed;
    /// What bridges tell.
    RunningBridge::Told of_bridges;
  };

  /// Connects to the database at `socket`; the sockets of bridges are beside it. Throws
  /// std::runtime_error, which says who writes to the database if somebody else does.
  /// `memory` outlives it. For `lives` see openvswitch::Stream.
  Bridges(events::Loop &loop, std::filesystem::path const &socket, openvswitch::Lives lives,
          Memory &memory, Told told);
  Bridges(Bridges const &) = delete;
  Bridges &operator=(Bridges const &) = delete;

  /// The bridge of somebody else that has a device.
  std::optional<std::string> elsewhere(std::string const &device);
  /// Why Open vSwitch cannot use devices at the bridges.
  std::map<std::string, std::string> const &errors() { return present().errors; }
  /// Whether frames may go out at a port of the bridge of a switch: it has a link and, in a group,
  /// a partner. Nothing while there is no bridge of it.
  [[nodiscard]] std::optional<bool> is_live(storage::SwitchKey key, openflow::Port port) const;
  using Forget = RunningBridge::Forget;
  struct Applied {
    std::size_t changed = 0;     ///< flows and groups, markers not counted
    std::vector<Unfit> refused;  ///< by Open vSwitch
  };
  /// Makes everything as it is wanted, and returns when it is in force: for frames of kinds that
  /// were there before, only with `forget`.
  Applied apply(Wanted const &wanted, Forget const &forget = nullptr);
  /// Sends frames from the bridge of a switch; returns whether there is one.
  bool send(storage::SwitchKey key, std::vector<openflow::PacketOut> const &frames);
  /// Tells what all bridges counted, and where addresses moved.
  void count(Devices devices);
  /// Likewise of the bridge of a switch, unless that was told just before.
  void count(storage::SwitchKey key);
  /// What the bridge of a switch has learned.
  std::vector<Learned> learned(storage::SwitchKey key);
  /// See RunningBridge::forget_learned().
  bool forget_learned(storage::SwitchKey key, std::uint32_t port, KnownAddress const &address);
  /// Looks when addresses were seen last, and takes out those for which that is too long ago.
  /// Returns when to do so again.
  Unseen age();

 private:
  struct RowsMade {
    std::vector<openvswitch::BridgeRow> rows;
    std::uint32_t most_tags = 0;

    bool operator==(RowsMade const &) const = default;
  };

  [[noreturn]] void fail_as_another_owns_it();
  bool take_database_events();
  void read_database_events();
  openvswitch::PresentRows const &present();
  void forget_rows();
  [[nodiscard]] bool is_signed() { return present().owner == told_.owner; }
  void sign(openvswitch::Deadline deadline);
  // How many Open vSwitch is to tell apart.
  std::uint32_t most_tags(Wanted const &wanted);
  // Returns the devices that were put at bridges.
  std::set<std::string> apply_rows(std::vector<openvswitch::BridgeRow> const &rows,
                                   std::uint32_t most_tags, openvswitch::Deadline deadline);
  void try_flows(WantedBridge const &wanted, std::uint64_t change,
                 std::set<std::string> const &added, Forget const &forget,
                 openvswitch::Deadline deadline, Applied &applied);
  RunningBridge &connected(WantedBridge const &wanted, openvswitch::Deadline deadline);
  [[nodiscard]] RunningBridge *find(storage::SwitchKey key) const;

  events::Loop &loop_;
  Place place_;
  Memory &memory_;
  Told told_;
  ovsdb::Client database_;
  // None once the database has changed: most changes are none of rows, and take no look at them.
  std::optional<openvswitch::PresentRows> present_;
  std::optional<RowsMade> rows_made_;  // of which nothing in those differs
  events::Loop::Watch database_watch_;
  events::Loop::Timer next_database_events_;
  std::map<storage::SwitchKey, std::unique_ptr<RunningBridge>> bridges_;
};

}  // namespace simhost::daemon
