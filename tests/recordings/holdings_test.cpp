// Memory that stands for numbers of a trace, where the tool has memory of its own.

#include "recordings/player/holdings.h"

#include <gtest/gtest.h>

#include <array>
#include <cstdint>
#include <optional>

namespace recordings {
namespace {

TEST(Holdings, MemoryThatTheToolAllocatesAgainStandsForTheLastNumberAlone) {
  std::array<char, 8> own{};
  auto const address = reinterpret_cast<std::uint64_t>(own.data());
  Holdings holdings;
  holdings.adopt(1, address, own.size());
  holdings.adopt(2, address, own.size());
  EXPECT_EQ(holdings.number_of(address), 2U);
  EXPECT_FALSE(holdings.has(1));

  holdings.release(address);
  EXPECT_EQ(holdings.number_of(address), std::nullopt);
  auto const given = holdings.give(1, {'a', 'b'}, false);
  EXPECT_NE(given, address);
  EXPECT_EQ(holdings.number_of(given), 1U);
}

TEST(Holdings, TheSameNumberMayHaveTheSameMemoryAgain) {
  std::array<char, 8> own{};
  auto const address = reinterpret_cast<std::uint64_t>(own.data());
  Holdings holdings;
  holdings.adopt(1, address, 2);
  holdings.adopt(1, address, own.size());
  EXPECT_EQ(holdings.give(1, {'a', 'b', 'c', 'd'}, false), address);
  EXPECT_EQ(own[3], 'd');
}

}  // namespace
}  // namespace recordings
