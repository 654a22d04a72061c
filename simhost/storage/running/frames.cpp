// The number of the last change, in SQL.
#include "storage/running/frames.h"

#include <limits>

#include "storage/query.h"

namespace simhost::storage {

std::optional<std::uint64_t> frames_change(Transaction &transaction) {
  return Query(transaction, "SELECT change FROM frames").first([](Query const &row) {
    return static_cast<std::uint64_t>(row.integer(0, 1, std::numeric_limits<std::int64_t>::max()));
  });
}

void advance_frames_change(ChangingTransaction &transaction) {
  Change(transaction, "UPDATE frames SET change = change + 1").run();
}

void take_frames(ChangingTransaction &transaction) {
  Change(transaction, "INSERT INTO frames SELECT 1 WHERE NOT EXISTS (SELECT 1 FROM frames)").run();
}

}  // namespace simhost::storage
