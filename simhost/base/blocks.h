// Writing and reading what crosses the boundary as one block: a header that says what it is, of
// which format and how long, a checksum, and then numbers and lengths of 4 bytes and raw bytes.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "base/bytes.h"

namespace simhost {

/// What a block holds.
enum class BlockKind : std::uint32_t {
  state = 1,
  persistent_state = 2,
  port_state = 3,
  list = 4,
};

class Writer {
 public:
  void number(std::uint32_t value);
  void bytes(BytesView value);
  void text(std::string_view value) { bytes(std::as_bytes(std::span(value))); }

  /// What was written, as a block. `version` is that of the distributed switch it is for; the
  /// format does not depend on it.
  [[nodiscard]] Bytes block(BlockKind kind, std::uint32_t version) const;

 private:
  Bytes content_;
};

/// Never reads past the end, whatever the bytes say; refuses what does not fit
/// (QEX_INVALID_METADATA).
class Reader {
 public:
  /// Refuses a block that is cut or altered (QEX_INVALID_METADATA, QEX_CHECKSUM_MISMATCH), or of
  /// another format (QEX_VERSION_MISMATCH_MAJOR).
  explicit Reader(BytesView block);

  [[nodiscard]] BlockKind kind() const { return kind_; }
  std::uint32_t number();
  BytesView bytes();
  /// Without a NUL: callers could not say such a text, nor read it whole.
  std::string text();
  /// Refuses if something is left.
  void end() const;

 private:
  BytesView take(std::size_t size);

  BlockKind kind_{};
  BytesView rest_;
};

}  // namespace simhost
