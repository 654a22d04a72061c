// The three lists of uplinks: what their constructors allocate, and their entries by index.

#include "helpers/uplinks.h"

#include <gtest/gtest.h>

#include <climits>
#include <string>

#include "tests/helpers/records_in_memory.h"

namespace {

/// What the lists differ in: the room for an entry, the distance to the next one, its text.
struct Uplinks {
  using Record = VSUplinks;
  static constexpr size_t kHeader = 8, kRoom = 32, kStride = 36, kSlot = 32;
  static constexpr auto make = uplinks_new;
  static constexpr auto get = uplinks_name_at;
  static constexpr auto set = uplinks_set_name_at;
  static qex_uint32 &count(Record *list) { return list->numEntries; }
};

struct Ports {
  using Record = VSUplinkPorts;
  static constexpr size_t kHeader = 4, kRoom = 81, kStride = 81, kSlot = 81;
  static constexpr auto make = uplink_ports_new;
  static constexpr auto get = uplink_ports_name_at;
  static constexpr auto set = uplink_ports_set_name_at;
  static qex_uint32 &count(Record *list) { return list->nUplinkPorts; }
};

struct PortIds {
  using Record = VSUplinkPortIds;
  static constexpr size_t kHeader = 4, kRoom = 48, kStride = 48, kSlot = 48;
  static constexpr auto make = uplink_port_ids_new;
  static constexpr auto get = uplink_port_ids_id_at;
  static constexpr auto set = uplink_port_ids_set_id_at;
  static qex_uint32 &count(Record *list) { return list->nUplinkPorts; }
};

template <typename List>
class UplinkList : public testing::Test {
 protected:
  static constexpr int kCount = 3;
  static constexpr char kFilling = '\xee';

  /// A list that has room for all it claims.
  UplinkList() : list_(kCount * List::kStride, kFilling) { List::count(list_.get()) = kCount; }

  static size_t offset(int index) {
    return List::kHeader + static_cast<size_t>(index) * List::kStride;
  }

  void put(int index, std::string const &bytes) {
    list_.put(static_cast<std::ptrdiff_t>(offset(index)), bytes);
  }

  Block<typename List::Record> list_;
};

using Lists = testing::Types<Uplinks, Ports, PortIds>;
TYPED_TEST_SUITE(UplinkList, Lists);

TYPED_TEST(UplinkList, IsMadeWithItsRoomAndItsCountAlone) {
  constexpr int kCount = 45;
  constexpr size_t kSize = TypeParam::kHeader + kCount * TypeParam::kRoom;
  FreshMemoryIsNotZero const guard;
  std::string expected = fresh_memory(kSize);
  Made<typename TypeParam::Record> const list(TypeParam::make(kCount));

  ASSERT_NE(nullptr, list);
  EXPECT_GE(malloc_usable_size(list.get()), kSize);
  EXPECT_LT(malloc_usable_size(list.get()), kSize + kRounding);
  expected.replace(TypeParam::kHeader - 4, 4, std::string("-\0\0\0", 4));
  EXPECT_EQ(expected, std::string(reinterpret_cast<char const *>(list.get()), kSize));
}

TYPED_TEST(UplinkList, MayBeMadeEmpty) {
  Made<typename TypeParam::Record> const list(TypeParam::make(0));
  ASSERT_NE(nullptr, list);
  EXPECT_EQ(0U, TypeParam::count(list.get()));
}

TYPED_TEST(UplinkList, IsNotMadeForANegativeCount) {
  for (int const count : {-1, -1000, INT_MIN}) {
    EXPECT_EQ(nullptr, TypeParam::make(count)) << count;
  }
}

TYPED_TEST(UplinkList, ReadsTheTextsOfItsEntries) {
  for (int index = 0; index < this->kCount; ++index) {
    this->put(index, "uplink" + std::to_string(index) + '\0');
    EXPECT_EQ("", printed_by([&] {
                EXPECT_EQ("uplink" + std::to_string(index),
                          std::string(TypeParam::get(this->list_.get(), index)));
              }));
  }
}

TYPED_TEST(UplinkList, ReadsOnAfterASlotWithoutATerminator) {
  this->put(0, std::string(TypeParam::kSlot, 'x') + "yz" + '\0');
  EXPECT_EQ(std::string(TypeParam::kSlot, 'x') + "yz", TypeParam::get(this->list_.get(), 0));
}

TYPED_TEST(UplinkList, PadsAShortText) {
  std::string expected = this->list_.bytes();
  TypeParam::set(this->list_.get(), 1, "ab");
  expected.replace(this->offset(1), TypeParam::kSlot,
                   "ab" + std::string(TypeParam::kSlot - 2, '\0'));
  EXPECT_EQ(expected, this->list_.bytes());
}

TYPED_TEST(UplinkList, CutsATextThatFillsItsSlotWithoutATerminator) {
  for (size_t const length : {TypeParam::kSlot, TypeParam::kSlot + 1, TypeParam::kSlot + 500}) {
    SCOPED_TRACE(length);
    std::string expected = this->list_.bytes();
    TypeParam::set(this->list_.get(), this->kCount - 1, std::string(length, 'x').c_str());
    expected.replace(this->offset(this->kCount - 1), TypeParam::kSlot,
                     std::string(TypeParam::kSlot, 'x'));
    EXPECT_EQ(expected, this->list_.bytes());
  }
}

TYPED_TEST(UplinkList, RefusesAnIndexThatIsNotBelowItsCountUnsigned) {
  std::string const before = this->list_.bytes();
  for (int const index : {this->kCount, this->kCount + 1, INT_MAX, -1, INT_MIN}) {
    SCOPED_TRACE(index);
    EXPECT_EQ(kNotice,
              printed_by([&] { EXPECT_EQ(nullptr, TypeParam::get(this->list_.get(), index)); }));
    EXPECT_EQ(kNotice, printed_by([&] { TypeParam::set(this->list_.get(), index, "ab"); }));
  }
  EXPECT_EQ(before, this->list_.bytes());
}

TEST(UplinksNew, MakesTooLittleRoomForItsCount) {
  Made<VSUplinks> const uplinks(uplinks_new(100));
  EXPECT_LT(malloc_usable_size(uplinks.get()), 8 + 100 * sizeof(VSUplinks_entries));
}

}  // namespace
