// The rules of VLANs, and the two properties' worth of bytes that follow from those of a port.
#include "model/vlans/properties.h"

#include <algorithm>
#include <set>
#include <span>

#include "model/properties/properties.h"
#include "storage/store.h"

namespace simhost::vlans {
namespace {

constexpr qex_uint16 kFlags =
    VSPORT_VLAN_GUEST_TAGGING | VSPORT_VLAN_PVLAN_ENABLED | VSPORT_VLAN_SET_PRIORITY;

unsigned flag_if(bool set, unsigned flag) {
  return set ? flag : 0;
}

Bytes with_ranges(BytesView head, std::vector<qex_NEBPortVIDRange> const &ranges) {
  auto value = copied(head);
  auto const tail = std::as_bytes(std::span(ranges));
  value.insert(value.end(), tail.begin(), tail.end());
  return value;
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

void check_entry(VSPvlanMapEntry const &entry) {
  for (auto const vlan : {entry.primaryVID, entry.secondaryVID}) {
    if (vlan < kLeast) {
      throw Refused(QEX_BAD_VLANID);
    }
    check_vlan(vlan);
  }
  bool const promiscuous = entry.pvlanType == VSPORT_PVLAN_TYPE_PROMISC;
  if (!form::is_among(entry.pvlanType, kTypes) ||
      promiscuous != (entry.primaryVID == entry.secondaryVID)) {
    throw Refused(QEX_BAD_PARAM);
  }
}

}  // namespace

void check_vlan(qex_uint16 vlan) {
  if (vlan > kGreatest) {
    throw Refused(QEX_BAD_VLANID);
  }
}

Bytes PortVlans::to_bytes() const {
  unsigned const flags = flag_if(guest_tagging, VSPORT_VLAN_GUEST_TAGGING) |
                         flag_if(private_vlan, VSPORT_VLAN_PVLAN_ENABLED) |
                         flag_if(priority_if_any().has_value(), VSPORT_VLAN_SET_PRIORITY);
  VSPortVlanPolicy policy{};
  policy.flags = static_cast<qex_uint16>(flags);
  policy.vlanID = vlan;
  policy.numRanges = static_cast<qex_uint16>(ranges.size());
  return with_ranges(bytes_of(policy), ranges);
}

PortVlans PortVlans::from(BytesView bytes) {
  auto const policy = record_at<VSPortVlanPolicy>(bytes);
  auto ranges = records_of<qex_NEBPortVIDRange>(bytes.subspan(sizeof policy));
  if (ranges.size() != policy.numRanges || (policy.flags & ~kFlags) != 0) {
    refuse(QEX_BAD_PARAM);
  }
  return {.vlan = policy.vlanID,
          .guest_tagging = (policy.flags & VSPORT_VLAN_GUEST_TAGGING) != 0,
          .private_vlan = (policy.flags & VSPORT_VLAN_PVLAN_ENABLED) != 0,
          .ranges = std::move(ranges)};
}

void check_port_vlans(PortVlans const &port) {
  if (port.private_vlan && !port.ranges.empty()) {
    throw Refused(QEX_BAD_PARAM);
  }
  check_vlan(port.vlan);
  check_ranges(port.ranges);
}

void check_is_in_map(Setting const &setting) {
  auto const port = PortVlans::from(setting.value);
  if (!port.private_vlan) {
    return;
  }
  auto const map = effective(setting.transaction, private_vlans,
                             storage::PropertyOwner::global(setting.owner.switch_key));
  if (std::none_of(map.begin(), map.end(),
                   [&](VSPvlanMapEntry const &entry) { return entry.secondaryVID == port.vlan; })) {
    throw Refused(QEX_BAD_VLANID);
  }
}

void check_private_vlans(PrivateVlans const &map) {
  std::set<qex_uint16> primaries;
  std::set<qex_uint16> secondaries;
  std::set<qex_uint16> with_isolated;
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

Bytes read_vlan_info(storage::Transaction &transaction, storage::PropertyOwner const &owner) {
  auto const port = effective(transaction, of_port, owner);
  qex_NEBPortVlanInfo info{};
  info.vlanID = port.vlan;
  info.numRanges = static_cast<qex_uint16>(port.ranges.size());
  return with_ranges(bytes_of(info), port.ranges);
}

}  // namespace simhost::vlans
