// The part of scenario documents that is about one switch.
#pragma once

#include "control/document.h"
#include "store/store.h"

namespace simhost::control {

/// Makes a switch what an item of "switches" says; see apply() in scenario.h.
void apply_switch(store::Transaction &work, Node const &node);

}  // namespace simhost::control
