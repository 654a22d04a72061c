#include "recordings/core/process.h"

#include <pthread.h>
#include <unistd.h>

#include <atomic>

namespace recordings {
namespace {

constinit std::atomic<pid_t> this_process{};

void ask() {
  this_process = getpid();
}

// Before other constructors, whose handlers of forks may ask for it.
[[gnu::constructor(101)]] void begin() {
  ask();
  pthread_atfork(nullptr, nullptr, ask);
}

}  // namespace

pid_t process_id() noexcept {
  return this_process.load(std::memory_order_relaxed);
}

}  // namespace recordings
