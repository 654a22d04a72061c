// Sending a frame to several ports. One flow holds no more than so many ports: what has more goes
// in pieces, by kPiece, which has to be that of the first one before.
#pragma once

#include <cstdint>
#include <vector>

#include "planes/openvswitch/compile/plan.h"
#include "planes/openvswitch/compile/program.h"

namespace simhost::openvswitch {

using Ports = std::vector<Port const *>;

/// Where the flows of a list are.
struct ListPlace {
  std::uint8_t table;
  std::uint16_t priority;
  Match match;  ///< of the list
  std::uint32_t first_piece = 0;
  /// Whether its frames may be of other VLANs than its ports are in.
  bool has_any_vlan = false;
};

/// The piece of that number in a table of lists.
Actions to_piece(std::uint8_t table, std::uint32_t number);
/// A list, from its first port on.
Actions to_list(List list);

/// Adds the flow, or the flows, that send a frame to ports and go on with `after`.
void add_ports(Plan const &plan, Program &program, ListPlace const &place, Ports const &ports,
               Actions const &after);

}  // namespace simhost::openvswitch
