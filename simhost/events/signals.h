// Signals that a loop takes one after the other, between two things that it does.
#pragma once

#include <functional>
#include <initializer_list>

#include "events/loop.h"

namespace simhost::events {

/// Holds the signals back from the process, for good, and does `work` with each that comes.
class Signals {
 public:
  Signals(Loop &loop, std::initializer_list<int> numbers, std::function<void(int)> work);

 private:
  void take();

  Descriptor descriptor_;
  std::function<void(int)> work_;
  Loop::Watch watch_;
};

}  // namespace simhost::events
