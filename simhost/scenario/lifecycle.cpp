// Each part of the host knows what it loses.
#include "scenario/lifecycle.h"

#include "clock/clock.h"
#include "faults/faults.h"
#include "model/plane.h"
#include "model/state/restart.h"
#include "storage/ports.h"
#include "storage/running/host_settings.h"
#include "storage/shared.h"
#include "storage/store.h"
#include "storage/switches.h"
#include "storage/tunnels/fabrics.h"

namespace simhost::scenario {

void restart_host(storage::ChangingTransaction &transaction) {
  restart_configuration(transaction);
  running_plane().restart(transaction);
  storage::remove_host_settings(transaction);
}

void empty_host(storage::ChangingTransaction &transaction) {
  for (auto const &known : storage::all_switches(transaction)) {
    if (!storage::is_shared(transaction, known.row.identifier)) {
      storage::remove_switch(transaction, known.key);
    }
  }
  storage::remove_uplinks(transaction);
  storage::remove_underlay(transaction);
  storage::restart_numbering(transaction);
  storage::remove_host_settings(transaction);
  clear_faults(transaction, "");
  reset_clock(transaction);
}

}  // namespace simhost::scenario
