// The one way to the properties, for typed calls and raw ones alike: what a key's bytes may be.
#pragma once

#include <cstddef>
#include <span>
#include <string_view>

#include "store/properties.h"

namespace simhost {

/// Sets a property. Refuses bytes that the key does not allow (QEX_BAD_PARAM); a key without rules
/// takes any.
void set_property(store::Transaction &transaction, store::PropertyOwner const &owner,
                  std::string_view key, std::span<std::byte const> value, store::PropertyType type);

}  // namespace simhost
