"""examples/change_vlan.py: whatever goes wrong, the port has its old VLANs, or the tool says so."""

import sys
from typing import Any, Callable, List

import pytest
from programs import EXAMPLES
from simhost import SharedHost

PORT = ["vswitch0", "web-1"]
GET = "VSDVS_GetPortVLANPolicy('vswitch0', 'web-1')"
SET = "VSDVS_SetPortVLANPolicy('vswitch0', 'web-1')"

# Runs the tool while another hand sets the port's VLAN to 99 before each read-back.
MEDDLE = """
import os, runpy, sys
import libvswitch as vs

read, reads = vs.VSDVS_GetPortVLANPolicy, 0

def meddle(switch, port):
    global reads
    reads += 1
    if reads in {when!r}:
        assert vs.VSDVS_SetPortVLANPolicy(switch, port, 99, -1, 0, 0, None, 0) == vs.QEX_OK
    return read(switch, port)

vs.VSDVS_GetPortVLANPolicy = meddle
sys.argv = {words!r}
sys.path.insert(0, os.path.dirname(sys.argv[0]))
runpy.run_path(sys.argv[0], run_name="__main__")
"""


@pytest.fixture
def vlans(shared_host: SharedHost) -> Callable[[], List[int]]:
    """The VLAN, the priority and the ends of the ranges that the port has."""
    code = """
import libvswitch as vs
with vs.owned(vs.VSDVS_GetPortVLANPolicy("vswitch0", "web-1")) as (status, policy, priority):
    print(policy.vlanID, priority)
    for one in policy.vidRanges:
        print(one.minVID, one.maxVID)
"""

    def read() -> List[int]:
        return [int(word) for word in shared_host.run([sys.executable, "-c", code]).stdout.split()]

    return read


def test_a_change(example: Callable[..., Any], vlans: Callable[[], List[int]]) -> None:
    said = ["web-1 of vswitch0: VLAN 0 -> VLAN 100"]
    assert example("change_vlan", *PORT, "100") == (0, said, "")
    assert vlans() == [100, -1]


def test_a_trunk_keeps_the_priority(
    shared_host: SharedHost, example: Callable[..., Any], vlans: Callable[[], List[int]]
) -> None:
    code = "import _libvswitch as vs; vs.VSDVS_SetPortVLANPolicy(*%r, 7, 5, 0, 0, None, 0)" % PORT
    shared_host.run([sys.executable, "-c", code])
    status, lines, errors = example("change_vlan", *PORT, "0", "--trunk", "10-12,20")
    assert (status, errors) == (0, "")
    assert lines == ["web-1 of vswitch0: VLAN 7, priority 5 -> VLAN 0, trunk 10-12,20, priority 5"]
    assert vlans() == [0, 5, 10, 12, 20, 20]


def test_a_dry_run(example: Callable[..., Any], vlans: Callable[[], List[int]]) -> None:
    said = ["web-1 of vswitch0: VLAN 0 would become VLAN 100"]
    assert example("change_vlan", *PORT, "100", "--dry-run") == (0, said, "")
    assert vlans() == [0, -1]


@pytest.mark.parametrize("where", [["nope", "web-1"], ["vswitch0", "nope"]])
def test_an_unknown_switch_or_port(example: Callable[..., Any], where: List[str]) -> None:
    errors = f"change_vlan: VSDVS_GetPortVLANPolicy({where[0]!r}, {where[1]!r}): Not found\n"
    assert example("change_vlan", *where, "100") == (1, [], errors)


@pytest.mark.parametrize(
    "fault, why",
    [
        ({"call": "VSDVS_SetPortVLANPolicy", "status": "QEX_BUSY"}, f"{SET}: Busy"),
        ({"call": "VSDVS_GetPortVLANPolicy", "nth": 2, "status": "QEX_BUSY"}, f"{GET}: Busy"),
        ({"call": "VSDVS_GetPortVLANPolicy", "nth": 2, "panic": (OSError, "gone")}, "gone"),
    ],
)
def test_a_call_that_fails_changes_nothing(
    shared_host: SharedHost,
    example: Callable[..., Any],
    vlans: Callable[[], List[int]],
    fault: Any,
    why: str,
) -> None:
    assert example("change_vlan", *PORT, "7")[0] == 0
    shared_host.fault(**fault)
    errors = f"change_vlan: {why}; the port has VLAN 7 as before\n"
    assert example("change_vlan", *PORT, "100") == (1, [], errors)
    assert vlans() == [7, -1]


def test_what_cannot_be_restored_is_said(
    shared_host: SharedHost, example: Callable[..., Any], vlans: Callable[[], List[int]]
) -> None:
    shared_host.fault("VSDVS_GetPortVLANPolicy", nth=2, status="QEX_BUSY")
    shared_host.fault("VSDVS_SetPortVLANPolicy", nth=2, status="QEX_NO_MEMORY")
    status, lines, errors = example("change_vlan", *PORT, "100")
    assert (status, lines) == (3, [])
    assert errors == (
        f"change_vlan: {GET}: Busy; then the port was to get VLAN 0 back: {SET}: No memory\n"
    )
    assert vlans() == [100, -1]


def meddled(shared_host: SharedHost, *when: int) -> Any:
    words = [str(EXAMPLES / "change_vlan.py"), *PORT, "100"]
    done = shared_host.run([sys.executable, "-c", MEDDLE.format(when=when, words=words)])
    return done.returncode, done.stdout.splitlines(), done.stderr


def test_another_policy_than_was_set_is_undone(
    shared_host: SharedHost, vlans: Callable[[], List[int]]
) -> None:
    errors = "change_vlan: the port has VLAN 99, not VLAN 100; the port has VLAN 0 as before\n"
    assert meddled(shared_host, 2) == (1, [], errors)
    assert vlans() == [0, -1]


def test_another_policy_than_was_restored_is_said(
    shared_host: SharedHost, vlans: Callable[[], List[int]]
) -> None:
    errors = (
        "change_vlan: the port has VLAN 99, not VLAN 100; then the port was to get VLAN 0 back and"
        " has VLAN 99\n"
    )
    assert meddled(shared_host, 2, 3) == (3, [], errors)
    assert vlans() == [99, -1]


@pytest.mark.parametrize(
    "words, why",
    [
        (["4095"], "argument vlan: 4095 is not within 0 to 4094"),
        (["-1"], "argument vlan: -1 is not within 0 to 4094"),
        (["x"], "argument vlan: invalid vlan value: 'x'"),
        (["1", "--trunk", "10-4095"], "argument --trunk: 4095 is not within 0 to 4094"),
        (["1", "--trunk", "10,"], "argument --trunk: invalid vlan_ranges value: '10,'"),
    ],
)
def test_what_is_no_vlan(example: Callable[..., Any], words: List[str], why: str) -> None:
    status, lines, errors = example("change_vlan", *PORT, *words)
    assert (status, lines) == (2, [])
    assert errors.splitlines()[-1] == f"change_vlan.py: error: {why}"
