"""What each checked call returns on the default host, written by hand: all of them, once."""

from typing import Any, Callable, Dict, List, NamedTuple, Tuple, Type

import libvswitch as vs
from libvswitch import checked
from libvswitch.enums import Balance, LinkState, MacType, Multicast

SWITCH = "vswitch0"
ID = "5f0c7a1e-27c4-4b61-9d0e-6a5b8f3d2c10"
PORT = "web-1"
KEY = "com.example.key"
CONFIG = vs.CONFIG_PROP_TYPE
ALL = vs.ALL_PROP_TYPE
MTU_BYTES = (1500).to_bytes(4, "little")


class Returned(NamedTuple):
    """What a call returned, and what it is to be: a value, or a question whose answer is yes."""

    found: Any
    expected: Any


Case = Callable[[], Returned]
CASES: Dict[str, Case] = {}


def case(name: str) -> Callable[[Case], Case]:
    """Notes which call a case is about."""

    def noted(made: Case) -> Case:
        assert name not in CASES, name
        CASES[name] = made
        return made

    return noted


def returns(name: str, *given: Any, value: Any = None, before: Callable[[], Any] = list) -> None:
    """A call with plain arguments; those that are functions are asked for them."""

    def made() -> Returned:
        before()
        arguments = [one() if callable(one) else one for one in given]
        return Returned(getattr(checked, name)(*arguments), value)

    case(name)(made)


def a(kind: type, **fields: Any) -> Callable[[Any], bool]:
    """Whether a result is of a type, and holds these."""

    def asked(found: Any) -> bool:
        return type(found) is kind and all(
            getattr(found, name) == value and type(getattr(found, name)) is type(value)
            for name, value in fields.items()
        )

    return asked


def of(kind: type) -> Callable[[Any], bool]:
    return lambda found: type(found) is kind


def number(port: str = PORT) -> int:
    return checked.VSDVS_DvPortIDToPortID(SWITCH, port)


def switch() -> checked.DVSwitchHandle:
    found = checked.DVSState_SwitchFindByAlias(SWITCH)
    assert found is not None
    return found


def port() -> checked.DVSPortHandle:
    found = checked.DVSState_PortFind(ID, PORT)
    assert found is not None
    return found


def note() -> None:
    checked.DVSQEX_GlobalPropSet(ID, KEY, b"note", CONFIG)
    checked.DVSQEX_HostPropSet(ID, KEY, b"rack", CONFIG)
    checked.DVSQEX_PortDataSet(ID, PORT, KEY, b"desk", CONFIG)


def item() -> checked.DVSDataItem:
    note()
    return checked.DVSState_GlobalPropLookup(ID, KEY)


def record(kind: Type[Any], **fields: Any) -> Any:
    made = kind()
    for name, value in fields.items():
        setattr(made, name, value)
    return made


TO = checked.DVMirrorEntity(vs.MIRROR_ENTTYPE_DVPORT, "web-2")
FROM = checked.DVMirrorEntity(vs.MIRROR_ENTTYPE_DVPORT, PORT)
SESSION = checked.DVMirrorSession(
    "audit", "of web-1", samplingRate=10, dstEntities=(TO,), srcInEntities=(FROM,)
)
ENTRY = checked.VSMACEntry("02:00:00:00:01:09", MacType.USER, vid=7)
MAP = (
    checked.VSPvlanMapEntry(10, 10, vs.VSPORT_PVLAN_TYPE_PROMISC),
    checked.VSPvlanMapEntry(10, 11, vs.VSPORT_PVLAN_TYPE_ISOLATED),
)
RANGES = (checked.qex_NEBPortVIDRange(3, 5), checked.qex_NEBPortVIDRange(7, 7))


def mirrored() -> None:
    checked.VSDVS_AppendDVMirrorSessions(SWITCH, PORT, [SESSION])


def entries(found: Any) -> List[Tuple[str, MacType]]:
    return [(one.macAddress, one.macAddrType) for one in found]


# Configuring

returns("VSDVS_CreateVSwitch", "lab", None, None, 0, True, 0, 0, 0)
returns("VSDVS_DestroyVSwitch", SWITCH)
returns("VSDVS_AddDVPort", SWITCH, "desk", 7)
returns("VSDVS_AddOpaqueDVPort", SWITCH, "desk", "theirs")
returns("VSDVS_RemoveDVPort", SWITCH, PORT)
returns("VSDVS_DvPortIDToPortID", SWITCH, PORT, value=of(int))
returns("VSDVS_DvPortIDToPortIDFromDVSID", ID, PORT, value=of(int))
returns("VSDVS_GetAliasFromPortset", "vswitch0-ports", value=SWITCH)
returns(
    "VSDVS_GetSwitchUplinkPorts",
    SWITCH,
    value=checked.VSDVS_GetSwitchUplinkPortsResult(
        names=("uplink1", "uplink2"), ids=("uplink1", "uplink2")
    ),
)
returns("VSDVS_SetSwitchUplinkPorts", SWITCH, ["Left", "Right"], ("uplink1", "uplink2"))
returns("VSDVS_AddSwitchUplinkPort", SWITCH, "nic0")
returns("VSDVS_RemoveSwitchUplinkPort", SWITCH, "nic4")
returns("VSDVS_ClearSwitchUplinkPorts", SWITCH)
returns("VSDVS_GetMTU", SWITCH, value=1500)
returns("VSDVS_SetMTU", SWITCH, 9000)
for _name, _arguments in (
    ("VSDVS_GetTeamingPolicy", [SWITCH]),
    ("VSDVS_GetTeamingPolicyFromDVSID", [ID]),
    ("VSDVS_GetPortTeamingPolicy", [SWITCH, PORT]),
):
    returns(_name, *_arguments, value=a(vs.VSTeamPolicy, numActive=1, numStandby=1))
returns("VSDVS_SetTeamingPolicy", SWITCH, record(vs.VSTeamPolicy, loadBalance=Balance.PORT))
returns(
    "VSDVS_SetPortTeamingPolicy", SWITCH, PORT, record(vs.VSTeamPolicy, loadBalance=Balance.MAC)
)
returns("VSDVS_ClearTeamingPolicy", SWITCH)
returns("VSDVS_ClearPortTeamingPolicy", SWITCH, PORT)
returns(
    "VSDVS_GetPortTeamingOverride",
    SWITCH,
    PORT,
    value="uplink2",
    before=lambda: checked.VSDVS_SetPortTeamingOverride(SWITCH, PORT, "uplink2"),
)
returns("VSDVS_SetPortTeamingOverride", SWITCH, PORT, "uplink1")
returns("VSDVS_ClearPortTeamingOverride", SWITCH, PORT)
returns("VSDVS_GetTxUplinkAlways", SWITCH, PORT, value=False)
returns("VSDVS_SetTxUplinkAlways", SWITCH, PORT, True)
returns("VSDVS_GetMACLearning", SWITCH, value=a(vs.VSMACLearning, agingTime=300))
returns("VSDVS_SetMACLearning", SWITCH, record(vs.VSMACLearning, agingTime=60, macLimit=9))
returns("VSDVS_ClearMACLearning", SWITCH)
returns("VSDVS_GetPortMACLearning", SWITCH, PORT, value=a(vs.VSPMACLearning, learning=True))
returns("VSDVS_SetPortMACLearning", SWITCH, PORT, record(vs.VSPMACLearning, macLimit=3))
returns("VSDVS_GetPortSecurity", SWITCH, PORT, value=a(vs.VSPropSecurity))
returns(
    "VSDVS_SetPortSecurity",
    SWITCH,
    PORT,
    record(vs.VSPropSecurity, flags=vs.VSPORT_SECURITY_DISALLOW_PROMISC),
)
returns("VSDVS_GetExtraEthFilter", SWITCH, PORT, value=a(vs.VSExtraEthFilter, numMulticastAddrs=0))
returns(
    "VSDVS_SetExtraEthFilter",
    SWITCH,
    PORT,
    record(vs.VSExtraEthFilter, flags=vs.QEX_ETH_FILTER_BROADCAST),
)
returns("VSDVS_ClearExtraEthFilter", SWITCH, PORT)
returns(
    "VSDVS_IsSinkPortEnabled",
    SWITCH,
    PORT,
    value=True,
    before=lambda: checked.VSDVS_ConfigureSinkPort(SWITCH, PORT, True),
)
returns("VSDVS_ConfigureSinkPort", SWITCH, PORT, False)
returns("VSDVS_GetMcastFilterMode", SWITCH, value=Multicast.SNOOPING)
returns("VSDVS_SetMcastFilterMode", SWITCH, Multicast.LEGACY)
returns(
    "VSDVS_GetPortVLANPolicy",
    SWITCH,
    PORT,
    value=checked.VSDVS_GetPortVLANPolicyResult(
        checked.VSPortVlanPolicy(
            flags=vs.VSPORT_VLAN_GUEST_TAGGING | vs.VSPORT_VLAN_SET_PRIORITY,
            vlanID=0,
            vidRanges=RANGES,
        ),
        priority=6,
    ),
    before=lambda: checked.VSDVS_SetPortVLANPolicy(SWITCH, PORT, 0, 6, True, False, RANGES),
)
returns("VSDVS_SetPortVLANPolicy", SWITCH, PORT, 100, -1, False, False)
returns("VSDVS_ClearPortVLANPolicy", SWITCH, PORT)
returns("VSDVS_GetPortNestedVLANTagging", SWITCH, PORT, value=False)
returns("VSDVS_SetPortNestedVLANTagging", SWITCH, PORT, True)
returns(
    "VSDVS_GetPrivateVLANMap",
    SWITCH,
    value=MAP,
    before=lambda: checked.VSDVS_SetPrivateVLANMap(SWITCH, MAP),
)
returns("VSDVS_SetPrivateVLANMap", SWITCH, [*MAP])
returns("VSDVS_GetDVMirrorSessions", SWITCH, PORT, value=(SESSION,), before=mirrored)
returns("VSDVS_AppendDVMirrorSessions", SWITCH, PORT, [SESSION])
returns("VSDVS_RemoveDVMirrorSession", SWITCH, PORT, "audit", before=mirrored)
returns("VSDVS_ClearDVMirrorSessions", SWITCH, PORT)


@case("VSDVS_FreeMemory")
def _free_both_lists() -> Returned:
    _, names, ids = vs.VSDVS_GetSwitchUplinkPorts(SWITCH)
    checked.VSDVS_FreeMemory(ids)
    free: Callable[[Any], object] = checked.VSDVS_FreeMemory
    return Returned(free(names), None)


# Asking

returns(
    "VSQEX_GetVSInfo",
    SWITCH,
    value=a(vs.VSInfo, mtu=1500, maxPorts=128),
)
returns("VSQEX_GetPortMACLearningStats", SWITCH, PORT, value=a(vs.VSPMACLearningStats))
returns(
    "VSQEX_GetTeamMACTable",
    SWITCH,
    MacType.ALL,
    value=lambda found: type(found) is checked.VSMACTable
    and found.totalEntries == 2
    and entries(found)
    == [("02:00:00:00:ff:01", MacType.LEARNED), ("02:00:00:00:ff:02", MacType.LEARNED)],
)
returns(
    "VSQEX_GetPortMACTable",
    SWITCH,
    PORT,
    MacType.STATIC,
    value=checked.VSMACTable(
        1, (checked.VSMACEntry("02:00:00:00:01:01", MacType.STATIC, False, 0, 0, 0),)
    ),
)
returns("VSQEX_SetPortMACTable", SWITCH, PORT, ENTRY)
returns(
    "VSQEX_ClearPortMACTable",
    SWITCH,
    PORT,
    ENTRY,
    before=lambda: checked.VSQEX_SetPortMACTable(SWITCH, PORT, ENTRY),
)
returns("VSQEX_GetLAGTable", SWITCH, value=checked.VSLAGTable())
returns("VSQEX_SetUplinkAdminLinkState", SWITCH, "nic4", LinkState.DOWN)
returns("VSQEX_GetUplinkLinkState", SWITCH, "nic4", value=LinkState.UP)
returns("VSQEX_GetUplinkLACPLinkState", SWITCH, "nic4", value=of(LinkState))
returns(
    "VSQEX_GetUplinks",
    SWITCH,
    value=lambda found: [one.name for one in found.entries] == ["nic4", "nic5"]
    and found.totalEntries == 2
    and found[0] == checked.VSUplinks_entries("nic4", number("uplink1")),
)
returns("VSQEX_GetUplinkDVPortID", "nic5", value="uplink2")
returns(
    "VSQEX_GetMcastFilters",
    SWITCH,
    number,
    Multicast.IGMP,
    value=checked.VSMcastFilters(1, ("239.1.1.1",)),
)
returns(
    "VSQEX_GetMcastFilterStats",
    SWITCH,
    number,
    Multicast.IGMP,
    "239.1.1.1",
    value=a(
        checked.VSMcastFilterStats,
        version=3,
        srcIPFilterMode=vs.VS_MCAST_SRC_IP_FILTER_MODE_INCLUDE,
        totalEntries=1,
        entries=("192.0.2.7",),
    ),
)
returns("VSQEX_GetMcastFilterMode", SWITCH, value=Multicast.SNOOPING)
returns(
    "VSQEX_GetDVMirrorSessionStats",
    SWITCH,
    "audit",
    value=a(vs.VSDVMirrorSessionStats, name="of web-1", mirroredPkts=0),
    before=mirrored,
)
returns(
    "VSQEX_GetDVMirrorSessionIDs",
    SWITCH,
    value=checked.VSDVMirrorSessionIDs(1, ("audit",)),
    before=mirrored,
)
returns(
    "VSQEX_GetPromiscSessionActiveDsts", SWITCH, value=checked.VSPromiscSessionActiveDsts(0, ())
)
returns(
    "VSQEX_GetServicePortTeamingStats", SWITCH, value=a(vs.VSServicePortTeamingStats, txErrors=0)
)
returns("VSQEX_GetRARPStats", SWITCH, value=a(vs.VSRARPStats, rarpPktsSent=0))
returns(
    "VSQEX_GetRuntimeOptions",
    [vs.VS_RT_OPT_IGMP_VERSION, vs.VS_RT_OPT_IGMP_ROUTER_IP],
    value=(
        checked.VSRuntimeOption(vs.VS_RT_OPT_IGMP_VERSION, 3),
        checked.VSRuntimeOption(vs.VS_RT_OPT_IGMP_ROUTER_IP, "0.0.0.0"),
    ),
)
returns(
    "VSQEX_SetRuntimeOptions",
    [
        checked.VSRuntimeOption(vs.VS_RT_OPT_IGMP_VERSION, 2),
        checked.VSRuntimeOption(vs.VS_RT_OPT_MLD_ROUTER_IP, "fe80::1"),
    ],
)
returns("VSQEX_GetGlobalMACLearningProps", value=a(vs.VSMACLearningGlobalProps, agingTime=300))
returns(
    "VSQEX_SetGlobalMACLearningProps", record(vs.VSMACLearningGlobalProps, agingTime=9, macLimit=9)
)
returns("VSQEX_PortGetTeamUplinkHint", number, value="nic4")
returns("VSQEX_FreeMemory", lambda: vs.VSQEX_GetUplinks(SWITCH)[1])

# Handles and lists

returns("DVS_SwitchId", switch, value=ID)
returns("DVS_SwitchName", switch, value=SWITCH)
returns("DVS_ClassName", switch, value=vs.PS_CLASS_NAME)
returns("DVS_GetMaxPorts", switch, value=128)
returns("DVS_Version", switch, value=vs.VS_YKT_NEB_VERSION_20)
returns("DVS_PortId", port, value=PORT)
returns("DVS_PortAlias", port)
returns("DVSData_Alloc", value=of(checked.DVSDataHandle))
returns("DVSData_Free", checked.DVSData_Alloc)
returns("DVSData_Update", checked.DVSData_Alloc, "name", b"bytes", CONFIG)
returns("DVSData_Serialize", checked.DVSData_Alloc, 200, value=of(bytes))
returns("DVSData_Name", item, value=KEY)
returns("DVSData_Data", item, value=b"note")
returns("DVSData_PropType", item, value=CONFIG)

# The state

returns("DVSState_ConfigDeserialize", checked.DVSQEX_PersistentStateGet)
returns("DVSState_ConfigReset")
returns("DVSState_SwitchFindByAlias", SWITCH, value=of(checked.DVSwitchHandle))
returns("DVSState_PortFind", ID, "none")
returns("DVSState_SwitchForEach", value=lambda found: [*found] == [switch()])
returns("DVSState_PortForEach", switch, value=lambda found: port() in [*found])
returns(
    "DVSState_GlobalPropForEach",
    switch,
    value=lambda found: checked.DVSDataItem(KEY, b"note", CONFIG) in [*found],
    before=note,
)
returns(
    "DVSState_HostPropForEach",
    switch,
    value=lambda found: checked.DVSDataItem(KEY, b"rack", CONFIG) in [*found],
    before=note,
)
returns(
    "DVSState_PortDataForEach",
    port,
    value=lambda found: checked.DVSDataItem(KEY, b"desk", CONFIG) in [*found],
    before=note,
)
returns(
    "DVSState_GlobalPropLookup",
    ID,
    KEY,
    value=checked.DVSDataItem(KEY, b"note", CONFIG),
    before=note,
)
returns(
    "DVSState_HostPropLookup", ID, KEY, value=checked.DVSDataItem(KEY, b"rack", CONFIG), before=note
)
returns("DVSQEX_StateInit", checked.DVSQEX_StateGet)
returns("DVSQEX_StateGet", value=of(bytes))
returns("DVSQEX_PersistentStateGet", value=of(bytes))
returns("DVSQEX_StateSanitize")
returns("DVSQEX_StateCleanup")


@case("DVSQEX_DataFree")
def _free_data() -> Returned:
    data, length = vs.Cell("void *"), vs.Cell("int")
    vs.DVSQEX_GlobalPropGet(ID, vs.VSPROP_MTU, data.pointer, length.pointer)
    free: Callable[[Any], object] = checked.DVSQEX_DataFree
    return Returned(free(data.value), None)


returns("DVSQEX_SwitchAdd", "lab-1", "lab", 8, vs.VS_YKT_NEB_VERSION_20)
returns("DVSQEX_SwitchRemove", ID)
returns("DVSQEX_SwitchDissociate", ID)
returns("DVSQEX_SwitchAssociate", ID, before=lambda: checked.DVSQEX_SwitchDissociate(ID))
returns("DVSQEX_SwitchSetVersion", ID, vs.VS_YKT_NEB_VERSION_10)
returns("DVSQEX_SwitchSetMaxPorts", ID, 64)
returns(
    "DVSQEX_SwitchPortList",
    ID,
    vs.DVSPORT_TYPE_ACTIVE,
    value=lambda found: type(found) is checked.DVPortList
    and found.type == vs.DVSPORT_TYPE_ACTIVE
    and checked.DVPortData("desk", 7) in found.dvPort,
    before=lambda: checked.VSDVS_AddDVPort(SWITCH, "desk", 7),
)
returns("DVSQEX_GlobalPropGet", ID, vs.VSPROP_MTU, value=MTU_BYTES)
returns("DVSQEX_GlobalPropSet", ID, KEY, b"", CONFIG)
returns("DVSQEX_GlobalPropClear", ID, KEY, before=note)
returns("DVSQEX_HostPropGet", ID, KEY, value=b"rack", before=note)
returns("DVSQEX_HostPropSet", ID, KEY, b"rack", CONFIG)
returns("DVSQEX_HostPropClear", ID, KEY, before=note)
returns("DVSQEX_PortAdd", ID, "desk", lambda: checked.DVSQEX_PortStateGet(ID, PORT))
returns("DVSQEX_PortRemove", ID, PORT)
returns("DVSQEX_PortFind", ID, PORT)
returns(
    "DVSQEX_PortGetByExternalId",
    ID,
    "theirs",
    value=checked.OpaqueDVPortData("desk", "theirs"),
    before=lambda: checked.VSDVS_AddOpaqueDVPort(SWITCH, "desk", "theirs"),
)
returns("DVSQEX_PortDataGet", ID, PORT, KEY, value=b"desk", before=note)
returns("DVSQEX_PortDataSet", ID, PORT, KEY, b"desk", CONFIG)
returns("DVSQEX_PortDataClear", ID, PORT, KEY, before=note)
returns("DVSQEX_PortStateGet", ID, PORT, value=of(bytes))
returns("DVSQEX_PersistentPortStateGet", ID, PORT, 200, value=of(bytes))
returns(
    "DVSQEX_UplinkDataGet",
    ID,
    KEY,
    lambda: number("uplink1"),
    value=b"left",
    before=lambda: checked.DVSQEX_UplinkDataSet(ID, KEY, number("uplink1"), b"left", CONFIG),
)
returns("DVSQEX_UplinkDataSet", ID, KEY, lambda: number("uplink1"), b"left", CONFIG)
for _name in ("VendorGlobalPropList", "VendorHostPropList", "ExtraConfigPropList"):
    returns(f"DVSQEX_{_name}", ID, ALL, value=of(checked.DVSDataHandle))
for _name in ("VendorPortPropList", "ExtraConfigPortPropList"):
    returns(f"DVSQEX_{_name}", ID, PORT, ALL, value=of(checked.DVSDataHandle))

# Names

returns("DVSAliasToSwitchId", SWITCH, value=ID)
returns("DVSPortsetNameToAlias", "vswitch0-ports", value=SWITCH)
returns("DVSAliasToPortsetName", SWITCH, value="vswitch0-ports")
returns("DVPortExist", ID, PORT, value=True)
returns("QEX_ReturnStatusToString", vs.QEX_NOT_FOUND, value="Not found")
returns("Panic", "all is well")
