// A private Open vSwitch starts, comes back after a kill, and leaves nothing running.
#include "planes/openvswitch/processes/private_openvswitch.h"

#include <gmock/gmock.h>
#include <sys/syscall.h>

#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <utility>

#include "refused_calls.h"
#include "temporary_folder.h"

namespace {

using simhost::events::Loop;
using simhost::openvswitch::Datapath;
using simhost::openvswitch::PrivateOpenVswitch;
using testing::HasSubstr;
using testing::Not;

// Nothing of a process that ends meanwhile: an iterator of the file would throw.
std::string content_of(std::filesystem::path const &file) {
  std::ostringstream all;
  all << std::ifstream(file).rdbuf();
  return all.str();
}

// The processes whose command lines name the folder.
std::vector<int> processes_in(std::filesystem::path const &folder) {
  std::vector<int> found;
  for (auto const &entry : std::filesystem::directory_iterator("/proc")) {
    if (content_of(entry.path() / "cmdline").find(folder.string()) != std::string::npos) {
      found.push_back(std::stoi(entry.path().filename()));
    }
  }
  return found;
}

// Likewise, once there are two: a child has its parent's command line until it has become a
// program.
std::vector<int> both_processes_in(std::filesystem::path const &folder) {
  auto const deadline = std::chrono::steady_clock::now() + std::chrono::seconds(30);
  auto found = processes_in(folder);
  while (found.size() < 2 && std::chrono::steady_clock::now() < deadline) {
    found = processes_in(folder);
  }
  return found;
}

struct AnOpenVswitch : testing::Test {
  [[nodiscard]] std::filesystem::path own() const { return folder.file("ovs"); }
  PrivateOpenVswitch::Told told() {
    return {.started = [this] { has_started = true; },
            .ended = [] {},
            .said = [this](std::string const &text) { said += text + "\n"; }};
  }

  // It may have done so already.
  void wait_until_started() {
    while (!std::exchange(has_started, false)) {
      loop.turn(std::chrono::seconds(1));
    }
  }

  TemporaryFolder folder;
  Loop loop;
  bool has_started = false;
  std::string said;
};

TEST_F(AnOpenVswitch, StartsAndEndsWithItsOwner) {
  {
    PrivateOpenVswitch openvswitch(loop, own(), Datapath::netdev, told());
    openvswitch.start();
    wait_until_started();
    EXPECT_EQ(both_processes_in(own()).size(), 2U);
  }
  EXPECT_TRUE(processes_in(own()).empty());
  EXPECT_EQ(said, "");
}

std::string environment_of(int process) {
  return content_of("/proc/" + std::to_string(process) + "/environ");
}

TEST_F(AnOpenVswitch, KeepsMemoryAtHandUnlessToldOtherwise) {
  auto const tunables = [&] {
    PrivateOpenVswitch openvswitch(loop, own(), Datapath::netdev, told());
    openvswitch.start();
    wait_until_started();
    std::string all;
    for (auto const process : both_processes_in(own())) {
      all += environment_of(process);
    }
    return all;
  };
  EXPECT_THAT(tunables(), HasSubstr("GLIBC_TUNABLES=glibc.malloc.tcache_count="));
  setenv("GLIBC_TUNABLES", "glibc.malloc.check=0", 1);
  EXPECT_THAT(tunables(), Not(HasSubstr("tcache_count")));
  unsetenv("GLIBC_TUNABLES");
}

TEST_F(AnOpenVswitch, StartsWhateverItsFolderIsCalled) {
  // No address of a socket is that long.
  auto const deep = own() / std::string(120, 'd') / std::string(120, 'e');
  PrivateOpenVswitch openvswitch(loop, deep, Datapath::netdev, told());
  openvswitch.start();
  wait_until_started();
  EXPECT_EQ(both_processes_in(deep).size(), 2U);
  EXPECT_EQ(said, "");
}

TEST_F(AnOpenVswitch, ComesBackWhole) {
  PrivateOpenVswitch openvswitch(loop, own(), Datapath::netdev, told());
  openvswitch.start();
  wait_until_started();
  for (auto const which : {0, 1}) {
    auto const before = both_processes_in(own());
    ASSERT_EQ(before.size(), 2U);
    kill(before.at(static_cast<std::size_t>(which)), SIGKILL);
    wait_until_started();
    for (auto const process : both_processes_in(own())) {
      EXPECT_THAT(before, testing::Not(testing::Contains(process)));
    }
  }
  EXPECT_THAT(said, HasSubstr("was ended by signal 9: both processes of Open vSwitch start anew"));
}

void start_where_no_process_can_be_made_any_more(std::filesystem::path const &own) {
  Loop loop;
  std::string said;
  PrivateOpenVswitch openvswitch(loop, own, Datapath::netdev,
                                 {.started = [] { std::_Exit(1); },
                                  .ended = [] {},
                                  .said = [&](std::string const &text) { said += text + "\n"; }});
  openvswitch.start();
  refuse_calls({SYS_clone, SYS_clone3}, EAGAIN);
  // It goes on trying.
  auto const failures = [&] {
    std::size_t count = 0;
    for (auto at = said.find("Open vSwitch cannot be started: fork"); at != std::string::npos;
         at = said.find("Open vSwitch cannot be started: fork", at + 1)) {
      ++count;
    }
    return count;
  };
  while (failures() < 2) {
    loop.turn(std::chrono::seconds(1));
  }
  std::_Exit(0);
}

TEST_F(AnOpenVswitch, IsTriedAgainWhenTheMachineHasNoRoomForItsProcesses) {
  EXPECT_EXIT(start_where_no_process_can_be_made_any_more(own()), testing::ExitedWithCode(0), "");
}

TEST_F(AnOpenVswitch, IsRefusedWhereItCannotBe) {
  auto const refusal = [&](std::filesystem::path const &where) -> std::string {
    try {
      PrivateOpenVswitch const refused(loop, where, Datapath::netdev, told());
    } catch (std::runtime_error const &error) {
      return error.what();
    }
    return {};
  };
  EXPECT_THAT(refusal("/proc/nowhere"),
              HasSubstr("the folder /proc/nowhere of the Open vSwitch cannot be used: "));
}

}  // namespace
