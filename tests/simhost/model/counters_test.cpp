// The counters: what SCENARIOS.md says that there are, and what each has room for.
#include "model/counters/counters.h"

#include <gmock/gmock.h>

#include <fstream>
#include <regex>
#include <string>
#include <vector>

#include "model/plane.h"
#include "plane.h"

namespace {

using simhost::CounterKind;
using testing::UnorderedElementsAreArray;

std::vector<std::string> names_of(CounterKind kind) {
  std::vector<std::string> names;
  for (auto const &counter : simhost::counters_of(kind)) {
    names.emplace_back(counter.name);
  }
  return names;
}

// The names in the row of a table of SCENARIOS.md that begins so.
std::vector<std::string> names_in_row(std::string const &beginning) {
  std::ifstream page(SCENARIOS);
  std::string line;
  while (std::getline(page, line) && line.find(beginning) != 0) {
  }
  std::regex const name("`([A-Za-z]+)`");
  auto const rest = line.substr(std::min(beginning.size(), line.size()));
  std::vector<std::string> names;
  for (std::sregex_iterator at(rest.begin(), rest.end(), name), end; at != end; ++at) {
    names.push_back((*at)[1]);
  }
  return names;
}

TEST(Counters, AreThoseOfThePage) {
  EXPECT_THAT(names_in_row("| `counters` | of the team: "),
              UnorderedElementsAreArray(names_of(CounterKind::of_switch)));
  EXPECT_THAT(names_in_row("| `counters` | of its learning: "),
              UnorderedElementsAreArray(names_of(CounterKind::of_port)));
  EXPECT_THAT(names_in_row("| `mirror_counters` | of mirror sessions by their identifiers: "),
              UnorderedElementsAreArray(names_of(CounterKind::of_session)));
}

struct CountersOfASwitch : Plane {
  QEX_ReturnStatus set(simhost::CounterOwner const &owner, char const *name, std::uint64_t value) {
    return status_of([&] { simhost::set_counter(transaction, owner, name, value); });
  }
  simhost::CounterOwner of_port() const { return {.switch_key = key, .port = p1.number}; }
};

TEST_F(CountersOfASwitch, HaveTheRoomOfTheirFields) {
  EXPECT_EQ(set({.switch_key = key}, "rarpPktsSent", 0xFFFFFFFF), QEX_OK);
  EXPECT_EQ(set({.switch_key = key}, "rarpPktsSent", 0x100000000), QEX_BAD_PARAM);
  EXPECT_EQ(set({.switch_key = key}, "rarpTime", ~std::uint64_t{0}), QEX_OK);
  EXPECT_EQ(set(of_port(), "rarpTime", 1), QEX_NOT_FOUND) << "it is a switch's";
}

TEST_F(CountersOfASwitch, AreShownInTheRecordThatHasThem) {
  ASSERT_EQ(set(of_port(), "numMACsMoved", 5), QEX_OK);
  ASSERT_EQ(set(of_port(), "bytesOutMulticast", ~std::uint64_t{0}), QEX_OK);
  auto const counters = simhost::running_plane().counters(transaction, of_port());
  qex_NEBPortStatistics statistics{};
  simhost::show(counters, statistics);
  EXPECT_EQ(statistics.bytesOutMulticast, ~std::uint64_t{0});
  EXPECT_EQ(statistics.pktsOutMulticast, 0U);
  EXPECT_EQ(simhost::running_plane()
                    .learning_stats(transaction, {.switch_key = key, .port = p1.number})
                    .numMACsMoved +
                0U,
            5U);
}

}  // namespace
