/**
 * The common cases of conversions: small integers, short ASCII texts.
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
#include "helpers/failures.h"

#if !defined(NO_FAST_PATHS) && !defined(Py_GIL_DISABLED) && !defined(PYPY_VERSION)
#define FAST_PATHS 1
#else
#define FAST_PATHS 0
#endif

/**
 * Whether calls come by the interpreter's vectorcall protocol. What the slot of a built-in function
 * may be used for, and how deep calls are counted, is known of these versions.
 */
#if FAST_PATHS && PY_VERSION_HEX >= 0x03080000 && PY_VERSION_HEX < 0x030E0000
#define VECTOR_CALLS 1
#else
#define VECTOR_CALLS 0
#endif

/** What marks a type whose instances may have a function of the protocol. */
#if PY_VERSION_HEX >= 0x03090000
#define HAS_VECTORCALL Py_TPFLAGS_HAVE_VECTORCALL
#else
#define HAS_VECTORCALL _Py_TPFLAGS_HAVE_VECTORCALL
#endif

/** Whether `object` is an int of one digit, and its value, which has less than 31 bits. */
static inline bool is_small_integer(PyObject *object, int *value) {
#if FAST_PATHS && PY_VERSION_HEX >= 0x030C0000
  if (PyLong_CheckExact(object) && PyUnstable_Long_IsCompact((PyLongObject *)object)) {
    *value = (int)PyUnstable_Long_CompactValue((PyLongObject *)object);
    return true;
  }
#elif FAST_PATHS
  if (PyLong_CheckExact(object) && (size_t)(Py_SIZE(object) + 1) <= 2) {
    *value = (int)((PyLongObject *)object)->ob_digit[0] * (int)Py_SIZE(object);
    return true;
  }
#endif
  (void)object, (void)value;
  return false;
}

/**
 * The readings of conversions.h for an argument, the small integers first: whether it was read, and
 * if not, there is an error that names the method, the argument and its type.
 *
 * A call costs next to nothing here, and code in each of a thousand wrappers would be much to
 * compile. The two are apart so that the first needs no frame.
 */
#define OUT_OF_LINE __attribute__((noinline, unused)) static
// NOLINTBEGIN(bugprone-macro-parentheses): types cannot have them
#define DEFINE_READING(NAME, TYPE, FITS)                                                        \
  OUT_OF_LINE bool read_other_##NAME(PyObject *object, TYPE *value, char const *method,         \
                                     int position, char const *type) {                          \
    int const kind = NAME##_from_object(object, value);                                         \
    if (kind != kConverted) report_argument(kind, method, position, type);                      \
    return kind == kConverted;                                                                  \
  }                                                                                             \
  OUT_OF_LINE bool read_##NAME(PyObject *object, TYPE *value, char const *method, int position, \
                               char const *type) {                                              \
    int small = 0;                                                                              \
    if (!is_small_integer(object, &small) || !(FITS)) {                                         \
      return read_other_##NAME(object, value, method, position, type);                          \
    }                                                                                           \
    *value = (TYPE)small;                                                                       \
    return true;                                                                                \
  }

DEFINE_READING(int, int, true)
DEFINE_READING(unsigned_int, unsigned int, small >= 0)
DEFINE_READING(unsigned_short, unsigned short, (unsigned int)small <= USHRT_MAX)
DEFINE_READING(unsigned_char, unsigned char, (unsigned int)small <= UCHAR_MAX)
DEFINE_READING(unsigned_long, unsigned long, small >= 0)
DEFINE_READING(unsigned_long_long, unsigned long long, small >= 0)

#undef DEFINE_READING
// NOLINTEND(bugprone-macro-parentheses)

/** The size of the array that a wrapper keeps in its frame for a text argument. */
enum { kFrameText = 256 };

/** Whether `object` is an ASCII text, and its bytes; they belong to the object and end with a NUL.
 */
static inline bool is_ascii_text(PyObject *object, char const **text, size_t *length) {
#if FAST_PATHS
  if (PyUnicode_CheckExact(object) && PyUnicode_IS_COMPACT_ASCII(object)) {
    *text = (char const *)object + sizeof(PyASCIIObject);
    *length = (size_t)((PyASCIIObject *)object)->length;
    return true;
  }
#else
  if (PyUnicode_CheckExact(object) && PyUnicode_IS_READY(object) && PyUnicode_IS_ASCII(object)) {
    *text = PyUnicode_AsUTF8(object);
    *length = (size_t)PyUnicode_GET_LENGTH(object);
    return true;
  }
#endif
  return false;
}

/** Names are mostly shorter than this. */
enum { kShortText = 32 };

/**
 * A copy, somewhere in `frame`, of an ASCII text that is short; null if `object` is another.
 *
 * It takes the 32 bytes that end with the text's NUL, whatever its length, which a processor that
 * had to branch on it would guess wrong. What lies before the text is its object's own head, which
 * is longer than that.
 */
static inline char *copy_short_text(PyObject *object, char frame[kShortText]) {
  // NOLINTBEGIN(modernize-use-nullptr): to C, NULL is the only null
  char const *text = NULL;
  size_t length = 0;
  bool const has_head = FAST_PATHS && sizeof(PyASCIIObject) >= kShortText;
  if (!has_head || !is_ascii_text(object, &text, &length) || length >= kShortText) return NULL;
  // NOLINTEND(modernize-use-nullptr)
  memcpy(frame, text + length + 1 - kShortText, kShortText);
  return frame + kShortText - 1 - length;
}

#endif
