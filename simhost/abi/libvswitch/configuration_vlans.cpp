// VSDVS_*: VLANs of ports and private VLANs of switches.
#include <span>

#include "abi/targets.h"
#include "model/vlans/vlans.h"
#include "vswitch/configuration.h"

namespace simhost {
namespace {

// An array of the caller; refuses null with a count, and a count that nothing can have, before that
// much is read (QEX_BAD_PARAM).
template <typename Entry>
std::span<Entry const> array(Entry const *first, int count) {
  if (count < 0 || count > vlans::kNumbers || (first == nullptr && count != 0)) {
    refuse(QEX_BAD_PARAM);
  }
  return {first, static_cast<std::size_t>(count)};
}

}  // namespace

extern "C" {

QEX_ReturnStatus VSDVS_GetPortVLANPolicy(char const *switchName, char const *port,
                                         VSPortVlanPolicy **policy, int *priority) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto &policy_output = require(policy);
    auto &priority_output = require(priority);
    auto &transaction = call.transaction();
    auto const owner = owner_of(transaction, target);
    auto const bytes = effective_bytes(transaction, vlans::of_port, owner);
    priority_output = effective(transaction, vlans::priority, owner);
    policy_output = allocate<VSPortVlanPolicy>(call, bytes);
  });
}

QEX_ReturnStatus VSDVS_SetPortVLANPolicy(char const *switchName, char const *port,
                                         qex_uint16 vlanID, int priority, qex_Bool guestTagging,
                                         qex_Bool privateVlan, qex_NEBPortVIDRange *ranges,
                                         qex_uint16 numRanges) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto const trunk = array(ranges, numRanges);
    vlans::PortVlans const wanted{.vlan = vlanID,
                                  .priority = priority,
                                  .guest_tagging = guestTagging != 0,
                                  .private_vlan = privateVlan != 0,
                                  .ranges = {trunk.begin(), trunk.end()}};
    auto &transaction = call.transaction();
    set_vlans(transaction, get_target(transaction, target), wanted);
  });
}

QEX_ReturnStatus VSDVS_ClearPortVLANPolicy(char const *switchName, char const *port) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = port_of(switch_called(switchName), port);
    auto &transaction = call.transaction();
    clear_vlans(transaction, get_target(transaction, target));
  });
}

QEX_ReturnStatus VSDVS_GetPortNestedVLANTagging(char const *switchName, char const *port,
                                                qex_Bool *enabled) {
  return reading(__func__, [&](ReadingCall &call) {
    require(enabled) = get(call, port_of(switch_called(switchName), port), vlans::nested_tag);
  });
}

QEX_ReturnStatus VSDVS_SetPortNestedVLANTagging(char const *switchName, char const *port,
                                                qex_Bool enabled) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const value = static_cast<qex_Bool>(enabled != 0);
    set(call, port_of(switch_called(switchName), port), vlans::nested_tag, value);
  });
}

QEX_ReturnStatus VSDVS_GetPrivateVLANMap(char const *switchName, VSPvlanMapEntry **entries,
                                         int *count) {
  return reading(__func__, [&](ReadingCall &call) {
    auto const target = switch_called(switchName);
    auto &entries_output = require(entries);
    auto &count_output = require(count);
    auto const map = get(call, target, vlans::private_vlans);
    auto const bytes = std::as_bytes(std::span(map));
    count_output = static_cast<int>(map.size());
    entries_output = map.empty() ? nullptr : allocate<VSPvlanMapEntry>(call, bytes);
  });
}

QEX_ReturnStatus VSDVS_SetPrivateVLANMap(char const *switchName, VSPvlanMapEntry const *entries,
                                         int count) {
  return changing(__func__, [&](ChangingCall &call) {
    auto const target = switch_called(switchName);
    auto const map = array(entries, count);
    set(call, target, vlans::private_vlans, {map.begin(), map.end()});
  });
}

}  // extern "C"
}  // namespace simhost
