// Those of a switch that is gone meanwhile are counted nowhere either.
#include "daemon/counting/announced.h"

#include <algorithm>
#include <chrono>

#include "clock/clock.h"
#include "planes/stored/counters.h"
#include "storage/running/readings.h"

namespace simhost::daemon {

void AnnouncedCounts::add(storage::SwitchKey key, std::uint64_t sent) {
  auto &unsaved = unsaved_[key];
  unsaved.packets += sent;
  unsaved.last = events::Clock::now();
}

void AnnouncedCounts::follow(storage::Transaction &transaction) {
  std::erase_if(unsaved_,
                [&](auto const &one) { return !storage::has_readings(transaction, one.first); });
}

bool AnnouncedCounts::save() {
  if (unsaved_.empty()) {
    return true;
  }
  bool const is_saved =
      storage::commit_if_free(store_, [this](storage::ChangingTransaction &transaction) {
        for (auto const &[key, sent] : unsaved_) {
          if (!storage::has_readings(transaction, key)) {
            continue;
          }
          CounterOwner const owner{.switch_key = key};
          stored::add_to_counter(transaction, owner, counter_in(&VSRARPStats::rarpPktsSent),
                                 sent.packets);
          auto const ago =
              clock_is_stopped(transaction)
                  ? ClockTime::zero()
                  : std::chrono::duration_cast<ClockTime>(events::Clock::now() - sent.last);
          auto const when = std::max(clock_now(transaction) - ago, ClockTime::zero());
          stored::set_counter(transaction, owner, counter_in(&VSRARPStats::rarpTime),
                              static_cast<std::uint64_t>(when.count()));
        }
      });
  if (is_saved) {
    unsaved_.clear();
  }
  return is_saved;
}

}  // namespace simhost::daemon
