// Two properties in one call.
#include "model/vlans/vlans.h"

#include "base/outcomes.h"
#include "model/lookup.h"
#include "model/properties/properties.h"
#include "storage/store.h"

namespace simhost {

void set_vlans(storage::ChangingTransaction &transaction, storage::Port const &port,
               vlans::PortVlans const &wanted) {
  if (wanted.priority != vlans::kNoPriority) {
    check_number(vlans::priority, wanted.priority);
  }
  auto const owner = owner_of(port);
  set(transaction, vlans::of_port, owner, wanted);
  if (auto const priority = wanted.priority_if_any()) {
    set(transaction, vlans::priority, owner, *priority);
  } else {
    clear(transaction, vlans::priority, owner);
  }
}

void clear_vlans(storage::ChangingTransaction &transaction, storage::Port const &port) {
  clear(transaction, vlans::of_port, owner_of(port));
  clear(transaction, vlans::priority, owner_of(port));
}

}  // namespace simhost
