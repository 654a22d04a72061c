// The properties for which documents have a member of their own beside their raw bytes: the teaming
// of a switch, the mirror sessions of a port.
#pragma once

#include <span>
#include <string_view>

#include "base/bytes.h"
#include "scenario/document.h"
#include "storage/properties.h"

namespace simhost::scenario {

/// A member of a document and the property that it is.
struct NamedProperty {
  std::string_view member;
  std::string_view key;
  Bytes (*value_from)(Node const &node);
  Json (*described)(BytesView value);  ///< what members can say of the value
};

using NamedProperties = std::span<NamedProperty const>;

NamedProperties named_of_switch();
NamedProperties named_of_port();
NamedProperties named_of_uplink_port();

/// Null for a property without a member of its own.
NamedProperty const *find_named(NamedProperties named, std::string_view key);

/// Sets the properties that an object has members for.
void apply_members(storage::Transaction &transaction, storage::PropertyOwner const &owner,
                   NamedProperties named, Node const &node);

/// Adds to an object the members for the properties that are set.
void describe_members(Json &described, storage::Transaction &transaction,
                      storage::PropertyOwner const &owner, NamedProperties named);

/// Whether the member of a property says all that there is: its type and each of its bytes.
bool round_trips(Json const &described, NamedProperty const &named,
                 storage::Property const &property);

}  // namespace simhost::scenario
