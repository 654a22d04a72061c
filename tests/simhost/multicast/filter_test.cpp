// The tables of RFC 3376 (6.4): each row, as sets of sources that are wanted (with a timer) or
// excluded.
#include "planes/openvswitch/multicast/filter.h"

#include <gmock/gmock.h>

#include <string>

#include "group_addresses.h"

namespace simhost::multicast {
namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr Timing kTiming{.membership = 260s, .between_asking = 1s, .times_asked = 2};
constexpr Reading kAll{.level = Level::sources, .most_sources = 32};

// "ab" for two sources.
std::vector<Address> sources(std::string const &letters) {
  std::vector<Address> all;
  for (auto const letter : letters) {
    all.push_back(address("10.0.0." + std::to_string(letter - 'a' + 1)));
  }
  return all;
}

std::string letters(std::vector<Address> const &sources) {
  std::string all;
  for (auto const &source : sources) {
    all += static_cast<char>('a' + source.bytes[3] - 1);
  }
  return all;
}

struct Table : testing::Test {
  void apply(RecordType type, std::string const &listed, Level level = Level::sources) {
    filter.apply({.type = type, .group = address("239.1.1.1"), .sources = sources(listed)}, level,
                 reading, kTiming, now);
  }
  void include(std::string const &listed) { apply(RecordType::is_include, listed); }
  void exclude(std::string const &listed) { apply(RecordType::is_exclude, listed); }

  // Lets time pass as a caller does, who looks whenever something is due.
  void wait(Time time) {
    auto const end = now + time;
    for (auto due = filter.next(); due && *due <= end; due = filter.next()) {
      now = std::max(now, *due);
      look();
    }
    now = end;
  }
  void look() {
    for (auto const &question : filter.advance(kTiming, now)) {
      asked += question.empty() ? "*" : letters(question);
      asked += " ";
    }
  }
  // What is asked at once.
  std::string asks() {
    asked.clear();
    look();
    return asked;
  }

  // "only ab", "all but ab", "nothing".
  [[nodiscard]] std::string wanted() const {
    if (filter.is_over()) {
      return "nothing";
    }
    auto const now_wanted = filter.wanted();
    return (now_wanted.are_excluded ? "all but " : "only ") + letters(now_wanted.listed);
  }

  Filter filter;
  Reading reading = kAll;
  Time now = 1000s;
  std::string asked;
};

// While it includes {a, b}.
struct Including : Table {
  Including() { include("ab"); }
};

TEST_F(Including, MoreIsIncluded) {
  include("bc");
  EXPECT_EQ(wanted(), "only abc");
  apply(RecordType::allow, "d");
  EXPECT_EQ(wanted(), "only abcd");
  EXPECT_EQ(asks(), "");
}

TEST_F(Including, ExcludingBeginsWithWhatWasNotWanted) {
  wait(100s);
  exclude("bc");
  EXPECT_EQ(wanted(), "all but c");
  EXPECT_EQ(asks(), "");
  // The timer of b goes on; that of the group is new.
  wait(160s);
  EXPECT_EQ(wanted(), "all but bc");
  wait(99s);
  EXPECT_EQ(wanted(), "all but bc");
  wait(1s);
  EXPECT_EQ(wanted(), "nothing");
}

TEST_F(Including, ChangingToExcludeAsksForThoseThatWereWanted) {
  apply(RecordType::to_exclude, "bc");
  EXPECT_EQ(wanted(), "all but c");
  EXPECT_EQ(asks(), "b ");
  wait(2s);
  EXPECT_EQ(wanted(), "all but bc");
}

TEST_F(Including, WhatIsBlockedIsAskedFor) {
  apply(RecordType::block, "bc");
  EXPECT_EQ(wanted(), "only ab");
  EXPECT_EQ(asks(), "b ");
  wait(1s);
  EXPECT_EQ(asked, "b b ");
  EXPECT_EQ(wanted(), "only ab");
  wait(1s);
  EXPECT_EQ(wanted(), "only a");
  EXPECT_EQ(asked, "b b ");
}

TEST_F(Including, WhoStillWantsItSaysSo) {
  apply(RecordType::block, "ab");
  EXPECT_EQ(asks(), "ab ");
  include("b");
  wait(1s);
  EXPECT_EQ(asked, "ab a ");
  wait(1s);
  EXPECT_EQ(wanted(), "only b");
}

TEST_F(Including, ChangingToIncludeAsksForTheOthers) {
  apply(RecordType::to_include, "bc");
  EXPECT_EQ(wanted(), "only abc");
  EXPECT_EQ(asks(), "a ");
  wait(2s);
  EXPECT_EQ(wanted(), "only bc");
}

TEST_F(Including, EndsWithItsTimers) {
  wait(259s);
  include("b");
  wait(1s);
  EXPECT_EQ(wanted(), "only b");
  wait(259s);
  EXPECT_EQ(wanted(), "nothing");
  EXPECT_EQ(filter.next(), std::nullopt);
}

// While it excludes {x, y} and somebody wants {a, b} all the same.
struct Excluding : Table {
  Excluding() {
    exclude("xy");
    include("ab");
  }
};

TEST_F(Excluding, HasBoth) {
  EXPECT_EQ(wanted(), "all but xy");
}

TEST_F(Excluding, WhatIsIncludedIsNotExcluded) {
  include("x");
  EXPECT_EQ(wanted(), "all but y");
  apply(RecordType::allow, "y");
  EXPECT_EQ(wanted(), "all but ");
  EXPECT_EQ(asks(), "");
  // Nobody said again that it is wanted in spite of the others.
  wait(259s);
  exclude("y");
  EXPECT_EQ(wanted(), "all but ");
  wait(1s);
  EXPECT_EQ(wanted(), "all but y");
}

TEST_F(Excluding, WhatIsExcludedNewlyIsWantedForAWhile) {
  exclude("axc");
  EXPECT_EQ(wanted(), "all but x");
  EXPECT_EQ(asks(), "");
  wait(259s);
  exclude("axc");
  wait(1s);
  EXPECT_EQ(wanted(), "all but acx");
}

TEST_F(Excluding, ChangingToExcludeAsksForWhatWasNotExcluded) {
  apply(RecordType::to_exclude, "axc");
  EXPECT_EQ(wanted(), "all but x");
  EXPECT_EQ(asks(), "ac ");
  wait(2s);
  EXPECT_EQ(wanted(), "all but acx");
}

TEST_F(Excluding, WhatIsBlockedIsAskedForUnlessItIsExcluded) {
  apply(RecordType::block, "axc");
  EXPECT_EQ(wanted(), "all but xy");
  EXPECT_EQ(asks(), "ac ");
  wait(2s);
  EXPECT_EQ(wanted(), "all but acxy");
}

TEST_F(Excluding, ChangingToIncludeAsksForTheGroupAndTheSources) {
  apply(RecordType::to_include, "bc");
  EXPECT_EQ(wanted(), "all but xy");
  EXPECT_EQ(asks(), "* a ");
  wait(2s);
  EXPECT_EQ(wanted(), "only bc");
  EXPECT_EQ(asked, "* a * a ");
}

TEST_F(Excluding, WhoStillExcludesSaysSo) {
  apply(RecordType::to_include, "");
  wait(1s);
  exclude("xy");
  asked.clear();
  wait(100s);
  EXPECT_EQ(asked, "");
  EXPECT_EQ(wanted(), "all but xy");
}

TEST_F(Excluding, IncludesWhatIsWantedWhenItsTimeIsOver) {
  wait(250s);
  include("a");
  wait(10s);
  EXPECT_EQ(wanted(), "only a");
}

struct Old : Table {};

TEST_F(Old, HostsJoinAndLeave) {
  apply(RecordType::is_exclude, "", Level::leaves);
  EXPECT_EQ(wanted(), "all but ");
  apply(RecordType::to_include, "", Level::leaves);
  EXPECT_EQ(asks(), "* ");
  wait(1s);
  EXPECT_EQ(asked, "* * ");
  EXPECT_EQ(wanted(), "all but ");
  wait(1s);
  EXPECT_EQ(wanted(), "nothing");
}

TEST_F(Old, HostsKnowNoSources) {
  apply(RecordType::is_exclude, "", Level::leaves);
  apply(RecordType::block, "a");
  apply(RecordType::to_exclude, "b");
  wait(10s);
  EXPECT_EQ(wanted(), "all but ");
  // Nobody says that one is still there.
  wait(200s);
  apply(RecordType::is_exclude, "");
  wait(50s);
  apply(RecordType::block, "a");
  wait(10s);
  EXPECT_EQ(wanted(), "all but a");
}

TEST_F(Old, HostsCannotLeave) {
  apply(RecordType::is_exclude, "", Level::joins);
  apply(RecordType::to_include, "", Level::leaves);
  apply(RecordType::to_include, "", Level::sources);
  EXPECT_EQ(asks(), "");
  wait(259s);
  EXPECT_EQ(wanted(), "all but ");
  wait(1s);
  EXPECT_EQ(wanted(), "nothing");
}

TEST_F(Old, VersionsAreReadOfNewReports) {
  reading.level = Level::leaves;
  apply(RecordType::is_include, "");
  apply(RecordType::allow, "");
  apply(RecordType::block, "a");
  EXPECT_EQ(wanted(), "nothing");
  apply(RecordType::allow, "a");
  EXPECT_EQ(wanted(), "all but ");
  apply(RecordType::is_exclude, "ab");
  apply(RecordType::to_exclude, "ab");
  apply(RecordType::to_include, "ab");
  EXPECT_EQ(asks(), "");
  EXPECT_EQ(wanted(), "all but ");
  apply(RecordType::to_include, "");
  EXPECT_EQ(asks(), "* ");
  reading.level = Level::joins;
  apply(RecordType::is_exclude, "");
  apply(RecordType::to_include, "");
  EXPECT_EQ(asks(), "");
}

TEST_F(Table, WhoListsTooManyGetsAll) {
  reading.most_sources = 2;
  include("ab");
  EXPECT_EQ(wanted(), "only ab");
  apply(RecordType::allow, "c");
  EXPECT_EQ(wanted(), "all but ");
  wait(259s);
  include("abc");
  wait(259s);
  EXPECT_EQ(wanted(), "all but ");
  apply(RecordType::to_include, "");
  wait(2s);
  EXPECT_EQ(wanted(), "nothing");
}

TEST_F(Table, NothingIsOver) {
  EXPECT_EQ(wanted(), "nothing");
  apply(RecordType::to_include, "");
  apply(RecordType::block, "ab");
  EXPECT_EQ(wanted(), "nothing");
  EXPECT_EQ(asks(), "");
}

TEST(Levels, AreWhatVersionsCanSay) {
  EXPECT_EQ(level_of(Family::ipv4, 1), Level::joins);
  EXPECT_EQ(level_of(Family::ipv4, 2), Level::leaves);
  EXPECT_EQ(level_of(Family::ipv4, 3), Level::sources);
  EXPECT_EQ(level_of(Family::ipv6, 1), Level::leaves);
  EXPECT_EQ(level_of(Family::ipv6, 2), Level::sources);
}

}  // namespace
}  // namespace simhost::multicast
