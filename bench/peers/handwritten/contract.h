/**
 * What an extension module written by hand shares between its functions when it keeps the same
 * contract as the measured one: arguments arrive as a tuple and are converted in order, each
 * failure names the method, the argument and its C type, texts are copied to the heap, the call
 * trap is armed around a call, and records travel as pointer objects that know their type and
 * whether they own.
 *
 * The common case is inline, and all that raises is not: this is meant to be as fast as such a
 * module gets without reaching into the interpreter.
 */
#ifndef BENCH_HANDWRITTEN_CONTRACT_H
#define BENCH_HANDWRITTEN_CONTRACT_H

#define PY_SSIZE_T_CLEAN
#include <Python.h>
#include <limits.h>
#include <stdbool.h>
#include <stdlib.h>
#include <string.h>

#include "vswitch/call_trap.h"

/* After a jump back nothing is read but the trap's globals, so no local can have been clobbered. */
#ifndef __clang__
#pragma GCC diagnostic ignored "-Wclobbered"
#endif

#define LIKELY(condition) __builtin_expect(!!(condition), 1)
#define COLD __attribute__((cold, noinline, unused))
#define SHARED static inline __attribute__((unused))

/* Failures. Each returns NULL or false, so that it can be returned. */

typedef struct {
  char const *method;
  int argument;
  char const *type;
} Place;

COLD static bool raise_at(PyObject *exception, Place place) {
  PyErr_Format(exception, "in method '%s', argument %d of type '%s'", place.method, place.argument,
               place.type);
  return false;
}

COLD static bool raise_null_reference(Place place) {
  PyErr_Format(PyExc_ValueError, "invalid null reference in method '%s', argument %d of type '%s'",
               place.method, place.argument, place.type);
  return false;
}

/** The interpreter's own parser counts the arguments, and words the error. */
COLD static PyObject *raise_wrong_count(PyObject *args, char const *format) {
  PyObject *ignored[8];
  PyArg_ParseTuple(args, format, &ignored[0], &ignored[1], &ignored[2], &ignored[3], &ignored[4],
                   &ignored[5], &ignored[6], &ignored[7]);
  return NULL;
}

#define EXPECT_ARGUMENTS(count, format)                                                     \
  do {                                                                                      \
    if (!LIKELY(PyTuple_GET_SIZE(args) == (count))) return raise_wrong_count(args, format); \
  } while (0)

/* Pointer objects. */

/** A type of record; its address is its identity. */
typedef struct {
  char const *name;
} RecordType;

typedef struct {
  PyObject_HEAD void *pointer;
  RecordType const *type;
  bool owned;
} PointerObject;

static PyTypeObject pointer_type = {
    PyVarObject_HEAD_INIT(NULL, 0).tp_name = "handwritten.Pointer",
    .tp_basicsize = sizeof(PointerObject),
    .tp_flags = Py_TPFLAGS_DEFAULT,
};

static RecordType const char_record = {"char"};

SHARED PyObject *pointer_object(void *pointer, RecordType const *type, bool owned) {
  if (!pointer) Py_RETURN_NONE;
  PointerObject *const object = PyObject_New(PointerObject, &pointer_type);
  if (!object) return NULL;
  object->pointer = pointer;
  object->type = type;
  object->owned = owned;
  return (PyObject *)object;
}

COLD static bool pointer_from_other(PyObject *object, void **pointer, Place place) {
  if (object != Py_None) return raise_at(PyExc_TypeError, place);
  *pointer = NULL;
  return true;
}

SHARED bool pointer_from(PyObject *object, RecordType const *type, void **pointer, Place place) {
  if (LIKELY(Py_IS_TYPE(object, &pointer_type) && ((PointerObject *)object)->type == type)) {
    *pointer = ((PointerObject *)object)->pointer;
    return true;
  }
  return pointer_from_other(object, pointer, place);
}

/** A pointer that must not be null, as readers and methods need it. */
SHARED bool record_from(PyObject *object, RecordType const *type, void **pointer, Place place) {
  if (!pointer_from(object, type, pointer, place)) return false;
  return LIKELY(*pointer != NULL) || raise_null_reference(place);
}

/** A pointer that its object no longer owns, to be freed. */
SHARED bool pointer_disowned(PyObject *object, RecordType const *type, void **pointer,
                             Place place) {
  if (!pointer_from(object, type, pointer, place)) return false;
  if (*pointer) ((PointerObject *)object)->owned = false;
  return true;
}

/* Integers. */

COLD static bool unsigned_from_wide(PyObject *object, unsigned long *value, Place place) {
  *value = PyLong_AsUnsignedLong(object);
  if (!PyErr_Occurred()) return true;
  PyErr_Clear();
  return raise_at(PyExc_TypeError, place);
}

SHARED bool unsigned_from(PyObject *object, unsigned long most, unsigned long *value, Place place) {
  int overflow;
  long wide;
  if (!LIKELY(PyLong_Check(object))) return raise_at(PyExc_TypeError, place);
  wide = PyLong_AsLongAndOverflow(object, &overflow);
  if (!LIKELY(overflow == 0)) {
    if (overflow < 0) return raise_at(PyExc_TypeError, place);
    if (!unsigned_from_wide(object, value, place)) return false;
  } else if (!LIKELY(wide >= 0)) {
    return raise_at(PyExc_OverflowError, place);
  } else {
    *value = (unsigned long)wide;
  }
  return LIKELY(*value <= most) || raise_at(PyExc_OverflowError, place);
}

/** Beyond 64 bits the value is -1, and the interpreter's error is left pending. */
SHARED bool int_from(PyObject *object, int *value, Place place) {
  long wide;
  if (!LIKELY(PyLong_Check(object))) return raise_at(PyExc_TypeError, place);
  wide = PyLong_AsLong(object);
  if (!LIKELY(wide >= INT_MIN && wide <= INT_MAX)) return raise_at(PyExc_OverflowError, place);
  *value = (int)wide;
  return true;
}

/* Texts. */

/** A text argument; `copy` is what is to be freed, if anything. */
typedef struct {
  char *text;
  char *copy;
} Text;

/** The UTF-8 bytes of a str; they belong to it. */
SHARED bool utf8_from(PyObject *object, char const **bytes, Py_ssize_t *length, Place place) {
  *bytes = PyUnicode_AsUTF8AndSize(object, length);
  if (LIKELY(*bytes != NULL)) return true;
  PyErr_Clear();
  return raise_at(PyExc_TypeError, place);
}

COLD static bool text_from_pointer(PyObject *object, Text *text, Place place) {
  void *pointer = NULL;
  if (!pointer_from(object, &char_record, &pointer, place)) return false;
  *text = (Text){pointer, NULL};
  return true;
}

SHARED bool text_from(PyObject *object, Text *text, Place place) {
  char const *bytes;
  Py_ssize_t length;
  if (!LIKELY(PyUnicode_Check(object))) return text_from_pointer(object, text, place);
  if (!utf8_from(object, &bytes, &length, place)) return false;
  text->copy = malloc((size_t)length + 1);
  if (!text->copy) return raise_at(PyExc_MemoryError, place);
  text->text = memcpy(text->copy, bytes, (size_t)length + 1);
  return true;
}

/** The text of an argument in an array of chars, zero-filled after it. */
SHARED bool char_array_from(PyObject *object, char *array, size_t capacity, Place place) {
  char const *bytes = NULL;
  Py_ssize_t length = -1;
  if (LIKELY(PyUnicode_Check(object))) {
    if (!utf8_from(object, &bytes, &length, place)) return false;
  } else {
    Text text = {NULL, NULL};
    if (!text_from_pointer(object, &text, place)) return false;
    bytes = text.text;
    if (bytes) length = (Py_ssize_t)strlen(bytes);
  }
  const size_t needed = (size_t)(length + 1);
  if (!LIKELY(needed <= capacity)) return raise_at(PyExc_TypeError, place);
  if (needed) memcpy(array, bytes, needed);
  memset(array + needed, 0, capacity - needed);
  return true;
}

SHARED PyObject *text_object(char const *text, size_t length) {
  return PyUnicode_DecodeUTF8(text, (Py_ssize_t)length, "surrogateescape");
}

SHARED PyObject *text_or_none(char const *text) {
  if (!text) Py_RETURN_NONE;
  return text_object(text, strlen(text));
}

/* Results. */

/** [status, value]; takes the references, of which either may be missing. */
SHARED PyObject *list_of_two(PyObject *first, PyObject *second) {
  PyObject *const list = first && second ? PyList_New(2) : NULL;
  if (!list) {
    Py_XDECREF(first);
    Py_XDECREF(second);
    return NULL;
  }
  PyList_SET_ITEM(list, 0, first);
  PyList_SET_ITEM(list, 1, second);
  return list;
}

/* The call trap. */

/** Copies of texts stay behind when a call traps: the library may still hold them. */
#define ARM_TRAP()                                  \
  do {                                              \
    exception_status = setjmp(exception_buffer);    \
    if (exception_status != 0) {                    \
      PyErr_SetString(exceptionType, exceptionMsg); \
      return NULL;                                  \
    }                                               \
  } while (0)

#endif
