// Ports of distributed switches in the state, and the types of properties. Lists of ports are the
// library's and are released with DVSQEX_DataFree.

%record(OpaqueDVPortData)
%record(DVPortData)
%record(DVPortList)

%{
#include "nebpublic/handles.h"
#include "nebpublic/ports.h"
#include "nebpublic/property_types.h"
%}
%include "nebpublic/handles.h"
%include "nebpublic/property_types.h"
%include "nebpublic/ports.h"
