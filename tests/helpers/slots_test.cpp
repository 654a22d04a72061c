// Indexes at each bound and one past it, and slots from empty to overfull.

#include "helpers/slots.h"

#include <gtest/gtest.h>

#include <climits>
#include <string>
#include <vector>

#include "tests/helpers/records_in_memory.h"

namespace {

constexpr std::uint32_t kMost = 0xffffffff;

struct Case {
  int index;
  std::uint32_t count;
  bool valid;
};

TEST(Index, IsComparedUnsigned) {
  for (Case const &c : std::vector<Case>{{0, 1, true},
                                         {4, 5, true},
                                         {5, 5, false},
                                         {0, 0, false},
                                         {-1, 5, false},
                                         {-1, kMost, false},
                                         {-2, kMost, true},
                                         {INT_MAX, 0x80000000, true},
                                         {INT_MIN, 0x80000000, false}}) {
    SCOPED_TRACE(testing::Message() << c.index << " of " << c.count);
    EXPECT_EQ(c.valid ? "" : kNotice,
              printed_by([&] { EXPECT_EQ(c.valid, index_is_valid(c.index, c.count)); }));
  }
}

TEST(SignedIndex, MayBeNegative) {
  for (Case const &c : std::vector<Case>{{0, 32, true},
                                         {31, 32, true},
                                         {32, 32, false},
                                         {INT_MAX, 32, false},
                                         {-1, 32, true},
                                         {INT_MIN, 32, true}}) {
    SCOPED_TRACE(testing::Message() << c.index << " of " << c.count);
    EXPECT_EQ(c.valid ? "" : kNotice, printed_by([&] {
                EXPECT_EQ(c.valid, signed_index_is_valid(c.index, static_cast<int>(c.count)));
              }));
  }
}

TEST(Notice, HasNoLineBreak) {
  EXPECT_EQ("Invalid array index.", printed_by(report_invalid_index));
}

TEST(Slot, IsPaddedWithNuls) {
  std::vector<char> slot(6, 'x');
  fill_slot({slot.data(), 5}, "ab");
  EXPECT_EQ(std::string("ab\0\0\0x", 6), std::string(slot.begin(), slot.end()));
}

TEST(Slot, OfAnEmptyTextIsAllNuls) {
  std::vector<char> slot(3, 'x');
  fill_slot(slot, "");
  EXPECT_EQ(std::string(3, '\0'), std::string(slot.begin(), slot.end()));
}

TEST(Slot, IsFilledToTheLastByteWithoutATerminator) {
  for (char const *text : {"abcde", "abcdef", "abcdefghijklmnop"}) {
    SCOPED_TRACE(text);
    std::vector<char> slot(6, 'x');
    fill_slot({slot.data(), 5}, text);
    EXPECT_EQ("abcdex", std::string(slot.begin(), slot.end()));
  }
}

TEST(Slot, NeedsNoMoreOfATextThanItHolds) {
  std::vector<char> const unterminated(5, 'y');
  std::vector<char> slot(5, 'x');
  fill_slot(slot, unterminated.data());
  EXPECT_EQ(unterminated, slot);
}

TEST(Element, IsWhereverTheIndexLeads) {
  using Element = char[81];
  std::vector<char> block(1000);
  char *const first = block.data() + 500;
  EXPECT_EQ(first, *element_at<Element>(first, 0));
  EXPECT_EQ(first + 162, *element_at<Element>(first, 2));
  EXPECT_EQ(first - 81, *element_at<Element>(first, -1));
}

}  // namespace
