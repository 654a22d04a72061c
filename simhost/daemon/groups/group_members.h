// The members of groups on the switches of a state: known by what clients say, which bridges send
// up, and by queries that bridges send out.
#pragma once

#include <chrono>
#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <set>
#include <vector>

#include "events/loop.h"
#include "planes/openvswitch/compile/network.h"
#include "planes/openvswitch/multicast/membership.h"
#include "planes/openvswitch/multicast/queries.h"
#include "planes/openvswitch/openflow/replies.h"
#include "planes/openvswitch/openflow/requests.h"
#include "storage/ports.h"

namespace simhost::daemon {

class GroupMembers {
 public:
  struct Told {
    /// Has a bridge send frames.
    std::function<void(storage::SwitchKey, std::vector<openflow::PacketOut> const &)> send;
    /// Frames of groups have to go elsewhere.
    std::function<void()> changed;
  };

  GroupMembers(events::Loop &loop, Told told);

  /// Listens where a switch does, as the host's options say, and puts into it who is a member.
  void follow(storage::Transaction &transaction, storage::SwitchKey key,
              openvswitch::Network &network);
  /// Only those switches are there.
  void keep(std::set<storage::SwitchKey> const &keys);
  /// A frame that a flow of a bridge sent up.
  void receive(storage::SwitchKey key, openflow::PacketIn const &packet);

  /// The groups of a port, and how long it is since it reported each.
  struct JoinedGroup {
    multicast::Address address;
    multicast::Joined joined;
    std::chrono::milliseconds age;
  };
  [[nodiscard]] std::vector<JoinedGroup> joined(storage::SwitchKey key, std::uint32_t port) const;

 private:
  struct Switch {
    multicast::Membership members;
    std::map<openflow::Port, std::uint32_t> numbers;  // of ports, by their devices
    std::map<std::uint32_t, openflow::Port> devices;
    std::map<std::uint32_t, openvswitch::Vlans> many;  // the VLANs of ports that have many
    std::set<multicast::Place> places;
    std::set<multicast::Place> heard;  // of those ports, where something was heard
    multicast::Querier igmp;
    multicast::Querier mld;
    std::uint64_t told = 0;  // the revision that whoever makes flows knows
  };

  void note_places(Switch &known, openvswitch::Network const &network) const;
  void advance();
  void wait();

  events::Loop &loop_;
  Told told_;
  std::map<storage::SwitchKey, Switch> switches_;
  std::optional<multicast::Time> tells_at_;
  events::Loop::Timer next_;
};

}  // namespace simhost::daemon
