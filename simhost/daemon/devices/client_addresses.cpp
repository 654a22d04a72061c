// The kernel says of one end of a veth pair where the other one is, and of that one there what its
// address is.
#include "daemon/devices/client_addresses.h"

#include <linux/if_link.h>
#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <sys/socket.h>

#include <array>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <stdexcept>
#include <string_view>
#include <utility>

#include "events/netlink_request.h"

namespace simhost::daemon {
namespace {

using events::NetlinkRequest;

constexpr int kThisSpace = -1;

events::Descriptor link_socket() {
  return events::owned(socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC | SOCK_NONBLOCK, NETLINK_ROUTE),
                       "socket");
}

// What other namespaces tell, too, which takes more than is needed for all else.
bool has_all_told(events::Descriptor const &socket) {
  int const on = 1;
  return setsockopt(socket.number(), SOL_NETLINK, NETLINK_LISTEN_ALL_NSID, &on, sizeof on) == 0;
}

void have_links_told(events::Descriptor const &socket) {
  sockaddr_nl address{};
  address.nl_family = AF_NETLINK;
  address.nl_groups = RTMGRP_LINK;
  if (bind(socket.number(), reinterpret_cast<sockaddr const *>(&address), sizeof address) != 0) {
    events::fail_with_errno("netlink");
  }
}

// Of a device, or of what one of its attributes holds.
rtattr const *find_among(rtattr const *attribute, std::size_t size, unsigned short type) {
  while (RTA_OK(attribute, size)) {
    if (attribute->rta_type == type) {
      return attribute;
    }
    attribute = RTA_NEXT(attribute, size);
  }
  return nullptr;
}

rtattr const *find_attribute(nlmsghdr const &device, unsigned short type) {
  return find_among(IFLA_RTA(static_cast<ifinfomsg const *>(NLMSG_DATA(&device))),
                    IFLA_PAYLOAD(&device), type);
}

template <typename Number>
Number attribute_as(rtattr const *attribute, Number otherwise) {
  if (attribute != nullptr && RTA_PAYLOAD(attribute) == sizeof otherwise) {
    std::memcpy(&otherwise, RTA_DATA(attribute), sizeof otherwise);
  }
  return otherwise;
}

bool is_veth(nlmsghdr const &device) {
  auto const *info = find_attribute(device, IFLA_LINKINFO);
  auto const *kind = info == nullptr ? nullptr
                                     : find_among(static_cast<rtattr const *>(RTA_DATA(info)),
                                                  RTA_PAYLOAD(info), IFLA_INFO_KIND);
  return kind != nullptr && static_cast<char const *>(RTA_DATA(kind)) == std::string_view("veth");
}

NetlinkRequest question_about(unsigned device) {
  ifinfomsg info{};
  info.ifi_index = static_cast<int>(device);
  NetlinkRequest question(RTM_GETLINK, 0, info);
  question.with(IFLA_EXT_MASK, RTEXT_FILTER_SKIP_STATS);
  return question;
}

// The number here of the namespace that told.
int space_of(msghdr &told) {
  int space = kThisSpace;
  for (auto *header = CMSG_FIRSTHDR(&told); header != nullptr;
       header = CMSG_NXTHDR(&told, header)) {
    if (header->cmsg_level == SOL_NETLINK && header->cmsg_type == NETLINK_LISTEN_ALL_NSID) {
      std::memcpy(&space, CMSG_DATA(header), sizeof space);
    }
  }
  return space;
}

// One that is at a bridge has the frames of others.
std::optional<openflow::EthernetAddress> address_of_its_own(nlmsghdr const &device) {
  auto const *address = find_attribute(device, IFLA_ADDRESS);
  openflow::EthernetAddress own{};
  if (address == nullptr || RTA_PAYLOAD(address) != own.size() ||
      attribute_as(find_attribute(device, IFLA_MASTER), 0U) != 0) {
    return std::nullopt;
  }
  std::memcpy(own.data(), RTA_DATA(address), own.size());
  return own;
}

}  // namespace

ClientAddresses::ClientAddresses(events::Loop &loop, std::function<void()> changed)
    : socket_(link_socket()), hears_all_(has_all_told(socket_)), changed_(std::move(changed)) {
  have_links_told(socket_);
  watch_ = loop.watch(socket_.number(), [this] {
    try {
      take_told();
    } catch (std::runtime_error const &) {
      clients_.clear();  // who looks asks again, and hears what is wrong
      changed_();
    }
  });
}

void ClientAddresses::begin() {
  before_ = std::exchange(clients_, {});
}

std::optional<openflow::EthernetAddress> ClientAddresses::at(unsigned device) {
  auto known = before_.extract(device);
  auto const client = known.empty() ? clients_.try_emplace(device, ask(device)).first
                                    : clients_.insert(std::move(known)).position;
  return client->second.address;
}

void ClientAddresses::look() {
  if (!hears_all_) {
    std::set<unsigned> all;
    for (auto const &[device, client] : clients_) {
      all.insert(device);
    }
    ask_again(all);
  }
}

ClientAddresses::Client ClientAddresses::ask(unsigned device) {
  auto near = question_about(device);
  auto const &said = near.exchanged();
  if (said.nlmsg_type != RTM_NEWLINK || !is_veth(said)) {
    return {};
  }
  Client client;
  client.space = attribute_as(find_attribute(said, IFLA_LINK_NETNSID), kThisSpace);
  client.device = attribute_as(find_attribute(said, IFLA_LINK), 0U);
  auto far = question_about(client.device);
  if (client.space != kThisSpace) {
    far.with(IFLA_TARGET_NETNSID, static_cast<unsigned>(client.space));
  }
  if (auto const &there = far.exchanged(); there.nlmsg_type == RTM_NEWLINK) {
    client.address = address_of_its_own(there);
  }
  return client;
}

void ClientAddresses::ask_again(std::set<unsigned> const &devices) {
  bool has_changed = false;
  for (auto const device : devices) {
    auto const client = ask(device);
    has_changed |= std::exchange(clients_[device], client).address != client.address;
  }
  if (has_changed) {
    changed_();
  }
}

void ClientAddresses::take_told() {
  std::set<unsigned> devices;
  alignas(nlmsghdr) std::array<char, 65536> part;
  alignas(cmsghdr) std::array<char, CMSG_SPACE(sizeof(int))> beside;
  while (true) {
    iovec content{.iov_base = part.data(), .iov_len = part.size()};
    msghdr told{};
    told.msg_iov = &content;
    told.msg_iovlen = 1;
    told.msg_control = beside.data();
    told.msg_controllen = beside.size();
    auto const size = recvmsg(socket_.number(), &told, 0);
    if (size >= 0) {
      note_told({part.data(), static_cast<std::size_t>(size)}, space_of(told), devices);
    } else if (errno == ENOBUFS) {
      // Some were lost.
      for (auto const &[device, client] : clients_) {
        devices.insert(device);
      }
    } else if (errno == EAGAIN) {
      return ask_again(devices);
    } else if (errno != EINTR) {
      events::fail_with_errno("netlink");
    }
  }
}

// A device and its client go, and may come back as others, together; but a client goes alone to
// another namespace.
void ClientAddresses::note_told(std::span<char const> messages, int space,
                                std::set<unsigned> &devices) const {
  auto size = messages.size();
  for (auto const *header = reinterpret_cast<nlmsghdr const *>(messages.data());
       NLMSG_OK(header, size); header = NLMSG_NEXT(header, size)) {
    auto const told =
        static_cast<unsigned>(static_cast<ifinfomsg const *>(NLMSG_DATA(header))->ifi_index);
    for (auto const &[device, client] : clients_) {
      if ((client.space == space && client.device == told) ||
          (space == kThisSpace && device == told)) {
        devices.insert(device);
      }
    }
  }
}

}  // namespace simhost::daemon
