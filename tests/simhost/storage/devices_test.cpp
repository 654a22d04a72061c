// The rows of devices: one holder each, and a number by which the data path knows them.
#include "storage/running/devices.h"

#include <gmock/gmock.h>

#include <string>

#include "named_switch.h"
#include "storage/query.h"
#include "storage/running/frames.h"
#include "storage/store.h"

namespace {

using namespace simhost::storage;
using testing::Eq;
using testing::Optional;

struct Devices : testing::Test {
  Devices() {
    add_uplink(transaction, "nic0");
    key = *add_switch(transaction, named("s"));
    p1 = *add_port(transaction, key, "p1", PortKind::client);
    p2 = *add_port(transaction, key, "p2", PortKind::client);
  }
  bool put(PortNumber port, char const *name) {
    return put_device(transaction, port, name, std::nullopt);
  }
  int number_of(PortNumber port) { return device_of(transaction, port)->number; }
  void set_number(int number) {
    Change(transaction, "UPDATE device SET number = ?").with(std::int64_t{number}).run();
  }

  Store store{std::nullopt, [](ChangingTransaction &) {}};
  ChangingTransaction transaction{store};
  SwitchKey key{};
  PortNumber p1{};
  PortNumber p2{};
};

constexpr MacBytes kClient{std::byte{2}, {}, {}, {}, {}, std::byte{1}};

TEST_F(Devices, AreFoundByTheirHoldersAndTheOtherWayRound) {
  EXPECT_FALSE(has_port_device(transaction, key));
  ASSERT_TRUE(put(p2, "tap2"));
  ASSERT_TRUE(put_device(transaction, p1, "tap1", kClient));
  ASSERT_TRUE(put_device(transaction, "nic0", "eth1"));
  EXPECT_TRUE(has_port_device(transaction, key));
  auto const devices = port_devices(transaction, key);
  ASSERT_EQ(devices.size(), 2U);
  EXPECT_EQ(devices[0].port, p1);
  EXPECT_EQ(devices[0].device, (Device{.name = "tap1", .number = 2, .mac = kClient}));
  EXPECT_EQ(devices[1].device, (Device{.name = "tap2", .number = 1}));
  EXPECT_THAT(find_device(transaction, "tap2")->port, Optional(p2));
  EXPECT_THAT(find_device(transaction, "eth1")->uplink, Optional(Eq("nic0")));
  EXPECT_FALSE(find_device(transaction, "eth2"));
  EXPECT_THAT(first_device(transaction), Optional(Eq("eth1")));
}

TEST_F(Devices, KeepTheirNumberWhileTheyStay) {
  put(p1, "tap1");
  put(p2, "tap2");
  ASSERT_TRUE(put_device(transaction, p1, "tap1", kClient));
  EXPECT_EQ(number_of(p1), 1);
  EXPECT_EQ(device_of(transaction, p1)->mac, kClient);
  put(p1, "tap1");
  EXPECT_FALSE(device_of(transaction, p1)->mac);
  put(p1, "tap3");
  EXPECT_EQ(number_of(p1), 3);
}

TEST_F(Devices, HaveNumbersInTheGapsOnceTheLastIsTaken) {
  put(p1, "tap1");
  set_number(65213);
  put(p2, "tap2");
  EXPECT_EQ(number_of(p2), 1);
}

TEST_F(Devices, GoWithTheirHolders) {
  put(p1, "tap1");
  put_device(transaction, "nic0", "eth1");
  remove_port(transaction, p1);
  remove_uplinks(transaction);
  EXPECT_FALSE(first_device(transaction));
}

TEST_F(Devices, AreBroughtIntoForceFromTheDayOnWhichADaemonTookTheHost) {
  advance_frames_change(transaction);
  EXPECT_FALSE(frames_change(transaction));
  take_frames(transaction);
  EXPECT_THAT(frames_change(transaction), Optional(1U));
  advance_frames_change(transaction);
  take_frames(transaction);
  EXPECT_THAT(frames_change(transaction), Optional(2U));
}

}  // namespace
