// What happens to the host as a whole.
#pragma once

namespace simhost::store {
class Transaction;
}

namespace simhost::control {

/// The host restarts: switches that are not persistent go, and so do runtime and volatile
/// properties, learned addresses, multicast groups, counters, runtime options and the global MAC
/// learning. Cabling, the clock and faults are not the host's and stay.
void restart_host(store::Transaction &transaction);

/// Empties the host: no switches, no uplinks, a real clock, no faults, and numbers from 1 on.
void empty_host(store::Transaction &transaction);

}  // namespace simhost::control
