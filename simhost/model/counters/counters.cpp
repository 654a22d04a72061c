// Counters by their names.
#include "model/counters/counters.h"

#include <fmt/format.h>

#include <algorithm>

#include "base/outcomes.h"
#include "model/devices/devices.h"
#include "model/plane.h"
#include "storage/store.h"

namespace simhost {
namespace {

// The counters that some records show, in one table.
template <typename... Records>
constexpr auto counters_in_all() {
  std::array<Counter, (kCountersIn<Records>.size() + ...)> all{};
  std::size_t count = 0;
  auto const append = [&](auto const &fields) {
    for (auto const &known : fields) {
      all[count++] = known.counter;
    }
  };
  (append(kCountersIn<Records>), ...);
  return all;
}

constexpr auto kOfSwitch = counters_in_all<VSRARPStats, VSServicePortTeamingStats>();
constexpr auto kOfPort = counters_in_all<VSPMACLearningStats, qex_NEBPortStatistics>();
constexpr auto kOfSession = counters_in_all<VSDVMirrorSessionStats>();

std::string_view text_of(CounterKind kind) {
  switch (kind) {
    case CounterKind::of_switch:
      return "switch";
    case CounterKind::of_port:
      return "port";
    case CounterKind::of_session:
      return "mirror session";
  }
  __builtin_unreachable();
}

}  // namespace

CounterKind kind_of(CounterOwner const &owner) {
  if (!owner.session.empty()) {
    return CounterKind::of_session;
  }
  return owner.port ? CounterKind::of_port : CounterKind::of_switch;
}

std::span<Counter const> counters_of(CounterKind kind) {
  switch (kind) {
    case CounterKind::of_switch:
      return kOfSwitch;
    case CounterKind::of_port:
      return kOfPort;
    case CounterKind::of_session:
      return kOfSession;
  }
  __builtin_unreachable();
}

Counter const *find_counter(CounterKind kind, std::string_view name) {
  auto const counters = counters_of(kind);
  auto const found =
      std::ranges::find_if(counters, [&](Counter const &known) { return known.name == name; });
  return found == counters.end() ? nullptr : &*found;
}

void set_counter(storage::ChangingTransaction &transaction, CounterOwner const &owner,
                 std::string_view name, std::uint64_t value) {
  auto const kind = kind_of(owner);
  auto const *const counter = find_counter(kind, name);
  if (counter == nullptr) {
    throw Refused(QEX_NOT_FOUND,
                  fmt::format("there is no counter '{}' of a {}", name, text_of(kind)));
  }
  if (value > counter->greatest) {
    throw Refused(QEX_BAD_PARAM, fmt::format("{} is above {}", value, counter->greatest));
  }
  get_wires(transaction, owner).set_counter(transaction, owner, *counter, value);
}

}  // namespace simhost
