// What a host comes with.
#include "core/fresh_host.h"

#include "store/ports.h"
#include "store/store.h"

namespace simhost {

void furnish_fresh_host(store::Transaction &transaction) {
  for (auto const *name : {"nic0", "nic1", "nic2", "nic3"}) {
    store::add_uplink(transaction, name);
  }
}

}  // namespace simhost
