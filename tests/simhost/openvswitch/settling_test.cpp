// A daemon tells that a change is in force, and what it does not tell before.
#include <gtest/gtest.h>

#include <chrono>
#include <optional>

#include "daemon/daemon.h"
#include "lab.h"
#include "named_switch.h"
#include "planes/stored/stored_plane.h"
#include "storage/ports.h"
#include "storage/running/devices.h"
#include "temporary_folder.h"

namespace simhost::daemon {
namespace {

// With a switch that has a bridge, and of which nothing is counted yet.
struct ASettlingDaemon : testing::Test {
  ASettlingDaemon() {
    run_on(stored::plane());
    storage::ChangingTransaction transaction(others);
    auto const key = storage::add_switch(transaction, named("a")).value();
    auto const port = storage::add_port(transaction, key, "p", storage::PortKind::client).value();
    storage::put_device(transaction, port, "nowhere", std::nullopt);
    transaction.commit();
  }

  void turn_until(bool const &is_so) {
    auto const deadline = events::Clock::now() + std::chrono::seconds(30);
    while (!is_so && events::Clock::now() < deadline) {
      loop.turn(std::chrono::seconds(1));
    }
    ASSERT_TRUE(is_so);
  }

  TemporaryFolder folder;
  storage::Store others{folder.file("host.db"), [](storage::ChangingTransaction &) {}};
  events::Loop loop;
};

TEST_F(ASettlingDaemon, TellsNobodyBeforeWhatItCountedIsInTheState) {
  Daemon daemon(loop,
                {.state = folder.file("host.db"),
                 .database = openvswitch::Lab::shared().database_socket(),
                 // One that makes no devices.
                 .datapath = "dummy"},
                [](std::string const &) {});
  bool is_ready = false;
  bool is_told = false;
  daemon.when_ready([&] { is_ready = true; });
  daemon.when_settled([&](std::uint64_t, std::string const &) { is_told = true; });
  {
    storage::ChangingTransaction const held(others);
    daemon.connect();
    turn_until(is_ready);
    EXPECT_FALSE(is_told);
  }
  turn_until(is_told);
}

}  // namespace
}  // namespace simhost::daemon
