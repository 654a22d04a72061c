// The table of keys; nothing else in the host knows what a key's bytes are.
#include "model/properties/keys.h"

#include <algorithm>
#include <array>

#include "base/outcomes.h"
#include "model/mirror/sessions.h"
#include "model/policies.h"
#include "model/ports/ports.h"
#include "model/ports/runtime_state.h"
#include "model/switches/switches.h"
#include "model/vlans/vlans.h"
#include "qexapi/links.h"
#include "qexapi/protocols.h"
#include "qexapi/switch_properties.h"
#include "vswitch/mac_tables.h"
#include "vswitch/mcast_filter_modes.h"
#include "vswitch/properties.h"

namespace simhost {
namespace {

using storage::PropertyScope;
using storage::PropertyType;

// One more than the name of an uplink port has: what callers have room for.
constexpr std::size_t kLongestOverride = 81;

void anything(Setting const & /*setting*/) {}

// One record of the accepted size with any content.
template <typename Record>
void any_record(Setting const &setting) {
  record_of<Record>(setting.value);
}

template <typename Record, void (*Check)(Record const &)>
void record(Setting const &setting) {
  Check(record_of<Record>(setting.value));
}

template <typename Number, Number Least, Number Greatest>
void number(Setting const &setting) {
  auto const value = record_of<Number>(setting.value);
  if (value < Least || value > Greatest) {
    throw Refused(QEX_BAD_PARAM);
  }
}

void boolean(Setting const &setting) {
  number<qex_uint8, 0, 1>(setting);
}

void vlan_number(Setting const &setting) {
  check_vlan(record_of<qex_uint16>(setting.value));
}

template <std::size_t Longest>
void text(Setting const &setting) {
  if (text_of(setting.value).size() > Longest) {
    throw Refused(QEX_NAME_TOO_LONG);
  }
}

constexpr auto kMtu = number<qex_uint32, kLeastMtu, kGreatestMtu>;
constexpr auto kLink = number<qex_uint32, QEX_LINK_STATE_DOWN, QEX_LINK_STATE_UP>;
constexpr auto kHealth = number<qex_uint32, QEX_NEB_STATUS_OK, QEX_NEB_STATUS_DOWN>;
constexpr auto kPortsetState =
    number<qex_uint32, QEX_NEBPORTSET_STATE_DEACTIVE, QEX_NEBPORTSET_STATE_HOTSWAP>;
constexpr auto kPortType = number<qex_uint32, DVSPORT_TYPE_ACTIVE, DVSPORT_TYPE_LOCALCACHE>;
constexpr auto kFilterMode =
    number<qex_uint32, VS_MCAST_FILTER_MODE_LEGACY, VS_MCAST_FILTER_MODE_MLD>;
constexpr auto kPriority = number<qex_int32, QEX_VLAN_PRIORITY_MINIMUM, QEX_VLAN_PRIORITY_MAXIMUM>;

// Keys of a switch as a whole, of the host's part of it, and of its ports.
constexpr auto kSwitch = PropertyScope::global;
constexpr auto kHost = PropertyScope::host;
constexpr auto kPort = PropertyScope::port;
constexpr auto kCommon = KeyFamily::common;
constexpr auto kVendor = KeyFamily::vendor;
constexpr auto kConfig = PropertyType::config;
constexpr auto kPolicy = PropertyType::policy;
constexpr auto kRuntime = PropertyType::runtime;
constexpr auto kVolatile = PropertyType::transient;

constexpr std::array kKeys{
    PropertyKey{QEX_NEBPROP_SWITCH_ALIAS, kSwitch, kCommon, kConfig, anything, read_alias,
                write_alias},
    PropertyKey{QEX_NEBPROP_SWITCH_VERSION, kSwitch, kCommon, kConfig, anything, read_version,
                write_version},
    PropertyKey{QEX_NEBPROP_SWITCH_UPLINKPORTS, kSwitch, kCommon, kConfig, anything,
                read_uplink_names, write_uplink_names},
    PropertyKey{QEX_NEBPROP_SWITCH_OVERLAY, kSwitch, kCommon, kConfig, anything},
    PropertyKey{QEX_NEBPROP_SWITCH_RESPOOLS_LIST, kSwitch, kCommon, kConfig, anything},
    PropertyKey{QEX_NEBPROP_SWITCH_RESPOOLS_SCHED, kSwitch, kCommon, kConfig, anything},
    PropertyKey{QEX_CISCO_PROP_SWITCH_CDP, kSwitch, kCommon, kConfig, anything},

    PropertyKey{QEX_NEBPROP_HOST_STATUS, kHost, kCommon, kVolatile, kHealth},
    PropertyKey{QEX_NEBPROP_HOST_PROXY_STATE, kHost, kCommon, kVolatile, kPortsetState},
    PropertyKey{QEX_NEBPROP_HOST_PROXY, kHost, kCommon, kConfig, anything, read_portset},
    PropertyKey{QEX_NEBPROP_HOST_UPLINKPORTS, kHost, kCommon, kConfig, anything, read_uplink_ids,
                write_uplink_ids},

    PropertyKey{QEX_NEBPROP_PORT_STATUS, kPort, kCommon, kVolatile, anything, read_port_status},
    PropertyKey{QEX_NEBPROP_PORT_TYPE, kPort, kCommon, kVolatile, kPortType},
    PropertyKey{QEX_NEBPROP_PORT_VLAN, kPort, kCommon, kVolatile, anything, vlan_info_of},
    PropertyKey{QEX_NEBPROP_PORT_PERSIST, kPort, kCommon, kVolatile, boolean},
    PropertyKey{QEX_NEBPROP_PORT_PTALLOWED, kPort, kCommon, kConfig, boolean},
    PropertyKey{QEX_NEBPROP_PORT_PTALLOWEDRT, kPort, kCommon, kRuntime, boolean},
    PropertyKey{QEX_NEBPROP_PORT_STATISTICS, kPort, kCommon, kRuntime, anything,
                read_port_statistics},
    PropertyKey{QEX_NEBPROP_PORT_ALIAS, kPort, kCommon, kConfig, check_port_alias},
    PropertyKey{QEX_NEBPROP_PORT_CONNECTID, kPort, kCommon, kConfig, any_record<qex_uint32>},
    PropertyKey{QEX_NEBPROP_PORT_QEXNIC_VLANID, kPort, kCommon, kConfig, vlan_number},
    PropertyKey{QEX_NEBPROP_PORT_VNIC_CONNECTEE, kPort, kCommon, kRuntime, anything},
    PropertyKey{QEX_NEBPROP_PORT_PORTGROUP, kPort, kCommon, kConfig, anything},
    PropertyKey{QEX_NEBPROP_PORT_BLOCK, kPort, kCommon, kPolicy, boolean},
    PropertyKey{QEX_NEBPROP_PORT_LINK_STATUS, kPort, kCommon, kRuntime, kLink, read_link_status,
                write_link_status},
    PropertyKey{QEX_NEBPROP_PORT_RESPOOLS_CFG, kPort, kCommon, kConfig, anything},
    PropertyKey{QEX_NEBPROP_PORT_RESPOOL_ASSOC, kPort, kCommon, kConfig, anything},
    PropertyKey{QEX_NEBPROP_PORT_SHAPER_INPUT, kPort, kCommon, kPolicy, anything},
    PropertyKey{QEX_NEBPROP_PORT_SHAPER_BROADCAST, kPort, kCommon, kPolicy, anything},
    PropertyKey{QEX_NEBPROP_PORT_SHAPER_OUTPUT, kPort, kCommon, kPolicy, anything},
    PropertyKey{QEX_NEBPROP_PORT_OVERLAY, kPort, kCommon, kConfig, anything},
    PropertyKey{QEX_NEBPROP_PORT_DVFILTER, kPort, kCommon, kPolicy, anything},
    PropertyKey{QEX_NEBPORT_FORWARD_NOT_READY_BLOCK, kPort, kCommon, kConfig, boolean},

    PropertyKey{VSPROP_MTU, kSwitch, kVendor, kConfig, kMtu},
    PropertyKey{VSPROP_PVLAN_MAP, kSwitch, kVendor, kConfig, check_private_vlans},
    PropertyKey{VSPROP_MULTICAST_FILTER, kSwitch, kVendor, kConfig, kFilterMode},
    PropertyKey{VSPROP_SWITCH_TEAMING, kSwitch, kVendor, kConfig,
                record<VSTeamPolicy, check_teaming>},
    PropertyKey{VSPROP_SWITCH_FORWARDING_DISABLED, kSwitch, kVendor, kConfig, boolean},
    PropertyKey{VSPROP_SWITCH_UPLINK_MIRROR_SESSIONS, kSwitch, kVendor, kConfig,
                check_mirror_sessions},
    PropertyKey{VSPROP_SWITCH_MAC_LEARNING, kSwitch, kVendor, kConfig,
                record<VSMACLearning, check_mac_learning>},
    PropertyKey{VSPROP_SWITCH_STATUS, kHost, kVendor, kVolatile, kHealth},

    PropertyKey{VSPROP_PORT_SECURITY, kPort, kVendor, kPolicy,
                record<VSPropSecurity, check_security>},
    PropertyKey{VSPROP_PORT_TEAMING_POLICY, kPort, kVendor, kPolicy,
                record<VSTeamPolicy, check_teaming>},
    PropertyKey{VSPROP_PORT_TEAMING_OVERRIDE, kPort, kVendor, kPolicy, text<kLongestOverride>},
    PropertyKey{VSPROP_PORT_VLAN, kPort, kVendor, kPolicy, check_vlan_policy},
    PropertyKey{VSPROP_PORT_PRIORITY, kPort, kVendor, kPolicy, kPriority},
    PropertyKey{VSPROP_PORT_TX_UPLINK, kPort, kVendor, kPolicy, boolean},
    PropertyKey{VSPROP_PORT_MIRROR_SESSIONS, kPort, kVendor, kPolicy, check_mirror_sessions},
    PropertyKey{VSPROP_PORT_VLAN_NESTEDTAG, kPort, kVendor, kPolicy, boolean},
    PropertyKey{VSPROP_PORT_EXTRA_ETH_FRP, kPort, kVendor, kPolicy,
                record<VSExtraEthFilter, check_eth_filter>},
    PropertyKey{VSPROP_PORT_MAC_MANAGEMENT, kPort, kVendor, kPolicy,
                record<VSPMACManagement, check_mac_management>},
    PropertyKey{VSPROP_PORT_MAC_LEARNING_STATS, kPort, kVendor, kRuntime, anything,
                read_learning_stats},
};

}  // namespace

std::span<PropertyKey const> property_keys() {
  return kKeys;
}

PropertyKey const *find_property_key(std::string_view name) {
  auto const *const found = std::find_if(kKeys.begin(), kKeys.end(),
                                         [&](PropertyKey const &key) { return key.name == name; });
  return found == kKeys.end() ? nullptr : found;
}

KeyFamily family_of(std::string_view name) {
  auto const *const key = find_property_key(name);
  return key == nullptr ? KeyFamily::extra : key->family;
}

}  // namespace simhost
