// A data plane without frames: what it knows is in the state, so all processes see the same. What
// would come to it over wires is put there by the functions beside this file.
#include "core/data_plane.h"
#include "dataplane/counters.h"
#include "dataplane/links.h"
#include "dataplane/mac_tables.h"
#include "dataplane/multicast.h"
#include "dataplane/teaming.h"

namespace simhost {
namespace {

class StoredPlane : public DataPlane {
 public:
  bool link_is_up(store::Transaction &transaction, std::string_view uplink) override {
    return dataplane::link_of(transaction, uplink).up();
  }
  bool lacp_is_up(store::Transaction &transaction, std::string_view uplink) override {
    auto const link = dataplane::link_of(transaction, uplink);
    return link.up() && link.partner && dataplane::is_aggregated(transaction, uplink);
  }
  void set_admin_state(store::Transaction &transaction, std::string_view uplink, bool up) override {
    auto link = dataplane::link_of(transaction, uplink);
    link.admin = up;
    dataplane::change_link(transaction, uplink, link);
  }
  std::vector<Lag> lags(store::Transaction &transaction, store::SwitchKey switch_key) override {
    return dataplane::lags_of(transaction, switch_key);
  }
  std::string team_uplink(store::Transaction &transaction, store::Port const &port) override {
    return dataplane::team_uplink(transaction, port);
  }

  std::vector<VSMACEntry> addresses(store::Transaction &transaction, Place const &place,
                                    VSMACAddrType type) override {
    return dataplane::addresses(transaction, place, type);
  }
  void put_address(store::Transaction &transaction, Place const &place,
                   VSMACEntry const &entry) override {
    dataplane::put_address(transaction, place, entry);
  }
  void remove_address(store::Transaction &transaction, Place const &place,
                      VSMACEntry const &entry) override {
    dataplane::remove_address(transaction, place, entry);
  }
  VSPMACLearningStats learning_stats(store::Transaction &transaction, Place const &place) override {
    return dataplane::learning_stats(transaction, place);
  }

  std::vector<AddressBytes> groups(store::Transaction &transaction, store::PortNumber port,
                                   std::size_t length) override {
    return dataplane::groups(transaction, port, length);
  }
  std::optional<McastGroup> group(store::Transaction &transaction, store::PortNumber port,
                                  AddressBytes const &address) override {
    return dataplane::group(transaction, port, address);
  }

  Counters counters(store::Transaction &transaction, CounterOwner const &owner) override {
    return dataplane::counters_of(transaction, owner);
  }

  void restart(store::Transaction &transaction) override {
    dataplane::forget_learned(transaction);
    dataplane::forget_groups(transaction);
    dataplane::forget_counters(transaction);
  }
};

}  // namespace

DataPlane &data_plane() {
  static StoredPlane plane;
  return plane;
}

}  // namespace simhost
