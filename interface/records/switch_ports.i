// Ports of distributed switches as the kernel knows them, and the keys of common properties. The
// caller fills and frees the records; arrays of VLAN ranges go to VSDVS_SetPortVLANPolicy.

%record(qex_NEBPortStatus)
%record(qex_NEBPortStatistics)
%record(qex_NEBPortVIDRange)
%record(qex_NEBPortVlanInfo)

%{
#include "qexapi/switch_ports.h"
#include "qexapi/switch_properties.h"
%}
%include "qexapi/switch_properties.h"
%include "qexapi/switch_ports.h"

%record_array(qex_NEBPortVIDRange, vidrangeArray)
