// VSDVS_*: configuring switches. Every call returns a status, with the outputs below after it.
// VSDVS_FreeMemory releases what the others allocate.

%{
#include "vswitch/configuration.h"
%}

%integer_out(int *portID)                               // VSDVS_DvPortIDToPortID*
%text_out(char *aliasBuffer, 128)                       // VSDVS_GetAliasFromPortset
%record_out(VSUplinkPorts **names)                      // VSDVS_GetSwitchUplinkPorts
%record_out(VSUplinkPortIds **ids)
%text_out(char *overrideBuffer, 81)                     // VSDVS_GetPortTeamingOverride
%boolean_out(qex_Bool *enabled)                         // VSDVS_GetTxUplinkAlways, ...
%integer_out(int *mode)                                 // VSDVS_GetMcastFilterMode
%record_out(VSPortVlanPolicy **policy)                  // VSDVS_GetPortVLANPolicy
%integer_out(int *priority)
%record_out_as(VSPvlanMapEntry **entries, VSUplinkPorts)  // VSDVS_GetPrivateVLANMap: the type
%integer_out(int *count)                                // that tools have always been given
%record_out(DVMirrorSessionTable **table)               // VSDVS_GetDVMirrorSessions
%array_argument(char const sid[32])                     // VSDVS_RemoveDVMirrorSession

%calls(configuration, VSDVS_FreeMemory)
%elements(ranges, numRanges)                            // VSDVS_SetPortVLANPolicy
%elements(entries, count)                               // VSDVS_GetPrivateVLANMap, ...
%volatile(switchId, switch_id)
%volatile(portsetName, portset_name)
%volatile(portID, port_number)
%nullable(VSDVS_CreateVSwitch, switchId)
%nullable(VSDVS_CreateVSwitch, portsetName)
%nullable(VSDVS_SetPortVLANPolicy, ranges)
%nullable(VSDVS_SetPrivateVLANMap, entries)
%reads(VSDVS_SetPortVLANPolicy, ranges)
%reads(VSDVS_AppendDVMirrorSessions, table)
%releases(VSDVS_FreeMemory, memory)
%nullable(VSDVS_FreeMemory, memory)
%asks(VSDVS_DvPortIDToPortID)
%asks(VSDVS_DvPortIDToPortIDFromDVSID)
%asks(VSDVS_GetAliasFromPortset)
%asks(VSDVS_GetSwitchUplinkPorts)
%asks(VSDVS_GetMTU)
%asks(VSDVS_GetTeamingPolicy)
%asks(VSDVS_GetTeamingPolicyFromDVSID)
%asks(VSDVS_GetPortTeamingPolicy)
%asks(VSDVS_GetPortTeamingOverride)
%asks(VSDVS_GetTxUplinkAlways)
%asks(VSDVS_GetMACLearning)
%asks(VSDVS_GetPortMACLearning)
%asks(VSDVS_GetPortSecurity)
%asks(VSDVS_GetExtraEthFilter)
%asks(VSDVS_IsSinkPortEnabled)
%asks(VSDVS_GetMcastFilterMode)
%asks(VSDVS_GetPortVLANPolicy)
%asks(VSDVS_GetPortNestedVLANTagging)
%asks(VSDVS_GetPrivateVLANMap)
%asks(VSDVS_GetDVMirrorSessions)
%asks(VSDVS_FreeMemory)
%include "vswitch/configuration.h"
%end_calls
