// A tally for each switch, begun with the readings of the state.
#include "daemon/counting/counting.h"

#include <algorithm>
#include <utility>

#include "planes/stored/counters.h"
#include "storage/running/readings.h"
#include "storage/switches.h"

namespace simhost::daemon {
namespace {

using openvswitch::CountingPart;
using openvswitch::Totals;
using storage::SwitchKey;

Totals totals_in(std::vector<storage::Reading> const &readings) {
  Totals totals;
  for (auto const &reading : readings) {
    totals[reading.source] = {.packets = reading.frames, .bytes = reading.bytes};
  }
  return totals;
}

CountingPart part_of(CounterOwner const &owner) {
  return {.port = static_cast<std::uint32_t>(owner.port.value_or(storage::PortNumber{})),
          .session = owner.session};
}

CounterOwner owner_of(SwitchKey key, CountingPart const &part) {
  CounterOwner owner{.switch_key = key, .port = std::nullopt, .session = part.session};
  if (part.port != 0) {
    owner.port = storage::PortNumber{part.port};
  }
  return owner;
}

std::uint64_t sum(std::uint64_t value, std::uint64_t more, std::uint64_t greatest) {
  return value + std::min(more, greatest - value);
}

void save_gains(storage::ChangingTransaction &transaction, SwitchKey key,
                openvswitch::Gains const &gains) {
  for (auto const &[part, counters] : gains) {
    auto const owner = owner_of(key, part);
    if (owner.port && !storage::find_port(transaction, key, *owner.port)) {
      continue;
    }
    for (auto const &[name, more] : counters) {
      stored::add_to_counter(transaction, owner, *find_counter(kind_of(owner), name), more);
    }
  }
}

void save_readings(storage::ChangingTransaction &transaction, SwitchKey key, Totals const &saved,
                   Totals const &last) {
  std::vector<storage::Reading> changed;
  for (auto const &[source, total] : last) {
    auto const known = saved.find(source);
    if (known == saved.end() || known->second != total) {
      changed.push_back({.source = source, .frames = total.packets, .bytes = total.bytes});
    }
  }
  storage::put_readings(transaction, key, changed);
  for (auto const &[source, total] : saved) {
    if (!last.contains(source)) {
      storage::remove_reading(transaction, key, source);
    }
  }
}

}  // namespace

Counting::OfSwitch &Counting::of_switch(SwitchKey key) {
  auto const [at, is_new] = switches_.try_emplace(key);
  if (is_new) {
    storage::ReadingTransaction transaction(store_);
    if (storage::has_readings(transaction, key)) {
      auto const saved = totals_in(storage::readings_of(transaction, key));
      at->second = {.tally = openvswitch::Tally(saved), .saved = saved, .is_in_state = true};
    }
  }
  return at->second;
}

void Counting::count(SwitchKey key, Totals const &totals,
                     openvswitch::CountedSessions const &sessions) {
  of_switch(key).tally.count(totals, sessions);
}

void Counting::count_move(SwitchKey key, std::uint32_t port) {
  of_switch(key).tally.count_move(port);
}

Counters Counting::counters_of(storage::Transaction &transaction, CounterOwner const &owner) {
  auto counters = stored::counters_of(transaction, owner);
  auto const known = switches_.find(owner.switch_key);
  if (known == switches_.end()) {
    return counters;
  }
  auto const &gains = known->second.tally.gains();
  auto const gained = gains.find(part_of(owner));
  if (gained != gains.end()) {
    for (auto const &[name, more] : gained->second) {
      auto const &counter = *find_counter(kind_of(owner), name);
      counters.set(counter, sum(counters.of(counter), more, counter.greatest));
    }
  }
  return counters;
}

std::vector<std::string> Counting::unsaved_sessions(SwitchKey key) const {
  std::vector<std::string> sessions;
  auto const known = switches_.find(key);
  if (known != switches_.end()) {
    for (auto const &[part, counters] : known->second.tally.gains()) {
      if (!part.session.empty()) {
        sessions.push_back(part.session);
      }
    }
  }
  return sessions;
}

void Counting::forget_removed(storage::Transaction &transaction) {
  for (auto &[key, one] : switches_) {
    if (one.is_in_state && !storage::has_readings(transaction, key)) {
      one = {};
      has_forgotten_ = true;
    }
  }
}

bool Counting::follow(storage::Transaction &transaction) {
  forget_removed(transaction);
  return std::exchange(has_forgotten_, false);
}

bool Counting::save() {
  auto const is_new = [](auto const &one) { return !one.second.is_saved(); };
  if (std::ranges::none_of(switches_, is_new)) {
    return true;
  }
  bool const is_saved =
      storage::commit_if_free(store_, [this](storage::ChangingTransaction &transaction) {
        forget_removed(transaction);
        remove_other_switches(transaction);
        for (auto const &[key, one] : switches_) {
          if (!one.is_saved()) {
            save_gains(transaction, key, one.tally.gains());
            save_readings(transaction, key, one.saved, one.tally.last());
          }
        }
      });
  if (is_saved) {
    for (auto &[key, one] : switches_) {
      one.set_saved();
    }
  }
  return is_saved;
}

void Counting::save_new() {
  if (std::ranges::any_of(switches_, [](auto const &one) { return !one.second.is_in_state; })) {
    save();
  }
}

void Counting::remove_other_switches(storage::Transaction &transaction) {
  auto const all = storage::all_switches(transaction);
  std::erase_if(switches_, [&](auto const &one) {
    return std::ranges::find(all, one.first, &storage::FoundSwitch::key) == all.end();
  });
}

bool Counting::OfSwitch::is_saved() const {
  return !tally.has_counted() || (is_in_state && tally.gains().empty() && tally.last() == saved);
}

void Counting::OfSwitch::set_saved() {
  if (tally.has_counted()) {
    tally.drop_gains();
    saved = tally.last();
    is_in_state = true;
  }
}

}  // namespace simhost::daemon
