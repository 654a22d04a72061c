// A data plane without frames: what it knows is in the state, so all processes see the same. What
// would come to it over wires is put there by the functions beside this file.
#include "planes/stored/stored_plane.h"

#include "planes/stored/counters.h"
#include "planes/stored/links.h"
#include "planes/stored/mac_tables.h"
#include "planes/stored/multicast.h"
#include "planes/stored/teaming.h"

namespace simhost {
namespace {

class StoredPlane : public Plane {
 public:
  bool link_is_up(storage::Transaction &transaction, std::string_view uplink) override {
    return stored::link_of(transaction, uplink).up();
  }
  bool lacp_is_up(storage::Transaction &transaction, std::string_view uplink) override {
    auto const link = stored::link_of(transaction, uplink);
    return link.up() && link.partner && stored::is_aggregated(transaction, uplink);
  }
  void set_admin_state(storage::Transaction &transaction, std::string_view uplink,
                       bool up) override {
    auto link = stored::link_of(transaction, uplink);
    link.admin = up;
    stored::change_link(transaction, uplink, link);
  }
  std::vector<Lag> lags(storage::Transaction &transaction, storage::SwitchKey switch_key) override {
    return stored::lags_of(transaction, switch_key);
  }
  std::string team_uplink(storage::Transaction &transaction, storage::Port const &port) override {
    return stored::team_uplink(transaction, port);
  }

  std::vector<VSMACEntry> addresses(storage::Transaction &transaction, Place const &place,
                                    VSMACAddrType type) override {
    return stored::addresses(transaction, place, type);
  }
  void put_address(storage::Transaction &transaction, Place const &place,
                   VSMACEntry const &entry) override {
    stored::put_address(transaction, place, entry);
  }
  void remove_address(storage::Transaction &transaction, Place const &place,
                      VSMACEntry const &entry) override {
    stored::remove_address(transaction, place, entry);
  }
  VSPMACLearningStats learning_stats(storage::Transaction &transaction,
                                     Place const &place) override {
    return stored::learning_stats(transaction, place);
  }

  std::vector<AddressBytes> groups(storage::Transaction &transaction, storage::PortNumber port,
                                   std::size_t length) override {
    return stored::groups(transaction, port, length);
  }
  std::optional<McastGroup> group(storage::Transaction &transaction, storage::PortNumber port,
                                  AddressBytes const &address) override {
    return stored::group(transaction, port, address);
  }

  Counters counters(storage::Transaction &transaction, CounterOwner const &owner) override {
    return stored::counters_of(transaction, owner);
  }

  void restart(storage::Transaction &transaction) override {
    stored::forget_learned(transaction);
    stored::forget_groups(transaction);
    stored::forget_counters(transaction);
  }
};

}  // namespace

namespace stored {

Plane &plane() {
  static StoredPlane plane;
  return plane;
}

}  // namespace stored
}  // namespace simhost
