// Methods of the tables that queries return.

#include "helpers/tables.h"

#include <gtest/gtest.h>

#include <climits>
#include <string>

#include "tests/helpers/records_in_memory.h"

namespace {

using namespace std::string_literals;

class McastFilters : public testing::Test {
 protected:
  Block<VSMcastFilters> filters_{32};
};

TEST_F(McastFilters, HaveMacAddressesSixBytesApart) {
  filters_.put(8,
               "\x01\0\x5e\0\0\xfb"
               "\x33\x33\xff\xAB\xCD\xEF"s);
  EXPECT_EQ("01:00:5e:00:00:fb", text_of(mcast_filters_mac_at(filters_.get(), 0)));
  EXPECT_EQ("33:33:ff:ab:cd:ef", text_of(mcast_filters_mac_at(filters_.get(), 1)));
}

TEST_F(McastFilters, HaveIpv4AddressesFourBytesApart) {
  filters_.put(8, "\xe0\0\0\xfb\xef\xff\xff\xfa"s);
  EXPECT_EQ("224.0.0.251", text_of(mcast_filters_ipv4_at(filters_.get(), 0)));
  EXPECT_EQ("239.255.255.250", text_of(mcast_filters_ipv4_at(filters_.get(), 1)));
}

TEST_F(McastFilters, HaveIpv6AddressesSixteenBytesApart) {
  filters_.put(8,
               "\xff\x02\0\0\0\0\0\0\0\0\0\0\0\0\0\xfb"
               "\xff\x05\0\0\0\0\0\0\0\0\0\0\0\x01\0\x03"s);
  EXPECT_EQ("ff02::fb", text_of(mcast_filters_ipv6_at(filters_.get(), 0)));
  EXPECT_EQ("ff05::1:3", text_of(mcast_filters_ipv6_at(filters_.get(), 1)));
}

TEST_F(McastFilters, AreReadAtAnyIndex) {
  filters_.put(0, "\1\2\3\4\5\6\7\x08"s);
  EXPECT_EQ("", printed_by([&] {
              EXPECT_EQ("03:04:05:06:07:08", text_of(mcast_filters_mac_at(filters_.get(), -1)));
              EXPECT_EQ("1.2.3.4", text_of(mcast_filters_ipv4_at(filters_.get(), -2)));
              EXPECT_EQ("0.0.0.0", text_of(mcast_filters_ipv4_at(filters_.get(), 7)));
            }));
}

TEST(McastFilterStats, HaveTheirSourcesBehind28Bytes) {
  Block<VSMcastFilterStats> stats(32);
  stats.put(28, "\x0a\0\0\x01\x0a\0\0\x02"s);
  EXPECT_EQ("10.0.0.1", text_of(mcast_filter_stats_ipv4_at(stats.get(), 0)));
  EXPECT_EQ("10.0.0.2", text_of(mcast_filter_stats_ipv4_at(stats.get(), 1)));

  stats.put(28, "\xfe\x80\0\0\0\0\0\0\0\0\0\0\0\0\0\1\xfe\x80\0\0\0\0\0\0\0\0\0\0\0\0\0\2"s);
  EXPECT_EQ("fe80::1", text_of(mcast_filter_stats_ipv6_at(stats.get(), 0)));
  EXPECT_EQ("fe80::2", text_of(mcast_filter_stats_ipv6_at(stats.get(), 1)));
}

TEST(McastFilterStats, AreReadAtAnyIndex) {
  Block<VSMcastFilterStats> stats;
  stats.put(12, "\xfe\x80\0\0\0\0\0\0\0\0\0\0\x01\x02\x03\x04"s);
  EXPECT_EQ("1.2.3.4", text_of(mcast_filter_stats_ipv4_at(stats.get(), -1)));
  EXPECT_EQ("fe80::102:304", text_of(mcast_filter_stats_ipv6_at(stats.get(), -1)));
}

class MacTable : public testing::Test {
 protected:
  MacTable() { table_.put(0, "eightbyt0123456789abcdefghijklmnopqrstuvwxyz"); }

  Block<VSMACTable> table_{36};
};

TEST_F(MacTable, HasEntriesThatAreCopiedFromAnyIndex) {
  struct {
    int index;
    char const *bytes;
  } const kCases[] = {{0, "0123456789abcdefgh"}, {1, "ijklmnopqrstuvwxyz"}};
  for (auto const &c : kCases) {
    VSMACEntry const entry = mac_entry_at(table_->macEntries, c.index);
    EXPECT_EQ(std::string(c.bytes, 18),
              std::string(reinterpret_cast<char const *>(&entry), sizeof entry));
  }
  auto *const second = reinterpret_cast<VSMACEntry *>(reinterpret_cast<char *>(table_.get()) + 26);
  VSMACEntry const before = mac_entry_at(second, -1);
  EXPECT_EQ(0, std::memcmp("012345", before.macAddress, 6));
}

TEST_F(MacTable, HasAddressesThatAreCopiedAlone) {
  std::string expected = table_.bytes();
  mac_entry_set_address(table_->macEntries, reinterpret_cast<unsigned char const *>("\0\1\2ABC"));
  expected.replace(8, 6, "\0\1\2ABC"s);
  EXPECT_EQ(expected, table_.bytes());
  EXPECT_EQ("00:01:02:41:42:43", text_of(mac_text(table_.get()->macEntries->macAddress)));
}

class SessionIds : public testing::Test {
 protected:
  SessionIds() {
    ids_->numEntries = 2;
    ids_.put(8, std::string(32, 'x') + "short\0behind"s);
  }

  Block<VSDVMirrorSessionIDs> ids_{64};
};

TEST_F(SessionIds, AreAllTheirBytes) {
  for (int const index : {0, 1}) {
    Object const id(mirror_session_ids_at(ids_.get(), index));
    ASSERT_TRUE(PyBytes_CheckExact(id.get()));
    EXPECT_EQ(
        ids_.bytes().substr(8 + 32 * static_cast<size_t>(index), 32),
        std::string(PyBytes_AS_STRING(id.get()), static_cast<size_t>(PyBytes_GET_SIZE(id.get()))));
  }
}

TEST_F(SessionIds, FailWithoutAnErrorForAnIndexThatIsNotBelowTheirCount) {
  for (int const index : {2, -1, INT_MAX, INT_MIN}) {
    SCOPED_TRACE(index);
    EXPECT_EQ(kNotice,
              printed_by([&] { EXPECT_EQ(nullptr, mirror_session_ids_at(ids_.get(), index)); }));
    EXPECT_EQ("", take_error_type());
  }
}

class PromiscDestinations : public testing::Test {
 protected:
  PromiscDestinations() {
    destinations_->numEntries = 2;
    destinations_.put(8, "\1\0\0\0\2\0\0\x80"s);
  }

  Block<VSPromiscSessionActiveDsts> destinations_{8};
};

TEST_F(PromiscDestinations, AreViewsIntoTheRecord) {
  auto *const entries = reinterpret_cast<char *>(destinations_.get()) + 8;
  EXPECT_EQ(static_cast<void *>(entries), promisc_destination_at(destinations_.get(), 0));
  EXPECT_EQ(static_cast<void *>(entries + 4), promisc_destination_at(destinations_.get(), 1));
  EXPECT_EQ(0x80000002, *promisc_destination_at(destinations_.get(), 1));
}

TEST_F(PromiscDestinations, AreReplacedOneByOne) {
  std::string expected = destinations_.bytes();
  qex_SwitchPortID const port = 0xfffefdfc;
  promisc_set_destination_at(destinations_.get(), 1, &port);
  expected.replace(12, 4, "\xfc\xfd\xfe\xff");
  EXPECT_EQ(expected, destinations_.bytes());
}

TEST_F(PromiscDestinations, AreOnlyThoseBelowTheirCount) {
  std::string const before = destinations_.bytes();
  qex_SwitchPortID const port = 7;
  for (int const index : {2, -1, INT_MAX, INT_MIN}) {
    SCOPED_TRACE(index);
    EXPECT_EQ(kNotice, printed_by([&] {
                EXPECT_EQ(nullptr, promisc_destination_at(destinations_.get(), index));
              }));
    EXPECT_EQ(kNotice,
              printed_by([&] { promisc_set_destination_at(destinations_.get(), index, &port); }));
  }
  EXPECT_EQ(before, destinations_.bytes());
}

}  // namespace
