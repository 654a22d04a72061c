// Faults in SQL, and striking.
#include "faults/faults.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <thread>

#include "base/outcomes.h"
#include "storage/store.h"

namespace simhost {
namespace {

struct HostCall {
  std::string_view name;
  bool answers_status;
};

constexpr std::array kCalls{
#define CALL(name, answers_status) HostCall{#name, answers_status},
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
  if (status && !get_call(fault.function).answers_status) {
    throw Refused(QEX_NOT_SUPPORTED, fmt::format("{} answers no status", fault.function));
  }
  if (status && exception) {
    throw Refused(QEX_BAD_PARAM, "a call has a status or an exception, not both");
  }
  if (fault.delay.count() < 0) {
    throw Refused(QEX_BAD_PARAM, "a delay is not negative");
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
  if (fault.first < 1 || fault.last < fault.first) {
    throw Refused(QEX_BAD_PARAM, "the first call that is hit is 1 or later");
  }
}

Fault fault_at(storage::Query const &row) {
  return {.function = row.text(0),
          .first = row.integer(1),
          .last = row.integer(2),
          .delay = std::chrono::milliseconds(row.integer(4)),
          .status = static_cast<QEX_ReturnStatus>(row.integer(5)),
          .exception = row.text(6),
          .message = row.text(7)};
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
  return transaction.query("SELECT 1 FROM fault WHERE function = ?").with(function).next();
}

std::vector<Fault> count_call(storage::Transaction &transaction, std::string_view function) {
  transaction.query("UPDATE fault SET seen = seen + 1 WHERE function = ?").with(function).run();
  std::vector<Fault> hits;
  {
    auto select = transaction.query(
        "SELECT function, first, last, seen, delay, status, exception, message FROM fault"
        " WHERE function = ? AND seen BETWEEN first AND last ORDER BY key");
    select.with(function);
    while (select.next()) {
      hits.push_back(fault_at(select));
    }
  }
  transaction.query("DELETE FROM fault WHERE function = ? AND seen >= last").with(function).run();
  return hits;
}

void add_fault(storage::Transaction &transaction, Fault const &fault) {
  check(fault);
  auto insert = transaction.query(
      "INSERT INTO fault (function, first, last, delay, status, exception, message)"
      " VALUES (?, ?, ?, ?, ?, ?, ?)");
  insert.with(fault.function).with(fault.first).with(fault.last).with(fault.delay.count());
  insert.with(std::int64_t{fault.status}).with(fault.exception).with(fault.message).run();
}

std::vector<WaitingFault> waiting_faults(storage::Transaction &transaction) {
  auto select = transaction.query(
      "SELECT function, first, last, seen, delay, status, exception, message FROM fault"
      " ORDER BY key");
  std::vector<WaitingFault> waiting;
  while (select.next()) {
    waiting.push_back({.fault = fault_at(select), .seen = select.integer(3)});
  }
  return waiting;
}

void clear_faults(storage::Transaction &transaction, std::string_view function) {
  if (!function.empty()) {
    get_call(function);
  }
  transaction.query("DELETE FROM fault WHERE ? IN ('', function)").with(function).run();
}

void inject(std::vector<Fault> const &hits) {
  std::chrono::milliseconds delay{0};
  for (auto const &fault : hits) {
    delay += fault.delay;
  }
  if (delay.count() > 0) {
    std::this_thread::sleep_for(delay);
  }
  for (auto const &fault : hits) {
    apply(fault);
  }
}

}  // namespace simhost
