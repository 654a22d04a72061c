// From what a database holds to what it is told, and no further.
#include "planes/openvswitch/rows/rows.h"

#include <gmock/gmock.h>

#include <map>
#include <string>
#include <utility>
#include <vector>

namespace {

using simhost::openvswitch::BridgeRow;
using simhost::openvswitch::Json;
using simhost::openvswitch::operations;
using simhost::openvswitch::present_rows;
using simhost::openvswitch::PresentRows;
using simhost::openvswitch::signature;
using simhost::ovsdb::Column;
using simhost::ovsdb::Replica;
using simhost::ovsdb::Schema;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::SizeIs;

constexpr auto *kHost = "/h.db";
constexpr auto *kOwner = "simhostd of /h.db, process 7";
using Rows = std::vector<BridgeRow>;

Schema schema() {
  using Kind = Column::Kind;
  Column const single{.kind = Kind::single, .is_optional = false, .usual = ""};
  Column const number{.kind = Kind::single, .is_optional = false, .usual = 0};
  Column const set{.kind = Kind::set, .is_optional = false, .usual = simhost::ovsdb::set({})};
  Column const optional{.kind = Kind::set, .is_optional = true, .usual = simhost::ovsdb::set({})};
  Column const map{.kind = Kind::map, .is_optional = false, .usual = simhost::ovsdb::map({})};
  return {{"Open_vSwitch", {{"external_ids", map}, {"other_config", map}}},
          {"Bridge",
           {{"name", single},
            {"datapath_type", single},
            {"ports", set},
            {"external_ids", map},
            {"flow_tables", map},
            {"fail_mode", optional},
            {"protocols", set},
            {"controller", set},
            {"mirrors", set},
            {"other_config", map}}},
          {"Port",
           {{"name", single},
            {"interfaces", set},
            {"tag", optional},
            {"trunks", set},
            {"vlan_mode", optional},
            {"lacp", optional},
            {"other_config", map}}},
          {"Interface",
           {{"name", single},
            {"ofport_request", optional},
            {"type", single},
            {"options", map},
            {"ingress_policing_rate", number},
            {"other_config", map},
            {"error", optional},
            {"ofport", optional}}},
          {"Flow_Table", {{"flow_limit", optional}}}};
}

Replica replica_of(char const *updates) {
  Replica replica(schema());
  replica.apply(Json::parse(updates));
  return replica;
}

// Of a database that has a bridge of this host with the device c1, and one of nobody's.
Replica replica() {
  return replica_of(R"json({
    "Open_vSwitch": {
      "o": {"initial": {"external_ids": ["map", [["simhostd", "simhostd of /h.db, process 7"]]],
                        "other_config": ["map", [["vlan-limit", "2"]]]}}},
    "Bridge": {
      "b1": {"initial": {"name": "vs1", "datapath_type": "netdev",
                         "ports": ["set", [["uuid", "p0"], ["uuid", "p1"]]],
                         "external_ids": ["map", [["simhost", "/h.db"]]],
                         "flow_tables": ["map", [[32, ["uuid", "t"]]]],
                         "fail_mode": "secure", "protocols": "OpenFlow15",
                         "other_config": ["map", [["disable-in-band", "true"]]]}},
      "b2": {"initial": {"name": "br0", "ports": ["uuid", "p2"]}}},
    "Port": {
      "p0": {"initial": {"name": "vs1", "interfaces": ["uuid", "i0"]}},
      "p1": {"initial": {"name": "c1", "interfaces": ["uuid", "i1"]}},
      "p2": {"initial": {"name": "eth7", "interfaces": ["uuid", "i2"]}}},
    "Interface": {
      "i0": {"initial": {"name": "vs1"}},
      "i1": {"initial": {"name": "c1", "ofport_request": 5}},
      "i2": {"initial": {"name": "eth7"}}},
    "Flow_Table": {"t": {"initial": {"flow_limit": 100}}}
  })json");
}

BridgeRow vs1() {
  return {.name = "vs1", .datapath = "netdev", .devices = {{"c1", 5}}, .limits = {{32, 100}}};
}

std::vector<std::string> told(PresentRows const &present, Rows const &wanted) {
  std::vector<std::string> all;
  for (auto const &operation : operations(present, wanted, kHost, 2)) {
    all.push_back(operation["op"].get<std::string>() + " " + operation["table"].get<std::string>());
  }
  return all;
}

TEST(TheRows, OfThisHostAreReadAndNoOthers) {
  auto const present = present_rows(replica(), kHost);
  ASSERT_THAT(present.bridges, SizeIs(1));
  EXPECT_EQ(present.bridges[0].row, vs1());
  EXPECT_EQ(present.owner, kOwner);
  EXPECT_EQ(present.most_tags, 2U);
  EXPECT_FALSE(present.is_new);
  EXPECT_THAT(present_rows(replica(), "/other.db").bridges, SizeIs(0));
}

TEST(TheRows, ThatAreAsTheyAreWantedAreLeftAlone) {
  EXPECT_THAT(told(present_rows(replica(), kHost), {vs1()}), SizeIs(0));
}

TEST(TheRows, SayWhoWritesThem) {
  auto const said = signature("another one");
  EXPECT_EQ(said["table"], "Open_vSwitch");
  EXPECT_THAT(said["mutations"].back().dump(),
              HasSubstr(R"(["external_ids","insert",["map",[["simhostd","another one"]]]])"));
}

TEST(TheRows, ChangeInPlace) {
  auto const present = present_rows(replica(), kHost);
  auto more = vs1();
  more.devices["c2"] = 6;
  EXPECT_THAT(told(present, {more}),
              ElementsAre("insert Interface", "insert Port", "mutate Bridge"));
  auto fewer = vs1();
  fewer.devices.clear();
  EXPECT_THAT(told(present, {fewer}), ElementsAre("mutate Bridge"));
  // A device whose number is another is put at the bridge anew.
  auto renumbered = vs1();
  renumbered.devices["c1"] = 9;
  auto const all = operations(present, Rows{renumbered}, kHost, 2);
  EXPECT_EQ(all[0]["row"]["ofport_request"], 9);
  EXPECT_THAT(all[2]["mutations"].dump(),
              HasSubstr(R"(["ports","delete",["set",[["uuid","p1"]]])"));
  auto limited = vs1();
  limited.limits[32] = 7;
  EXPECT_THAT(told(present, {limited}), ElementsAre("insert Flow_Table", "update Bridge"));
}

// As they are once those operations are done, with the identifiers t1, u and u0.
Replica replica_with_tunnels() {
  auto made = replica();
  made.apply(Json::parse(R"json({
    "Bridge": {
      "b1": {"modify": {"ports": ["uuid", "t1"]}},
      "u": {"initial": {"name": "vu1", "datapath_type": "netdev", "ports": ["uuid", "u0"],
                        "external_ids": ["map", [["simhost", "/h.db"],
                                                 ["simhost-role", "underlay"]]],
                        "fail_mode": "standalone",
                        "other_config": ["map", [["disable-in-band", "true"],
                                                 ["hwaddr", "02:00:00:00:00:01"]]]}}},
    "Port": {
      "t1": {"initial": {"name": "vt1", "interfaces": ["uuid", "it1"]}},
      "u0": {"initial": {"name": "vu1", "interfaces": ["uuid", "iu0"]}}},
    "Interface": {
      "it1": {"initial": {"name": "vt1", "ofport_request": 65216, "type": "vxlan",
                          "options": ["map", [["key", "5"], ["remote_ip", "192.0.2.2"]]]}},
      "iu0": {"initial": {"name": "vu1"}}}
  })json"));
  return made;
}

TEST(TheRows, OfTunnelsAndTheirUnderlayAreAddedAndThenLeftAlone) {
  auto tunnelled = vs1();
  tunnelled.tunnels["vt1"] = {
      .number = 65216, .type = "vxlan", .options = {{"remote_ip", "192.0.2.2"}, {"key", "5"}}};
  BridgeRow const underlay{
      .name = "vu1", .datapath = "netdev", .is_underlay = true, .address = "02:00:00:00:00:01"};
  Rows const wanted{tunnelled, underlay};
  auto const all = operations(present_rows(replica(), kHost), wanted, kHost, 2);
  EXPECT_EQ(all[0]["row"], Json::parse(R"json({
    "name": "vt1", "type": "vxlan", "ofport_request": 65216,
    "options": ["map", [["key", "5"], ["remote_ip", "192.0.2.2"]]]})json"));
  EXPECT_EQ(all[5]["row"]["fail_mode"], Json::parse(R"(["set", ["standalone"]])"));
  EXPECT_EQ(operations(present_rows(replica_with_tunnels(), kHost), wanted, kHost, 2).dump(), "[]");
  // Another key is another tunnel.
  auto other = wanted;
  other[0].tunnels["vt1"].options["key"] = "6";
  EXPECT_THAT(told(present_rows(replica_with_tunnels(), kHost), other),
              ElementsAre("insert Interface", "insert Port", "mutate Bridge"));
}

TEST(TheRows, SayWhichDevicesAreOthersOrOpenVswitchsOwn) {
  using Device = std::pair<std::string const, std::string>;
  EXPECT_THAT(present_rows(replica(), kHost).elsewhere,
              ElementsAre(Device("eth7", "br0"), Device("ovs-netdev", "ovs-netdev"),
                          Device("ovs-system", "ovs-system"), Device("vs1", "vs1")));
}

TEST(TheRows, SayWhatOpenVswitchCannotUse) {
  auto with_errors = replica();
  with_errors.apply(Json::parse(R"json({
    "Interface": {
      "i1": {"modify": {"error": "could not open c1"}},
      "i2": {"modify": {"error": "nobody here asked for eth7"}}}
  })json"));
  EXPECT_THAT(present_rows(replica(), kHost).errors, SizeIs(0));
  EXPECT_THAT(present_rows(with_errors, kHost).errors,
              ElementsAre(std::pair("c1", "could not open c1")));
  // It may say nothing but that there is no port of the device.
  auto without_port = replica();
  without_port.apply(Json::parse(R"({"Interface": {"i1": {"modify": {"ofport": -1}}}})"));
  EXPECT_THAT(present_rows(without_port, kHost).errors,
              ElementsAre(std::pair("c1", "its log says why")));
  without_port.apply(Json::parse(R"({"Interface": {"i1": {"modify": {"ofport": 5}}}})"));
  EXPECT_THAT(present_rows(without_port, kHost).errors, SizeIs(0));
  // It is nothing that could be made otherwise.
  EXPECT_THAT(told(present_rows(with_errors, kHost), {vs1()}), SizeIs(0));
}

TEST(TheRows, ThatSomebodyElseChangedAreMadeAsTheyWere) {
  auto standalone = replica();
  standalone.apply(
      Json::parse(R"json({"Bridge": {"b1": {"modify": {"fail_mode": "standalone"}}}})json"));
  EXPECT_THAT(told(present_rows(standalone, kHost), {vs1()}), ElementsAre("update Bridge"));
  for (auto const *change : {R"json({"Port": {"p1": {"modify": {"tag": 7}}}})json",
                             R"json({"Interface": {"i1": {"modify": {"type": "tap"}}}})json"}) {
    auto altered = replica();
    altered.apply(Json::parse(change));
    EXPECT_THAT(told(present_rows(altered, kHost), {vs1()}),
                ElementsAre("insert Interface", "insert Port", "mutate Bridge"));
  }
}

// The same bridge with a group of two devices.
Replica with_lag() {
  auto made = replica();
  made.apply(Json::parse(R"json({
    "Bridge": {"b1": {"modify": {"ports": ["uuid", "p3"]}}},
    "Port": {
      "p3": {"insert": {"name": "vs1-lag1", "interfaces": ["set", [["uuid", "i3"], ["uuid", "i4"]]],
                        "lacp": "active",
                        "other_config": ["map", [["lacp-system-id", "02:00:00:00:00:01"],
                                                 ["lacp-time", "fast"]]]}}},
    "Interface": {
      "i3": {"insert": {"name": "u0", "ofport_request": 7,
                        "other_config": ["map", [["lacp-aggregation-key", "1"]]]}},
      "i4": {"insert": {"name": "u1", "ofport_request": 8,
                        "other_config": ["map", [["lacp-aggregation-key", "1"]]]}}}
  })json"));
  return made;
}

BridgeRow vs1_with_lag() {
  auto bridge = vs1();
  bridge.devices.merge(std::map<std::string, std::uint16_t>{{"u0", 7}, {"u1", 8}});
  bridge.lags["vs1-lag1"] = {
      .devices = {"u0", "u1"}, .system = "02:00:00:00:00:01", .is_fast = true};
  return bridge;
}

TEST(TheRows, OfGroupsAreRead) {
  auto const present = present_rows(with_lag(), kHost);
  EXPECT_EQ(present.bridges.at(0).row, vs1_with_lag());
  EXPECT_THAT(told(present, {vs1_with_lag()}), SizeIs(0));
  EXPECT_THAT(present_rows(with_lag(), "/other.db").elsewhere,
              testing::IsSupersetOf({std::pair<std::string const, std::string>("u0", "vs1"),
                                     std::pair<std::string const, std::string>("u1", "vs1")}));
}

TEST(TheRows, OfAGroupAreOnePortWithItsDevices) {
  auto const all = operations(present_rows(replica(), kHost), Rows{vs1_with_lag()}, kHost, 2);
  ASSERT_THAT(all, SizeIs(4));
  EXPECT_EQ(all[0]["row"], Json::parse(R"json({
    "name": "u0", "ofport_request": 7, "type": "", "ingress_policing_rate": 0,
    "other_config": ["map", [["lacp-aggregation-key", "1"]]]})json"));
  EXPECT_EQ(all[1]["row"]["name"], "u1");
  EXPECT_EQ(all[2]["row"]["name"], "vs1-lag1");
  EXPECT_EQ(all[2]["row"]["lacp"], simhost::ovsdb::set({"active"}));
  EXPECT_THAT(all[2]["row"]["other_config"].dump(), HasSubstr(R"(["lacp-time","fast"])"));
  EXPECT_THAT(all[2]["row"]["interfaces"][1], SizeIs(2));
}

TEST(TheRows, OfADeviceGoWithItIntoAGroupAndOutOfIt) {
  auto alone = vs1_with_lag();
  alone.lags.clear();
  EXPECT_THAT(told(present_rows(with_lag(), kHost), {alone}),
              ElementsAre("insert Interface", "insert Port", "insert Interface", "insert Port",
                          "mutate Bridge"));
  auto joined = vs1_with_lag();
  joined.lags["vs1-lag1"].devices.insert("c1");
  auto const all = operations(present_rows(with_lag(), kHost), Rows{joined}, kHost, 2);
  ASSERT_THAT(all, SizeIs(3));
  EXPECT_EQ(all[1]["table"], "Port") << "that of the group stays, and so do its partners";
  EXPECT_THAT(all[2]["mutations"].dump(),
              HasSubstr(R"(["ports","delete",["set",[["uuid","p1"]]])"));
}

TEST(TheRows, OfAGroupChangeInPlace) {
  auto const present = present_rows(with_lag(), kHost);
  auto slow = vs1_with_lag();
  slow.lags["vs1-lag1"].is_fast = false;
  EXPECT_THAT(told(present, {slow}), ElementsAre("update Port"));
  auto fewer = vs1_with_lag();
  fewer.devices.erase("u0");
  auto const all = operations(present, Rows{fewer}, kHost, 2);
  ASSERT_THAT(all, SizeIs(1));
  EXPECT_EQ(all[0]["mutations"].dump(), R"([["interfaces","delete",["set",[["uuid","i3"]]]]])");
  auto none = vs1();
  none.lags = vs1_with_lag().lags;
  EXPECT_THAT(told(present, {none}), ElementsAre("mutate Bridge"));
}

TEST(TheRows, OfAGroupThatSomebodyElseChangedAreMadeAsTheyWere) {
  auto altered = with_lag();
  altered.apply(Json::parse(R"json({"Port": {"p3": {"modify": {"lacp": "passive"}}}})json"));
  EXPECT_THAT(told(present_rows(altered, kHost), {vs1_with_lag()}), ElementsAre("update Port"));
  altered = with_lag();
  altered.apply(Json::parse(R"json({"Interface": {"i4": {"modify": {
      "other_config": ["map", [["lacp-aggregation-key", "9"]]]}}}})json"));
  EXPECT_THAT(told(present_rows(altered, kHost), {vs1_with_lag()}),
              ElementsAre("insert Interface", "mutate Port"));
  altered.apply(Json::parse(R"json({"Interface": {"i3": {"modify": {
      "other_config": ["map", [["lacp-aggregation-key", "9"]]]}}}})json"));
  EXPECT_THAT(told(present_rows(altered, kHost), {vs1_with_lag()}),
              ElementsAre("insert Interface", "insert Interface", "mutate Port"));
}

TEST(TheRows, OfBridgesThatNobodyWantsGoWithAllThatIsTheirs) {
  EXPECT_THAT(told(present_rows(replica(), kHost), {}), ElementsAre("mutate Open_vSwitch"));
}

TEST(TheRows, OfABridgeWithAnotherDataPathAreMadeAnew) {
  auto other = vs1();
  other.datapath = "system";
  auto const all = told(present_rows(replica(), kHost), {other});
  EXPECT_THAT(all, testing::Contains("insert Bridge"));
  EXPECT_EQ(all.back(), "mutate Open_vSwitch");
}

TEST(TheRows, OfANewDatabaseBeginWithItsOnlyRow) {
  auto const present = present_rows(replica_of("{}"), kHost);
  EXPECT_TRUE(present.is_new);
  EXPECT_EQ(told(present, {vs1()}).front(), "insert Open_vSwitch");
}

TEST(TheRows, ThatDoNotFitTogetherAreRefusedInWords) {
  for (
      auto const *said :
      {R"({"Bridge": {"b1": {"modify": {"ports": ["set", [["uuid", "gone"]]]}}}})",
       R"({"Port": {"p1": {"delete": null}}})", R"({"Interface": {"i1": {"delete": null}}})",
       R"({"Flow_Table": {"t": {"delete": null}}})",
       R"({"Open_vSwitch": {"o": {"modify": {"other_config": ["map", [["vlan-limit", "x"]]]}}}})"}) {
    auto changed = replica();
    changed.apply(Json::parse(said));
    EXPECT_THAT([&] { present_rows(changed, kHost); },
                testing::ThrowsMessage<std::runtime_error>(HasSubstr("Open vSwitch's database")))
        << said;
  }
}

}  // namespace
