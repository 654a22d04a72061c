// Methods of policies: names of a team's uplinks, ranges of VLANs, entries of private-VLAN maps.

#include "helpers/policies.h"

#include <gtest/gtest.h>

#include <climits>
#include <string>

#include "tests/helpers/records_in_memory.h"

namespace {

using namespace std::string_literals;

constexpr int kSlots = 32;
constexpr size_t kSlot = 81;
constexpr size_t kFirst = 24;

/// A policy with room in front of it, where negative indexes lead.
class TeamPolicy : public testing::Test {
 protected:
  static constexpr size_t kInFront = 2 * kSlot;

  static std::ptrdiff_t offset(int index) {
    return static_cast<std::ptrdiff_t>(kFirst) + index * static_cast<std::ptrdiff_t>(kSlot);
  }

  /// The block as it is after bytes of a slot have been replaced.
  [[nodiscard]] std::string with(int index, std::string const &bytes) const {
    return policy_.bytes().replace(kInFront + static_cast<size_t>(offset(index)), bytes.size(),
                                   bytes);
  }

  Block<VSTeamPolicy> policy_{0, '\xee', kInFront};
};

TEST_F(TeamPolicy, ReadsTheNamesOfItsSlots) {
  for (int const index : {0, 1, kSlots - 1}) {
    policy_.put(offset(index), "uplink" + std::to_string(index) + '\0');
    EXPECT_EQ("", printed_by([&] {
                EXPECT_EQ("uplink" + std::to_string(index),
                          std::string(team_policy_name_at(policy_.get(), index)));
              }));
  }
}

TEST_F(TeamPolicy, FillsItsSlots) {
  for (int const index : {0, 1, kSlots - 1}) {
    SCOPED_TRACE(index);
    std::string expected = with(index, "ab" + std::string(kSlot - 2, '\0'));
    team_policy_set_name_at(policy_.get(), index, "ab");
    EXPECT_EQ(expected, policy_.bytes());
    for (size_t const length : {kSlot, kSlot + 1}) {
      expected = with(index, std::string(kSlot, 'x'));
      team_policy_set_name_at(policy_.get(), index, std::string(length, 'x').c_str());
      EXPECT_EQ(expected, policy_.bytes());
    }
  }
}

TEST_F(TeamPolicy, RefusesAnIndexOf32AndAbove) {
  std::string const before = policy_.bytes();
  for (int const index : {kSlots, kSlots + 1, INT_MAX}) {
    SCOPED_TRACE(index);
    EXPECT_EQ(kNotice,
              printed_by([&] { EXPECT_EQ(nullptr, team_policy_name_at(policy_.get(), index)); }));
    EXPECT_EQ(kNotice, printed_by([&] { team_policy_set_name_at(policy_.get(), index, "ab"); }));
  }
  EXPECT_EQ(before, policy_.bytes());
}

TEST_F(TeamPolicy, GoesBeforeItsSlotsForANegativeIndex) {
  for (int const index : {-1, -2}) {
    SCOPED_TRACE(index);
    std::string const expected = with(index, "before" + std::string(kSlot - 6, '\0'));
    EXPECT_EQ("", printed_by([&] { team_policy_set_name_at(policy_.get(), index, "before"); }));
    EXPECT_EQ(expected, policy_.bytes());
    EXPECT_EQ("before"s, team_policy_name_at(policy_.get(), index));
  }
}

TEST(PvlanEntry, IsACopyOfAnyElement) {
  VSPvlanMapEntry entries[4];
  for (qex_uint16 i = 0; i < 4; ++i) {
    entries[i] = {.primaryVID = static_cast<qex_uint16>(100 + i),
                  .secondaryVID = static_cast<qex_uint16>(200 + i),
                  .pvlanType = static_cast<qex_uint8>(i),
                  .pad = {'a', 'b', 'c'}};
  }
  for (int const index : {-1, 0, 2}) {
    SCOPED_TRACE(index);
    VSPvlanMapEntry const entry = pvlan_entry_at(entries + 1, index);
    EXPECT_EQ(0, std::memcmp(&entry, &entries[1 + index], sizeof entry));
  }
}

TEST(VlanRange, IsACopyOfAnyOfTheRangesAfterThePolicy) {
  Block<VSPortVlanPolicy> policy(3 * sizeof(qex_NEBPortVIDRange));
  policy.put(0,
             "\1\0\2\0\3\0\4\0"
             "\x0a\0\x0b\0\x0c\0\x0d\0\xff\x0f\xff\xff"s);
  struct {
    int index;
    int first;
    int last;
  } const kCases[] = {{0, 10, 11}, {1, 12, 13}, {2, 4095, 65535}, {-1, 3, 4}, {-2, 1, 2}};
  for (auto const &c : kCases) {
    SCOPED_TRACE(c.index);
    qex_NEBPortVIDRange const range = vlan_policy_range_at(policy.get(), c.index);
    EXPECT_EQ(c.first, range.minVID);
    EXPECT_EQ(c.last, range.maxVID);
  }
}

TEST(VlanRange, IsThereWhateverTheNumberOfRangesSays) {
  Block<VSPortVlanPolicy> policy(sizeof(qex_NEBPortVIDRange));
  policy.put(8, "\1\0\2\0"s);
  ASSERT_EQ(0, policy->numRanges);
  EXPECT_EQ(2, vlan_policy_range_at(policy.get(), 0).maxVID);
}

}  // namespace
