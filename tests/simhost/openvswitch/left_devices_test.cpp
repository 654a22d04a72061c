// What a killed switch leaves behind is in nobody's way.
#include "planes/openvswitch/processes/left_devices.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <linux/if.h>
#include <linux/if_tun.h>
#include <sys/ioctl.h>

#include <cerrno>
#include <cstring>
#include <fstream>

#include "events/descriptor.h"
#include "own_network.h"
#include "temporary_folder.h"

namespace {

using simhost::events::Descriptor;
using simhost::openvswitch::network_devices;
using simhost::openvswitch::remove_left;

// Held by a process that is about to end for as long as this is open.
Descriptor tap(char const *name) {
  Descriptor made(open("/dev/net/tun", O_RDWR | O_CLOEXEC));
  ifreq request{};
  std::strncpy(request.ifr_name, name, IFNAMSIZ - 1);
  request.ifr_flags = IFF_TAP | IFF_NO_PI;
  return ioctl(made.number(), TUNSETIFF, &request) == 0 ? std::move(made) : Descriptor();
}

TEST(WhatASwitchLeavesBehind, IsRemovedUnlessItIsOfOthers) {
  enter_own_network();
  TemporaryFolder const folder;
  auto const in_folder = folder.file(".");
  for (auto const *name : {"vs1.mgmt", "vs1.snoop", "vs2.mgmt", "db.sock", "vs3"}) {
    std::ofstream(folder.file(name)) << "";
  }
  auto const of_another = tap("vs2");
  auto const others = network_devices();
  ASSERT_TRUE(others.contains("vs2"));
  auto const datapath = tap("ovs-netdev");
  auto const bridge = tap("vs1");
  auto const no_bridge = tap("vs3");
  ASSERT_TRUE(datapath && bridge && no_bridge);
  ASSERT_FALSE(tap("vs1")) << "nobody else may have it";

  remove_left(in_folder, others);
  EXPECT_THAT(network_devices(), testing::UnorderedElementsAre("lo", "vs2", "vs3"));
  EXPECT_TRUE(tap("vs1") && tap("ovs-netdev")) << "another one may have them now";
  EXPECT_FALSE(std::filesystem::exists(folder.file("vs1.mgmt")));
  EXPECT_FALSE(std::filesystem::exists(folder.file("vs1.snoop")));
  EXPECT_TRUE(std::filesystem::exists(folder.file("db.sock")));

  // Nothing is left, and nothing is wrong with that.
  remove_left(folder.file("nowhere"), others);
}

}  // namespace
