// What is asked of the operating system again and again.
#pragma once

#include <chrono>
#include <string>

namespace simhost::openvswitch {

/// When waiting ends.
using Deadline = std::chrono::steady_clock::time_point;

/// For poll(2): in whole milliseconds, none too few and at most a minute.
int milliseconds_until(Deadline deadline);

/// An errno in words.
std::string error_words(int error);

}  // namespace simhost::openvswitch
