// Devices of ports and uplinks: one holder each, and nobody tells what comes over real wires.
#include "model/devices/devices.h"

#include <gmock/gmock.h>

#include <string>

#include "clock/clock.h"
#include "memory_state.h"
#include "model/lookup.h"
#include "model/ports/ports.h"
#include "model/switches/switches.h"
#include "scenario/scenario.h"

namespace {

using simhost::connect;
using simhost::Refused;
using simhost::storage::ChangingTransaction;
using simhost::storage::Device;
using simhost::storage::MacBytes;
using testing::Optional;
using testing::StrEq;

struct Devices : MemoryState {
  Devices() {
    simhost::create_switch(transaction, {.alias = "s", .uplink_count = 1});
    key = simhost::get_switch(transaction, "s").key;
    p1 = simhost::add_client_port(transaction, key, "p1");
    p2 = simhost::add_client_port(transaction, key, "p2");
  }

  simhost::storage::Uplink uplink() { return simhost::get_uplink(transaction, "nic0"); }
  std::string refusal(std::string const &document) {
    try {
      simhost::scenario::apply(transaction, document);
    } catch (std::exception const &error) {
      return error.what();
    }
    return {};
  }

  ChangingTransaction transaction{store};
  simhost::storage::SwitchKey key{};
  simhost::storage::Port p1{};
  simhost::storage::Port p2{};
};

constexpr MacBytes kClient{std::byte{2}, {}, {}, {}, {}, std::byte{1}};

TEST_F(Devices, AreKeptReplacedAndTakenAway) {
  connect(transaction, p1, "tap0", std::nullopt);
  connect(transaction, p1, "tap1", kClient);
  EXPECT_THAT(simhost::storage::device_of(transaction, p1.number),
              Optional(Device{.name = "tap1", .number = 1, .mac = kClient}));
  connect(transaction, p2, "tap0", std::nullopt);
  auto const devices = simhost::storage::port_devices(transaction, key);
  ASSERT_EQ(devices.size(), 2U);
  EXPECT_EQ(devices[0].device.number, 1);
  EXPECT_EQ(devices[1].device.number, 2);
  connect(transaction, p2, "tap0", kClient);
  EXPECT_EQ(simhost::storage::device_of(transaction, p2.number)->number, 2);
  simhost::disconnect(transaction, p1);
  EXPECT_FALSE(simhost::storage::device_of(transaction, p1.number));
  EXPECT_EQ(status_of([&] { simhost::disconnect(transaction, p1); }), QEX_IS_DISCONNECTED);
}

TEST_F(Devices, OfOneHolderAreRefusedToAnother) {
  connect(transaction, p1, "tap0", std::nullopt);
  connect(transaction, p1, "tap0", kClient);
  EXPECT_THAT(
      refusal(R"({"uplinks": [{"name": "nic0", "device": "tap0"}]})"),
      StrEq("uplinks[0].device: the host refuses it: the device tap0 is at the port 'p1' of "
            "the switch 's' (QEX_BUSY)"));
  connect(transaction, uplink(), "eth1");
  EXPECT_EQ(status_of([&] { connect(transaction, p2, "eth1", std::nullopt); }), QEX_BUSY);
}

TEST_F(Devices, WithNamesThatNoneCanHaveAreRefused) {
  for (auto const *name : {"", ".", "..", "a/b", "a b", "a:b", "sixteen-bytes-xx", "\xC3\xA4"}) {
    EXPECT_EQ(status_of([&] { connect(transaction, p1, name, std::nullopt); }), QEX_INVALID_NAME)
        << name;
  }
  connect(transaction, p1, "fifteen-bytes-x", std::nullopt);
}

TEST_F(Devices, OfClientsThatNoneCanBeAreRefused) {
  EXPECT_EQ(status_of([&] { connect(transaction, p1, "tap0", MacBytes{}); }), QEX_INVALID_ADDRESS);
  MacBytes const multicast{std::byte{1}};
  EXPECT_EQ(status_of([&] { connect(transaction, p1, "tap0", multicast); }), QEX_INVALID_ADDRESS);
}

TEST_F(Devices, AreNoneOfUplinkPorts) {
  auto const port = simhost::storage::uplink_ports_of(transaction, key).at(0);
  EXPECT_EQ(status_of([&] { connect(transaction, port, "tap0", std::nullopt); }),
            QEX_NOT_SUPPORTED);
}

TEST_F(Devices, TellWhatComesOverTheirWiresThemselves) {
  connect(transaction, p1, "tap0", std::nullopt);
  connect(transaction, uplink(), "eth1");
  EXPECT_THAT(refusal(R"({"uplinks": [{"name": "nic0", "link": "down"}]})"),
              StrEq("uplinks[0]: the host refuses it: the uplink 'nic0' has the device eth1: what "
                    "comes over it cannot be set (QEX_NOT_SUPPORTED)"));
  auto const of_port = [&](std::string const &member) {
    return refusal(R"({"switches": [{"alias": "s", "ports": [{"id": "p1", )" + member + "}]}]}");
  };
  EXPECT_THAT(of_port(R"("addresses": [{"mac": "02:00:00:00:00:07"}])"),
              StrEq("switches[0].ports[0].addresses[0]: the host refuses it: the port 'p1' of the "
                    "switch 's' has the device tap0: what comes over it cannot be set "
                    "(QEX_NOT_SUPPORTED)"));
  EXPECT_THAT(of_port(R"("counters": {"pktsInUnicast": 1})"), testing::HasSubstr("tap0"));
  EXPECT_THAT(of_port(R"("groups": [{"address": "239.1.1.1"}])"), testing::HasSubstr("tap0"));
  EXPECT_THAT(refusal(R"({"switches": [{"alias": "s", "counters": {"txErrors": 1}}]})"),
              testing::HasSubstr("eth1"));
  // An address that is set is a setting, and the other port is nobody's wire.
  EXPECT_EQ(of_port(R"("addresses": [{"mac": "02:00:00:00:00:07", "type": "static"}])"), "");
  EXPECT_EQ(refusal(R"({"switches": [{"alias": "s", "ports":
                        [{"id": "p2", "addresses": [{"mac": "02:00:00:00:00:08"}]}]}]})"),
            "");
}

TEST_F(Devices, GoByRealTime) {
  connect(transaction, p1, "tap0", std::nullopt);
  EXPECT_THAT(refusal(R"({"clock": {"stopped": true}})"),
              StrEq("clock: the host refuses it: the frames of the device tap0 go by real time "
                    "(QEX_NOT_SUPPORTED)"));
  simhost::disconnect(transaction, p1);
  EXPECT_EQ(refusal(R"({"clock": {"stopped": true}})"), "");
  EXPECT_EQ(status_of([&] { connect(transaction, p1, "tap0", std::nullopt); }), QEX_NOT_SUPPORTED);
}

TEST_F(Devices, GoWithTheirHolders) {
  connect(transaction, p1, "tap0", std::nullopt);
  connect(transaction, uplink(), "eth1");
  simhost::remove_port(transaction, p1);
  simhost::storage::remove_uplinks(transaction);
  EXPECT_FALSE(simhost::storage::first_device(transaction));
}

TEST_F(Devices, AreDescribedAndRead) {
  connect(transaction, p1, "tap0", kClient);
  connect(transaction, p2, "tap1", std::nullopt);
  connect(transaction, uplink(), "eth1");
  auto const host = simhost::scenario::host_to_json(transaction);
  EXPECT_EQ(host["uplinks"][0]["device"], "eth1");
  EXPECT_FALSE(host["uplinks"][0].contains("link"));
  auto const &ports = host["switches"][0]["ports"];
  EXPECT_EQ(ports[0]["device"],
            (simhost::scenario::Json{{"name", "tap0"}, {"mac", "02:00:00:00:00:01"}}));
  EXPECT_EQ(ports[1]["device"], "tap1");
  EXPECT_EQ(refusal(R"({"switches": [{"alias": "s", "ports": [{"id": "p1", "device": ""}]}],
                        "uplinks": [{"name": "nic0", "device": ""}]})"),
            "");
  EXPECT_FALSE(simhost::storage::device_of(transaction, p1.number));
  EXPECT_FALSE(simhost::storage::device_of(transaction, "nic0"));
  EXPECT_THAT(refusal(R"({"switches": [{"alias": "s", "ports":
                          [{"id": "p1", "device": {"name": "tap0", "mac": "here"}}]}]})"),
              StrEq("switches[0].ports[0].device.mac: must be six bytes such as "
                    "02:00:00:00:00:01"));
}

}  // namespace
