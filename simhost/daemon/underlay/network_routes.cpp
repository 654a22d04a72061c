// What rtnetlink says of addresses and routes.
#include "daemon/underlay/network_routes.h"

#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <net/if.h>

#include <array>
#include <cerrno>
#include <cstring>
#include <system_error>

#include "daemon/underlay/address_family.h"
#include "events/netlink_request.h"

namespace simhost::daemon {
namespace {

using events::error_in;
using events::NetlinkRequest;
using storage::AddressBytes;

std::uint8_t bits_of(AddressBytes const &address) {
  return static_cast<std::uint8_t>(address.size() * 8);
}

// Whether it was not so before.
bool request(NetlinkRequest request, char const *what) {
  auto const error = error_in(request.exchanged());
  if (error != 0 && error != EEXIST) {
    throw std::system_error(error, std::generic_category(), what);
  }
  return error == 0;
}

std::optional<std::uint32_t> mtu_in(rtattr const &metrics) {
  auto size = RTA_PAYLOAD(&metrics);
  for (auto const *one = static_cast<rtattr const *>(RTA_DATA(&metrics)); RTA_OK(one, size);
       one = RTA_NEXT(one, size)) {
    if (one->rta_type == RTAX_MTU) {
      std::uint32_t mtu = 0;
      std::memcpy(&mtu, RTA_DATA(one), sizeof mtu);
      return mtu;
    }
  }
  return std::nullopt;
}

std::string device_in(rtattr const &attribute) {
  unsigned index = 0;
  std::memcpy(&index, RTA_DATA(&attribute), sizeof index);
  std::array<char, IF_NAMESIZE> name{};
  return if_indextoname(index, name.data()) == nullptr ? std::string() : name.data();
}

}  // namespace

bool put_address(unsigned device, AddressBytes const &address, std::uint8_t prefix) {
  ifaddrmsg body{};
  body.ifa_family = family_of(address);
  body.ifa_prefixlen = prefix;
  body.ifa_index = device;
  // Nobody waits until the network was asked whether another one has it.
  body.ifa_flags = address.size() == 4 ? 0 : IFA_F_NODAD;
  NetlinkRequest told(RTM_NEWADDR, NLM_F_ACK | NLM_F_CREATE | NLM_F_EXCL, body);
  told.with(IFA_LOCAL, address).with(IFA_ADDRESS, address);
  return request(told, "the address of the underlay");
}

bool put_default_route(unsigned device, AddressBytes const &gateway) {
  rtmsg body{};
  body.rtm_family = family_of(gateway);
  body.rtm_table = RT_TABLE_MAIN;
  body.rtm_protocol = RTPROT_STATIC;
  body.rtm_scope = RT_SCOPE_UNIVERSE;
  body.rtm_type = RTN_UNICAST;
  NetlinkRequest told(RTM_NEWROUTE, NLM_F_ACK | NLM_F_CREATE | NLM_F_EXCL, body);
  told.with(RTA_GATEWAY, gateway).with(RTA_OIF, device);
  return request(told, "the gateway of the underlay");
}

std::optional<Route> find_route(AddressBytes const &address) {
  rtmsg body{};
  body.rtm_family = family_of(address);
  body.rtm_dst_len = bits_of(address);
  NetlinkRequest asked(RTM_GETROUTE, 0, body);
  auto &reply = asked.with(RTA_DST, address).exchanged();
  if (error_in(reply) != 0) {
    return std::nullopt;
  }
  auto const &route = *static_cast<rtmsg const *>(NLMSG_DATA(&reply));
  if (route.rtm_type != RTN_UNICAST && route.rtm_type != RTN_LOCAL) {
    return std::nullopt;
  }
  Route found{.is_local = route.rtm_type == RTN_LOCAL};
  auto size = RTM_PAYLOAD(&reply);
  for (auto const *attribute = RTM_RTA(&route); RTA_OK(attribute, size);
       attribute = RTA_NEXT(attribute, size)) {
    if (attribute->rta_type == RTA_OIF) {
      found.device = device_in(*attribute);
    } else if (attribute->rta_type == RTA_GATEWAY) {
      auto const *const first = static_cast<std::byte const *>(RTA_DATA(attribute));
      found.gateway.assign(first, first + RTA_PAYLOAD(attribute));
    } else if (attribute->rta_type == RTA_METRICS) {
      found.mtu = mtu_in(*attribute);
    }
  }
  return found;
}

}  // namespace simhost::daemon
