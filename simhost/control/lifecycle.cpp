// Each part of the host knows what it loses.
#include "control/lifecycle.h"

#include "core/clock.h"
#include "core/data_plane.h"
#include "core/faults.h"
#include "core/host_settings.h"
#include "core/restart.h"
#include "store/store.h"
#include "store/switches.h"

namespace simhost::control {

void restart_host(store::Transaction &transaction) {
  restart_configuration(transaction);
  data_plane().restart(transaction);
  forget_host_settings(transaction);
}

void empty_host(store::Transaction &transaction) {
  for (auto const &known : store::all_switches(transaction)) {
    store::remove_switch(transaction, known.key);
  }
  transaction.query("DELETE FROM uplink").run();
  // What is numbered begins anew. But keys of switches, which nobody sees, tell a handle from
  // before.
  transaction.query("DELETE FROM sqlite_sequence WHERE name <> 'switch'").run();
  forget_host_settings(transaction);
  clear_faults(transaction, "");
  reset_clock(transaction);
}

}  // namespace simhost::control
