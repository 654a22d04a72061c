// A daemon tells that a change is in force, and what it does not tell before.
#include <gmock/gmock.h>
#include <sys/resource.h>

#include <csignal>

#include "state_with_a_switch.h"

namespace simhost::daemon {
namespace {

using ASettlingDaemon = StateWithASwitch;

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
