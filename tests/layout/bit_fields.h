#ifndef TESTS_LAYOUT_BIT_FIELDS_H
#define TESTS_LAYOUT_BIT_FIELDS_H

#include <stddef.h>

// A bit field, where the table of records puts it, and a writer that sets all its bits.
typedef struct BitField {
  char const *record;
  char const *field;
  size_t record_size;
  size_t offset;
  unsigned first_bit;
  unsigned bit_count;
  void (*set_all_bits)(void *record);
} BitField;

#ifdef __cplusplus
extern "C" {
#endif

// The same fields with writers compiled as C and as C++.
extern BitField const bit_fields_in_c[];
extern size_t const bit_fields_in_c_count;
extern BitField const bit_fields_in_cpp[];
extern size_t const bit_fields_in_cpp_count;

#ifdef __cplusplus
}
#endif

#endif  // TESTS_LAYOUT_BIT_FIELDS_H
