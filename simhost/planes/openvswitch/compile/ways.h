// Ways: how ports reach the network beyond the uplinks. Ports of one team that use the same uplinks
// in the same order go the same way, and what comes in is for all ports of a way or for none.
#pragma once

#include <cstdint>
#include <map>
#include <vector>

#include "planes/openvswitch/compile/network.h"

namespace simhost::openvswitch {

struct Way {
  /// Not 0, and below 2 to the power of 28; it stays while others come and go.
  std::uint32_t number = 0;
  Balance balance = Balance::first;
  /// The first slot with a link carries everything; in balances that look into frames, all do.
  std::vector<Slot> slots;

  /// Whether there is nothing to choose.
  [[nodiscard]] bool is_single() const { return slots.size() == 1 && slots.front().size() == 1; }
  /// Whether each frame may take another uplink.
  [[nodiscard]] bool spreads_frames() const {
    return balance == Balance::source || balance == Balance::addresses;
  }
};

/// The uplinks of a slot: no more are ever aggregated.
inline constexpr std::uint32_t kMostInSlot = 32;

/// How a slot is known: its uplinks may be in another order elsewhere.
openflow::Port name_of(Slot const &slot);

class Ways {
 public:
  explicit Ways(Network const &network);

  [[nodiscard]] std::vector<Way> const &all() const { return ways_; }
  /// Null for a port that reaches no uplink.
  [[nodiscard]] Way const *of(Port const &port) const;

 private:
  void add(Network const &network, Port const &port);

  std::vector<Way> ways_;
  std::map<openflow::Port, std::size_t> of_ports_;
};

}  // namespace simhost::openvswitch
