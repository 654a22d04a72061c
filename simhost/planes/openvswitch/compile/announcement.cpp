// A frame of RFC 903 that asks for the address of whoever it is about, to all.
#include "planes/openvswitch/compile/announcement.h"

#include <algorithm>
#include <iterator>
#include <vector>

#include "planes/openvswitch/compile/pipeline.h"
#include "planes/openvswitch/compile/program.h"
#include "planes/openvswitch/compile/stages/recent_sources.h"

namespace simhost::openvswitch {
namespace {

using Frame = std::vector<std::uint8_t>;

// Without their checksum.
constexpr std::size_t kShortestFrame = 60;

void append_address(Frame &frame, EthernetAddress const &address) {
  std::ranges::copy(address, std::back_inserter(frame));
}

Frame reverse_arp(EthernetAddress const &address) {
  Frame frame(address.size(), 0xff);
  append_address(frame, address);
  // Reverse ARP: between Ethernet and IPv4, with addresses of 6 and 4 bytes, a request.
  frame.insert(frame.end(), {0x80, 0x35, 0x00, 0x01, 0x08, 0x00, 0x06, 0x04, 0x00, 0x03});
  for (int twice = 0; twice < 2; ++twice) {
    append_address(frame, address);
    frame.insert(frame.end(), {0, 0, 0, 0});
  }
  frame.resize(kShortestFrame);
  return frame;
}

}  // namespace

openflow::PacketOut announcement(Announced const &announced) {
  return {.in_port = announced.port,
          .actions = {openflow::set(field::kVlan, announced.vlan),
                      openflow::set(field::kDomain, announced.vlan),
                      recent_source(announced.number, Recent::drops), go_to(table::kTeams)},
          .frame = reverse_arp(announced.address)};
}

}  // namespace simhost::openvswitch
