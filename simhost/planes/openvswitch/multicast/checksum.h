// The checksum of the protocols of the internet.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>

#include "planes/openvswitch/multicast/address.h"

namespace simhost::multicast {

/// Adds up parts, each of which begins with the higher byte of a number.
class Checksum {
 public:
  Checksum &add(std::span<std::uint8_t const> bytes) {
    for (std::size_t at = 0; at < bytes.size(); ++at) {
      sum_ += at % 2 == 0 ? std::uint64_t{bytes[at]} << 8U : bytes[at];
    }
    return *this;
  }
  /// What protocols over IPv6 count in.
  Checksum &add_header(Address const &source, Address const &destination, std::uint8_t protocol,
                       std::size_t length) {
    sum_ += protocol + length;
    return add(source.bytes).add(destination.bytes);
  }

  /// What the field must have; 0 if the field is right and was added, too.
  [[nodiscard]] std::uint16_t value() const {
    auto sum = sum_;
    while (sum > 0xffff) {
      sum = (sum >> 16U) + (sum & 0xffffU);
    }
    return static_cast<std::uint16_t>(~sum);
  }

 private:
  std::uint64_t sum_ = 0;
};

}  // namespace simhost::multicast
