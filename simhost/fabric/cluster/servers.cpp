// Names of servers are those that Open vSwitch's own programs take.
#include "fabric/cluster/servers.h"

#include <algorithm>

namespace simhost::fabric {
namespace {

constexpr std::string_view kTcp = "tcp:";
constexpr std::string_view kSsl = "ssl:";

std::optional<Server> server_in(std::string_view text) {
  bool const is_encrypted = text.starts_with(kSsl);
  if (!is_encrypted && !text.starts_with(kTcp)) {
    return std::nullopt;
  }
  auto const address = openvswitch::tcp_address(text.substr(kTcp.size()));
  if (!address) {
    return std::nullopt;
  }
  return Server{.address = *address, .is_encrypted = is_encrypted};
}

}  // namespace

std::vector<Server> servers_in(std::string_view text) {
  if (text.ends_with(',')) {
    return {};
  }
  std::vector<Server> servers;
  while (!text.empty()) {
    auto const one = text.substr(0, text.find(','));
    text.remove_prefix(std::min(one.size() + 1, text.size()));
    auto const server = server_in(one);
    if (!server) {
      return {};
    }
    servers.push_back(*server);
  }
  return servers;
}

std::string text_of(Server const &server) {
  return std::string(server.is_encrypted ? kSsl : kTcp) + openvswitch::text_of(server.address);
}

openvswitch::Stream connected_to(Server const &server, Credentials const &credentials,
                                 openvswitch::Deadline deadline) {
  return server.is_encrypted ? encrypted_to(server.address, credentials, deadline)
                             : openvswitch::connected_to(server.address, deadline);
}

}  // namespace simhost::fabric
