// Python objects for tests: made from an expression, released at the end of the scope.
#ifndef TESTS_HELPERS_PYTHON_OBJECTS_H
#define TESTS_HELPERS_PYTHON_OBJECTS_H

#include <Python.h>

#include <memory>
#include <stdexcept>
#include <string>

struct Release {
  void operator()(PyObject *object) const { Py_XDECREF(object); }
};
using Object = std::unique_ptr<PyObject, Release>;

/// The value of a Python expression.
inline Object python(std::string const &expression) {
  Object const globals(PyDict_New());
  PyDict_SetItemString(globals.get(), "__builtins__", PyEval_GetBuiltins());
  Object value(PyRun_String(expression.c_str(), Py_eval_input, globals.get(), globals.get()));
  if (!value) {
    PyErr_Print();
    throw std::invalid_argument(expression);
  }
  return value;
}

/// Takes the pending error away and names its type; empty if there is none.
inline std::string take_error_type() {
  PyObject *type = nullptr;
  PyObject *value = nullptr;
  PyObject *traceback = nullptr;
  PyErr_Fetch(&type, &value, &traceback);
  std::string name = type != nullptr ? reinterpret_cast<PyTypeObject *>(type)->tp_name : "";
  Py_XDECREF(type);
  Py_XDECREF(value);
  Py_XDECREF(traceback);
  return name;
}

#endif
