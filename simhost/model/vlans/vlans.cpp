// VLAN rules, and the two calls' worth of bytes that follow from one VLAN setting.
#include "model/vlans/vlans.h"

#include <algorithm>
#include <limits>
#include <set>

#include "base/outcomes.h"
#include "model/lookup.h"
#include "model/properties/properties.h"
#include "qexapi/protocols.h"
#include "storage/store.h"
#include "vswitch/properties.h"

namespace simhost {
namespace {

constexpr qex_uint16 kGreatestVlan = 4094;
constexpr qex_uint16 kVlanFlags =
    VSPORT_VLAN_GUEST_TAGGING | VSPORT_VLAN_PVLAN_ENABLED | VSPORT_VLAN_SET_PRIORITY;
constexpr int kNoPriority = -1;

unsigned flag_if(bool set, unsigned flag) {
  return set ? flag : 0;
}

void check_ranges(std::span<qex_NEBPortVIDRange const> ranges) {
  int last = -1;
  for (auto const &range : ranges) {
    check_vlan(range.minVID);
    check_vlan(range.maxVID);
    if (range.minVID > range.maxVID || range.minVID <= last) {
      throw Refused(QEX_BAD_PARAM);
    }
    last = range.maxVID;
  }
}

std::vector<VSPvlanMapEntry> private_vlans_of(storage::Transaction &transaction,
                                              storage::SwitchKey switch_key) {
  auto const map = storage::find_property(transaction, storage::PropertyOwner::global(switch_key),
                                          VSPROP_PVLAN_MAP);
  return map ? records_of<VSPvlanMapEntry>(map->value) : std::vector<VSPvlanMapEntry>();
}

void check_is_private(Setting const &setting, qex_uint16 vlan) {
  auto const map = private_vlans_of(setting.transaction, setting.owner.switch_key);
  if (std::none_of(map.begin(), map.end(),
                   [&](VSPvlanMapEntry const &entry) { return entry.secondaryVID == vlan; })) {
    throw Refused(QEX_BAD_VLANID);
  }
}

void check_entry(VSPvlanMapEntry const &entry) {
  for (auto const vlan : {entry.primaryVID, entry.secondaryVID}) {
    if (vlan == 0) {
      throw Refused(QEX_BAD_VLANID);
    }
    check_vlan(vlan);
  }
  bool const known = entry.pvlanType == VSPORT_PVLAN_TYPE_PROMISC ||
                     entry.pvlanType == VSPORT_PVLAN_TYPE_ISOLATED ||
                     entry.pvlanType == VSPORT_PVLAN_TYPE_COMMUNITY;
  bool const promiscuous = entry.pvlanType == VSPORT_PVLAN_TYPE_PROMISC;
  if (!known || promiscuous != (entry.primaryVID == entry.secondaryVID)) {
    throw Refused(QEX_BAD_PARAM);
  }
}

}  // namespace

void check_vlan(qex_uint16 vlan) {
  if (vlan > kGreatestVlan) {
    throw Refused(QEX_BAD_VLANID);
  }
}

void check_vlan_policy(Setting const &setting) {
  auto const policy = record_at<VSPortVlanPolicy>(setting.value);
  auto const ranges = records_of<qex_NEBPortVIDRange>(setting.value.subspan(sizeof policy));
  bool const is_private = (policy.flags & VSPORT_VLAN_PVLAN_ENABLED) != 0;
  if (ranges.size() != policy.numRanges || (policy.flags & ~kVlanFlags) != 0 ||
      (is_private && !ranges.empty())) {
    throw Refused(QEX_BAD_PARAM);
  }
  check_vlan(policy.vlanID);
  check_ranges(ranges);
  if (is_private) {
    check_is_private(setting, policy.vlanID);
  }
}

void check_private_vlans(Setting const &setting) {
  std::set<qex_uint16> primaries;
  std::set<qex_uint16> secondaries;
  std::set<qex_uint16> with_isolated;
  auto const map = records_of<VSPvlanMapEntry>(setting.value);
  for (auto const &entry : map) {
    check_entry(entry);
    primaries.insert(entry.primaryVID);
    bool const isolated = entry.pvlanType == VSPORT_PVLAN_TYPE_ISOLATED;
    if (!secondaries.insert(entry.secondaryVID).second ||
        (isolated && !with_isolated.insert(entry.primaryVID).second)) {
      throw Refused(QEX_BAD_PARAM);
    }
  }
  if (std::any_of(map.begin(), map.end(), [&](VSPvlanMapEntry const &entry) {
        return entry.pvlanType != VSPORT_PVLAN_TYPE_PROMISC &&
               primaries.contains(entry.secondaryVID);
      })) {
    throw Refused(QEX_BAD_PARAM);
  }
}

Bytes vlan_policy_of(storage::Transaction &transaction, storage::Port const &port) {
  auto property = get_property(transaction, owner_of(port), VSPROP_PORT_VLAN);
  return property ? std::move(property->value) : Bytes(sizeof(VSPortVlanPolicy));
}

int priority_of(storage::Transaction &transaction, storage::Port const &port) {
  return read(transaction, owner_of(port), RecordProperty<int>{VSPROP_PORT_PRIORITY, kNoPriority});
}

void set_vlans(storage::Transaction &transaction, storage::Port const &port, VlanSpec const &spec) {
  if (spec.priority < kNoPriority || spec.priority > QEX_VLAN_PRIORITY_MAXIMUM ||
      spec.ranges.size() > std::numeric_limits<qex_uint16>::max()) {
    throw Refused(QEX_BAD_PARAM);
  }
  bool const has_priority = spec.priority != kNoPriority;
  unsigned const flags = flag_if(spec.guest_tagging, VSPORT_VLAN_GUEST_TAGGING) |
                         flag_if(spec.private_vlan, VSPORT_VLAN_PVLAN_ENABLED) |
                         flag_if(has_priority, VSPORT_VLAN_SET_PRIORITY);
  VSPortVlanPolicy policy{};
  policy.flags = static_cast<qex_uint16>(flags);
  policy.vlanID = spec.vlan;
  policy.numRanges = static_cast<qex_uint16>(spec.ranges.size());
  auto value = copied(bytes_of(policy));
  auto const tail = std::as_bytes(spec.ranges);
  value.insert(value.end(), tail.begin(), tail.end());

  auto const owner = owner_of(port);
  set_property(transaction, owner, VSPROP_PORT_VLAN, value);
  if (has_priority) {
    set_property(transaction, owner, VSPROP_PORT_PRIORITY, bytes_of(spec.priority));
  } else {
    reset_property(transaction, owner, VSPROP_PORT_PRIORITY);
  }
}

void clear_vlans(storage::Transaction &transaction, storage::Port const &port) {
  reset_property(transaction, owner_of(port), VSPROP_PORT_VLAN);
  reset_property(transaction, owner_of(port), VSPROP_PORT_PRIORITY);
}

Bytes vlan_info_of(storage::Transaction &transaction, storage::PropertyOwner const &owner) {
  auto const property = storage::find_property(transaction, owner, VSPROP_PORT_VLAN);
  qex_NEBPortVlanInfo info{};
  BytesView ranges;
  if (property) {
    auto const policy = record_at<VSPortVlanPolicy>(property->value);
    info.vlanID = policy.vlanID;
    info.numRanges = policy.numRanges;
    ranges = BytesView(property->value).subspan(sizeof policy);
  }
  auto value = copied(bytes_of(info));
  value.insert(value.end(), ranges.begin(), ranges.end());
  return value;
}

}  // namespace simhost
