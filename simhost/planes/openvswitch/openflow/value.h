// What a field of a frame or of its metadata can hold.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>

namespace simhost::openflow {

/// The content of a field as a number: addresses too, their first byte the highest.
__extension__ typedef unsigned __int128 Value;

using EthernetAddress = std::array<std::uint8_t, 6>;
using Ipv4Address = std::array<std::uint8_t, 4>;
using Ipv6Address = std::array<std::uint8_t, 16>;

/// An address as the content of a field.
template <std::size_t Size>
constexpr Value to_value(std::array<std::uint8_t, Size> const &address) {
  static_assert(Size <= sizeof(Value));
  Value value = 0;
  for (auto const byte : address) {
    value = value << 8U | byte;
  }
  return value;
}

/// The address that is the content of a field; higher bits are left out.
template <std::size_t Size>
constexpr std::array<std::uint8_t, Size> to_address(Value value) {
  std::array<std::uint8_t, Size> address{};
  for (auto at = Size; at > 0; --at) {
    address.at(at - 1) = static_cast<std::uint8_t>(value);
    value >>= 8U;
  }
  return address;
}

/// So many ones, the lowest bits of a number; at most 128.
constexpr Value ones(unsigned bits) {
  return bits == 0 ? 0 : ~Value{0} >> (8 * sizeof(Value) - bits);
}

}  // namespace simhost::openflow
