// Which frames a flow is for.
#pragma once

#include <cstdint>
#include <utility>
#include <vector>

#include "planes/openvswitch/openflow/field.h"

namespace simhost::openflow {

/// What some bits of a field are.
struct Masked {
  Value value;  // zero wherever the mask is
  Value mask;   // the bits that count

  friend auto operator<=>(Masked const &, Masked const &) = default;
};

/// What some fields are: as a map, but in one piece of memory, for a switch has tens of thousands
/// of them, which are made, sorted and compared at each change.
class MaskedFields {
 public:
  using value_type = std::pair<Field, Masked>;
  using const_iterator = std::vector<value_type>::const_iterator;

  /// In the order of the fields.
  [[nodiscard]] const_iterator begin() const { return all_.begin(); }
  [[nodiscard]] const_iterator end() const { return all_.end(); }
  [[nodiscard]] const_iterator find(Field field) const;

  void put(Field field, Masked const &content);
  void erase(Field field);

  friend auto operator<=>(MaskedFields const &, MaskedFields const &) = default;

 private:
  std::vector<value_type> all_;
};

/// The frames whose fields have these contents; an empty one is for all. The switch refuses a field
/// whose layer no other field of the match asks for: arp_op without the eth_type of ARP.
class Match {
 public:
  /// Another field; once named it is replaced. Throws std::invalid_argument for bits that the field
  /// has not, and for a part of a field that only matches as a whole.
  Match &with(Field field, Value value);
  /// Likewise, of which only the bits of the mask count; none of them is no condition.
  Match &with(Field field, Value value, Value mask);

  /// A tag with this VLAN, 0 to 4095, whatever its priority.
  Match &vlan(std::uint16_t vid) { return with(Field::vlan_vid, kVlanPresent | vid); }
  /// A tag whose VLAN has these bits.
  Match &vlan(std::uint16_t vid, std::uint16_t mask) {
    return with(Field::vlan_vid, kVlanPresent | vid, kVlanPresent | mask);
  }
  /// Any tag.
  Match &tagged() { return vlan(0, 0); }
  /// No tag.
  Match &untagged() { return with(Field::vlan_vid, 0); }

  [[nodiscard]] MaskedFields const &fields() const { return fields_; }

  friend auto operator<=>(Match const &, Match const &) = default;

 private:
  MaskedFields fields_;
};

}  // namespace simhost::openflow
