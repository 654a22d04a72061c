// Streams to servers on other machines.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "planes/openvswitch/transport/stream.h"

namespace simhost::openvswitch {

/// Where a server listens. Names are not looked up: that may take longer than a change of the
/// state.
struct TcpAddress {
  std::string host;  ///< an address of IPv4 or IPv6
  std::uint16_t port = 0;

  bool operator==(TcpAddress const &) const = default;
};

/// From "192.0.2.1:6641" or "[2001:db8::1]:6641"; nothing for other texts.
std::optional<TcpAddress> tcp_address(std::string_view text);
std::string text_of(TcpAddress const &address);

/// Throws Disconnected, and TimedOut where nobody replies. A server that is silently gone is found
/// out within seconds, whether or not something was sent to it. `protocol` is that of its name.
Stream connected_to(TcpAddress const &address, Deadline deadline,
                    std::string_view protocol = "tcp");

}  // namespace simhost::openvswitch
