// Tells the network beyond the uplinks of clients that are reached over another one than before: by
// reverse-ARP packets, no more in a second than the host's options allow.
#pragma once

#include <cstddef>
#include <deque>
#include <functional>
#include <map>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "daemon/learned/memory.h"
#include "daemon/wanted.h"
#include "events/loop.h"

namespace simhost::daemon {

class Announcer {
 public:
  /// Sends the packets of a switch; those that it has sent are counted there.
  using Send = std::function<void(storage::SwitchKey, std::vector<openvswitch::Announced> const &)>;

  Announcer(events::Loop &loop, Send send) : loop_(loop), send_(std::move(send)) {}

  /// This is in force. What is so when it is told first is no news; clients whose address is not
  /// known are announced by what `memory` has learned of them.
  void follow(Wanted const &wanted, Memory const &memory);

 private:
  // With those first that any client is announced as first: what a trunk port has of many VLANs
  // keeps no other port waiting.
  using Clients = std::set<std::pair<std::size_t, openvswitch::Announced>>;
  // Where a client was.
  struct Place {
    std::string device;
    std::vector<std::uint32_t> links;
  };
  struct Due {
    openvswitch::Announced announced;
    events::Clock::time_point until;
  };
  struct OfSwitch {
    std::map<std::uint32_t, Place> places;
    std::deque<Due> due;
  };

  void follow(WantedBridge const &bridge, Memory const &memory);
  static Clients clients_at(Carried const &carried, std::vector<openflow::Flow> const &learned);
  void announce(OfSwitch &known, Clients const &clients) const;
  void send();

  events::Loop &loop_;
  Send send_;
  std::map<storage::SwitchKey, OfSwitch> switches_;
  bool has_begun_ = false;
  std::uint32_t most_ = 0;
  std::chrono::seconds duration_{};
  events::Loop::Timer next_interval_;
};

}  // namespace simhost::daemon
