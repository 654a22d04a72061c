// Scenario documents: a host, or a change of one, in JSON. Every key is described in SCENARIOS.md.
#pragma once

#include <string>
#include <string_view>

#include "scenario/document.h"

namespace simhost::storage {
class ChangingTransaction;
class Transaction;
}  // namespace simhost::storage

namespace simhost::scenario {

/// Makes the host what a document says. What the document names is added or changed; nothing else
/// is touched. Throws DocumentError for a document that is malformed or that the host refuses; the
/// transaction must not be committed then.
void apply(storage::ChangingTransaction &transaction, std::string_view document);
/// Likewise, but passes over the switches that the host shares with others.
void apply_to_own(storage::ChangingTransaction &transaction, std::string_view document);

/// The whole host as a document. Beside what apply() reads, switches and ports have a key
/// "observed" with what follows from the rest, which apply() passes over.
Json host_to_json(storage::Transaction &transaction);

/// Likewise, as text. Names are UTF-8, as JSON is; of a value that is none, which its bytes under
/// "properties" say whole, the other bytes are shown as U+FFFD.
std::string description(storage::Transaction &transaction);

}  // namespace simhost::scenario
