// Policies as the state holds them: records, byte for byte.
#pragma once

#include <cstring>
#include <optional>
#include <string_view>
#include <type_traits>

#include "store/properties.h"

namespace simhost::dataplane {

/// The record that a property holds; nothing if there is no such property or it is too short.
template <typename Record>
std::optional<Record> policy(store::Transaction &transaction, store::PropertyOwner const &owner,
                             std::string_view key) {
  static_assert(std::is_trivially_copyable_v<Record>);
  auto const property = store::find_property(transaction, owner, key);
  if (!property || property->value.size() < sizeof(Record)) {
    return std::nullopt;
  }
  Record record;
  std::memcpy(&record, property->value.data(), sizeof record);
  return record;
}

}  // namespace simhost::dataplane
