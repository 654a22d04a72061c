// Arguments are counted and taken without the interpreter's parser, from a tuple or, where the caller
// has none, from the caller's own array: see vector_calls.i.
// Stands before everything that generates a wrapper.

%begin %{
#define PY_SSIZE_T_CLEAN
#include <Python.h>
#include <stdint.h>
#include "helpers/failures.h"
#include "helpers/fast_paths.h"

/* A wrapper's self when its arguments are no tuple but an array of so many objects. It is odd, which
   the address of an object never is; a wrapper has no other use for its self. */
#define ARRAY_OF(count) ((PyObject *)(2 * (uintptr_t)(count) + 1))

#if VECTOR_CALLS
static inline bool is_array(PyObject *self) { return ((uintptr_t)self & 1) != 0; }

/* The arguments as a tuple, a new reference. */
static PyObject *arguments_as_tuple(PyObject *self, PyObject *args) {
  PyObject *const *objects = (PyObject *const *)args;
  Py_ssize_t const count = (Py_ssize_t)((uintptr_t)self >> 1);
  PyObject *tuple = PyTuple_New(count);
  for (Py_ssize_t i = 0; tuple && i < count; i++) {
    Py_INCREF(objects[i]);
    PyTuple_SET_ITEM(tuple, i, objects[i]);
  }
  return tuple;
}
#endif

/* Where the arguments of any call are; null, with the interpreter's own error, if they are not as
   many as expected. */
static __attribute__((noinline)) PyObject *const *find_arguments(PyObject *self, PyObject *args,
                                                                 char const *method, int expected) {
#if VECTOR_CALLS
  if (is_array(self)) {
    PyObject *tuple = arguments_as_tuple(self, args);
    if (tuple) report_argument_count(tuple, method, expected);
    Py_XDECREF(tuple);
    return NULL;
  }
#endif
  (void)self;
  if (PyTuple_GET_SIZE(args) == expected) return &PyTuple_GET_ITEM(args, 0);
  report_argument_count(args, method, expected);
  return NULL;
}

/* Likewise; one test for the way that most calls come. */
static inline PyObject *const *take_arguments(PyObject *self, PyObject *args, char const *method,
                                              int expected) {
#if VECTOR_CALLS
  static PyObject *const no_arguments[1] = {NULL};
  if (self == ARRAY_OF(expected)) return expected ? (PyObject *const *)args : no_arguments;
#else
  if (PyTuple_GET_SIZE(args) == expected) return &PyTuple_GET_ITEM(args, 0);
#endif
  return find_arguments(self, args, method, expected);
}
%}

%insert("runtime") %{
#define STORE_0(from) (void)(from)
#define STORE_1(from, a) *(a) = (from)[0]
#define STORE_2(from, a, b) STORE_1(from, a), *(b) = (from)[1]
#define STORE_3(from, a, b, c) STORE_2(from, a, b), *(c) = (from)[2]
#define STORE_4(from, a, b, c, d) STORE_3(from, a, b, c), *(d) = (from)[3]
#define STORE_5(from, a, b, c, d, e) STORE_4(from, a, b, c, d), *(e) = (from)[4]
#define STORE_6(from, a, b, c, d, e, f) STORE_5(from, a, b, c, d, e), *(f) = (from)[5]
#define STORE_7(from, a, b, c, d, e, f, g) STORE_6(from, a, b, c, d, e, f), *(g) = (from)[6]
#define STORE_8(from, a, b, c, d, e, f, g, h) STORE_7(from, a, b, c, d, e, f, g), *(h) = (from)[7]

/* Whether a wrapper was given as many arguments as it takes, which are then stored. */
#define PyArg_UnpackTuple(args, method, least, most, ...)                       \
  ({                                                                            \
    PyObject *const *taken = take_arguments(self, args, method, most);          \
    if (taken) STORE_##most(taken, ##__VA_ARGS__);                              \
    taken != NULL;                                                              \
  })
%}
