// The counters of the host: each is a field of a record in which callers see it, and declared by
// it, with its width and its name everywhere else.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <map>
#include <span>
#include <string_view>
#include <variant>

#include "base/api.h"
#include "qexapi/switch_ports.h"
#include "storage/running/counters.h"
#include "vswitch/mac_tables.h"
#include "vswitch/mirror.h"
#include "vswitch/statistics.h"

namespace simhost {

using storage::CounterOwner;

enum class CounterKind { of_switch, of_port, of_session };

struct Counter {
  CounterKind kind;
  std::string_view name;   ///< of the field
  std::uint64_t greatest;  ///< what the field has room for
};

/// A counter as a record shows it.
template <typename Record>
struct CounterField {
  Counter counter;
  std::variant<qex_uint32 Record::*, qex_uint64 Record::*> field;
  /// By a function, because no pointer may be made into a packed record.
  void (*show)(Record &record, std::uint64_t value);
};

#define SIMHOST_COUNTER(owner, record, field)                                          \
  CounterField<record> {                                                               \
    {CounterKind::owner, #field, std::numeric_limits<decltype(record::field)>::max()}, \
        &record::field, [](record &shown, std::uint64_t value) {                       \
          shown.field = static_cast<decltype(record::field)>(value);                   \
        }                                                                              \
  }

/// The counters that a record shows.
template <typename Record>
inline constexpr std::array<CounterField<Record>, 0> kCountersIn{};

template <>
inline constexpr std::array kCountersIn<VSRARPStats>{
    SIMHOST_COUNTER(of_switch, VSRARPStats, rarpPktsSent),
    SIMHOST_COUNTER(of_switch, VSRARPStats, maxRARPTime),
    SIMHOST_COUNTER(of_switch, VSRARPStats, rarpTime),
};
template <>
inline constexpr std::array kCountersIn<VSServicePortTeamingStats>{
    SIMHOST_COUNTER(of_switch, VSServicePortTeamingStats, txFromSrvPort),
    SIMHOST_COUNTER(of_switch, VSServicePortTeamingStats, txUsingSrvPortFRP),
    SIMHOST_COUNTER(of_switch, VSServicePortTeamingStats, txUsingPktSrcPortFRP),
    SIMHOST_COUNTER(of_switch, VSServicePortTeamingStats, txErrors),
    SIMHOST_COUNTER(of_switch, VSServicePortTeamingStats, rxToSrvPort),
    SIMHOST_COUNTER(of_switch, VSServicePortTeamingStats, rxRpfOverride),
};
template <>
inline constexpr std::array kCountersIn<VSPMACLearningStats>{
    SIMHOST_COUNTER(of_port, VSPMACLearningStats, noLearningAllowedPkts),
    SIMHOST_COUNTER(of_port, VSPMACLearningStats, noLearningDroppedPkts),
    SIMHOST_COUNTER(of_port, VSPMACLearningStats, numMACsMoved),
};
template <>
inline constexpr std::array kCountersIn<qex_NEBPortStatistics>{
    SIMHOST_COUNTER(of_port, qex_NEBPortStatistics, pktsInUnicast),
    SIMHOST_COUNTER(of_port, qex_NEBPortStatistics, bytesInUnicast),
    SIMHOST_COUNTER(of_port, qex_NEBPortStatistics, pktsInMulticast),
    SIMHOST_COUNTER(of_port, qex_NEBPortStatistics, bytesInMulticast),
    SIMHOST_COUNTER(of_port, qex_NEBPortStatistics, pktsInBroadcast),
    SIMHOST_COUNTER(of_port, qex_NEBPortStatistics, bytesInBroadcast),
    SIMHOST_COUNTER(of_port, qex_NEBPortStatistics, pktsOutUnicast),
    SIMHOST_COUNTER(of_port, qex_NEBPortStatistics, bytesOutUnicast),
    SIMHOST_COUNTER(of_port, qex_NEBPortStatistics, pktsOutMulticast),
    SIMHOST_COUNTER(of_port, qex_NEBPortStatistics, bytesOutMulticast),
    SIMHOST_COUNTER(of_port, qex_NEBPortStatistics, pktsOutBroadcast),
    SIMHOST_COUNTER(of_port, qex_NEBPortStatistics, bytesOutBroadcast),
    SIMHOST_COUNTER(of_port, qex_NEBPortStatistics, pktsInDropped),
    SIMHOST_COUNTER(of_port, qex_NEBPortStatistics, pktsOutDropped),
    SIMHOST_COUNTER(of_port, qex_NEBPortStatistics, pktsInException),
    SIMHOST_COUNTER(of_port, qex_NEBPortStatistics, pktsOutException),
};
static_assert(sizeof(qex_NEBPortStatistics) ==
                  kCountersIn<qex_NEBPortStatistics>.size() * sizeof(qex_uint64),
              "each field is a counter");
template <>
inline constexpr std::array kCountersIn<VSDVMirrorSessionStats>{
    SIMHOST_COUNTER(of_session, VSDVMirrorSessionStats, mirrorPktCnt),
    SIMHOST_COUNTER(of_session, VSDVMirrorSessionStats, mirrorPktFailCnt),
    SIMHOST_COUNTER(of_session, VSDVMirrorSessionStats, mirroredPkts),
    SIMHOST_COUNTER(of_session, VSDVMirrorSessionStats, discardedPkts),
    SIMHOST_COUNTER(of_session, VSDVMirrorSessionStats, failedPkts),
};

#undef SIMHOST_COUNTER

/// The counter that a field shows, such as counter_in(&VSRARPStats::rarpTime); a field that shows
/// none does not compile.
template <typename Record, typename Number>
consteval Counter counter_in(Number Record::*field) {
  decltype(CounterField<Record>::field) const wanted = field;
  for (auto const &known : kCountersIn<Record>) {
    if (known.field == wanted) {
      return known.counter;
    }
  }
  throw "the field shows no counter";
}

CounterKind kind_of(CounterOwner const &owner);
/// All counters that an owner of that kind has.
std::span<Counter const> counters_of(CounterKind kind);
/// Null for a name that no counter of that kind has.
Counter const *find_counter(CounterKind kind, std::string_view name);

/// What an owner has counted.
class Counters {
 public:
  /// 0 for what has counted nothing.
  [[nodiscard]] std::uint64_t of(Counter const &counter) const {
    auto const found = values_.find(counter.name);
    return found == values_.end() ? 0 : found->second;
  }
  void set(Counter const &counter, std::uint64_t value) { values_[counter.name] = value; }
  /// Those that were set, with their names, in the order of these.
  [[nodiscard]] auto begin() const { return values_.begin(); }
  [[nodiscard]] auto end() const { return values_.end(); }

 private:
  std::map<std::string_view, std::uint64_t> values_;
};

/// Writes the counters that a record shows into it.
template <typename Record>
void show(Counters const &counters, Record &record) {
  static_assert(!kCountersIn<Record>.empty());
  for (auto const &known : kCountersIn<Record>) {
    known.show(record, counters.of(known.counter));
  }
}

/// Sets a counter from outside, by its name. Refuses a name that the owner does not have
/// (QEX_NOT_FOUND), a number that its field has no room for (QEX_BAD_PARAM), and what get_wires()
/// refuses.
void set_counter(storage::ChangingTransaction &transaction, CounterOwner const &owner,
                 std::string_view name, std::uint64_t value);

}  // namespace simhost
