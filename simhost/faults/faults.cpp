// Which faults make sense, and what they do to a call.
#include "faults/faults.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>

#include "base/outcomes.h"
#include "base/utf8.h"
#include "storage/store.h"

namespace simhost {
namespace {

struct HostCall {
  std::string_view name;
  bool returns_status;
};

constexpr std::array kCalls{
#define CALL(name, returns_status) HostCall{#name, returns_status},
#include "call_names.inc"
#undef CALL
};

HostCall get_call(std::string_view function) {
  auto const call = std::find_if(kCalls.begin(), kCalls.end(),
                                 [&](HostCall const &known) { return known.name == function; });
  if (call == kCalls.end()) {
    throw Refused(QEX_NOT_FOUND, fmt::format("there is no call '{}'", function));
  }
  // These two keep no state, and the first must return whatever happens.
  if (function == "Panic" || function == "QEX_ReturnStatusToString") {
    throw Refused(QEX_NOT_SUPPORTED, fmt::format("no fault can hit {}", function));
  }
  return *call;
}

void check_effect(Fault const &fault) {
  bool const status = fault.status != QEX_OK;
  bool const exception = !fault.exception.empty();
  if (status && !get_call(fault.function).returns_status) {
    throw Refused(QEX_NOT_SUPPORTED, fmt::format("{} returns no status", fault.function));
  }
  if (status && exception) {
    throw Refused(QEX_BAD_PARAM, "a call has a status or an exception, not both");
  }
  if (fault.delay.count() < 0) {
    throw Refused(QEX_BAD_PARAM, "a delay is not negative");
  }
  if (fault.delay > kLongestDelay) {
    throw Refused(QEX_BAD_PARAM, "a delay is an hour at most");
  }
  if (!status && !exception && fault.delay.count() == 0) {
    throw Refused(QEX_BAD_PARAM, "a fault needs a status, an exception or a delay");
  }
  if (exception && !find_trap_kind(fault.exception)) {
    throw Refused(QEX_BAD_PARAM, fmt::format("'{}' is none of the exception types {}",
                                             fault.exception, trap_types()));
  }
}

void check(Fault const &fault) {
  get_call(fault.function);
  check_effect(fault);
  require_utf8(fault.message);
  if (fault.first < 1 || fault.last < fault.first) {
    throw Refused(QEX_BAD_PARAM, "the first call that is hit is 1 or later");
  }
}

void apply(Fault const &fault) {
  if (fault.status != QEX_OK) {
    throw Refused(fault.status);
  }
  if (!fault.exception.empty()) {
    throw Trapped(*find_trap_kind(fault.exception), fault.message, TrapText::verbatim);
  }
}

}  // namespace

bool any_fault_waits(storage::Transaction &transaction, std::string_view function) {
  return storage::has_fault(transaction, function);
}

std::vector<Fault> count_call(storage::ChangingTransaction &transaction,
                              std::string_view function) {
  return storage::count_for_faults(transaction, function);
}

void add_fault(storage::ChangingTransaction &transaction, Fault const &fault) {
  check(fault);
  storage::insert_fault(transaction, fault);
}

std::vector<WaitingFault> waiting_faults(storage::Transaction &transaction) {
  return storage::all_faults(transaction);
}

void clear_faults(storage::ChangingTransaction &transaction, std::string_view function) {
  if (function.empty()) {
    storage::remove_all_faults(transaction);
  } else {
    get_call(function);
    storage::remove_faults(transaction, function);
  }
}

std::chrono::milliseconds delay_of(std::vector<Fault> const &hits) {
  std::chrono::milliseconds delay{0};
  for (auto const &fault : hits) {
    delay = std::min(delay + std::min(fault.delay, kLongestDelay), kLongestDelay);
  }
  return delay;
}

void inject(std::vector<Fault> const &hits) {
  for (auto const &fault : hits) {
    apply(fault);
  }
}

}  // namespace simhost
