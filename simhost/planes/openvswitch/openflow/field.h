// The fields of frames and of their metadata that flows match and change.
#pragma once

#include <compare>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string_view>

#include "planes/openvswitch/openflow/value.h"

namespace simhost::openflow {

/// In an order in which each comes after those that it requires: ip_proto after eth_type, tcp_src
/// after ip_proto.
enum class Field : std::uint8_t {
  tun_id,
  tun_src,
  tun_dst,
  tun_ipv6_dst,
  tun_erspan_idx,
  tun_erspan_ver,
  tun_erspan_dir,
  tun_erspan_hwid,
  metadata,
  in_port,
  // The same as 16 bits: the one that can be written.
  nxm_in_port,
  pkt_mark,
  reg0,
  reg1,
  reg2,
  reg3,
  reg4,
  reg5,
  reg6,
  reg7,
  reg8,
  reg9,
  reg10,
  reg11,
  reg12,
  reg13,
  reg14,
  reg15,
  eth_src,
  eth_dst,
  eth_type,
  // The whole tag, of which bit 12 says that there is one. Not for a Match, which has the next two.
  vlan_tci,
  // 12 bits, and in a Match and in SetField a thirteenth, kVlanPresent.
  vlan_vid,
  vlan_pcp,
  ip_src,
  ip_dst,
  ipv6_src,
  ipv6_dst,
  ip_proto,
  arp_spa,
  arp_tpa,
  arp_op,
  arp_sha,
  arp_tha,
  tcp_src,
  tcp_dst,
  udp_src,
  udp_dst,
  icmp_type,
  icmp_code,
  icmpv6_type,
  icmpv6_code,
  nd_target,
};
inline constexpr std::size_t kFields = static_cast<std::size_t>(Field::nd_target) + 1;

inline constexpr Value kVlanPresent = 0x1000;

/// How the content of a field reads in text.
enum class Form : std::uint8_t { decimal, hexadecimal, port, ethernet, ipv4, ipv6 };

/// The number of a field on the wire.
struct FieldId {
  std::uint16_t oxm_class;
  std::uint8_t number;

  friend auto operator<=>(FieldId const &, FieldId const &) = default;
};
inline constexpr std::uint16_t kExperimenterClass = 0xffff;  // all of ours are of one experimenter

/// What there is to know of a field.
struct FieldInfo {
  std::string_view name;        // where it is set, learned or hashed: eth_dst
  std::string_view match_name;  // in a match: dl_dst
  std::string_view part_name;   // where a part of it is meant: NXM_OF_ETH_DST
  FieldId oxm;
  FieldId nxm;         // the older number, or the same
  std::uint8_t bytes;  // on the wire
  std::uint8_t bits;
  Form form;
  bool is_maskable;
};

FieldInfo const &info(Field field);
/// By either number.
std::optional<Field> find_field(FieldId id);
/// Register `number`, of 16.
Field reg(unsigned number);
/// All the bits that a match or a SetField may name: those of the field, and kVlanPresent.
Value settable_bits(Field field);

/// Some bits of a field, one after the other.
struct SubField {
  Field field;
  std::uint8_t first;  // the lowest, from 0
  std::uint8_t bits;

  friend auto operator<=>(SubField const &, SubField const &) = default;
};

/// A field as a whole.
SubField whole(Field field);
/// The bits from `first` to `last`; throws std::invalid_argument for those that the field has not.
SubField part(Field field, unsigned first, unsigned last);
/// One bit.
SubField bit(Field field, unsigned number);

}  // namespace simhost::openflow
