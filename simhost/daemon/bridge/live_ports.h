// The ports of a bridge over which frames may go out: with a link and, in a group, a partner.
#pragma once

#include <set>

#include "planes/openvswitch/openflow/replies.h"

namespace simhost::daemon {

class LivePorts {
 public:
  // These return whether the port is something else than before.
  bool follow(openflow::PortDescription const &port) {
    return port.is_live ? ports_.insert(port.port).second : ports_.erase(port.port) > 0;
  }
  bool follow(openflow::PortStatus const &status) {
    return status.reason == openflow::PortStatus::Reason::removed
               ? ports_.erase(status.port.port) > 0
               : follow(status.port);
  }

  [[nodiscard]] bool contains(openflow::Port port) const { return ports_.contains(port); }

 private:
  std::set<openflow::Port> ports_;
};

}  // namespace simhost::daemon
