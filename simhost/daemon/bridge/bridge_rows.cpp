// Bridges are known by their names, as the database of Open vSwitch knows them.
#include "daemon/bridge/bridge_rows.h"

#include <algorithm>

namespace simhost::daemon {

using openvswitch::BridgeRow;
using openvswitch::PresentRows;

namespace {

bool is_new(BridgeRow const &row, PresentRows const &present) {
  return std::ranges::none_of(present.bridges,
                              [&](auto const &bridge) { return bridge.row.name == row.name; });
}

}  // namespace

std::vector<BridgeRow> wanted_rows(Wanted const &wanted, PresentRows const &present) {
  std::vector<BridgeRow> rows;
  for (auto const &bridge : wanted.bridges) {
    rows.push_back(bridge.row);
  }
  if (wanted.underlay) {
    rows.push_back(wanted.underlay->row);
  }
  for (auto &row : rows) {
    std::erase_if(row.devices,
                  [&](auto const &device) { return present.elsewhere.contains(device.first); });
  }
  for (auto const &bridge : present.bridges) {
    if (std::ranges::any_of(wanted.unfit,
                            [&](Unfit const &one) { return one.bridge == bridge.row.name; })) {
      rows.push_back(bridge.row);
    }
  }
  return rows;
}

bool has_new(std::vector<BridgeRow> const &wanted, PresentRows const &present) {
  return std::ranges::any_of(wanted, [&](BridgeRow const &row) { return is_new(row, present); });
}

std::vector<BridgeRow> rows_before_flows(std::vector<BridgeRow> wanted,
                                         PresentRows const &present) {
  for (auto &row : wanted) {
    if (is_new(row, present)) {
      row.devices.clear();
    }
  }
  return wanted;
}

std::set<std::string> added_devices(PresentRows const &present,
                                    std::vector<BridgeRow> const &wanted) {
  std::set<std::string> added;
  for (auto const &bridge : wanted) {
    for (auto const &[device, number] : bridge.devices) {
      added.insert(device);
    }
  }
  for (auto const &bridge : present.bridges) {
    for (auto const &[device, number] : bridge.row.devices) {
      added.erase(device);
    }
  }
  return added;
}

std::set<std::string> aggregated_devices(BridgeRow const &row) {
  std::set<std::string> devices;
  for (auto const &[name, lag] : row.lags) {
    devices.insert(lag.devices.begin(), lag.devices.end());
  }
  return devices;
}

std::set<openflow::Port> chosen_uplinks(WantedBridge const &wanted) {
  std::set<openflow::Port> uplinks;
  for (auto const &carried : wanted.carried) {
    for (auto const &slot : carried.slots) {
      uplinks.insert(slot.begin(), slot.end());
    }
  }
  return uplinks;
}

}  // namespace simhost::daemon
