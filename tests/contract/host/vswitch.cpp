// libvswitch.so of the recording host: a line for each call.

#include <cstdarg>

#include "recording.h"
#include "vswitch/configuration.h"
#include "vswitch/queries.h"
#include "vswitch/status_text.h"

CALL(VSDVS_CreateVSwitch);
CALL(VSDVS_DestroyVSwitch);
CALL(VSDVS_AddDVPort);
CALL(VSDVS_AddOpaqueDVPort);
CALL(VSDVS_RemoveDVPort);
CALL(VSDVS_DvPortIDToPortID);
CALL(VSDVS_DvPortIDToPortIDFromDVSID);
CALL(VSDVS_GetAliasFromPortset);
CALL(VSDVS_GetSwitchUplinkPorts);
CALL(VSDVS_SetSwitchUplinkPorts);
CALL(VSDVS_AddSwitchUplinkPort);
CALL(VSDVS_RemoveSwitchUplinkPort);
CALL(VSDVS_ClearSwitchUplinkPorts);
CALL(VSDVS_GetMTU);
CALL(VSDVS_SetMTU);
CALL(VSDVS_GetTeamingPolicy);
CALL(VSDVS_SetTeamingPolicy);
CALL(VSDVS_ClearTeamingPolicy);
CALL(VSDVS_GetTeamingPolicyFromDVSID);
CALL(VSDVS_GetPortTeamingPolicy);
CALL(VSDVS_SetPortTeamingPolicy);
CALL(VSDVS_ClearPortTeamingPolicy);
CALL(VSDVS_GetPortTeamingOverride);
CALL(VSDVS_SetPortTeamingOverride);
CALL(VSDVS_ClearPortTeamingOverride);
CALL(VSDVS_GetTxUplinkAlways);
CALL(VSDVS_SetTxUplinkAlways);
CALL(VSDVS_GetMACLearning);
CALL(VSDVS_SetMACLearning);
CALL(VSDVS_ClearMACLearning);
CALL(VSDVS_GetPortMACLearning);
CALL(VSDVS_SetPortMACLearning);
CALL(VSDVS_GetPortSecurity);
CALL(VSDVS_SetPortSecurity);
CALL(VSDVS_GetExtraEthFilter);
CALL(VSDVS_SetExtraEthFilter);
CALL(VSDVS_ClearExtraEthFilter);
CALL(VSDVS_IsSinkPortEnabled);
CALL(VSDVS_ConfigureSinkPort);
CALL(VSDVS_GetMcastFilterMode);
CALL(VSDVS_SetMcastFilterMode);
CALL(VSDVS_GetPortVLANPolicy);
CALL(VSDVS_SetPortVLANPolicy);
CALL(VSDVS_ClearPortVLANPolicy);
CALL(VSDVS_GetPortNestedVLANTagging);
CALL(VSDVS_SetPortNestedVLANTagging);
CALL(VSDVS_GetPrivateVLANMap);
CALL(VSDVS_SetPrivateVLANMap);
CALL(VSDVS_GetDVMirrorSessions);
CALL(VSDVS_AppendDVMirrorSessions);
CALL(VSDVS_RemoveDVMirrorSession);
CALL(VSDVS_ClearDVMirrorSessions);
CALL(VSDVS_FreeMemory);

CALL(VSQEX_GetVSInfo);
CALL(VSQEX_GetPortMACLearningStats);
CALL(VSQEX_GetTeamMACTable);
CALL(VSQEX_GetPortMACTable);
CALL(VSQEX_SetPortMACTable);
CALL(VSQEX_ClearPortMACTable);
CALL(VSQEX_GetLAGTable);
CALL(VSQEX_SetUplinkAdminLinkState);
CALL(VSQEX_GetUplinkLinkState);
CALL(VSQEX_GetUplinkLACPLinkState);
CALL(VSQEX_GetUplinks);
CALL(VSQEX_GetUplinkDVPortID);
CALL(VSQEX_GetMcastFilters);
CALL(VSQEX_GetMcastFilterStats);
CALL(VSQEX_GetMcastFilterMode);
CALL(VSQEX_GetDVMirrorSessionStats);
CALL(VSQEX_GetDVMirrorSessionIDs);
CALL(VSQEX_GetPromiscSessionActiveDsts);
CALL(VSQEX_GetServicePortTeamingStats);
CALL(VSQEX_GetRARPStats);
CALL(VSQEX_GetRuntimeOptions);
CALL(VSQEX_SetRuntimeOptions);
CALL(VSQEX_GetGlobalMACLearningProps);
CALL(VSQEX_SetGlobalMACLearningProps);
CALL(VSQEX_PortGetTeamUplinkHint);
CALL(VSQEX_FreeMemory);

CALL(QEX_ReturnStatusToString);

// The one call with variable arguments: the first of them is recorded as a pointer.
using PanicCall = recording::Call<"Panic", void(char const *, void *)>;
static recording::Declaration const declare_Panic{PanicCall{}};

[[gnu::visibility("default")]] void Panic(char const *format, ...) {
  va_list variable;
  va_start(variable, format);
  PanicCall::call(format, va_arg(variable, void *));
  va_end(variable);
}
