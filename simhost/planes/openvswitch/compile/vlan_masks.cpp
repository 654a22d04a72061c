// Halves of halves, until one is full or empty.
#include "planes/openvswitch/compile/vlan_masks.h"

#include "base/vlan.h"

namespace simhost::openvswitch {
namespace {

constexpr unsigned kNumbers = 4096;

bool is_vlan(unsigned number) {
  return number != 0 && number <= kGreatestVlan;
}

struct Found {
  bool any = false;
  bool all = true;
};

Found look_at(Vlans const &vlans, unsigned first, unsigned count) {
  Found found;
  for (auto number = first; number < first + count; ++number) {
    if (is_vlan(number)) {
      found.any = found.any || vlans[number];
      found.all = found.all && vlans[number];
    }
  }
  return found;
}

// `count` is a power of 2.
void collect(Vlans const &vlans, unsigned first, unsigned count, std::vector<VlanMask> &masks) {
  auto const found = look_at(vlans, first, count);
  if (!found.any) {
    return;
  }
  if (found.all) {
    masks.push_back({.vlan = static_cast<std::uint16_t>(first),
                     .mask = static_cast<std::uint16_t>(kNumbers - count)});
    return;
  }
  collect(vlans, first, count / 2, masks);
  collect(vlans, first + count / 2, count / 2, masks);
}

}  // namespace

std::vector<VlanMask> masks_of(Vlans const &vlans) {
  std::vector<VlanMask> masks;
  collect(vlans, 0, kNumbers, masks);
  return masks;
}

}  // namespace simhost::openvswitch
