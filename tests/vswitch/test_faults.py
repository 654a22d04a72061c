"""A plan on a host that fails: at each call of an apply in turn, once or from then on, with a
status or a trap. The host is as before, as wanted, or what differs is named, byte for byte."""

import copy
from typing import Any, Dict, Iterator, List, Optional, Set, Tuple

import pytest
import simhost
from conftest import LAB
from test_transaction import everything
from vswitch import Host, HostError, NotRestored, Plan, RolledBack, _table

# How often each call is made by an apply that goes well, is asked of the host itself.
CHANGE: Dict[str, Any] = {
    "options": {"IGMPVersion": 1},
    "mac_learning": {"aging_time": 70, "limit": 1000, "learn_static": True},
    "switches": [
        {
            "alias": "lab",
            "mtu": 1400,
            "multicast": "absent",
            "uplinks": ["nic2"],
            "properties": {"com.example.note": {"type": "runtime", "hex": "0102"}},
            "ports": [
                {
                    "id": "desk-1",
                    "vlan": {"id": 9, "trunk": ["20-30"]},
                    "uplink": "absent",
                    "mac_learning": {"learning": True},
                    "mirrors": [],
                    "macs": [{"mac": "02:00:00:00:00:0a", "type": "static"}],
                },
                {"id": "desk-3", "vlan": "absent"},
                {"id": "new", "vlan": {"id": 3, "priority": 1}, "forbids": ["mac_changes"]},
                {"id": "desk-4", "state": "absent"},
            ],
        },
    ],
}
# These have no status to return, and no trap reaches who asks for their words.
NO_STATUS = ("DVSState_", "DVS_", "DVSData_", "VSDVS_FreeMemory", "VSQEX_FreeMemory", "DVPortExist")
NEVER = 2**31 - 1


def fresh(host: simhost.Host) -> Dict[str, Any]:
    host.clear_faults()
    host.reset()
    host.clock.stop()
    host.clock.set(1000)
    document = copy.deepcopy(LAB)
    host.apply(document)
    return everything(host)


def calls_of(host: simhost.Host, plan: Plan) -> Dict[str, int]:
    """How often an apply makes each call."""
    for name in names():
        host.fault(name, nth=NEVER, panic=(OSError, "never"))
    plan.apply()
    faults = host.describe()["faults"]
    return {one["call"]: one["observed"]["calls"] for one in faults if one["observed"]["calls"]}


def names() -> List[str]:
    import functions

    untrapped = {"Panic", "QEX_ReturnStatusToString"}
    return [
        one.name for one in functions.read() if one.kind == "call" and one.name not in untrapped
    ]


def outcome(host: simhost.Host, plan: Plan, fault: Dict[str, Any]) -> Optional[HostError]:
    host.fault(**fault)
    try:
        plan.apply()
    except HostError as error:
        # The words of an error ask the host, which fails for now.
        str(error)
        return error
    finally:
        host.clear_faults()
    return None


def items(described: Dict[str, Any], place: Any) -> Any:
    """What somebody has set there, None for what is not there."""
    held = described["bytes"].get(place)
    return held and [one for one in held if one.name not in _table.COMPUTED]


def differences(before: Dict[str, Any], now: Dict[str, Any]) -> Iterator[Tuple[str, ...]]:
    """What is not as it was: how it may be named."""
    for place in {*before["bytes"], *now["bytes"]}:
        if items(before, place) != items(now, place):
            alias, where = place
            path = f"{alias}/{where}" if where else alias
            clients = ("desk-1", "desk-2", "desk-3", "desk-4", "new", "", "host")
            whole = (path, f"{alias}: it was removed", f"{alias} (nobody knows")
            yield whole if where in clients else (*whole, f"{alias}: uplink ports")
    for key, name in (("runtime_options", "options"), ("mac_learning", "mac_learning")):
        if before[key] != now[key]:
            yield (name,)


def check(before: Dict[str, Any], wanted: Dict[str, Any], now: Dict[str, Any], error: Any) -> None:
    if error is None:
        assert now["bytes"] == wanted["bytes"]
        assert now["runtime_options"] == wanted["runtime_options"]
    elif isinstance(error, NotRestored):
        assert error.left
        for paths in differences(before, now):
            assert any(line.startswith(paths) for line in error.left), (paths, error.left)
    else:
        assert now == before, str(error)


def is_of_change(name: str) -> bool:
    return any(word in name for word in ("Set", "Add", "Remove", "Clear", "Destroy"))


def faults_of(name: str, count: int) -> Iterator[Dict[str, Any]]:
    """Each call in turn: of a change in every way, of a question in one way after the other."""
    trap: Dict[str, Any] = {"panic": (OSError, "the device is gone")}
    refusal = trap if name.startswith(NO_STATUS) else {"status": "QEX_BUSY"}
    ways: List[Dict[str, Any]] = [
        {**how, "times": times} for times in (1, 0) for how in (trap, refusal)
    ]
    # An item is copied by three calls, hundreds of times.
    step = 13 if name.startswith("DVSData_") else 1
    for at, nth in enumerate(range(1, count + 1, step)):
        of_change = is_of_change(name)
        for way in ways if of_change else [ways[at % len(ways)]]:
            yield {"call": name, "nth": nth, **way}


@pytest.mark.leaves_host_memory("of a deallocator that traps nobody knows what it did")
def test_each_call_of_an_apply_in_turn(host: simhost.Host, objects: Host) -> None:
    fresh(host)
    calls = calls_of(host, objects.plan(CHANGE))
    wanted = everything(host)
    seen: Set[Any] = set()
    assert len(calls) > 40
    for name, count in calls.items():
        for fault in faults_of(name, count):
            before = fresh(host)
            error = outcome(host, objects.plan(CHANGE), fault)
            check(before, wanted, everything(host), error)
            seen.add(type(error))
            if error is None or type(error) is RolledBack:
                objects.plan(CHANGE).apply()
                assert objects.plan(CHANGE).changes == ()
    assert {RolledBack, NotRestored} <= seen


@pytest.mark.leaves_host_memory("of a deallocator that traps nobody knows what it did")
def test_each_change_of_a_restore_in_turn(host: simhost.Host, objects: Host) -> None:
    """An uplink has moved to a switch that goes again, and comes back to its port."""

    def changed() -> Plan:
        fresh(host)
        document = objects.state()
        objects.switches["vswitch0"].uplinks["nic5"].remove()
        objects.add_switch("new", uplinks=["nic5"]).add_port("a")
        objects.options["IGMPVersion"] = 3
        lab = objects.switches["lab"]
        del lab.teaming
        lab.add_port("new")
        lab.ports["desk-3"].vlan = 9
        return objects.plan(document, whole=True)

    calls = calls_of(host, changed())
    wanted = everything(host)
    faults = [
        fault
        for name, count in calls.items()
        if is_of_change(name)
        for fault in faults_of(name, count)
    ]
    assert len(faults) > 20
    for fault in faults:
        plan = changed()
        before = everything(host)
        error = outcome(host, plan, fault)
        assert error is not None, fault
        check(before, wanted, everything(host), error)
        plan.apply()
        assert plan.changes == ()
