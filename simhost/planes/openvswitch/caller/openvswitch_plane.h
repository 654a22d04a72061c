// The plane of the processes that use a state whose frames a daemon moves. What is wanted is in the
// state, and the links of devices are written there by the daemon; only what frames leave behind in
// Open vSwitch is asked of it. A state that no daemon ever took has the plane without frames.
#pragma once

#include <cstdint>
#include <filesystem>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "model/plane.h"
#include "planes/openvswitch/caller/asking.h"
#include "planes/openvswitch/caller/packet_sizes.h"
#include "planes/openvswitch/trace/story.h"
#include "storage/switches.h"

namespace simhost::openvswitch {

/// Which change the daemon has brought into force, and what it says of itself besides.
struct InForce {
  std::optional<std::uint64_t> wanted;  ///< the last change; none while no daemon took the host
  std::optional<std::uint64_t> done;    ///< none while no daemon says so
  std::string said;                     ///< why that is not the last one
};

/// Of the state in `file`; what it does not know itself, `stored` does. Both live as long as it.
class OpenVswitchPlane : public Plane {
 public:
  OpenVswitchPlane(Plane &stored, std::filesystem::path file);

  bool link_is_up(storage::Transaction &transaction, std::string_view uplink) override;
  bool lacp_is_up(storage::Transaction &transaction, std::string_view uplink) override;
  std::string team_uplink(storage::Transaction &transaction, storage::Port const &port) override;
  std::vector<VSMACEntry> addresses(storage::Transaction &transaction, Place const &place,
                                    VSMACAddrType type) override;
  VSPMACLearningStats learning_stats(storage::Transaction &transaction,
                                     Place const &place) override;
  std::vector<AddressBytes> groups(storage::Transaction &transaction, storage::PortNumber port,
                                   std::size_t length) override;
  std::optional<McastGroup> group(storage::Transaction &transaction, storage::PortNumber port,
                                  AddressBytes const &address) override;
  int multicast_mode(storage::Transaction &transaction, storage::SwitchKey key) override;
  Counters counters(storage::Transaction &transaction, CounterOwner const &owner) override;
  std::vector<std::string> counting_sessions(storage::Transaction &transaction,
                                             storage::SwitchKey key) override;
  void set_admin_state(storage::ChangingTransaction &transaction, std::string_view uplink,
                       bool up) override;
  void put_address(storage::ChangingTransaction &transaction, Place const &place,
                   VSMACEntry const &entry) override;
  void remove_address(storage::ChangingTransaction &transaction, Place const &place,
                      VSMACEntry const &entry) override;
  void restart(storage::ChangingTransaction &transaction) override;
  void check_device(storage::Transaction &transaction, std::string_view device) override;
  void prepare(storage::ChangingTransaction &transaction) override;
  void committed() noexcept override;
  Wires *find_wires() override;

  /// Another call begins, which waits for the daemon anew.
  void begin_call() { asking_.begin(); }
  InForce in_force(storage::Transaction &transaction);
  /// What becomes of a frame that comes in at a port or an uplink of a switch. Refuses one without
  /// a device (QEX_IS_DISCONNECTED), and what Open vSwitch refuses (QEX_IO_ERROR).
  std::vector<StoryStep> trace(storage::Transaction &transaction,
                               storage::FoundSwitch const &of_switch, std::string const &station,
                               std::vector<std::uint8_t> const &frame);

 private:
  [[nodiscard]] bool has_frames(storage::Transaction &transaction, Place const &place) const;
  [[nodiscard]] bool counts_frames(storage::Transaction &transaction,
                                   CounterOwner const &owner) const;
  std::map<AddressBytes, McastGroup> joined(storage::Transaction &transaction,
                                            storage::Port const &port);

  void check_packet_sizes(storage::Transaction &transaction);

  Plane &stored_;
  std::filesystem::path file_;
  Asking asking_;
  std::optional<std::uint64_t> prepared_;  // the change that is about to be committed
  PacketSizes packet_sizes_;
};

}  // namespace simhost::openvswitch
