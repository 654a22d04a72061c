// What is known of wires while one of them cannot be asked.
#include "daemon/devices/uplink_wires.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <map>
#include <string>
#include <system_error>
#include <vector>

#include "own_network.h"

namespace {

using simhost::daemon::Arrived;
using simhost::daemon::NetworkDevices;
using simhost::daemon::UplinkWires;
using testing::ElementsAre;
using testing::Optional;

TEST(TheWires, AreEachAskedWhateverIsWrongWithAnother) {
  enter_own_network();
  for (auto const *wire : {"u0", "u1", "u2"}) {
    ip(std::string("link add ") + wire + " type veth peer name far-" + wire);
    ip(std::string("link set ") + wire + " up");
    ip(std::string("link set far-") + wire + " up");
  }
  simhost::events::Loop loop;
  NetworkDevices devices(loop, [] {});
  std::map<unsigned, Arrived> arrived;
  auto const silent = devices.find("u1")->index;
  UplinkWires wires([&](unsigned device) {
    if (device == silent) {
      throw std::system_error(EPERM, std::generic_category(), "the counters of devices");
    }
    return std::optional(arrived[device]);
  });
  wires.follow({"u0", "u1", "u2"});
  std::vector<std::string> said;
  auto const look = [&] {
    return wires.look(devices, [&](std::string const &why) { said.push_back(why); });
  };
  EXPECT_FALSE(look());
  for (auto const *wire : {"u0", "u2"}) {
    arrived[devices.find(wire)->index] = {.whole = 75, .damaged = 25};
  }
  said.clear();
  EXPECT_TRUE(look());
  EXPECT_THAT(said, ElementsAre("what came in at the device u1 is not known: "
                                "the counters of devices: Operation not permitted"));
  EXPECT_THAT(wires.damaged_percent("u0"), Optional(25U));
  EXPECT_EQ(wires.damaged_percent("u1"), std::nullopt);
  EXPECT_THAT(wires.damaged_percent("u2"), Optional(25U));
}

}  // namespace
