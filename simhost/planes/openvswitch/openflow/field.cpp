// The table of fields: names, numbers and widths as ovs-fields(7) has them.
#include "planes/openvswitch/openflow/field.h"

#include <array>
#include <stdexcept>

namespace simhost::openflow {
namespace {

constexpr std::uint16_t kNxm0 = 0x0000;
constexpr std::uint16_t kNxm1 = 0x0001;
constexpr std::uint16_t kBasic = 0x8000;
constexpr std::uint16_t kExperimenter = kExperimenterClass;

constexpr auto kRegisters =
    static_cast<unsigned>(Field::reg15) - static_cast<unsigned>(Field::reg0) + 1;

// In the order of Field.
constexpr std::array<FieldInfo, kFields> kFieldTable{{
    {"tun_id",
     "tun_id",
     "NXM_NX_TUN_ID",
     {kBasic, 38},
     {kNxm1, 16},
     8,
     64,
     Form::hexadecimal,
     true},
    {"tun_src",
     "tun_src",
     "NXM_NX_TUN_IPV4_SRC",
     {kNxm1, 31},
     {kNxm1, 31},
     4,
     32,
     Form::ipv4,
     true},
    {"tun_dst",
     "tun_dst",
     "NXM_NX_TUN_IPV4_DST",
     {kNxm1, 32},
     {kNxm1, 32},
     4,
     32,
     Form::ipv4,
     true},
    {"tun_ipv6_dst",
     "tun_ipv6_dst",
     "NXM_NX_TUN_IPV6_DST",
     {kNxm1, 110},
     {kNxm1, 110},
     16,
     128,
     Form::ipv6,
     true},
    {"tun_erspan_idx",
     "tun_erspan_idx",
     "NXOXM_ET_ERSPAN_IDX",
     {kExperimenter, 11},
     {kExperimenter, 11},
     4,
     20,
     Form::hexadecimal,
     true},
    {"tun_erspan_ver",
     "tun_erspan_ver",
     "NXOXM_ET_ERSPAN_VER",
     {kExperimenter, 12},
     {kExperimenter, 12},
     1,
     4,
     Form::decimal,
     true},
    {"tun_erspan_dir",
     "tun_erspan_dir",
     "NXOXM_ET_ERSPAN_DIR",
     {kExperimenter, 13},
     {kExperimenter, 13},
     1,
     1,
     Form::decimal,
     true},
    {"tun_erspan_hwid",
     "tun_erspan_hwid",
     "NXOXM_ET_ERSPAN_HWID",
     {kExperimenter, 14},
     {kExperimenter, 14},
     1,
     6,
     Form::hexadecimal,
     true},
    {"metadata",
     "metadata",
     "OXM_OF_METADATA",
     {kBasic, 2},
     {kBasic, 2},
     8,
     64,
     Form::hexadecimal,
     true},
    {"in_port_oxm",
     "in_port",
     "OXM_OF_IN_PORT",
     {kBasic, 0},
     {kBasic, 0},
     4,
     32,
     Form::port,
     false},
    {"in_port", "in_port", "NXM_OF_IN_PORT", {kNxm0, 0}, {kNxm0, 0}, 2, 16, Form::port, false},
    {"pkt_mark",
     "pkt_mark",
     "NXM_NX_PKT_MARK",
     {kNxm1, 33},
     {kNxm1, 33},
     4,
     32,
     Form::hexadecimal,
     true},
    {"reg0", "reg0", "NXM_NX_REG0", {kNxm1, 0}, {kNxm1, 0}, 4, 32, Form::hexadecimal, true},
    {"reg1", "reg1", "NXM_NX_REG1", {kNxm1, 1}, {kNxm1, 1}, 4, 32, Form::hexadecimal, true},
    {"reg2", "reg2", "NXM_NX_REG2", {kNxm1, 2}, {kNxm1, 2}, 4, 32, Form::hexadecimal, true},
    {"reg3", "reg3", "NXM_NX_REG3", {kNxm1, 3}, {kNxm1, 3}, 4, 32, Form::hexadecimal, true},
    {"reg4", "reg4", "NXM_NX_REG4", {kNxm1, 4}, {kNxm1, 4}, 4, 32, Form::hexadecimal, true},
    {"reg5", "reg5", "NXM_NX_REG5", {kNxm1, 5}, {kNxm1, 5}, 4, 32, Form::hexadecimal, true},
    {"reg6", "reg6", "NXM_NX_REG6", {kNxm1, 6}, {kNxm1, 6}, 4, 32, Form::hexadecimal, true},
    {"reg7", "reg7", "NXM_NX_REG7", {kNxm1, 7}, {kNxm1, 7}, 4, 32, Form::hexadecimal, true},
    {"reg8", "reg8", "NXM_NX_REG8", {kNxm1, 8}, {kNxm1, 8}, 4, 32, Form::hexadecimal, true},
    {"reg9", "reg9", "NXM_NX_REG9", {kNxm1, 9}, {kNxm1, 9}, 4, 32, Form::hexadecimal, true},
    {"reg10", "reg10", "NXM_NX_REG10", {kNxm1, 10}, {kNxm1, 10}, 4, 32, Form::hexadecimal, true},
    {"reg11", "reg11", "NXM_NX_REG11", {kNxm1, 11}, {kNxm1, 11}, 4, 32, Form::hexadecimal, true},
    {"reg12", "reg12", "NXM_NX_REG12", {kNxm1, 12}, {kNxm1, 12}, 4, 32, Form::hexadecimal, true},
    {"reg13", "reg13", "NXM_NX_REG13", {kNxm1, 13}, {kNxm1, 13}, 4, 32, Form::hexadecimal, true},
    {"reg14", "reg14", "NXM_NX_REG14", {kNxm1, 14}, {kNxm1, 14}, 4, 32, Form::hexadecimal, true},
    {"reg15", "reg15", "NXM_NX_REG15", {kNxm1, 15}, {kNxm1, 15}, 4, 32, Form::hexadecimal, true},
    {"eth_src", "dl_src", "NXM_OF_ETH_SRC", {kBasic, 4}, {kNxm0, 2}, 6, 48, Form::ethernet, true},
    {"eth_dst", "dl_dst", "NXM_OF_ETH_DST", {kBasic, 3}, {kNxm0, 1}, 6, 48, Form::ethernet, true},
    {"eth_type",
     "dl_type",
     "NXM_OF_ETH_TYPE",
     {kBasic, 5},
     {kNxm0, 3},
     2,
     16,
     Form::hexadecimal,
     false},
    {"vlan_tci",
     "vlan_tci",
     "NXM_OF_VLAN_TCI",
     {kNxm0, 4},
     {kNxm0, 4},
     2,
     16,
     Form::hexadecimal,
     true},
    {"vlan_vid",
     "dl_vlan",
     "OXM_OF_VLAN_VID",
     {kBasic, 6},
     {kBasic, 6},
     2,
     12,
     Form::decimal,
     true},
    {"vlan_pcp",
     "dl_vlan_pcp",
     "OXM_OF_VLAN_PCP",
     {kBasic, 7},
     {kBasic, 7},
     1,
     3,
     Form::decimal,
     false},
    {"ip_src", "nw_src", "NXM_OF_IP_SRC", {kBasic, 11}, {kNxm0, 7}, 4, 32, Form::ipv4, true},
    {"ip_dst", "nw_dst", "NXM_OF_IP_DST", {kBasic, 12}, {kNxm0, 8}, 4, 32, Form::ipv4, true},
    {"ipv6_src",
     "ipv6_src",
     "NXM_NX_IPV6_SRC",
     {kBasic, 26},
     {kNxm1, 19},
     16,
     128,
     Form::ipv6,
     true},
    {"ipv6_dst",
     "ipv6_dst",
     "NXM_NX_IPV6_DST",
     {kBasic, 27},
     {kNxm1, 20},
     16,
     128,
     Form::ipv6,
     true},
    {"nw_proto",
     "nw_proto",
     "NXM_OF_IP_PROTO",
     {kBasic, 10},
     {kNxm0, 6},
     1,
     8,
     Form::decimal,
     false},
    {"arp_spa", "arp_spa", "NXM_OF_ARP_SPA", {kBasic, 22}, {kNxm0, 16}, 4, 32, Form::ipv4, true},
    {"arp_tpa", "arp_tpa", "NXM_OF_ARP_TPA", {kBasic, 23}, {kNxm0, 17}, 4, 32, Form::ipv4, true},
    {"arp_op", "arp_op", "NXM_OF_ARP_OP", {kBasic, 21}, {kNxm0, 15}, 2, 16, Form::decimal, false},
    {"arp_sha",
     "arp_sha",
     "NXM_NX_ARP_SHA",
     {kBasic, 24},
     {kNxm1, 17},
     6,
     48,
     Form::ethernet,
     true},
    {"arp_tha",
     "arp_tha",
     "NXM_NX_ARP_THA",
     {kBasic, 25},
     {kNxm1, 18},
     6,
     48,
     Form::ethernet,
     true},
    {"tcp_src", "tp_src", "NXM_OF_TCP_SRC", {kBasic, 13}, {kNxm0, 9}, 2, 16, Form::decimal, true},
    {"tcp_dst", "tp_dst", "NXM_OF_TCP_DST", {kBasic, 14}, {kNxm0, 10}, 2, 16, Form::decimal, true},
    {"udp_src", "tp_src", "NXM_OF_UDP_SRC", {kBasic, 15}, {kNxm0, 11}, 2, 16, Form::decimal, true},
    {"udp_dst", "tp_dst", "NXM_OF_UDP_DST", {kBasic, 16}, {kNxm0, 12}, 2, 16, Form::decimal, true},
    {"icmp_type",
     "icmp_type",
     "NXM_OF_ICMP_TYPE",
     {kBasic, 19},
     {kNxm0, 13},
     1,
     8,
     Form::decimal,
     false},
    {"icmp_code",
     "icmp_code",
     "NXM_OF_ICMP_CODE",
     {kBasic, 20},
     {kNxm0, 14},
     1,
     8,
     Form::decimal,
     false},
    {"icmpv6_type",
     "icmp_type",
     "NXM_NX_ICMPV6_TYPE",
     {kBasic, 29},
     {kNxm1, 21},
     1,
     8,
     Form::decimal,
     false},
    {"icmpv6_code",
     "icmp_code",
     "NXM_NX_ICMPV6_CODE",
     {kBasic, 30},
     {kNxm1, 22},
     1,
     8,
     Form::decimal,
     false},
    {"nd_target",
     "nd_target",
     "NXM_NX_ND_TARGET",
     {kBasic, 31},
     {kNxm1, 23},
     16,
     128,
     Form::ipv6,
     true},
}};

// Each class that our fields are of has 128 numbers.
constexpr std::array kClasses{kNxm0, kNxm1, kBasic, kExperimenter};
constexpr std::size_t kNumbers = 128;
using ByNumber = std::array<std::array<std::optional<Field>, kNumbers>, kClasses.size()>;

constexpr std::optional<std::size_t> class_index(std::uint16_t oxm_class) {
  for (std::size_t index = 0; index < kClasses.size(); ++index) {
    if (kClasses[index] == oxm_class) {
      return index;
    }
  }
  return std::nullopt;
}

constexpr ByNumber by_number() {
  ByNumber all{};
  for (std::size_t index = 0; index < kFields; ++index) {
    for (auto const id : {kFieldTable[index].oxm, kFieldTable[index].nxm}) {
      all[*class_index(id.oxm_class)][id.number] = static_cast<Field>(index);
    }
  }
  return all;
}

constexpr ByNumber kByNumber = by_number();

}  // namespace

FieldInfo const &info(Field field) {
  return kFieldTable.at(static_cast<std::size_t>(field));
}

std::optional<Field> find_field(FieldId id) {
  auto const index = class_index(id.oxm_class);
  return index && id.number < kNumbers ? kByNumber[*index][id.number] : std::nullopt;
}

Field reg(unsigned number) {
  if (number >= kRegisters) {
    throw std::invalid_argument("there are 16 registers");
  }
  return static_cast<Field>(static_cast<unsigned>(Field::reg0) + number);
}

Value settable_bits(Field field) {
  return ones(info(field).bits) | (field == Field::vlan_vid ? kVlanPresent : 0);
}

SubField whole(Field field) {
  return {field, 0, info(field).bits};
}

SubField part(Field field, unsigned first, unsigned last) {
  if (first > last || last >= info(field).bits) {
    throw std::invalid_argument(std::string(info(field).name) + " has no such bits");
  }
  return {field, static_cast<std::uint8_t>(first), static_cast<std::uint8_t>(last - first + 1)};
}

SubField bit(Field field, unsigned number) {
  return part(field, number, number);
}

}  // namespace simhost::openflow
