// The interpreter that some helpers make objects with, started once for all inputs.
#ifndef TESTS_FUZZ_PYTHON_H
#define TESTS_FUZZ_PYTHON_H

#include <Python.h>

#include "tests/fuzz/harness.h"
#include "tests/helpers/python_objects.h"

/// Its objects are blocks of the C library, so that the sanitizer sees where each ends.
inline bool start_interpreter() {
  PyPreConfig config;
  PyPreConfig_InitPythonConfig(&config);
  config.allocator = PYMEM_ALLOCATOR_MALLOC;
  require(PyStatus_Exception(Py_PreInitialize(&config)) == 0, "the interpreter starts");
  Py_InitializeEx(0);
  return true;
}

inline bool const interpreter_runs = start_interpreter();

/// The text of a `str` of which the reference is taken over.
inline std::string text_of(PyObject *str) {
  Object const owned(str);
  require(owned != nullptr && PyUnicode_Check(owned.get()), "the result is a str");
  Py_ssize_t size = 0;
  char const *const text = PyUnicode_AsUTF8AndSize(owned.get(), &size);
  return {text, static_cast<std::size_t>(size)};
}

#endif
