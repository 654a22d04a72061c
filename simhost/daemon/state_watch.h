// Tells when somebody has written to a state.
#pragma once

#include <filesystem>
#include <functional>

#include "events/loop.h"

namespace simhost::daemon {

class StateWatch {
 public:
  /// Of the state in `file`, which is open, so that SQLite's log is there. Throws
  /// std::system_error.
  StateWatch(events::Loop &loop, std::filesystem::path const &file, std::function<void()> written);

 private:
  events::Descriptor inotify_;
  std::function<void()> written_;
  events::Loop::Watch watch_;
};

}  // namespace simhost::daemon
