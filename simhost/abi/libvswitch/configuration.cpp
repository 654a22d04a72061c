// VSDVS_*: the life of switches and their ports, their names, and memory that comes back.
#include "vswitch/configuration.h"

#include <algorithm>

#include "abi/boundary.h"
#include "abi/ledger.h"
#include "abi/targets.h"
#include "model/ports/ports.h"
#include "model/ports/properties.h"
#include "model/switches/properties.h"
#include "model/switches/switches.h"

namespace simhost {
namespace {

// The number of a port; a switch that does not run has given its ports none.
int running_number(ReadingCall &call, NamedPort const &target) {
  auto &transaction = call.transaction();
  auto const [key, row] = get_switch(transaction, target.owner.name, target.owner.kind);
  if (!row.associated) {
    refuse(QEX_NOT_FOUND);
  }
  return static_cast<int>(get_port(transaction, key, target.identifier).number);
}

}  // namespace

extern "C" {

QEX_ReturnStatus VSDVS_CreateVSwitch(char const *alias, char const *switchId,
                                     char const *portsetName, qex_uint32 maxPorts,
                                     qex_Bool persistent, qex_uint32 version, qex_uint32 mtu,
                                     qex_uint32 uplinkCount) {
  return changing(__func__, [&](ChangingCall &call) {
    SwitchSpec const spec{.alias = require_text(alias),
                          .identifier = optional_text(switchId),
                          .portset = optional_text(portsetName),
                          .max_ports = maxPorts,
                          .persistent = persistent != 0,
                          .version = version,
                          .mtu = mtu,
                          .uplink_count = uplinkCount};
    create_switch(call.transaction(), spec);
  });
}

QEX_ReturnStatus VSDVS_DestroyVSwitch(char const *switchName) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const alias = require_text(switchName);
    destroy_switch(call.transaction(), alias);
  });
}

QEX_ReturnStatus VSDVS_AddDVPort(char const *switchName, char const *port, qex_uint32 connectId) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto &transaction = call.transaction();
    auto const added =
        add_client_port(transaction, get_target(transaction, target.owner), target.identifier);
    set(transaction, ports::connection, owner_of(added), connectId);
  });
}

QEX_ReturnStatus VSDVS_AddOpaqueDVPort(char const *switchName, char const *port,
                                       char const *externalId) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto const external = require_text(externalId);
    auto &transaction = call.transaction();
    auto const added =
        add_client_port(transaction, get_target(transaction, target.owner), target.identifier);
    set_external_id(transaction, added, external);
  });
}

QEX_ReturnStatus VSDVS_RemoveDVPort(char const *switchName, char const *port) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto &transaction = call.transaction();
    remove_port(transaction, get_target(transaction, target));
  });
}

QEX_ReturnStatus VSDVS_DvPortIDToPortID(char const *switchName, char const *port, int *portID) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const target = port_of(switch_called(switchName), port);
    require(portID) = running_number(call, target);
  });
}

QEX_ReturnStatus VSDVS_DvPortIDToPortIDFromDVSID(char const *switchId, char const *port,
                                                 int *portID) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const target = port_of(switch_identified(switchId), port);
    require(portID) = running_number(call, target);
  });
}

QEX_ReturnStatus VSDVS_GetAliasFromPortset(char const *portsetName, char *aliasBuffer) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const name = require_text(portsetName);
    auto *const output = &require(aliasBuffer);
    auto const alias = alias_of_portset(call.transaction(), name);
    *std::copy(alias.begin(), alias.end(), output) = '\0';
  });
}

QEX_ReturnStatus VSDVS_GetMTU(char const *switchName, qex_uint32 *mtu) {
  return reading(__func__, [&](ReadingCall &call) {
    require(mtu) = get(call, switch_called(switchName), switches::mtu);
  });
}

QEX_ReturnStatus VSDVS_SetMTU(char const *switchName, qex_uint32 mtu) {
  return changing(__func__, [&](ChangingCall &call) {
    set(call, switch_called(switchName), switches::mtu, mtu);
  });
}

void VSDVS_FreeMemory(void *memory) {
  stateless_or_trap(__func__, [&](Call &call) { call.ledger().release(memory, call.name()); });
}

}  // extern "C"
}  // namespace simhost
