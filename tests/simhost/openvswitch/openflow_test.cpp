// The OpenFlow client against a real switch, which ovs-ofctl reads as well.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <poll.h>

#include <algorithm>
#include <fstream>
#include <sstream>

#include "lab.h"
#include "planes/openvswitch/openflow/codec/requests.h"
#include "planes/openvswitch/openflow/connection.h"
#include "planes/openvswitch/openflow/form.h"
#include "planes/openvswitch/openflow/text.h"
#include "samples.h"

namespace simhost::openflow {
namespace {

using openvswitch::Bridge;
using openvswitch::Lab;
using openvswitch::soon;

Changes to_add(std::vector<Group> const &groups, std::vector<Flow> const &flows) {
  Changes changes;
  for (auto const &group : groups) {
    changes.emplace_back(GroupChange{GroupCommand::add, group});
  }
  for (auto const &flow : flows) {
    changes.emplace_back(FlowChange{FlowCommand::add, flow});
  }
  return changes;
}

template <typename Values>
std::vector<std::string> texts_of(Values const &values) {
  std::vector<std::string> texts;
  texts.reserve(values.size());
  for (auto const &value : values) {
    texts.push_back(to_text(value));
  }
  std::sort(texts.begin(), texts.end());
  return texts;
}

Flow flow_of_table(std::uint8_t table, Actions actions = {}) {
  Flow flow;
  flow.table = table;
  flow.actions = std::move(actions);
  return flow;
}

TEST(OpenFlow, MakesEveryFlowThatOvsOfctlReadsBack) {
  Bridge const bridge(2);
  Connection connection(bridge.socket(), soon());
  connection.change(to_add(sample_groups(), sample_flows()), soon());
  EXPECT_EQ(bridge.flows(), texts_of(sample_flows()));
  EXPECT_EQ(bridge.groups(), texts_of(sample_groups()));
}

TEST(OpenFlow, ReadsEveryFlowThatItMade) {
  Bridge const bridge(2);
  Connection connection(bridge.socket(), soon());
  connection.change(to_add(sample_groups(), sample_flows()), soon());
  std::vector<Flow> flows;
  for (auto const &entry : connection.flows({}, soon())) {
    EXPECT_EQ(entry.foreign, "") << to_text(entry.flow);
    flows.push_back(entry.flow);
  }
  EXPECT_EQ(texts_of(flows), texts_of(sample_flows()));
}

TEST(OpenFlow, ReadsEveryGroupThatItMade) {
  Bridge const bridge(2);
  Connection connection(bridge.socket(), soon());
  connection.change(to_add(sample_groups(), {}), soon());
  std::vector<Group> groups;
  for (auto const &entry : connection.groups(soon())) {
    EXPECT_EQ(entry.foreign, "") << to_text(entry.group);
    groups.push_back(entry.group);
  }
  std::sort(groups.begin(), groups.end());
  EXPECT_EQ(groups, sample_groups());
}

TEST(OpenFlow, SendsFramesThroughMeters) {
  Bridge const bridge;
  Lab::shared().ovs_ofctl(
      {"add-meter", "unix:" + bridge.socket().native(), "meter=5,kbps,band=type=drop,rate=1000"});
  Connection connection(bridge.socket(), soon());
  auto const flow = flow_of_table(1, {ToMeter{5}, Output{1}});
  connection.change(to_add({}, {flow}), soon());
  EXPECT_EQ(bridge.flows(), texts_of(std::vector{flow}));
  EXPECT_EQ(connection.flows({}, soon()).at(0).flow, flow);
}

TEST(OpenFlow, SaysWhatOfAFlowItCannotSay) {
  Bridge const bridge;
  auto &lab = Lab::shared();
  auto const add = [&](std::string const &flow) {
    lab.ovs_ofctl({"add-flow", "unix:" + bridge.socket().native(), flow});
  };
  add("table=1,in_port=5,actions=exit");
  add("table=2,mpls,mpls_label=5,actions=drop");
  add("table=3,in_port=5,actions=write_metadata:5");
  Connection connection(bridge.socket(), soon());
  auto const flows_of = [&](std::uint8_t table) { return connection.flows({table}, soon()).at(0); };
  EXPECT_EQ(flows_of(1).foreign, "action 17 of Open vSwitch");
  EXPECT_TRUE(flows_of(1).has_match);
  EXPECT_EQ(flows_of(1).flow.match, Match().with(Field::in_port, 5));
  EXPECT_EQ(flows_of(2).foreign, "field 34 of class 0x8000");
  EXPECT_FALSE(flows_of(2).has_match);
  EXPECT_EQ(flows_of(3).foreign, "instruction 2");
}

TEST(OpenFlow, ModifiesAndRemovesByPlace) {
  Bridge const bridge;
  Connection connection(bridge.socket(), soon());
  auto const one = flow_of_table(1);
  auto low = flow_of_table(1);
  low.priority = 1;
  auto const modified = flow_of_table(1, {Output{3}});
  connection.change({FlowChange{FlowCommand::add, one}, FlowChange{FlowCommand::add, low}}, soon());
  connection.change({FlowChange{FlowCommand::modify_strict, modified}}, soon());
  EXPECT_EQ(bridge.flows(), texts_of(std::vector{modified, low}));
  connection.change({FlowChange{FlowCommand::remove_strict, low}}, soon());
  EXPECT_EQ(bridge.flows(), texts_of(std::vector{modified}));
  Flow const all{kAllTables};
  connection.change({FlowChange{FlowCommand::remove, all}}, soon());
  EXPECT_EQ(bridge.flows(), std::vector<std::string>());
}

TEST(OpenFlow, ModifiesAndRemovesGroups) {
  Bridge const bridge;
  Connection connection(bridge.socket(), soon());
  Group const one{1, GroupType::indirect, {}, {{0, 1, kAnyPort, kAnyGroup, {Output{1}}}}};
  Group const other{1, GroupType::indirect, {}, {{0, 1, kAnyPort, kAnyGroup, {Output{2}}}}};
  connection.change({GroupChange{GroupCommand::add, one}}, soon());
  connection.change({GroupChange{GroupCommand::modify, other}}, soon());
  EXPECT_EQ(bridge.groups(), texts_of(std::vector{other}));
  Group const all{kAllGroups};
  connection.change({GroupChange{GroupCommand::remove, all}}, soon());
  EXPECT_EQ(bridge.groups(), std::vector<std::string>());
}

TEST(OpenFlow, RemovesByCookie) {
  Bridge const bridge;
  Connection connection(bridge.socket(), soon());
  Flow one{1};
  one.cookie = 0x11;
  Flow other{2};
  other.cookie = 0x21;
  connection.change(to_add({}, {one, other}), soon());
  Flow all{kAllTables};
  all.cookie = 0x10;
  connection.change({FlowChange{FlowCommand::remove, all, 0xf0}}, soon());
  EXPECT_EQ(bridge.flows(), texts_of(std::vector{other}));
}

std::string words_of_refusal(Connection &connection, Changes const &changes, std::size_t index) {
  try {
    connection.change(changes, soon());
  } catch (ChangeRefused const &refused) {
    EXPECT_EQ(refused.index(), index);
    return refused.what();
  }
  return "nothing is refused";
}

TEST(OpenFlow, MakesNoneOfTheChangesIfOneIsRefusedAtOnce) {
  Bridge const bridge;
  Connection connection(bridge.socket(), soon());
  Flow bad{2};
  bad.match.with(Field::arp_op, 1);
  EXPECT_EQ(words_of_refusal(connection, to_add({}, {Flow{1}, bad, Flow{3}}), 1),
            "the switch refuses to add flow table=2, arp_op=1 actions=drop: "
            "OFPBMC_BAD_PREREQ: a field of the match needs another one, which the match lacks");
  EXPECT_EQ(bridge.flows(), std::vector<std::string>());
  connection.change(to_add({}, {Flow{1}}), soon());
  EXPECT_EQ(bridge.flows(), texts_of(std::vector{Flow{1}}));
}

TEST(OpenFlow, MakesNoneOfTheChangesIfOneIsRefusedAtTheCommit) {
  Bridge const bridge;
  Connection connection(bridge.socket(), soon());
  Group const group{1};
  EXPECT_EQ(words_of_refusal(
                connection,
                {FlowChange{FlowCommand::add, Flow{1}}, GroupChange{GroupCommand::add, group},
                 GroupChange{GroupCommand::add, group}, FlowChange{FlowCommand::add, Flow{2}}},
                2),
            "the switch refuses to add group group_id=1,type=all: "
            "OFPGMFC_GROUP_EXISTS: the group exists");
  EXPECT_EQ(bridge.flows(), std::vector<std::string>());
  EXPECT_EQ(bridge.groups(), std::vector<std::string>());
}

// The commit is not held back, as the switch took such changes before.
TEST(OpenFlow, MakesNoneOfTheChangesIfOneOfAKnownFormIsRefusedAtTheCommit) {
  Bridge const bridge;
  Connection connection(bridge.socket(), soon());
  Group const group{1};
  auto const to_group = flow_of_table(1, {ToGroup{1}});
  connection.change({GroupChange{GroupCommand::add, group}, FlowChange{FlowCommand::add, Flow{2}},
                     FlowChange{FlowCommand::add, to_group}},
                    soon());
  connection.change(
      {GroupChange{GroupCommand::remove, group}, FlowChange{FlowCommand::remove, Flow{kAllTables}}},
      soon());
  EXPECT_EQ(bridge.flows(), std::vector<std::string>());
  EXPECT_EQ(words_of_refusal(connection, to_add({}, {Flow{2}, to_group}), 1),
            "the switch refuses to add flow table=1, actions=group:1: "
            "OFPBAC_BAD_OUT_GROUP: the group of an action does not exist");
  EXPECT_EQ(bridge.flows(), std::vector<std::string>());
}

TEST(OpenFlow, MakesNoneOfTheChangesIfOneOfAKnownFormNeedsAMeterThatIsGone) {
  constexpr std::uint32_t kMeter = 7;
  Bridge const bridge;
  Connection connection(bridge.socket(), soon());
  connection.have_meters({{kMeter, 1}}, soon());
  auto const changes = to_add({}, {Flow{2}, flow_of_table(1, {ToMeter{kMeter}, Output{1}})});
  connection.change(changes, soon());
  connection.change({FlowChange{FlowCommand::remove, Flow{kAllTables}}}, soon());
  connection.have_meters({}, soon());
  EXPECT_THROW(connection.change(changes, soon()), ChangeRefused);
  EXPECT_EQ(bridge.flows(), std::vector<std::string>());
}

// A flow that says a number wherever a form leaves it out.
Flow flow_that_says(Field field, Value value) {
  auto flow = flow_of_table(1, {Learn{.table = 2, .specs = {LearnedMatch{whole(field), value}}}});
  flow.match.with(field, value);
  if (field != Field::in_port) {
    flow.actions.emplace_back(set(field, value));
  }
  return flow;
}

std::vector<Flow> flows_with_numbers_that_forms_leave_out() {
  std::vector<Field> fields{Field::metadata, Field::tun_id, Field::eth_src, Field::eth_dst};
  for (unsigned number = 0; number < 16; ++number) {
    fields.push_back(reg(number));
  }
  std::vector<Flow> flows;
  for (auto const field : fields) {
    for (auto const value : {Value{0}, Value{1}, ones(info(field).bits)}) {
      flows.push_back(flow_that_says(field, value));
    }
  }
  for (std::uint16_t const vlan : {0, 1, 4094, 4095}) {
    auto &flow = flows.emplace_back(
        flow_of_table(1, {set(Field::vlan_vid, kVlanPresent | vlan), Output{1}}));
    flow.match.vlan(vlan);
  }
  for (Port const port : {Port{1}, Port{2}, kLastOwn}) {
    auto &flow = flows.emplace_back(flow_of_table(1, {Output{port}}));
    flow.match.with(Field::in_port, port);
  }
  for (auto const cookie : {std::uint64_t{1}, ~std::uint64_t{1}}) {
    auto &flow = flows.emplace_back(flow_of_table(1, {Learn{.table = 2, .cookie = cookie}}));
    flow.cookie = cookie;
  }
  return flows;
}

TEST(OpenFlow, TakesAnyOfTheNumbersThatFormsLeaveOut) {
  Bridge const bridge;
  for (auto const &flow : flows_with_numbers_that_forms_leave_out()) {
    // It knows no forms, so that what the switch says to each is heard.
    Connection connection(bridge.socket(), soon());
    EXPECT_NO_THROW(connection.change(to_add({}, {flow}), soon())) << to_text(flow);
    EXPECT_EQ(connection.flows({1}, soon()).at(0).flow, flow) << to_text(flow);
    connection.change({FlowChange{FlowCommand::remove, Flow{kAllTables}}}, soon());
  }
}

TEST(OpenFlow, ChangesNothingThroughAClientThatDiesBeforeTheCommit) {
  Bridge const bridge;
  constexpr std::uint32_t kBundle = 1;
  constexpr Xid kXid = 1;
  {
    openvswitch::Stream stream(bridge.socket(), soon());
    Writer out;
    put_hello(out, kXid);
    put_bundle_control(out, kXid, kBundle, BundleControl::open);
    put_bundle_add(out, kXid, kBundle, FlowChange{FlowCommand::add, Flow{1}});
    put_bundle_control(out, kXid, kBundle, BundleControl::close);
    stream.send(out.bytes());
    // The hello, and the replies of 16 bytes to the opening and the closing.
    for (std::vector<std::uint8_t> received; received.size() < 8 + 16 + 16;) {
      stream.wait_to_receive(soon());
      stream.receive(received);
    }
  }
  Connection connection(bridge.socket(), soon());
  connection.change(to_add({}, {Flow{2}}), soon());
  EXPECT_EQ(bridge.flows(), texts_of(std::vector{Flow{2}}));
}

TEST(OpenFlow, SendsNothingOfWhatHasNoFormOnTheWire) {
  Bridge const bridge;
  Connection connection(bridge.socket(), soon());
  auto const bad = flow_of_table(2, {Move{whole(reg(0)), part(reg(1), 0, 7)}});
  EXPECT_THROW(connection.change(to_add({}, {Flow{1}, bad}), soon()), std::invalid_argument);
  auto const long_one = flow_of_table(3, Actions(5000, Output{1}));
  EXPECT_THROW(connection.change(to_add({}, {Flow{1}, long_one}), soon()), std::length_error);
  connection.barrier(soon());
  EXPECT_EQ(bridge.flows(), std::vector<std::string>());
}

PacketOut frame_through_the_tables(Port in_port) {
  return {in_port, {Output{kTable}}, {2, 0, 0, 0, 0, 1, 2, 0, 0, 0, 0, 2, 0x88, 0xb5, 1, 2, 3, 4}};
}

/// The next event; fails the test if none comes.
Event next_event(Connection &connection) {
  while (true) {
    if (auto event = connection.next_event()) {
      return *event;
    }
    struct pollfd polled {
      connection.fd(), POLLIN, 0
    };
    if (::poll(&polled, 1, 10'000) != 1) {
      throw std::runtime_error("no event comes");
    }
    connection.receive();
  }
}

TEST(OpenFlow, CountsFrames) {
  Bridge const bridge(2);
  Connection connection(bridge.socket(), soon());
  connection.change(to_add(sample_groups(), {flow_of_table(0, {ToGroup{1}})}), soon());
  connection.send(frame_through_the_tables(2));
  connection.send(frame_through_the_tables(2));
  connection.barrier(soon());
  Lab::shared().ovs_appctl({"revalidator/purge"});

  constexpr std::uint64_t kFrame = 18;
  auto const flow = connection.flows({}, soon()).at(0);
  EXPECT_EQ(flow.traffic, (Traffic{2, 2 * kFrame}));
  EXPECT_GT(flow.age.count(), 0);

  auto const groups = connection.group_statistics(soon());
  auto const group = std::find_if(groups.begin(), groups.end(),
                                  [](GroupStatistics const &one) { return one.group == 1; });
  ASSERT_NE(group, groups.end());
  EXPECT_EQ(group->traffic, (Traffic{2, 2 * kFrame}));
  EXPECT_EQ(group->references, 1);
  EXPECT_THAT(group->buckets, testing::ElementsAre(Traffic{2, 2 * kFrame}, Traffic{2, 2 * kFrame}));

  auto const port = connection.port_statistics(1, soon()).at(0);
  EXPECT_EQ(port.port, 1);
  EXPECT_EQ(port.sent.packets, 2);
  EXPECT_EQ(connection.port_statistics(kAnyPort, soon()).size(), 3);

  std::vector<FlowFilter> const tables{{1}, {0}};
  auto const sums = connection.sums_of(tables, true, soon());
  EXPECT_THAT(sums.flows, testing::ElementsAre(Aggregate{}, Aggregate{{2, 2 * kFrame}, 1}));
  EXPECT_EQ(sums.ports.size(), 3);
  EXPECT_EQ(connection.sums_of(tables, false, soon()).ports.size(), 0);
}

TEST(OpenFlow, DescribesPorts) {
  Bridge const bridge(1);
  Connection connection(bridge.socket(), soon());
  auto ports = connection.ports(soon());
  std::sort(ports.begin(), ports.end(),
            [](auto const &one, auto const &other) { return one.port < other.port; });
  ASSERT_EQ(ports.size(), 2);
  EXPECT_EQ(ports[0].port, 1);
  EXPECT_EQ(ports[0].name, bridge.name() + "p1");
  EXPECT_NE(ports[0].address, EthernetAddress());
  EXPECT_TRUE(ports[0].is_live);
  EXPECT_FALSE(ports[0].is_down);
  EXPECT_EQ(ports[1].port, kLocal);
  EXPECT_EQ(ports[1].name, bridge.name());
}

TEST(OpenFlow, ReceivesFramesWithWhatTheFlowKnewOfThem) {
  Bridge const bridge(1);
  Connection connection(bridge.socket(), soon());
  connection.set_async({true, false, false}, soon());
  auto flow = flow_of_table(7, {set(reg(1), 5), set(reg(2), 6), ToController{}});
  flow.cookie = 0x1234;
  connection.change(to_add({}, {flow, flow_of_table(0, {Resubmit{7}})}), soon());
  connection.send(frame_through_the_tables(1));
  auto const event = next_event(connection);
  auto const &packet = std::get<PacketIn>(event);
  EXPECT_EQ(packet.cookie, 0x1234);
  EXPECT_EQ(packet.table, 7);
  EXPECT_EQ(packet.frame_bytes, 18);
  EXPECT_EQ(to_text(packet.metadata), "reg1=0x5,reg2=0x6,in_port=1");
  EXPECT_EQ(packet.frame, frame_through_the_tables(1).frame);
}

TEST(OpenFlow, LimitsWhatFlowsSendUp) {
  Bridge const bridge(1);
  constexpr std::uint32_t kRate = 10;
  constexpr std::uint32_t kFrames = 200;
  {
    // Whatever was said of it before.
    Connection connection(bridge.socket(), soon());
    connection.have_meters({{kControllerMeter, 1}}, soon());
  }
  Connection connection(bridge.socket(), soon());
  connection.set_async({true, false, false}, soon());
  connection.have_meters({{kControllerMeter, kRate}}, soon());
  connection.change(to_add({}, {flow_of_table(0, {ToController{}})}), soon());
  for (std::uint32_t count = 0; count < kFrames; ++count) {
    connection.send(frame_through_the_tables(1));
  }
  connection.barrier(soon());
  std::uint32_t received = 0;
  while (connection.next_event()) {
    ++received;
  }
  EXPECT_GE(received, kRate);
  EXPECT_LT(received, kFrames / 2);
}

TEST(OpenFlow, HasTheMetersThatAreWantedAndNewOnes) {
  Bridge const bridge;
  auto &lab = Lab::shared();
  auto const target = "unix:" + bridge.socket().native();
  Connection connection(bridge.socket(), soon());
  connection.set_async({.group_and_meter_changes = true}, soon());
  lab.ovs_ofctl({"-OOpenFlow15", "add-meter", target, "meter=7,kbps,band=type=drop,rate=9"});
  EXPECT_TRUE(std::holds_alternative<GroupsOrMetersChanged>(next_event(connection)));
  connection.have_meters({{kControllerMeter, 10}}, soon());
  auto meters = lab.ovs_ofctl({"-OOpenFlow15", "dump-meters", target});
  EXPECT_THAT(meters, testing::HasSubstr("meter=controller pktps burst"));
  EXPECT_THAT(meters, testing::Not(testing::HasSubstr("meter=7")));
  connection.add_meters(std::vector<std::uint32_t>{7, 8}, 9, soon());
  meters = lab.ovs_ofctl({"-OOpenFlow15", "dump-meters", target});
  for (auto const *meter : {"meter=7 pktps burst", "meter=8 pktps burst"}) {
    EXPECT_THAT(meters, testing::HasSubstr(meter));
  }
  EXPECT_THROW(connection.add_meters(std::vector<std::uint32_t>{9, 8}, 9, soon()), Refused);

  // What goes through one that is wanted still stays.
  for (auto const *flow : {"table=1,actions=meter:7,1", "table=1,ip,actions=meter:8,1"}) {
    lab.ovs_ofctl({"-OOpenFlow15", "add-flow", target, flow});
  }
  connection.have_meters({{kControllerMeter, 10}, {7, 5}}, soon());
  meters = lab.ovs_ofctl({"-OOpenFlow15", "dump-meters", target});
  EXPECT_THAT(meters, testing::HasSubstr("rate=5"));
  EXPECT_THAT(meters, testing::Not(testing::HasSubstr("meter=8")));
  auto const flows = lab.ovs_ofctl({"-OOpenFlow15", "dump-flows", target, "table=1"});
  EXPECT_THAT(flows, testing::HasSubstr("meter:7"));
  EXPECT_THAT(flows, testing::Not(testing::HasSubstr("meter:8")));
}

TEST(OpenFlow, IsToldOfAFlowThatGoes) {
  Bridge const bridge;
  Connection connection(bridge.socket(), soon());
  connection.set_async({false, false, true}, soon());
  Flow flow{3};
  flow.cookie = 9;
  flow.tells_removal = true;
  flow.match.with(Field::in_port, 4);
  connection.change(to_add({}, {flow}), soon());
  Connection(bridge.socket(), soon())
      .change({FlowChange{FlowCommand::remove_strict, flow}}, soon());
  auto const event = next_event(connection);
  auto const &removed = std::get<FlowRemoved>(event);
  EXPECT_EQ(removed.flow, flow);
  EXPECT_EQ(removed.reason, FlowRemoved::Reason::removed);
}

TEST(OpenFlow, IsToldOfPorts) {
  Bridge const bridge;
  Connection connection(bridge.socket(), soon());
  connection.set_async({false, true, false}, soon());
  auto const name = bridge.name() + "p9";
  Lab::shared().ovs_vsctl(
      {"add-port", bridge.name(), name, "--", "set", "interface", name, "type=dummy"});
  auto event = next_event(connection);
  EXPECT_EQ(std::get<PortStatus>(event).reason, PortStatus::Reason::added);
  EXPECT_EQ(std::get<PortStatus>(event).port.name, name);
  Lab::shared().ovs_vsctl({"del-port", name});
  do {
    event = next_event(connection);
  } while (std::get<PortStatus>(event).reason == PortStatus::Reason::modified);
  EXPECT_EQ(std::get<PortStatus>(event).reason, PortStatus::Reason::removed);
  EXPECT_EQ(std::get<PortStatus>(event).port.name, name);
}

std::vector<FlowMonitor> of_table_5(OwnChanges own = OwnChanges::untold) {
  return {{.number = 1, .filter = {5}, .own = own}};
}

TEST(OpenFlow, IsAskedForSeveralThingsAtOnce) {
  Bridge const bridge;
  Connection connection(bridge.socket(), soon());
  connection.change(to_add({}, {Flow{5}, Flow{6}, Flow{7}}), soon());
  std::vector<std::uint8_t> tables;
  for (auto const &entry : connection.flows_of(std::vector<FlowFilter>{{7}, {8}, {5}}, soon())) {
    tables.push_back(entry.flow.table);
  }
  EXPECT_THAT(tables, testing::ElementsAre(7, 5));
  std::vector<FlowMonitor> const monitors{
      {.number = 1, .filter = {6}},
      {.number = 2, .filter = {7}, .present = PresentFlows::untold},
      {.number = 3, .filter = {5}}};
  tables.clear();
  for (auto const &update : connection.monitor_flows(monitors, soon())) {
    tables.push_back(update.flow.table);
  }
  EXPECT_THAT(tables, testing::ElementsAre(6, 5));
}

TEST(OpenFlow, TellsAllThatThereIsOnceItIsFollowed) {
  Bridge const bridge(2);
  Connection connection(bridge.socket(), soon());
  connection.change(to_add(sample_groups(), {Flow{5}, Flow{6}}), soon());
  auto const all = connection.follow({.group_and_meter_changes = true},
                                     of_table_5(OwnChanges::told), PresentFlows::told, soon());
  ASSERT_EQ(all.monitored.size(), 1);
  EXPECT_EQ(all.monitored[0].flow, Flow{5});
  ASSERT_EQ(all.flows.size(), 2);
  EXPECT_EQ(all.flow_count, 2);
  EXPECT_EQ(all.groups.size(), sample_groups().size());
  // The bridge has one of its own name.
  EXPECT_EQ(all.ports.size(), 3);
  EXPECT_EQ(all.port_statistics.size(), 3);

  Connection other(bridge.socket(), soon());
  other.change({FlowChange{FlowCommand::remove, Flow{5}}}, soon());
  EXPECT_EQ(std::get<FlowUpdate>(next_event(connection)).event, FlowUpdate::Event::removed);
  other.change({GroupChange{GroupCommand::remove, Group{kAllGroups}}}, soon());
  EXPECT_TRUE(std::holds_alternative<GroupsOrMetersChanged>(next_event(connection)));
}

TEST(OpenFlow, TellsHowManyFlowsThereAreIfTheyAreNotToBeTold) {
  Bridge const bridge;
  Connection connection(bridge.socket(), soon());
  connection.change(to_add({}, {Flow{5}, Flow{6}, Flow{7}}), soon());
  auto const all =
      connection.follow({}, std::span<FlowMonitor const>(), PresentFlows::untold, soon());
  EXPECT_EQ(all.flow_count, 3);
  EXPECT_TRUE(all.flows.empty());
}

TEST(OpenFlow, TellsWhetherABridgeIsBare) {
  Bridge const bridge;
  Connection connection(bridge.socket(), soon());
  EXPECT_TRUE(connection.is_bare(soon()));
  connection.change(to_add({}, {Flow{5}}), soon());
  EXPECT_FALSE(connection.is_bare(soon()));
  connection.change({FlowChange{FlowCommand::remove, Flow{5}}}, soon());
  EXPECT_TRUE(connection.is_bare(soon()));
  connection.change(to_add(sample_groups(), {}), soon());
  EXPECT_FALSE(connection.is_bare(soon()));
}

TEST(OpenFlow, AddsFlowsEachByItself) {
  Bridge const bridge;
  Connection connection(bridge.socket(), soon());
  std::vector<Flow> const flows{Flow{5}, flow_of_table(6, {ToGroup{12345}}), Flow{7}};
  std::vector<Flow const *> const all{&flows[0], &flows[1], &flows[2]};
  try {
    connection.add(all, soon());
    FAIL();
  } catch (HalfMade const &refused) {
    EXPECT_THAT(refused.what(), testing::HasSubstr("refuses to " + to_text(to_add({}, flows)[1])));
  }
  EXPECT_THAT(bridge.flows(), testing::ElementsAre(to_text(flows[0]), to_text(flows[2])));
  connection.add({all.begin(), 1}, soon());
  EXPECT_EQ(bridge.flows().size(), 2);
}

TEST(OpenFlow, MonitorsFlows) {
  Bridge const bridge;
  Connection connection(bridge.socket(), soon());
  auto const before = flow_of_table(5, {Output{1}});
  connection.change(to_add({}, {before, Flow{6}}), soon());
  auto const initial = connection.monitor_flows(of_table_5(), soon());
  ASSERT_EQ(initial.size(), 1);
  EXPECT_EQ(initial[0].event, FlowUpdate::Event::initial);
  EXPECT_EQ(initial[0].flow, before);

  auto later = flow_of_table(5, {Output{2}});
  later.priority = 7;
  Connection other(bridge.socket(), soon());
  other.change(to_add({}, {later, Flow{7}}), soon());
  auto event = next_event(connection);
  EXPECT_EQ(std::get<FlowUpdate>(event).event, FlowUpdate::Event::added);
  EXPECT_EQ(std::get<FlowUpdate>(event).flow, later);

  later.actions = {Output{3}};
  other.change({FlowChange{FlowCommand::modify_strict, later}}, soon());
  event = next_event(connection);
  EXPECT_EQ(std::get<FlowUpdate>(event).event, FlowUpdate::Event::modified);
  EXPECT_EQ(std::get<FlowUpdate>(event).flow, later);

  other.change({FlowChange{FlowCommand::remove_strict, later}}, soon());
  event = next_event(connection);
  EXPECT_EQ(std::get<FlowUpdate>(event).event, FlowUpdate::Event::removed);
  EXPECT_EQ(std::get<FlowUpdate>(event).reason, FlowRemoved::Reason::removed);

  connection.change(to_add({}, {later}), soon());
  event = next_event(connection);
  EXPECT_EQ(std::get<FlowUpdate>(event).event, FlowUpdate::Event::own);

  connection.cancel_monitor(1, soon());
  other.change(to_add({}, {later}), soon());
  connection.barrier(soon());
  EXPECT_FALSE(connection.next_event());
}

TEST(OpenFlow, MonitorsFlowsThatItChangesItself) {
  Bridge const bridge;
  Connection connection(bridge.socket(), soon());
  EXPECT_TRUE(connection.monitor_flows(of_table_5(OwnChanges::told), soon()).empty());
  auto const flow = flow_of_table(5, {Output{1}});
  connection.change(to_add({}, {flow}), soon());
  auto event = next_event(connection);
  EXPECT_EQ(std::get<FlowUpdate>(event).event, FlowUpdate::Event::added);
  EXPECT_EQ(std::get<FlowUpdate>(event).flow, flow);
  connection.change({FlowChange{FlowCommand::remove_strict, flow}}, soon());
  event = next_event(connection);
  EXPECT_EQ(std::get<FlowUpdate>(event).event, FlowUpdate::Event::removed);
  EXPECT_EQ(std::get<FlowUpdate>(event).flow.match, flow.match);
}

TEST(OpenFlow, IsToldOfGroupsThatOthersChange) {
  Bridge const bridge;
  Connection connection(bridge.socket(), soon());
  connection.set_async({.group_and_meter_changes = true}, soon());
  Group const group{.id = 1, .type = GroupType::all, .buckets = {}};
  connection.change(to_add({group}, {}), soon());
  EXPECT_FALSE(connection.next_event());
  Connection other(bridge.socket(), soon());
  other.change({GroupChange{.command = GroupCommand::modify, .group = group}}, soon());
  EXPECT_TRUE(std::holds_alternative<GroupsOrMetersChanged>(next_event(connection)));
  other.change({GroupChange{.command = GroupCommand::remove, .group = group}}, soon());
  EXPECT_TRUE(std::holds_alternative<GroupsOrMetersChanged>(next_event(connection)));
}

TEST(OpenFlow, IsToldOfAFrameThatIsRefused) {
  Bridge const bridge;
  Connection connection(bridge.socket(), soon());
  auto packet = frame_through_the_tables(1);
  packet.actions = {ToMeter{99}};
  connection.send(packet);
  auto const event = next_event(connection);
  EXPECT_EQ(to_text(std::get<ErrorReply>(event)).substr(0, 22), "OFPMMFC_INVALID_METER:");
}

TEST(OpenFlow, SaysWhoIsNotThere) {
  try {
    Connection const connection("/nonexistent/br0.mgmt", soon());
    FAIL();
  } catch (openvswitch::Disconnected const &error) {
    EXPECT_STREQ(error.what(), "/nonexistent/br0.mgmt: No such file or directory");
  }
}

TEST(OpenFlow, NoticesThatTheBridgeIsGone) {
  auto bridge = std::make_unique<Bridge>();
  Connection connection(bridge->socket(), soon());
  bridge.reset();
  EXPECT_THROW(connection.barrier(soon()), openvswitch::Disconnected);
}

TEST(Errors, HaveTheNamesThatOvsOfctlKnows) {
  auto &lab = Lab::shared();
  Writer out;
  std::vector<std::string> expected;
  for (auto const &name : error_names()) {
    out.u8(kVersion);
    out.u8(static_cast<std::uint8_t>(MessageType::error));
    out.u16(12);
    out.u32(1);
    out.u16(name.type);
    out.u16(name.code);
    expected.emplace_back(name.name);
  }
  TemporaryFolder const folder;
  std::ofstream(folder.file("errors"), std::ios::binary)
      .write(reinterpret_cast<char const *>(out.bytes().data()),
             static_cast<std::streamsize>(out.size()));
  std::istringstream printed(lab.ovs_ofctl({"ofp-parse", folder.file("errors")}));
  std::vector<std::string> names;
  for (std::string line; std::getline(printed, line);) {
    if (auto const at = line.find(": OFP"); at != std::string::npos) {
      names.push_back(line.substr(at + 2));
    }
  }
  EXPECT_EQ(names, expected);
}

}  // namespace
}  // namespace simhost::openflow
