// Generations in SQL; triggers move them on.
#include "storage/running/generations.h"

#include "storage/query.h"

namespace simhost::storage {

Generations get_generations(Transaction &transaction, SwitchKey key) {
  Query select(transaction, "SELECT team, ports FROM generation WHERE switch = ?");
  select.with(key).require_row();
  return {.team = select.integer(0), .ports = select.integer(1)};
}

std::int64_t commits_of_others(Transaction &transaction) {
  Query select(transaction, "PRAGMA data_version");
  select.require_row();
  return select.integer(0);
}

}  // namespace simhost::storage
