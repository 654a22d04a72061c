// What a running switch tells about itself. The caller makes the records, queries fill them.

%record(VSInfo)
%record(VSStats)

%{
#include "vswitch/switch_info.h"
%}
%include "vswitch/switch_info.h"
