// How long the host waits for other processes on one state. Private to this layer.
#pragma once

#include <SQLiteCpp/Exception.h>
#include <sqlite3.h>

#include <chrono>
#include <thread>

namespace simhost::storage {

inline constexpr std::chrono::seconds kPatience{10};

/// Switching a file to write-ahead logging, and recovering it after a crash, may answer "busy"
/// without asking the busy handler; two processes that open a new file together run into that.
template <typename Work>
auto patiently(Work const &work) {
  auto const deadline = std::chrono::steady_clock::now() + kPatience;
  while (true) {
    try {
      return work();
    } catch (SQLite::Exception const &error) {
      if (error.getErrorCode() != SQLITE_BUSY || std::chrono::steady_clock::now() >= deadline) {
        throw;
      }
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
  }
}

}  // namespace simhost::storage
