// The records as C++ lays them out, and the types of their fields.

#include <cstddef>
#include <type_traits>

#include "headers.inc"

#define SAME_TYPE(NAME, TYPE) static_assert(std::is_same_v<NAME, TYPE>)
#define FIELD_TYPE(RECORD, FIELD, TYPE) \
  static_assert(std::is_same_v<decltype(RECORD::FIELD), TYPE>, "type of " #RECORD "." #FIELD)

#include "records.inc"
