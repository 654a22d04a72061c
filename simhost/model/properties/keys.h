// The keys that have a meaning to the host: whose they are, what their bytes may be, who keeps
// them.
#pragma once

#include <span>
#include <string_view>

#include "base/api.h"
#include "base/bytes.h"
#include "storage/properties.h"

namespace simhost {

/// A property and the bytes that it is to have.
struct Setting {
  storage::Transaction &transaction;
  storage::PropertyOwner const &owner;
  BytesView value;
};

/// Who defines a key.
enum class KeyFamily {
  common,  ///< distributed switches of every kind
  vendor,  ///< this kind of switch
  extra,   ///< nobody here
};

struct PropertyKey {
  std::string_view name;
  storage::PropertyScope scope;
  KeyFamily family;
  storage::PropertyType type;  ///< what the typed calls store it as
  /// Refuses bytes that the property may not have.
  void (*check)(Setting const &setting);
  /// If the host keeps the value elsewhere than under the key: reads it.
  Bytes (*read)(storage::Transaction &, storage::PropertyOwner const &) = nullptr;
  /// Likewise: writes it; null if callers may only read it.
  void (*write)(Setting const &setting) = nullptr;
};

/// All of them.
std::span<PropertyKey const> property_keys();
/// The key of that name; null if the name has no meaning to the host.
PropertyKey const *find_property_key(std::string_view name);

/// KeyFamily::extra for a name without a meaning.
SIMHOST_API KeyFamily family_of(std::string_view name);

}  // namespace simhost
