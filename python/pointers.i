// _pointers: what libvswitch does with pointer objects of the wrapper runtime that _libvswitch shares:
// it makes them, for pointers that calls take and the flat module has no constructor for; reads and
// writes what they point to; and makes them null. Each of these is one step for other threads.

%module _pointers

%include "fields.i"

%{
#include "record_sizes.h"

#define LENGTH_OF(array) (sizeof(array) / sizeof *(array))

static PyObject *as_dict(NamedNumber const *rows, size_t count) {
  PyObject *numbers = PyDict_New();
  for (size_t i = 0; numbers && i < count; ++i) {
    PyObject *number = PyLong_FromSize_t(rows[i].number);
    if (!number || PyDict_SetItemString(numbers, rows[i].name, number) < 0) Py_CLEAR(numbers);
    Py_XDECREF(number);
  }
  return numbers;
}

/* Keeps the pending exception in a list. */
static void keep_exception(PyObject *raised) {
  PyObject *type = NULL, *value = NULL, *traceback = NULL;
  PyErr_Fetch(&type, &value, &traceback);
  PyErr_NormalizeException(&type, &value, &traceback);
  if (traceback) PyException_SetTraceback(value, traceback);
  if (PyList_Append(raised, value) < 0) PyErr_WriteUnraisable(raised);
  Py_XDECREF(type);
  Py_XDECREF(value);
  Py_XDECREF(traceback);
}

static PyObject *call_guarded(PyObject *both, PyObject *arguments) {
  PyObject *result = PyObject_CallObject(PyTuple_GET_ITEM(both, 0), arguments);
  int truth = !result ? -1 : result == Py_None ? 1 : PyObject_IsTrue(result);
  if (truth < 0) {
    keep_exception(PyTuple_GET_ITEM(both, 1));
    truth = 0;
  }
  Py_XDECREF(result);
  return PyLong_FromLong(truth);
}

static PyMethodDef call_guarded_method = {"guarded", call_guarded, METH_VARARGS, NULL};
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

/* Another pointer object of the same type and place, without ownership. */
PyObject *same_place(PyObject *object) {
  SwigPyObject *raw = raw_pointer(object);
  return raw ? SwigPyObject_New(raw->ptr, raw->ty, 0) : NULL;
}

/* Makes a pointer object null; another one, which is returned, points there and owns what it owned.
   Nothing comes in between: of several threads, one gets the place. */
PyObject *take(PyObject *object) {
  SwigPyObject *raw = raw_pointer(object);
  PyObject *taken = raw ? SwigPyObject_New(raw->ptr, raw->ty, raw->own) : NULL;
  if (taken) {
    raw->ptr = NULL;
    raw->own = 0;
  }
  return taken;
}

/* Undoes take, with what it returned. */
PyObject *put_back(PyObject *object, PyObject *taken) {
  SwigPyObject *raw = raw_pointer(object);
  SwigPyObject *from = raw_pointer(taken);
  if (!raw || !from) return NULL;
  raw->ptr = from->ptr;
  raw->own = from->own;
  return clear(taken);
}

/* Calls a deallocator with a pointer object, which is null if it succeeded. A signal that arrives
   meanwhile is handled after that. */
PyObject *release(PyObject *deallocator, PyObject *object) {
  PyObject *result = PyObject_CallFunctionObjArgs(deallocator, object, NULL);
  if (!result) return NULL;
  Py_DECREF(result);
  return clear(object);
}

/* Bytes of the memory that a pointer object points to. A ValueError if it is null, which it may have
   become since anybody looked. */
PyObject *read_memory(PyObject *object, size_t offset, size_t size) {
  SwigPyObject *raw = raw_pointer(object);
  if (!raw) return NULL;
  if (!raw->ptr) return PyErr_Format(PyExc_ValueError, "the memory is gone: it was released");
  return PyBytes_FromStringAndSize((char const *)raw->ptr + offset, (Py_ssize_t)size);
}

/* Likewise, the other way. */
PyObject *write_memory(PyObject *object, size_t offset, PyObject *bytes) {
  SwigPyObject *raw = raw_pointer(object);
  char *held = NULL;
  Py_ssize_t size = 0;
  if (!raw || PyBytes_AsStringAndSize(bytes, &held, &size) < 0) return NULL;
  if (!raw->ptr) return PyErr_Format(PyExc_ValueError, "the memory is gone: it was released");
  memmove((char *)raw->ptr + offset, held, (size_t)size);
  return SWIG_Py_Void();
}

/* A function that returns 1 or 0, as another does by its truth, None being true; what that raises is
   appended to a list, and it returns 0. There is no frame of Python's in which it could be lost. */
PyObject *guarded(PyObject *function, PyObject *raised) {
  PyObject *both = Py_BuildValue("OO", function, raised);
  PyObject *guard = both ? PyCFunction_New(&call_guarded_method, both) : NULL;
  Py_XDECREF(both);
  return guard;
}

/* The size in bytes of every record, as the C compiler lays it out. */
PyObject *record_sizes(void) { return as_dict(sizes_of_records, LENGTH_OF(sizes_of_records)); }

/* Where arrays lie in their records, as RECORD_field. */
PyObject *array_offsets(void) { return as_dict(offsets_of_arrays, LENGTH_OF(offsets_of_arrays)); }
%}

%include "held.i"
