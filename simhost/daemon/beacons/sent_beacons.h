// Beacons of the switches whose teams ask for them: sent over each of their uplinks twice a second,
// and heard at the others.
#pragma once

#include <functional>
#include <map>
#include <optional>
#include <set>
#include <vector>

#include "events/loop.h"
#include "planes/openvswitch/beacons/frame.h"
#include "planes/openvswitch/beacons/hearing.h"
#include "planes/openvswitch/compile/network.h"
#include "planes/openvswitch/openflow/replies.h"
#include "planes/openvswitch/openflow/requests.h"
#include "storage/ports.h"

namespace simhost::daemon {

class SentBeacons {
 public:
  struct Told {
    /// Has a bridge send frames.
    std::function<void(storage::SwitchKey, std::vector<openflow::PacketOut> const &)> send;
    /// Beacons arrive at an uplink, or not any more.
    std::function<void()> changed;
  };

  SentBeacons(events::Loop &loop, Told told);

  /// A switch has these uplinks, and asks for beacons or does not; puts into it where its beacons
  /// go.
  void follow(storage::SwitchKey key, openvswitch::Network &network);
  /// Only those switches are there.
  void keep(std::set<storage::SwitchKey> const &keys);
  /// A frame that a flow of a bridge sent up. Returns whether it was a beacon.
  bool receive(storage::SwitchKey key, openflow::PacketIn const &packet);

  /// Whether beacons arrive at an uplink, as far as anybody can tell: they do where nobody asks.
  /// Nothing while it is too early to say.
  [[nodiscard]] std::optional<bool> arrive_at(storage::SwitchKey key, openflow::Port port) const;
  /// Whether a switch asks for beacons, and has too few links to tell which of them is cut off.
  [[nodiscard]] bool has_too_few(storage::SwitchKey key) const;

 private:
  struct Switch {
    bool asks = false;
    std::map<openflow::Port, beacons::Link> uplinks = {};
    std::set<beacons::Link> links = {};
    beacons::Hearing hearing = {};
    std::map<beacons::Link, std::optional<bool>> told = {};
  };

  void begin_round();
  void send(storage::SwitchKey key, Switch const &of_switch) const;
  // Returns whether it is another one than was told before.
  static bool note_verdicts(Switch &of_switch);
  void wait();

  events::Loop &loop_;
  Told told_;
  beacons::Key key_;
  std::map<storage::SwitchKey, Switch> switches_;
  events::Loop::Timer next_;
};

}  // namespace simhost::daemon
