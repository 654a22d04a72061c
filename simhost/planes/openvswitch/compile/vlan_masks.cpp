// Halves of halves, until one is full or empty.
#include "planes/openvswitch/compile/vlan_masks.h"

#include <algorithm>

#include "base/vlan.h"

namespace simhost::openvswitch {
namespace {

constexpr unsigned kNumbers = 4096;

struct Found {
  bool any = false;
  bool all = true;
};

// Of a set, as far as somebody asks for its members.
class Masks {
 public:
  Masks(Vlans const &vlans, unsigned first_asked_for) : vlans_(vlans), first_(first_asked_for) {
    collect(0, kNumbers);
  }

  std::vector<VlanMask> found;

 private:
  [[nodiscard]] Found look_at(unsigned first, unsigned count) const {
    Found found;
    for (auto number = std::max(first, first_);
         number < std::min<unsigned>(first + count, kGreatestVlan + 1); ++number) {
      found.any = found.any || vlans_[number];
      found.all = found.all && vlans_[number];
    }
    return found;
  }

  // `count` is a power of 2.
  void collect(unsigned first, unsigned count) {
    auto const inside = look_at(first, count);
    if (!inside.any) {
      return;
    }
    if (inside.all) {
      found.push_back({.vlan = static_cast<std::uint16_t>(first),
                       .mask = static_cast<std::uint16_t>(kNumbers - count)});
      return;
    }
    collect(first, count / 2);
    collect(first + count / 2, count / 2);
  }

  Vlans const &vlans_;
  unsigned const first_;
};

}  // namespace

std::vector<VlanMask> masks_of(Vlans const &vlans) {
  return Masks(vlans, 1).found;
}

std::vector<VlanMask> masks_with_0_of(Vlans const &vlans) {
  return Masks(vlans, 0).found;
}

}  // namespace simhost::openvswitch
