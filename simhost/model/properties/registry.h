// All settings that have a meaning to the host.
#pragma once

#include <span>
#include <string_view>

#include "base/api.h"
#include "model/properties/descriptor.h"

namespace simhost {

/// Who defines a key.
enum class KeyFamily {
  common,  ///< distributed switches of every kind
  vendor,  ///< this kind of switch
  extra,   ///< nobody here
};

/// A key of the headers and what they call it.
struct KeyConstant {
  std::string_view name;
  std::string_view key;
  KeyFamily family;
};

/// All of them; those of one owner in the order in which documents say them.
SIMHOST_API std::span<Descriptor const *const> descriptors();
/// The setting of that key; null if the key has no meaning to the host.
SIMHOST_API Descriptor const *find_descriptor(std::string_view key);

/// The constant of a setting.
SIMHOST_API KeyConstant const &constant_of(Descriptor const &descriptor);
/// KeyFamily::extra for a key without a meaning.
SIMHOST_API KeyFamily family_of(std::string_view key);

}  // namespace simhost
