// The runtime options list, byte by byte: building one, walking one, names and values.

#include "helpers/runtime_options.h"

#include <gtest/gtest.h>

#include <climits>
#include <string>

#include "tests/helpers/records_in_memory.h"

namespace {

using namespace std::string_literals;

constexpr char const *kNames[] = {"IGMPQueryInterval",   "IGMPV3MaxSrcIPNum",
                                  "IGMPQueries",         "IGMPVersion",
                                  "MLDVersion",          "MLDV2MaxSrcIPNum",
                                  "MaxRARPsPerInterval", "RARPAdvertisementDuration",
                                  "ReversePathFwdCheck", "ReversePathFwdCheckPromisc",
                                  "AllowFastPath",       "TeamPolicyUpDelay",
                                  "AllowMirrorStats",    "IGMPRouterIP",
                                  "MLDRouterIP"};

TEST(OptionNames, StandInTheOrderOfTheirTypes) {
  static_assert(std::size(kNames) == VS_NUM_RT_OPT);
  for (size_t type = 0; type < std::size(kNames); ++type) {
    EXPECT_STREQ(kNames[type], runtimeOptionNames[type]);
  }
}

int type_of(std::string name) {
  return get_runtime_option_type_from_name(name.data());
}

TEST(OptionNames, LeadBackToTheirTypes) {
  for (size_t type = 0; type < std::size(kNames); ++type) {
    EXPECT_EQ(static_cast<int>(type), type_of(kNames[type]));
  }
}

TEST(OptionNames, AreComparedWhole) {
  for (char const *name : {"", "allowmirrorstats", "AllowMirrorStat", "AllowMirrorStatsX", " "}) {
    EXPECT_EQ(15, type_of(name)) << name;
  }
  EXPECT_EQ(15, get_runtime_option_type_from_name(nullptr));
}

TEST(NewList, HasItsSizeAlone) {
  constexpr int kSize = 2048;
  FreshMemoryIsNotZero const guard;
  std::string expected = fresh_memory(kSize);
  Made<VSRuntimeOptions> const list(runtime_options_new(kSize));

  ASSERT_NE(nullptr, list);
  EXPECT_GE(malloc_usable_size(list.get()), static_cast<size_t>(kSize));
  EXPECT_LT(malloc_usable_size(list.get()), kSize + kRounding);
  expected.replace(0, 4, "\0\x08\0\0"s);
  EXPECT_EQ(expected, std::string(reinterpret_cast<char const *>(list.get()), kSize));
}

TEST(NewList, HoldsItsLengthHoweverSmallItIs) {
  for (int const size : {0, 1, 3, 4}) {
    Made<VSRuntimeOptions> const list(runtime_options_new(size));
    ASSERT_NE(nullptr, list);
    EXPECT_EQ(static_cast<qex_uint32>(size), list->totalLength);
  }
}

TEST(NewList, IsNotMadeForANegativeSize) {
  for (int const size : {-1, -4096, INT_MIN}) {
    EXPECT_EQ(nullptr, runtime_options_new(size)) << size;
  }
}

/// A list of a chosen size, filled so that every byte that is written shows.
class OptionList : public testing::Test {
 protected:
  static constexpr size_t kRoom = 200;
  static constexpr char kFilling = '\xee';

  OptionList() { list_->totalLength = sizeof(VSRuntimeOptions) + kRoom; }

  /// The position of a byte, counted from the start of the list.
  VSRuntimeOptionHeader *at(size_t offset) {
    return reinterpret_cast<VSRuntimeOptionHeader *>(reinterpret_cast<char *>(list_.get()) +
                                                     offset);
  }

  [[nodiscard]] std::string with(size_t offset, std::string const &bytes) const {
    return list_.bytes().replace(offset, bytes.size(), bytes);
  }

  VSRuntimeOptionHeader *add(VSRuntimeOptionHeader *position, int type, int value) {
    return runtime_options_add_int(list_.get(), position, "ignored", type, value);
  }

  VSRuntimeOptionHeader *add(VSRuntimeOptionHeader *position, int type, std::string const &value) {
    return runtime_options_add_text(list_.get(), position, "ignored", type, value.c_str());
  }

  Block<VSRuntimeOptions> list_{kRoom, kFilling};
};

TEST_F(OptionList, StartsAfterItsLength) {
  EXPECT_EQ(at(4), runtime_options_first(list_.get()));
  list_->totalLength = 0;
  EXPECT_EQ(at(4), runtime_options_first(list_.get()));
}

TEST_F(OptionList, TakesAnIntegerInEightBytes) {
  std::string const expected = with(4, "\x0c\0\x08\0\x78\x56\x34\x12"s);
  EXPECT_EQ(at(12), add(at(4), 12, 0x12345678));
  EXPECT_EQ(expected, list_.bytes());
}

TEST_F(OptionList, TakesATextAndItsNul) {
  std::string const expected = with(4, "\x0d\0\x0d\0"s + "10.1.1.1\0"s);
  EXPECT_EQ(at(17), add(at(4), 13, "10.1.1.1"));
  EXPECT_EQ(expected, list_.bytes());
}

TEST_F(OptionList, TakesOptionsAtAnyByte) {
  std::string const expected = with(4, "\x0d\0\x05\0\0"s + "\x01\0\x08\0\xff\xff\xff\xff"s);
  EXPECT_EQ(at(9), add(at(4), 13, ""));
  EXPECT_EQ(at(17), add(at(9), 1, -1));
  EXPECT_EQ(expected, list_.bytes());
}

TEST_F(OptionList, KeepsTheLow16BitsOfAType) {
  std::string expected = with(4, "\xff\xff\x08\0\0\0\0\0"s);
  add(at(4), -1, 0);
  EXPECT_EQ(expected, list_.bytes());
  expected = with(4, "\x0d\0\x06\0"s + "x\0"s);
  add(at(4), 0x7fff000d, "x");
  EXPECT_EQ(expected, list_.bytes());
}

TEST_F(OptionList, IgnoresTheNameOfAnOption) {
  runtime_options_add_int(list_.get(), at(4), "MLDVersion", 2, 0);
  EXPECT_EQ(2, at(4)->type);
  runtime_options_add_text(list_.get(), at(4), "MLDVersion", 13, "");
  EXPECT_EQ(13, at(4)->type);
}

TEST_F(OptionList, KeepsOneByteFreeAfterAnInteger) {
  std::string before = list_.bytes();
  list_->totalLength = 12;
  before.replace(0, 4, "\x0c\0\0\0"s);
  EXPECT_EQ(nullptr, add(at(4), 0, 5));
  EXPECT_EQ(before, list_.bytes());
  list_->totalLength = 13;
  EXPECT_EQ(at(12), add(at(4), 0, 5));
}

TEST_F(OptionList, KeepsOneByteFreeAfterAText) {
  std::string before = list_.bytes();
  list_->totalLength = 17;
  before.replace(0, 4, "\x11\0\0\0"s);
  EXPECT_EQ(nullptr, add(at(4), 13, "10.1.1.1"));
  EXPECT_EQ(before, list_.bytes());
  list_->totalLength = 18;
  EXPECT_EQ(at(17), add(at(4), 13, "10.1.1.1"));
}

TEST_F(OptionList, TakesATextOf127BytesAndNoLongerOne) {
  std::string const before = list_.bytes();
  EXPECT_EQ(nullptr, add(at(4), 13, std::string(128, 'x')));
  EXPECT_EQ(nullptr, add(at(4), 13, std::string(70000, 'x')));
  EXPECT_EQ(before, list_.bytes());

  std::string const expected = with(4, "\x0d\0\x84\0"s + std::string(127, 'x') + '\0');
  EXPECT_EQ(at(4 + 132), add(at(4), 13, std::string(127, 'x')));
  EXPECT_EQ(expected, list_.bytes());
}

TEST_F(OptionList, EndsAfterTheBytesThatWereUsed) {
  for (int const used : {0, 16, 4092}) {
    runtime_options_set_length(list_.get(), used);
    EXPECT_EQ(static_cast<qex_uint32>(used) + 4, list_->totalLength);
  }
  runtime_options_set_length(list_.get(), -1);
  EXPECT_EQ(3U, list_->totalLength);
}

TEST_F(OptionList, IsWalkedFromOptionToOption) {
  VSRuntimeOptionHeader *const second = add(runtime_options_first(list_.get()), 13, "a");
  VSRuntimeOptionHeader *const third = add(second, 0, 1);
  add(third, 1, 2);
  runtime_options_set_length(list_.get(), 6 + 8 + 8);

  EXPECT_EQ(second, runtime_options_next(list_.get(), at(4)));
  EXPECT_EQ(third, runtime_options_next(list_.get(), second));
  EXPECT_EQ(nullptr, runtime_options_next(list_.get(), third));
}

TEST_F(OptionList, IsWalkedStrictlyBelowItsLength) {
  add(at(4), 0, 1);
  list_->totalLength = 12;
  EXPECT_EQ(nullptr, runtime_options_next(list_.get(), at(4)));
  list_->totalLength = 13;
  EXPECT_EQ(at(12), runtime_options_next(list_.get(), at(4)));
}

TEST_F(OptionList, StandsStillAtAnOptionWithoutLength) {
  at(4)->length = 0;
  EXPECT_EQ(at(4), runtime_options_next(list_.get(), at(4)));
}

TEST_F(OptionList, NamesItsOptions) {
  for (size_t type = 0; type < std::size(kNames); ++type) {
    at(5)->type = static_cast<qex_uint16>(type);
    EXPECT_STREQ(kNames[type], runtime_option_name(at(5)));
  }
}

TEST_F(OptionList, HasUnsignedNumbersUpToType12) {
  struct {
    int type;
    int value;
    unsigned long number;
  } const kCases[] = {
      {0, 0, 0}, {0, INT_MAX, 2147483647}, {12, -1, 4294967295}, {12, INT_MIN, 2147483648}};
  for (auto const &c : kCases) {
    SCOPED_TRACE(c.value);
    add(at(5), c.type, c.value);
    Object const value(runtime_option_value(at(5)));
    ASSERT_TRUE(PyLong_CheckExact(value.get()));
    EXPECT_EQ(c.number, PyLong_AsUnsignedLong(value.get()));
  }
}

TEST_F(OptionList, HasBytesUpToTheFirstNulAboveType12) {
  for (int const type : {13, 14, 15, 0xffff}) {
    for (std::string const text : {"224.0.0.1", "", "\xff\x80"}) {
      SCOPED_TRACE(text);
      add(at(5), type, text);
      at(5)->length = 0xffff;
      Object const value(runtime_option_value(at(5)));
      ASSERT_TRUE(PyBytes_CheckExact(value.get()));
      EXPECT_EQ(text, PyBytes_AS_STRING(value.get()));
      EXPECT_EQ(static_cast<Py_ssize_t>(text.size()), PyBytes_GET_SIZE(value.get()));
    }
  }
}

}  // namespace
