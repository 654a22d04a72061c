// Configuration and policy stay, the rest goes.
#include "model/state/restart.h"

#include "storage/properties.h"
#include "storage/shared.h"
#include "storage/store.h"
#include "storage/switches.h"

namespace simhost {

void restart_configuration(storage::ChangingTransaction &transaction) {
  for (auto const &[key, row] : storage::all_switches(transaction)) {
    if (!row.persistent && !storage::is_shared(transaction, row.identifier)) {
      storage::remove_switch(transaction, key);
    }
  }
  storage::remove_properties(transaction, storage::PropertyType::runtime);
  storage::remove_properties(transaction, storage::PropertyType::transient);
}

}  // namespace simhost
