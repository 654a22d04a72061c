// Buckets and how a group selects among them, on the wire.
#pragma once

#include "planes/openvswitch/openflow/codec/wire.h"
#include "planes/openvswitch/openflow/group.h"

namespace simhost::openflow {

/// Throws std::invalid_argument for a method with too long a name.
void put_buckets(Writer &out, Group const &group);
void put_selection(Writer &out, Selection const &selection);

// These take all that there is. They throw Malformed, and Foreign for what has no value here.

std::vector<Bucket> take_buckets(Reader &in);
Selection take_group_properties(Reader &in);

}  // namespace simhost::openflow
