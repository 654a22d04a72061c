// Checked and unchecked ways to the elements of variable-length records; see slots.h.

#include "helpers/slots.h"

#include <algorithm>
#include <cstdio>
#include <cstring>

void report_invalid_index() {
  std::fputs("Invalid array index.", stdout);
}

bool index_is_valid(int index, std::uint32_t count) {
  if (static_cast<std::uint32_t>(index) < count) {
    return true;
  }
  report_invalid_index();
  return false;
}

bool signed_index_is_valid(int index, int count) {
  if (index < count) {
    return true;
  }
  report_invalid_index();
  return false;
}

void fill_slot(std::span<char> slot, char const *text) {
  size_t const length = strnlen(text, slot.size());
  std::copy_n(text, length, slot.begin());
  std::fill(slot.begin() + static_cast<std::ptrdiff_t>(length), slot.end(), '\0');
}
