// From the names that callers use to what they name. A name that nothing has is refused
// (QEX_NOT_FOUND).
#pragma once

#include <string_view>

#include "core/api.h"
#include "store/ports.h"
#include "store/switches.h"

namespace simhost {

SIMHOST_API store::FoundSwitch known_switch(store::Transaction &transaction, std::string_view name,
                                            store::SwitchName kind = store::SwitchName::alias);
SIMHOST_API store::Port known_port(store::Transaction &transaction, store::SwitchKey switch_key,
                                   std::string_view identifier);
SIMHOST_API store::Port known_port(store::Transaction &transaction, store::PortNumber number);
/// Likewise, of one switch only.
SIMHOST_API store::Port known_port(store::Transaction &transaction, store::SwitchKey switch_key,
                                   store::PortNumber number);
SIMHOST_API store::Uplink known_uplink(store::Transaction &transaction, std::string_view name);
/// Likewise, at a port of one switch only.
SIMHOST_API store::Uplink known_uplink(store::Transaction &transaction, store::SwitchKey switch_key,
                                       std::string_view name);

}  // namespace simhost
