// What a daemon replies to those who ask when Open vSwitch does not reply to it.
#include <gmock/gmock.h>

#include <filesystem>
#include <string>

#include "planes/openvswitch/compile/pipeline.h"
#include "spoiling_relay.h"
#include "state_with_a_switch.h"

namespace simhost::daemon {
namespace {

using AnAskedDaemon = StateWithASwitch;

TEST_F(AnAskedDaemon, SaysWhyNobodyKnowsWhatWasLearned) {
  auto &lab = openvswitch::Lab::shared();
  Json const question{{"ask", "addresses"},
                      {"switch", static_cast<std::int64_t>(key)},
                      {"port", static_cast<std::uint32_t>(port)}};
  std::string bridge;
  {
    DaemonOfTheState first(*this);
    first.connect();
    turn_until(first.is_ready);
    bridge = asked({{"ask", "bridge"}, {"switch", named("a").identifier}}).at("name");
    EXPECT_EQ(asked(question), Json({{"addresses", Json::array()}}));
  }
  openvswitch::SpoilingRelay relay(lab.bridge_socket(bridge), 0);
  std::filesystem::create_symlink(lab.database_socket(), relay.folder() / "db.sock");
  DaemonOfTheState second(*this, relay.folder() / "db.sock");
  second.connect();
  turn_until(second.is_ready);
  relay.have_refused(openvswitch::table::kLearnedAddresses);
  EXPECT_THAT(asked(question).at("refused").get<std::string>(),
              testing::StartsWith("Open vSwitch cannot be reached: "));
  // It connects anew, and is replied to.
  auto const socket = relay.folder() / lab.bridge_socket(bridge).filename();
  std::filesystem::remove(socket);
  std::filesystem::create_symlink(lab.bridge_socket(bridge), socket);
  auto const deadline = openvswitch::soon();
  auto reply = asked(question);
  while (!reply.contains("addresses") && events::Clock::now() < deadline) {
    reply = asked(question);
  }
  EXPECT_EQ(reply, Json({{"addresses", Json::array()}}));
}

}  // namespace
}  // namespace simhost::daemon
