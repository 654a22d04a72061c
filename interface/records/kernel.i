// Basics of the kernel: units, status codes, worldlets.

%record(qex_WorldletRunData)

%{
#include "qexapi/basics.h"
#include "qexapi/status.h"
#include "qexapi/worldlets.h"
%}
%include "qexapi/basics.h"
%include "qexapi/status.h"
%include "qexapi/worldlets.h"
