// Fault rows in SQL.
#include "storage/running/faults.h"

#include "base/outcomes.h"
#include "storage/query.h"

namespace simhost::storage {
namespace {

// What a row is written and read with; macros, so that a statement is one literal.
#define FAULT_COLUMNS "function, first, last, seen, delay, status, exception, message"
#define SELECT_FAULT "SELECT " FAULT_COLUMNS " FROM fault"

// Empty for none.
std::string exception_at(Query const &row, int column) {
  auto type = row.text(column);
  if (!type.empty() && !find_trap_kind(type)) {
    row.refuse(column, "'" + type + "'");
  }
  return type;
}

// Of a row that SELECT_FAULT finds.
WaitingFault fault_at(Query const &row) {
  auto const first = row.integer(1, 1, Fault::kForever);
  return {.fault = {.function = row.text(0),
                    .first = first,
                    .last = row.integer(2, first, Fault::kForever),
                    .delay = std::chrono::milliseconds(row.integer(4, 0, Fault::kForever)),
                    .status = static_cast<QEX_ReturnStatus>(row.number<std::uint32_t>(5)),
                    .exception = exception_at(row, 6),
                    .message = row.text(7)},
          .seen = row.integer(3, 0, Fault::kForever)};
}

}  // namespace

void insert_fault(ChangingTransaction &transaction, Fault const &fault) {
  Change insert(transaction,
                "INSERT INTO fault (" FAULT_COLUMNS ") VALUES (?, ?, ?, ?, ?, ?, ?, ?)");
  insert.with(fault.function).with(fault.first).with(fault.last).with(std::int64_t{0});
  insert.with(fault.delay.count()).with(fault.status).with(fault.exception).with(fault.message);
  insert.run();
}

std::vector<WaitingFault> all_faults(Transaction &transaction) {
  return Query(transaction, SELECT_FAULT " ORDER BY key").all(fault_at);
}

bool has_fault(Transaction &transaction, std::string_view function) {
  return Query(transaction, "SELECT 1 FROM fault WHERE function = ?").with(function).next();
}

std::vector<Fault> count_for_faults(ChangingTransaction &transaction, std::string_view function) {
  Change(transaction, "UPDATE fault SET seen = seen + 1 WHERE function = ?").with(function).run();
  auto hits = Query(transaction,
                    SELECT_FAULT " WHERE function = ? AND seen BETWEEN first AND last ORDER BY key")
                  .with(function)
                  .all([](Query const &row) { return fault_at(row).fault; });
  Change(transaction, "DELETE FROM fault WHERE function = ? AND seen >= last").with(function).run();
  return hits;
}

void remove_faults(ChangingTransaction &transaction, std::string_view function) {
  Change(transaction, "DELETE FROM fault WHERE function = ?").with(function).run();
}

void remove_all_faults(ChangingTransaction &transaction) {
  Change(transaction, "DELETE FROM fault").run();
}

}  // namespace simhost::storage
