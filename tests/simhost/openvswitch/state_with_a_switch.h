// A state with one switch, and daemons that have its frames moved by the Open vSwitch of the
// program.
#pragma once

#include <gtest/gtest.h>

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <future>
#include <string>
#include <utility>

#include "daemon/daemon.h"
#include "lab.h"
#include "named_switch.h"
#include "planes/openvswitch/line/line.h"
#include "planes/stored/stored_plane.h"
#include "soon.h"
#include "storage/ports.h"
#include "storage/running/devices.h"
#include "temporary_folder.h"

namespace simhost::daemon {

/// The switch has a bridge, and nothing of it is counted yet.
struct StateWithASwitch : testing::Test {
  StateWithASwitch() {
    run_on(stored::plane());
    storage::ChangingTransaction transaction(others);
    key = storage::add_switch(transaction, named("a")).value();
    port = storage::add_port(transaction, key, "p", storage::PortKind::client).value();
    storage::put_device(transaction, port, "nowhere", std::nullopt);
    transaction.commit();
  }

  void turn_until(bool const &is_so) {
    auto const deadline = openvswitch::soon();
    while (!is_so && events::Clock::now() < deadline) {
      loop.turn(std::chrono::seconds(1));
    }
    ASSERT_TRUE(is_so);
  }

  /// What a daemon in the loop replies.
  Json asked(Json const &question) {
    auto reply = std::async(std::launch::async, [&] {
      return openvswitch::ask(folder.file("host.db"), question, std::chrono::seconds(30));
    });
    while (reply.wait_for(std::chrono::seconds(0)) != std::future_status::ready) {
      loop.turn(std::chrono::milliseconds(10));
    }
    return reply.get();
  }

  TemporaryFolder folder;
  storage::Store others{folder.file("host.db"), [](storage::ChangingTransaction &) {}};
  storage::SwitchKey key{};
  storage::PortNumber port{};
  events::Loop loop;
};

struct DaemonOfTheState {
  explicit DaemonOfTheState(
      StateWithASwitch &test,
      std::filesystem::path database = openvswitch::Lab::shared().database_socket())
      : daemon(test.loop,
               {.state = test.folder.file("host.db"),
                .database = std::move(database),
                // One that makes no devices.
                .datapath = "dummy"},
               [](std::string const &) {}) {
    daemon.when_ready([this] { is_ready = true; });
    daemon.when_settled([this](std::uint64_t, std::string const &said) {
      is_told = true;
      troubles = said;
    });
  }

  void connect() { daemon.connect(); }

  Daemon daemon;
  bool is_ready = false;
  bool is_told = false;
  std::string troubles;
};

}  // namespace simhost::daemon
