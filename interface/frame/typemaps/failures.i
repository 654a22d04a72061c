// How what is wrong with an argument becomes an error: out of line, for what a wrapper does not need
// when all is well is elsewhere.
// Stands before every typemap that reports.

%{
#include "helpers/failures.h"
%}
