#include "samples.h"

#include <cstddef>

namespace simhost::openflow {
namespace {

constexpr EthernetAddress kAddress{2, 0, 0, 0, 0, 1};

Match ip() {
  return Match().with(Field::eth_type, 0x0800);
}
Match ipv6() {
  return Match().with(Field::eth_type, 0x86dd);
}
Match arp() {
  return Match().with(Field::eth_type, 0x0806);
}
Match protocol(Match match, std::uint8_t number) {
  return match.with(Field::ip_proto, number);
}

Match all_registers() {
  Match match;
  for (unsigned number = 0; number < 16; ++number) {
    match.with(reg(number), number, 0xff >> (number / 2));
  }
  return match;
}

std::vector<Match> sample_matches() {
  Value const multicast = to_value(EthernetAddress{1, 0, 0, 0, 0, 0});
  Value const network = to_value(Ipv4Address{10, 1, 0, 0});
  Value const host = to_value(Ipv6Address{0xfe, 0x80, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 1});
  return {
      Match(),
      Match().with(Field::in_port, 1),
      Match().with(Field::in_port, kLocal),
      all_registers(),
      Match().with(reg(0), 5).with(reg(1), 0).with(reg(15), 0xffffffff),
      Match().with(Field::metadata, 5),
      Match().with(Field::metadata, 5, 0xff),
      Match().with(Field::tun_id, 5, 0xff).with(Field::tun_src, network),
      Match().with(Field::tun_dst, network, ones(16) << 16U),
      Match().with(Field::eth_dst, multicast, multicast),
      Match().with(Field::eth_src, to_value(kAddress)).with(Field::eth_dst, to_value(kAddress)),
      Match().with(Field::eth_type, 0x88cc),
      Match().untagged(),
      Match().tagged(),
      Match().vlan(0),
      Match().vlan(5),
      Match().vlan(4095),
      Match().vlan(5).with(Field::vlan_pcp, 3),
      Match().tagged().with(Field::vlan_pcp, 3),
      Match().vlan(0x10, 0xff0),
      Match().vlan(0x10, 0xff0).with(Field::vlan_pcp, 7),
      Match().with(Field::vlan_vid, 0, kVlanPresent),
      ip().with(Field::ip_src, network, ones(16) << 16U).with(Field::ip_dst, network),
      ip().with(Field::ip_dst, network, 0xffff00ff),
      ipv6().with(Field::ipv6_src, host).with(Field::ipv6_dst, host, ones(10) << 118U),
      protocol(ip(), 2),
      protocol(ip(), 1).with(Field::icmp_type, 8).with(Field::icmp_code, 0),
      protocol(ip(), 6).with(Field::tcp_src, 1).with(Field::tcp_dst, 0x50, 0xfff0),
      protocol(ip(), 17).with(Field::udp_src, 67).with(Field::udp_dst, 68),
      protocol(ip(), 132),
      protocol(ipv6(), 0),
      protocol(ipv6(), 6).with(Field::tcp_dst, 80),
      protocol(ipv6(), 17).with(Field::udp_dst, 53),
      protocol(ipv6(), 58).with(Field::icmpv6_type, 143).with(Field::icmpv6_code, 0),
      protocol(ipv6(), 58)
          .with(Field::icmpv6_type, 135)
          .with(Field::icmpv6_code, 0)
          .with(Field::nd_target, host),
      arp()
          .with(Field::arp_op, 1)
          .with(Field::arp_spa, network, ones(24) << 8U)
          .with(Field::arp_tpa, network)
          .with(Field::arp_sha, to_value(kAddress))
          .with(Field::arp_tha, to_value(kAddress)),
      Match().with(Field::eth_type, 0x8035).with(Field::arp_op, 3),
      Match()
          .with(Field::in_port, 2)
          .with(reg(2), 7)
          .with(Field::metadata, 1)
          .with(Field::eth_type, 0x0806)
          .with(Field::eth_src, to_value(kAddress))
          .with(Field::eth_dst, multicast, multicast)
          .vlan(9),
  };
}

Learn learn_address() {
  Learn learn{};
  learn.table = 40;
  learn.hard_timeout = 300;
  learn.priority = 50;
  learn.cookie = 0x10001;
  learn.limit = 4096;
  learn.result = bit(reg(9), 0);
  learn.specs = {LearnedMatch{part(reg(8), 0, 11), part(reg(8), 0, 11)},
                 LearnedMatch{whole(Field::eth_dst), whole(Field::eth_src)},
                 LearnedLoad{part(reg(6), 0, 15), Value{1}}};
  return learn;
}

Learn learn_much() {
  Learn learn{};
  learn.table = 41;
  learn.idle_timeout = 10;
  learn.tells_removal = true;
  learn.deletes_learned = true;
  learn.specs = {LearnedMatch{whole(reg(0)), Value{0xdeadbeef}},
                 LearnedMatch{part(reg(1), 4, 4), Value{1}},
                 LearnedMatch{part(Field::vlan_tci, 0, 11), part(Field::vlan_tci, 0, 11)},
                 LearnedMatch{part(reg(2), 0, 11), part(Field::vlan_tci, 0, 11)},
                 LearnedMatch{whole(Field::in_port), Value{2}},
                 LearnedMatch{whole(Field::eth_type), Value{0x0806}},
                 LearnedMatch{whole(Field::eth_src), to_value(kAddress)},
                 LearnedLoad{whole(Field::eth_dst), to_value(kAddress)},
                 LearnedLoad{part(reg(6), 16, 31), part(reg(0), 0, 15)},
                 LearnedLoad{whole(reg(3)), Value{0}},
                 LearnedOutput{whole(reg(0))},
                 LearnedOutput{part(reg(7), 16, 31)}};
  return learn;
}

struct Sample {
  Actions actions;
  Match match{};
};

std::vector<Sample> sample_actions() {
  return {
      {{Output{2}, Output{kLocal}, Output{kInPort}, Output{kNormal}, Output{kFlood}}},
      {{Output{0xfeff}, Output{kAllPorts}}},
      {{OutputFrom{whole(reg(0))}, OutputFrom{part(reg(1), 0, 15)},
        OutputFrom{part(reg(2), 16, 31)}}},
      {{OutputTruncated{2, 14}, OutputTruncated{kLocal, 65535}, OutputTruncated{kInPort, 100}}},
      {{ToController{}, ToController{128}, ToController{0}}},
      {{ToGroup{1}}},
      {{Resubmit{1}, Resubmit{2, 3}, Resubmit{254, 0xfffe}}},
      {{PushVlan{}, set(Field::vlan_vid, kVlanPresent | 6), set(Field::vlan_pcp, 4), Output{1}}},
      {{PopVlan{}, PushVlan{0x88a8}}, Match().vlan(5)},
      {{load(part(Field::vlan_tci, 0, 11), 5), set(Field::vlan_tci, 0x3005)}, Match().vlan(5)},
      {{set(reg(0), 0), set(reg(15), 0xffffffff), load(part(reg(6), 0, 15), 3),
        load(part(reg(6), 8, 15), 1), load(bit(reg(1), 31), 0)}},
      {{set(Field::metadata, 5), load(part(Field::metadata, 32, 63), 5), set(Field::tun_id, 7),
        load(part(Field::tun_id, 0, 23), 5), set(Field::nxm_in_port, 3),
        set(Field::nxm_in_port, 0xfffe)}},
      {{set(Field::tun_dst, 0x01020304), set(Field::tun_src, 0x01020304),
        set(Field::tun_erspan_ver, 2), set(Field::tun_erspan_idx, 0x12345),
        set(Field::tun_erspan_dir, 1), set(Field::tun_erspan_hwid, 63),
        load(part(Field::tun_erspan_idx, 0, 7), 5)}},
      {{set(Field::eth_src, to_value(kAddress)), load(bit(Field::eth_dst, 40), 1)}},
      {{set(Field::ip_src, 0x0a000001), load(part(Field::ip_dst, 24, 31), 10)}, ip()},
      {{set(Field::ipv6_dst, 1), load(part(Field::ipv6_src, 64, 127), 5)}, ipv6()},
      {{set(Field::udp_src, 5), load(part(Field::udp_dst, 0, 7), 5)}, protocol(ip(), 17)},
      {{set(Field::arp_op, 2), set(Field::arp_spa, 0x0a000001),
        set(Field::arp_sha, to_value(kAddress)), Move{whole(Field::arp_spa), whole(Field::arp_tpa)},
        Move{whole(Field::arp_sha), whole(Field::arp_tha)},
        Move{whole(Field::eth_src), whole(Field::eth_dst)}},
       arp()},
      {{Move{part(Field::vlan_tci, 0, 11), part(reg(2), 0, 11)},
        Move{part(Field::vlan_tci, 13, 15), part(reg(5), 0, 2)}}},
      {{Move{whole(reg(2)), part(Field::metadata, 32, 63)},
        Move{part(Field::metadata, 0, 31), part(Field::tun_id, 32, 63)},
        Move{whole(Field::in_port), whole(reg(0))},
        Move{whole(Field::nxm_in_port), part(reg(0), 0, 15)}}},
      {{Push{whole(Field::eth_dst)}, Push{part(reg(1), 4, 8)}, Pop{bit(reg(2), 31)},
        Pop{whole(Field::eth_dst)}}},
      {{PushVlan{}, Move{part(reg(2), 0, 11), whole(Field::vlan_vid)},
        Move{part(reg(5), 0, 2), whole(Field::vlan_pcp)}}},
      {{learn_address(), Resubmit{4}}},
      {{learn_much()}},
      {{Learn{}}},
      {{Clone{{load(part(reg(6), 0, 15), 3), Resubmit{9}}}, Clone{{Clone{{Output{1}}}, Output{2}}},
        Clone{}}},
      {{CheckPacketLarger{1500, bit(reg(0), 3)},
        CheckPacketLarger{65535, bit(Field::metadata, 63)}}},
      {{Note{{}}, Note{{0, 1, 2}}, Note{{1, 2, 3, 4, 5, 6, 7, 8}}}},
  };
}

}  // namespace

std::vector<Flow> sample_flows() {
  std::vector<Flow> flows;
  std::uint16_t priority = 1;
  for (auto const &match : sample_matches()) {
    flows.push_back({0, priority++, match});
  }
  std::uint8_t table = 60;
  for (auto const &[actions, match] : sample_actions()) {
    Flow flow;
    flow.table = table++;
    flow.match = match;
    flow.actions = actions;
    flows.push_back(flow);
  }
  flows.push_back({50, 0, {}, 0xfedcba9876543210, 5, 60000, true, {}});
  flows.push_back({50, 65535, {}, 1, 0, 0, false, {}});
  return flows;
}

std::vector<Group> sample_groups() {
  auto const all = [](Field field) { return std::pair(field, settable_bits(field)); };
  return {
      {1,
       GroupType::all,
       {},
       {{0, 1, kAnyPort, kAnyGroup, {Output{1}}},
        {7, 1, kAnyPort, kAnyGroup, {Resubmit{4}, Output{2}}}}},
      {2, GroupType::indirect, {}, {{0, 1, kAnyPort, kAnyGroup, {ToGroup{1}}}}},
      {3,
       GroupType::fast_failover,
       {},
       {{0, 1, 1, kAnyGroup, {set(reg(11), 1), Resubmit{12}}}, {1, 1, kAnyPort, 1, {}}}},
      {4,
       GroupType::select,
       {},
       {{0, 0, kAnyPort, kAnyGroup, {Output{1}}}, {1, 100, 2, kAnyGroup, {Output{2}}}}},
      {5,
       GroupType::select,
       {"hash", 77, {all(Field::eth_src)}},
       {{0, 1, 1, kAnyGroup, {Output{1}}}}},
      {6,
       GroupType::select,
       {"hash",
        0,
        {all(Field::ip_src),
         all(Field::ip_dst),
         all(Field::vlan_vid),
         {Field::tcp_src, 0xff},
         {Field::eth_dst, ones(24)}}},
       {}},
      {7, GroupType::select, {"dp_hash"}, {}},
      {0xffffff00, GroupType::all, {}, {}},
  };
}

}  // namespace simhost::openflow
