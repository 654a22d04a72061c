// Which changes a switch takes or refuses alike.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "planes/openvswitch/openflow/form.h"

namespace simhost::openflow {
namespace {

std::string form_of_flow(Flow const &flow, FlowCommand command = FlowCommand::add) {
  return form_of(FlowChange{.command = command, .flow = flow});
}

std::string form_of_actions(Actions const &actions) {
  return form_of_flow({.actions = actions});
}

std::string form_of_match(Match const &match) {
  return form_of_flow({.match = match});
}

Learn learning(Value number) {
  return {.table = 32,
          .cookie = static_cast<std::uint64_t>(number),
          .limit = 5,
          .result = bit(Field::reg1, 0),
          .specs = {LearnedMatch{whole(Field::eth_dst), whole(Field::eth_src)},
                    LearnedMatch{part(Field::reg4, 0, 11), number},
                    LearnedLoad{part(Field::reg2, 0, 15), number}}};
}

Flow numbered(std::uint16_t number) {
  return {.table = 1,
          .priority = 100,
          .match = Match()
                       .with(Field::in_port, number)
                       .with(Field::metadata, number)
                       .with(Field::reg1, number)
                       .with(Field::reg2, number & 1U, 0xfff)
                       .with(Field::eth_src, number)
                       .with(Field::eth_dst, number)
                       .vlan(number),
          .cookie = number,
          .actions = {set(Field::reg3, number), learning(number), Output{number},
                      set(Field::eth_dst, number), set(Field::vlan_vid, kVlanPresent | number),
                      Clone{{set(Field::reg3, number)}}}};
}

TEST(Form, IsTheSameForNumbersOfWhichAnyIsTaken) {
  EXPECT_EQ(form_of_flow(numbered(1)), form_of_flow(numbered(0xffe)));
}

TEST(Form, IsTheSameForWhatIsDoneSomeTimesMore) {
  Actions const once{PopVlan{}, set(Field::reg1, 1), Resubmit{2}, set(Field::reg1, 3), Resubmit{2}};
  auto more = once;
  more.push_back(set(Field::reg1, 4));
  more.push_back(Resubmit{2});
  EXPECT_EQ(form_of_actions(once), form_of_actions(more));
  more.resize(100, Resubmit{2});
  EXPECT_NE(form_of_actions(once), form_of_actions(more));
}

TEST(Form, IsAnotherOneForAnotherCommand) {
  EXPECT_NE(form_of_flow({}, FlowCommand::add), form_of_flow({}, FlowCommand::modify_strict));
  EXPECT_NE(form_of(GroupChange{.command = GroupCommand::add}),
            form_of(GroupChange{.command = GroupCommand::modify}));
  EXPECT_NE(form_of(GroupChange{}), form_of(FlowChange{}));
  EXPECT_NE(form_of(FlowChange{}), form_of(FlowChange{.cookie_mask = 1}));
}

TEST(Form, IsAnotherOneForAnotherFlow) {
  std::vector<Flow> const all{
      {},
      {.table = 1},
      {.priority = 1},
      {.cookie = ~std::uint64_t{0}},
      {.idle_timeout = 1},
      {.hard_timeout = 1},
      {.tells_removal = true},
  };
  for (auto const &one : all) {
    for (auto const &other : all) {
      EXPECT_EQ(form_of_flow(one) == form_of_flow(other), one == other);
    }
  }
}

TEST(Form, IsAnotherOneForAnotherMatch) {
  std::vector<Match> const all{
      Match(),
      Match().with(Field::in_port, 1),
      Match().with(Field::in_port, kLocal),
      Match().with(Field::reg1, 1),
      Match().with(Field::reg2, 1),
      Match().with(Field::reg1, 1, 1),
      Match().with(Field::reg1, 1).with(Field::reg2, 1),
      Match().with(Field::eth_type, 0x0800),
      Match().with(Field::eth_type, 0x86dd),
      Match().with(Field::eth_type, 0x0800).with(Field::ip_proto, 1),
      Match().with(Field::eth_type, 0x0800).with(Field::ip_proto, 2),
      Match().untagged(),
      Match().tagged(),
      Match().vlan(1),
      Match().vlan(1).with(Field::vlan_pcp, 1),
      Match().vlan(1).with(Field::vlan_pcp, 2),
  };
  for (auto const &one : all) {
    for (auto const &other : all) {
      EXPECT_EQ(form_of_match(one) == form_of_match(other), one == other);
    }
  }
}

TEST(Form, IsAnotherOneForOtherActions) {
  auto without_limit = learning(1);
  without_limit.limit = 0;
  auto without_result = learning(1);
  without_result.result.reset();
  auto from_frame = learning(1);
  from_frame.specs.back() = LearnedLoad{part(Field::reg2, 0, 15), part(Field::reg4, 0, 15)};
  std::vector<Actions> const all{
      {},
      {Output{1}},
      {Output{kLastOwn + 1}},
      {Output{kInPort}},
      {Output{kController}},
      {OutputFrom{whole(Field::reg1)}},
      {OutputFrom{whole(Field::reg2)}},
      {OutputTruncated{1, 64}},
      {OutputTruncated{1, 13}},
      {ToController{}},
      {ToGroup{1}},
      {ToGroup{2}},
      {ToMeter{1}},
      {ToMeter{1}, Output{1}},
      {ToMeter{1}, ToMeter{1}},
      {Resubmit{1}},
      {Resubmit{2}},
      {Resubmit{1, 2}},
      {PushVlan{0x8100}},
      {PushVlan{0x88a8}},
      {PopVlan{}},
      {PopVlan{}, PopVlan{}},
      {PopVlan{}, Output{1}},
      {Output{1}, PopVlan{}},
      {Output{1}, PopVlan{}, Output{1}},
      {set(Field::reg1, 1)},
      {set(Field::reg2, 1)},
      {set(Field::vlan_vid, kVlanPresent)},
      {set(Field::vlan_pcp, 1)},
      {set(Field::vlan_pcp, 2)},
      {load(part(Field::reg1, 0, 7), 1)},
      {Move{whole(Field::reg1), whole(Field::reg2)}},
      {Move{whole(Field::reg1), whole(Field::reg3)}},
      {learning(1)},
      {without_limit},
      {without_result},
      {from_frame},
      {Clone{{Output{1}}}},
      {Clone{{Output{1}, Output{1}, Output{1}}}},
      {Clone{{}}, Output{1}},
      {CheckPacketLarger{1, bit(Field::reg1, 0)}},
      {CheckPacketLarger{1, bit(Field::reg2, 0)}},
      {Note{{1}}},
  };
  for (auto const &one : all) {
    for (auto const &other : all) {
      EXPECT_EQ(form_of_actions(one) == form_of_actions(other), one == other);
    }
  }
}

TEST(Form, IsAnotherOneForAnotherGroup) {
  auto const form_of_group = [](Group const &group) {
    return form_of(GroupChange{.group = group});
  };
  Group const one{.id = 1, .buckets = {{.actions = {Output{1}}}}};
  auto other_number = one;
  other_number.id = 2;
  auto other_port = one;
  other_port.buckets.front().actions = {Output{2}};
  auto failing_over = one;
  failing_over.type = GroupType::fast_failover;
  auto hashing = one;
  hashing.type = GroupType::select;
  hashing.selection = {.method = "hash", .fields = {{Field::eth_dst, ones(48)}}};
  auto with_more_buckets = one;
  with_more_buckets.buckets.push_back({.id = 1, .actions = {Output{1}}});
  for (auto const &other : {other_number, other_port, failing_over, hashing, with_more_buckets}) {
    EXPECT_NE(form_of_group(one), form_of_group(other));
  }
}

TEST(KnownForms, IncludeChangesOfWhichEachHasOne) {
  KnownForms known;
  Changes const one{FlowChange{.flow = {.actions = {Output{1}}}}};
  Changes const other{FlowChange{.flow = {.actions = {Output{2}}}}};
  auto more = other;
  more.emplace_back(FlowChange{.flow = {.actions = {PopVlan{}}}});
  EXPECT_FALSE(known.include(one));
  known.add(one);
  EXPECT_TRUE(known.include(other));
  EXPECT_FALSE(known.include(more));
  EXPECT_TRUE(known.include({}));
}

Changes of_priority(std::uint16_t priority) {
  return {FlowChange{.flow = {.priority = priority}}};
}

TEST(KnownForms, AreNeverMoreThanSome) {
  constexpr std::uint16_t kMost = 4096;
  KnownForms known;
  for (std::uint16_t priority = 0; priority < kMost; ++priority) {
    known.add(of_priority(priority));
  }
  EXPECT_TRUE(known.include(of_priority(0)));
  known.add(of_priority(kMost));
  EXPECT_FALSE(known.include(of_priority(0)));
  EXPECT_TRUE(known.include(of_priority(kMost)));
}

TEST(KnownForms, AreNoneOfWhatIsLarge) {
  KnownForms known;
  Group large{.id = 1};
  for (std::uint32_t number = 0; number < 100; ++number) {
    large.buckets.push_back({.id = number, .actions = {Output{1}}});
  }
  Changes const of_group{GroupChange{.group = large}};
  known.add(of_group);
  EXPECT_FALSE(known.include(of_group));
  Changes const many(1000, FlowChange{});
  known.add(many);
  EXPECT_FALSE(known.include({FlowChange{}}));
}

}  // namespace
}  // namespace simhost::openflow
