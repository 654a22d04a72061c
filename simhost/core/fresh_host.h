// The host as it is when nobody has changed it yet.
#pragma once

namespace simhost::store {
class Transaction;
}

namespace simhost {

/// Fills an empty state with what the document says that SIMHOST_SCENARIO names; without one, with
/// the default host. Throws control::DocumentError for a document that cannot be used.
void furnish_fresh_host(store::Transaction &transaction);

}  // namespace simhost
