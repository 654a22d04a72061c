// The records as C lays them out.

#include <assert.h>
#include <stdalign.h>
#include <stddef.h>

#include "headers.inc"

// One variable may be declared twice only with one type.
#define SAME_TYPE(NAME, TYPE)  \
  extern NAME NAME##_variable; \
  extern TYPE NAME##_variable

// C cannot ask for the type of a bit field; that check is left to C++.
#define FIELD_TYPE(RECORD, FIELD, TYPE) \
  static_assert(sizeof(RECORD) > 0, "keeps the semicolon legal")

#include "records.inc"
