// VSQEX_*: asking the running switches, and commanding them. Every call returns a status, with the
// outputs below after it. Records among them belong to the library until VSQEX_FreeMemory.

%{
#include "vswitch/queries.h"
%}

%record_out(VSMACTable **table)                         // VSQEX_GetTeamMACTable, ...
%integer_out(int *state)                                // VSQEX_GetUplinkLinkState, ...
%record_out(VSUplinks **uplinks)                        // VSQEX_GetUplinks
%text_out(char *portBuffer, 48)                         // VSQEX_GetUplinkDVPortID
%record_out(VSMcastFilters **filters)                   // VSQEX_GetMcastFilters
%raw_bytes(unsigned char const *group)                  // VSQEX_GetMcastFilterStats
%record_out(VSMcastFilterStats **stats)
%record_out(VSDVMirrorSessionIDs **ids)                 // VSQEX_GetDVMirrorSessionIDs
%record_out(VSPromiscSessionActiveDsts **ports)         // VSQEX_GetPromiscSessionActiveDsts
%record_out(VSRuntimeOptions **options)                 // VSQEX_GetRuntimeOptions

%calls(queries, VSQEX_FreeMemory)
%elements(ids, count)                                   // VSQEX_GetRuntimeOptions
%volatile_of(VSQEX_GetMcastFilters, port, port_number)
%volatile_of(VSQEX_GetMcastFilterStats, port, port_number)
%volatile_of(VSQEX_PortGetTeamUplinkHint, port, port_number)
%nullable(VSQEX_GetRuntimeOptions, ids)
%form(VSQEX_GetMcastFilters, filters, mode)
%form(VSQEX_GetMcastFilterStats, group, mode)
%form(VSQEX_GetMcastFilterStats, stats, mode)
%reads(VSQEX_SetRuntimeOptions, options)
%reads(VSQEX_SetGlobalMACLearningProps, props)
%releases(VSQEX_FreeMemory, memory)
%nullable(VSQEX_FreeMemory, memory)
%asks(VSQEX_GetVSInfo)
%asks(VSQEX_GetPortMACLearningStats)
%asks(VSQEX_GetTeamMACTable)
%asks(VSQEX_GetPortMACTable)
%asks(VSQEX_GetLAGTable)
%asks(VSQEX_GetUplinkLinkState)
%asks(VSQEX_GetUplinkLACPLinkState)
%asks(VSQEX_GetUplinks)
%asks(VSQEX_GetUplinkDVPortID)
%asks(VSQEX_GetMcastFilters)
%asks(VSQEX_GetMcastFilterStats)
%asks(VSQEX_GetMcastFilterMode)
%asks(VSQEX_GetDVMirrorSessionStats)
%asks(VSQEX_GetDVMirrorSessionIDs)
%asks(VSQEX_GetPromiscSessionActiveDsts)
%asks(VSQEX_GetServicePortTeamingStats)
%asks(VSQEX_GetRARPStats)
%asks(VSQEX_GetRuntimeOptions)
%asks(VSQEX_GetGlobalMACLearningProps)
%asks(VSQEX_PortGetTeamUplinkHint)
%asks(VSQEX_FreeMemory)
%include "vswitch/queries.h"
%end_calls
