// Records and texts as the bytes of a property, and back.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstring>
#include <span>
#include <string>
#include <string_view>
#include <type_traits>
#include <vector>

#include "base/outcomes.h"

namespace simhost {

using Bytes = std::vector<std::byte>;
using BytesView = std::span<std::byte const>;

template <typename Record>
BytesView bytes_of(Record const &record) {
  static_assert(std::is_trivially_copyable_v<Record>);
  return std::as_bytes(std::span(&record, 1));
}

/// The bytes as a value of their own.
inline Bytes copied(BytesView bytes) {
  return {bytes.begin(), bytes.end()};
}

/// A text with its terminating NUL.
inline Bytes bytes_of_text(std::string_view text) {
  auto const bytes = std::as_bytes(std::span(text));
  Bytes all(bytes.begin(), bytes.end());
  all.push_back(std::byte{0});
  return all;
}

/// The record that the bytes begin with; refuses too few (QEX_BAD_PARAM).
template <typename Record>
Record record_at(BytesView bytes) {
  static_assert(std::is_trivially_copyable_v<Record>);
  if (bytes.size() < sizeof(Record)) {
    refuse(QEX_BAD_PARAM);
  }
  Record record;
  std::memcpy(&record, bytes.data(), sizeof record);
  return record;
}

/// The record that the bytes are; refuses another size (QEX_BAD_PARAM).
template <typename Record>
Record record_of(BytesView bytes) {
  if (bytes.size() != sizeof(Record)) {
    refuse(QEX_BAD_PARAM);
  }
  return record_at<Record>(bytes);
}

/// The records, one after the other, that the bytes are; refuses a part of one (QEX_BAD_PARAM).
template <typename Record>
std::vector<Record> records_of(BytesView bytes) {
  if (bytes.size() % sizeof(Record) != 0) {
    refuse(QEX_BAD_PARAM);
  }
  std::vector<Record> records(bytes.size() / sizeof(Record));
  if (!records.empty()) {
    std::memcpy(records.data(), bytes.data(), bytes.size());
  }
  return records;
}

/// The text that the bytes are, without its NUL; refuses a missing NUL or a second (QEX_BAD_PARAM).
inline std::string text_of(BytesView bytes) {
  if (bytes.empty() || std::find(bytes.begin(), bytes.end(), std::byte{0}) != bytes.end() - 1) {
    refuse(QEX_BAD_PARAM);
  }
  return {reinterpret_cast<char const *>(bytes.data()), bytes.size() - 1};
}

/// The text in a field of a record; refuses one that does not end there (QEX_NAME_TOO_LONG).
inline std::string_view text_in(std::span<char const> field) {
  auto const end = std::find(field.begin(), field.end(), '\0');
  if (end == field.end()) {
    refuse(QEX_NAME_TOO_LONG);
  }
  return {field.begin(), end};
}

/// Writes a text into a zeroed field of a record; refuses one that has no room for its NUL
/// (QEX_NAME_TOO_LONG).
template <typename Character, std::size_t Size>
void put_text(Character (&field)[Size], std::string_view text) {
  static_assert(sizeof(Character) == 1);
  if (text.size() >= Size) {
    refuse(QEX_NAME_TOO_LONG);
  }
  std::copy(text.begin(), text.end(), field);
}

}  // namespace simhost
