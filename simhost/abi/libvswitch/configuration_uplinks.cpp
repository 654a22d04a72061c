// VSDVS_*: the uplink ports of switches.

#include "abi/targets.h"
#include "model/ports/ports.h"
#include "vswitch/configuration.h"
#include "vswitch/teaming.h"

namespace simhost {
namespace {

// A caller's list of `count` texts, whose size only its count tells.
template <typename List>
BytesView list_bytes(List const &list, std::size_t width) {
  if (list.nUplinkPorts > QEX_TEAM_MAX_UPLINKS) {
    refuse(QEX_LIMIT_EXCEEDED);
  }
  return {reinterpret_cast<std::byte const *>(&list), sizeof list + (list.nUplinkPorts * width)};
}

}  // namespace

extern "C" {

QEX_ReturnStatus VSDVS_GetSwitchUplinkPorts(char const *switchName, VSUplinkPorts **names,
                                            VSUplinkPortIds **ids) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const target = switch_called(switchName);
    auto &names_output = require(names);
    auto &ids_output = require(ids);
    auto &transaction = call.transaction();
    auto const owner = owner_of(transaction, target);
    auto const name_list = read_uplink_names(transaction, owner);
    auto const id_list = read_uplink_ids(transaction, owner);
    names_output = allocate<VSUplinkPorts>(call, name_list);
    ids_output = allocate<VSUplinkPortIds>(call, id_list);
  });
}

QEX_ReturnStatus VSDVS_SetSwitchUplinkPorts(char const *switchName, VSUplinkPorts const *names,
                                            VSUplinkPortIds const *ids) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = switch_called(switchName);
    auto const ports = uplink_ports_in(list_bytes(require(names), QEX_NEB_NAME_MAX_LEN),
                                       list_bytes(require(ids), QEX_NEB_PORT_ID_MAX_LEN));
    auto &transaction = call.transaction();
    set_uplink_ports(transaction, get_target(transaction, target), ports);
  });
}

QEX_ReturnStatus VSDVS_AddSwitchUplinkPort(char const *switchName, char const *uplink) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = switch_called(switchName);
    auto const name = require_text(uplink);
    auto &transaction = call.transaction();
    add_uplink_port(transaction, get_target(transaction, target), name);
  });
}

QEX_ReturnStatus VSDVS_RemoveSwitchUplinkPort(char const *switchName, char const *uplink) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = switch_called(switchName);
    auto const name = require_text(uplink);
    auto &transaction = call.transaction();
    remove_uplink_port(transaction, get_target(transaction, target), name);
  });
}

QEX_ReturnStatus VSDVS_ClearSwitchUplinkPorts(char const *switchName) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = switch_called(switchName);
    auto &transaction = call.transaction();
    set_uplink_ports(transaction, get_target(transaction, target), {});
  });
}

}  // extern "C"
}  // namespace simhost
