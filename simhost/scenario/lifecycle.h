// What happens to the host as a whole.
#pragma once

namespace simhost::storage {
class ChangingTransaction;
}

namespace simhost::scenario {

/// The host restarts: switches that are neither persistent nor shared go, and so do runtime and
/// volatile properties, learned addresses, multicast groups, counters, runtime options and the
/// global MAC learning. Cabling, the clock and faults are not the host's and stay.
void restart_host(storage::ChangingTransaction &transaction);

/// Empties the host: no switches but those that it shares, no uplinks, a real clock, no faults, and
/// numbers from 1 on.
void empty_host(storage::ChangingTransaction &transaction);

}  // namespace simhost::scenario
