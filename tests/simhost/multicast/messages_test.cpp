// Frames as the RFCs lay them out, field by field: what is read of them, and that nothing is read
// of those with something wrong.
#include "planes/openvswitch/multicast/messages.h"

#include <gmock/gmock.h>

#include <ostream>
#include <string>
#include <utility>

#include "group_addresses.h"
#include "planes/openvswitch/multicast/checksum.h"
#include "planes/openvswitch/multicast/floating_code.h"
#include "planes/openvswitch/multicast/queries.h"

namespace simhost::multicast {
namespace {

using namespace std::chrono_literals;
using openflow::EthernetAddress;

Report one_record(unsigned version, RecordType type, std::string const &group) {
  return {.version = version, .records = {{.type = type, .group = address(group)}}};
}

std::string const kFromHost = "020000000001";
std::string const kIpv4Host = "0a000001";
std::string const kIpv4Router = "0a0000fe";
std::string const kIpv6Host = "fe800000000000000000000000000001";
std::string const kIpv6Router = "fe8000000000000000000000000000fe";
std::string const kIpv6Group = "ff150000000000000000000000000101";
// Of IPv6, before the payload: next header and length, the option and what fills it up.
std::string const kAlert = "3a00 0502 0000 0100";

std::string igmp_1_report() {
  return "01005e010101" + kFromHost + "0800 45c0001c00004000 01027f1d" + kIpv4Host + "ef010101" +
         "1200fdfc ef010101";
}
std::string igmp_2_report() {
  return "01005e010101" + kFromHost + "0800 46c0002000004000 0102ea14" + kIpv4Host + "ef010101" +
         "94040000 1600f9fc ef010101";
}
std::string igmp_2_leave() {
  return "01005e000002" + kFromHost + "0800 46c0002000004000 0102fa14" + kIpv4Host + "e0000002" +
         "94040000 1700f8fc ef010101";
}
// A change of sources, a record of a kind that nobody knows, and one with auxiliary data.
std::string igmp_3_report() {
  return "01005e000016" + kFromHost + "0800 46c0004400004000 0102f9dc" + kIpv4Host + "e0000016" +
         "94040000 2200493e 00000003" + "06000002ef010101 0a000009 0a00000a" + "09000000ef010101" +
         "03010000ef020202 deadbeef";
}
std::string igmp_1_query() {
  return "01005e000001" + kFromHost + "0800 45c0001c00004000 01028e21" + kIpv4Router + "e0000001" +
         "1100eeff 00000000";
}
std::string igmp_2_query() {
  return "01005e010101" + kFromHost + "0800 46c0002000004000 0102e917" + kIpv4Router + "ef010101" +
         "94040000 110afef2 ef010101";
}
std::string igmp_3_query() {
  return "01005e010101" + kFromHost + "0800 46c0002800004000 0102e90f" + kIpv4Router + "ef010101" +
         "94040000 118ae9de ef010101 0a8a0001 0a000009";
}
std::string ipv4_advertisement() {
  return "01005e00006a" + kFromHost + "0800 46c0002000004000 0102f8af" + kIpv4Router + "e000006a" +
         "94040000 3014cf6c 007d0002";
}
std::string ipv4_termination() {
  return "01005e00006a" + kFromHost + "0800 46c0001c00004000 0102f8b3" + kIpv4Router + "e000006a" +
         "94040000 3200cdff";
}
std::string ipv4_pim_hello() {
  return "01005e00000d" + kFromHost + "0800 45c0002600004000 01678da6" + kIpv4Router + "e000000d" +
         "2000cd92 00010002001e 0014000400001234";
}
std::string mld_1_report() {
  return "333300000101" + kFromHost + "86dd 60000000 0020 00 01" + kIpv6Host + kIpv6Group + kAlert +
         "83007dfd 00000000" + kIpv6Group;
}
std::string mld_1_done() {
  return "333300000002" + kFromHost + "86dd 60000000 0020 00 01" + kIpv6Host +
         "ff020000000000000000000000000002" + kAlert + "84007e0f 00000000" + kIpv6Group;
}
std::string mld_2_report() {
  return "333300000016" + kFromHost + "86dd 60000000 0034 00 01" +
         "00000000000000000000000000000000" + "ff020000000000000000000000000016" + kAlert +
         "8f0042a5 00000001" + "01000001" + kIpv6Group + "20010db8000000000000000000000009";
}
std::string mld_1_query() {
  return "333300000001" + kFromHost + "86dd 60000000 0020 00 01" + kIpv6Router +
         "ff020000000000000000000000000001" + kAlert +
         "8200581a 27100000 00000000000000000000000000000000";
}
std::string mld_2_query() {
  return "333300000101" + kFromHost + "86dd 60000000 0034 00 01" + kIpv6Router + kIpv6Group +
         kAlert + "8200c9c3 83e80000" + kIpv6Group + "027d0001 20010db8000000000000000000000009";
}
std::string ipv6_advertisement() {
  return "33330000006a" + kFromHost + "86dd 60000000 0010 00 01" + kIpv6Router +
         "ff02000000000000000000000000006a" + kAlert + "9714693e 007d0002";
}
std::string ipv6_termination() {
  return "33330000006a" + kFromHost + "86dd 60000000 000c 00 01" + kIpv6Router +
         "ff02000000000000000000000000006a" + kAlert + "990067d5";
}
std::string ipv6_pim_hello() {
  return "33330000000d" + kFromHost + "86dd 60000000 000a 67 01" + kIpv6Router +
         "ff02000000000000000000000000000d" + "2000e0fc 000100020000";
}

using Content = decltype(Message::content);

struct Golden {
  std::string name;
  std::string frame;
  std::string source;
  Content content;
};

void PrintTo(Golden const &golden, std::ostream *out) {
  *out << golden.name;
}

std::vector<Golden> goldens() {
  return {
      {"igmp_1_report", igmp_1_report(), "10.0.0.1",
       one_record(1, RecordType::is_exclude, "239.1.1.1")},
      {"igmp_2_report", igmp_2_report(), "10.0.0.1",
       one_record(2, RecordType::is_exclude, "239.1.1.1")},
      {"igmp_2_leave", igmp_2_leave(), "10.0.0.1",
       one_record(2, RecordType::to_include, "239.1.1.1")},
      {"igmp_3_report", igmp_3_report(), "10.0.0.1",
       Report{.version = 3,
              .records = {{.type = RecordType::block,
                           .group = address("239.1.1.1"),
                           .sources = {address("10.0.0.9"), address("10.0.0.10")}},
                          {.type = RecordType::to_include, .group = address("239.2.2.2")}}}},
      {"igmp_1_query", igmp_1_query(), "10.0.0.254", Query{.version = 1, .response = 10s}},
      {"igmp_2_query", igmp_2_query(), "10.0.0.254",
       Query{.version = 2, .group = address("239.1.1.1"), .response = 1s}},
      {"igmp_3_query", igmp_3_query(), "10.0.0.254",
       Query{.version = 3,
             .group = address("239.1.1.1"),
             .sources = {address("10.0.0.9")},
             .response = 20800ms,
             .robustness = 2,
             .interval = 208s}},
      {"ipv4_advertisement", ipv4_advertisement(), "10.0.0.254", RouterHello{.hold = 60s}},
      {"ipv4_termination", ipv4_termination(), "10.0.0.254", RouterHello{}},
      {"ipv4_pim_hello", ipv4_pim_hello(), "10.0.0.254", RouterHello{.hold = 30s}},
      {"mld_1_report", mld_1_report(), "fe80::1",
       one_record(1, RecordType::is_exclude, "ff15::101")},
      {"mld_1_done", mld_1_done(), "fe80::1", one_record(1, RecordType::to_include, "ff15::101")},
      {"mld_2_report", mld_2_report(), "::",
       Report{.version = 2,
              .records = {{.type = RecordType::is_include,
                           .group = address("ff15::101"),
                           .sources = {address("2001:db8::9")}}}}},
      {"mld_1_query", mld_1_query(), "fe80::fe", Query{.version = 1, .response = 10s}},
      {"mld_2_query", mld_2_query(), "fe80::fe",
       Query{.version = 2,
             .group = address("ff15::101"),
             .sources = {address("2001:db8::9")},
             .response = 40768ms,
             .robustness = 2,
             .interval = 125s}},
      {"ipv6_advertisement", ipv6_advertisement(), "fe80::fe", RouterHello{.hold = 60s}},
      {"ipv6_termination", ipv6_termination(), "fe80::fe", RouterHello{}},
      {"ipv6_pim_hello", ipv6_pim_hello(), "fe80::fe", RouterHello{}},
  };
}

class Frames : public testing::TestWithParam<Golden> {};

constexpr std::size_t kTagAt = 12;
constexpr std::size_t kPacketAt = 14;

std::vector<std::uint8_t> with_tags(std::vector<std::uint8_t> frame,
                                    std::vector<std::uint8_t> const &tags) {
  frame.insert(frame.begin() + kTagAt, tags.begin(), tags.end());
  return frame;
}

void expect_read(std::vector<std::uint8_t> const &frame, Golden const &golden) {
  auto const message = decode(frame);
  ASSERT_TRUE(message);
  EXPECT_EQ(message->source, address(golden.source));
  EXPECT_EQ(message->content, golden.content);
}

TEST_P(Frames, AreRead) {
  expect_read(bytes(GetParam().frame), GetParam());
}

TEST_P(Frames, AreReadAfterTags) {
  auto const frame = bytes(GetParam().frame);
  expect_read(with_tags(frame, bytes("8100 0007")), GetParam());
  expect_read(with_tags(frame, bytes("88a8 0007 8100 e008")), GetParam());
  EXPECT_FALSE(decode(with_tags(frame, bytes("88a8 0007 8100 e008 8100 0009"))));
}

TEST_P(Frames, MayBePadded) {
  auto frame = bytes(GetParam().frame);
  frame.resize(frame.size() + 20, 0x55);
  expect_read(frame, GetParam());
}

TEST_P(Frames, AreNoneWhenTheyEndEarly) {
  auto frame = bytes(GetParam().frame);
  while (!frame.empty()) {
    frame.pop_back();
    EXPECT_FALSE(decode(frame)) << frame.size();
  }
}

// Whatever a checksum covers.
TEST_P(Frames, AreNoneWithAnyBitOfTheMessageChanged) {
  auto const frame = bytes(GetParam().frame);
  auto const first = frame.size() - (GetParam().name.ends_with("termination") ? 4 : 8);
  for (auto at = first; at < frame.size(); ++at) {
    auto changed = frame;
    changed[at] ^= 1U;
    EXPECT_FALSE(decode(changed)) << at;
  }
}

TEST_P(Frames, AreNoneWithAnyBitOfTheAddressesChanged) {
  auto const frame = bytes(GetParam().frame);
  bool const is_ipv4 = frame[kTagAt] == 0x08;
  auto const first = kPacketAt + (is_ipv4 ? 12U : 8U);
  for (auto at = first; at < first + (is_ipv4 ? 8U : 32U); ++at) {
    auto changed = frame;
    changed[at] ^= 1U;
    EXPECT_FALSE(decode(changed)) << at;
  }
}

INSTANTIATE_TEST_SUITE_P(Messages, Frames, testing::ValuesIn(goldens()),
                         [](auto const &info) { return info.param.name; });

std::vector<std::uint8_t> with_ipv4_sum(std::vector<std::uint8_t> frame) {
  auto *const header = &frame[kPacketAt];
  auto const length = (header[0] & 0xfU) * std::size_t{4};
  header[10] = header[11] = 0;
  auto const sum = Checksum().add({header, length}).value();
  header[10] = static_cast<std::uint8_t>(sum >> 8U);
  header[11] = static_cast<std::uint8_t>(sum);
  return frame;
}

std::vector<std::uint8_t> with_hops(std::string const &frame, std::uint8_t hops) {
  auto changed = bytes(frame);
  bool const is_ipv4 = changed[kTagAt] == 0x08;
  changed[kPacketAt + (is_ipv4 ? 8 : 7)] = hops;
  return is_ipv4 ? with_ipv4_sum(changed) : changed;
}

TEST(Neighbours, AloneSayWhatIsForNeighbours) {
  for (auto const &frame :
       {mld_1_report(), mld_1_done(), mld_2_report(), mld_1_query(), mld_2_query(),
        ipv6_advertisement(), ipv6_termination(), ipv6_pim_hello(), ipv4_advertisement(),
        ipv4_termination(), ipv4_pim_hello()}) {
    EXPECT_TRUE(decode(with_hops(frame, 1)));
    EXPECT_FALSE(decode(with_hops(frame, 0)));
    EXPECT_FALSE(decode(with_hops(frame, 2)));
  }
  // Nothing says how far a report of IGMP may come.
  EXPECT_TRUE(decode(with_hops(igmp_2_report(), 2)));
}

TEST(Neighbours, AlertRoutersWithMld) {
  auto frame = bytes(mld_1_report());
  auto const option = kPacketAt + sizeof(std::uint64_t) + 2 * sizeof(openflow::Ipv6Address) + 2;
  ASSERT_EQ(frame[option], 5);
  frame[option] = 1;  // nothing but padding
  EXPECT_FALSE(decode(frame));
}

TEST(Fragments, SayNothing) {
  for (auto const *of : {"2000", "0001", "6000"}) {
    auto frame = bytes(igmp_2_report());
    auto const field = bytes(of);
    std::copy(field.begin(), field.end(), frame.begin() + kPacketAt + 6);
    EXPECT_FALSE(decode(with_ipv4_sum(frame))) << of;
  }
}

TEST(Other, FramesAreNoMessages) {
  EXPECT_FALSE(decode({}));
  EXPECT_FALSE(decode(bytes("ffffffffffff 020000000001 0806 0001")));
  // A solicitation, which nobody here replies to.
  EXPECT_FALSE(decode(bytes("01005e000002" + kFromHost + "0800 46c0001c00004000 0102f91b" +
                            kIpv4Router + "e0000002" + "94040000 3100ceff")));
}

TEST(Queries, AreFramesOfTheirVersion) {
  EthernetAddress const hardware{2, 0, 0, 0, 0, 2};
  auto const from = kFromHost.substr(0, 11) + "2";
  auto const own = "fe80000000000000000000fffe000002";
  EXPECT_EQ(encode({.version = 2, .response = 10s}, {hardware, address("192.0.2.1")}),
            bytes("01005e000001" + from + "0800 46c0002000004000 01024215 c0000201 e0000001" +
                  "94040000 1164ee9b 00000000"));
  EXPECT_EQ(encode({.version = 3,
                    .group = address("239.1.1.1"),
                    .sources = {address("10.0.0.9")},
                    .response = 1s,
                    .robustness = 2,
                    .interval = 125s},
                   {hardware, address("0.0.0.0")}),
            bytes("01005e010101" + from + "0800 46c0002800004000 0102f40d 00000000 ef010101" +
                  "94040000 110af26b ef010101 027d0001 0a000009"));
  EXPECT_EQ(encode({.version = 2, .response = 10s, .robustness = 2, .interval = 125s},
                   {hardware, link_local_address(hardware)}),
            bytes("333300000001" + from + "86dd 60000000 0024 00 01" + own +
                  "ff020000000000000000000000000001" + kAlert +
                  "82005795 27100000 00000000000000000000000000000000 027d0000"));
  EXPECT_EQ(encode({.version = 1, .group = address("ff15::101"), .response = 1s},
                   {hardware, link_local_address(hardware)}),
            bytes("333300000101" + from + "86dd 60000000 0020 00 01" + own + kIpv6Group + kAlert +
                  "82007c14 03e80000" + kIpv6Group));
}

TEST(Queries, AreReadAsTheyWere) {
  std::vector<std::pair<Query, std::string>> const all{
      {{.version = 1, .response = 10s}, "0.0.0.0"},
      {{.version = 2, .group = address("239.1.1.1"), .response = 100ms}, "192.0.2.1"},
      {{.version = 3, .response = 12800ms, .robustness = 7, .interval = 31744s}, "192.0.2.1"},
      {{.version = 1, .response = 65535ms}, "fe80::1"},
      {{.version = 2,
        .group = address("ff15::101"),
        .sources = {address("2001:db8::1"), address("2001:db8::2")},
        .response = 32768ms,
        .robustness = 1,
        .interval = 1s},
       "fe80::1"}};
  for (auto const &[query, source] : all) {
    auto const message = decode(encode(query, {.hardware = {2}, .source = address(source)}));
    ASSERT_TRUE(message) << source << query.version;
    EXPECT_EQ(std::get<Query>(message->content), query);
    EXPECT_EQ(message->source, address(source));
  }
}

TEST(Codes, AreTheNextSmallerOnes) {
  EXPECT_EQ(FloatingCode<8>::decoded(0x7f), 127);
  EXPECT_EQ(FloatingCode<8>::decoded(0x80), 128);
  EXPECT_EQ(FloatingCode<8>::decoded(0xff), 31744);
  EXPECT_EQ(FloatingCode<16>::decoded(0x8000), 32768);
  EXPECT_EQ(FloatingCode<16>::decoded(0xffff), 8387584);
  EXPECT_EQ(FloatingCode<8>::encoded(1'000'000), 0xff);
  for (std::uint64_t number = 0; number < 40'000; ++number) {
    auto const code = FloatingCode<8>::encoded(number);
    EXPECT_LE(FloatingCode<8>::decoded(code), number);
    if (code < 0xff) {
      EXPECT_GT(FloatingCode<8>::decoded(code + 1), number);
    }
  }
}

TEST(Addresses, ThatNobodyJoinsAreForAll) {
  for (auto const *text : {"224.0.0.0", "224.0.0.22", "224.0.0.255", "ff02::1", "ff02::16",
                           "ff02::1:ff12:3456", "ff01::101", "ff11::1"}) {
    EXPECT_TRUE(is_for_all(address(text))) << text;
  }
  for (auto const *text : {"224.0.1.9", "239.0.0.1", "225.0.0.1", "ff02::1:3", "ff02::1:2",
                           "ff02::101", "ff12::1", "ff05::1", "ff15::101", "ff02::2:ff12:3456"}) {
    EXPECT_FALSE(is_for_all(address(text))) << text;
  }
}

TEST(Addresses, OfGroupsHaveOnesOfEthernet) {
  EXPECT_EQ(ethernet_of(address("239.129.2.3")), (EthernetAddress{1, 0, 0x5e, 1, 2, 3}));
  EXPECT_EQ(ethernet_of(address("ff15::1:2:3")), (EthernetAddress{0x33, 0x33, 0, 2, 0, 3}));
}

}  // namespace
}  // namespace simhost::multicast
