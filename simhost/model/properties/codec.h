// A value of C++ and the bytes that a property of it has.
#pragma once

#include <string>
#include <string_view>
#include <type_traits>
#include <vector>

#include "base/bytes.h"

namespace simhost {

/// A value that has bytes of its own making: to_bytes(), from(bytes), which refuses others, and
/// what the bytes are called.
template <typename Value>
concept CodesItself = requires(Value const &value, BytesView bytes) {
  value.to_bytes();
  Value::from(bytes);
  Value::kBytes;
};

/// One record, byte for byte.
template <typename Value>
struct Codec {
  static Bytes bytes(Value const &value) { return copied(bytes_of(value)); }
  static Value value(BytesView bytes) { return record_of<Value>(bytes); }
};

template <>
struct Codec<Bytes> {
  static Bytes bytes(Bytes value) { return value; }
  static Bytes value(BytesView bytes) { return copied(bytes); }
};

template <>
struct Codec<std::string> {
  static Bytes bytes(std::string const &value) { return bytes_of_text(value); }
  static std::string value(BytesView bytes) { return text_of(bytes); }
};

/// Records, one after the other.
template <typename Record>
struct Codec<std::vector<Record>> {
  static Bytes bytes(std::vector<Record> const &value) {
    return copied(std::as_bytes(std::span(value)));
  }
  static std::vector<Record> value(BytesView bytes) { return records_of<Record>(bytes); }
};

template <CodesItself Value>
struct Codec<Value> {
  static Bytes bytes(Value const &value) { return value.to_bytes(); }
  static Value value(BytesView bytes) { return Value::from(bytes); }
};

}  // namespace simhost
