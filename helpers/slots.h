/**
 * Slots: elements of the variable-length records, reached by index.
 *
 * For the module's own C++ only.
 */
#ifndef HELPERS_SLOTS_H
#define HELPERS_SLOTS_H

#include <cstddef>
#include <cstdint>
#include <span>

/**
 * Whether `index` lies below `count`; both are compared unsigned, so a negative index does not.
 *
 * If it does not, "Invalid array index." goes to standard output, without a line break.
 */
bool index_is_valid(int index, std::uint32_t count);

/** The same for a signed comparison, which a negative index passes. */
bool signed_index_is_valid(int index, int count);

/** Writes the notice of an index that is not valid. */
void report_invalid_index();

/**
 * Fills a slot with a text: cut at the slot's size, or padded with NULs. A text that is as long as
 * the slot leaves no terminator in it.
 */
void fill_slot(std::span<char> slot, char const *text);

/**
 * The `index`-th element from `first` on, without a check and whatever its alignment.
 *
 * The address is computed in bytes, because the index may lead out of the declared array.
 */
template <typename Element>
Element *element_at(void *first, std::ptrdiff_t index) {
  auto const start = reinterpret_cast<std::uintptr_t>(first);
  return reinterpret_cast<Element *>(start + static_cast<std::uintptr_t>(index) * sizeof(Element));
}

#endif
