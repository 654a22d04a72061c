// The names and widths of the counters.
#include "planes/stored/counters.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <limits>

#include "base/outcomes.h"

namespace simhost::stored {
namespace {

constexpr std::uint64_t k32Bits = std::numeric_limits<std::uint32_t>::max();
constexpr std::uint64_t k64Bits = std::numeric_limits<std::uint64_t>::max();

constexpr std::array kOfSwitch{
    CounterName{.name = "rarpPktsSent", .greatest = k32Bits},
    CounterName{.name = "maxRARPTime", .greatest = k32Bits},
    CounterName{.name = "rarpTime", .greatest = k64Bits},
    CounterName{.name = "txFromSrvPort", .greatest = k64Bits},
    CounterName{.name = "txUsingSrvPortFRP", .greatest = k64Bits},
    CounterName{.name = "txUsingPktSrcPortFRP", .greatest = k64Bits},
    CounterName{.name = "txErrors", .greatest = k64Bits},
    CounterName{.name = "rxToSrvPort", .greatest = k64Bits},
    CounterName{.name = "rxRpfOverride", .greatest = k64Bits},
};
constexpr std::array kOfPort{
    CounterName{.name = "noLearningAllowedPkts", .greatest = k64Bits},
    CounterName{.name = "noLearningDroppedPkts", .greatest = k64Bits},
    CounterName{.name = "numMACsMoved", .greatest = k64Bits},
    CounterName{.name = "pktsInUnicast", .greatest = k64Bits},
    CounterName{.name = "bytesInUnicast", .greatest = k64Bits},
    CounterName{.name = "pktsInMulticast", .greatest = k64Bits},
    CounterName{.name = "bytesInMulticast", .greatest = k64Bits},
    CounterName{.name = "pktsInBroadcast", .greatest = k64Bits},
    CounterName{.name = "bytesInBroadcast", .greatest = k64Bits},
    CounterName{.name = "pktsOutUnicast", .greatest = k64Bits},
    CounterName{.name = "bytesOutUnicast", .greatest = k64Bits},
    CounterName{.name = "pktsOutMulticast", .greatest = k64Bits},
    CounterName{.name = "bytesOutMulticast", .greatest = k64Bits},
    CounterName{.name = "pktsOutBroadcast", .greatest = k64Bits},
    CounterName{.name = "bytesOutBroadcast", .greatest = k64Bits},
    CounterName{.name = "pktsInDropped", .greatest = k64Bits},
    CounterName{.name = "pktsOutDropped", .greatest = k64Bits},
    CounterName{.name = "pktsInException", .greatest = k64Bits},
    CounterName{.name = "pktsOutException", .greatest = k64Bits},
};
constexpr std::array kOfSession{
    CounterName{.name = "mirrorPktCnt", .greatest = k64Bits},
    CounterName{.name = "mirrorPktFailCnt", .greatest = k64Bits},
    CounterName{.name = "mirroredPkts", .greatest = k64Bits},
    CounterName{.name = "discardedPkts", .greatest = k64Bits},
    CounterName{.name = "failedPkts", .greatest = k64Bits},
};

std::string_view kind_of(CounterOwner const &owner) {
  if (!owner.session.empty()) {
    return "mirror session";
  }
  return owner.port ? "port" : "switch";
}

CounterName known_name(CounterOwner const &owner, std::string_view name) {
  auto const names = counter_names(owner);
  auto const found = std::find_if(names.begin(), names.end(),
                                  [&](auto const &known) { return known.name == name; });
  if (found == names.end()) {
    throw Refused(QEX_NOT_FOUND,
                  fmt::format("there is no counter '{}' of a {}", name, kind_of(owner)));
  }
  return *found;
}

}  // namespace

std::span<CounterName const> counter_names(CounterOwner const &owner) {
  if (!owner.session.empty()) {
    return kOfSession;
  }
  return owner.port ? std::span<CounterName const>(kOfPort) : kOfSwitch;
}

Counters counters_of(storage::Transaction &transaction, CounterOwner const &owner) {
  Counters counters;
  for (auto const &[name, value] : storage::all_counters(transaction, owner)) {
    counters.emplace(name, value);
  }
  return counters;
}

void set_counter(storage::Transaction &transaction, CounterOwner const &owner,
                 std::string_view name, std::uint64_t value) {
  if (auto const greatest = known_name(owner, name).greatest; value > greatest) {
    throw Refused(QEX_BAD_PARAM, fmt::format("{} is above {}", value, greatest));
  }
  storage::put_counter(transaction, owner, name, value);
}

void add_to_counter(storage::Transaction &transaction, CounterOwner const &owner,
                    std::string_view name, std::uint64_t more) {
  auto const value = storage::find_counter(transaction, owner, name).value_or(0);
  auto const room = known_name(owner, name).greatest - value;
  set_counter(transaction, owner, name, value + std::min(more, room));
}

std::vector<std::string> counting_sessions(storage::Transaction &transaction,
                                           storage::SwitchKey key) {
  return storage::sessions_with_counters(transaction, key);
}

void forget_counters(storage::Transaction &transaction) {
  storage::remove_counters(transaction);
}

}  // namespace simhost::stored
