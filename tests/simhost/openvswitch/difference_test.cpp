// What has to be told to a switch, and what has to be left alone.
#include "planes/openvswitch/reconcile/difference.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <iterator>
#include <map>
#include <memory>
#include <random>
#include <set>
#include <utility>
#include <vector>

#include "planes/openvswitch/openflow/text.h"
#include "planes/openvswitch/reconcile/present.h"
#include "planes/openvswitch/reconcile/relearning.h"

namespace {

using simhost::openflow::Field;
using simhost::openflow::Flow;
using simhost::openflow::Group;
using simhost::openflow::Learn;
using simhost::openflow::Output;
using simhost::openvswitch::Difference;
using simhost::openvswitch::difference;
using simhost::openvswitch::LearnedFlows;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::UnorderedElementsAreArray;
using Flows = std::vector<Flow>;
using Groups = std::vector<Group>;

Flow flow(std::uint8_t table, std::uint16_t port, std::uint32_t out, std::uint64_t cookie = 0) {
  Flow made;
  made.table = table;
  made.priority = 10;
  made.cookie = cookie;
  made.actions = {Output{.port = out}};
  made.match.with(simhost::openflow::Field::in_port, port);
  return made;
}

Group group(std::uint32_t id, std::uint32_t out) {
  return {.id = id,
          .type = simhost::openflow::GroupType::fast_failover,
          .buckets = {{.watch_port = out, .actions = {Output{.port = out}}}}};
}

TEST(ADifference, OfTheSameIsEmpty) {
  Flows const flows{flow(0, 1, 2), flow(0, 2, 1), flow(3, 1, 1)};
  Groups const groups{group(1, 1), group(2, 2)};
  EXPECT_TRUE(difference(flows, groups, flows, groups).empty());
}

TEST(ADifference, LeavesFlowsAloneThatNobodyChanges) {
  auto const all = difference(Flows{flow(0, 1, 2), flow(0, 2, 1)}, Groups{},
                              Flows{flow(0, 1, 2), flow(0, 3, 1)}, Groups{});
  EXPECT_THAT(all.added_flows, ElementsAre(flow(0, 3, 1)));
  EXPECT_THAT(all.removed_flows, ElementsAre(flow(0, 2, 1)));
  EXPECT_THAT(all.changed_flows, IsEmpty());
}

TEST(ADifference, ChangesActionsInPlaceSoThatCountersStay) {
  auto const all = difference(Flows{flow(0, 1, 2, 7)}, Groups{}, Flows{flow(0, 1, 3, 7)}, Groups{});
  EXPECT_THAT(all.changed_flows, ElementsAre(flow(0, 1, 3, 7)));
  EXPECT_THAT(all.added_flows, IsEmpty());
  EXPECT_THAT(all.removed_flows, IsEmpty());
}

TEST(ADifference, PutsAnotherFlowInPlaceOfOneThatCountsForSomethingElse) {
  auto const all = difference(Flows{flow(0, 1, 2, 7)}, Groups{}, Flows{flow(0, 1, 2, 8)}, Groups{});
  EXPECT_THAT(all.added_flows, ElementsAre(flow(0, 1, 2, 8)));
  EXPECT_THAT(all.changed_flows, IsEmpty());
  EXPECT_THAT(all.removed_flows, IsEmpty());
}

TEST(ADifference, TellsGroupsApartByTheirNumbers) {
  auto const all = difference(Flows{}, Groups{group(1, 1), group(2, 2), group(3, 3)}, Flows{},
                              Groups{group(2, 5), group(3, 3), group(4, 4)});
  EXPECT_THAT(all.added_groups, ElementsAre(group(4, 4)));
  EXPECT_THAT(all.changed_groups, ElementsAre(group(2, 5)));
  EXPECT_THAT(all.removed_groups, ElementsAre(1));
}

// Teaches where a frame's source is.
Flow teacher(std::uint32_t place, std::uint16_t hard_timeout) {
  auto teaches = flow(3, 1, 2);
  Learn learn{.table = 6, .cookie = 7, .hard_timeout = hard_timeout, .specs = {}};
  learn.specs.emplace_back(
      simhost::openflow::LearnedMatch{.field = simhost::openflow::whole(Field::eth_dst),
                                      .content = simhost::openflow::whole(Field::eth_src)});
  learn.specs.emplace_back(simhost::openflow::LearnedLoad{
      .destination = simhost::openflow::whole(Field::reg6), .content = place});
  teaches.actions = {learn};
  return teaches;
}

Flow learned_flow(std::uint64_t source, std::uint32_t place) {
  Flow learned{.table = 6, .cookie = 7, .hard_timeout = 300};
  learned.match.with(Field::eth_dst, source);
  learned.actions = {simhost::openflow::set(Field::reg6, place)};
  return learned;
}

TEST(ADifference, LeavesWhatWasLearnedByWantedFlowsAlone) {
  auto teaches = teacher(1, 300);
  teaches.actions = {simhost::openflow::Clone{teaches.actions}};
  auto const learned = learned_flow(9, 1);
  // How long it may stay was said otherwise when it was learned.
  auto for_ever = learned_flow(8, 1);
  for_ever.hard_timeout = 0;
  auto of_another = learned_flow(7, 1);
  of_another.cookie = 8;
  auto elsewhere = learned_flow(7, 1);
  elsewhere.table = 5;
  auto before_all = learned_flow(7, 1);
  before_all.priority = 6;
  auto of_more = learned_flow(7, 1);
  of_more.match.with(Field::in_port, 1);
  auto of_all = learned_flow(7, 1);
  of_all.match = {};
  auto const that_says_otherwise = learned_flow(6, 2);
  Flows const foreign{of_another, elsewhere, before_all, of_more, of_all, that_says_otherwise};
  Flows present{teaches, learned, for_ever};
  present.insert(present.end(), foreign.begin(), foreign.end());
  std::ranges::sort(present);
  auto const all = difference(present, Groups{}, Flows{teaches}, Groups{});
  EXPECT_THAT(all.removed_flows, UnorderedElementsAreArray(foreign));
  EXPECT_THAT(all.forgotten, IsEmpty());
  // When nobody teaches it any more, it goes.
  EXPECT_THAT(difference(Flows{teaches, learned}, Groups{}, Flows{}, Groups{}).removed_flows,
              ElementsAre(teaches, learned));
}

TEST(ADifference, ForgetsWhatIsLearnedOtherwiseNow) {
  Flows const present{teacher(1, 300), learned_flow(9, 1)};
  auto const forgotten = [&](Flow const &wanted) {
    return difference(present, Groups{}, Flows{wanted}, Groups{}).forgotten;
  };
  EXPECT_THAT(forgotten(teacher(2, 300)), ElementsAre(LearnedFlows{.table = 6, .cookie = 7}));
  // How long it stays makes it nothing else.
  EXPECT_THAT(forgotten(teacher(1, 60)), IsEmpty());
  // All of it goes at once.
  EXPECT_THAT(difference(present, Groups{}, Flows{teacher(2, 300)}, Groups{}).removed_flows,
              IsEmpty());
}

TEST(WhatIsThere, DiffersFromAllThatIsWantedIfItSaysMore) {
  using simhost::openflow::FlowEntry;
  using simhost::openvswitch::present_of;
  auto const read = [](Flow const &flow, std::string foreign = "", bool has_match = true) {
    FlowEntry entry;
    entry.flow = flow;
    entry.foreign = std::move(foreign);
    entry.has_match = has_match;
    return entry;
  };
  auto drops = flow(1, 1, 1);
  drops.actions = {};
  auto const two = flow(2, 1, 1, 5);
  auto const other = flow(2, 2, 1, 5);
  Flows const wanted{drops, two, other};
  std::vector<FlowEntry> const entries{read(drops, "instruction 3"), read(two),
                                       read(other, "a field", false)};
  simhost::openflow::GroupEntry entry;
  entry.group = group(1, 1);
  entry.foreign = "a property";
  auto const present = present_of(entries, std::vector{entry});
  auto const all = difference(present.flows, present.groups, wanted, Groups{group(1, 1)});
  EXPECT_THAT(all.changed_flows, ElementsAre(drops));
  EXPECT_THAT(all.changed_groups, ElementsAre(group(1, 1)));
  // Whatever is at places that nobody can say goes, and what has its cookie comes back.
  EXPECT_THAT(present.unplaced, ElementsAre(LearnedFlows{.table = 2, .cookie = 5}));
  EXPECT_THAT(all.added_flows, ElementsAre(two, other));
  EXPECT_THAT(all.removed_flows, IsEmpty());
}

TEST(WhatIsThere, HasItsGroupsInTheirOrder) {
  std::vector<simhost::openflow::GroupEntry> groups;
  for (auto const number : {2, 3, 1}) {
    groups.emplace_back().group = group(static_cast<std::uint32_t>(number), 4);
  }
  auto const present = simhost::openvswitch::present_of({}, groups);
  EXPECT_THAT(present.groups, ElementsAre(group(1, 4), group(2, 4), group(3, 4)));
}

TEST(WhatWasLearned, IsLearnedAnewAsItWouldBeNow) {
  using simhost::openvswitch::relearned;
  using simhost::openvswitch::Teachers;
  Learn learn{.table = 6, .priority = 5, .cookie = 7, .hard_timeout = 300, .specs = {}};
  learn.specs.emplace_back(
      simhost::openflow::LearnedMatch{.field = simhost::openflow::whole(Field::eth_dst),
                                      .content = simhost::openflow::whole(Field::eth_src)});
  learn.specs.emplace_back(
      simhost::openflow::LearnedMatch{.field = simhost::openflow::part(Field::reg4, 0, 11),
                                      .content = simhost::openflow::Value{7}});
  learn.specs.emplace_back(
      simhost::openflow::LearnedLoad{.destination = simhost::openflow::whole(Field::reg6),
                                     .content = simhost::openflow::Value{3}});
  Flow before;
  before.match.with(Field::eth_dst, 0x020000000001).with(Field::reg4, 1, 0xfff);
  auto const after = relearned(learn, before);
  ASSERT_TRUE(after);
  EXPECT_EQ(to_text(*after),
            "cookie=0x7, table=6, hard_timeout=300, priority=5,reg4=0x7/0xfff,"
            "dl_dst=02:00:00:00:00:01 actions=set_field:0x3->reg6");
  // One that does not tell whom it is about tells too little.
  EXPECT_FALSE(relearned(learn, Flow()));

  auto teaches = flow(3, 1, 2);
  teaches.actions = {learn};
  Flows const one{teaches};
  LearnedFlows const asked{.table = 6, .cookie = 7};
  EXPECT_EQ(Teachers(one).how_learned(asked), learn);
  EXPECT_EQ(Teachers(one, {asked}).how_learned(asked), learn);
  EXPECT_FALSE(Teachers(one).how_learned({.table = 6, .cookie = 8}));
  auto other = learn;
  auto teaches_too = teaches;
  auto const how_two_teach = [&] {
    Flows const two{teaches, teaches_too};
    return Teachers(two).how_learned({.table = 6, .cookie = 7});
  };
  other.limit = 4096;
  teaches_too.actions = {other};
  EXPECT_EQ(how_two_teach(), learn);
  other.hard_timeout = 20;
  teaches_too.actions = {other};
  EXPECT_FALSE(how_two_teach());
}

// A switch that does what it is told.
Flows applied(Flows flows, Difference const &told) {
  auto const drop = [&](Flow const &gone) {
    std::erase_if(flows, [&](Flow const &one) { return place(one) == place(gone); });
  };
  for (auto const &added : told.added_flows) {
    drop(added);
    flows.push_back(added);
  }
  for (auto const &changed : told.changed_flows) {
    auto const found =
        std::ranges::find_if(flows, [&](Flow const &one) { return place(one) == place(changed); });
    EXPECT_TRUE(found != flows.end());
    found->actions = changed.actions;
  }
  std::ranges::for_each(told.removed_flows, drop);
  std::ranges::sort(flows);
  return flows;
}

// One of a few ways to teach the flows of a few cookies in table 3.
Learn drawn_learn(std::mt19937 &chance) {
  Learn learn{.table = 3,
              .priority = 10,
              .cookie = chance() % 3,
              .hard_timeout = static_cast<std::uint16_t>(chance() % 2),
              .specs = {}};
  learn.specs.emplace_back(
      simhost::openflow::LearnedMatch{.field = simhost::openflow::whole(Field::in_port),
                                      .content = simhost::openflow::whole(Field::in_port)});
  learn.specs.emplace_back(simhost::openflow::LearnedLoad{
      .destination = simhost::openflow::whole(Field::reg6), .content = 1 + chance() % 2});
  return learn;
}

Flows drawn(std::mt19937 &chance) {
  Flows flows;
  for (std::uint8_t table = 0; table < 3; ++table) {
    for (std::uint16_t port = 1; port < 5; ++port) {
      if (chance() % 3 == 0) {
        continue;
      }
      flows.push_back(flow(table, port, chance() % 2, chance() % 2));
      if (chance() % 3 == 0) {
        flows.back().actions.emplace_back(drawn_learn(chance));
      }
    }
  }
  return flows;
}

// What one of them may have learned, and what not.
Flows drawn_learned(std::mt19937 &chance) {
  Flows flows;
  for (std::uint16_t port = 1; port < 5; ++port) {
    flows.push_back(flow(3, port, 1, chance() % 3));
    flows.back().actions = {simhost::openflow::set(Field::reg6, chance() % 3)};
  }
  return flows;
}

using Taught = std::map<LearnedFlows, std::set<decltype(Learn::specs)>>;

Taught taught_by_all(Flows const &flows) {
  Taught taught;
  for (auto const &flow : flows) {
    for_each_learn(flow.actions, [&](Learn const &learn) {
      taught[simhost::openvswitch::taught_by(learn)].insert(learn.specs);
    });
  }
  return taught;
}

// Some of the flows of each in parts that both have.
struct InParts {
  simhost::openflow::FlowParts present;
  simhost::openflow::FlowParts wanted;
};

InParts in_parts(Flows const &present, Flows const &wanted, std::mt19937 &chance) {
  InParts in_parts;
  Flows only_present;
  Flows only_wanted;
  for (auto const &flow : present) {
    if (chance() % 2 == 0 && std::ranges::count(wanted, flow) > 0) {
      auto const part = std::make_shared<Flows const>(Flows{flow});
      in_parts.present.add(part);
      in_parts.wanted.add(part);
    } else {
      only_present.push_back(flow);
    }
  }
  auto const is_there = [](simhost::openflow::FlowParts const &flows, Flow const &flow) {
    return std::ranges::count(flows, flow) > 0;
  };
  std::ranges::copy_if(wanted, std::back_inserter(only_wanted),
                       [&](Flow const &flow) { return !is_there(in_parts.wanted, flow); });
  std::ranges::shuffle(only_present, chance);
  std::ranges::shuffle(only_wanted, chance);
  in_parts.present.add(std::make_shared<Flows const>(std::move(only_present)));
  in_parts.wanted.add(std::make_shared<Flows const>(std::move(only_wanted)));
  return in_parts;
}

TEST(ADifference, IsTheSameHoweverFlowsArePutInParts) {
  std::mt19937 chance(3);  // NOLINT(cert-msc32-c,cert-msc51-cpp): the same in each run
  for (int round = 0; round < 500; ++round) {
    auto const present = drawn(chance);
    auto wanted = present;
    std::ranges::copy(drawn(chance), std::back_inserter(wanted));
    std::ranges::sort(wanted);
    auto const again =
        std::unique(wanted.begin(), wanted.end(),
                    [](Flow const &one, Flow const &other) { return place(one) == place(other); });
    wanted.erase(again, wanted.end());
    auto const whole = difference(present, Groups{}, wanted, Groups{});
    auto const parts = in_parts(present, wanted, chance);
    EXPECT_EQ(in_order(parts.wanted), wanted);
    auto const all = difference(parts.present, Groups{}, parts.wanted, Groups{});
    ASSERT_EQ(all.forgotten, whole.forgotten) << "in round " << round;
    ASSERT_EQ(all.added_flows, whole.added_flows) << "in round " << round;
    ASSERT_EQ(all.changed_flows, whole.changed_flows) << "in round " << round;
    ASSERT_EQ(all.removed_flows, whole.removed_flows) << "in round " << round;
  }
}

TEST(ADifference, LeadsFromAnyFlowsToAnyOthers) {
  std::mt19937 chance(1);  // NOLINT(cert-msc32-c,cert-msc51-cpp): the same in each run
  for (int round = 0; round < 500; ++round) {
    auto const present = drawn(chance);
    auto const wanted = drawn(chance);
    auto const reached = applied(present, difference(present, Groups{}, wanted, Groups{}));
    ASSERT_EQ(reached, wanted) << "in round " << round;
  }
}

TEST(ADifference, KeepsWhatIsTaughtAsBeforeAndForgetsWhatIsTaughtOtherwise) {
  std::mt19937 chance(2);  // NOLINT(cert-msc32-c,cert-msc51-cpp): the same in each run
  for (int round = 0; round < 500; ++round) {
    auto present = drawn(chance);
    std::ranges::copy(drawn_learned(chance), std::back_inserter(present));
    auto const wanted = drawn(chance);
    auto const all = difference(present, Groups{}, wanted, Groups{});
    auto const after = taught_by_all(wanted);
    std::vector<LearnedFlows> forgotten;
    for (auto const &[flows, ways] : taught_by_all(present)) {
      auto const found = after.find(flows);
      if (found != after.end() && !std::ranges::includes(found->second, ways)) {
        forgotten.push_back(flows);
      }
    }
    ASSERT_EQ(all.forgotten, forgotten) << "in round " << round;
    simhost::openvswitch::Teachers const teachers(wanted);
    Flows removed;
    for (auto const &flow : present) {
      bool const is_wanted = std::ranges::any_of(
          wanted, [&](Flow const &other) { return place(other) == place(flow); });
      bool const is_forgotten =
          std::ranges::count(forgotten, simhost::openvswitch::cookie_of(flow)) > 0;
      if (!is_wanted && !is_forgotten && !teachers.teach(flow)) {
        removed.push_back(flow);
      }
    }
    ASSERT_EQ(all.removed_flows, removed) << "in round " << round;
  }
}

}  // namespace
