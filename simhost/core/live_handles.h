// From handles to what they designate now.
#pragma once

#include <string_view>

#include "core/call.h"
#include "store/ports.h"
#include "store/switches.h"

namespace simhost {

/// Both throw HostPanic for a handle that the host never gave, and for one of what is gone.
SIMHOST_API store::FoundSwitch live_switch(Call &call, store::Transaction &transaction,
                                           void const *handle);
SIMHOST_API store::Port live_port(Call &call, store::Transaction &transaction, void const *handle);

/// The handle of the switch with an alias; null if there is none.
SIMHOST_API void *handle_of_switch(Call &call, std::string_view alias);
/// The handle of the port of the switch with an identifier; null if there is none.
SIMHOST_API void *handle_of_port(Call &call, std::string_view switch_identifier,
                                 std::string_view identifier);
/// The handle of the switch that was added after `last`, which becomes that switch; null after the
/// last one.
SIMHOST_API void *handle_after(Call &call, store::SwitchKey &last);
/// Likewise for the ports of a switch.
SIMHOST_API void *handle_after(Call &call, store::SwitchKey switch_key, store::PortNumber &last);

}  // namespace simhost
