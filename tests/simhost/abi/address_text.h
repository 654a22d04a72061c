// An address as the host writes it into its messages.
#pragma once

#include <array>
#include <cstdio>
#include <string>

inline std::string text_of(void const *address) {
  std::array<char, 32> text{};
  std::snprintf(text.data(), text.size(), "%p", address);
  return text.data();
}
