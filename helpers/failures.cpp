// Cold paths of the wrappers; see failures.h.

#include "helpers/failures.h"

#include <algorithm>
#include <array>
#include <cassert>
#include <cstring>
#include <string_view>

extern "C" {

PyObject *exception_of_kind(int kind) {
  switch (kind) {
    case -1:  // a generic error
    case -5:
      return PyExc_TypeError;
    case -2:
      return PyExc_IOError;
    case -4:
      return PyExc_IndexError;
    case -6:
      return PyExc_ZeroDivisionError;
    case -7:
      return PyExc_OverflowError;
    case -8:
      return PyExc_SyntaxError;
    case -9:
      return PyExc_ValueError;
    case -10:
      return PyExc_SystemError;
    case -11:
      return PyExc_AttributeError;
    case -12:
      return PyExc_MemoryError;
    default:
      return PyExc_RuntimeError;
  }
}

void report_argument(int kind, char const *method, int position, char const *type) {
  PyErr_Format(exception_of_kind(kind), "in method '%s', argument %d of type '%s'", method,
               position, type);
}

void report_null_argument(char const *method, int position, char const *type) {
  PyErr_Format(PyExc_ValueError, "invalid null reference in method '%s', argument %d of type '%s'",
               method, position, type);
}

void report_null_variable(char const *name, char const *type) {
  PyErr_Format(PyExc_ValueError, "invalid null reference in variable '%s' of type '%s'", name,
               type);
}

bool accepts_null_record(char const *method) {
  std::string_view const name = method;
  return (name.ends_with("_set") && name != "_set") || name.starts_with("delete_") ||
         name == "qex_Name___repr__";
}

PyObject *report_argument_count(PyObject *args, char const *method, int expected) {
  // "OO...:method"; the longest name has some fifty characters.
  std::array<char, 128> format;
  assert(static_cast<size_t>(expected) + std::strlen(method) + 2 <= format.size());
  auto const objects = static_cast<size_t>(expected);
  std::fill_n(format.begin(), objects, 'O');
  PyOS_snprintf(format.data() + objects, format.size() - objects, ":%s", method);
  // The interpreter counts before it stores, so no targets are needed for a tuple of another size.
  [[maybe_unused]] int const counted = PyArg_ParseTuple(args, format.data());
  assert(counted == 0);
  return nullptr;
}

}  // extern "C"
