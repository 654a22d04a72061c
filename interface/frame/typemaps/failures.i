// How what is wrong with an argument becomes an error.
// Stands before everything that generates a wrapper.

%{
#include "helpers/failures.h"
%}

// Failures are reported out of line: what a wrapper does not need when all is well is elsewhere. The
// macros stand in typemaps, where the method's name and the argument's position are known.
#define %bad_argument(kind, type) \
  do { report_argument(kind, "$symname", $argnum, type); SWIG_fail; } while (0)
#define %null_argument(position, type) \
  do { report_null_argument("$symname", position, type); SWIG_fail; } while (0)
#define %null_variable(name, type) \
  do { report_null_variable(name, type); SWIG_fail; } while (0)

// The same for what stock definitions report.
%insert("runtime") %{
#undef SWIG_exception_fail
#define SWIG_exception_fail(kind, text) do { report_failure(kind, text); SWIG_fail; } while (0)
%}
