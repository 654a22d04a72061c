// _pointers: makes and clears pointer objects of the wrapper runtime that _libvswitch shares, for the
// pointers that its calls take and it has no constructor for.

%module _pointers

%{
#include "record_sizes.h"

/* What a class wraps, or the object itself; a TypeError for anything else. */
static SwigPyObject *raw_pointer(PyObject *object) {
  SwigPyObject *raw = SWIG_Python_GetSwigThis(object);
  if (!raw) PyErr_SetString(PyExc_TypeError, "neither a pointer object nor a record");
  return raw;
}
%}

%inline %{
/* A pointer object of the type that is spelled so, without ownership; a LookupError if none is. */
PyObject *pointer_object(size_t address, char const *spelling) {
  swig_type_info *type = SWIG_TypeQuery(spelling);
  if (!type) return PyErr_Format(PyExc_LookupError, "no pointer type is spelled '%s'", spelling);
  return SwigPyObject_New((void *)address, type, 0);
}

/* Makes a pointer object null, for all that share it. */
PyObject *clear(PyObject *object) {
  SwigPyObject *raw = raw_pointer(object);
  if (!raw) return NULL;
  raw->ptr = NULL;
  raw->own = 0;
  return SWIG_Py_Void();
}

/* Where a pointer object or a record points. */
PyObject *address_of(PyObject *object) {
  SwigPyObject *raw = raw_pointer(object);
  return raw ? PyLong_FromVoidPtr(raw->ptr) : NULL;
}

/* The size in bytes of every record, as the C compiler lays it out. */
PyObject *record_sizes(void) {
  PyObject *sizes = PyDict_New();
  if (!sizes) return NULL;
  for (size_t i = 0; i < sizeof sizes_of_records / sizeof *sizes_of_records; ++i) {
    PyObject *size = PyLong_FromSize_t(sizes_of_records[i].size);
    if (!size || PyDict_SetItemString(sizes, sizes_of_records[i].name, size) < 0) {
      Py_XDECREF(size);
      Py_DECREF(sizes);
      return NULL;
    }
    Py_DECREF(size);
  }
  return sizes;
}
%}
