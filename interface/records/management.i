// Descriptors of management interfaces and interrupts. The caller fills and frees them.

%record(qex_MgmtCallbackInfo)
%record(qex_MgmtApiSignature)
%record(qex_MgmtVectorParm)
%record(qex_MgmtInstances)
%record(qex_IntrInfo)

%{
#include "qexapi/interrupts.h"
#include "qexapi/management.h"
%}
%include "qexapi/management.h"
%include "qexapi/interrupts.h"
