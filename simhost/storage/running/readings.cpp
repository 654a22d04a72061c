// Readings in SQL, whose integers are signed: the greatest numbers are negative there.
#include "storage/running/readings.h"

#include "storage/query.h"

namespace simhost::storage {
namespace {

std::uint64_t number_at(Query const &row, int column) {
  return static_cast<std::uint64_t>(row.integer(column));
}

void put(ChangingTransaction &transaction, SwitchKey key, Reading const &reading) {
  Change(transaction, "INSERT OR REPLACE INTO reading VALUES (?, ?, ?, ?)")
      .with(key)
      .with(static_cast<std::int64_t>(reading.source))
      .with(static_cast<std::int64_t>(reading.frames))
      .with(static_cast<std::int64_t>(reading.bytes))
      .run();
}

}  // namespace

bool has_readings(Transaction &transaction, SwitchKey key) {
  Query select(transaction, "SELECT 1 FROM reading WHERE switch = ? LIMIT 1");
  return select.with(key).next();
}

std::vector<Reading> readings_of(Transaction &transaction, SwitchKey key) {
  Query select(transaction,
               "SELECT source, frames, bytes FROM reading WHERE switch = ? AND source <> 0");
  return select.with(key).all([](Query const &row) {
    return Reading{
        .source = number_at(row, 0), .frames = number_at(row, 1), .bytes = number_at(row, 2)};
  });
}

void put_readings(ChangingTransaction &transaction, SwitchKey key,
                  std::vector<Reading> const &readings) {
  put(transaction, key, {});
  for (auto const &reading : readings) {
    put(transaction, key, reading);
  }
}

void remove_reading(ChangingTransaction &transaction, SwitchKey key, std::uint64_t source) {
  Change(transaction, "DELETE FROM reading WHERE switch = ? AND source = ?")
      .with(key)
      .with(static_cast<std::int64_t>(source))
      .run();
}

}  // namespace simhost::storage
