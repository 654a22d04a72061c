// The mirror session table: its layout, its sessions and entities, and the text of an entity.

#include "helpers/mirror.h"

#include <gtest/gtest.h>

#include <climits>
#include <string>
#include <vector>

#include "tests/helpers/records_in_memory.h"

namespace {

using namespace std::string_literals;

struct FreeTable {
  void operator()(DVMirrorSessionTable *table) const { free_dvmirror_session_table(table); }
};
using Table = std::unique_ptr<DVMirrorSessionTable, FreeTable>;

std::string bytes_of(Table const &table, size_t size) {
  return {reinterpret_cast<char const *>(table.get()), size};
}

TEST(NewTable, IsZeroButForItsMagicNumberAndCounts) {
  FreshMemoryIsNotZero const guard;
  Table const empty(alloc_dvmirror_session_table(0, 0));
  EXPECT_EQ("\xef\xbe\xce\xfa"s + std::string(16, '\0'), bytes_of(empty, 20));

  Table const table(alloc_dvmirror_session_table(2, 3));
  EXPECT_EQ("\xef\xbe\xce\xfa\0\0\0\0\2\0\0\0\3\0\0\0"s + std::string(4 + 464 + 156, '\0'),
            bytes_of(table, 640));
}

TEST(NewTable, HasRoomForItsSessionsAndEntities) {
  for (auto const &[sessions, entities, size] :
       std::vector<std::tuple<int, int, size_t>>{{2, 3, 640}, {100, 0, 23220}, {0, 100, 5220}}) {
    Table const table(alloc_dvmirror_session_table(sessions, entities));
    ASSERT_NE(nullptr, table);
    EXPECT_GE(malloc_usable_size(table.get()), size);
    EXPECT_LT(malloc_usable_size(table.get()), size + kRounding);
  }
}

TEST(NewTable, HasASizeOf32SignedBits) {
  // 2^26 entities and 4 sessions: the entities' bytes are 52 * 2^26, of which 32 bits keep
  // 0xd0000000, a negative size.
  EXPECT_EQ(nullptr, alloc_dvmirror_session_table(4, 1 << 26));
  EXPECT_EQ(nullptr, alloc_dvmirror_session_table(-1, 0));
  EXPECT_EQ(nullptr, alloc_dvmirror_session_table(0, -1));

  // 52 * 2^30 is a multiple of 2^32: nothing is left of the entities.
  Table const table(alloc_dvmirror_session_table(1, 1 << 30));
  ASSERT_NE(nullptr, table);
  EXPECT_EQ(1U << 30, table->numEntities);
  EXPECT_LT(malloc_usable_size(table.get()), 20 + 232 + kRounding);
}

TEST(NewTable, HoldsItsHeaderHoweverSmallItsSizeComesOut) {
  // 20 + 10 * 232 - 45 * 52 is 0.
  Table const table(alloc_dvmirror_session_table(10, -45));
  ASSERT_NE(nullptr, table);
  EXPECT_GE(malloc_usable_size(table.get()), sizeof(DVMirrorSessionTable));
  EXPECT_EQ(10U, table->numSessions);
}

TEST(NoTable, IsNothingToFree) {
  free_dvmirror_session_table(nullptr);
}

class Sessions : public testing::Test {
 protected:
  char *byte(std::ptrdiff_t offset) { return reinterpret_cast<char *>(table_.get()) + offset; }

  Table const table_{alloc_dvmirror_session_table(2, 3)};
};

TEST_F(Sessions, FollowTheHeader) {
  EXPECT_EQ(static_cast<void *>(byte(20)), mirror_first_session(table_.get()));
  EXPECT_EQ(static_cast<void *>(byte(20)), mirror_session_at(table_.get(), 0));
  EXPECT_EQ(static_cast<void *>(byte(252)), mirror_session_at(table_.get(), 1));
}

TEST_F(Sessions, HaveAFirstOneEvenIfThereIsNone) {
  table_->numSessions = 0;
  EXPECT_EQ(static_cast<void *>(byte(20)), mirror_first_session(table_.get()));
}

TEST_F(Sessions, AreReplacedWhole) {
  std::string expected = bytes_of(table_, 640);
  std::string const session(232, '\xa5');
  mirror_set_session_at(table_.get(), 1, reinterpret_cast<DVMirrorSession const *>(session.data()));
  expected.replace(252, 232, session);
  EXPECT_EQ(expected, bytes_of(table_, 640));
}

TEST_F(Sessions, MayBeReplacedByThemselves) {
  DVMirrorSession *const session = mirror_session_at(table_.get(), 1);
  session->flags = 7;
  mirror_set_session_at(table_.get(), 1, session);
  EXPECT_EQ(7U, session->flags);
}

TEST_F(Sessions, AreOnlyThoseBelowTheirNumberUnsigned) {
  std::string const before = bytes_of(table_, 640);
  Block<DVMirrorSession> session(0, 'x');
  for (int const index : {2, 3, INT_MAX, -1, INT_MIN}) {
    SCOPED_TRACE(index);
    EXPECT_EQ(kNotice,
              printed_by([&] { EXPECT_EQ(nullptr, mirror_session_at(table_.get(), index)); }));
    EXPECT_EQ(kNotice,
              printed_by([&] { mirror_set_session_at(table_.get(), index, session.get()); }));
  }
  EXPECT_EQ(before, bytes_of(table_, 640));
}

TEST_F(Sessions, AreFollowedByTheEntities) {
  EXPECT_EQ(static_cast<void *>(byte(484)), mirror_entity_at(table_.get(), 0));
  EXPECT_EQ(static_cast<void *>(byte(536)), mirror_entity_at(table_.get(), 1));
  EXPECT_EQ(static_cast<void *>(byte(536)), mirror_next_entity(mirror_entity_at(table_.get(), 0)));
}

TEST_F(Sessions, AreFollowedByEntitiesThatNobodyCounts) {
  for (int const index : {-9, -1, 3, 100000, INT_MAX, INT_MIN}) {
    SCOPED_TRACE(index);
    std::intptr_t const address = reinterpret_cast<std::intptr_t>(byte(484)) + index * 52L;
    EXPECT_EQ("", printed_by([&] {
                EXPECT_EQ(reinterpret_cast<void *>(address), mirror_entity_at(table_.get(), index));
              }));
  }
  table_->numEntities = 0;
  EXPECT_EQ(static_cast<void *>(byte(484)), mirror_entity_at(table_.get(), 0));
  table_->numSessions = 1;
  EXPECT_EQ(static_cast<void *>(byte(252)), mirror_entity_at(table_.get(), 0));
}

/// An entity whose value is all bytes of one kind.
class Entity : public testing::Test {
 protected:
  static constexpr char kFilling = '\xee';

  void become(int type) { entity_.put(0, {static_cast<char>(type), '\0', '\0', '\0'}); }

  std::string text() { return mirror_entity_text(entity_.get()).text; }

  /// The value's first bytes after a text has been set over the filling; the others must have kept
  /// it.
  std::string set(std::string const &text, size_t size) {
    entity_.put(4, std::string(48, kFilling));
    mirror_set_entity_text(entity_.get(), text.c_str());
    EXPECT_EQ(std::string(48 - size, kFilling), entity_.bytes().substr(4 + size));
    return entity_.bytes().substr(4, size);
  }

  Block<DVMirrorEntity> entity_{0, kFilling};
};

TEST_F(Entity, OfAPortIdentifierReadsUpTo48Bytes) {
  become(MIRROR_ENTTYPE_DVPORT);
  entity_.put(4, "port-7\0x"s);
  EXPECT_EQ("port-7", text());
  entity_.put(4, std::string(48, 'x'));
  EXPECT_EQ(std::string(48, 'x'), text());
}

TEST_F(Entity, OfAPortIdentifierTakes48BytesWithoutATerminator) {
  become(MIRROR_ENTTYPE_DVPORT);
  EXPECT_EQ("port-7" + std::string(42, '\0'), set("port-7", 48));
  EXPECT_EQ(std::string(47, 'x') + '\0', set(std::string(47, 'x'), 48));
  EXPECT_EQ(std::string(48, 'x'), set(std::string(48, 'x'), 48));
  EXPECT_EQ(std::string(48, 'x'), set(std::string(500, 'x'), 48));
}

TEST_F(Entity, OfAnUplinkReadsUpTo32Bytes) {
  become(MIRROR_ENTTYPE_UPLINK);
  entity_.put(4, "uplink1\0x"s);
  EXPECT_EQ("uplink1", text());
  entity_.put(4, std::string(48, 'x'));
  EXPECT_EQ(std::string(32, 'x'), text());
}

TEST_F(Entity, OfAnUplinkTakes31BytesAndATerminator) {
  become(MIRROR_ENTTYPE_UPLINK);
  EXPECT_EQ("uplink1" + std::string(25, '\0'), set("uplink1", 32));
  for (size_t const length : {31, 32, 40}) {
    EXPECT_EQ(std::string(31, 'x') + '\0', set(std::string(length, 'x'), 32)) << length;
    EXPECT_EQ(std::string(31, 'x'), text());
  }
}

struct Number {
  char const *text;
  long value;
};

TEST_F(Entity, OfAVlanTakes16BitsOfADecimalNumber) {
  become(MIRROR_ENTTYPE_VLAN);
  for (Number const &c : std::vector<Number>{{"0", 0},
                                             {"4097", 4097},
                                             {"65535", 65535},
                                             {"65536", 0},
                                             {"70000", 4464},
                                             {"-1", 65535},
                                             {" +12abc", 12},
                                             {"010", 10},
                                             {"0x10", 0},
                                             {"", 0},
                                             {"abc", 0},
                                             {"99999999999999999999", 65535},
                                             {"-99999999999999999999", 0}}) {
    SCOPED_TRACE(c.text);
    std::string const stored = set(c.text, 2);
    EXPECT_EQ(c.value, static_cast<unsigned char>(stored[0]) | static_cast<unsigned char>(stored[1])
                                                                   << 8);
    EXPECT_EQ(std::to_string(c.value), text());
  }
}

TEST_F(Entity, OfAPortTakes32BitsOfADecimalNumberAndReadsThemSigned) {
  become(MIRROR_ENTTYPE_PORT);
  for (Number const &c : std::vector<Number>{{"0", 0},
                                             {"2147483647", 2147483647},
                                             {"2147483648", -2147483648},
                                             {"4294967295", -1},
                                             {"4294967296", 0},
                                             {"4294967301x", 5},
                                             {"-1", -1},
                                             {"port", 0},
                                             {"99999999999999999999", -1}}) {
    SCOPED_TRACE(c.text);
    std::string const stored = set(c.text, 4);
    qex_uint32 number = 0;
    std::memcpy(&number, stored.data(), sizeof number);
    EXPECT_EQ(static_cast<qex_uint32>(c.value), number);
    EXPECT_EQ(std::to_string(c.value), text());
  }
}

TEST_F(Entity, OfAnAddressTakesIpv4AndLeavesTheRestAlone) {
  become(MIRROR_ENTTYPE_IP);
  EXPECT_EQ("\0\xee\xee\xee\x0a\0\0\x01"s, set("10.0.0.1", 8));
  EXPECT_EQ("10.0.0.1", text());
}

TEST_F(Entity, OfAnAddressTakesIpv6) {
  become(MIRROR_ENTTYPE_IP);
  EXPECT_EQ("\1\xee\xee\xee\xfe\x80\0\0\0\0\0\0\0\0\0\0\0\0\0\1"s, set("fe80::1", 20));
  EXPECT_EQ("fe80::1", text());
  set("ffff:ffff:ffff:ffff:ffff:ffff:255.255.255.255", 20);
  EXPECT_EQ("ffff:ffff:ffff:ffff:ffff:ffff:ffff:ffff", text());
}

TEST_F(Entity, OfAnAddressReadsIpv6ForAnyFlagThatIsNotZero) {
  become(MIRROR_ENTTYPE_IP);
  entity_.put(4, "\x80\0\0\0\xfe\x80\0\0\0\0\0\0\0\0\0\0\0\0\0\1"s);
  EXPECT_EQ("fe80::1", text());
  entity_.put(4, "\0"s);
  EXPECT_EQ("254.128.0.0", text());
}

TEST_F(Entity, OfAnAddressKeepsItForATextThatIsNone) {
  become(MIRROR_ENTTYPE_IP);
  for (char const *text :
       {"", "host", "10.0.0", "10.0.0.256", "10.0.0.1 ", " ::1", ":::", "::1%0", "fe80::1::2"}) {
    EXPECT_EQ("", set(text, 0)) << text;
  }
}

TEST_F(Entity, OfAnotherTypeIsEmptyAndTakesNothing) {
  for (int const type : {5, 7, 127}) {
    SCOPED_TRACE(type);
    become(type);
    EXPECT_EQ("", set("10", 0));
    EXPECT_EQ("", text());
  }
  entity_.put(0, "\xff\xff\xff\xff"s);
  EXPECT_EQ("", set("10", 0));
  EXPECT_EQ("", text());
}

TEST(MirrorMacros, DoNothing) {
  EXPECT_EQ("", printed_by([] {
              MIRROR_ENCAP_TYPE();
              MIRROR_ASSERT();
            }));
}

}  // namespace
