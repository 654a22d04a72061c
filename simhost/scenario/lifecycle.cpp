// Each part of the host knows what it loses.
#include "scenario/lifecycle.h"

#include "clock/clock.h"
#include "faults/faults.h"
#include "model/options/host_settings.h"
#include "model/plane.h"
#include "model/state/restart.h"
#include "storage/store.h"
#include "storage/switches.h"

namespace simhost::scenario {

void restart_host(storage::Transaction &transaction) {
  restart_configuration(transaction);
  running_plane().restart(transaction);
  forget_host_settings(transaction);
}

void empty_host(storage::Transaction &transaction) {
  for (auto const &known : storage::all_switches(transaction)) {
    storage::remove_switch(transaction, known.key);
  }
  transaction.query("DELETE FROM uplink").run();
  // What is numbered begins anew. But keys of switches, which nobody sees, tell a handle from
  // before.
  transaction.query("DELETE FROM sqlite_sequence WHERE name <> 'switch'").run();
  forget_host_settings(transaction);
  clear_faults(transaction, "");
  reset_clock(transaction);
}

}  // namespace simhost::scenario
