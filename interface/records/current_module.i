// Which kernel module the extension is: a variable of `cvar`.

%{
#include "qexapi/current_module.h"
%}
%include "qexapi/current_module.h"
