// Halves of halves, until one is full or empty.
#include "planes/openvswitch/compile/vlan_masks.h"

#include <algorithm>
#include <array>

#include "base/vlan.h"

namespace simhost::openvswitch {
namespace {

constexpr unsigned kNumbers = 4096;

// Of a set, as far as somebody asks for its members.
class Masks {
 public:
  Masks(Vlans const &vlans, unsigned first_asked_for) : first_(first_asked_for) {
    for (auto number = first_; number <= kGreatestVlan; ++number) {
      members_below_[number + 1] = members_below_[number] + (vlans[number] ? 1 : 0);
    }
    collect(0, kNumbers);
  }

  std::vector<VlanMask> found;

 private:
  // `count` is a power of 2.
  void collect(unsigned first, unsigned count) {
    auto const from = std::max(first, first_);
    auto const to = std::min<unsigned>(first + count, kGreatestVlan + 1);
    auto const members = members_below_[to] - members_below_[from];
    if (members == 0) {
      return;
    }
    if (members == to - from) {
      found.push_back({.vlan = static_cast<std::uint16_t>(first),
                       .mask = static_cast<std::uint16_t>(kNumbers - count)});
      return;
    }
    collect(first, count / 2);
    collect(first + count / 2, count / 2);
  }

  unsigned const first_;
  std::array<unsigned, kNumbers> members_below_{};
};

}  // namespace

std::vector<VlanMask> masks_of(Vlans const &vlans) {
  return Masks(vlans, 1).found;
}

std::vector<VlanMask> masks_with_0_of(Vlans const &vlans) {
  return Masks(vlans, 0).found;
}

}  // namespace simhost::openvswitch
