// Which port moves to another uplink for the load, if any does.
#include "daemon/load/next_move.h"

#include <gtest/gtest.h>

#include <array>

namespace {

using namespace simhost::daemon;

constexpr std::uint64_t kMegabyte = 1'000'000;

TEST(NextMove, LeavesTheBusierOfTwoWithLeast) {
  std::array const ports{LoadedPort{.number = 1, .slot = 0, .bytes = 6 * kMegabyte},
                         LoadedPort{.number = 2, .slot = 0, .bytes = 3 * kMegabyte},
                         LoadedPort{.number = 3, .slot = 0, .bytes = 1 * kMegabyte},
                         LoadedPort{.number = 4, .slot = 1, .bytes = 2 * kMegabyte}};
  // The largest would make the other one as busy as the first is.
  EXPECT_EQ(next_move(ports, 2), (Move{.number = 2, .slot = 1}));
}

TEST(NextMove, GoesToWhoeverCarriesLeast) {
  std::array const ports{LoadedPort{.number = 1, .slot = 2, .bytes = 2 * kMegabyte},
                         LoadedPort{.number = 2, .slot = 2, .bytes = 2 * kMegabyte},
                         LoadedPort{.number = 3, .slot = 0, .bytes = 1 * kMegabyte}};
  EXPECT_EQ(next_move(ports, 3), (Move{.number = 1, .slot = 1}));
}

TEST(NextMove, IsNoneThatGainsLittle) {
  std::array const alone{LoadedPort{.number = 1, .slot = 0, .bytes = 9 * kMegabyte}};
  EXPECT_EQ(next_move(alone, 2), std::nullopt);
  std::array const nearly{LoadedPort{.number = 1, .slot = 0, .bytes = 19 * kMegabyte},
                          LoadedPort{.number = 2, .slot = 0, .bytes = 1 * kMegabyte},
                          LoadedPort{.number = 3, .slot = 1, .bytes = 17 * kMegabyte}};
  EXPECT_EQ(next_move(nearly, 2), std::nullopt);
  // What moved does not move back.
  std::array const moved{LoadedPort{.number = 1, .slot = 0, .bytes = 5 * kMegabyte},
                         LoadedPort{.number = 2, .slot = 1, .bytes = 4 * kMegabyte}};
  EXPECT_EQ(next_move(moved, 2), std::nullopt);
}

TEST(NextMove, IsNoneForWhatAnyClientSends) {
  std::array const quiet{LoadedPort{.number = 1, .slot = 0, .bytes = 900},
                         LoadedPort{.number = 2, .slot = 0, .bytes = 900}};
  EXPECT_EQ(next_move(quiet, 2), std::nullopt);
}

TEST(NextMove, IsNoneWithoutAChoice) {
  std::array const two{LoadedPort{.number = 1, .slot = 0, .bytes = kMegabyte},
                       LoadedPort{.number = 2, .slot = 0, .bytes = kMegabyte}};
  EXPECT_EQ(next_move(two, 1), std::nullopt);
  EXPECT_EQ(next_move({}, 0), std::nullopt);
}

}  // namespace
