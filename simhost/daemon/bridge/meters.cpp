// One for each client that is heard, so that none keeps this process from the others.
#include "daemon/bridge/meters.h"

#include <map>

#include "daemon/bridge/changes.h"

namespace simhost::daemon {
namespace {

// A second and bridge: more than members say, and less than keeps this process from all else.
constexpr std::uint32_t kMostPacketIns = 1000;
// Likewise of one client, of which several may say too much.
constexpr std::uint32_t kMostOfAClient = 100;

}  // namespace

void Meters::replace(openflow::Connection &connection, openflow::FlowParts const &flows,
                     openvswitch::Deadline deadline) {
  std::map<std::uint32_t, std::uint32_t> rates{{openflow::kControllerMeter, kMostPacketIns}};
  present_.clear();
  for (auto const &flow : flows) {
    if (auto const meter = meter_of(flow)) {
      present_.insert(*meter);
      rates.emplace(*meter, kMostOfAClient);
    }
  }
  connection.have_meters(rates, deadline);
}

void Meters::add(openflow::Connection &connection, std::vector<openflow::Flow> const &flows,
                 openvswitch::Deadline deadline) {
  std::vector<std::uint32_t> added;
  for (auto const &flow : flows) {
    if (auto const meter = meter_of(flow); meter && present_.insert(*meter).second) {
      added.push_back(*meter);
    }
  }
  if (!added.empty()) {
    connection.add_meters(added, kMostOfAClient, deadline);
  }
}

}  // namespace simhost::daemon
