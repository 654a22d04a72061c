// The names of runtime options: a variable of `cvar` that cannot be set.

%{
#include "helpers/runtime_options.h"
#include "vswitch/runtime_option_queries.h"
%}
%include "vswitch/runtime_option_queries.h"

// As in the stock definition, without its warning that the array cannot be set.
%typemap(varin, noblock=1) char const *runtimeOptionNames[] {
  %variable_fail(SWIG_AttributeError, "$type", "read-only $name");
}
extern char const *runtimeOptionNames[];
