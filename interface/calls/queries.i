// VSQEX_*: what the running switches tell. Records that a call answers belong to the library until
// VSQEX_FreeMemory takes them back.

%{
#include "vswitch/queries.h"
%}
%include "vswitch/queries.h"
