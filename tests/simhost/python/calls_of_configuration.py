"""Every call that configures switches and ports, seen to do what it does."""

import ctypes
import json
from typing import Any, Dict

import libvswitch as vs

from witness import ID, LAB, NEBPUBLIC, PORT, SIMHOST, call, cell, filled, allocated


def names_and_switches() -> None:
    for alias in ("other", "none"):
        if alias == "other":
            call("VSDVS_CreateVSwitch", alias, "other-id", "other-ports", 0, 1, 0, 0, 0)
        call("VSDVS_CreateVSwitch", LAB, ID, "lab-ports", 64, 1, 0, 9000, 2)
    for alias, portset in ((LAB, "lab-ports"), ("other", "other-ports")):
        call("VSDVS_GetAliasFromPortset", portset)
        call("DVSAliasToPortsetName", alias)
        for name, room, given in (
            ("DVSAliasToSwitchId", 64, alias),
            ("DVSPortsetNameToAlias", 128, portset),
        ):
            # Through the module these keep what they write to themselves.
            text = ctypes.create_string_buffer(room)
            status = getattr(NEBPUBLIC, name)(given.encode(), text)
            call.note(name, [status, text.value])
    for handle in (
        vs.DVSState_SwitchFindByAlias("other"),
        vs.DVSState_SwitchFindByAlias(LAB),
        None,
    ):
        for name in ("SwitchId", "SwitchName", "ClassName", "GetMaxPorts", "Version"):
            call(f"DVS_{name}", handle)
    for alias in (LAB, "none"):
        call("DVSState_SwitchFindByAlias", alias)
    info = vs.VSInfo()
    for alias in (LAB, "other"):
        call("VSQEX_GetVSInfo", alias, info, outputs=(info,))
    call("VSDVS_DestroyVSwitch", "other")


def ports() -> None:
    call("DVSQEX_PortFind", ID, PORT)
    call("DVPortExist", ID, PORT)
    call("DVSState_PortFind", ID, PORT)
    call("VSDVS_AddDVPort", LAB, PORT, 7)
    call("DVSQEX_PortFind", ID, PORT)
    call("DVPortExist", ID, PORT)
    call("DVSState_PortFind", ID, PORT)
    call("VSDVS_AddOpaqueDVPort", LAB, "opaque", "theirs")
    call("VSDVS_AddOpaqueDVPort", LAB, "second", "more")
    for external in ("theirs", "more"):
        port = cell("OpaqueDVPortData *")
        call("DVSQEX_PortGetByExternalId", ID, external, port, outputs=(port,))
        vs.DVSQEX_DataFree(port.value)
    call("VSDVS_RemoveDVPort", LAB, "second")
    call("DVSQEX_PortAdd", ID, "third", None, 0)
    call("DVSQEX_PortRemove", ID, "third")
    for identifier in (PORT, "opaque"):
        call("VSDVS_DvPortIDToPortID", LAB, identifier)
        call("VSDVS_DvPortIDToPortIDFromDVSID", ID, identifier)
        handle = vs.DVSState_PortFind(ID, identifier)
        call("DVS_PortId", handle)
        call("DVS_PortAlias", handle)
        allocated("DVSQEX_PortStateGet", ID, identifier)
        allocated("DVSQEX_PersistentPortStateGet", ID, identifier, 200)
        alias = vs.Cell("qex_uint8", list(b"alias\0"))
        vs.DVSQEX_PortDataSet(
            ID, identifier, vs.QEX_NEBPROP_PORT_ALIAS, alias.pointer, 6, vs.CONFIG_PROP_TYPE
        )
        call("DVS_PortAlias", handle)
    for kind in (vs.DVSPORT_TYPE_ACTIVE, vs.DVSPORT_TYPE_ZOMBIE):
        found = cell("DVPortList *")
        call("DVSQEX_SwitchPortList", ID, found, kind, outputs=(found,))
        vs.DVSQEX_DataFree(found.value)


def uplinks() -> None:
    def look() -> None:
        status, names, ids = call("VSDVS_GetSwitchUplinkPorts", LAB)
        call("VSDVS_FreeMemory", names)
        call("VSDVS_FreeMemory", ids)
        status, attached = call("VSQEX_GetUplinks", LAB)
        call("VSQEX_FreeMemory", attached)
        groups = cell("VSLAGTable *")
        call("VSQEX_GetLAGTable", LAB, groups, outputs=(groups,))
        call("VSQEX_FreeMemory", groups.value)
        name = vs.qex_Name()
        number = vs.VSDVS_DvPortIDToPortID(LAB, PORT)[1]
        call("VSQEX_PortGetTeamUplinkHint", number, name, outputs=(name,))
        for state in ("GetUplinkLinkState", "GetUplinkLACPLinkState"):
            call(f"VSQEX_{state}", LAB, "nic1")
        for uplink in ("nic0", "nic1"):
            call("VSQEX_GetUplinkDVPortID", uplink)

    look()
    lag = {"switches": [{"alias": LAB, "lags": [{"name": "lag1", "uplinks": ["nic0", "nic1"]}]}]}
    assert SIMHOST.simhost_apply(json.dumps(lag).encode()) == 0
    look()
    for down in ("nic0", "nic1"):
        call("VSQEX_SetUplinkAdminLinkState", LAB, down, vs.QEX_LINK_STATE_DOWN)
        look()
        call("VSQEX_SetUplinkAdminLinkState", LAB, down, vs.QEX_LINK_STATE_UP)
    status, names, ids = vs.VSDVS_GetSwitchUplinkPorts(LAB)
    vs.VSDVS_AddSwitchUplinkPort(LAB, "nic2")
    call("VSDVS_SetSwitchUplinkPorts", LAB, names, ids)
    for record in (names, ids):
        vs.VSDVS_FreeMemory(record)
    call("VSDVS_AddSwitchUplinkPort", LAB, "nic2")
    look()
    call("VSDVS_RemoveSwitchUplinkPort", LAB, "nic2")
    look()
    call("VSDVS_ClearSwitchUplinkPorts", LAB)
    vs.VSDVS_AddSwitchUplinkPort(LAB, "nic0")


def record_settings() -> None:
    """Setters, getters and clears of settings that are one record or number."""
    settings: Dict[str, Any] = {
        "TeamingPolicy": filled(vs.VSTeamPolicy(), loadBalance=vs.TEAM_FRP_TYPE_FO_EXPLICIT),
        "MACLearning": filled(vs.VSMACLearning(), agingTime=30, macLimit=5),
        "PortTeamingPolicy": filled(vs.VSTeamPolicy(), loadBalance=vs.TEAM_FRP_TYPE_LB_IP),
        "PortMACLearning": filled(vs.VSPMACLearning(), learning=True, macLimit=2),
        "PortSecurity": filled(vs.VSPropSecurity(), flags=vs.VSPORT_SECURITY_DISALLOW_PROMISC),
        "ExtraEthFilter": filled(vs.VSExtraEthFilter(), flags=vs.QEX_ETH_FILTER_UNICAST),
    }
    for name, record in settings.items():
        where = (LAB,) if name in ("TeamingPolicy", "MACLearning") else (LAB, PORT)
        read = type(record)()
        for _ in range(2):
            call(f"VSDVS_Get{name}", *where, read, outputs=(read,))
            if name == "TeamingPolicy":
                call("VSDVS_GetTeamingPolicyFromDVSID", ID, read, outputs=(read,))
            call(f"VSDVS_Set{name}", *where, record)
        if hasattr(vs, f"VSDVS_Clear{name}") and name != "PortMACLearning":
            call(f"VSDVS_Clear{name}", *where)
    mtu = cell("qex_uint32")
    for wanted in (1500, 9000):
        call("VSDVS_SetMTU", LAB, wanted)
        call("VSDVS_GetMTU", LAB, mtu, outputs=(mtu,))
    for switch, wanted in (
        (0, vs.VS_MCAST_FILTER_MODE_SNOOPING),
        (0, vs.VS_MCAST_FILTER_MODE_IGMP),
    ):
        call("VSDVS_SetMcastFilterMode", LAB, wanted)
        call("VSDVS_GetMcastFilterMode", LAB)
        call("VSQEX_GetMcastFilterMode", LAB)
    for setter, getter in (
        ("SetTxUplinkAlways", "GetTxUplinkAlways"),
        ("SetPortNestedVLANTagging", "GetPortNestedVLANTagging"),
        ("ConfigureSinkPort", "IsSinkPortEnabled"),
    ):
        for wanted in (1, 0):
            call(f"VSDVS_{setter}", LAB, PORT, wanted)
            call(f"VSDVS_{getter}", LAB, PORT)
    call("VSDVS_GetPortTeamingOverride", LAB, PORT)
    call("VSDVS_SetPortTeamingOverride", LAB, PORT, "uplink1")
    call("VSDVS_GetPortTeamingOverride", LAB, PORT)
    call("VSDVS_ClearPortTeamingOverride", LAB, PORT)


def vlans() -> None:
    for vlan in (5, 6):
        call("VSDVS_SetPortVLANPolicy", LAB, PORT, vlan, 3, 0, 0, None, 0)
        status, policy, priority = call("VSDVS_GetPortVLANPolicy", LAB, PORT)
        call("VSDVS_FreeMemory", policy)
    call("VSDVS_ClearPortVLANPolicy", LAB, PORT)
    entry = filled(
        vs.VSPvlanMapEntry(), primaryVID=5, secondaryVID=5, pvlanType=vs.VSPORT_PVLAN_TYPE_PROMISC
    )
    for _ in range(2):
        status, entries, count = vs.VSDVS_GetPrivateVLANMap(LAB)
        call.note("VSDVS_GetPrivateVLANMap", [status, count])
        vs.VSDVS_FreeMemory(entries)
        call("VSDVS_SetPrivateVLANMap", LAB, entry, 1)


def sessions() -> None:
    table = vs.alloc_dvmirror_session_table(1, 1)
    table.version = vs.VS_DVMIRROR_VERSION_V3
    session = table[0]
    session.sid, session.type = "audit", vs.VS_DVMIRROR_SESSIONTYPE_DVPORT
    session.flags = vs.VS_DVMIRROR_FLAG_LEGACY
    session.numDstEntities = 1
    entity = table.get_first_session_entity(0)
    entity.type = vs.MIRROR_ENTTYPE_DVPORT
    entity.set_entity("opaque")

    def look() -> None:
        for name, given, free in (
            ("VSDVS_GetDVMirrorSessions", (LAB, PORT), vs.VSDVS_FreeMemory),
            ("VSQEX_GetDVMirrorSessionIDs", (LAB,), vs.VSQEX_FreeMemory),
            ("VSQEX_GetPromiscSessionActiveDsts", (LAB,), vs.VSQEX_FreeMemory),
        ):
            status, found = call(name, *given)
            free(found)

    look()
    call("VSDVS_AppendDVMirrorSessions", LAB, PORT, table)
    look()
    stats = vs.VSDVMirrorSessionStats()
    for count in (1, 2):
        SIMHOST.simhost_set_counter(LAB.encode(), None, b"audit", b"mirroredPkts", count)
        call("VSQEX_GetDVMirrorSessionStats", LAB, "audit", stats, outputs=(stats,))
    call("VSDVS_RemoveDVMirrorSession", LAB, PORT, "audit")
    vs.VSDVS_AppendDVMirrorSessions(LAB, PORT, table)
    call("VSDVS_ClearDVMirrorSessions", LAB, PORT)
    vs.free_dvmirror_session_table(table)


def configure() -> None:
    names_and_switches()
    ports()
    uplinks()
    record_settings()
    vlans()
    sessions()
