// Switches of the host: their life, their names, what they tell about themselves.
// A function that takes a name of a switch refuses one that no switch has (QEX_NOT_FOUND).
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "base/api.h"
#include "model/properties/descriptor.h"
#include "storage/ports.h"
#include "vswitch/device.h"
#include "vswitch/mirror.h"
#include "vswitch/switch_info.h"

namespace simhost {

/// Ports of a switch, uplink ports not counted.
inline constexpr std::uint32_t kDefaultMaxPorts = 128;
inline constexpr std::uint32_t kDefaultVersion = VS_YKT_NEB_VERSION_20;

/// Bytes of names, without the NUL that the fixed texts of the callers' records have room for.
inline constexpr std::size_t kLongestAlias = sizeof(VSInfo::dvsName) - 1;
inline constexpr std::size_t kLongestSwitchIdentifier = sizeof(VSInfo::nebID) - 1;
inline constexpr std::size_t kLongestPortset = VS_PORTSET_NAME_MAX - 1;

/// What a new switch is to be. An empty identifier or portset and a 0 leave the choice to the host.
struct SwitchSpec {
  std::string_view alias;
  std::string_view identifier = {};
  std::string_view portset = {};
  std::uint32_t max_ports = 0;  ///< uplink ports not counted
  bool persistent = false;
  std::uint32_t version = 0;
  std::uint32_t mtu = 0;  ///< bytes
  std::uint32_t uplink_count = 0;
  bool associated = true;  ///< runs on this host
};

/// Creates a switch and attaches free uplinks to its uplink ports "uplink1", "uplink2", ... Refuses
/// an empty alias and a number out of bounds (QEX_BAD_PARAM), a name too long (QEX_NAME_TOO_LONG),
/// a name that is taken (QEX_EXISTS), and more uplinks than are free (QEX_NO_RESOURCES).
SIMHOST_API storage::SwitchKey create_switch(storage::ChangingTransaction &transaction,
                                             SwitchSpec const &spec);
/// Destroys a switch with its ports and properties; its uplinks become free.
SIMHOST_API void destroy_switch(storage::ChangingTransaction &transaction, std::string_view alias);

SIMHOST_API void destroy_switch(storage::ChangingTransaction &transaction, storage::SwitchKey key);
/// Starts or stops running a switch on this host.
SIMHOST_API void change_running(storage::ChangingTransaction &transaction, storage::SwitchKey key,
                                bool running);

/// Refuses 0 (QEX_BAD_PARAM).
SIMHOST_API void change_version(storage::ChangingTransaction &transaction, storage::SwitchKey key,
                                std::uint32_t version);
/// Refuses 0 and more than a switch can have (QEX_BAD_PARAM), and fewer than it has
/// (QEX_LIMIT_EXCEEDED).
SIMHOST_API void change_max_ports(storage::ChangingTransaction &transaction, storage::SwitchKey key,
                                  std::uint32_t max_ports);

/// From one name of a switch to another.
SIMHOST_API std::string identifier_of(storage::Transaction &transaction, std::string_view alias);
SIMHOST_API std::string portset_of(storage::Transaction &transaction, std::string_view alias);
SIMHOST_API std::string alias_of_portset(storage::Transaction &transaction,
                                         std::string_view portset);

SIMHOST_API VSInfo switch_info(storage::Transaction &transaction, std::string_view alias);
/// The uplinks of a switch, in the order of its uplink ports.
SIMHOST_API std::vector<storage::AttachedUplink> uplinks_of(storage::Transaction &transaction,
                                                            std::string_view alias);

/// The values of QEX_NEBPROP_SWITCH_ALIAS, QEX_NEBPROP_SWITCH_VERSION and QEX_NEBPROP_HOST_PROXY,
/// which are names and a number of the switch; the first two can be set.
SIMHOST_API Bytes read_alias(storage::Transaction &transaction,
                             storage::PropertyOwner const &owner);
SIMHOST_API Bytes read_version(storage::Transaction &transaction,
                               storage::PropertyOwner const &owner);
SIMHOST_API Bytes read_portset(storage::Transaction &transaction,
                               storage::PropertyOwner const &owner);
SIMHOST_API void write_alias(Setting const &setting);
SIMHOST_API void write_version(Setting const &setting);

}  // namespace simhost
