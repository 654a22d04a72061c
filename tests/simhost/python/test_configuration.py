"""Configuring a switch through the module, in several processes and over a restart of the host."""

from typing import Callable

Run = Callable[[str], str]

CREATE = """
assert vs.VSDVS_CreateVSwitch("lab", "lab-id", "lab-ports", 0, 1, 0, 9000, 2) == vs.QEX_OK
assert vs.VSDVS_AddDVPort("lab", "desk", 7) == vs.QEX_OK
"""


def test_a_vlan_policy_comes_back_with_its_ranges(run: Run) -> None:
    run(CREATE)
    run(
        """
ranges = vs.new_vidrangeArray(2)
for index, (low, high) in enumerate([(1, 9), (20, 30)]):
    one = vs.new_qex_NEBPortVIDRange()
    vs.qex_NEBPortVIDRange_minVID_set(one, low)
    vs.qex_NEBPortVIDRange_maxVID_set(one, high)
    vs.vidrangeArray_setitem(ranges, index, one)
    vs.delete_qex_NEBPortVIDRange(one)
assert vs.VSDVS_SetPortVLANPolicy("lab", "desk", 5, 3, 1, 0, ranges, 2) == vs.QEX_OK
vs.delete_vidrangeArray(ranges)
"""
    )
    assert (
        run(
            """
status, policy, priority = vs.VSDVS_GetPortVLANPolicy("lab", "desk")
assert status == vs.QEX_OK
print(priority, vs.VSPortVlanPolicy_vlanID_get(policy), vs.VSPortVlanPolicy_numRanges_get(policy))
print(vs.VSPortVlanPolicy_flags_get(policy)
      == vs.VSPORT_VLAN_GUEST_TAGGING | vs.VSPORT_VLAN_SET_PRIORITY)
first = vs.VSPortVlanPolicy_get_vid_range(policy, 1)
print(vs.qex_NEBPortVIDRange_minVID_get(first), vs.qex_NEBPortVIDRange_maxVID_get(first))
vs.delete_qex_NEBPortVIDRange(first)
vs.VSDVS_FreeMemory(policy)
print(simhost.simhost_ledger_count())
"""
        )
        == "3 5 2\nTrue\n20 30\n0\n"
    )


def test_a_mirror_session_comes_back(run: Run) -> None:
    run(
        CREATE
        + """
table = vs.alloc_dvmirror_session_table(1, 1)
vs.DVMirrorSessionTable_version_set(table, vs.VS_DVMIRROR_VERSION_V3)
session = vs.DVMirrorSessionTable___getitem__(table, 0)
vs.DVMirrorSession_sid_set(session, "tap")
vs.DVMirrorSession_numDstEntities_set(session, 1)
entity = vs.DVMirrorSessionTable_get_first_session_entity(table, 0)
vs.DVMirrorEntity_type_set(entity, vs.MIRROR_ENTTYPE_DVPORT)
vs.DVMirrorEntity_set_entity(entity, "desk")
assert vs.VSDVS_AppendDVMirrorSessions("lab", "desk", table) == vs.QEX_OK
assert vs.VSDVS_AppendDVMirrorSessions("lab", "desk", table) == vs.QEX_EXISTS
vs.free_dvmirror_session_table(table)
"""
    )
    assert (
        run(
            """
status, table = vs.VSDVS_GetDVMirrorSessions("lab", "desk")
session = vs.DVMirrorSessionTable___getitem__(table, 0)
entity = vs.DVMirrorSessionTable_get_first_session_entity(
    table, vs.DVMirrorSession_startIdx_get(session))
print(status, vs.DVMirrorSession_sid_get(session), vs.DVMirrorEntity_get_entity(entity))
vs.VSDVS_FreeMemory(table)
"""
        )
        == "0 tap desk\n"
    )


def test_a_restart_keeps_configuration_and_policy(run: Run) -> None:
    run(
        CREATE
        + """
note = ctypes.create_string_buffer(b"note")
neb = ctypes.CDLL(os.path.join(os.environ["BUILD_DIR"], "simhost", "libnebPublic.so"))
for kind in ("CONFIG", "POLICY", "RUNTIME", "VOLATILE"):
    assert neb.DVSQEX_PortDataSet(
        b"lab-id", b"desk", b"com.example." + kind.encode(), note, 4,
        getattr(vs, kind + "_PROP_TYPE")) == vs.QEX_OK
assert vs.VSDVS_CreateVSwitch("fleeting", "f", None, 0, 0, 0, 0, 0) == vs.QEX_OK
assert vs.VSDVS_SetTxUplinkAlways("lab", "desk", 1) == vs.QEX_OK
print(vs.VSDVS_DvPortIDToPortID("lab", "desk"))
assert simhost.simhost_restart() == vs.QEX_OK
"""
    )
    assert (
        run(
            """
neb = ctypes.CDLL(os.path.join(os.environ["BUILD_DIR"], "simhost", "libnebPublic.so"))
for kind in ("CONFIG", "POLICY", "RUNTIME", "VOLATILE"):
    data, length = ctypes.c_void_p(), ctypes.c_int()
    status = neb.DVSQEX_PortDataGet(
        b"lab-id", b"desk", b"com.example." + kind.encode(),
        ctypes.byref(data), ctypes.byref(length))
    print(kind, "there" if status == vs.QEX_OK else "gone")
    if status == vs.QEX_OK:
        assert ctypes.string_at(data, length.value) == b"note"
        neb.DVSQEX_DataFree(data)
print(vs.VSDVS_GetTxUplinkAlways("lab", "desk"))
print(vs.VSDVS_DestroyVSwitch("fleeting") == vs.QEX_NOT_FOUND)
print(ord(vs.DVPortExist("lab-id", "desk")))
"""
        )
        == "CONFIG there\nPOLICY there\nRUNTIME gone\nVOLATILE gone\n[0, 1]\nTrue\n1\n"
    )


def test_a_handle_that_nobody_gave_raises(run: Run) -> None:
    assert (
        run(
            """
info = vs.new_VSInfo()
try:
    vs.DVS_SwitchName(info)
except RuntimeError as error:
    print(str(error).rsplit(" ", 1)[0])
print(vs.DVS_SwitchName(None))
vs.delete_VSInfo(info)
"""
        )
        == "DVS_SwitchName: the host never gave out the switch handle\nNone\n"
    )
