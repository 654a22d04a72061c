// Results that the library allocates for a caller.
#pragma once

#include <cstddef>
#include <cstring>
#include <span>
#include <string_view>

#include "abi/boundary.h"
#include "abi/ledger.h"
#include "qexapi/names.h"

namespace simhost {

/// A record of zeros with room for `trailing` bytes after it.
template <typename Record>
Record *allocate_record(Call &call, std::size_t trailing = 0) {
  return static_cast<Record *>(call.ledger().allocate(sizeof(Record) + trailing, call.name()));
}

/// A record that counts its entries and has them right after it.
template <typename Record>
Record *allocate_counted(Call &call, std::span<std::byte const> entries, std::size_t count) {
  auto *const record = allocate_record<Record>(call, entries.size());
  record->totalEntries = static_cast<qex_uint32>(count);
  record->numEntries = static_cast<qex_uint32>(count);
  if (!entries.empty()) {
    std::memcpy(record + 1, entries.data(), entries.size());
  }
  return record;
}

template <typename Record, typename Entries>
Record *allocate_list(Call &call, Entries const &entries) {
  return allocate_counted<Record>(call, std::as_bytes(std::span(entries)), entries.size());
}

/// A name as records hold it, cut at 31 bytes.
inline qex_Name name_of(std::string_view text) {
  qex_Name name{};
  text.copy(name.string, sizeof name.string - 1);
  return name;
}

}  // namespace simhost
