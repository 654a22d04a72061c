// libnebPublic: the state of distributed switches. Every DVSQEX_* call returns a status; what calls
// allocate through a pointer that the caller passes is the library's until DVSQEX_DataFree. Of
// libvswitch, the text of a status and the report of a fatal condition.

%{
#include "nebpublic/data.h"
#include "nebpublic/kernel_state.h"
#include "nebpublic/names.h"
#include "nebpublic/state.h"
#include "vswitch/status_text.h"
%}

// Of handles and lists. A null handle has no properties, and its texts are null.
%calls(data)
%bytes(data, length)                                    // DVSData_Update
%allocates(DVSData_Alloc, list, DVSData_Free)
%allocates(DVSData_Serialize, bytes, DVSQEX_DataFree)
%volatile_of(DVSData_Serialize, bytes, image)
%volatile_of(DVS_SwitchId, RESULT, switch_id)
%unless(DVSData_Serialize, bytes, "the list has an allocator of its own, whose counterpart frees it")
%length(DVSData_Serialize, bytes, length)
%shows(DVSData_Data, data, "the item ends")
%length(DVSData_Data, data, RESULT)
%releases(DVSData_Free, list)
%nullable(DVSData_Free, list)
%nullable(DVSData_Alloc, alloc)
%nullable(DVSData_Alloc, release)
%nullable(DVSData_Update, data)
%nullable(DVSData_Name, item)
%nullable(DVSData_Data, item)
%nullable(DVSData_PropType, item)
%nullable(DVS_SwitchId, handle)
%nullable(DVS_SwitchName, handle)
%nullable(DVS_ClassName, handle)
%nullable(DVS_GetMaxPorts, handle)
%nullable(DVS_Version, handle)
%nullable(DVS_PortId, handle)
%nullable(DVS_PortAlias, handle)
%asks(DVS_SwitchId)
%asks(DVS_SwitchName)
%asks(DVS_ClassName)
%asks(DVS_GetMaxPorts)
%asks(DVS_Version)
%asks(DVS_PortId)
%asks(DVS_PortAlias)
%asks(DVSData_Alloc)
%asks(DVSData_Free)
%asks(DVSData_Update)
%asks(DVSData_Serialize)
%asks(DVSData_Name)
%asks(DVSData_Data)
%asks(DVSData_PropType)
%include "nebpublic/data.h"
%end_calls

// Reading the state in place. A walk over a null handle, or with a null callback, does nothing.
%calls(state)
%bytes(state, length)                                   // DVSState_ConfigDeserialize
%volatile(switchId, switch_id)
%volatile(state, image)
%shows(DVSState_SwitchFindByAlias, RESULT, "a reset or a cleanup of the state")
%shows(DVSState_PortFind, RESULT, "a reset or a cleanup of the state")
%shows(DVSState_GlobalPropLookup, item, "the same property is looked up or walked over again")
%shows(DVSState_HostPropLookup, item, "the same property is looked up or walked over again")
%define %walk(CALL)
%nullable(CALL, callback)
%nullable(CALL, context)
%volatile_of(CALL, context, callers_own)
%enddef
%walk(DVSState_SwitchForEach)
%nullable(DVSState_PortForEach, handle)
%nullable(DVSState_GlobalPropForEach, handle)
%nullable(DVSState_HostPropForEach, handle)
%nullable(DVSState_PortDataForEach, handle)
%walk(DVSState_PortForEach)
%walk(DVSState_GlobalPropForEach)
%walk(DVSState_HostPropForEach)
%walk(DVSState_PortDataForEach)
%asks(DVSState_SwitchFindByAlias)
%asks(DVSState_PortFind)
%asks(DVSState_SwitchForEach)
%asks(DVSState_PortForEach)
%asks(DVSState_GlobalPropForEach)
%asks(DVSState_HostPropForEach)
%asks(DVSState_PortDataForEach)
%asks(DVSState_GlobalPropLookup)
%asks(DVSState_HostPropLookup)
%include "nebpublic/state.h"
%end_calls

// The kernel's state. Lists of properties are lists like those of DVSData_Alloc.
%calls(kernel_state, DVSQEX_DataFree)
%bytes(state, length)                                   // DVSQEX_StateInit, ...
%bytes(data, length)                                    // DVSQEX_GlobalPropGet, ...
%bytes(input, inputLength)                              // DVSQEX_CmdExec
%bytes(output, outputLength)
%volatile(switchId, switch_id)
%volatile(portID, port_number)
%volatile(state, image)
%length(DVSQEX_PortAdd, state, stateLength)
%nullable(DVSQEX_StateInit, state)
%nullable(DVSQEX_PortAdd, state)
%nullable(DVSQEX_CmdExec, input)
%allocates(DVSQEX_VendorGlobalPropList, list, DVSData_Free)
%allocates(DVSQEX_VendorHostPropList, list, DVSData_Free)
%allocates(DVSQEX_VendorPortPropList, list, DVSData_Free)
%allocates(DVSQEX_ExtraConfigPropList, list, DVSData_Free)
%allocates(DVSQEX_ExtraConfigPortPropList, list, DVSData_Free)
%releases(DVSQEX_DataFree, data)
%nullable(DVSQEX_DataFree, data)
%asks(DVSQEX_StateGet)
%asks(DVSQEX_PersistentStateGet)
%asks(DVSQEX_DataFree)
%asks(DVSQEX_SwitchPortList)
%asks(DVSQEX_GlobalPropGet)
%asks(DVSQEX_HostPropGet)
%asks(DVSQEX_PortFind)
%asks(DVSQEX_PortGetByExternalId)
%asks(DVSQEX_PortDataGet)
%asks(DVSQEX_PortStateGet)
%asks(DVSQEX_PersistentPortStateGet)
%asks(DVSQEX_UplinkDataGet)
%asks(DVSQEX_VendorGlobalPropList)
%asks(DVSQEX_VendorHostPropList)
%asks(DVSQEX_VendorPortPropList)
%asks(DVSQEX_ExtraConfigPropList)
%asks(DVSQEX_ExtraConfigPortPropList)
%include "nebpublic/kernel_state.h"
%end_calls

// One C function under two shapes: with a text after the status, or with an array of the caller's
// whose contents are discarded.
%text_out(char *portsetBuffer, 128)
%array_argument(char switchId[64])                      // DVSAliasToSwitchId
%array_argument(char alias[128])                        // DVSPortsetNameToAlias
%array_argument(char portsetName[128])                  // DVSAliasToPortsetName
%calls(names)
%volatile(switchId, switch_id)
%volatile(portsetName, portset_name)
%volatile(portsetBuffer, portset_name)
%asks(DVSAliasToSwitchId)
%asks(DVSPortsetNameToAlias)
%asks(DVSAliasToPortsetName)
%asks(DVPortExist)
%include "nebpublic/names.h"
QEX_ReturnStatus DVSAliasToPortsetName(char const *alias, char portsetName[128]);
%end_calls
%overloaded(DVSAliasToPortsetName)

// Panic reports and returns, or ends the process: it never springs the trap. Of its arguments only the
// format is passed on, with a null pointer after it.
%untrapped(Panic)
%calls(status_text)
%shows(QEX_ReturnStatusToString, RESULT, "the process ends")
%asks(QEX_ReturnStatusToString)
%include "vswitch/status_text.h"
%end_calls
%called_by_tuple(Panic)
