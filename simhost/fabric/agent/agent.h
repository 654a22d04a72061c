// The member of a fabric in a thread of its own: callers that change what is shared wait for it
// with the lock of the state, for which the daemon may be waiting at the same time.
#pragma once

#include <exception>
#include <mutex>
#include <thread>

#include "fabric/agent/member.h"

namespace simhost::fabric {

class Agent {
 public:
  /// Throws what Member does. `failed` is called from the thread when it cannot go on.
  Agent(Options options, Say say, std::function<void()> failed);
  ~Agent();
  Agent(Agent const &) = delete;
  Agent &operator=(Agent const &) = delete;

  /// From any thread.
  void tell(InForce in_force);

 private:
  void wake();
  void take();

  events::Loop loop_;
  Member member_;
  events::Descriptor wakes_;
  events::Loop::Watch watch_;
  std::mutex mutex_;
  std::optional<InForce> told_;  // under the mutex, as what follows
  bool ends_ = false;
  std::thread thread_;
};

}  // namespace simhost::fabric
