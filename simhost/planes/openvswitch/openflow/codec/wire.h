// Numbers in network order: written one after the other, and read from bytes that nobody vouches
// for.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <stdexcept>
#include <string>
#include <vector>

#include "planes/openvswitch/openflow/value.h"

namespace simhost::openflow {

using Bytes = std::vector<std::uint8_t>;
using BytesView = std::span<std::uint8_t const>;

/// The bytes are no OpenFlow: lengths that do not fit into each other.
class Malformed : public std::runtime_error {
 public:
  using runtime_error::runtime_error;
};

class Writer {
 public:
  [[nodiscard]] std::size_t size() const { return bytes_.size(); }
  [[nodiscard]] Bytes const &bytes() const { return bytes_; }

  void u8(std::uint8_t number) { bytes_.push_back(number); }
  void u16(std::uint16_t number) { value(number, sizeof number); }
  void u32(std::uint32_t number) { value(number, sizeof number); }
  void u64(std::uint64_t number) { value(number, sizeof number); }
  /// The lowest bytes of a number.
  void value(Value number, unsigned size) {
    for (auto left = size; left > 0; --left) {
      u8(static_cast<std::uint8_t>(number >> (8 * (left - 1))));
    }
  }
  void zeros(std::size_t size) { bytes_.resize(bytes_.size() + size); }
  void append(BytesView bytes) { bytes_.insert(bytes_.end(), bytes.begin(), bytes.end()); }
  /// Zeros until what began at `start` has a multiple of 8 bytes.
  void pad(std::size_t start) { zeros((start - bytes_.size()) % 8); }
  /// Puts how much there is since `start` at `place`. Throws std::length_error if that is too much
  /// for 16 bits.
  void put_length(std::size_t place, std::size_t start) {
    auto const length = bytes_.size() - start;
    if (length > 0xffff) {
      throw std::length_error("a message of OpenFlow has at most 65535 bytes");
    }
    bytes_[place] = static_cast<std::uint8_t>(length >> 8U);
    bytes_[place + 1] = static_cast<std::uint8_t>(length);
  }

 private:
  Bytes bytes_;
};

/// Throws Malformed for what is past the end.
class Reader {
 public:
  explicit Reader(BytesView bytes) : left_(bytes) {}

  [[nodiscard]] bool empty() const { return left_.empty(); }
  [[nodiscard]] std::size_t size() const { return left_.size(); }
  [[nodiscard]] BytesView rest() const { return left_; }

  std::uint8_t u8() { return static_cast<std::uint8_t>(value(1)); }
  std::uint16_t u16() { return static_cast<std::uint16_t>(value(2)); }
  std::uint32_t u32() { return static_cast<std::uint32_t>(value(4)); }
  std::uint64_t u64() { return static_cast<std::uint64_t>(value(8)); }
  Value value(std::size_t size) {
    Value number = 0;
    for (auto const byte : take(size)) {
      number = number << 8U | byte;
    }
    return number;
  }
  void skip(std::size_t size) { take(size); }
  BytesView take(std::size_t size) {
    if (size > left_.size()) {
      throw Malformed("it ends early");
    }
    auto const taken = left_.first(size);
    left_ = left_.subspan(size);
    return taken;
  }

 private:
  BytesView left_;
};

/// The next item of a list. Its length, the 16 bits at `place`, counts it whole and not what pads
/// it to a multiple of `alignment`. The reader has all of it.
inline Reader take_item(Reader &list, std::size_t place, std::size_t least,
                        std::size_t alignment = 1) {
  Reader ahead(list.rest());
  ahead.skip(place);
  std::size_t const length = ahead.u16();
  if (length < least) {
    throw Malformed("an item is shorter than any of its kind");
  }
  Reader const item(list.take(length));
  list.skip((alignment - length % alignment) % alignment);
  return item;
}

}  // namespace simhost::openflow
