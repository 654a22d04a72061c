// Which rows are told, and when.
#include "daemon/bridge/bridge_rows.h"

#include <gmock/gmock.h>

#include <vector>

namespace simhost::daemon {
namespace {

using openvswitch::BridgeRow;
using openvswitch::PresentBridge;
using openvswitch::PresentRows;
using testing::ElementsAre;

BridgeRow row(std::string const &name, std::map<std::string, std::uint16_t> devices) {
  return {.name = name, .datapath = "netdev", .devices = std::move(devices), .limits = {{32, 9}}};
}

PresentRows with(BridgeRow const &row) {
  PresentRows present;
  present.bridges.push_back({.id = "1", .row = row, .ports = {}});
  for (auto const &[device, number] : row.devices) {
    present.bridges.back().ports[device] = "2";
  }
  return present;
}

WantedBridge wanted(BridgeRow const &row) {
  WantedBridge bridge{};
  bridge.row = row;
  return bridge;
}

TEST(RowsOfBridges, HaveNoDevicesBeforeABridgeHasItsFlows) {
  auto const present = with(row("there", {{"a", 1}}));
  std::vector const all{row("there", {{"a", 1}, {"b", 2}}), row("new", {{"c", 3}})};
  EXPECT_TRUE(has_new(all, present));
  EXPECT_FALSE(has_new({all[0]}, present));
  EXPECT_THAT(rows_before_flows(all, present), ElementsAre(all[0], row("new", {})));
}

TEST(RowsOfBridges, LeaveOutDevicesThatOthersHave) {
  PresentRows present;
  present.elsewhere["b"] = "of somebody else";
  Wanted all;
  all.bridges = {wanted(row("new", {{"a", 1}, {"b", 2}}))};
  EXPECT_THAT(wanted_rows(all, present), ElementsAre(row("new", {{"a", 1}})));
}

TEST(RowsOfBridges, StayAsTheyAreForASwitchThatCannotBeRun) {
  auto const present = with(row("there", {{"a", 1}}));
  Wanted all;
  EXPECT_THAT(wanted_rows(all, present), ElementsAre());
  all.unfit.push_back({.key = {}, .alias = "", .bridge = "there", .why = ""});
  EXPECT_THAT(wanted_rows(all, present), ElementsAre(row("there", {{"a", 1}})));
}

TEST(RowsOfBridges, TellWhichDevicesCome) {
  auto const present = with(row("there", {{"a", 1}, {"c", 3}}));
  std::vector const all{row("there", {{"a", 1}, {"b", 2}}), row("new", {{"d", 4}})};
  EXPECT_THAT(added_devices(present, all), ElementsAre("b", "d"));
}

}  // namespace
}  // namespace simhost::daemon
