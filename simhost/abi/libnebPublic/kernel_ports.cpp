// DVSQEX_*: the kernel's ports.
#include "abi/boundary.h"
#include "abi/libnebPublic/arguments.h"
#include "abi/targets.h"
#include "model/lookup.h"
#include "model/ports/ports.h"
#include "model/state/images.h"
#include "nebpublic/kernel_state.h"
#include "storage/store.h"
#include "vswitch/mirror.h"

namespace simhost {
namespace {

QEX_ReturnStatus return_port(char const *name, char const *switch_id, char const *port,
                             Extent extent, NEBVersion version, void **state, int *length) {
  return reading(name, [&](ReadingCall &call) {
    auto const target = port_of(switch_identified(switch_id), port);
    auto const output = output_at(state, length);
    auto &transaction = call.transaction();
    auto const image = port_image(transaction, get_target(transaction, target), extent, version);
    allocate_copy(call, output, image);
  });
}

}  // namespace

extern "C" {

QEX_ReturnStatus DVSQEX_PortAdd(char const *switchId, char const *port, void *state,
                                int stateLength) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = port_of(switch_identified(switchId), port);
    auto const image = argument_bytes(state, stateLength);
    auto &transaction = call.transaction();
    auto const added =
        add_client_port(transaction, get_target(transaction, target.owner), target.identifier);
    if (state != nullptr) {
      load_port(transaction, added, image);
    }
  });
}

QEX_ReturnStatus DVSQEX_PortRemove(char const *switchId, char const *port) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = port_of(switch_identified(switchId), port);
    auto &transaction = call.transaction();
    remove_port(transaction, get_target(transaction, target));
  });
}

QEX_ReturnStatus DVSQEX_PortFind(char const *switchId, char const *port) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const target = port_of(switch_identified(switchId), port);
    get_target(call.transaction(), target);
  });
}

QEX_ReturnStatus DVSQEX_PortGetByExternalId(char const *switchId, char const *externalId,
                                            OpaqueDVPortData **port) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const target = switch_identified(switchId);
    auto const external = require_text(externalId);
    auto &output = require(port);
    auto &transaction = call.transaction();
    auto const found = get_external_port(transaction, get_target(transaction, target), external);
    OpaqueDVPortData data{};
    put_text(data.dvPortId, found.identifier);
    put_text(data.externalId, external);
    output = allocate<OpaqueDVPortData>(call, bytes_of(data));
  });
}

QEX_ReturnStatus DVSQEX_PortStateGet(char const *switchId, char const *port, void **state,
                                     int *length) {
  return return_port(__func__, switchId, port, Extent::whole, VS_YKT_NEB_VERSION_20, state, length);
}

QEX_ReturnStatus DVSQEX_PersistentPortStateGet(char const *switchId, char const *port,
                                               NEBVersion version, void **state, int *length) {
  return return_port(__func__, switchId, port, Extent::persistent, version, state, length);
}

}  // extern "C"
}  // namespace simhost
