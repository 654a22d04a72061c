// Ports and links of the kernel, and the resource pools that share them. The caller fills and frees
// the records.

%record(qex_LinkStatus)
%record(qex_PortsetResPoolCfg)
%record(qex_PortsetResPoolStats)

%{
#include "qexapi/links.h"
#include "qexapi/ports.h"
#include "qexapi/resource_pools.h"
%}
%include "qexapi/ports.h"
%include "qexapi/links.h"
%include "qexapi/resource_pools.h"
