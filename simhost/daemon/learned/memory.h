// What bridges have learned, kept past their end and the daemon's: Open vSwitch forgets it when it
// is started anew, and a client that says nothing would not be reached until it does.
#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <set>
#include <span>
#include <string>
#include <tuple>
#include <vector>

#include "daemon/learned/ageing.h"
#include "planes/openvswitch/openflow/flow.h"
#include "planes/openvswitch/openflow/replies.h"
#include "planes/openvswitch/reconcile/difference.h"
#include "storage/running/remembered.h"
#include "storage/store.h"

namespace simhost::daemon {

/// What a flow of a table that a bridge fills by itself says that it learned; nothing for a flow
/// that no bridge taught itself.
std::optional<storage::Remembered> learned_in(openflow::Flow const &flow);

/// The flow that knows a source as a destination, as far as its place goes.
openflow::Flow where_learned(openflow::Flow const &source);

class Memory {
 public:
  /// `changed` is told when there is something to save. Nothing of this may be called in a
  /// transaction on the store.
  Memory(storage::Store &store, std::function<void()> changed)
      : store_(store), changed_(std::move(changed)) {}

  /// A bridge was told, or learned, a flow of a table that it fills by itself; or lost one. Returns
  /// the port at which an address is learned that was learned elsewhere; 0 beyond the uplinks.
  std::optional<std::uint32_t> follow(storage::SwitchKey key, openflow::FlowUpdate const &update);
  /// Somebody took a flow from a bridge, which is to have it again. Returns whether it was known.
  bool miss(storage::SwitchKey key, openflow::Flow const &flow);
  /// A bridge has these flows in its tables, and what it was known to have besides it has lost, but
  /// for what is missed.
  void replace(storage::SwitchKey key, std::span<openflow::Flow const> flows);
  /// The devices of a bridge, with the numbers of their ports. What was learned at a port that has
  /// another device than before is forgotten.
  void follow_devices(storage::SwitchKey key, std::map<std::string, std::uint32_t> const &devices);
  /// What a bridge says of the flows of table::kCountedSources: returns for how long nothing came
  /// from those that are followed.
  std::vector<Source> saw(storage::SwitchKey key, std::span<openflow::FlowEntry const> sources,
                          storage::SeenAt now);
  /// Nothing that a bridge knows is to be known once more.
  void forget(storage::SwitchKey key);
  /// Forgets all switches but these, which the state has.
  void keep(std::set<storage::SwitchKey> const &switches);
  /// What was learned at a port of a bridge.
  [[nodiscard]] std::vector<openflow::Flow> learned_at(storage::SwitchKey key,
                                                       std::uint32_t port) const;
  /// The addresses that are learned at any port, or beyond the uplinks.
  [[nodiscard]] std::vector<openflow::Flow> learned_addresses(storage::SwitchKey key) const;
  /// What is learned of an address in a VLAN: where it is, and that it has room.
  [[nodiscard]] std::vector<openflow::Flow> learned_of(storage::SwitchKey key,
                                                       openflow::EthernetAddress const &address,
                                                       std::uint16_t vlan) const;
  /// Likewise what a cookie knows, but for table::kRecentSources, which is not followed.
  [[nodiscard]] std::vector<openflow::Flow> learned(storage::SwitchKey key,
                                                    openvswitch::LearnedFlows const &known) const;
  /// What a bridge that is to have these flows knows once more. What was not seen for too long is
  /// forgotten.
  [[nodiscard]] std::vector<openflow::Flow> recall(storage::SwitchKey key,
                                                   openflow::FlowParts const &wanted,
                                                   std::chrono::seconds aging, storage::SeenAt now);
  /// What is missed of what a bridge knows that is to have these flows.
  [[nodiscard]] std::vector<openflow::Flow> missed(storage::SwitchKey key,
                                                   openflow::FlowParts const &wanted) const;
  /// What a bridge knows for another time than these flows would teach it.
  [[nodiscard]] std::vector<openflow::Flow> with_other_timeouts(
      storage::SwitchKey key, openflow::FlowParts const &wanted) const;

  /// Puts into the state what is not there yet. Returns whether all of it is: nothing is put while
  /// somebody else writes.
  bool save();

 private:
  using Place = std::tuple<std::uint8_t, std::uint16_t, openflow::Match>;

  struct Known {
    openflow::Flow flow;
    Sighting seen = {};  // of a source
    bool is_missed = false;
  };

  struct OfBridge {
    std::map<std::string, std::uint32_t> devices = {};
    std::map<Place, Known> flows = {};
  };

  struct Unsaved {
    storage::SwitchKey key;
    storage::Remembered address;
    bool is_known;
  };

  OfBridge &of_bridge(storage::SwitchKey key);
  void note(storage::SwitchKey key, Known const &known, bool is_known);
  template <typename IsGone>
  void remove(storage::SwitchKey key, IsGone const &is_gone);
  // Those of which something is true.
  template <typename Condition>
  [[nodiscard]] std::vector<openflow::Flow> flows_that(storage::SwitchKey key,
                                                       Condition const &condition) const;

  storage::Store &store_;
  std::function<void()> changed_;
  std::map<storage::SwitchKey, OfBridge> bridges_;
  std::vector<Unsaved> unsaved_;  // in the order in which it came to be known
};

}  // namespace simhost::daemon
