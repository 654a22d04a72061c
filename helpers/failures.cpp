// Cold paths of the wrappers; see failures.h.

#include "helpers/failures.h"

#include <string>

extern "C" {

int wrong_argument_count(PyObject *args, char const *method, int expected) {
  std::string const format = std::string(static_cast<size_t>(expected), 'O') + ":" + method;
  // The interpreter counts before it stores, so no targets are needed for a tuple of another size.
  return PyArg_ParseTuple(args, format.c_str());
}

}  // extern "C"
