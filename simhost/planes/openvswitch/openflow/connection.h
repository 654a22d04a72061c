// A connection to a bridge of Open vSwitch, in OpenFlow 1.5.
#pragma once

#include <cstdint>
#include <deque>
#include <filesystem>
#include <functional>
#include <map>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "planes/openvswitch/openflow/change.h"
#include "planes/openvswitch/openflow/form.h"
#include "planes/openvswitch/openflow/replies.h"
#include "planes/openvswitch/openflow/requests.h"
#include "planes/openvswitch/transport/stream.h"

namespace simhost::openflow {

class Writer;
enum class BundleControl : std::uint16_t;

using openvswitch::Deadline;

/// Requests wait for their replies until a deadline; what the switch sends by itself in the
/// meantime is kept for next_event(). A connection that threw Disconnected, TimedOut or Malformed
/// is of no more use: its owner makes another one.
class Connection {
 public:
  /// `socket` is BRIDGE.mgmt in Open vSwitch's run folder; for `lives` see Stream. Throws
  /// Disconnected and TimedOut. The switch may greet later: whoever takes the first message finds
  /// out whether it does, and throws Refused by one that speaks another version.
  Connection(std::filesystem::path const &socket, Deadline deadline, openvswitch::Lives lives = {});

  /// For poll(2): readable when there is something to receive.
  [[nodiscard]] int fd() const { return stream_.fd(); }
  /// Whether poll(2) should tell when fd() is writable, for receive().
  [[nodiscard]] bool has_unsent() const { return stream_.has_unsent(); }

  // None of these waits. They throw Disconnected and Malformed.

  /// Reads what is there, and sends what is left.
  void receive();
  /// What the switch sent by itself, in its order; none when all is told.
  std::optional<Event> next_event();
  /// A frame to send. If the switch refuses it, an ErrorReply is an event later.
  void send(PacketOut const &packet);

  // These wait. They throw Disconnected, TimedOut, Malformed and Refused.

  /// Makes all of the changes in their order, or none of them: throws ChangeRefused, which says
  /// which one was refused; or HalfMade, if the switch refuses what it took before in the same
  /// form. After TimedOut nobody knows whether they are made. Does `meanwhile`, if that is
  /// anything, once the switch was told to make them and while it does.
  void change(Changes const &changes, Deadline deadline,
              std::function<void()> const &meanwhile = nullptr);
  /// Adds these one after the other, each by itself: throws HalfMade if one is refused.
  void add(std::span<Flow const *const> flows, Deadline deadline);
  /// Returns when the switch is done with all that it was sent.
  void barrier(Deadline deadline);
  /// There are these meters from now on and no others, each of which drops what is more than so
  /// many frames a second; kControllerMeter, of all that flows send up. The flows through those
  /// that are there already stay.
  void have_meters(std::map<std::uint32_t, std::uint32_t> const &rates, Deadline deadline);
  /// New ones, likewise.
  void add_meters(std::span<std::uint32_t const> meters, std::uint32_t rate, Deadline deadline);
  /// From now on it sends these by itself.
  void set_async(AsyncMessages const &wanted, Deadline deadline);

  // What is asked of several things is sent at once: Open vSwitch looks at all of its devices
  // before it listens to a connection again.

  /// From now on it sends these by itself, and each change of flows as monitor_flows() says.
  /// Returns all that there is; of the flows only how many, unless they are to be told.
  Contents follow(AsyncMessages const &wanted, std::span<FlowMonitor const> monitors,
                  PresentFlows present, Deadline deadline);
  /// Whether it has neither flows nor groups.
  bool is_bare(Deadline deadline);
  std::vector<FlowEntry> flows(FlowFilter const &filter, Deadline deadline);
  /// Of one filter after the other.
  std::vector<FlowEntry> flows_of(std::span<FlowFilter const> filters, Deadline deadline);
  /// One sum of each filter, in a part of the time that its flows take; of all ports, if asked.
  Sums sums_of(std::span<FlowFilter const> filters, bool are_ports_asked, Deadline deadline);
  std::vector<PortStatistics> port_statistics(Port port, Deadline deadline);
  std::vector<PortDescription> ports(Deadline deadline);
  std::vector<GroupEntry> groups(Deadline deadline);
  std::vector<GroupStatistics> group_statistics(Deadline deadline);
  /// From now on each change of such flows, its own too, is an event. Returns what there is, as far
  /// as that is to be told.
  std::vector<FlowUpdate> monitor_flows(std::span<FlowMonitor const> monitors, Deadline deadline);
  /// Ends one that there is. For others Open vSwitch has no reply that tells what it is about.
  void cancel_monitor(std::uint32_t monitor, Deadline deadline);

 private:
  using Message = std::vector<std::uint8_t>;

  std::uint32_t next_xid() { return ++xid_; }
  void send(Writer const &out);
  /// Sends what is replied to only if it is refused, and waits until it is done.
  void order(std::function<void(Writer &, std::uint32_t)> const &put, Deadline deadline);
  static void require_hello(std::span<std::uint8_t const> message);
  /// The next whole message that is received already.
  std::optional<Message> take_message();
  Message wait_for_message(Deadline deadline);
  /// Replies to an echo, keeps an event; returns whether it was one of those.
  bool is_handled(Message const &message, std::uint32_t first_xid, std::uint32_t last_xid);
  /// The reply to a request, or the error: throws Refused.
  Message wait_for_reply(std::uint32_t xid, Deadline deadline);
  struct Outcome {
    std::optional<ErrorReply> error;  ///< the first one
    bool is_refused = false;          ///< the last request
  };
  /// Takes replies to requests of these numbers until the last one's.
  Outcome wait_for_outcome(std::uint32_t first, std::uint32_t last, Deadline deadline);
  void control(std::uint32_t bundle, BundleControl control);
  /// All items of a multipart reply.
  template <typename Item, typename Put, typename Take>
  std::vector<Item> ask(Put const &put, Take const &take, Deadline deadline);
  /// Likewise, of several requests, those of one after those of the other.
  template <typename Item, typename Asked, typename Put, typename Take>
  std::vector<Item> ask_each(std::span<Asked const> all, Put const &put, Take const &take,
                             Deadline deadline);
  template <typename Item, typename Take>
  void take_items(std::uint32_t xid, Take const &take, std::vector<Item> &items, Deadline deadline);
  /// The reply to how many flows there are.
  std::size_t take_count(std::uint32_t xid, Deadline deadline);

  openvswitch::Stream stream_;
  std::vector<std::uint8_t> received_;
  std::size_t taken_ = 0;  // of that
  bool is_greeted_ = false;
  std::deque<Event> events_;
  std::uint32_t xid_ = 0;
  std::uint32_t bundle_ = 0;
  KnownForms known_forms_;
};

}  // namespace simhost::openflow
