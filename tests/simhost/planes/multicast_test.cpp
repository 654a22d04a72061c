// Multicast groups of ports.
#include <gmock/gmock.h>

#include <initializer_list>

#include "model/options/runtime_options.h"
#include "plane.h"
#include "vswitch/mcast_filters.h"

namespace {

using simhost::AddressBytes;
using simhost::McastGroup;
using testing::ElementsAre;
using testing::IsEmpty;

AddressBytes bytes(std::initializer_list<unsigned char> values) {
  auto const all = std::as_bytes(std::span(values));
  return {all.begin(), all.end()};
}

AddressBytes const kIPv4 = bytes({239, 1, 1, 1});
AddressBytes const kMac = bytes({0x01, 0x00, 0x5E, 1, 1, 1});
AddressBytes const kIPv6 = bytes({0xFF, 2, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 9});

struct Multicast : Plane {
  QEX_ReturnStatus join(McastGroup const &group) {
    return status_of([&] { simhost::get_wires().join(transaction, p1.number, group); });
  }
  std::vector<AddressBytes> groups(simhost::storage::Port const &port, std::size_t length) {
    return simhost::running_plane().groups(transaction, port.number, length);
  }
};

McastGroup group(AddressBytes const &address) {
  return {
      .address = address, .version = 0, .source_mode = 0, .vni = 0, .updated = {}, .sources = {}};
}

TEST_F(Multicast, GroupsAreApartByTheirFamilies) {
  ASSERT_EQ(join(group(kIPv4)), QEX_OK);
  ASSERT_EQ(join(group(kMac)), QEX_OK);
  ASSERT_EQ(join(group(kIPv6)), QEX_OK);
  EXPECT_THAT(groups(p1, 4), ElementsAre(kIPv4));
  EXPECT_THAT(groups(p1, 6), ElementsAre(kMac));
  EXPECT_THAT(groups(p1, 16), ElementsAre(kIPv6));
  EXPECT_THAT(groups(p2, 4), IsEmpty());
}

TEST_F(Multicast, AReportReplacesWhatWasKnown) {
  auto first = group(kIPv4);
  first.version = 3;
  first.source_mode = VS_MCAST_SRC_IP_FILTER_MODE_INCLUDE;
  first.vni = 5;
  first.sources = {bytes({10, 0, 0, 2}), bytes({10, 0, 0, 1})};
  ASSERT_EQ(join(first), QEX_OK);
  simhost::step_clock(transaction, std::chrono::seconds(5));
  auto const known = simhost::running_plane().group(transaction, p1.number, kIPv4).value();
  EXPECT_EQ(known.version, 3U);
  EXPECT_EQ(known.source_mode, 1U);
  EXPECT_EQ(known.vni, 5U);
  EXPECT_EQ(known.updated, kStart);
  EXPECT_EQ(known.sources, first.sources) << "in the order of the report";
  ASSERT_EQ(join(group(kIPv4)), QEX_OK);
  auto const replaced = simhost::running_plane().group(transaction, p1.number, kIPv4).value();
  EXPECT_EQ(replaced.updated, kStart + std::chrono::seconds(5));
  EXPECT_THAT(replaced.sources, IsEmpty());
}

TEST_F(Multicast, GroupsAreLeft) {
  ASSERT_EQ(join(group(kIPv4)), QEX_OK);
  simhost::get_wires().leave(transaction, p1.number, kIPv4);
  EXPECT_THAT(groups(p1, 4), IsEmpty());
  EXPECT_FALSE(simhost::running_plane().group(transaction, p1.number, kIPv4).has_value());
  EXPECT_EQ(status_of([&] { simhost::get_wires().leave(transaction, p1.number, kIPv4); }),
            QEX_NOT_FOUND);
}

TEST_F(Multicast, OnlyMulticastAddressesAreGroups) {
  EXPECT_EQ(join(group(bytes({10, 0, 0, 1}))), QEX_INVALID_ADDRESS);
  EXPECT_EQ(join(group(bytes({240, 0, 0, 1}))), QEX_INVALID_ADDRESS);
  EXPECT_EQ(join(group(bytes({0x02, 0, 0, 0, 0, 1}))), QEX_INVALID_ADDRESS);
  EXPECT_EQ(join(group(AddressBytes(16))), QEX_INVALID_ADDRESS);
  EXPECT_EQ(join(group({})), QEX_INVALID_ADDRESS);
  EXPECT_EQ(join(group(bytes({0xFF, 1, 1}))), QEX_INVALID_ADDRESS);
}

TEST_F(Multicast, ReportsAreChecked) {
  auto wrong = group(kIPv4);
  wrong.version = 4;
  EXPECT_EQ(join(wrong), QEX_BAD_PARAM);
  wrong = group(kIPv6);
  wrong.version = 3;
  EXPECT_EQ(join(wrong), QEX_BAD_PARAM);
  wrong = group(kIPv4);
  wrong.source_mode = 3;
  EXPECT_EQ(join(wrong), QEX_BAD_PARAM);
  wrong = group(kIPv4);
  wrong.sources = {kIPv6};
  EXPECT_EQ(join(wrong), QEX_INVALID_ADDRESS);
  wrong = group(kMac);
  wrong.sources = {kMac};
  EXPECT_EQ(join(wrong), QEX_INVALID_ADDRESS);
}

TEST_F(Multicast, SourcesAreLimitedByTheRuntimeOptions) {
  simhost::set_runtime_option(transaction, VS_RT_OPT_IGMP_V3_MAX_SRC_IP_NUM, 1);
  simhost::set_runtime_option(transaction, VS_RT_OPT_MLD_V2_MAX_SRC_IP_NUM, 0);
  auto full = group(kIPv4);
  full.sources = {bytes({10, 0, 0, 1})};
  EXPECT_EQ(join(full), QEX_OK);
  full.sources.push_back(bytes({10, 0, 0, 2}));
  EXPECT_EQ(join(full), QEX_LIMIT_EXCEEDED);
  full = group(kIPv6);
  full.sources = {kIPv6};
  EXPECT_EQ(join(full), QEX_LIMIT_EXCEEDED);
}

}  // namespace
