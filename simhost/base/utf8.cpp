// Well-formed is what the standard's table of byte sequences has.
#include "base/utf8.h"

#include <fmt/format.h>

#include <algorithm>

#include "base/outcomes.h"

namespace simhost {

std::size_t character_length(std::string_view text) {
  auto const byte = [&](std::size_t at) { return static_cast<unsigned char>(text[at]); };
  auto const lead = byte(0);
  if (lead < 0x80) {
    return 1;
  }
  std::size_t const length = lead < 0xC2   ? 0
                             : lead < 0xE0 ? 2
                             : lead < 0xF0 ? 3
                             : lead < 0xF5 ? 4
                                           : 0;
  if (length == 0 || length > text.size()) {
    return 0;
  }
  // The second byte is where overlong forms, surrogates and values past the last one differ.
  unsigned const low = lead == 0xE0 ? 0xA0 : lead == 0xF0 ? 0x90 : 0x80;
  unsigned const high = lead == 0xED ? 0x9F : lead == 0xF4 ? 0x8F : 0xBF;
  if (byte(1) < low || byte(1) > high) {
    return 0;
  }
  for (std::size_t at = 2; at < length; ++at) {
    if ((byte(at) & 0xC0U) != 0x80U) {
      return 0;
    }
  }
  return length;
}

std::string in_utf8(std::string_view text) {
  std::string whole;
  while (!text.empty()) {
    auto const length = character_length(text);
    if (length == 0) {
      whole += fmt::format("\\x{:02x}", static_cast<unsigned char>(text.front()));
    } else {
      whole += text.substr(0, length);
    }
    text.remove_prefix(std::max<std::size_t>(length, 1));
  }
  return whole;
}

void require_utf8(std::string_view text) {
  while (!text.empty()) {
    auto const length = character_length(text);
    if (length == 0) {
      throw Refused(QEX_INVALID_NAME, "the text is no UTF-8");
    }
    text.remove_prefix(length);
  }
}

}  // namespace simhost
