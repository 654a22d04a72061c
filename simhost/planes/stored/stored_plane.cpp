// A plane without frames: what it knows is in the state, so that all processes see the same, in the
// transaction in which they ask.
#include "planes/stored/stored_plane.h"

#include "model/multicast/properties.h"
#include "model/properties/properties.h"
#include "planes/stored/counters.h"
#include "planes/stored/links.h"
#include "planes/stored/mac_tables.h"
#include "planes/stored/multicast.h"
#include "planes/stored/teaming.h"
#include "storage/store.h"

namespace simhost::stored {
namespace {

class StoredWires : public Wires {
 public:
  explicit StoredWires(Teaming &teaming) : teaming_(teaming) {}

  Link link_of(storage::Transaction &transaction, std::string_view uplink) override {
    return stored::link_of(transaction, uplink);
  }
  void change_link(storage::ChangingTransaction &transaction, std::string_view uplink,
                   Link const &link) override {
    teaming_.change_link(transaction, uplink, link);
  }
  Sighting learn(storage::ChangingTransaction &transaction, Place const &place,
                 VSMACEntry const &source) override {
    return stored::learn(transaction, place, source);
  }
  void describe_address(storage::ChangingTransaction &transaction, Place const &place,
                        VSMACEntry const &entry) override {
    stored::describe_address(transaction, place, entry);
  }
  void join(storage::ChangingTransaction &transaction, storage::PortNumber port,
            McastGroup const &group) override {
    stored::join(transaction, port, group);
  }
  void leave(storage::ChangingTransaction &transaction, storage::PortNumber port,
             AddressBytes const &address) override {
    stored::leave(transaction, port, address);
  }
  void set_counter(storage::ChangingTransaction &transaction, CounterOwner const &owner,
                   Counter const &counter, std::uint64_t value) override {
    stored::set_counter(transaction, owner, counter, value);
  }

 private:
  Teaming &teaming_;
};

class StoredPlane : public Plane {
 public:
  bool link_is_up(storage::Transaction &transaction, std::string_view uplink) override {
    return link_of(transaction, uplink).up();
  }
  bool lacp_is_up(storage::Transaction &transaction, std::string_view uplink) override {
    return stored::lacp_is_up(transaction, uplink);
  }
  std::string team_uplink(storage::Transaction &transaction, storage::Port const &port) override {
    return teaming_.uplink_of(transaction, port);
  }
  std::vector<VSMACEntry> addresses(storage::Transaction &transaction, Place const &place,
                                    VSMACAddrType type) override {
    return stored::addresses(transaction, place, type);
  }
  VSPMACLearningStats learning_stats(storage::Transaction &transaction,
                                     Place const &place) override {
    return stored::learning_stats(transaction, place);
  }
  std::vector<AddressBytes> groups(storage::Transaction &transaction, storage::PortNumber port,
                                   std::size_t length) override {
    return storage::group_addresses(transaction, port, length);
  }
  std::optional<McastGroup> group(storage::Transaction &transaction, storage::PortNumber port,
                                  AddressBytes const &address) override {
    return storage::find_group(transaction, port, address);
  }
  int multicast_mode(storage::Transaction &transaction, storage::SwitchKey key) override {
    return static_cast<int>(
        effective(transaction, multicast::filter_mode, storage::PropertyOwner::global(key)));
  }
  Counters counters(storage::Transaction &transaction, CounterOwner const &owner) override {
    return counters_of(transaction, owner);
  }
  std::vector<std::string> counting_sessions(storage::Transaction &transaction,
                                             storage::SwitchKey key) override {
    return storage::sessions_with_counters(transaction, key);
  }

  void set_admin_state(storage::ChangingTransaction &transaction, std::string_view uplink,
                       bool up) override {
    auto link = link_of(transaction, uplink);
    link.admin = up;
    teaming_.change_link(transaction, uplink, link);
  }
  void put_address(storage::ChangingTransaction &transaction, Place const &place,
                   VSMACEntry const &entry) override {
    stored::put_address(transaction, place, entry);
  }
  void remove_address(storage::ChangingTransaction &transaction, Place const &place,
                      VSMACEntry const &entry) override {
    stored::remove_address(transaction, place, entry);
  }
  void restart(storage::ChangingTransaction &transaction) override {
    storage::remove_learned(transaction);
    storage::remove_groups(transaction);
    storage::remove_counters(transaction);
  }

  void check_device(storage::Transaction & /*transaction*/, std::string_view /*device*/) override {}

  // The state is all that is running: whatever it says, it says to whoever asks next.
  void prepare(storage::ChangingTransaction & /*transaction*/) override {}
  void committed() noexcept override {}

  Wires *find_wires() override { return &wires_; }

 private:
  Teaming teaming_;
  StoredWires wires_{teaming_};
};

}  // namespace

Plane &plane() {
  // Never destroyed: other threads and the exit handlers of others may still call.
  static auto &plane = *new StoredPlane;
  return plane;
}

}  // namespace simhost::stored
