// The host as it is when nobody has changed it yet.
#pragma once

namespace simhost::storage {
class ChangingTransaction;
}

namespace simhost {

/// Fills an empty state with what the document says that SIMHOST_SCENARIO names; without one, with
/// the default host. Throws scenario::DocumentError for a document that cannot be used.
void populate_fresh_host(storage::ChangingTransaction &transaction);

}  // namespace simhost
