// Times of queries in few bits: small ones as they are, larger ones as a mantissa and an exponent
// under a first bit that is set.
#pragma once

#include <algorithm>
#include <cstdint>

namespace simhost::multicast {

/// A code with an exponent of 3 bits: in 8 bits the mantissa has 4 of them, in 16 it has 12.
template <unsigned kBits>
struct FloatingCode {
  static constexpr unsigned kMantissaBits = kBits - 4;
  static constexpr std::uint64_t kFirstBit = std::uint64_t{1} << (kBits - 1);
  static constexpr std::uint64_t kHidden = std::uint64_t{1} << kMantissaBits;
  static constexpr unsigned kLeastExponent = 3;
  static constexpr unsigned kMostExponent = 7;
  static constexpr std::uint64_t kGreatest = (2 * kHidden - 1) << (kLeastExponent + kMostExponent);

  static constexpr std::uint64_t decoded(std::uint64_t code) {
    if (code < kFirstBit) {
      return code;
    }
    auto const exponent = (code >> kMantissaBits) & kMostExponent;
    return (kHidden | (code & (kHidden - 1))) << (exponent + kLeastExponent);
  }
  /// The code of that number, or of the next smaller one that has one.
  static constexpr std::uint64_t encoded(std::uint64_t number) {
    if (number < kFirstBit) {
      return number;
    }
    auto mantissa = std::min(number, kGreatest) >> kLeastExponent;
    std::uint64_t exponent = 0;
    for (; mantissa >= 2 * kHidden; mantissa >>= 1U) {
      ++exponent;
    }
    return kFirstBit | exponent << kMantissaBits | (mantissa & (kHidden - 1));
  }
};

}  // namespace simhost::multicast
