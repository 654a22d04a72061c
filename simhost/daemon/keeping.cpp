// What was counted and seen goes into the state now and then, and before anybody is told of it.
#include <algorithm>
#include <chrono>
#include <exception>
#include <string>
#include <utility>

#include "daemon/daemon.h"
#include "daemon/wanted.h"

namespace simhost::daemon {
namespace {

using namespace std::chrono_literals;

// What was counted since the last time is lost when Open vSwitch is killed.
constexpr auto kBetweenCounts = 2s;
// While somebody else writes.
constexpr auto kBetweenTries = 20ms;
// Many addresses may come at once.
constexpr auto kBetweenSaves = 100ms;

}  // namespace

void Daemon::save() {
  age();
  count(Devices::always);
}

void Daemon::count(Devices devices) {
  try {
    if (bridges_) {
      bridges_->count(devices);
    }
  } catch (std::exception const &error) {
    fail(error.what());
  }
  try {
    counting_.save();
  } catch (std::exception const &error) {
    keep_nothing(error.what());
  }
  remember();
}

void Daemon::age() {
  try {
    if (bridges_) {
      next_aging_ = loop_.after(bridges_->age(), [this] { age(); });
    }
  } catch (std::exception const &error) {
    fail(error.what());
  }
}

// What ages faster than before is not to wait for what was due.
void Daemon::age_by(Wanted const &wanted) {
  auto shortest = std::chrono::seconds::max();
  for (auto const &bridge : wanted.bridges) {
    shortest = std::min(shortest, bridge.aging);
  }
  if (shortest < std::exchange(shortest_aging_, shortest)) {
    next_aging_ = loop_.after(0ms, [this] { age(); });
  }
}

// From a timer, too, so that nothing is thrown.
void Daemon::remember() {
  try {
    bool const all_remembered = memory_.save();
    // Those after it tell by the readings of a switch whether it has begun anew.
    if (!counting_.save() || !announced_.save() || !load_balance_.save() || !all_remembered) {
      remember_soon();
    } else {
      keep_nothing({});
    }
  } catch (std::exception const &error) {
    keep_nothing(error.what());
  }
}

// Whoever is told of troubles is told of those of a look at all.
void Daemon::keep_nothing(std::string const &why) {
  if (std::exchange(why_nothing_is_kept_, why) == why) {
    return;
  }
  if (!why.empty()) {
    troubles_.add(why);
  }
  sync_soon();
}

void Daemon::remember_soon() {
  if (!next_remembering_) {
    next_remembering_ = loop_.after(kBetweenSaves, [this] { remember(); });
  }
}

// Less often than it is counted: what clients send comes and goes.
void Daemon::balance() {
  constexpr unsigned kBetweenLooks = 3;
  if (++counts_ == kBetweenLooks) {
    counts_ = 0;
    if (load_balance_.choose()) {
      sync_soon();
      remember_soon();
    }
  }
}

// From a timer, too.
void Daemon::look_at_wires() {
  try {
    devices_.refresh();
    client_addresses_.look();
    if (wires_.look(devices_, [this](std::string const &why) { troubles_.add(why); })) {
      sync_soon();
    }
  } catch (std::exception const &error) {
    troubles_.add(error.what());
  }
}

void Daemon::count_from_now_on() {
  next_count_ = loop_.after(kBetweenCounts, [this] {
    count(Devices::now_and_then);
    balance();
    look_at_wires();
    count_from_now_on();
  });
}

// Who is told asks the state what was counted until then. From a timer, too.
void Daemon::tell_settled() {
  if (!settled_) {
    return;
  }
  try {
    if (!counting_.save()) {
      next_telling_ = loop_.after(kBetweenTries, [this] { tell_settled(); });
      return;
    }
  } catch (std::exception const &error) {
    keep_nothing(error.what());
  }
  next_telling_.end();
  settled_(in_force_, troubles_.text());
}

}  // namespace simhost::daemon
