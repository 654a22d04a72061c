// Policies as the state holds them: records, byte for byte.
#pragma once

#include <cstddef>
#include <cstring>
#include <optional>
#include <span>
#include <string_view>
#include <type_traits>

#include "storage/properties.h"

namespace simhost::stored {

/// The record that bytes begin with; nothing if they are too short.
template <typename Record>
std::optional<Record> record_in(std::span<std::byte const> bytes) {
  static_assert(std::is_trivially_copyable_v<Record>);
  if (bytes.size() < sizeof(Record)) {
    return std::nullopt;
  }
  Record record;
  std::memcpy(&record, bytes.data(), sizeof record);
  return record;
}

/// The record that a property holds; nothing if there is no such property or it is too short.
template <typename Record>
std::optional<Record> policy(storage::Transaction &transaction, storage::PropertyOwner const &owner,
                             std::string_view key) {
  auto const property = storage::find_property(transaction, owner, key);
  return property ? record_in<Record>(property->value) : std::nullopt;
}

}  // namespace simhost::stored
