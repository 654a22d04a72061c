// Entries of the kernel's table of neighbours.
#include "daemon/underlay/neighbors.h"

#include <linux/neighbour.h>

#include <cerrno>
#include <system_error>

#include "daemon/underlay/address_family.h"
#include "events/netlink_request.h"

namespace simhost::daemon {
namespace {

using events::error_in;
using events::NetlinkRequest;

// With an address of Ethernet that nobody has found wrong.
constexpr unsigned kKnown =
    NUD_REACHABLE | NUD_STALE | NUD_DELAY | NUD_PROBE | NUD_PERMANENT | NUD_NOARP;

ndmsg entry_of(unsigned device, storage::AddressBytes const &address) {
  ndmsg entry{};
  entry.ndm_family = family_of(address);
  entry.ndm_ifindex = static_cast<int>(device);
  return entry;
}

bool is_known(unsigned device, storage::AddressBytes const &address) {
  NetlinkRequest asked(RTM_GETNEIGH, 0, entry_of(device, address));
  auto &reply = asked.with(NDA_DST, address).exchanged();
  auto const error = error_in(reply);
  if (error == ENOENT) {
    return false;
  }
  if (error != 0) {
    throw std::system_error(error, std::generic_category(), "the neighbours of the underlay");
  }
  return (static_cast<ndmsg const *>(NLMSG_DATA(&reply))->ndm_state & kKnown) != 0;
}

void ask(unsigned device, storage::AddressBytes const &address) {
  auto entry = entry_of(device, address);
  entry.ndm_flags = NTF_USE;
  entry.ndm_state = NUD_NONE;
  NetlinkRequest told(RTM_NEWNEIGH, NLM_F_ACK | NLM_F_CREATE | NLM_F_REPLACE, entry);
  auto const error = error_in(told.with(NDA_DST, address).exchanged());
  if (error != 0) {
    throw std::system_error(error, std::generic_category(), "the neighbours of the underlay");
  }
}

}  // namespace

bool replies(unsigned device, storage::AddressBytes const &address) {
  bool const known = is_known(device, address);
  ask(device, address);
  return known;
}

}  // namespace simhost::daemon
