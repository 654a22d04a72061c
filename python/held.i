// A call whose outputs are read and released in one step. A signal can raise between the return of a
// call and the next statement of Python, and the outputs would be lost; nothing here can be
// interrupted but the reader itself, after which they are released all the same.

%{
/* The pending exception, a new reference. */
static PyObject *taken_exception(void) {
  PyObject *type = NULL, *value = NULL, *traceback = NULL;
  PyErr_Fetch(&type, &value, &traceback);
  PyErr_NormalizeException(&type, &value, &traceback);
  if (traceback) PyException_SetTraceback(value, traceback);
  Py_XDECREF(type);
  Py_XDECREF(traceback);
  return value;
}

/* What a call left at a place, a new reference; None for a null. The place is an index into the list
   that the call returned, or a pointer object to where it put a pointer. */
static PyObject *left_at(PyObject *result, PyObject *place) {
  if (PyLong_Check(place)) {
    PyObject *output = PyList_GetItem(result, PyLong_AsSsize_t(place));
    Py_XINCREF(output);
    return output;
  }
  SwigPyObject *const raw = raw_pointer(place);
  if (!raw) return NULL;
  void *const left = *(void **)raw->ptr;
  return left ? SwigPyObject_New(left, SWIG_TypeQuery("void *"), 0) : SWIG_Py_Void();
}

/* Releases what is at each place, the last first, also after one was refused; -1 if one was. */
static int release_places(PyObject *result, PyObject *deallocator, PyObject *places) {
  int refused = 0;
  for (Py_ssize_t at = PyTuple_GET_SIZE(places); at-- > 0;) {
    PyObject *type = NULL, *value = NULL, *traceback = NULL;
    PyErr_Fetch(&type, &value, &traceback);
    PyObject *left = left_at(result, PyTuple_GET_ITEM(places, at));
    PyObject *released = NULL;
    if (left == Py_None) {
      released = SWIG_Py_Void();
    } else if (left) {
      released = PyObject_CallFunctionObjArgs(deallocator, left, NULL);
    }
    refused |= !released;
    Py_XDECREF(left);
    Py_XDECREF(released);
    if (type) PyErr_Restore(type, value, traceback);
  }
  return refused ? -1 : 0;
}
%}

%inline %{
/* Calls a function of the host, has `read` make a value of its outputs, and releases what it left at
   `places`; of a call that `keeps`, only where `read` raised. The result is the status and the value.
   What the call or the deallocator raised stands in the place of the status, what `read` raised is
   raised. A call that did not succeed has left nothing. */
PyObject *read_and_release(PyObject *call, PyObject *arguments, PyObject *read,
                           PyObject *deallocator, PyObject *places, int keeps) {
  PyObject *result = PyObject_CallObject(call, arguments);
  if (!result) return Py_BuildValue("(NO)", taken_exception(), Py_None);
  int const is_list = PyList_Check(result);
  PyObject *status = is_list ? PyList_GET_ITEM(result, 0) : result;
  if (PyLong_AsLong(status) != 0) {
    PyObject *refused = Py_BuildValue("(OO)", status, Py_None);
    Py_DECREF(result);
    return refused;
  }
  PyObject *outputs = is_list ? PyList_AsTuple(result) : PyTuple_New(0);
  PyObject *given = outputs && is_list ? PyTuple_GetSlice(outputs, 1, PY_SSIZE_T_MAX) : outputs;
  PyObject *value = given ? PyObject_CallObject(read, given) : NULL;
  if (is_list) Py_XDECREF(given);
  Py_XDECREF(outputs);
  int const released = value && keeps ? 0 : release_places(result, deallocator, places);
  PyObject *both = NULL;
  if (value) {
    both = released < 0 ? Py_BuildValue("(NO)", taken_exception(), Py_None)
                        : Py_BuildValue("(OO)", status, value);
  }
  Py_XDECREF(value);
  Py_DECREF(result);
  return both;
}
%}
