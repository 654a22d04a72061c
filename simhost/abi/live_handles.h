// From handles to what they designate now.
#pragma once

#include <string_view>

#include "abi/call.h"
#include "storage/ports.h"
#include "storage/switches.h"

namespace simhost {

/// Both throw Trapped for a handle that the host never gave, and for one of what is gone.
SIMHOST_API storage::FoundSwitch live_switch(ReadingCall &call, void const *handle);
SIMHOST_API storage::Port live_port(ReadingCall &call, void const *handle);

/// The handle of the switch with an alias; null if there is none.
SIMHOST_API void *handle_of_switch(ReadingCall &call, std::string_view alias);
/// The handle of the port of the switch with an identifier; null if there is none.
SIMHOST_API void *handle_of_port(ReadingCall &call, std::string_view switch_identifier,
                                 std::string_view identifier);
/// The handle of the switch that was added after `last`, which becomes that switch; null after the
/// last one.
SIMHOST_API void *handle_after(ReadingCall &call, storage::SwitchKey &last);
/// Likewise for the ports of a switch.
SIMHOST_API void *handle_after(ReadingCall &call, storage::SwitchKey switch_key,
                               storage::PortNumber &last);

}  // namespace simhost
