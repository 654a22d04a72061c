// The bit fields of all records as the C++ compiler lays them.
#define BIT_FIELD_TABLE bit_fields_in_cpp
#define BIT_FIELD_COUNT bit_fields_in_cpp_count
#include "bit_field_table.inc"
