// Who tells it something leaves that behind and wakes the thread, which alone touches the member.
#include "fabric/agent/agent.h"

#include <sys/eventfd.h>

#include <cstdint>
#include <utility>

namespace simhost::fabric {

Agent::Agent(Options options, Say say, std::function<void()> failed)
    : member_(loop_, std::move(options), say),
      wakes_(events::owned(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK), "eventfd")),
      watch_(loop_.watch(wakes_.number(), [this] { take(); })),
      thread_([this, say = std::move(say), failed = std::move(failed)] {
        try {
          loop_.run();
        } catch (std::exception const &error) {
          say(std::string("the fabric is followed no further: ") + error.what());
          failed();
        }
      }) {}

Agent::~Agent() {
  {
    std::scoped_lock const held(mutex_);
    ends_ = true;
  }
  wake();
  thread_.join();
}

void Agent::tell(InForce in_force) {
  {
    std::scoped_lock const held(mutex_);
    told_ = std::move(in_force);
  }
  wake();
}

void Agent::wake() {
  eventfd_write(wakes_.number(), 1);
}

void Agent::take() {
  eventfd_t times = 0;
  eventfd_read(wakes_.number(), &times);
  std::optional<InForce> told;
  {
    std::scoped_lock const held(mutex_);
    told = std::exchange(told_, std::nullopt);
    if (ends_) {
      loop_.stop();
      return;
    }
  }
  if (told) {
    member_.tell(*told);
  }
}

}  // namespace simhost::fabric
