// The records as C lays them out.

#include <assert.h>
#include <stdalign.h>
#include <stddef.h>

#include "headers.inc"

#define SAME_TYPE(NAME, TYPE) \
  static_assert(_Generic((NAME *)0, TYPE * : 1, default : 0), #NAME " names " #TYPE)

// C cannot ask for the type of a bit field; that check is left to C++.
#define FIELD_TYPE(RECORD, FIELD, TYPE) \
  static_assert(sizeof(RECORD) > 0, "keeps the semicolon legal")

#include "records.inc"
