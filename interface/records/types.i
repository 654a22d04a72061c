// Scalar types of the host kernel interface: names of one width and signedness are one type, so a
// pointer to one passes where another is expected.

%{
#include "qexapi/types.h"
%}
%include "qexapi/types.h"
