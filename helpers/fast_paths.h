/**
 * The common cases of conversions, inline in every wrapper: small integers, short ASCII texts.
 *
 * Each reads what it can straight from the object and hands everything else to the function of
 * conversions.h that it stands before, so the two never disagree. What depends on how an
 * interpreter lays out its objects is guarded by version; -DNO_FAST_PATHS leaves only the
 * functions.
 */
#ifndef HELPERS_FAST_PATHS_H
#define HELPERS_FAST_PATHS_H

#include <Python.h>
#include <limits.h>
#include <stdbool.h>
#include <string.h>

#include "helpers/conversions.h"

#if !defined(NO_FAST_PATHS) && !defined(Py_GIL_DISABLED) && !defined(PYPY_VERSION)
#define FAST_PATHS 1
#else
#define FAST_PATHS 0
#endif

/** Whether `object` is an int of one digit, and its value. */
static inline bool is_small_integer(PyObject *object, long *value) {
#if FAST_PATHS && PY_VERSION_HEX >= 0x030C0000
  if (PyLong_CheckExact(object) && PyUnstable_Long_IsCompact((PyLongObject *)object)) {
    *value = PyUnstable_Long_CompactValue((PyLongObject *)object);
    return true;
  }
#elif FAST_PATHS
  if (PyLong_CheckExact(object) && (size_t)(Py_SIZE(object) + 1) <= 2) {
    *value = (long)((PyLongObject *)object)->ob_digit[0] * Py_SIZE(object);
    return true;
  }
#endif
  (void)object, (void)value;
  return false;
}

/** The readings of conversions.h, with the small integers first. */
// NOLINTBEGIN(bugprone-macro-parentheses): types cannot have them
#define DEFINE_READING(NAME, TYPE, LEAST, MOST)                           \
  static inline int read_##NAME(PyObject *object, TYPE *value) {          \
    long small = 0;                                                       \
    if (is_small_integer(object, &small) && (LEAST) && small <= (MOST)) { \
      *value = (TYPE)small;                                               \
      return kConverted;                                                  \
    }                                                                     \
    return NAME##_from_object(object, value);                             \
  }

DEFINE_READING(int, int, true, INT_MAX)
DEFINE_READING(unsigned_int, unsigned int, small >= 0, LONG_MAX)
DEFINE_READING(unsigned_short, unsigned short, small >= 0, USHRT_MAX)
DEFINE_READING(unsigned_char, unsigned char, small >= 0, UCHAR_MAX)
DEFINE_READING(unsigned_long, unsigned long, small >= 0, LONG_MAX)
DEFINE_READING(unsigned_long_long, unsigned long long, small >= 0, LONG_MAX)

#undef DEFINE_READING
// NOLINTEND(bugprone-macro-parentheses)

/** The size of the array that a wrapper keeps in its frame for a text argument. */
enum { kFrameText = 256 };

/** Whether `object` is an ASCII text, and its bytes; they belong to the object and end with a NUL.
 */
static inline bool is_ascii_text(PyObject *object, char const **text, size_t *length) {
#if FAST_PATHS
  if (PyUnicode_CheckExact(object) && PyUnicode_IS_READY(object) &&
      PyUnicode_IS_COMPACT_ASCII(object)) {
    *text = (char const *)PyUnicode_1BYTE_DATA(object);
    *length = (size_t)PyUnicode_GET_LENGTH(object);
    return true;
  }
#endif
  (void)object, (void)text, (void)length;
  return false;
}

/** Copies `SIZE` bytes from both ends, which together cover any length from `SIZE` to twice that.
 */
#define COPY_BOTH_ENDS(SIZE)                      \
  do {                                            \
    char tail[SIZE];                              \
    memcpy(tail, source + length - (SIZE), SIZE); \
    memcpy(target, source, SIZE);                 \
    memcpy(target + length - (SIZE), tail, SIZE); \
  } while (0)

/**
 * Copies `length` bytes, at least one. Names are mostly short, and a call for each is what a copy
 * costs; the compiler would make it a string instruction, which costs more.
 */
static inline void copy_short(char *target, char const *source, size_t length) {
  if (length > 32) {
    __asm__("" : "+r"(length)); /* hides the bound */
    memcpy(target, source, length);
  } else if (length >= 16) {
    COPY_BOTH_ENDS(16);
  } else if (length >= 8) {
    COPY_BOTH_ENDS(8);
  } else if (length >= 4) {
    COPY_BOTH_ENDS(4);
  } else if (length >= 2) {
    COPY_BOTH_ENDS(2);
  } else {
    *target = *source;
  }
}

#undef COPY_BOTH_ENDS

#endif
