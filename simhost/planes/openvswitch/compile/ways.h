// Ways: how ports reach the network beyond the uplinks. Ports of one team that use the same uplinks
// in the same order go the same way, and what comes in is for all ports of a way or for none.
#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <vector>

#include "planes/openvswitch/compile/network.h"

namespace simhost::openvswitch {

struct Way {
  /// Not 0, and below 2 to the power of 28; it stays while others come and go.
  std::uint32_t number = 0;
  Balance balance = Balance::first;
  /// The first slot with a link carries everything; in balances that look into frames, all do. The
  /// uplinks of a slot share what it carries by what is in the frames.
  std::vector<Slot> slots;
  /// What the network takes the slots for: the same for all uplinks that it takes for one link, and
  /// of no others.
  std::vector<std::uint32_t> links;

  /// Whether what comes in at an uplink comes in at a slot.
  [[nodiscard]] bool is_at(Uplink const &uplink, std::size_t slot) const;
  /// Whether there is nothing to choose.
  [[nodiscard]] bool is_single() const { return slots.size() == 1 && slots.front().size() == 1; }
  /// Whether each frame may take another uplink.
  [[nodiscard]] bool spreads_frames() const {
    return balance == Balance::source || balance == Balance::addresses;
  }
};

/// The uplinks of a slot: no more are ever aggregated.
inline constexpr std::uint32_t kMostInSlot = 32;

class Ways {
 public:
  /// `network` must outlive it.
  explicit Ways(Network const &network);

  [[nodiscard]] std::vector<Way> const &all() const { return ways_; }
  /// Null for a port that reaches no uplink.
  [[nodiscard]] Way const *of(Port const &port) const;

 private:
  void add(Network const &network, Port const &port);
  [[nodiscard]] std::uint32_t link_of(Slot const &slot) const;
  void leave_out_dead(Way &way) const;

  std::map<openflow::Port, Uplink const *> uplinks_;
  std::vector<Way> ways_;
  std::map<openflow::Port, std::size_t> of_ports_;
};

}  // namespace simhost::openvswitch
