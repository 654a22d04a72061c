// What the clients make of a switch and of a database that do not keep to the protocol, or that ask
// whether somebody is there.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <array>
#include <functional>
#include <initializer_list>
#include <string>

#include "peer.h"
#include "planes/openvswitch/openflow/codec/foreign.h"
#include "planes/openvswitch/openflow/codec/oxm.h"
#include "planes/openvswitch/openflow/codec/wire.h"
#include "planes/openvswitch/openflow/connection.h"
#include "planes/openvswitch/ovsdb/client.h"
#include "soon.h"

namespace simhost::openvswitch {
namespace {

using testing::HasSubstr;

template <typename Expected>
std::string words_of(std::function<void()> const &work) {
  try {
    work();
  } catch (Expected const &error) {
    return error.what();
  }
  return "nothing is wrong";
}

/// A message of OpenFlow 1.5 without a payload.
std::string message(char type, char xid, char version = 6, char length = 8) {
  return {version, type, 0, length, 0, 0, 0, xid};
}
std::string hello() {
  return message(0, 1);
}
constexpr char kBarrierReply = 21;

/// The words about a switch that says this.
template <typename Expected>
std::string words_about_switch(std::string const &said) {
  Peer peer(said);
  return words_of<Expected>([&] {
    openflow::Connection connection(peer.socket(), soon());
    connection.barrier(soon());
  });
}

TEST(Switch, OfAnOlderVersionIsRefused) {
  constexpr auto *kWords =
      "the switch refuses: OFPHFC_INCOMPATIBLE: no version of OpenFlow is common";
  EXPECT_EQ(words_about_switch<openflow::Refused>(message(0, 1, 4)), kWords);
  EXPECT_EQ(words_about_switch<openflow::Refused>(message(1, 1, 6, 12) + std::string(4, '\0')),
            kWords);
}

TEST(Switch, ThatDoesNotKeepToTheProtocolIsNotBelieved) {
  using openflow::Malformed;
  EXPECT_EQ(words_about_switch<Malformed>(message(kBarrierReply, 1)),
            "the switch does not begin with a hello");
  EXPECT_EQ(words_about_switch<Malformed>(hello() + message(kBarrierReply, 2, 6, 7)),
            "a message is shorter than its header");
  EXPECT_EQ(words_about_switch<Malformed>(hello() + message(kBarrierReply, 2, 5)),
            "a message is of another version of OpenFlow");
  EXPECT_EQ(words_about_switch<Malformed>(hello() + message(10, 0)), "it ends early");
}

/// The words about a match with this content of vlan_pcp, which has 3 bits.
std::string words_about_priority(std::uint8_t content) {
  openflow::Bytes const match{0, 1, 0, 9, 0x80, 0, 7U << 1U, 1, content, 0, 0, 0, 0, 0, 0, 0};
  return words_of<openflow::Foreign>([&] {
    openflow::Reader in(match);
    openflow::take_match(in);
  });
}

TEST(Switch, ThatHasMoreBitsInAFieldThanThereAreIsNotMisread) {
  EXPECT_EQ(words_about_priority(7), "nothing is wrong");
  EXPECT_EQ(words_about_priority(8), "a content that vlan_pcp cannot have");
}

TEST(Switch, IsToldThatSomebodyIsThere) {
  Peer peer(hello() + message(2, 9, 6, 10) + "ab" + message(kBarrierReply, 2));
  {
    openflow::Connection connection(peer.socket(), soon());
    connection.barrier(soon());
  }
  EXPECT_THAT(peer.heard(), HasSubstr(message(3, 9, 6, 10) + "ab"));
}

// Its replies to requests of these numbers: to what controls a bundle, and to a change that it
// refuses for its command.
std::string controlled(std::initializer_list<char> numbers) {
  constexpr char kBundleControl = 33;
  std::string said;
  for (auto const number : numbers) {
    said += message(kBundleControl, number);
  }
  return said;
}
std::string refused(char number) {
  return message(1, number, 6, 12) + std::string{0, 5, 0, 6};
}

// Four messages for a bundle of one change: what opens it, the change, what closes it, the commit.
TEST(Switch, IsWaitedForBeforeTheCommitOnlyWhereAFormIsNew) {
  Peer const peer(hello() + controlled({4, 5, 9, 13}));
  openflow::Connection connection(peer.socket(), soon());
  auto const change_flow = [&](openflow::Flow const &flow, Deadline deadline) {
    connection.change({openflow::FlowChange{.flow = flow}}, deadline);
  };
  change_flow({.cookie = 1}, soon());
  change_flow({.cookie = 2}, soon());
  EXPECT_THROW(change_flow({.cookie = 3, .actions = {openflow::Output{1}}}, Deadline::clock::now()),
               TimedOut);
}

TEST(Switch, ThatRefusesWhatItTookBeforeIsNotTrustedInThat) {
  Peer const peer(hello() + controlled({4, 5}) + refused(7) + controlled({8, 9}) + refused(11) +
                  controlled({12, 13}));
  openflow::Connection connection(peer.socket(), soon());
  auto const change_flow = [&](std::uint64_t cookie) {
    connection.change({openflow::FlowChange{.flow = {.cookie = cookie}}}, soon());
  };
  change_flow(1);
  EXPECT_EQ(words_of<openflow::HalfMade>([&] { change_flow(2); }),
            "the switch makes some changes, but refuses to add flow cookie=0x2, actions=drop: "
            "OFPFMFC_BAD_COMMAND: the command is unknown");
  // No form is known any more: it discards what is refused.
  EXPECT_THROW(change_flow(3), openflow::ChangeRefused);
}

TEST(Switch, ThatSaysNothingIsNotWaitedForForEver) {
  Peer const peer("");
  EXPECT_EQ(words_of<TimedOut>([&] {
              openflow::Connection connection(peer.socket(), soon());
              connection.barrier(Deadline::clock::now());
            }),
            peer.socket().native() + ": no reply in time");
}

// Whose sockets are closed later.
TEST(Switch, WhoseProcessHasEndedIsNotWaitedFor) {
  Peer const peer(hello());
  std::array<int, 2> ends{};
  ASSERT_EQ(pipe2(ends.data(), O_CLOEXEC), 0);
  events::Descriptor const life(ends[0]);
  events::Descriptor process(ends[1]);
  openflow::Connection connection(peer.socket(), soon(), {life.number()});
  process.close();
  EXPECT_EQ(words_of<Disconnected>([&] { connection.barrier(soon()); }),
            peer.socket().native() + ": nobody replies any more");
}

ovsdb::Json nothing_done(std::filesystem::path const &socket) {
  ovsdb::Client client(socket, "Open_vSwitch", soon());
  return client.transact(ovsdb::Json::array({{{"op", "comment"}, {"comment", "c"}}}), soon());
}

std::string words_about_database(std::string const &said) {
  Peer const peer(said);
  return words_of<ovsdb::Malformed>([&] { nothing_done(peer.socket()); });
}

TEST(Database, ThatDoesNotKeepToTheProtocolIsNotBelieved) {
  EXPECT_EQ(words_about_database(R"({"id": 1, "result": [], "error": null})"),
            "a transaction has fewer results than operations");
  EXPECT_EQ(words_about_database(R"({"id": 1, "error": null})"),
            "the result of a transaction is no list");
  EXPECT_EQ(words_about_database("HTTP/1.0 400"), "what the database sends is no object of JSON");
  EXPECT_EQ(words_about_database(R"({"method": "update2", "params": ["replica", 1]})"),
            "a change of the database is no object");
}

TEST(Database, IsToldThatSomebodyIsThere) {
  Peer peer(R"({"method": "echo", "params": ["x"], "id": "echo"})"
            R"({"id": 7, "result": "of nobody's request", "error": null})"
            R"({"id": 1, "result": [{}], "error": null})");
  EXPECT_EQ(nothing_done(peer.socket()).size(), 1);
  EXPECT_THAT(peer.heard(), HasSubstr(R"({"error":null,"id":"echo","result":["x"]})"));
}

}  // namespace
}  // namespace simhost::openvswitch
