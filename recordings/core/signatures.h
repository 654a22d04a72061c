// How arguments and results cross where their types are known.
#pragma once

#include <cstddef>
#include <cstdint>
#include <type_traits>

namespace recordings {

/// The functions that calls are given, to be called back.
using Visit = char (*)(void *, void *);
using Allocate = void *(*)(std::size_t);
using Release = void (*)(void *);

/// An argument or a result in 64 bits.
template <typename T>
std::uint64_t word_of(T value) noexcept {
  if constexpr (std::is_pointer_v<T>) {
    return reinterpret_cast<std::uint64_t>(value);
  } else {
    return static_cast<std::uint64_t>(static_cast<std::int64_t>(value));
  }
}

/// The argument or result that was those.
template <typename T>
T value_of(std::uint64_t word) noexcept {
  if constexpr (std::is_pointer_v<T>) {
    return reinterpret_cast<T>(word);
  } else {
    return static_cast<T>(word);
  }
}

}  // namespace recordings
