// Configuration and policy stay, the rest goes.
#include "core/restart.h"

#include "store/properties.h"
#include "store/store.h"
#include "store/switches.h"

namespace simhost {

void restart_configuration(store::Transaction &transaction) {
  for (auto const &[key, row] : store::all_switches(transaction)) {
    if (!row.persistent) {
      store::remove_switch(transaction, key);
    }
  }
  store::remove_properties(transaction, store::PropertyType::runtime);
  store::remove_properties(transaction, store::PropertyType::transient);
}

}  // namespace simhost
