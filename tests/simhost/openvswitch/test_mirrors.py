"""What mirror sessions copy, where to, and what of it."""

from pathlib import Path
from typing import Any, Dict, Mapping

import pytest

from bench import Bench
from compiler import Compiler
from frames import Frame
from open_vswitch import OpenVSwitch
from test_goldens import read

BROADCAST = "ff:ff:ff:ff:ff:ff"
P1, P2, P3 = (f"02:00:00:00:00:0{number}" for number in (1, 2, 3))
STRANGER = "02:00:00:00:00:99"
PORTS = ("p1", "p2", "p3")


@pytest.fixture(scope="module")
def bench(open_vswitch: OpenVSwitch, compiler: Compiler) -> Bench:
    return Bench(open_vswitch, compiler, "mirrors", 5)


def load(bench: Bench, *sessions: Mapping[str, Any]) -> None:
    """Ports of VLAN 7, and p3 of VLAN 8; the sessions are p1's."""
    switch = {
        "uplinks": ["nic0", "nic1"],
        "teaming": {"balance": "explicit", "active": ["nic0"]},
        "ports": [
            {"id": "p1", "vlan": 7, "mirror_sessions": list(sessions)},
            {"id": "p2", "vlan": 7},
            {"id": "p3", "vlan": 8},
        ],
    }
    macs = zip(PORTS, (P1, P2, P3))
    bench.load(switch, [{"port": port, "mac": mac} for port, mac in macs])


def session(**said: Any) -> Dict[str, Any]:
    return {"sid": "s", "to": [{"port": "p3"}], **said}


def test_two_sessions_at_once(bench: Bench) -> None:
    document, _ = read(Path(__file__).parent / "goldens" / "mirrors.txt")
    bench.load(document["switch"], document["clients"])
    # The tag is none of the 96 bytes.
    cut, to_p3 = ("p3", ((7, 0),), 100), ("p3", ((7, 0),), None)
    remote = ("nic1", ((50, 0),), None)
    p1, p2, wire = ("p1", (), None), ("p2", (), None), ("nic0", ((7, 0),), None)
    assert bench.look("p1", Frame(P2, P1, (), 200)) == {cut: 1, p2: 1, remote: 1}
    # What the uplink sends, and what p2 gets.
    assert bench.look("p1", Frame(BROADCAST, P1)) == {to_p3: 1, p2: 1, wire: 1, remote: 2}
    assert bench.look("p2", Frame(BROADCAST, P2)) == {p1: 1, wire: 1, remote: 1}
    outside = Frame(BROADCAST, STRANGER, ((7, 0),))
    assert bench.look("nic0", outside) == {to_p3: 1, p1: 1, p2: 1, remote: 1}


def test_a_port_both_ways(bench: Bench) -> None:
    load(bench, session(sent_by=[{"port": "p2"}], received_by=[{"port": "p2"}]))
    copy = ("p3", (), None)
    assert bench.look("p2", Frame(P1, P2)) == {("p1", (), None): 1, copy: 1}
    assert bench.look("p1", Frame(P2, P1)) == {("p2", (), None): 1, copy: 1}
    # Its own broadcast does not reach it.
    assert bench.look("p2", Frame(BROADCAST, P2))[copy] == 1


def test_a_vlan_both_ways(bench: Bench) -> None:
    load(bench, session(sent_by=[{"vlan": 7}], received_by=[{"vlan": 7}]))
    copy = ("p3", (), None)
    assert bench.look("p2", Frame(P1, P2))[copy] == 1
    assert bench.look("nic0", Frame(P1, STRANGER, ((7, 0),)))[copy] == 1
    assert bench.look("nic0", Frame(P1, STRANGER, ((8, 0),)))[copy] == 0


@pytest.mark.parametrize(
    "sources", [{"received_by": [{"uplink": "nic0"}]}, {"received_from": ["uplinks"]}]
)
def test_what_an_uplink_receives(bench: Bench, sources: Mapping[str, Any]) -> None:
    load(bench, session(**sources))
    copy = ("p3", (), None)
    assert bench.look("nic0", Frame(P1, STRANGER, ((7, 0),)))[copy] == 1
    assert bench.look("p1", Frame(STRANGER, P1))[copy] == 0


def test_an_uplink_by_its_port(bench: Bench) -> None:
    """And one that is named twice gets one copy."""
    to = [{"port": "u1"}, {"uplink": "nic1"}]
    said = session(received_by=[{"port": "u0"}], to=to, encapsulation={"vlan": 50})
    switch = {
        "uplinks": ["nic0", "nic1"],
        "uplink_ports": [{"id": "u0", "uplink": "nic0"}, {"id": "u1", "uplink": "nic1"}],
        "teaming": {"balance": "explicit", "active": ["nic0"]},
        "ports": [{"id": "p1", "vlan": 7, "mirror_sessions": [said]}],
    }
    bench.load(switch, [{"port": "p1", "mac": P1}])
    out = bench.look("nic0", Frame(P1, STRANGER, ((7, 0),)))
    assert out == {("p1", (), None): 1, ("nic1", ((50, 0),), None): 1}


def test_what_an_uplink_sends(bench: Bench) -> None:
    load(bench, session(sent_by=[{"uplink": "nic0"}]))
    copy = ("p3", (), None)
    assert bench.look("p1", Frame(STRANGER, P1))[copy] == 1
    assert bench.look("nic0", Frame(P1, STRANGER, ((7, 0),)))[copy] == 0


def test_a_copy_is_cut_by_itself(bench: Bench) -> None:
    """Whatever went out before, and with which tags."""
    everywhere = {"to": [{"port": "p2"}, {"port": "p3"}], "sent_by": [{"uplink": "nic0"}]}
    load(bench, session(snap_length=20, keeps_vlan=True, **everywhere))
    out = bench.look("p1", Frame(STRANGER, P1))
    cut = ((7, 0),), 24
    assert out == {("p2", *cut): 1, ("p3", *cut): 1, ("nic0", ((7, 0),), None): 1}


def test_one_that_nothing_passes_gets_no_copies(bench: Bench) -> None:
    ports = [
        {"id": "p1", "mirror_sessions": [session(sent_by=[{"port": "p1"}])]},
        {"id": "p2"},
        {"id": "p3", "blocked": True},
    ]
    bench.load({"ports": ports}, [{"port": port} for port in PORTS])
    assert bench.look("p1", Frame(BROADCAST, P1)) == {("p2", (), None): 1}


def test_what_is_dropped_is_not_copied(bench: Bench) -> None:
    load(bench, session(sent_by=[{"port": "p1"}]))
    assert bench.look("p1", Frame(BROADCAST, P1, ((9, 0),))) == {}


def test_a_destination_that_gets_nothing_else_and_sends_nothing(bench: Bench) -> None:
    source = {"sent_by": [{"port": "p1"}]}
    load(bench, {**session(**source), "to": [{"port": "p2"}], "no_output": True, "no_input": True})
    assert bench.look("p1", Frame(P2, P1)) == {("p2", (), None): 1}
    assert bench.look("nic0", Frame(P2, STRANGER, ((7, 0),))) == {}
    assert bench.look("p2", Frame(BROADCAST, P2)) == {}


def test_a_session_that_stands_for_a_promiscuous_port(bench: Bench) -> None:
    load(bench, {"sid": "legacy_promiscuous", "promiscuous": True, "to": [{"port": "p2"}]})
    outside = Frame(STRANGER, "02:00:00:00:00:98", ((7, 0),))
    assert bench.look("nic0", outside) == {("p2", (), None): 1}
    assert bench.look("p1", Frame(P2, P1)) == {("p2", (), None): 1}


OF_A_KIND = "mirrors clients of a kind, which are not told apart here"
SOME_TRAFFIC = "mirrors some traffic of uplinks, which is not told apart here"
WRAPS = "wraps what it mirrors, which is not done here"


@pytest.mark.parametrize(
    "said, why",
    [
        ({"type": "encapsulated"}, WRAPS),
        ({"encapsulates": True}, WRAPS),
        ({"to": [{"ip": "192.0.2.1"}]}, "mirrors to what is no port and no uplink"),
        ({"to": [{"vlan": 7}]}, "mirrors to what is no port and no uplink"),
        ({"sent_by": [{"ip": "192.0.2.1"}]}, "mirrors from an address"),
        *(({"received_from": [kind]}, OF_A_KIND) for kind in ("vmm", "cos", "tcpip", "test")),
        ({"sent_from": ["uplinks", "vmm"]}, OF_A_KIND),
        ({"mirrors_uplinks": True}, SOME_TRAFFIC),
        ({"uplink_filter": "normal"}, SOME_TRAFFIC),
        ({"stack": True}, "mirrors on the side of the stack, which is not here"),
    ],
)
def test_what_is_not_mirrored_here_is_refused(
    compiler: Compiler, said: Mapping[str, Any], why: str
) -> None:
    ports = [{"id": "p1", "mirror_sessions": [session(**said)]}]
    answer = compiler.answer({"ports": ports}, [])
    assert answer == {"refused": f"the mirror session 's' {why}", "status": "QEX_NOT_SUPPORTED"}


def test_fewer_bytes_than_a_header_are_refused(compiler: Compiler) -> None:
    ports = [{"id": "p1", "mirror_sessions": [session(snap_length=13)]}]
    answer = compiler.answer({"ports": ports}, [])
    why = "mirror session 2049: fewer than 14 bytes of a frame cannot be mirrored"
    assert answer == {"refused": why, "status": "QEX_BAD_PARAM"}
