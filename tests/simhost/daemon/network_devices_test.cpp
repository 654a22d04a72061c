// What is known of network devices, in a namespace of the test's own.
#include "daemon/devices/network_devices.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/rtnetlink.h>
#include <sys/socket.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <string>
#include <thread>

#include "own_network.h"

namespace {

using simhost::daemon::NetworkDevices;
using testing::Contains;
using testing::Key;
using testing::Not;
using testing::Pair;
using namespace std::chrono_literals;

class TheNetworkDevices : public testing::Test {
 protected:
  void SetUp() override { enter_own_network(); }

  simhost::events::Loop loop;
  int changes = 0;
};

TEST_F(TheNetworkDevices, AreKnownAsSoonAsTheyAreMade) {
  ip("link add before type veth peer name other");
  NetworkDevices devices(loop, [this] { ++changes; });
  ASSERT_TRUE(devices.find("before"));
  EXPECT_EQ(devices.find("before")->mtu, 1500U);
  EXPECT_FALSE(devices.find("before")->is_up);
  EXPECT_FALSE(devices.find("after"));
  devices.refresh();
  EXPECT_EQ(changes, 0);

  ip("link add after type veth peer name another");
  devices.refresh();
  EXPECT_TRUE(devices.find("after"));
  // Whoever asked, others wait for that.
  EXPECT_EQ(changes, 1);
}

// A question on the socket that the devices are told on, to which the kernel replies with an error.
void have_an_error_told() {
  for (auto const &entry : std::filesystem::directory_iterator("/proc/self/fd")) {
    int const number = std::stoi(entry.path().filename());
    int domain = 0;
    socklen_t size = sizeof domain;
    if (getsockopt(number, SOL_SOCKET, SO_DOMAIN, &domain, &size) == 0 && domain == AF_NETLINK) {
      nlmsghdr const question{.nlmsg_len = sizeof question,
                              .nlmsg_type = RTM_SETLINK,
                              .nlmsg_flags = NLM_F_REQUEST | NLM_F_ACK,
                              .nlmsg_seq = 0,
                              .nlmsg_pid = 0};
      ASSERT_EQ(send(number, &question, sizeof question, 0), ssize_t{sizeof question});
    }
  }
}

TEST_F(TheNetworkDevices, AreAskedForAgainAfterAnError) {
  ip("link add one type veth peer name other");
  NetworkDevices devices(loop, [&] { ++changes; });
  have_an_error_told();
  EXPECT_THROW(devices.refresh(), std::runtime_error);
  ip("link delete one");
  devices.refresh();
  EXPECT_FALSE(devices.find("one"));
  EXPECT_EQ(changes, 1);
  // Nothing leaves a loop: who is told looks.
  have_an_error_told();
  loop.turn(5s);
  EXPECT_EQ(changes, 2);
  ip("link add two type veth peer name other");
  devices.refresh();
  EXPECT_TRUE(devices.find("two"));
}

// The kernel looks for carriers when it has time.
bool comes_to_have_link(NetworkDevices &devices, std::string const &name, bool wanted) {
  auto const end = std::chrono::steady_clock::now() + 10s;
  while (devices.find(name)->has_link != wanted && std::chrono::steady_clock::now() < end) {
    std::this_thread::sleep_for(1ms);
    devices.refresh();
  }
  return devices.find(name)->has_link == wanted;
}

TEST_F(TheNetworkDevices, AreFollowed) {
  ip("link add one type veth peer name other");
  NetworkDevices devices(loop, [] {});
  auto const index = devices.find("one")->index;
  EXPECT_THAT(devices.switched_off(), Contains("one"));
  ip("link set one up mtu 9000");
  ip("link set other up");
  devices.refresh();
  EXPECT_TRUE(devices.find("one")->is_up);
  EXPECT_TRUE(comes_to_have_link(devices, "one", true));
  EXPECT_EQ(devices.find("one")->mtu, 9000U);
  EXPECT_THAT(devices.switched_off(), Not(Contains("one")));
  EXPECT_THAT(devices.smaller_than(9000), Not(Contains(Key("one"))));
  EXPECT_THAT(devices.smaller_than(9001), Contains(Pair("one", 9000U)));

  ip("link set other down");
  devices.refresh();
  EXPECT_TRUE(comes_to_have_link(devices, "one", false));

  ip("link set one down");
  ip("link set one name two");
  devices.refresh();
  EXPECT_FALSE(devices.find("one"));
  EXPECT_EQ(devices.find("two")->index, index);

  ip("link delete two");
  ip("link add two type veth peer name other");
  devices.refresh();
  EXPECT_NE(devices.find("two")->index, index);
}

TEST_F(TheNetworkDevices, OfBridgesGoOnBeingThereAsPorts) {
  ip("link add one type veth peer name other");
  ip("link add bridge type bridge");
  NetworkDevices devices(loop, [] {});
  ip("link set one master bridge");
  ip("link set one nomaster");
  devices.refresh();
  EXPECT_TRUE(devices.find("one"));
}

TEST_F(TheNetworkDevices, AreTold) {
  NetworkDevices devices(loop, [this] { ++changes; });
  ip("link add one type veth peer name other");
  loop.turn(1s);
  EXPECT_EQ(changes, 1);
  ip("link set one promisc on");
  loop.turn(1s);
  EXPECT_EQ(changes, 1);
  EXPECT_TRUE(devices.find("one"));
}

// More than the kernel keeps for who does not listen.
TEST_F(TheNetworkDevices, AreKnownThoughSomeOfWhatIsToldWasLost) {
  ip("link add gone type veth peer name other");
  NetworkDevices devices(loop, [] {});
  auto *const batch = popen("ip -batch -", "w");
  ASSERT_NE(batch, nullptr);
  std::fputs("link delete gone\nlink add one type veth peer name other\n", batch);
  for (int time = 0; time < 3000; ++time) {
    std::fputs(time % 2 == 0 ? "link set one mtu 1400\n" : "link set one mtu 1401\n", batch);
  }
  std::fputs("link set one mtu 1300\n", batch);
  ASSERT_EQ(pclose(batch), 0);
  devices.refresh();
  EXPECT_FALSE(devices.find("gone"));
  ASSERT_TRUE(devices.find("one"));
  EXPECT_EQ(devices.find("one")->mtu, 1300U);
}

}  // namespace
