/**
 * What the whole surface needs on top of the measured functions: more kinds of arguments and
 * results, constants, classes of records, and the module itself.
 */
#ifndef BENCH_HANDWRITTEN_SURFACE_H
#define BENCH_HANDWRITTEN_SURFACE_H

#include "contract.h"

#define EXPORTED __attribute__((visibility("default")))
EXPORTED jmp_buf exception_buffer;
EXPORTED int exception_status;
EXPORTED struct _object *exceptionType;
EXPORTED char *exceptionMsg;

/** Any pointer object, or null. */
SHARED bool any_pointer_from(PyObject *object, void **pointer, Place place) {
  if (LIKELY(Py_IS_TYPE(object, &pointer_type))) {
    *pointer = ((PointerObject *)object)->pointer;
    return true;
  }
  return pointer_from_other(object, pointer, place);
}

/** One byte: a text of at most one, or an integer. */
SHARED bool char_from(PyObject *object, char *value, Place place) {
  int overflow;
  long wide;
  if (PyUnicode_Check(object)) {
    char const *bytes;
    Py_ssize_t length;
    if (!utf8_from(object, &bytes, &length, place)) return false;
    if (length > 1) return raise_at(PyExc_TypeError, place);
    *value = bytes[0];
    return true;
  }
  if (!PyLong_Check(object)) return raise_at(PyExc_TypeError, place);
  wide = PyLong_AsLongAndOverflow(object, &overflow);
  if (overflow || wide < CHAR_MIN || wide > CHAR_MAX) return raise_at(PyExc_OverflowError, place);
  *value = (char)wide;
  return true;
}

/** The inside of a bytes object. */
SHARED bool bytes_from(PyObject *object, void **bytes, Place place) {
  if (!PyBytes_Check(object)) return raise_at(PyExc_TypeError, place);
  *bytes = PyBytes_AS_STRING(object);
  return true;
}

/** An object that owns a copy of a record. */
SHARED PyObject *copy_object(void const *record, size_t size, RecordType const *type) {
  void *const copy = malloc(size);
  if (!copy) return PyErr_NoMemory();
  return pointer_object(memcpy(copy, record, size), type, true);
}

/** As list_of_two. */
SHARED PyObject *list_of_three(PyObject *first, PyObject *second, PyObject *third) {
  PyObject *const list = first && second && third ? PyList_New(3) : NULL;
  if (!list) {
    Py_XDECREF(first);
    Py_XDECREF(second);
    Py_XDECREF(third);
    return NULL;
  }
  PyList_SET_ITEM(list, 0, first);
  PyList_SET_ITEM(list, 1, second);
  PyList_SET_ITEM(list, 2, third);
  return list;
}

COLD static PyObject *no_such_form(char const *method) {
  return PyErr_Format(PyExc_NotImplementedError,
                      "Wrong number or type of arguments for overloaded function '%s'.", method);
}

/** The class of a record; what it is good for is the business of those who register one. */
SHARED PyObject *class_registered(PyObject *self, PyObject *args, char const *format) {
  (void)self;
  EXPECT_ARGUMENTS(1, format);
  Py_INCREF(PyTuple_GET_ITEM(args, 0));
  Py_RETURN_NONE;
}

SHARED PyObject *instance_method(PyObject *self, PyObject *function) {
  (void)self;
  return PyInstanceMethod_New(function);
}

typedef struct {
  char const *name;
  long long number;
  char const *text;
} Constant;

SHARED int add_constants(PyObject *module, Constant const *constant) {
  for (; constant->name; ++constant) {
    PyObject *const value = constant->text ? PyUnicode_FromString(constant->text)
                                           : PyLong_FromLongLong(constant->number);
    int const added = PyModule_AddObjectRef(module, constant->name, value);
    Py_XDECREF(value);
    if (added < 0) return -1;
  }
  return 0;
}

#define DEFINE_MODULE(name, methods, constants)                                                 \
  static struct PyModuleDef definition = {PyModuleDef_HEAD_INIT, .m_name = #name, .m_size = -1, \
                                          .m_methods = methods};                                \
  PyMODINIT_FUNC PyInit_##name(void);                                                           \
  PyMODINIT_FUNC PyInit_##name(void) {                                                          \
    PyObject *module;                                                                           \
    if (PyType_Ready(&pointer_type) < 0) return NULL;                                           \
    module = PyModule_Create(&definition);                                                      \
    if (module && add_constants(module, constants) < 0) Py_CLEAR(module);                       \
    return module;                                                                              \
  }

#endif
