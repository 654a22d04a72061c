// A daemon tells that a change is in force, and what it does not tell before.
#include <gmock/gmock.h>
#include <sys/resource.h>

#include <chrono>
#include <csignal>
#include <optional>
#include <string>

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

struct DaemonOfTheState {
  explicit DaemonOfTheState(ASettlingDaemon &test)
      : daemon(test.loop,
               {.state = test.folder.file("host.db"),
                .database = openvswitch::Lab::shared().database_socket(),
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

// No file that this process writes to becomes larger.
class FullDisk {
 public:
  FullDisk() {
    std::signal(SIGXFSZ, SIG_IGN);
    getrlimit(RLIMIT_FSIZE, &before_);
    rlimit const none{.rlim_cur = 0, .rlim_max = before_.rlim_max};
    setrlimit(RLIMIT_FSIZE, &none);
  }
  FullDisk(FullDisk const &) = delete;
  FullDisk &operator=(FullDisk const &) = delete;
  ~FullDisk() { setrlimit(RLIMIT_FSIZE, &before_); }

 private:
  rlimit before_{};
};

TEST_F(ASettlingDaemon, TellsNobodyBeforeWhatItCountedIsInTheState) {
  DaemonOfTheState daemon(*this);
  {
    storage::ChangingTransaction const held(others);
    daemon.connect();
    turn_until(daemon.is_ready);
    EXPECT_FALSE(daemon.is_told);
  }
  turn_until(daemon.is_told);
}

TEST_F(ASettlingDaemon, TellsWhyWhatItCountedCannotBePutThere) {
  DaemonOfTheState daemon(*this);
  {
    storage::ChangingTransaction const held(others);
    daemon.connect();
    turn_until(daemon.is_ready);
  }
  {
    FullDisk const full;
    turn_until(daemon.is_told);
  }
  EXPECT_THAT(daemon.troubles, testing::HasSubstr("cannot be read or written"));
}

}  // namespace
}  // namespace simhost::daemon
