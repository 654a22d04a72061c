"""Every call of the state library, seen to do what it does."""

import libvswitch as vs

from witness import ID, LAB, PORT, call, cell, allocated, listing, walk


def kernel_switches() -> None:
    call("DVSQEX_SwitchAdd", "k-id", "k", 8, 200)
    call("DVSQEX_SwitchAssociate", "k-id")
    call("DVSQEX_SwitchDissociate", "k-id")
    call("DVSQEX_SwitchSetVersion", "k-id", 100)
    call("DVSQEX_SwitchSetMaxPorts", "k-id", 16)
    call("DVSQEX_SwitchRemove", "k-id")
    for command in ("show", "reset", "com.example.anything"):
        call("DVSQEX_CmdExec", ID, command, None, 0, None, None)


def properties() -> None:
    data = vs.Cell("qex_uint8", [1, 2, 3])
    key = "com.example.note"
    for target, where in (("GlobalProp", (ID,)), ("HostProp", (ID,)), ("PortData", (ID, PORT))):
        for length in (3, 2):
            call(f"DVSQEX_{target}Set", *where, key, data, length, vs.CONFIG_PROP_TYPE)
            allocated(f"DVSQEX_{target}Get", *where, key)
    looked_up = cell("DVSDataItem")
    view = cell("void *")
    for length, kind in ((3, vs.CONFIG_PROP_TYPE), (1, vs.POLICY_PROP_TYPE)):
        for scope in ("Global", "Host"):
            set_it = getattr(vs, f"DVSQEX_{scope}PropSet")
            set_it(ID, key, data.pointer, length, kind)
            assert getattr(vs, f"DVSState_{scope}PropLookup")(ID, key, looked_up.pointer) == 0
            read = vs.DVSData_Data(looked_up.value, view.pointer)
            call.note(f"DVSState_{scope}PropLookup", [vs.QEX_OK, view.read(read)])
            call.note("DVSData_Data", [vs.QEX_OK, view.read(read)])
            call("DVSData_PropType", looked_up.value)
    for other in (key, vs.VSPROP_MTU):
        vs.DVSState_GlobalPropLookup(ID, other, looked_up.pointer)
        call("DVSData_Name", looked_up.value)
    number = vs.VSDVS_DvPortIDToPortID(LAB, "uplink1")[1]
    for length in (3, 2):
        call("DVSQEX_UplinkDataSet", ID, key, number, data, length, vs.CONFIG_PROP_TYPE)
        allocated("DVSQEX_UplinkDataGet", ID, key, number)


def lists() -> None:
    data = vs.Cell("qex_uint8", [1, 2, 3])
    status_key = vs.VSPROP_SWITCH_STATUS
    word = vs.Cell("qex_uint8", [0, 0, 0, 0])
    for _ in range(2):
        for family in ("Vendor", "ExtraConfig"):
            listing(f"DVSQEX_{family}{'Global' if family == 'Vendor' else ''}PropList", ID)
            listing(f"DVSQEX_{family}PortPropList", ID, PORT)
        listing("DVSQEX_VendorHostPropList", ID)
        vs.VSDVS_SetMTU(LAB, 1600)
        vs.VSDVS_SetTxUplinkAlways(LAB, PORT, 1)
        vs.DVSQEX_HostPropSet(ID, status_key, word.pointer, 4, vs.VOLATILE_PROP_TYPE)
        vs.DVSQEX_GlobalPropSet(ID, "com.example.two", data.pointer, 1, vs.CONFIG_PROP_TYPE)
        vs.DVSQEX_PortDataSet(ID, PORT, "com.example.two", data.pointer, 1, vs.CONFIG_PROP_TYPE)
    handle = cell("DVSDataHandle")
    call("DVSData_Alloc", handle, None, None)
    call("DVSData_Update", handle.value, "n", data, 3, vs.CONFIG_PROP_TYPE)
    call("DVSData_Free", handle.value)


def walks() -> None:
    for more in (False, True):
        if more:
            vs.VSDVS_CreateVSwitch("more", None, None, 0, 1, 0, 0, 0)
            vs.VSDVS_AddDVPort(LAB, "more", 0)
            data = vs.Cell("qex_uint8", [1])
            given = ("com.example.more", data.pointer, 1, vs.CONFIG_PROP_TYPE)
            vs.DVSQEX_GlobalPropSet(ID, *given)
            vs.DVSQEX_HostPropSet(ID, *given)
            vs.DVSQEX_PortDataSet(ID, PORT, *given)
        lab, desk = vs.DVSState_SwitchFindByAlias(LAB), vs.DVSState_PortFind(ID, PORT)
        walk("DVSState_SwitchForEach", text_of=vs.DVS_SwitchName)
        walk("DVSState_PortForEach", lab, text_of=vs.DVS_PortId)
        walk("DVSState_GlobalPropForEach", lab, text_of=vs.DVSData_Name)
        walk("DVSState_HostPropForEach", lab, text_of=vs.DVSData_Name)
        walk("DVSState_PortDataForEach", desk, text_of=vs.DVSData_Name)


def clears() -> None:
    key = "com.example.more"
    call("DVSQEX_GlobalPropClear", ID, key)
    call("DVSQEX_HostPropClear", ID, key)
    call("DVSQEX_PortDataClear", ID, PORT, key)


def images() -> None:
    """The state as a whole; what it was is gone when this ends."""
    whole = allocated("DVSQEX_StateGet")
    kept = allocated("DVSQEX_PersistentStateGet")
    call("DVSState_ConfigReset")
    allocated("DVSQEX_StateGet")
    allocated("DVSQEX_PersistentStateGet")
    call("DVSState_ConfigDeserialize", vs.Cell("qex_uint8", list(kept)), len(kept))
    data = vs.Cell("int", vs.DVSPORT_TYPE_ZOMBIE)
    vs.DVSQEX_PortDataSet(ID, PORT, vs.QEX_NEBPROP_PORT_TYPE, data.pointer, 4, vs.CONFIG_PROP_TYPE)
    call("DVSQEX_StateSanitize")
    call("DVSQEX_StateCleanup")
    call("DVSQEX_StateInit", vs.Cell("qex_uint8", list(whole)), len(whole))


def keep_state() -> None:
    kernel_switches()
    properties()
    lists()
    walks()
    clears()
    images()
