// DVSQEX_*: the kernel's switches.
#include <algorithm>

#include "abi/boundary.h"
#include "abi/ledger.h"
#include "abi/targets.h"
#include "model/ports/ports.h"
#include "model/switches/switches.h"
#include "nebpublic/kernel_state.h"
#include "storage/store.h"

namespace simhost {
namespace {

// Does `work` to the switch with an identifier.
template <typename Work>
QEX_ReturnStatus change(char const *name, char const *switch_id, Work const &work) {
  return changing(name, [&](ChangingCall &call) {
    auto const target = switch_identified(switch_id);
    auto &transaction = call.transaction();
    work(transaction, get_target(transaction, target));
  });
}

}  // namespace

extern "C" {

QEX_ReturnStatus DVSQEX_SwitchAdd(char const *switchId, char const *alias, qex_uint32 maxPorts,
                                  NEBVersion version) {
  return changing(__func__, [&](ChangingCall &call) {
    SwitchSpec const spec{.alias = require_text(alias),
                          .identifier = require_text(switchId),
                          .max_ports = maxPorts,
                          .persistent = true,
                          .version = version,
                          .associated = false};
    if (spec.identifier.empty()) {
      refuse(QEX_BAD_PARAM);
    }
    create_switch(call.transaction(), spec);
  });
}

QEX_ReturnStatus DVSQEX_SwitchRemove(char const *switchId) {
  return change(__func__, switchId,
                [](storage::ChangingTransaction &transaction, storage::SwitchKey key) {
                  destroy_switch(transaction, key);
                });
}

QEX_ReturnStatus DVSQEX_SwitchAssociate(char const *switchId) {
  return change(__func__, switchId,
                [](storage::ChangingTransaction &transaction, storage::SwitchKey key) {
                  change_running(transaction, key, true);
                });
}

QEX_ReturnStatus DVSQEX_SwitchDissociate(char const *switchId) {
  return change(__func__, switchId,
                [](storage::ChangingTransaction &transaction, storage::SwitchKey key) {
                  change_running(transaction, key, false);
                });
}

QEX_ReturnStatus DVSQEX_SwitchSetVersion(char const *switchId, NEBVersion version) {
  return change(__func__, switchId,
                [&](storage::ChangingTransaction &transaction, storage::SwitchKey key) {
                  change_version(transaction, key, version);
                });
}

QEX_ReturnStatus DVSQEX_SwitchSetMaxPorts(char const *switchId, qex_uint32 maxPorts) {
  return change(__func__, switchId,
                [&](storage::ChangingTransaction &transaction, storage::SwitchKey key) {
                  change_max_ports(transaction, key, maxPorts);
                });
}

QEX_ReturnStatus DVSQEX_SwitchPortList(char const *switchId, DVPortList **ports, DVSPortType type) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const target = switch_identified(switchId);
    auto &output = require(ports);
    auto const number = static_cast<int>(type);
    if (number < DVSPORT_TYPE_ACTIVE || number > DVSPORT_TYPE_LOCALCACHE) {
      refuse(QEX_BAD_PARAM);
    }
    auto &transaction = call.transaction();
    auto const entries = ports_of_type(transaction, get_target(transaction, target), type);
    auto const beyond_first = std::max<std::size_t>(entries.size(), 1) - 1;
    auto const size = sizeof(DVPortList) + (beyond_first * sizeof(DVPortData));
    auto *const list = static_cast<DVPortList *>(call.ledger().allocate(size, call.name()));
    list->nports = static_cast<int>(entries.size());
    list->type = type;
    std::copy(entries.begin(), entries.end(), &list->dvPort[0]);
    output = list;
  });
}

}  // extern "C"
}  // namespace simhost
