// One socket for each request: there are few.
#include "events/netlink_request.h"

#include <sys/socket.h>

#include <stdexcept>

#include "events/descriptor.h"

namespace simhost::events {

NetlinkRequest &NetlinkRequest::with(std::uint16_t type, std::span<std::byte const> content) {
  auto *const attribute =
      reinterpret_cast<rtattr *>(bytes_.data() + NLMSG_ALIGN(header().nlmsg_len));
  attribute->rta_type = type;
  attribute->rta_len = static_cast<std::uint16_t>(RTA_LENGTH(content.size()));
  std::memcpy(RTA_DATA(attribute), content.data(), content.size());
  header().nlmsg_len = NLMSG_ALIGN(header().nlmsg_len) + RTA_ALIGN(attribute->rta_len);
  return *this;
}

nlmsghdr &NetlinkRequest::exchanged(int protocol) {
  auto const socket = owned(::socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC, protocol), "netlink");
  if (send(socket.number(), bytes_.data(), header().nlmsg_len, 0) < 0) {
    fail_with_errno("netlink");
  }
  auto const size = recv(socket.number(), bytes_.data(), bytes_.size(), 0);
  if (size < 0) {
    fail_with_errno("netlink");
  }
  if (!NLMSG_OK(&header(), static_cast<std::size_t>(size))) {
    throw std::runtime_error("the kernel says by netlink what nobody understands");
  }
  return header();
}

int error_in(nlmsghdr &reply) {
  return reply.nlmsg_type == NLMSG_ERROR ? -static_cast<nlmsgerr const *>(NLMSG_DATA(&reply))->error
                                         : 0;
}

}  // namespace simhost::events
