// The host as it is when nobody has changed it yet.
#pragma once

namespace simhost::store {
class Transaction;
}

namespace simhost {

/// Fills an empty state: four free uplinks, "nic0" to "nic3".
void furnish_fresh_host(store::Transaction &transaction);

}  // namespace simhost
