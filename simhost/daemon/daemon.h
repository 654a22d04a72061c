// The daemon of one state: it looks at what the state wants whenever somebody wrote to it, and
// makes Open vSwitch so.
#pragma once

#include <cstdint>
#include <filesystem>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "daemon/announcer.h"
#include "daemon/beacons/sent_beacons.h"
#include "daemon/bridges.h"
#include "daemon/compiler.h"
#include "daemon/counting/announced.h"
#include "daemon/counting/counting.h"
#include "daemon/devices/client_addresses.h"
#include "daemon/devices/devices_at_bridges.h"
#include "daemon/devices/network_devices.h"
#include "daemon/devices/saved_links.h"
#include "daemon/devices/uplink_wires.h"
#include "daemon/groups/group_members.h"
#include "daemon/load/load_balance.h"
#include "daemon/server.h"
#include "daemon/state_watch.h"
#include "daemon/troubles.h"
#include "daemon/underlay/collectors.h"
#include "daemon/underlay/underlay.h"
#include "events/loop.h"
#include "storage/store.h"

namespace simhost::daemon {

struct Options {
  std::filesystem::path state;
  std::filesystem::path database;  ///< the socket of Open vSwitch's
  std::string datapath;
};

class Daemon {
 public:
  /// Opens the state, and becomes its daemon. Throws std::runtime_error if it has one.
  Daemon(events::Loop &loop, Options options, Say say);
  /// Takes the frames of the state: what changes in it waits for Open vSwitch from now on.
  void begin();

  /// Open vSwitch is there, or there anew: connects to it. For `lives`, of which each stays open
  /// until disconnect() is called, see openvswitch::Stream.
  void connect(openvswitch::Lives lives = {});
  /// Open vSwitch is gone, until connect() is called.
  void disconnect();
  /// Done when what is wanted is in force for the first time.
  void when_ready(std::function<void()> ready) { ready_ = std::move(ready); }
  using Settled = std::function<void(std::uint64_t change, std::string const &troubles)>;
  /// Done whenever a change of the state is in force.
  void when_settled(Settled settled) { settled_ = std::move(settled); }
  /// Puts into the state what was counted and seen, as it does from time to time.
  void save();
  /// Open vSwitch has ended for good: the devices of the machine are as if it had never been.
  void leave_devices();

 private:
  void count(Devices devices);
  void attempt(std::function<void()> const &work);
  void fail(std::string const &why);
  [[nodiscard]] RunningBridge::Told told_by_bridges();
  void reconnect(std::string const &why);
  void connect_anew();
  void connect_later();
  void mend_soon();
  void look_at_commits();
  void announce(storage::SwitchKey key, std::vector<openvswitch::Announced> const &clients);
  bool send(storage::SwitchKey key, std::vector<openflow::PacketOut> const &frames);
  void follow_members();
  void sync_soon();
  void sync_after(std::optional<ClockTime> const &wait);
  void sync();
  bool forget_cached_flows(std::string const &bridge, std::uint64_t generation);
  void follow_devices();
  [[nodiscard]] Heard heard_at(storage::SwitchKey key, storage::Device const &device) const;
  // The way of the machine to the hosts beyond tunnels, and what is wrong with it.
  void follow_tunnels(Wanted const &wanted);
  void settle(Wanted const &wanted);
  void tell_settled();
  void reply_to_waiting();

  // What callers ask.
  [[nodiscard]] Questions questions();
  void handle_in_force(std::uint64_t change, Reply const &reply);
  [[nodiscard]] Json carry(Json const &question);
  [[nodiscard]] Json is_there(Json const &question);
  [[nodiscard]] Json carrier(Json const &question) const;
  // Nothing if Open vSwitch cannot be reached.
  [[nodiscard]] std::optional<std::vector<Learned>> learned_of(storage::SwitchKey key);
  [[nodiscard]] Json addresses(Json const &question);
  [[nodiscard]] Json forget_learned(Json const &question);
  void count_of(storage::SwitchKey key);
  [[nodiscard]] Json counters(Json const &question);
  [[nodiscard]] Json counting_sessions(Json const &question);
  void count_from_now_on();
  void age();
  void age_by(Wanted const &wanted);
  void remember();
  void remember_soon();
  // Until the state takes it, as a full disk does not, what was counted and seen waits here. That
  // is over when nothing is said why.
  void keep_nothing(std::string const &why);
  void balance();
  void look_at_wires();
  [[nodiscard]] Json groups(Json const &question) const;
  [[nodiscard]] Json multicast_mode(Json const &question) const;
  [[nodiscard]] Json bridge(Json const &question) const;
  [[nodiscard]] Json source(Json const &question) const;
  [[nodiscard]] Json status(Json const &question) const;

  events::Loop &loop_;
  Options options_;
  Say say_;
  Troubles troubles_;
  events::Descriptor lock_;
  storage::Store store_;
  std::string host_;
  StateWatch state_watch_;
  NetworkDevices devices_;
  ClientAddresses client_addresses_;
  DevicesAtBridges at_bridges_;
  UplinkWires wires_;
  Server server_;
  Memory memory_;
  Announcer announcer_;
  SentBeacons beacons_;
  GroupMembers members_;
  bool follows_members_ = false;                       // and nothing else
  std::map<storage::SwitchKey, int> multicast_modes_;  // that frames obey
  SavedLinks links_;
  Counting counting_;
  AnnouncedCounts announced_;
  LoadBalance load_balance_;
  unsigned counts_ = 0;  // since the load was looked at
  Underlay underlay_;
  Collectors collectors_;
  Compiler compiler_;
  openvswitch::Lives lives_;
  std::optional<Bridges> bridges_;
  std::uint64_t in_force_ = 0;
  std::optional<std::int64_t> commits_;          // to the state, at the last look
  std::multimap<std::uint64_t, Reply> waiting_;  // for a change to be in force
  std::function<void()> ready_;
  Settled settled_;
  events::Loop::Timer next_sync_;
  events::Loop::Timer next_settling_;
  events::Loop::Timer next_connect_;
  events::Loop::Timer next_mend_;
  events::Clock::time_point mended_;    // when the last one was due
  events::Clock::duration pause_ = {};  // before the next attempt to connect
  events::Loop::Timer next_count_;
  events::Loop::Timer next_aging_;
  std::chrono::seconds shortest_aging_ = std::chrono::seconds::max();
  events::Loop::Timer next_remembering_;
  std::string why_nothing_is_kept_;  // at the last attempt
  events::Loop::Timer next_telling_;
};

}  // namespace simhost::daemon
