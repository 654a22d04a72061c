// VSDVS_*: configuring switches. Every call returns a status; VSDVS_FreeMemory takes back what the
// others handed out.

%{
#include "vswitch/configuration.h"
%}
%include "vswitch/configuration.h"
