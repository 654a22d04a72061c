// Memory of the process, read as if from outside: where there is none, that is told and harms
// nobody.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>

#include "recordings/core/line.h"

namespace recordings {

/// The most bytes that a trace holds of one value.
inline constexpr std::size_t most_bytes = std::size_t{64} << 20U;
inline constexpr std::size_t longest_text = std::size_t{1} << 20U;

/// A block that is copied as far as it is looked at, for how long it is stands inside it.
class Block {
 public:
  /// Begins with the block at an address, of which nothing is copied yet.
  void open(std::uint64_t address) noexcept;

  /// Whether the first so many bytes are there; they are copied then.
  bool need(std::size_t size) noexcept;

  /// Copies a text up to its NUL, or the longest that a trace holds; false if it is not all there.
  bool need_text() noexcept;

  [[nodiscard]] char const *at(std::size_t offset) const noexcept { return room_.data() + offset; }
  [[nodiscard]] std::size_t size() const noexcept { return size_; }

 private:
  Room room_;
  std::uint64_t address_ = 0;
  std::size_t size_ = 0;
};

}  // namespace recordings
