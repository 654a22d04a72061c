// The servers of a cluster, as an operator names them.
#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "fabric/cluster/tls.h"

namespace simhost::fabric {

struct Server {
  openvswitch::TcpAddress address;
  bool is_encrypted = false;

  bool operator==(Server const &) const = default;
};

/// From "tcp:ADDRESS:PORT,ssl:ADDRESS:PORT,..."; empty if the text is no such list.
std::vector<Server> servers_in(std::string_view text);
std::string text_of(Server const &server);

/// The servers, and who this host is to those that are encrypted.
struct Servers {
  std::vector<Server> all;
  Credentials credentials;
};

openvswitch::Stream connected_to(Server const &server, Credentials const &credentials,
                                 openvswitch::Deadline deadline);

}  // namespace simhost::fabric
