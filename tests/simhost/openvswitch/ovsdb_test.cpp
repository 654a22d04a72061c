// The client of OVSDB against a real ovsdb-server, and ovs-vsctl as the one that reads as well.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <poll.h>

#include "lab.h"
#include "planes/openvswitch/ovsdb/client.h"
#include "planes/openvswitch/ovsdb/configuration.h"

namespace simhost::ovsdb {
namespace {

using openvswitch::Bridge;
using openvswitch::Lab;
using openvswitch::soon;

Client connected() {
  return {Lab::shared().database_socket(), "Open_vSwitch", soon()};
}

Json where_name(std::string const &name) {
  return Json::array({Json::array({"name", "==", name})});
}

Json update(std::string const &table, std::string const &name, Json row) {
  return {{"op", "update"}, {"table", table}, {"where", where_name(name)}, {"row", std::move(row)}};
}

/// Operations that make a bridge with its own port.
Json bridge_operations(std::string const &name) {
  return Json::array(
      {{{"op", "insert"},
        {"table", "Interface"},
        {"uuid-name", "i"},
        {"row", {{"name", name}, {"type", "internal"}}}},
       {{"op", "insert"},
        {"table", "Port"},
        {"uuid-name", "p"},
        {"row", {{"name", name}, {"interfaces", set({named_uuid("i")})}}}},
       {{"op", "insert"},
        {"table", "Bridge"},
        {"uuid-name", "b"},
        {"row", {{"name", name}, {"ports", set({named_uuid("p")})}, {"datapath_type", "dummy"}}}},
       {{"op", "mutate"},
        {"table", "Open_vSwitch"},
        {"where", Json::array()},
        {"mutations", Json::array({Json::array({"bridges", "insert", set({named_uuid("b")})})})}},
       {{"op", "comment"}, {"comment", "a bridge of a test"}}});
}

Event next_event(Client &client) {
  while (true) {
    if (auto event = client.next_event()) {
      return *event;
    }
    pollfd polled{client.fd(), POLLIN, 0};
    if (::poll(&polled, 1, 10'000) != 1) {
      throw std::runtime_error("no event comes");
    }
    client.receive();
  }
}

TEST(Ovsdb, MakesABridgeInOneTransactionAndWaitsUntilItIsInForce) {
  auto client = connected();
  Selected selected{{"Bridge", {"name"}}};
  select_configuration(selected);
  client.monitor(selected, soon());
  auto operations = bridge_operations("made");
  raise_configuration(operations);
  auto const results = client.transact(operations, soon());
  auto const number = raised_configuration(results);
  wait_for_configuration(client, number, soon());
  EXPECT_EQ(wanted_configuration(client.replica()), number);
  EXPECT_TRUE(std::filesystem::is_socket(Lab::shared().bridge_socket("made")));
  EXPECT_THAT(Lab::shared().ovs_vsctl({"list-br"}), testing::HasSubstr("made\n"));
  Lab::shared().ovs_vsctl({"del-br", "made"});
}

TEST(Ovsdb, IsMonitoredWhileSomethingElseIsDone) {
  Bridge const bridge;
  auto client = connected();
  client.begin_monitor({{"Bridge", {"name"}}});
  EXPECT_TRUE(client.replica().rows("Bridge").empty());
  client.end_monitor(soon());
  EXPECT_FALSE(client.replica().rows("Bridge").empty());
  auto const before = client.replica().rows("Bridge").size();
  client.end_monitor(soon());
  EXPECT_EQ(client.replica().rows("Bridge").size(), before);
}

TEST(Ovsdb, ChangesNothingIfAnOperationIsRefused) {
  auto client = connected();
  auto operations = bridge_operations("refused");
  operations.push_back(update("Bridge", "refused", {{"fail_mode", "no such mode"}}));
  try {
    client.transact(operations, soon());
    FAIL();
  } catch (TransactionRefused const &refused) {
    EXPECT_EQ(refused.operation(), 5);
    EXPECT_THAT(
        refused.what(),
        testing::MatchesRegex("the database refuses to update Bridge: constraint "
                              "violation: .no such mode. is not one of the allowed values .*"));
  }
  EXPECT_THAT(Lab::shared().ovs_vsctl({"list-br"}), testing::Not(testing::HasSubstr("refused")));
}

TEST(Ovsdb, SaysWhatIsWrongWithATransactionAsAWhole) {
  Bridge const bridge;
  auto client = connected();
  try {
    client.transact(bridge_operations(bridge.name()), soon());
    FAIL();
  } catch (TransactionRefused const &refused) {
    EXPECT_EQ(refused.operation(), 5);
    EXPECT_THAT(refused.what(), testing::StartsWith("the database refuses the transaction: "
                                                    "constraint violation: Transaction causes "
                                                    "multiple rows in \"Interface\""));
  }
}

TEST(Ovsdb, WaitsForACondition) {
  Bridge const bridge;
  auto client = connected();
  auto const wait = [&](char const *until) {
    return Json{{"op", "wait"},
                {"timeout", 0},
                {"table", "Bridge"},
                {"where", where_name(bridge.name())},
                {"until", until},
                {"columns", Json::array({"datapath_type"})},
                {"rows", Json::array({{{"datapath_type", "dummy"}}})}};
  };
  auto const change = update("Bridge", bridge.name(), {{"stp_enable", true}});
  EXPECT_THROW(client.transact(Json::array({wait("!="), change}), soon()), TransactionRefused);
  EXPECT_EQ(Lab::shared().ovs_vsctl({"get", "bridge", bridge.name(), "stp_enable"}), "false\n");
  client.transact(Json::array({wait("=="), change}), soon());
  EXPECT_EQ(Lab::shared().ovs_vsctl({"get", "bridge", bridge.name(), "stp_enable"}), "true\n");
}

TEST(Ovsdb, RefusesRequestsInWords) {
  Client client(Lab::shared().database_socket(), "Nothing", soon());
  try {
    client.monitor({{"T", {}}}, soon());
    FAIL();
  } catch (Refused const &refused) {
    EXPECT_STREQ(refused.what(),
                 "the database refuses to get_schema: unknown database: "
                 "get_schema request specifies unknown database Nothing");
  }
  EXPECT_THROW(
      connected().transact(Json::array({{{"op", "comment"}, {"comment", "\xff"}}}), soon()),
      std::invalid_argument);
}

/// A row of the replica as another client reads it from the beginning.
Row fresh_row(Selected const &selected, std::string const &uuid) {
  auto client = connected();
  client.monitor(selected, soon());
  return client.replica().rows("Interface").at(uuid);
}

TEST(Ovsdb, FollowsWhatOthersChange) {
  Bridge const bridge(1);
  auto const port = bridge.name() + "p1";
  Selected const selected{
      {"Interface", {"name", "ofport_request", "external_ids", "lldp", "ingress_policing_rate"}}};
  auto client = connected();
  client.monitor(selected, soon());
  auto const &rows = client.replica().rows("Interface");
  auto const found = std::find_if(rows.begin(), rows.end(),
                                  [&](auto const &row) { return row.second.at("name") == port; });
  ASSERT_NE(found, rows.end());
  auto const uuid = found->first;
  auto other = connected();
  auto const change = [&](Json row) {
    other.transact(Json::array({update("Interface", port, std::move(row))}), soon());
    EXPECT_TRUE(std::holds_alternative<Changed>(next_event(client)));
    EXPECT_EQ(rows.at(uuid), fresh_row(selected, uuid));
    return rows.at(uuid);
  };
  EXPECT_EQ(change({{"ofport_request", 5}}).at("ofport_request"), set({5}));
  EXPECT_EQ(change({{"ofport_request", 6}}).at("ofport_request"), set({6}));
  EXPECT_EQ(change({{"ofport_request", set({})}}).at("ofport_request"), set({}));
  EXPECT_EQ(change({{"ingress_policing_rate", 9}}).at("ingress_policing_rate"), 9);
  EXPECT_EQ(change({{"external_ids", map({{"a", "b"}, {"c", "d"}})}}).at("external_ids"),
            map({{"a", "b"}, {"c", "d"}}));
  EXPECT_EQ(change({{"external_ids", map({{"a", "x"}, {"e", "f"}})}}).at("external_ids"),
            map({{"a", "x"}, {"e", "f"}}));
  Lab::shared().ovs_vsctl({"del-port", port});
  while (rows.contains(uuid)) {
    next_event(client);
  }
}

TEST(Ovsdb, FollowsSets) {
  Bridge const bridge(1);
  Selected const selected{{"Port", {"name", "trunks"}}};
  auto client = connected();
  client.monitor(selected, soon());
  auto const port = bridge.name() + "p1";
  auto other = connected();
  auto const change = [&](Json const &trunks) {
    other.transact(Json::array({update("Port", port, {{"trunks", trunks}})}), soon());
    next_event(client);
    for (auto const &[uuid, row] : client.replica().rows("Port")) {
      if (row.at("name") == port) {
        return row.at("trunks");
      }
    }
    return Json();
  };
  EXPECT_EQ(change(set({1, 2, 3})), set({1, 2, 3}));
  EXPECT_EQ(change(set({2, 4})), set({2, 4}));
  EXPECT_EQ(change(4), set({4}));
}

TEST(Ovsdb, HasOneOwnerOfALock) {
  auto one = std::optional(connected());
  auto other = connected();
  EXPECT_TRUE(one->lock("held", soon()));
  EXPECT_FALSE(other.lock("held", soon()));
  EXPECT_FALSE(other.next_event());
  auto const assertion = Json::array({{{"op", "assert"}, {"lock", "held"}}});
  one->transact(assertion, soon());
  EXPECT_THROW(other.transact(assertion, soon()), TransactionRefused);
  one.reset();
  auto const event = next_event(other);
  EXPECT_EQ(std::get<LockGained>(event).name, "held");
  other.transact(assertion, soon());
  other.unlock("held", soon());
  EXPECT_THROW(other.transact(assertion, soon()), TransactionRefused);
}

TEST(Ovsdb, StealsALock) {
  auto one = connected();
  auto other = connected();
  EXPECT_TRUE(one.lock("stolen", soon()));
  other.steal("stolen", soon());
  auto const event = next_event(one);
  EXPECT_EQ(std::get<LockLost>(event).name, "stolen");
}

TEST(Ovsdb, SaysWhoIsNotThere) {
  try {
    Client const client("/nonexistent/db.sock", "Open_vSwitch", soon());
    FAIL();
  } catch (openvswitch::Disconnected const &error) {
    EXPECT_STREQ(error.what(), "/nonexistent/db.sock: No such file or directory");
  }
}

TEST(Ovsdb, WaitsNoLongerThanItMay) {
  auto client = connected();
  Selected selected;
  select_configuration(selected);
  client.monitor(selected, soon());
  EXPECT_THROW(wait_for_configuration(client, INT64_MAX, Deadline::clock::now()),
               openvswitch::TimedOut);
}

}  // namespace
}  // namespace simhost::ovsdb
