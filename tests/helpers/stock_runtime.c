// The wrapper runtime as its generator ships it, for what helpers must agree with it about.

#include "tests/helpers/stock_runtime.h"

#include <swig_runtime.h>

PyObject *stock_exception_of_kind(int kind) {
  return SWIG_Python_ErrorType(SWIG_ArgError(kind));
}
