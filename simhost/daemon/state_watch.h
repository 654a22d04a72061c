// Tells when somebody has written to a state.
#pragma once

#include <filesystem>
#include <functional>

#include "events/loop.h"
#include "storage/store.h"

namespace simhost::daemon {

class StateWatch {
 public:
  /// Of the state in `file`, which `store` has open, so that SQLite's log is there. `written` is
  /// called when what was written can be read. Throws std::system_error.
  StateWatch(events::Loop &loop, storage::Store &store, std::filesystem::path const &file,
             std::function<void()> written);

 private:
  void read_events();
  void tell_when_readable(events::Clock::duration next_look);

  events::Loop &loop_;
  storage::Store &store_;
  events::Descriptor inotify_;
  std::function<void()> written_;
  events::Loop::Watch watch_;
  events::Loop::Timer next_look_;
};

}  // namespace simhost::daemon
