// A request by netlink, and its reply.
#pragma once

#include <linux/netlink.h>
#include <linux/rtnetlink.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <span>

namespace simhost::events {

class NetlinkRequest {
 public:
  template <typename Body>
  NetlinkRequest(std::uint16_t type, std::uint16_t flags, Body const &body) {
    header().nlmsg_type = type;
    header().nlmsg_flags = static_cast<std::uint16_t>(NLM_F_REQUEST | flags);
    header().nlmsg_len = NLMSG_LENGTH(sizeof body);
    std::memcpy(NLMSG_DATA(&header()), &body, sizeof body);
  }

  NetlinkRequest &with(std::uint16_t type, std::span<std::byte const> content);
  NetlinkRequest &with(std::uint16_t type, unsigned number) {
    return with(type, std::as_bytes(std::span(&number, 1)));
  }

  /// The kernel's reply, which takes the place of the request.
  nlmsghdr &exchanged(int protocol = NETLINK_ROUTE);

 private:
  nlmsghdr &header() { return *reinterpret_cast<nlmsghdr *>(bytes_.data()); }

  alignas(nlmsghdr) std::array<char, 8192> bytes_{};
};

/// 0, or what the kernel had against it.
int error_in(nlmsghdr &reply);

}  // namespace simhost::events
