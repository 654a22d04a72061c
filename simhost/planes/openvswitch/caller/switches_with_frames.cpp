// What a change makes of switches is compared to what they were before it.
#include "planes/openvswitch/caller/switches_with_frames.h"

#include <algorithm>
#include <map>

#include "base/outcomes.h"
#include "model/teaming/team.h"
#include "planes/openvswitch/compile/compile.h"
#include "planes/openvswitch/reading/read_network.h"
#include "storage/running/devices.h"
#include "storage/running/links.h"
#include "storage/store.h"
#include "storage/tunnels/fabrics.h"

namespace simhost::openvswitch {
namespace {

// The switches of which no flows can be made, and why.
std::map<storage::SwitchKey, Refused> unfit_switches(storage::Transaction &transaction) {
  auto const links = [](storage::Transaction &from, std::string_view uplink) {
    return storage::find_link(from, uplink).value_or(storage::Link{});
  };
  std::map<storage::SwitchKey, Refused> unfit;
  for (auto const &[key, row] : storage::all_switches(transaction)) {
    if (row.associated && may_be_refused(transaction, key) && has_device(transaction, key)) {
      try {
        auto const team = teaming::team_of(transaction, key, links);
        auto const connected = storage::port_devices(transaction, key);
        check(read_network(transaction, key, team, connected, {}));
      } catch (Refused const &why) {
        unfit.emplace(key, why);
      }
    }
  }
  return unfit;
}

}  // namespace

bool has_uplink_device(storage::Transaction &transaction, storage::SwitchKey key) {
  auto const uplinks = storage::uplinks_of(transaction, key);
  return std::ranges::any_of(uplinks, [&](auto const &uplink) {
    return storage::carries_frames(transaction, uplink.name);
  });
}

bool has_device(storage::Transaction &transaction, storage::SwitchKey key) {
  return storage::has_port_device(transaction, key) || has_uplink_device(transaction, key);
}

void check_switches(storage::Transaction &transaction, std::filesystem::path const &file) {
  auto const unfit = unfit_switches(transaction);
  if (unfit.empty()) {
    return;
  }
  // Another connection does not see yet what the transaction changed.
  storage::Store committed(file, [](storage::ChangingTransaction &) {});
  storage::ReadingTransaction before(committed);
  auto const unfit_before = unfit_switches(before);
  for (auto const &[key, why] : unfit) {
    if (!unfit_before.contains(key)) {
      throw Refused(why);
    }
  }
}

}  // namespace simhost::openvswitch
