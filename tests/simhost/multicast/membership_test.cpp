// Histories of a switch: who joins, leaves, falls silent; routers; what is asked, and when.
#include "planes/openvswitch/multicast/membership.h"

#include <gmock/gmock.h>

#include <random>
#include <string>

#include "group_addresses.h"
#include "naive_membership.h"

namespace simhost::multicast {
namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

constexpr Place kFirst{.port = 1, .vlan = 7};
constexpr Place kSecond{.port = 2, .vlan = 7};
constexpr Place kElsewhere{.port = 1, .vlan = 8};
std::string const kGroup = "239.1.1.1";

Options heard() {
  return {.igmp = {.is_heard = true, .version = 3, .most_sources = 10},
          .mld = {.is_heard = true, .version = 2, .most_sources = 10},
          .robustness = 2,
          .interval = 125s};
}

Message report(unsigned version, RecordType type, std::string const &group,
               std::vector<Address> const &sources = {}) {
  auto const to = address(group);
  return {.source = {.family = to.family},
          .content = Report{.version = version,
                            .records = {{.type = type, .group = to, .sources = sources}}}};
}
Message joins(std::string const &group) {
  return report(2, RecordType::is_exclude, group);
}
Message leaves(std::string const &group) {
  return report(2, RecordType::to_include, group);
}
Message query(std::string const &source, std::chrono::seconds interval = 0s) {
  return {.source = address(source),
          .content = Query{.version = 3,
                           .response = 10s,
                           .robustness = interval == 0s ? 0U : 2U,
                           .interval = interval}};
}

struct Switch : testing::Test {
  Switch() {
    membership.set_options(heard(), now);
    membership.set_places({kFirst, kSecond, kElsewhere}, now);
  }

  void receive(Place const &place, Message const &message) {
    membership.receive(place, message, now);
  }
  // As a caller does: it looks when something is due, and not before.
  void wait(Time time) {
    auto const end = now + time;
    for (auto due = membership.next(); due && *due <= end; due = membership.next()) {
      now = std::max(now, *due);
      look();
    }
    now = end;
  }
  void look() {
    for (auto &one : membership.advance(now)) {
      asked.push_back(std::move(one));
    }
  }
  // Past what is asked of new places.
  void settle() {
    wait(100s);
    asked.clear();
  }
  [[nodiscard]] std::vector<std::uint32_t> members(Address const &group,
                                                   std::uint16_t vlan = 7) const {
    std::vector<std::uint32_t> all;
    for (auto const &one : membership.groups().groups) {
      if (one.address == group && one.vlan == vlan) {
        for (auto const &member : one.members) {
          all.push_back(member.port);
        }
      }
    }
    return all;
  }
  [[nodiscard]] std::vector<std::uint32_t> members() const { return members(address(kGroup)); }

  Membership membership;
  Time now = 5000s;
  std::vector<Asked> asked;
};

TEST_F(Switch, KnowsItsMembersByVlan) {
  receive(kSecond, joins(kGroup));
  receive(kFirst, joins(kGroup));
  receive(kElsewhere, joins("ff15::101"));
  EXPECT_THAT(members(), ElementsAre(1, 2));
  EXPECT_THAT(members(address("ff15::101")), IsEmpty());
  EXPECT_THAT(members(address("ff15::101"), 8), ElementsAre(1));
}

TEST_F(Switch, HearsNobodyWhoIsNotThere) {
  receive({.port = 3, .vlan = 7}, joins(kGroup));
  receive({.port = 1, .vlan = 9}, query("10.0.0.1"));
  EXPECT_THAT(membership.groups().groups, IsEmpty());
  EXPECT_THAT(membership.groups().routers, IsEmpty());
}

TEST_F(Switch, KnowsNoMembersOfGroupsThatAreForAll) {
  receive(kFirst, joins("224.0.0.251"));
  receive(kFirst, joins("ff02::1:ff00:1"));
  EXPECT_THAT(membership.groups().groups, IsEmpty());
}

TEST_F(Switch, ForgetsMembersThatAreSilent) {
  receive(kFirst, joins(kGroup));
  wait(200s);
  receive(kSecond, joins(kGroup));
  wait(60s - 1ms);
  EXPECT_THAT(members(), ElementsAre(1, 2));
  wait(1ms);
  EXPECT_THAT(members(), ElementsAre(2));
  wait(200s);
  EXPECT_THAT(membership.groups().groups, IsEmpty());
}

TEST_F(Switch, AsksWhereAMemberLeaves) {
  receive(kFirst, joins(kGroup));
  receive(kSecond, joins(kGroup));
  settle();
  receive(kFirst, leaves(kGroup));
  look();
  Asked const about{.place = kFirst,
                    .family = Family::ipv4,
                    .query = {.version = 3,
                              .group = address(kGroup),
                              .response = 1s,
                              .robustness = 2,
                              .interval = 125s}};
  EXPECT_THAT(asked, ElementsAre(about));
  wait(2s);
  EXPECT_THAT(asked, ElementsAre(about, about));
  EXPECT_THAT(members(), ElementsAre(2));
}

TEST_F(Switch, KeepsAMemberThatReplies) {
  receive(kFirst, joins(kGroup));
  receive(kFirst, leaves(kGroup));
  wait(1s);
  receive(kFirst, joins(kGroup));
  wait(100s);
  EXPECT_THAT(members(), ElementsAre(1));
}

TEST_F(Switch, AsksForSources) {
  auto const one = address("10.0.0.9");
  auto const other = address("10.0.0.10");
  receive(kFirst, report(3, RecordType::allow, kGroup, {one, other}));
  settle();
  receive(kFirst, report(3, RecordType::block, kGroup, {one}));
  look();
  ASSERT_THAT(asked, SizeIs(1));
  EXPECT_THAT(asked[0].query.sources, ElementsAre(one));
  wait(2s);
  EXPECT_EQ(membership.joined(1).at(address(kGroup)).sources,
            (Sources{.are_excluded = false, .listed = {other}}));
}

TEST_F(Switch, AsksNewPlacesAtOnceAndAllAgainAndAgain) {
  look();
  Query const first{.version = 3, .response = 1s, .robustness = 2, .interval = 125s};
  auto later = first;
  later.response = 10s;
  auto of_ipv6 = first;
  of_ipv6.version = 2;
  ASSERT_THAT(asked, SizeIs(6));
  EXPECT_EQ(asked[0], (Asked{kFirst, Family::ipv4, first}));
  EXPECT_EQ(asked[1], (Asked{kFirst, Family::ipv6, of_ipv6}));
  EXPECT_EQ(asked[2].place, kElsewhere);
  EXPECT_EQ(asked[4].place, kSecond);
  asked.clear();
  wait(31250ms);
  ASSERT_THAT(asked, SizeIs(6));
  EXPECT_EQ(asked[0].query, first);
  asked.clear();
  wait(125s - 1ms);
  EXPECT_THAT(asked, IsEmpty());
  wait(1ms);
  ASSERT_THAT(asked, SizeIs(6));
  EXPECT_EQ(asked[0].query, later);
  asked.clear();
  membership.set_places({kFirst, kSecond, kElsewhere, {.port = 9, .vlan = 7}}, now);
  look();
  ASSERT_THAT(asked, SizeIs(2));
  EXPECT_EQ(asked[0].place, (Place{.port = 9, .vlan = 7}));
}

TEST_F(Switch, KnowsWhoHadNoTimeYet) {
  EXPECT_THAT(membership.groups().undecided, ElementsAre(kFirst, kElsewhere, kSecond));
  auto const before = membership.revision();
  wait(2s - 1ms);
  EXPECT_THAT(membership.groups().undecided, SizeIs(3));
  EXPECT_EQ(membership.revision(), before);
  wait(1ms);
  EXPECT_THAT(membership.groups().undecided, IsEmpty());
  EXPECT_NE(membership.revision(), before);
}

TEST_F(Switch, AsksInTheVersionsOfItsOptions) {
  auto options = heard();
  options.igmp.version = 1;
  options.mld.version = 1;
  membership.set_options(options, now);
  receive(kFirst, joins(kGroup));
  receive(kFirst, report(1, RecordType::is_exclude, "ff15::101"));
  settle();
  receive(kFirst, leaves(kGroup));
  receive(kFirst, report(1, RecordType::to_include, "ff15::101"));
  look();
  ASSERT_THAT(asked, SizeIs(1));
  EXPECT_EQ(asked[0].query.version, 1);
  EXPECT_EQ(asked[0].query.group, address("ff15::101"));
  wait(10s);
  EXPECT_THAT(members(), ElementsAre(1));
  EXPECT_THAT(members(address("ff15::101")), IsEmpty());
}

TEST_F(Switch, HearsOneFamilyAlone) {
  auto options = heard();
  options.mld.is_heard = false;
  membership.set_options(options, now);
  receive(kFirst, joins(kGroup));
  receive(kFirst, joins("ff15::101"));
  receive(kFirst, query("fe80::1"));
  EXPECT_THAT(members(), ElementsAre(1));
  EXPECT_THAT(members(address("ff15::101")), IsEmpty());
  EXPECT_THAT(membership.groups().routers, IsEmpty());
  look();
  EXPECT_THAT(asked, SizeIs(3));
}

TEST_F(Switch, IsSilentWhenItHearsNobody) {
  receive(kFirst, joins(kGroup));
  membership.set_options({}, now);
  EXPECT_EQ(membership.groups(), Groups{});
  EXPECT_EQ(membership.next(), std::nullopt);
  receive(kFirst, joins(kGroup));
  EXPECT_EQ(membership.groups(), Groups{});
}

TEST_F(Switch, BeginsAnewWithOtherOptions) {
  receive(kFirst, joins(kGroup));
  settle();
  membership.set_options(heard(), now);
  EXPECT_THAT(members(), ElementsAre(1));
  auto options = heard();
  options.interval = 60s;
  membership.set_options(options, now);
  EXPECT_THAT(members(), IsEmpty());
  EXPECT_THAT(membership.groups().undecided, SizeIs(3));
  look();
  EXPECT_THAT(asked, SizeIs(6));
}

TEST_F(Switch, ForgetsPlacesThatAreGone) {
  receive(kFirst, joins(kGroup));
  receive(kSecond, joins(kGroup));
  receive(kElsewhere, joins("239.2.2.2"));
  receive(kFirst, query("10.0.0.1"));
  membership.set_places({kSecond, kElsewhere}, now);
  EXPECT_THAT(members(), ElementsAre(2));
  EXPECT_THAT(members(address("239.2.2.2"), 8), ElementsAre(1));
  EXPECT_THAT(membership.groups().routers, IsEmpty());
  wait(1000s);
  EXPECT_THAT(membership.groups().groups, IsEmpty());
}

TEST_F(Switch, KnowsRoutersByTheirQueries) {
  receive(kFirst, query("10.0.0.1", 60s));
  receive(kSecond, query("fe80::1"));
  Router const of_ipv4{.place = kFirst, .family = Family::ipv4};
  Router const of_ipv6{.place = kSecond, .family = Family::ipv6};
  EXPECT_THAT(membership.groups().routers, ElementsAre(of_ipv4, of_ipv6));
  wait(130s - 1ms);
  EXPECT_THAT(membership.groups().routers, ElementsAre(of_ipv4, of_ipv6));
  wait(1ms);
  EXPECT_THAT(membership.groups().routers, ElementsAre(of_ipv6));
  wait(130s);
  EXPECT_THAT(membership.groups().routers, IsEmpty());
}

TEST_F(Switch, TakesNoSwitchForARouter) {
  receive(kFirst, query("0.0.0.0"));
  EXPECT_THAT(membership.groups().routers, IsEmpty());
}

TEST_F(Switch, KnowsRoutersThatSaySo) {
  Message const hello{.source = address("10.0.0.1"), .content = RouterHello{.hold = 60s}};
  receive(kFirst, hello);
  wait(59s);
  receive(kFirst, hello);
  wait(59s);
  EXPECT_THAT(membership.groups().routers, SizeIs(1));
  receive(kFirst, {.source = address("10.0.0.1"), .content = RouterHello{}});
  EXPECT_THAT(membership.groups().routers, IsEmpty());
}

TEST_F(Switch, SaysWhatAPortJoined) {
  receive(kFirst, joins(kGroup));
  now += 10s;
  receive(kElsewhere, report(2, RecordType::is_include, "ff15::101", {address("2001:db8::9")}));
  EXPECT_EQ(membership.joined(1),
            (std::map<Address, Joined>{
                {address(kGroup),
                 {.version = 2, .sources = {.are_excluded = true}, .reported = now - 10s}},
                {address("ff15::101"),
                 {.version = 2, .sources = {.listed = {address("2001:db8::9")}}, .reported = now}},
            }));
  EXPECT_THAT(membership.joined(2), IsEmpty());
}

TEST_F(Switch, ChangesNothingWithReportsThatSayTheSame) {
  receive(kFirst, joins(kGroup));
  settle();
  auto const before = membership.revision();
  receive(kFirst, joins(kGroup));
  receive(kFirst, query("0.0.0.0"));
  receive(kFirst, leaves("239.9.9.9"));
  wait(100s);
  receive(kFirst, joins(kGroup));
  wait(200s);
  EXPECT_EQ(membership.revision(), before);
}

TEST_F(Switch, KnowsNoMoreGroupsThanItMay) {
  auto const group = [](std::size_t number) {
    return "239.1." + std::to_string(number / 256) + "." + std::to_string(number % 256);
  };
  for (std::size_t number = 0; number < Membership::kMostGroups + 5; ++number) {
    receive(kFirst, joins(group(number)));
  }
  EXPECT_THAT(membership.joined(1), SizeIs(Membership::kMostGroups));
  receive(kElsewhere, joins(kGroup));
  EXPECT_THAT(members(address(kGroup), 8), ElementsAre(1));
  receive(kFirst, leaves(group(0)));
  wait(2s);
  receive(kFirst, joins("239.200.0.1"));
  EXPECT_THAT(members(address("239.200.0.1")), ElementsAre(1));
}

TEST_F(Switch, BearsManyMembers) {
  std::set<Place> places;
  for (std::uint32_t port = 1; port <= 100; ++port) {
    places.insert({.port = port, .vlan = 7});
  }
  membership.set_places(places, now);
  for (int round = 0; round < 3; ++round) {
    for (auto const &place : places) {
      for (int number = 0; number < 1000; ++number) {
        receive(place, joins("239.1." + std::to_string(number / 250) + "." +
                             std::to_string(number % 250)));
      }
    }
    wait(100s);
  }
  auto const groups = membership.groups().groups;
  ASSERT_THAT(groups, SizeIs(1000));
  EXPECT_THAT(groups.front().members, SizeIs(100));
  wait(260s);
  EXPECT_THAT(membership.groups().groups, IsEmpty());
}

class Histories : public testing::TestWithParam<unsigned> {};

TEST_P(Histories, AreTheSameToTheTables) {
  constexpr Time kTick = 250ms;
  Options options = heard();
  options.interval = 4s;
  options.igmp.most_sources = options.mld.most_sources = 100;
  std::set<Place> const places{kFirst, kSecond, kElsewhere};
  Membership membership;
  Time now = 77s;
  membership.set_options(options, now);
  membership.set_places(places, now);
  NaiveMembership naive(2 * 4s + 2s, 2 * 1s);
  std::mt19937 random(GetParam());
  auto const any = [&](unsigned count) { return static_cast<unsigned>(random() % count); };
  for (int step = 0; step < 3000; ++step) {
    if (any(3) == 0) {
      auto const place = *std::next(places.begin(), any(3));
      auto const *const prefix = any(2) == 0 ? "10.0.0." : "2001:db8::";
      bool const is_ipv4 = *prefix == '1';
      Record record{.type = static_cast<RecordType>(1 + any(6)),
                    .group = address(is_ipv4 ? "239.1.1.1" : "ff15::101")};
      for (unsigned number = 1; number <= 5; ++number) {
        if (any(3) == 0) {
          record.sources.push_back(address(prefix + std::to_string(number)));
        }
      }
      membership.receive(place,
                         {.source = {.family = record.group.family},
                          .content = Report{.version = is_ipv4 ? 3U : 2U, .records = {record}}},
                         now);
      naive.receive(place, record);
      ASSERT_EQ(membership.groups().groups, naive.groups()) << step;
    }
    now += kTick;
    naive.pass(kTick);
    auto const before = membership.groups().groups;
    auto const revision = membership.revision();
    if (auto const due = membership.next(); due && *due <= now) {
      membership.advance(now);
    }
    ASSERT_EQ(membership.groups().groups, naive.groups()) << step;
    if (membership.groups().groups != before) {
      ASSERT_NE(membership.revision(), revision) << step;
    }
  }
}

INSTANTIATE_TEST_SUITE_P(Seeds, Histories, testing::Range(0U, 20U));

}  // namespace
}  // namespace simhost::multicast
