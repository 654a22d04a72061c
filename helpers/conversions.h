/**
 * Conversions between Python objects and C values that every wrapper of the module shares.
 *
 * A conversion either fills its target and answers `kConverted`, or leaves it untouched and answers
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
 * The UTF-8 bytes of a `str` in a new allocation, with a NUL behind them.
 *
 * `*text` is the caller's to give to `free`; `*size` counts the NUL. A `str` that UTF-8 cannot
 * encode is a wrong type. The object must be a `str`; `text` and `size` may be null.
 */
int text_from_str(PyObject *str, char **text, size_t *size);

/**
 * The UTF-8 bytes of a `str` in an array of `capacity` chars, zero-filled behind the text.
 *
 * Text and NUL must fit, except that an array of one char takes a one-byte text without its NUL.
 * The object must be a `str`; `array` may be null.
 */
int char_array_from_str(PyObject *str, char *array, size_t capacity);

/** As `char_array_from_str`, from `size` bytes of C text that count their NUL; 0 bytes are no text.
 */
int char_array_from_text(char const *text, size_t size, char *array, size_t capacity);

/** The number of chars before the first NUL of `s`, of which no more than `maxlen` are read. */
size_t SWIG_strnlen(const char *s, size_t maxlen);

#ifdef __cplusplus
}
#endif

#endif
