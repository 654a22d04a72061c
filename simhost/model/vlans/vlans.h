// VLANs of ports and the private VLANs of switches.
#pragma once

#include <span>

#include "base/api.h"
#include "base/bytes.h"
#include "model/properties/keys.h"
#include "qexapi/switch_ports.h"
#include "storage/ports.h"
#include "vswitch/port_policies.h"
#include "vswitch/private_vlans.h"

namespace simhost {

/// The rules of VSPROP_PORT_VLAN: refuses VLANs past 4094 (QEX_BAD_VLANID), a private VLAN that is
/// not in the switch's map (QEX_BAD_VLANID), ranges whose ends or which themselves are not in
/// rising order or that share a VLAN, ranges beside a private VLAN, unknown bits, another size
/// (QEX_BAD_PARAM).
void check_vlan_policy(Setting const &setting);
/// The rules of VSPROP_PVLAN_MAP: refuses VLANs outside 1 to 4094 (QEX_BAD_VLANID); unknown types,
/// a promiscuous entry of two VLANs or another entry of one, a VLAN that is secondary twice or both
/// secondary and primary, two isolated VLANs of one primary, another size (QEX_BAD_PARAM).
void check_private_vlans(Setting const &setting);
/// Refuses a VLAN past 4094 (QEX_BAD_VLANID); 0 is none.
void check_vlan(qex_uint16 vlan);

/// The VLANs of a port as callers read them: the bytes of VSPROP_PORT_VLAN.
SIMHOST_API Bytes vlan_policy_of(storage::Transaction &transaction, storage::Port const &port);
/// The priority of a port's frames; -1 if it has none.
SIMHOST_API int priority_of(storage::Transaction &transaction, storage::Port const &port);

struct VlanSpec {
  qex_uint16 vlan;
  int priority;  ///< -1 leaves it to the frames
  bool guest_tagging;
  bool private_vlan;
  std::span<qex_NEBPortVIDRange const> ranges;
};

/// Sets VSPROP_PORT_VLAN, and VSPROP_PORT_PRIORITY if there is a priority.
SIMHOST_API void set_vlans(storage::Transaction &transaction, storage::Port const &port,
                           VlanSpec const &spec);
/// Takes a port out of all VLANs; its priority goes too.
SIMHOST_API void clear_vlans(storage::Transaction &transaction, storage::Port const &port);

/// The value of QEX_NEBPROP_PORT_VLAN: what VSPROP_PORT_VLAN says in the form of all kinds of
/// switch.
Bytes vlan_info_of(storage::Transaction &transaction, storage::PropertyOwner const &owner);

}  // namespace simhost
