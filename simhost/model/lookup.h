// From the names that callers use to what they name. A name that nothing has is refused
// (QEX_NOT_FOUND).
#pragma once

#include <optional>
#include <string_view>

#include "base/api.h"
#include "storage/ports.h"
#include "storage/properties.h"
#include "storage/switches.h"

namespace simhost {

SIMHOST_API storage::FoundSwitch get_switch(storage::Transaction &transaction,
                                            std::string_view name,
                                            storage::SwitchName kind = storage::SwitchName::alias);
/// Likewise, and refuses a switch that does not run on this host.
SIMHOST_API storage::FoundSwitch get_running_switch(storage::Transaction &transaction,
                                                    std::string_view alias);
SIMHOST_API storage::Port get_port(storage::Transaction &transaction, storage::SwitchKey switch_key,
                                   std::string_view identifier);
/// The port of the switch that is called `switch_name`, a name of the given kind.
SIMHOST_API storage::Port get_port(storage::Transaction &transaction, storage::SwitchName kind,
                                   std::string_view switch_name, std::string_view identifier);
SIMHOST_API storage::Port get_port(storage::Transaction &transaction, storage::PortNumber number);
/// Likewise, of one switch only.
SIMHOST_API storage::Port get_port(storage::Transaction &transaction, storage::SwitchKey switch_key,
                                   storage::PortNumber number);
/// Likewise, of any switch that runs on this host; the others' ports have no number.
SIMHOST_API storage::Port get_running_port(storage::Transaction &transaction,
                                           storage::PortNumber number);
SIMHOST_API storage::Uplink get_uplink(storage::Transaction &transaction, std::string_view name);
/// Likewise, at a port of one switch only.
SIMHOST_API storage::Uplink get_uplink(storage::Transaction &transaction,
                                       storage::SwitchKey switch_key, std::string_view name);

/// Likewise, but nothing if it is not there.
SIMHOST_API std::optional<storage::Port> find_port(storage::Transaction &transaction,
                                                   storage::SwitchName kind,
                                                   std::string_view switch_name,
                                                   std::string_view identifier);

/// Whether the switch or the port that owns properties is there.
SIMHOST_API bool is_there(storage::Transaction &transaction, storage::PropertyOwner const &owner);

/// A port as an owner of properties.
inline storage::PropertyOwner owner_of(storage::Port const &port) {
  return storage::PropertyOwner::port(port.switch_key, port.number);
}

}  // namespace simhost
