// Status codes, as every library call returns them.

%{
#include "qexapi/status.h"
%}
%include "qexapi/status.h"
