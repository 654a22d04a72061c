// Flows and groups read as ovs-ofctl prints them.
#include "planes/openvswitch/openflow/text.h"

#include <gtest/gtest.h>

#include <stdexcept>

namespace simhost::openflow {
namespace {

constexpr EthernetAddress kAddress{2, 0, 0, 0, 0, 1};
constexpr EthernetAddress kGroupBit{1, 0, 0, 0, 0, 0};

std::string text_of(Match const &match) {
  return to_text(match);
}

std::string text_of(Action const &action) {
  return to_text(Actions{action});
}

TEST(MatchText, NamesNothingForAllFrames) {
  EXPECT_EQ(text_of(Match()), "");
}

TEST(MatchText, PutsRegistersBeforePortAndAddresses) {
  EXPECT_EQ(text_of(Match()
                        .with(Field::eth_dst, to_value(kGroupBit), to_value(kGroupBit))
                        .with(Field::in_port, 2)
                        .with(Field::metadata, 5, 7)
                        .with(Field::tun_id, 4)
                        .with(reg(10), 10)
                        .with(reg(1), 0, 1)),
            "reg1=0/0x1,reg10=0xa,tun_id=0x4,metadata=0x5/0x7,in_port=2,"
            "dl_dst=01:00:00:00:00:00/01:00:00:00:00:00");
}

TEST(MatchText, HasTagsInTheFormThatSaysMost) {
  EXPECT_EQ(text_of(Match().untagged()), "vlan_tci=0x0000/0x1fff");
  EXPECT_EQ(text_of(Match().tagged()), "vlan_tci=0x1000/0x1000");
  EXPECT_EQ(text_of(Match().vlan(5)), "dl_vlan=5");
  EXPECT_EQ(text_of(Match().vlan(0)), "dl_vlan=0");
  EXPECT_EQ(text_of(Match().vlan(5).with(Field::vlan_pcp, 3)), "dl_vlan=5,dl_vlan_pcp=3");
  EXPECT_EQ(text_of(Match().tagged().with(Field::vlan_pcp, 3)), "dl_vlan_pcp=3");
  EXPECT_EQ(text_of(Match().vlan(0x10, 0xff0)), "vlan_tci=0x1010/0x1ff0");
  EXPECT_EQ(text_of(Match().vlan(0x10, 0xff0).with(Field::vlan_pcp, 3)), "vlan_tci=0x7010/0xfff0");
  EXPECT_EQ(text_of(Match().with(Field::vlan_vid, 0, kVlanPresent)), "vlan_tci=0x0000/0x1000");
}

TEST(MatchText, CallsProtocolsByName) {
  auto const ip = Match().with(Field::eth_type, 0x800);
  auto const ipv6 = Match().with(Field::eth_type, 0x86dd);
  EXPECT_EQ(text_of(ip), "ip");
  EXPECT_EQ(text_of(Match(ip).with(Field::ip_proto, 2)), "ip,nw_proto=2");
  EXPECT_EQ(text_of(Match(ip).with(Field::ip_proto, 17).with(Field::udp_dst, 67)), "udp,tp_dst=67");
  EXPECT_EQ(text_of(Match(ipv6).with(Field::ip_proto, 58).with(Field::icmpv6_type, 143)),
            "icmp6,icmp_type=143");
  EXPECT_EQ(text_of(Match(ipv6).with(Field::ip_proto, 1)), "ipv6,nw_proto=1");
  EXPECT_EQ(text_of(Match(ipv6).with(Field::ip_proto, 6).with(Field::tcp_dst, 0x44, 0xfffc)),
            "tcp6,tp_dst=0x44/0xfffc");
  EXPECT_EQ(text_of(Match().with(Field::eth_type, 0x88cc)), "dl_type=0x88cc");
  EXPECT_EQ(text_of(Match().with(Field::eth_type, 0x05ff)), "dl_type=0x05ff");
}

TEST(MatchText, ShortensMasksOfAddressesToLengths) {
  auto const ip = Match().with(Field::eth_type, 0x800);
  Value const ten = to_value(Ipv4Address{10, 0, 0, 0});
  EXPECT_EQ(text_of(Match(ip).with(Field::ip_src, ten, to_value(Ipv4Address{255, 0, 0, 0}))),
            "ip,nw_src=10.0.0.0/8");
  EXPECT_EQ(text_of(Match(ip).with(Field::ip_src, ten, to_value(Ipv4Address{255, 0, 255, 0}))),
            "ip,nw_src=10.0.0.0/255.0.255.0");
  EXPECT_EQ(text_of(Match()
                        .with(Field::eth_type, 0x86dd)
                        .with(Field::ipv6_dst, Value{0xff02} << 112U, Value{0xffff} << 112U)),
            "ipv6,ipv6_dst=ff02::/16");
}

TEST(MatchText, HasAddressResolution) {
  EXPECT_EQ(text_of(Match()
                        .with(Field::eth_type, 0x806)
                        .with(Field::arp_op, 1)
                        .with(Field::arp_spa, to_value(Ipv4Address{1, 2, 3, 4}))
                        .with(Field::arp_sha, to_value(kAddress))),
            "arp,arp_spa=1.2.3.4,arp_op=1,arp_sha=02:00:00:00:00:01");
}

TEST(Match, ForgetsBitsThatDoNotCount) {
  EXPECT_EQ(Match().with(reg(1), 0xff, 0x0f), Match().with(reg(1), 0x0f, 0x0f));
  EXPECT_EQ(Match().with(reg(1), 5, 0), Match());
}

TEST(Match, RefusesWhatItsFieldsCannotHold) {
  EXPECT_THROW(Match().with(Field::vlan_pcp, 8), std::invalid_argument);
  EXPECT_THROW(Match().with(Field::vlan_pcp, 1, 1), std::invalid_argument);
  EXPECT_THROW(Match().with(reg(0), Value{1} << 32U), std::invalid_argument);
  EXPECT_THROW(reg(16), std::invalid_argument);
  EXPECT_THROW(part(reg(0), 5, 32), std::invalid_argument);
  EXPECT_THROW(load(part(reg(0), 0, 3), 16), std::invalid_argument);
  EXPECT_THROW(set(Field::vlan_pcp, 8), std::invalid_argument);
}

TEST(ActionText, HasEachKind) {
  EXPECT_EQ(to_text(Actions()), "drop");
  EXPECT_EQ(text_of(Output{7}), "output:7");
  EXPECT_EQ(text_of(Output{kInPort}), "IN_PORT");
  EXPECT_EQ(text_of(Output{kLocal}), "LOCAL");
  EXPECT_EQ(text_of(ToController{128}), "CONTROLLER:128");
  EXPECT_EQ(text_of(OutputFrom{whole(reg(0))}), "output:NXM_NX_REG0[]");
  EXPECT_EQ(text_of(OutputTruncated{3, 100}), "output(port=3,max_len=100)");
  EXPECT_EQ(text_of(ToGroup{50}), "group:50");
  EXPECT_EQ(text_of(ToMeter{5}), "meter:5");
  EXPECT_EQ(text_of(Resubmit{1}), "resubmit(,1)");
  EXPECT_EQ(text_of(Resubmit{1, 3}), "resubmit(3,1)");
  EXPECT_EQ(text_of(PushVlan{}), "push_vlan:0x8100");
  EXPECT_EQ(text_of(PopVlan{}), "pop_vlan");
  EXPECT_EQ(text_of(Push{whole(Field::eth_dst)}), "push:NXM_OF_ETH_DST[]");
  EXPECT_EQ(text_of(Pop{part(reg(1), 4, 8)}), "pop:NXM_NX_REG1[4..8]");
  EXPECT_EQ(text_of(CheckPacketLarger{1500, bit(reg(0), 3)}),
            "check_pkt_larger(1500)->NXM_NX_REG0[3]");
  EXPECT_EQ(text_of(Note{{0x00, 0x11}}), "note:00.11.00.00.00.00");
  EXPECT_EQ(text_of(Note{{1, 2, 3, 4, 5, 6, 7}}), "note:01.02.03.04.05.06.07.00.00.00.00.00.00.00");
  EXPECT_EQ(text_of(Clone{{load(part(reg(6), 0, 15), 3), Resubmit{9}}}),
            "clone(set_field:0x3/0xffff->reg6,resubmit(,9))");
  EXPECT_EQ(text_of(Clone{}), "clone(drop)");
}

TEST(ActionText, SetsFieldsInTheirForms) {
  EXPECT_EQ(text_of(set(reg(0), 0)), "set_field:0->reg0");
  EXPECT_EQ(text_of(load(part(reg(5), 0, 2), 7)), "set_field:0x7/0x7->reg5");
  EXPECT_EQ(text_of(load(part(reg(6), 8, 15), 1)), "set_field:0x100/0xff00->reg6");
  EXPECT_EQ(text_of(set(Field::vlan_vid, kVlanPresent | 6)), "set_field:4102->vlan_vid");
  EXPECT_EQ(text_of(set(Field::vlan_pcp, 4)), "set_field:4->vlan_pcp");
  EXPECT_EQ(text_of(load(part(Field::vlan_tci, 0, 11), 5)), "set_field:0x5/0xfff->vlan_tci");
  EXPECT_EQ(text_of(set(Field::eth_src, to_value(kAddress))),
            "set_field:02:00:00:00:00:01->eth_src");
  EXPECT_EQ(text_of(load(bit(Field::eth_src, 40), 1)),
            "set_field:01:00:00:00:00:00/01:00:00:00:00:00->eth_src");
  EXPECT_EQ(text_of(load(part(Field::udp_dst, 0, 7), 5)), "set_field:5/0xff->udp_dst");
  EXPECT_EQ(text_of(load(part(Field::arp_tpa, 24, 31), 1)), "set_field:1.0.0.0/8->arp_tpa");
  EXPECT_EQ(text_of(SetField{Field::ipv6_dst, 0, 0}), "set_field:::/0->ipv6_dst");
}

TEST(ActionText, MovesBetweenParts) {
  EXPECT_EQ(text_of(Move{part(Field::vlan_tci, 0, 11), part(reg(2), 0, 11)}),
            "move:NXM_OF_VLAN_TCI[0..11]->NXM_NX_REG2[0..11]");
  EXPECT_EQ(text_of(Move{part(reg(2), 0, 11), whole(Field::vlan_vid)}),
            "move:NXM_NX_REG2[0..11]->OXM_OF_VLAN_VID[]");
}

TEST(ActionText, LearnsWithWhatIsNotUsual) {
  Learn usual{};
  usual.table = 1;
  EXPECT_EQ(text_of(usual), "learn(table=1)");
  EXPECT_EQ(
      text_of(Learn{
          6,
          50,
          0x10001,
          10,
          300,
          true,
          true,
          4096,
          bit(reg(9), 0),
          {LearnedMatch{part(reg(8), 0, 11), part(reg(8), 0, 11)},
           LearnedMatch{part(reg(7), 0, 3), Value{5}},
           LearnedMatch{whole(Field::eth_type), Value{0x800}},
           LearnedMatch{whole(Field::eth_dst), whole(Field::eth_src)},
           LearnedLoad{part(reg(6), 0, 15), Value{1}},
           LearnedLoad{part(reg(6), 16, 31), part(reg(0), 0, 15)}, LearnedOutput{whole(reg(0))}}}),
      "learn(table=6,idle_timeout=10,hard_timeout=300,priority=50,send_flow_rem,delete_learned,"
      "cookie=0x10001,limit=4096,result_dst=NXM_NX_REG9[0],NXM_NX_REG8[0..11],"
      "NXM_NX_REG7[0..3]=0x5,eth_type=0x800,NXM_OF_ETH_DST[]=NXM_OF_ETH_SRC[],"
      "load:0x1->NXM_NX_REG6[0..15],load:NXM_NX_REG0[0..15]->NXM_NX_REG6[16..31],"
      "output:NXM_NX_REG0[])");
}

TEST(FlowText, LeavesOutWhatIsUsual) {
  Flow flow;
  EXPECT_EQ(to_text(flow), "actions=drop");
  flow.table = 12;
  EXPECT_EQ(to_text(flow), "table=12, actions=drop");
  flow.priority = 9;
  EXPECT_EQ(to_text(flow), "table=12, priority=9 actions=drop");
  flow.match.with(Field::in_port, kLocal);
  flow.cookie = 0x4001;
  flow.idle_timeout = 5;
  flow.hard_timeout = 60000;
  flow.tells_removal = true;
  flow.actions = {Output{1}, Output{2}};
  EXPECT_EQ(to_text(flow),
            "cookie=0x4001, table=12, idle_timeout=5, hard_timeout=60000, send_flow_rem "
            "priority=9,in_port=LOCAL actions=output:1,output:2");
}

TEST(Flow, IsOrderedByItsPlace) {
  Flow low;
  low.priority = 1;
  low.cookie = 9;
  Flow high;
  EXPECT_LT(low, high);
  auto other = low;
  other.cookie = 1;
  EXPECT_NE(low, other);
  EXPECT_EQ(place(low), place(other));
}

TEST(GroupText, HasEachType) {
  Group group{50, GroupType::fast_failover, {}, {}};
  EXPECT_EQ(to_text(group), "group_id=50,type=ff");
  group.buckets = {{0, 1, 1, kAnyGroup, {load(whole(reg(11)), 1), Resubmit{12}}},
                   {1, 1, kAnyPort, 6, {}}};
  EXPECT_EQ(to_text(group),
            "group_id=50,type=ff,bucket=bucket_id:0,watch_port:1,actions=set_field:0x1->reg11,"
            "resubmit(,12),bucket=bucket_id:1,watch_group:6,actions=drop");
  group = {1, GroupType::indirect, {}, {{0, 1, kAnyPort, kAnyGroup, {Output{1}}}}};
  EXPECT_EQ(to_text(group), "group_id=1,type=indirect,bucket=bucket_id:0,actions=output:1");
}

TEST(GroupText, SaysHowASelectGroupChooses) {
  Group group{2, GroupType::select, {"hash"}, {{1, 7, 2, kAnyGroup, {Output{2}}}}};
  EXPECT_EQ(to_text(group),
            "group_id=2,type=select,selection_method=hash,bucket=bucket_id:1,weight:7,"
            "watch_port:2,actions=output:2");
  group.buckets.clear();
  group.selection.fields = {{Field::eth_src, settable_bits(Field::eth_src)}};
  EXPECT_EQ(to_text(group), "group_id=2,type=select,selection_method=hash,fields=eth_src");
  group.selection.parameter = 77;
  group.selection.fields = {{Field::eth_dst, settable_bits(Field::eth_dst)},
                            {Field::ip_src, to_value(Ipv4Address{255, 255, 255, 0})},
                            {Field::tcp_src, 0xff}};
  EXPECT_EQ(to_text(group),
            "group_id=2,type=select,selection_method=hash,selection_method_param=77,"
            "fields(eth_dst,ip_src=255.255.255.0,tcp_src=255)");
}

}  // namespace
}  // namespace simhost::openflow
