// What each row of this host's says, whoever else writes there; as a replica has it.
#pragma once

#include <map>
#include <string>

#include "planes/openvswitch/ovsdb/json.h"
#include "planes/openvswitch/ovsdb/replica.h"

namespace simhost::openvswitch {

// In external_ids of a bridge: whose it is.
inline constexpr auto *kHost = "simhost";
// In external_ids of Open_vSwitch: who writes all of those.
inline constexpr auto *kOwner = "simhostd";
inline constexpr auto *kMostTags = "vlan-limit";

inline ovsdb::Json map_of(std::map<std::string, std::string> const &entries) {
  return ovsdb::map({entries.begin(), entries.end()});
}

inline ovsdb::Row const kBridge{{"fail_mode", ovsdb::set({"secure"})},
                                {"protocols", ovsdb::set({"OpenFlow15"})},
                                {"controller", ovsdb::set({})},
                                {"mirrors", ovsdb::set({})},
                                {"other_config", map_of({{"disable-in-band", "true"}})}};
inline ovsdb::Row const kPort{
    {"tag", ovsdb::set({})}, {"trunks", ovsdb::set({})}, {"vlan_mode", ovsdb::set({})}};
inline ovsdb::Row const kInterface{{"type", ""}, {"ingress_policing_rate", 0}};

}  // namespace simhost::openvswitch
