// libnebPublic.so of the recording host: a line for each call.

#include "nebpublic/data.h"
#include "nebpublic/kernel_state.h"
#include "nebpublic/names.h"
#include "nebpublic/state.h"
#include "recording.h"

CALL(DVS_SwitchId);
CALL(DVS_SwitchName);
CALL(DVS_ClassName);
CALL(DVS_GetMaxPorts);
CALL(DVS_Version);
CALL(DVS_PortId);
CALL(DVS_PortAlias);
CALL(DVSData_Alloc);
CALL(DVSData_Free);
CALL(DVSData_Update);
CALL(DVSData_Serialize);
CALL(DVSData_Name);
CALL(DVSData_Data);
CALL(DVSData_PropType);

CALL(DVSQEX_StateInit);
CALL(DVSQEX_StateGet);
CALL(DVSQEX_PersistentStateGet);
CALL(DVSQEX_StateSanitize);
CALL(DVSQEX_StateCleanup);
CALL(DVSQEX_DataFree);
CALL(DVSQEX_SwitchAdd);
CALL(DVSQEX_SwitchRemove);
CALL(DVSQEX_SwitchAssociate);
CALL(DVSQEX_SwitchDissociate);
CALL(DVSQEX_SwitchSetVersion);
CALL(DVSQEX_SwitchSetMaxPorts);
CALL(DVSQEX_SwitchPortList);
CALL(DVSQEX_CmdExec);
CALL(DVSQEX_GlobalPropGet);
CALL(DVSQEX_GlobalPropSet);
CALL(DVSQEX_GlobalPropClear);
CALL(DVSQEX_HostPropGet);
CALL(DVSQEX_HostPropSet);
CALL(DVSQEX_HostPropClear);
CALL(DVSQEX_PortAdd);
CALL(DVSQEX_PortRemove);
CALL(DVSQEX_PortFind);
CALL(DVSQEX_PortGetByExternalId);
CALL(DVSQEX_PortDataGet);
CALL(DVSQEX_PortDataSet);
CALL(DVSQEX_PortDataClear);
CALL(DVSQEX_PortStateGet);
CALL(DVSQEX_PersistentPortStateGet);
CALL(DVSQEX_UplinkDataGet);
CALL(DVSQEX_UplinkDataSet);
CALL(DVSQEX_VendorGlobalPropList);
CALL(DVSQEX_VendorHostPropList);
CALL(DVSQEX_VendorPortPropList);
CALL(DVSQEX_ExtraConfigPropList);
CALL(DVSQEX_ExtraConfigPortPropList);

CALL(DVSAliasToSwitchId);
CALL(DVSPortsetNameToAlias);
CALL(DVSAliasToPortsetName);
CALL(DVPortExist);

CALL(DVSState_ConfigDeserialize);
CALL(DVSState_ConfigReset);
CALL(DVSState_SwitchFindByAlias);
CALL(DVSState_PortFind);
CALL(DVSState_SwitchForEach);
CALL(DVSState_PortForEach);
CALL(DVSState_GlobalPropForEach);
CALL(DVSState_HostPropForEach);
CALL(DVSState_PortDataForEach);
CALL(DVSState_GlobalPropLookup);
CALL(DVSState_HostPropLookup);
