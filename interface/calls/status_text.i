// The text of a status, and the panic of a caller.

%{
#include "vswitch/status_text.h"
%}
// Panic reports and returns, or ends the process: it never springs the trap. Of its arguments only the
// format is passed on, with a null pointer behind it.
%untrapped(Panic)
%include "vswitch/status_text.h"
