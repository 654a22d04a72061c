// Watching the log to which SQLite writes each transaction: before others can read it there.
#include "daemon/state_watch.h"

#include <sys/inotify.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <utility>

namespace simhost::daemon {
namespace {

using namespace std::chrono_literals;

constexpr events::Clock::duration kFirstLook = 1ms;
constexpr events::Clock::duration kLongestLook = 100ms;

events::Descriptor watched(std::filesystem::path const &file) {
  auto inotify = events::owned(inotify_init1(IN_CLOEXEC | IN_NONBLOCK), "inotify_init1");
  auto log = file;
  log += "-wal";
  for (auto const &name : {file, log}) {
    if (inotify_add_watch(inotify.number(), name.c_str(), IN_MODIFY) < 0) {
      events::fail_with_errno(name.string());
    }
  }
  return inotify;
}

// Whoever writes holds a lock until what was written can be read, or never will be. What else is
// wrong with the state is told to those who read it.
bool somebody_writes(storage::Store &store) {
  try {
    storage::Patience none(0ns);
    storage::ChangingTransaction const taken(store, none);
    return false;
  } catch (storage::StateFailure const &failure) {
    return failure.kind() == storage::FailureKind::busy;
  }
}

}  // namespace

StateWatch::StateWatch(events::Loop &loop, storage::Store &store, std::filesystem::path const &file,
                       std::function<void()> written)
    : loop_(loop),
      store_(store),
      inotify_(watched(file)),
      written_(std::move(written)),
      watch_(loop.watch(inotify_.number(), [this] { read_events(); })) {}

void StateWatch::read_events() {
  std::array<char, 4096> part{};
  while (read(inotify_.number(), part.data(), part.size()) > 0) {
  }
  tell_when_readable(kFirstLook);
}

void StateWatch::tell_when_readable(events::Clock::duration next_look) {
  if (!somebody_writes(store_)) {
    next_look_.end();
    written_();
    return;
  }
  next_look_ = loop_.after(
      next_look, [this, next_look] { tell_when_readable(std::min(2 * next_look, kLongestLook)); });
}

}  // namespace simhost::daemon
