// What each row of this host's says, whoever else writes there; as a replica has it.
#pragma once

#include <map>
#include <string>
#include <string_view>

#include "planes/openvswitch/ovsdb/json.h"
#include "planes/openvswitch/ovsdb/replica.h"
#include "planes/openvswitch/rows/rows.h"

namespace simhost::openvswitch {

// In external_ids of a bridge: whose it is.
inline constexpr auto *kHost = "simhost";
// In external_ids of Open_vSwitch: who writes all of those.
inline constexpr auto *kOwner = "simhostd";
inline constexpr auto *kMostTags = "vlan-limit";
// In external_ids of a bridge: what it is for, unless it is a switch.
inline constexpr auto *kRole = "simhost-role";
inline constexpr auto *kUnderlay = "underlay";
// In other_config of a bridge.
inline constexpr auto *kAddress = "hwaddr";

inline ovsdb::Json map_of(std::map<std::string, std::string> const &entries) {
  return ovsdb::map({entries.begin(), entries.end()});
}

inline ovsdb::Row const kBridge{{"fail_mode", ovsdb::set({"secure"})},
                                {"protocols", ovsdb::set({"OpenFlow15"})},
                                {"controller", ovsdb::set({})},
                                {"mirrors", ovsdb::set({})},
                                {"other_config", map_of({{"disable-in-band", "true"}})}};
inline ovsdb::Row const kPort{{"tag", ovsdb::set({})},
                              {"trunks", ovsdb::set({})},
                              {"vlan_mode", ovsdb::set({})},
                              {"lacp", ovsdb::set({})}};
inline ovsdb::Row const kInterface{{"ingress_policing_rate", 0}};

inline ovsdb::Row settings_of(BridgeRow const &bridge) {
  auto row = kBridge;
  if (bridge.is_underlay) {
    row["fail_mode"] = ovsdb::set({"standalone"});
    row["protocols"] = ovsdb::set({});
  }
  if (!bridge.address.empty()) {
    row["other_config"] = map_of({{"disable-in-band", "true"}, {kAddress, bridge.address}});
  }
  return row;
}

// Those of a link-aggregation group in place of a port's.
inline ovsdb::Row lag_columns(LagRow const &lag) {
  auto columns = kPort;
  columns["lacp"] = ovsdb::set({"active"});
  columns["other_config"] =
      map_of({{"lacp-system-id", lag.system}, {"lacp-time", lag.is_fast ? "fast" : "slow"}});
  return columns;
}

// And of its devices.
inline ovsdb::Row member_columns(LagRow const &lag) {
  auto columns = kInterface;
  columns["type"] = "";
  columns["other_config"] = map_of({{"lacp-aggregation-key", std::to_string(lag.key)}});
  return columns;
}

// Whether a port of a bridge is a group: no device has such a name.
inline bool is_name_of_lag(std::string_view name, std::string_view bridge) {
  return name.size() > bridge.size() && name.starts_with(bridge) && name[bridge.size()] == '-';
}

}  // namespace simhost::openvswitch
