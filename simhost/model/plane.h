// Where the model meets what runs the switches. The model knows the configuration and asks; a plane
// knows what goes on, reads the configuration from the state, and is told what callers do to it.
// Which plane runs is chosen when the process opens its host.
//
// A plane may live in another process, so that each question and each change can fail: it then
// refuses, as anything refuses that a caller may wait out (QEX_TIMEOUT, QEX_IO_ERROR). Nobody
// assumes that two questions in a row are of the same moment, except on a plane whose knowledge is
// in the state.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "base/api.h"
#include "clock/clock.h"
#include "model/counters/counters.h"
#include "storage/ports.h"
#include "storage/running/addresses.h"
#include "storage/running/links.h"
#include "storage/running/multicast.h"
#include "vswitch/mac_tables.h"

namespace simhost {

namespace storage {
class ReadingTransaction;
}

using storage::AddressBytes;
using storage::Link;
using storage::McastGroup;
using storage::Place;

/// What became of an address that was seen as the source of a frame.
enum class Sighting {
  learned,
  refreshed,
  moved,
  fixed_elsewhere,  ///< it is static or a user's elsewhere; static ones move with learnStatic
  learning_off,
  let_through,  ///< no room, and the limit policy allows its frames
  dropped,      ///< no room, and the limit policy drops its frames
};

/// What stands in for wires on a plane without frames: what would come over them is put there by
/// these.
class Wires {
 public:
  virtual ~Wires() = default;

  /// The cable and the other end of an uplink.
  virtual Link link_of(storage::Transaction &transaction, std::string_view uplink) = 0;
  /// Changes a link, and lets the team of its switch follow. Its up_since is kept by the clock,
  /// whatever `link` says.
  virtual void change_link(storage::ChangingTransaction &transaction, std::string_view uplink,
                           Link const &link) = 0;

  /// A frame from this address, VLAN and network arrives at a place; its other fields mean nothing.
  /// Refuses what no frame can come from, like Plane::put_address.
  virtual Sighting learn(storage::ChangingTransaction &transaction, Place const &place,
                         VSMACEntry const &source) = 0;
  /// Puts an address of any type at a place, last seen `elapsed` seconds ago: for describing a
  /// host, past all limits. The rest as for Plane::put_address.
  virtual void describe_address(storage::ChangingTransaction &transaction, Place const &place,
                                VSMACEntry const &entry) = 0;

  /// The client of a port joins a group, or reports it anew: what is known of it is replaced. Its
  /// time of update is the clock's, whatever `group` says. Refuses an address of another length
  /// than 4, 6 or 16 bytes or that is not multicast, and sources of another length or beside a
  /// group of Ethernet (QEX_INVALID_ADDRESS); a protocol version or source mode out of bounds
  /// (QEX_BAD_PARAM); more sources than IGMPV3MaxSrcIPNum or MLDV2MaxSrcIPNum (QEX_LIMIT_EXCEEDED).
  virtual void join(storage::ChangingTransaction &transaction, storage::PortNumber port,
                    McastGroup const &group) = 0;
  /// Refuses a group that the port has not joined (QEX_NOT_FOUND).
  virtual void leave(storage::ChangingTransaction &transaction, storage::PortNumber port,
                     AddressBytes const &address) = 0;

  /// `counter` is one of the owner's, and `value` has room in it.
  virtual void set_counter(storage::ChangingTransaction &transaction, CounterOwner const &owner,
                           Counter const &counter, std::uint64_t value) = 0;
};

class Plane {
 public:
  virtual ~Plane() = default;

  // Questions.

  virtual bool link_is_up(storage::Transaction &transaction, std::string_view uplink) = 0;
  /// Whether link aggregation uses the uplink; never for one that is in no group.
  virtual bool lacp_is_up(storage::Transaction &transaction, std::string_view uplink) = 0;
  /// The uplink that carries what a port sends. Refuses an uplink port (QEX_NOT_SUPPORTED), a team
  /// without uplinks (QEX_ENETUNREACH), and one none of whose uplinks is in use (QEX_ENETDOWN).
  virtual std::string team_uplink(storage::Transaction &transaction, storage::Port const &port) = 0;
  /// The addresses of one type at a place, or of all, in the order of the addresses.
  virtual std::vector<VSMACEntry> addresses(storage::Transaction &transaction, Place const &place,
                                            VSMACAddrType type) = 0;
  /// How many addresses a place has learned, and its counters.
  virtual VSPMACLearningStats learning_stats(storage::Transaction &transaction,
                                             Place const &place) = 0;
  /// The groups of a port with addresses of that many bytes, in the order of the addresses.
  virtual std::vector<AddressBytes> groups(storage::Transaction &transaction,
                                           storage::PortNumber port, std::size_t length) = 0;
  virtual std::optional<McastGroup> group(storage::Transaction &transaction,
                                          storage::PortNumber port,
                                          AddressBytes const &address) = 0;
  /// Where a switch sends the frames of groups just now (VSMcastFilterMode), which may be another
  /// way than the one that is set while a change is pending.
  virtual int multicast_mode(storage::Transaction &transaction, storage::SwitchKey key) = 0;
  virtual Counters counters(storage::Transaction &transaction, CounterOwner const &owner) = 0;
  /// The mirror sessions of a switch that have counted, in the order of their names.
  virtual std::vector<std::string> counting_sessions(storage::Transaction &transaction,
                                                     storage::SwitchKey key) = 0;

  // What callers change of the runtime state.

  virtual void set_admin_state(storage::ChangingTransaction &transaction, std::string_view uplink,
                               bool up) = 0;
  /// Puts a static or user address at a place; one that is there already starts over. A learned
  /// address gives way wherever it is. Refuses other types (QEX_BAD_PARAM), a multicast or zero
  /// address (QEX_INVALID_ADDRESS), a VLAN that is none (QEX_BAD_VLANID), a network of more than 24
  /// bits (QEX_BAD_PARAM), and an address that is static or a user's elsewhere (QEX_EXISTS).
  virtual void put_address(storage::ChangingTransaction &transaction, Place const &place,
                           VSMACEntry const &entry) = 0;
  /// Takes an address from a place. Refuses an address that is not there, or of another type than
  /// the entry's unless that is VS_MAC_ADDR_TYPE_ALL (QEX_NOT_FOUND).
  virtual void remove_address(storage::ChangingTransaction &transaction, Place const &place,
                              VSMACEntry const &entry) = 0;
  /// What the host learned and counted goes; what is wired and configured stays.
  virtual void restart(storage::ChangingTransaction &transaction) = 0;

  /// An uplink or a port is to have this network device. Refuses one that no frames can go through
  /// (QEX_NOT_FOUND if it is not there); a plane without frames takes any.
  virtual void check_device(storage::Transaction &transaction, std::string_view device) = 0;

  // Transactions.

  /// A transaction that changed the state is about to be committed. Refuses it, with the reason, if
  /// the plane cannot run what the state then says; nothing of it happens then. It may still fail
  /// to be committed: a plane acts on nothing before committed(). A state that is opened is told in
  /// neither way; a plane that keeps something of it looks when it is asked or told first.
  virtual void prepare(storage::ChangingTransaction &transaction) = 0;
  /// The transaction that was prepared last is committed: others see it. Returns when it is in
  /// force or the plane has run out of patience, and cannot fail any more.
  virtual void committed() noexcept = 0;

  /// Null on a plane whose wires are real.
  virtual Wires *find_wires() = 0;
};

/// What runs the switches of this process. A plane must have been chosen.
SIMHOST_API Plane &running_plane();
/// Chooses it; `plane` must live as long as the process, or until another one is chosen.
void run_on(Plane &plane);
/// What stands in for the wires of the plane that runs; refused with the reason if they are real
/// (QEX_NOT_SUPPORTED).
Wires &get_wires();

/// Ends a transaction.
void commit(storage::ReadingTransaction &transaction);
/// Makes what a transaction changed last. The plane is told before, and may refuse it, and after.
void commit(storage::ChangingTransaction &transaction);

}  // namespace simhost
