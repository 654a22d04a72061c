// Tells the network beyond the uplinks of clients that are reached over another one than before: by
// reverse-ARP packets, no more in a second than the host's options allow.
#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
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

  /// Whether Open vSwitch sees a link at a port of a switch's bridge.
  using IsLive = std::function<bool(storage::SwitchKey, openflow::Port)>;

  /// This is in force. What is so when it is told first is no news; clients whose address is not
  /// known are announced by what `memory` has learned of them. Open vSwitch may see later that a
  /// link is back than this host does: until then frames go as before, and a port is where it was.
  void follow(Wanted const &wanted, Memory const &memory, IsLive const &is_live);

 private:
  // Where a client was.
  struct Place {
    std::string device;
    std::vector<std::uint32_t> links;
  };
  // A port that is reached over another link than before, and its clients. Those of all VLANs are
  // told in the first one of each port before any is in the next: what a trunk has of many VLANs
  // keeps no other port waiting.
  struct Moved {
    std::uint32_t number;
    std::vector<openvswitch::Announced> in_one_vlan;
    std::vector<openvswitch::Announced> in_all;
    std::vector<std::uint16_t> vlans;
  };
  struct Due {
    openvswitch::Announced announced;
    events::Clock::time_point until;
  };
  struct OfSwitch {
    std::map<std::uint32_t, Place> places;
    std::deque<Due> due;
  };

  void follow(WantedBridge const &bridge, Memory const &memory, IsLive const &is_live);
  static Moved clients_at(Carried const &carried, std::vector<openflow::Flow> const &learned);
  static std::set<openvswitch::Announced> clients_in(std::vector<Moved> const &moved,
                                                     std::size_t place);
  void announce(OfSwitch &known, std::vector<Moved> const &moved) const;
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
