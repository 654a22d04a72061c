// The part of scenario documents that is about one switch.
#pragma once

#include "scenario/document.h"
#include "storage/store.h"

namespace simhost::scenario {

/// Makes a switch what an item of "switches" says; see apply() in scenario.h.
void apply_switch(storage::ChangingTransaction &transaction, Node const &node);

}  // namespace simhost::scenario
