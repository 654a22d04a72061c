// What joins a host to others, in documents: the fabric of a switch, and the underlay.
#pragma once

#include "scenario/document.h"
#include "storage/store.h"
#include "storage/tunnels/fabrics.h"

namespace simhost::scenario {

/// Applies a member "underlay" of a document; an empty object stands for none.
void apply_underlay(storage::ChangingTransaction &transaction, Node const &node);
/// Likewise a member "fabric" of a switch. Its uplink is not yet at a port.
void apply_fabric(storage::ChangingTransaction &transaction, storage::SwitchKey key,
                  Node const &node);

Json to_json(storage::Underlay const &underlay);
Json to_json(storage::Fabric const &fabric);

}  // namespace simhost::scenario
