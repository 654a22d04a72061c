// Telling the network where a client is, which has said nothing by itself.
#pragma once

#include <cstdint>

#include "planes/openvswitch/compile/network.h"
#include "planes/openvswitch/openflow/requests.h"

namespace simhost::openvswitch {

struct Announced {
  openflow::Port port = 0;   ///< the client's
  std::uint32_t number = 0;  ///< of the port of the switch
  EthernetAddress address = {};
  std::uint16_t vlan = 0;  ///< 0 for none

  friend auto operator<=>(Announced const &, Announced const &) = default;
};

/// A reverse-ARP packet that goes out over the uplink that carries what the client sends, and
/// nowhere else. It is known for one of this switch's if it comes back.
openflow::PacketOut announcement(Announced const &announced);

}  // namespace simhost::openvswitch
