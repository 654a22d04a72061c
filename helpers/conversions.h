/**
 * Conversions between Python objects and C values that every wrapper of the module shares.
 *
 * A conversion either fills its target and returns `kConverted`, or leaves it untouched and returns
 * the kind of failure, which the wrapper reports with the method's name, the argument's position
 * and its C type. Where a target may be null, the object is only tested. No conversion takes a
 * reference.
 *
 * An integer object is an object whose type is `int` or derives from it: `bool` is one, `float` and
 * objects with `__index__` are not.
 */
#ifndef HELPERS_CONVERSIONS_H
#define HELPERS_CONVERSIONS_H

#include <Python.h>
#include <stddef.h>

#ifdef __cplusplus
extern "C" {
#endif

/** The outcome of a conversion; the numbers are the wrapper runtime's own error kinds. */
enum Conversion {
  kConverted = 0,
  kWrongType = -5,  /**< becomes a `TypeError` */
  kOutOfRange = -7, /**< becomes an `OverflowError` */
  kNoMemory = -12   /**< becomes a `MemoryError` */
};

/**
 * Signed 32 bits. An integer beyond signed 64 bits converts to -1 and leaves the interpreter's
 * `OverflowError` pending, so that the call is made and the interpreter reports the error after it.
 */
int int_from_object(PyObject *object, int *value);

/**
 * Unsigned 64 bits as `unsigned long`: a negative integer within signed 64 bits is out of range,
 * anything that neither 64-bit reading can hold is a wrong type.
 */
int unsigned_long_from_object(PyObject *object, unsigned long *value);

/** Unsigned 64 bits as `unsigned long long`: every failure is a wrong type, negative values too. */
int unsigned_long_long_from_object(PyObject *object, unsigned long long *value);

/** Narrower unsigned integers are read as `unsigned long` first and then held to their maximum. */
int unsigned_int_from_object(PyObject *object, unsigned int *value);
int unsigned_short_from_object(PyObject *object, unsigned short *value);
int unsigned_char_from_object(PyObject *object, unsigned char *value);

/** One byte: a text of at most one byte in UTF-8 (the empty text is 0), or an integer object. */
int char_from_object(PyObject *object, char *value);

/**
 * The UTF-8 bytes of a `str` in a new allocation, with a trailing NUL.
 *
 * `*text` is the caller's to give to `free`; `*size` counts the NUL. A `str` that UTF-8 cannot
 * encode is a wrong type. The object must be a `str`; `text` and `size` may be null.
 */
int text_from_str(PyObject *str, char **text, size_t *size);

/** A text on its way into an array of chars; null bytes are no text. */
typedef struct ArrayText {
  char const *bytes; /**< somebody else's: valid while the object that was read lives */
  size_t size;       /**< bytes to store, the NUL counted */
} ArrayText;

/**
 * A text for an array of `capacity` chars: of a `str`, or of C chars that end with a NUL.
 *
 * Text and NUL must fit, except that an array of one char takes a one-byte text without its NUL.
 */
int array_text_from_str(PyObject *str, size_t capacity, ArrayText *text);
int array_text_from_chars(char const *chars, size_t capacity, ArrayText *text);

/** Whether a text fits, and if so how much of it is stored; the rule of the two above. */
static inline int fit_array_text(size_t capacity, ArrayText *text) {
  if (capacity == 1 && text->size == 2) {
    text->size = 1;
  }
  return text->size <= capacity ? kConverted : kWrongType;
}

/** Stores a text that fits, with zeros to the end of the array. It may lie in the array itself. */
void store_array_text(char *array, size_t capacity, ArrayText text);

/** The number of chars before the first NUL of `s`, of which no more than `maxlen` are read. */
size_t SWIG_strnlen(const char *s, size_t maxlen);

#ifdef __cplusplus
}
#endif

#endif
