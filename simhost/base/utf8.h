// UTF-8: what documents and the interpreter take texts to be.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace simhost {

/// How many bytes the well-formed character at the start of a text takes; 0 if there is none. The
/// text is not empty.
std::size_t character_length(std::string_view text);

/// A text of any bytes as UTF-8: those that are of no character as \xNN.
std::string in_utf8(std::string_view text);

/// Refuses a name or another text that is no UTF-8 (QEX_INVALID_NAME): no document could say it.
void require_utf8(std::string_view text);

}  // namespace simhost
