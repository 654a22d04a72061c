// One line of a trace while it is being written: JSON, in memory of the thread's own that no heap
// knows.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string_view>

namespace recordings {

/// Room that grows and is used again. Where there is no memory it stays as it is.
class Room {
 public:
  Room() = default;
  Room(Room const &) = delete;
  Room &operator=(Room const &) = delete;
  ~Room();

  /// Whether there is room for so many bytes; what was there stays.
  bool reserve(std::size_t size) noexcept { return size <= size_ || grow(size); }

  [[nodiscard]] char *data() const noexcept { return data_; }

 private:
  bool grow(std::size_t size) noexcept;

  char *data_ = nullptr;
  std::size_t size_ = 0;
};

class Line {
 public:
  void clear() noexcept {
    used_ = 0;
    is_whole_ = true;
  }

  /// What is written so far; it counts only if all of it found room.
  [[nodiscard]] std::string_view text() const noexcept { return {room_.data(), used_}; }
  [[nodiscard]] bool is_whole() const noexcept { return is_whole_; }

  Line &raw(std::string_view json) noexcept {
    if (reserve(json.size())) {
      std::memcpy(room_.data() + used_, json.data(), json.size());
      used_ += json.size();
    }
    return *this;
  }
  Line &number(std::int64_t value) noexcept;
  Line &number(std::uint64_t value) noexcept;
  Line &hex(void const *bytes, std::size_t size) noexcept;

  /// A text with its quotes, or its bytes in hexadecimal digits where they are no UTF-8.
  Line &text(std::string_view bytes) noexcept;

  /// The name of a member, which needs no escape, and its colon; a comma before it if it is not the
  /// first.
  Line &member(std::string_view name) noexcept { return comma().raw("\"").raw(name).raw("\":"); }

  Line &comma() noexcept {
    if (used_ != 0 && room_.data()[used_ - 1] != '{' && room_.data()[used_ - 1] != '[') {
      raw(",");
    }
    return *this;
  }

 private:
  bool reserve(std::size_t more) noexcept {
    is_whole_ = is_whole_ && room_.reserve(used_ + more);
    return is_whole_;
  }

  Room room_;
  std::size_t used_ = 0;
  bool is_whole_ = true;
};

}  // namespace recordings
