// Which switches have frames, and of which of them no flows can be made.
#pragma once

#include <filesystem>

#include "storage/switches.h"

namespace simhost::openvswitch {

/// Whether frames come and go over an uplink of a switch.
bool has_uplink_device(storage::Transaction &transaction, storage::SwitchKey key);
/// Likewise over an uplink or a port.
bool has_device(storage::Transaction &transaction, storage::SwitchKey key);

/// Refuses what the transaction makes of a switch if no flows can be made of that. One that was so
/// before is no reason: everything else would be refused because of it. That flows are made is the
/// daemon's matter. `file` has the state.
void check_switches(storage::Transaction &transaction, std::filesystem::path const &file);

}  // namespace simhost::openvswitch
