// From the names that callers use to what they name. A name that nothing has is refused
// (QEX_NOT_FOUND).
#pragma once

#include <optional>
#include <string_view>

#include "core/api.h"
#include "store/ports.h"
#include "store/properties.h"
#include "store/switches.h"

namespace simhost {

SIMHOST_API store::FoundSwitch known_switch(store::Transaction &transaction, std::string_view name,
                                            store::SwitchName kind = store::SwitchName::alias);
/// Likewise, and refuses a switch that does not run on this host.
SIMHOST_API store::FoundSwitch running_switch(store::Transaction &transaction,
                                              std::string_view alias);
SIMHOST_API store::Port known_port(store::Transaction &transaction, store::SwitchKey switch_key,
                                   std::string_view identifier);
/// The port of the switch that is called `switch_name`, a name of the given kind.
SIMHOST_API store::Port known_port(store::Transaction &transaction, store::SwitchName kind,
                                   std::string_view switch_name, std::string_view identifier);
SIMHOST_API store::Port known_port(store::Transaction &transaction, store::PortNumber number);
/// Likewise, of one switch only.
SIMHOST_API store::Port known_port(store::Transaction &transaction, store::SwitchKey switch_key,
                                   store::PortNumber number);
/// Likewise, of any switch that runs on this host; the others' ports have no number.
SIMHOST_API store::Port running_port(store::Transaction &transaction, store::PortNumber number);
SIMHOST_API store::Uplink known_uplink(store::Transaction &transaction, std::string_view name);
/// Likewise, at a port of one switch only.
SIMHOST_API store::Uplink known_uplink(store::Transaction &transaction, store::SwitchKey switch_key,
                                       std::string_view name);

/// Likewise, but nothing if it is not there.
SIMHOST_API std::optional<store::Port> find_port(store::Transaction &transaction,
                                                 store::SwitchName kind,
                                                 std::string_view switch_name,
                                                 std::string_view identifier);

/// Whether the switch or the port that owns properties is there.
SIMHOST_API bool is_there(store::Transaction &transaction, store::PropertyOwner const &owner);

/// A port as an owner of properties.
inline store::PropertyOwner owner_of(store::Port const &port) {
  return store::PropertyOwner::port(port.switch_key, port.number);
}

}  // namespace simhost
