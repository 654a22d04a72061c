// The list of a status and its outputs.
// Stands before everything that generates a wrapper.

%wrapper %{
/* A status and its first output are a list from the start. */
static PyObject *append_output(PyObject *result, PyObject *output) {
  PyObject *list = NULL;
  if (!output) {
    Py_XDECREF(result);
    return NULL;
  }
  if (result == Py_None || PyList_Check(result)) return SWIG_Python_AppendOutput(result, output);
  list = PyList_New(2);
  if (!list) {
    Py_DECREF(result);
    Py_DECREF(output);
    return NULL;
  }
  PyList_SET_ITEM(list, 0, result);
  PyList_SET_ITEM(list, 1, output);
  return list;
}
#undef SWIG_AppendOutput
#define SWIG_Python_AppendOutput append_output
%}
