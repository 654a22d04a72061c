// Taking signals from a descriptor.
#include "events/signals.h"

#include <sys/signalfd.h>

#include <csignal>
#include <utility>

namespace simhost::events {
namespace {

Descriptor held_back(std::initializer_list<int> numbers) {
  sigset_t set;
  sigemptyset(&set);
  for (auto const number : numbers) {
    sigaddset(&set, number);
  }
  if (sigprocmask(SIG_BLOCK, &set, nullptr) != 0) {
    fail_with_errno("sigprocmask");
  }
  return owned(signalfd(-1, &set, SFD_CLOEXEC | SFD_NONBLOCK), "signalfd");
}

}  // namespace

Signals::Signals(Loop &loop, std::initializer_list<int> numbers, std::function<void(int)> work)
    : descriptor_(held_back(numbers)),
      work_(std::move(work)),
      watch_(loop.watch(descriptor_.number(), [this] { take(); })) {}

void Signals::take() {
  signalfd_siginfo info{};
  while (read(descriptor_.number(), &info, sizeof info) == sizeof info) {
    work_(static_cast<int>(info.ssi_signo));
  }
}

}  // namespace simhost::events
