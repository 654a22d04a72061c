"""Every checked call over the simulated host: what it returns, raises, releases and asks for."""

import gc
import pickle
import re
import signal
import subprocess
import sys
import threading
from types import FrameType
from typing import Any, Callable, List, Optional, Type, Union

import functions
import libvswitch as vs
import pytest
from checked_calls import CASES, CONFIG, ID, KEY, PORT, SWITCH, note, number
from libvswitch import _checking, checked, errors
from libvswitch.enums import LinkState, MacType, Multicast, Status
from simhost import Host

NAMES = sorted({one.name for one in functions.read() if one.kind == "call"})
# The host has no command, which only a refusal can show.
REFUSED_ALONE = {"DVSQEX_CmdExec"}
UNTRAPPED = {"Panic", "QEX_ReturnStatusToString"}
DEALLOCATORS = {"VSDVS_FreeMemory", "VSQEX_FreeMemory", "DVSQEX_DataFree", "DVSData_Free"}
# What a copy of an item returns by itself.
OF_ITEMS = {"DVSData_Name", "DVSData_Data", "DVSData_PropType"}
WITH_STATUS = sorted(
    {one.name for one in functions.read() if one.kind == "call" and "status" in one.result}
    or {name for name in NAMES if name.startswith(("VSDVS_", "VSQEX_", "DVSQEX_"))} - DEALLOCATORS
)
TRAPPED = sorted(set(NAMES) - REFUSED_ALONE - UNTRAPPED - OF_ITEMS)


def outstanding(host: Host) -> List[str]:
    gc.collect()
    return [block.call for block in host.ledger()]


def test_there_is_a_case_for_every_call() -> None:
    assert len(NAMES) == 146
    assert {*CASES, *REFUSED_ALONE} == set(NAMES)
    assert set(NAMES) <= set(checked.__all__)


@pytest.mark.parametrize("name", CASES)
def test_what_a_call_returns(host: Host, name: str) -> None:
    found, expected = CASES[name]()
    if callable(expected):
        assert expected(found), found
    else:
        assert found == expected and type(found) is type(expected)
    del found
    assert outstanding(host) == []


@pytest.mark.parametrize("name", TRAPPED)
@pytest.mark.leaves_host_memory("of a deallocator that traps nobody knows what it did")
def test_a_trap_is_raised_with_its_cause(host: Host, name: str) -> None:
    host.fault(name, times=0, panic=(OSError, "the device is gone"))
    with pytest.raises(errors.Trapped) as raised:
        CASES[name]()
    assert isinstance(raised.value.__cause__, OSError)
    assert raised.value.call == name and raised.value.status is None
    assert str(raised.value).endswith(": the call trapped: the device is gone")
    host.clear_faults()
    del raised
    if name not in DEALLOCATORS:
        assert outstanding(host) == []


@pytest.mark.parametrize("name", sorted(OF_ITEMS))
def test_what_asks_an_item_of_the_flat_module(host: Host, name: str) -> None:
    note()
    item = vs.Cell("DVSDataItem")
    assert vs.DVSState_GlobalPropLookup(ID, KEY, item.pointer) == vs.QEX_OK
    call: Callable[[Any], Any] = getattr(checked, name)
    assert call(item.value) == CASES[name]().expected
    host.fault(name, panic=(ValueError, "no such item"))
    with pytest.raises(errors.Trapped, match="no such item"):
        call(item.value)


def test_a_walk_that_traps_in_the_middle(host: Host) -> None:
    handle = checked.DVSState_SwitchFindByAlias(SWITCH)
    assert handle is not None
    host.fault("DVSData_Name", nth=2, panic=(OSError, "gone"))
    with pytest.raises(errors.Trapped, match="gone"):
        checked.DVSState_GlobalPropForEach(handle)


@pytest.mark.parametrize("name", sorted(set(WITH_STATUS) & set(CASES)))
def test_each_status_has_its_exception(host: Host, name: str) -> None:
    others = {"QEX_FAILURE": errors.HostError, "QEX_IO_ERROR": errors.HostError}
    for status, kind in {**errors.STATUSES, **others}.items():
        host.fault(name, times=0, status=getattr(vs, status))
        with pytest.raises(errors.HostError) as raised:
            CASES[name]()
        assert type(raised.value) is kind
        assert raised.value.call == name and str(raised.value.status) == status
        assert isinstance(raised.value.status, Status)
        del raised
        assert outstanding(host) == []
        host.reset()


# What the host itself refuses, and in which words.
REFUSED = [
    (errors.NotFound, lambda: checked.VSDVS_GetMTU("lab"), "no switch 'lab' (there are vswitch0)"),
    (
        errors.NotFound,
        lambda: checked.VSDVS_GetPortSecurity(SWITCH, "nope"),
        "no port 'nope' of switch 'vswitch0' (it has db-1, web-1, web-2)",
    ),
    (
        errors.NotFound,
        lambda: checked.DVSQEX_SwitchRemove("no-id"),
        f"no switch with the identifier 'no-id' (there are {ID})",
    ),
    (
        errors.NotFound,
        lambda: checked.VSDVS_GetAliasFromPortset("none"),
        "no switch with the ports 'none' (there are vswitch0-ports)",
    ),
    (
        errors.NotFound,
        lambda: checked.VSQEX_GetUplinkLinkState(SWITCH, "nic9"),
        "no uplink 'nic9' of switch 'vswitch0' (it has nic4, nic5)",
    ),
    (
        errors.NotFound,
        lambda: checked.VSDVS_RemoveDVMirrorSession(SWITCH, PORT, "audit"),
        "no mirror session 'audit' of port 'web-1' of switch 'vswitch0' (it has none)",
    ),
    (
        errors.NotFound,
        lambda: checked.DVSQEX_GlobalPropGet(ID, KEY),
        "no property 'com.example.key' is set of switch 'vswitch0'",
    ),
    (
        errors.NotFound,
        lambda: checked.DVSQEX_PortDataGet(ID, PORT, KEY),
        "no property 'com.example.key' is set of port 'web-1' of switch 'vswitch0'",
    ),
    (
        errors.NotFound,
        lambda: checked.DVSQEX_PortGetByExternalId(ID, "theirs"),
        "no port of switch 'vswitch0' is called 'theirs' by another system",
    ),
    (
        errors.NotFound,
        lambda: checked.VSQEX_PortGetTeamUplinkHint(4711),
        "no port has the number 4711",
    ),
    (
        errors.NotFound,
        lambda: checked.VSQEX_GetMcastFilters(SWITCH, 4711, Multicast.IGMP),
        "no port of switch 'vswitch0' has the number 4711",
    ),
    (
        errors.Exists,
        lambda: checked.VSDVS_AddDVPort(SWITCH, PORT, connectId=0),
        "VSDVS_AddDVPort(switchName='vswitch0', port='web-1', connectId=0):"
        " QEX_EXISTS if `port` is taken",
    ),
    (
        errors.Busy,
        lambda: checked.VSDVS_RemoveDVPort(SWITCH, "uplink1"),
        "VSDVS_RemoveDVPort(switchName='vswitch0', port='uplink1'):"
        " QEX_BUSY for an uplink port with its uplink",
    ),
    (
        errors.BadParameter,
        lambda: checked.VSDVS_SetMTU(SWITCH, 1),
        "VSDVS_SetMTU(switchName='vswitch0', mtu=1): QEX_BAD_PARAM for an MTU out of its bounds",
    ),
    (
        errors.LimitExceeded,
        lambda: checked.DVSQEX_SwitchSetMaxPorts(ID, 1),
        f"DVSQEX_SwitchSetMaxPorts(switchId='{ID}', maxPorts=1):"
        " QEX_LIMIT_EXCEEDED if it has more",
    ),
    (
        errors.NotSupported,
        lambda: checked.DVSQEX_CmdExec(ID, "reboot", b"now"),
        f"DVSQEX_CmdExec(switchId='{ID}', command='reboot', input=b'now'):"
        " QEX_NOT_SUPPORTED for a command that it does not have",
    ),
    (
        errors.NotFound,
        lambda: _stopped(lambda: checked.VSQEX_GetUplinks(SWITCH)),
        "switch 'vswitch0' does not run on this host",
    ),
    (
        errors.NotFound,
        lambda: _stopped(lambda: checked.DVSQEX_PortDataGet(ID, PORT, KEY)),
        "no property 'com.example.key' is set of port 'web-1' of switch 'vswitch0'",
    ),
    (
        errors.NoUplink,
        lambda: _without_links(),
        "QEX_ENETDOWN if no link of the team is usable",
    ),
]


def _without_links() -> object:
    for name in ("nic4", "nic5"):
        checked.VSQEX_SetUplinkAdminLinkState(SWITCH, name, checked.LinkState.DOWN)
    return checked.VSQEX_PortGetTeamUplinkHint(number())


def _stopped(act: Callable[[], object]) -> object:
    checked.DVSQEX_SwitchDissociate(ID)
    return act()


@pytest.mark.parametrize("kind, act, words", REFUSED, ids=[one[2][:40] for one in REFUSED])
def test_what_a_refusal_says(
    host: Host, kind: Type[errors.HostError], act: Callable[[], object], words: str
) -> None:
    with pytest.raises(errors.HostError) as raised:
        act()
    assert type(raised.value) is kind
    assert str(raised.value).endswith(words) and raised.value.what == str(raised.value)
    assert outstanding(host) == []


@pytest.mark.scenario({"uplinks": [{"name": "nic0"}]})
def test_an_uplink_at_no_port(host: Host) -> None:
    with pytest.raises(errors.Disconnected):
        checked.VSQEX_GetUplinkDVPortID("nic0")


@pytest.mark.scenario({})
def test_there_is_nothing_instead(host: Host) -> None:
    with pytest.raises(errors.NotFound, match=r"^no switch 'lab' \(there are none\)$"):
        checked.VSDVS_GetMTU("lab")


def test_names_that_are_many_are_cut_short(host: Host) -> None:
    for at in range(12):
        checked.VSDVS_AddDVPort(SWITCH, f"a-{at:02}", 0)
    with pytest.raises(errors.NotFound, match=r"a-00, .*, a-11 and 3 more\)$"):
        checked.VSDVS_GetPortSecurity(SWITCH, "nope")


def test_an_error_is_also_what_python_calls_it() -> None:
    assert issubclass(errors.NotFound, KeyError) and issubclass(errors.BadParameter, ValueError)
    assert issubclass(errors.NotRestored, errors.RolledBack)
    assert all(issubclass(getattr(errors, name), errors.HostError) for name in errors.__all__)
    left = errors.NotRestored("the host went away", left=["lab.mtu"])
    assert str(left) == "the host went away" and left.left == ("lab.mtu",)
    assert left.status is None and left.arguments == {} and left.call == ""


def test_an_error_goes_into_another_process(host: Host) -> None:
    with pytest.raises(errors.HostError) as raised:
        checked.VSDVS_SetTeamingPolicy("lab", vs.VSTeamPolicy())
    other = pickle.loads(pickle.dumps(raised.value))
    assert type(other) is errors.NotFound and str(other) == str(raised.value)
    assert other.status is Status.NOT_FOUND and other.call == "VSDVS_SetTeamingPolicy"
    assert other.arguments["switchName"] == "lab"
    assert str(other.arguments["policy"]).startswith("VSTeamPolicy(")


def test_the_words_of_an_error_do_not_fail_with_the_host(host: Host) -> None:
    with pytest.raises(errors.NotFound) as raised:
        checked.VSDVS_GetMTU("lab")
    host.fault("DVSState_SwitchForEach", panic=(OSError, "gone"))
    assert str(raised.value) == "VSDVS_GetMTU(switchName='lab'): QEX_NOT_FOUND, Not found"


# What is refused before the host is asked.
untyped: Any = checked  # which a type checker would refuse first
WRONG: List[Any] = [
    (TypeError, lambda: untyped.VSDVS_GetMTU(None)),
    (TypeError, lambda: untyped.VSDVS_GetMTU(7)),
    (TypeError, lambda: untyped.VSDVS_GetMTU(["vswitch0"])),
    (ValueError, lambda: untyped.VSDVS_GetMTU("vswitch0\0")),
    (ValueError, lambda: untyped.VSDVS_CreateVSwitch("a", "b\0", None, 0, True, 0, 0, 0)),
    (TypeError, lambda: untyped.VSDVS_GetMTU("\ud800")),
    (TypeError, lambda: untyped.VSDVS_SetMTU(SWITCH, "9000")),
    (OverflowError, lambda: untyped.VSDVS_SetMTU(SWITCH, 2**32)),
    (TypeError, lambda: untyped.VSDVS_SetTxUplinkAlways(SWITCH, PORT, "no")),
    (TypeError, lambda: untyped.VSDVS_SetTxUplinkAlways(SWITCH, PORT, 2)),
    (
        OverflowError,
        lambda: untyped.VSDVS_SetPortVLANPolicy(SWITCH, PORT, 1, 2**64, False, False),
    ),
    (TypeError, lambda: untyped.VSDVS_SetPortVLANPolicy(SWITCH, PORT, 1, 0.5, False, False)),
    (OverflowError, lambda: untyped.VSDVS_SetMcastFilterMode(SWITCH, 2**70)),
    (TypeError, lambda: untyped.VSDVS_SetTeamingPolicy(SWITCH, None)),
    (TypeError, lambda: untyped.VSDVS_SetTeamingPolicy(SWITCH, vs.VSMACLearning())),
    (TypeError, lambda: untyped.VSDVS_SetSwitchUplinkPorts(SWITCH, "Left", ["uplink1"])),
    (ValueError, lambda: untyped.VSDVS_SetSwitchUplinkPorts(SWITCH, ["a\0"], ["uplink1"])),
    (TypeError, lambda: untyped.VSDVS_SetPrivateVLANMap(SWITCH, [1])),
    (TypeError, lambda: untyped.VSDVS_SetPrivateVLANMap(SWITCH, None)),
    (TypeError, lambda: untyped.VSDVS_AppendDVMirrorSessions(SWITCH, PORT, ["audit"])),
    (TypeError, lambda: untyped.VSQEX_SetRuntimeOptions([(1, 2)])),
    (OverflowError, lambda: untyped.VSQEX_SetRuntimeOptions([untyped.VSRuntimeOption(1, -1)])),
    (OverflowError, lambda: untyped.VSQEX_GetRuntimeOptions([2**16])),
    (TypeError, lambda: untyped.VSQEX_GetRuntimeOptions(["IGMPVersion"])),
    (TypeError, lambda: untyped.DVSQEX_GlobalPropSet(ID, KEY, "text", CONFIG)),
    (TypeError, lambda: untyped.VSQEX_SetPortMACTable(SWITCH, PORT, None)),
    (TypeError, lambda: untyped.DVS_SwitchName(None)),
    (TypeError, lambda: untyped.DVS_PortId(untyped.DVSState_SwitchFindByAlias(SWITCH))),
    (TypeError, lambda: untyped.DVSData_Update(None, "a", b"", CONFIG)),
    (ValueError, lambda: untyped.VSQEX_GetMcastFilterStats(SWITCH, 1, Multicast.IGMP, "::1")),
    (ValueError, lambda: untyped.VSQEX_GetMcastFilterStats(SWITCH, 1, Multicast.MLD, b"1234")),
    (ValueError, lambda: untyped.VSQEX_GetMcastFilterStats(SWITCH, 1, Multicast.LEGACY, "1.2.3.4")),
]


@pytest.mark.parametrize("kind, act", WRONG)
def test_what_is_refused_before_the_host_is_asked(
    host: Host, kind: Type[Exception], act: Callable[[], object]
) -> None:
    host.clock.stop()
    before = host.describe()
    with pytest.raises(kind) as raised:
        act()
    assert not isinstance(raised.value, errors.HostError)
    assert host.describe() == before


ENTITIES = [
    (vs.MIRROR_ENTTYPE_VLAN, "seven", ValueError),
    (vs.MIRROR_ENTTYPE_VLAN, "65536", OverflowError),
    (vs.MIRROR_ENTTYPE_PORT, "-1", OverflowError),
    (vs.MIRROR_ENTTYPE_IP, "192.0.2", ValueError),
    (vs.MIRROR_ENTTYPE_DVPORT, "x" * 48, ValueError),
    (vs.MIRROR_ENTTYPE_UPLINK, "x" * 32, ValueError),
    (9, "web-1", ValueError),
]


@pytest.mark.parametrize("type_, entity, kind", ENTITIES)
def test_an_entity_that_would_be_another(
    host: Host, type_: int, entity: str, kind: Type[Exception]
) -> None:
    """The method of the record reads what it can, and leaves the rest as it was."""
    session = checked.DVMirrorSession("s", dstEntities=(checked.DVMirrorEntity(type_, entity),))
    with pytest.raises(kind):
        checked.VSDVS_AppendDVMirrorSessions(SWITCH, PORT, [session])
    assert checked.VSDVS_GetDVMirrorSessions(SWITCH, PORT) == ()


def test_entities_of_every_kind_come_back(host: Host) -> None:
    given = [(0, "web-2"), (1, "nic4"), (2, "4094"), (3, "192.0.2.7"), (3, "fe80::1"), (4, "7")]
    entities = tuple(checked.DVMirrorEntity(*one) for one in given)
    sessions = (
        checked.DVMirrorSession("one", dstEntities=entities[:1], srcInEntities=entities),
        checked.DVMirrorSession(
            "two", srcOutEntities=entities[::-1], stack=True, greKey=2**32 - 1
        ),
    )
    checked.VSDVS_AppendDVMirrorSessions(SWITCH, PORT, sessions)
    assert checked.VSDVS_GetDVMirrorSessions(SWITCH, PORT) == sessions


LAGS = [
    {"name": "east", "uplinks": ["nic0", "nic1", "nic2"]},
    {"name": "empty", "uplinks": []},
    {"name": "west", "uplinks": ["nic3"]},
]


def test_groups_of_links_have_their_uplinks(host: Host) -> None:
    uplinks = [f"nic{number}" for number in range(4)]
    host.apply({"switches": [{"alias": "lab", "uplinks": uplinks, "lags": LAGS}]})
    host.link("nic1").down()
    host.link("nic3").down()
    table = checked.VSQEX_GetLAGTable("lab")
    ids = [group.id for group in table]
    assert len(set(ids)) == len(ids)
    down, up = LinkState.DOWN, LinkState.UP
    assert table == checked.VSLAGTable(
        (
            checked.VSLAGStatus(up, ids[0], "east", 0b101, ("nic0", "nic1", "nic2")),
            checked.VSLAGStatus(down, ids[1], "empty", 0, ()),
            checked.VSLAGStatus(down, ids[2], "west", 0, ("nic3",)),
        )
    )
    assert all(isinstance(group.state, LinkState) for group in table)
    assert outstanding(host) == []


@pytest.mark.parametrize("count", ["VSLAGTable_numLAGs_get", "VSLAGStatus_numUplinks_get"])
def test_groups_of_links_that_there_cannot_be(
    host: Host, monkeypatch: pytest.MonkeyPatch, count: str
) -> None:
    def many(record: object) -> int:
        return 33

    host.apply({"switches": [{"alias": "lab", "uplinks": ["nic3"], "lags": LAGS[2:]}]})
    monkeypatch.setattr("_libvswitch." + count, many)
    with pytest.raises(ValueError, match="says 33 of at most 32"):
        checked.VSQEX_GetLAGTable("lab")
    assert outstanding(host) == []


def test_sessions_without_entities(host: Host) -> None:
    sessions = (checked.DVMirrorSession("one"), checked.DVMirrorSession("two"))
    checked.VSDVS_AppendDVMirrorSessions(SWITCH, PORT, sessions)
    assert checked.VSDVS_GetDVMirrorSessions(SWITCH, PORT) == sessions
    checked.VSDVS_AppendDVMirrorSessions(SWITCH, PORT, [])
    assert checked.VSDVS_GetDVMirrorSessions(SWITCH, "web-2") == ()


# Memory

INTERRUPTED = sorted(set(NAMES) - REFUSED_ALONE)


class Interrupted(BaseException):
    """Something that is no error, such as a signal."""


def test_what_a_reader_raises_releases_what_it_read(
    host: Host, monkeypatch: pytest.MonkeyPatch
) -> None:
    made = _checking.read_and_release
    reached: List[str] = []

    def read(call: Any, arguments: Any, _: Any, *rest: Any) -> Any:
        def interrupted(*outputs: Any) -> None:
            reached.append(call.__name__)
            raise Interrupted

        return made(call, arguments, interrupted if call.__name__ == name else _, *rest)

    for name in INTERRUPTED:
        host.reset()
        monkeypatch.setattr(checked, "_read_and_release", read)
        try:
            CASES[name]()
        except Interrupted:
            pass
        monkeypatch.setattr(checked, "_read_and_release", made)
        assert outstanding(host) == [], name
    # Every call that allocates but the one that is always refused.
    assert len({*reached}) == 30


def test_a_signal_at_any_time_leaves_nothing(host: Host) -> None:
    def stop(number: int, frame: Optional[FrameType]) -> None:
        raise Interrupted

    before = signal.signal(signal.SIGALRM, stop)
    interrupted = 0
    try:
        for at in range(300):
            try:
                signal.setitimer(signal.ITIMER_REAL, 0.0002 + at * 0.000001)
                while True:
                    checked.VSQEX_GetUplinks(SWITCH)
                    checked.VSDVS_GetSwitchUplinkPorts(SWITCH)
                    checked.DVSQEX_GlobalPropGet(ID, vs.VSPROP_MTU)
            except Interrupted:
                interrupted += 1
    finally:
        signal.setitimer(signal.ITIMER_REAL, 0)
        signal.signal(signal.SIGALRM, before)
    assert interrupted == 300
    assert outstanding(host) == []


@pytest.mark.leaves_host_memory("the first of two deallocations traps")
def test_what_one_deallocation_refuses_does_not_keep_the_other(host: Host) -> None:
    host.fault("VSDVS_FreeMemory", nth=1, panic=(OSError, "gone"))
    with pytest.raises(errors.Trapped, match="gone"):
        checked.VSDVS_GetSwitchUplinkPorts(SWITCH)
    assert outstanding(host) == ["VSDVS_GetSwitchUplinkPorts"]


def test_lists_end_once(host: Host) -> None:
    with checked.DVSData_Alloc() as made:
        checked.DVSData_Update(made, "one", b"1", CONFIG)
        assert outstanding(host) != []
    assert outstanding(host) == []
    made.end()
    checked.DVSData_Free(made)
    with pytest.raises(ValueError, match="has ended"):
        checked.DVSData_Update(made, "one", b"1", CONFIG)
    collected = checked.DVSData_Alloc()
    del collected
    assert outstanding(host) == []
    assert repr(made) == "<DVSDataHandle that has ended>"


def test_a_list_with_an_allocator_of_its_own(host: Host) -> None:
    """What it allocates is released to it, and the host's ledger never hears of that."""
    import ctypes

    from libvswitch import _pointers

    libc, freed = ctypes.CDLL(None), []
    libc.malloc.restype = ctypes.c_void_p
    allocate = ctypes.CFUNCTYPE(ctypes.c_void_p, ctypes.c_size_t)(
        lambda size: libc.malloc(ctypes.c_size_t(size))
    )

    def free(address: int) -> None:
        freed.append(address)
        libc.free(ctypes.c_void_p(address))

    release = ctypes.CFUNCTYPE(None, ctypes.c_void_p)(free)
    pointers = [
        _pointers.pointer_object(ctypes.cast(one, ctypes.c_void_p).value or 0, spelling)
        for one, spelling in ((allocate, "DVSData_MemAlloc"), (release, "DVSData_MemFree"))
    ]
    with checked.DVSData_Alloc(*pointers) as made:
        checked.DVSData_Update(made, "one", b"1", CONFIG)
        held = len(freed)
        assert checked.DVSData_Serialize(made, 200).startswith(b"NEBS")
        assert len(freed) == held + 1
    assert outstanding(host) == []


def test_a_reset_ends_handles(host: Host) -> None:
    handle = checked.DVSState_SwitchFindByAlias(SWITCH)
    assert handle is not None and handle in [*checked.DVSState_SwitchForEach()]
    assert len({handle, *checked.DVSState_SwitchForEach()}) == 1
    checked.DVSState_ConfigReset()
    with pytest.raises(ValueError, match="this DVSwitchHandle is gone: the state was reset"):
        checked.DVS_SwitchName(handle)


def test_threads(host: Host) -> None:
    failed: List[BaseException] = []

    def work(name: str) -> None:
        try:
            for at in range(50):
                checked.VSDVS_CreateVSwitch(name, None, None, 8, True, 0, 1280 + at, 0)
                assert checked.VSDVS_GetMTU(name) == 1280 + at
                assert checked.VSQEX_GetUplinks(name).entries == ()
                with pytest.raises(errors.NotFound):
                    checked.VSDVS_GetPortSecurity(name, "none")
                checked.VSDVS_DestroyVSwitch(name)
        except BaseException as raised:
            failed.append(raised)

    threads = [threading.Thread(target=work, args=(f"lab-{at}",)) for at in range(4)]
    for one in threads:
        one.start()
    for one in threads:
        one.join()
    assert failed == []
    assert outstanding(host) == []


# Values


def test_values_are_frozen_and_equal_by_what_they_hold(host: Host) -> None:
    one, other = (checked.VSQEX_GetTeamMACTable(SWITCH, MacType.ALL) for _ in range(2))
    host.clock.stop()
    assert one.macEntries[0].macAddress == other[0].macAddress
    assert hash(checked.VSMACEntry("a")) == hash(checked.VSMACEntry("a"))
    with pytest.raises(AttributeError):
        one.totalEntries = 9  # type: ignore[misc]
    assert [*one] == [*one.macEntries] and one[0:1] == one.macEntries[0:1] and len(one) == 2


def test_options_have_names(host: Host) -> None:
    found = {one.name: one.value for one in checked.VSQEX_GetRuntimeOptions()}
    assert len(found) == vs.VS_NUM_RT_OPT
    assert (found["IGMPVersion"], found["MLDRouterIP"]) == (3, "::")
    assert checked.VSRuntimeOption(99, 1).name == "99"


def test_groups_of_every_form(host: Host) -> None:
    web_2 = number("web-2")
    assert checked.VSQEX_GetMcastFilters(SWITCH, web_2, Multicast.MLD).entries == ("ff02::fb",)
    legacy = checked.VSQEX_GetMcastFilters(SWITCH, number(), Multicast.LEGACY)
    assert legacy.entries == ("01:00:5e:01:01:01",)
    groups: List[Union[str, bytes]] = [legacy.entries[0], bytes.fromhex("01005e010101")]
    for group in groups:
        stats = checked.VSQEX_GetMcastFilterStats(SWITCH, number(), Multicast.LEGACY, group)
        assert stats.entries == ()
    stats = checked.VSQEX_GetMcastFilterStats(SWITCH, web_2, Multicast.MLD, "ff02::fb")
    assert stats.version == 2


@pytest.mark.parametrize(
    "mode, address, size",
    [
        (Multicast.LEGACY, "01:00:5e:01:01", 6),
        (Multicast.LEGACY, "somewhere", 6),
        (Multicast.IGMP, "ff02::fb", 4),
        (Multicast.IGMP, "224.0.0.1\0", 4),
        (Multicast.MLD, "224.0.0.1", 16),
        (Multicast.MLD, bytes(4), 16),
    ],
)
def test_a_group_that_is_no_address_of_its_form(
    host: Host, mode: Multicast, address: Union[str, bytes], size: int
) -> None:
    message = f"group is an address of {size} bytes for this mode, not {address!r}"
    with pytest.raises(ValueError, match=f"^{re.escape(message)}$"):
        checked.VSQEX_GetMcastFilterStats(SWITCH, number(), mode, address)


def test_what_few_programs_need_is_imported_late() -> None:
    program = "import sys, libvswitch.checked; print({'socket', 'inspect'} & {*sys.modules})"
    assert subprocess.check_output([sys.executable, "-c", program], text=True) == "set()\n"
