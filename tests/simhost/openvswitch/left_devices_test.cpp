// What a killed switch leaves behind is in nobody's way.
#include "planes/openvswitch/processes/left_devices.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <linux/if.h>
#include <linux/if_tun.h>
#include <sys/ioctl.h>

#include <cerrno>
#include <chrono>
#include <cstring>
#include <filesystem>
#include <fstream>

#include "events/descriptor.h"
#include "events/process.h"
#include "own_network.h"
#include "planes/openvswitch/processes/private_openvswitch.h"
#include "temporary_folder.h"

namespace {

using simhost::events::Descriptor;
using simhost::events::Loop;
using simhost::events::Process;
using simhost::openvswitch::Datapath;
using simhost::openvswitch::network_devices;
using simhost::openvswitch::PrivateOpenVswitch;
using simhost::openvswitch::remove_left;
using namespace std::chrono_literals;

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

// It does nothing but bear the name.
TEST(WhatASwitchLeavesBehind, IsRemovedByTheNextOneInItsFolder) {
  enter_own_network();
  TemporaryFolder const folder;
  auto const own = folder.file("ovs");
  std::filesystem::create_directory(own);
  auto const program = folder.file("ovs-vswitchd");
  std::filesystem::copy_file("/bin/sleep", program);
  Loop loop;
  auto const of_another = tap("vs2");
  auto const left_beside_next_one = [&] {
    std::ofstream(own / "vs1.mgmt") << "";
    auto const datapath = tap("ovs-netdev");
    auto const bridge = tap("vs1");
    PrivateOpenVswitch const next(loop, own, Datapath::netdev, {});
    return network_devices();
  };
  EXPECT_THAT(left_beside_next_one(), testing::UnorderedElementsAre("lo", "vs2"));
  Process running(loop, {.program = program, .words = {"600"}, .environment = {}},
                  [](std::string const &) {});
  while (!simhost::openvswitch::is_switch_running()) {
    loop.turn(1ms);
  }
  // Which data path that is cannot be told.
  EXPECT_THAT(left_beside_next_one(), testing::UnorderedElementsAre("lo", "vs2", "ovs-netdev"));
  running.end(1s);
  EXPECT_THAT(left_beside_next_one(), testing::UnorderedElementsAre("lo", "vs2"));

  // One that runs where its process is not seen.
  auto const datapath = tap("ovs-netdev");
  PrivateOpenVswitch const next(loop, own, Datapath::netdev, {});
  EXPECT_THAT(network_devices(), testing::UnorderedElementsAre("lo", "vs2", "ovs-netdev"));
}

}  // namespace
