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
UNDERLAY = {"device": "eth9", "address": "192.0.2.1/24"}
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


def test_a_copy_keeps_its_own_tag_inside_that_of_the_session(bench: Bench) -> None:
    to = {"to": [{"uplink": "nic1"}]}
    source: Dict[str, Any] = {"sent_by": [{"port": "p1"}], **to, "keeps_vlan": True}
    load(bench, session(**source, encapsulation={"vlan": 50}))
    copy = ("nic1", ((50, 0), (7, 0)), None)
    assert bench.look("p1", Frame(P2, P1)) == {("p2", (), None): 1, copy: 1}
    load(bench, session(**source))
    assert bench.look("p1", Frame(P2, P1))[("nic1", ((7, 0),), None)] == 1
    load(bench, session(**{**source, "keeps_vlan": False}))
    assert bench.look("p1", Frame(P2, P1))[("nic1", (), None)] == 1


TAKES: Dict[str, Any] = {"type": "remote_destination", "to": [{"port": "p2"}, {"port": "p3"}]}
TAKEN = {("p2", (), None): 1, ("p3", (), None): 1}


@pytest.mark.parametrize("vlan", [{"received_by": [{"vlan": 50}]}, {"encapsulation": {"vlan": 50}}])
def test_what_others_mirrored_goes_to_the_ports_of_a_session_alone(
    bench: Bench, vlan: Mapping[str, Any]
) -> None:
    """Once, although the network floods it to both uplinks; whoever else is meant."""
    load(bench, session(**{**TAKES, **vlan}), {**session(received_from=["uplinks"]), "sid": "t"})
    for destination in (BROADCAST, P1, STRANGER):
        copy = Frame(destination, STRANGER, ((50, 3),))
        assert bench.look("nic0", copy) == TAKEN
        assert bench.look("nic1", copy) == {}
    # A tag that it kept, and one byte more than a packet may have.
    tagged = Frame(BROADCAST, STRANGER, ((50, 0), (7, 0)), 1515)
    assert bench.look("nic0", tagged) == {(port, ((7, 0),), None): 1 for port in ("p2", "p3")}
    assert bench.look("nic0", Frame(P1, STRANGER, ((7, 0),)))[("p1", (), None)] == 1
    assert bench.look("p1", Frame(P2, P1, ())) == {("p2", (), None): 1}


def test_what_others_mirrored_is_cut_and_keeps_its_tag(bench: Bench) -> None:
    said = {**TAKES, "received_by": [{"vlan": 50}], "snap_length": 20, "keeps_vlan": True}
    load(bench, session(**said))
    cut = ((50, 3),), 24
    out = bench.look("nic0", Frame(BROADCAST, STRANGER, ((50, 3),)))
    assert out == {("p2", *cut): 1, ("p3", *cut): 1}
    load(bench, {**session(**said), "to": [{"port": "p2"}]})
    assert bench.look("nic0", Frame(BROADCAST, STRANGER, ((50, 3),))) == {("p2", *cut): 1}
    load(bench, {**session(**said), "disabled": True})
    assert bench.look("nic0", Frame(BROADCAST, STRANGER, ((50, 3),))) == {}


def test_a_switch_takes_none_of_its_own_copies_back(bench: Bench) -> None:
    """Nor mirrors it once more: two switches would go on for ever."""
    source = {"received_from": ["uplinks"], "encapsulation": {"vlan": 50}}
    load(bench, session(**source, to=[{"uplink": "nic1"}]))
    for uplink in ("nic0", "nic1"):
        assert bench.look(uplink, Frame(BROADCAST, STRANGER, ((50, 0),))) == {}
    assert bench.look("nic0", Frame(P1, STRANGER, ((7, 0),))) == {
        ("p1", (), None): 1,
        ("nic1", ((50, 0),), None): 1,
    }


def test_a_source_and_a_destination_make_a_whole(bench: Bench) -> None:
    load(
        bench,
        session(sent_by=[{"port": "p1"}], to=[{"uplink": "nic1"}], encapsulation={"vlan": 50}),
    )
    ((_, tags, _),) = [copy for copy in bench.look("p1", Frame(P2, P1)) if copy[0] == "nic1"]
    load(bench, session(**TAKES, received_by=[{"vlan": 50}]))
    assert bench.look("nic0", Frame(P2, P1, tags)) == TAKEN


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
OF_IPV6 = "mirrors to an address of IPv6, and the underlay has one of IPv4"
MOST_SESSIONS = "is session 1024 of ERSPAN, which has 1023 at most"
NO_PORTS = "takes copies from uplinks, and mirrors to others than ports"
TAKES_MORE = "takes copies from uplinks, and mirrors from what is no VLAN of them"


def wraps(**said: Any) -> Dict[str, Any]:
    return {"type": "encapsulated", "to": [{"ip": "192.0.2.7"}], **said}


def takes(**said: Any) -> Dict[str, Any]:
    return {"type": "remote_destination", **said}


@pytest.mark.parametrize(
    "said, why",
    [
        ({"to": [{"ip": "192.0.2.7"}]}, "mirrors to an address, and wraps nothing"),
        ({"to": [{"vlan": 7}]}, "mirrors to a VLAN"),
        ({"encapsulates": True}, "wraps what it mirrors to a port, which is not done here"),
        (wraps(to=[{"port": "p3"}]), "is an encapsulated one, and mirrors to what is no address"),
        (wraps(to=[{"ip": "2001:db8::7"}]), OF_IPV6),
        (wraps(to=[{"ip": "192.0.2.1"}]), "mirrors to the address of this host"),
        (wraps(encapsulation={"type": "erspan2", "id": 1024}), MOST_SESSIONS),
        ({"sent_by": [{"ip": "192.0.2.1"}]}, "mirrors from an address"),
        *(({"received_from": [kind]}, OF_A_KIND) for kind in ("vmm", "cos", "tcpip", "test")),
        ({"sent_from": ["uplinks", "vmm"]}, OF_A_KIND),
        ({"mirrors_uplinks": True}, SOME_TRAFFIC),
        ({"uplink_filter": "normal"}, SOME_TRAFFIC),
        ({"stack": True}, "mirrors on the side of the stack, which is not here"),
        ({"type": "remote_source"}, "mirrors to other hosts, and has no VLAN for that"),
        (takes(to=[{"uplink": "nic0"}]), NO_PORTS),
        (takes(to=[{"ip": "192.0.2.7"}], encapsulates=True), NO_PORTS),
        (takes(sent_by=[{"vlan": 7}]), TAKES_MORE),
        (takes(received_by=[{"port": "p1"}]), TAKES_MORE),
        (takes(received_from=["uplinks"]), TAKES_MORE),
    ],
)
def test_what_is_not_mirrored_here_is_refused(
    compiler: Compiler, said: Mapping[str, Any], why: str
) -> None:
    ports = [{"id": "p1", "mirror_sessions": [session(**said)]}, {"id": "p3"}]
    switch = {"uplinks": ["nic0"], "ports": ports}
    answer = compiler.answer(switch, [{"port": "p3"}], {"underlay": UNDERLAY})
    assert answer == {"refused": f"the mirror session 's' {why}", "status": "QEX_NOT_SUPPORTED"}


def test_without_an_underlay_no_address_is_mirrored_to(compiler: Compiler) -> None:
    answer = compiler.answer({"ports": [{"id": "p1", "mirror_sessions": [session(**wraps())]}]}, [])
    why = "the mirror session 's' mirrors to an address, and the host has no underlay"
    assert answer == {"refused": why, "status": "QEX_NOT_SUPPORTED"}


def test_fewer_bytes_than_a_header_are_refused(compiler: Compiler) -> None:
    ports = [{"id": "p1", "mirror_sessions": [session(snap_length=13)]}]
    answer = compiler.answer({"ports": ports}, [])
    why = "mirror session 2049: fewer than 14 bytes of a frame cannot be mirrored"
    assert answer == {"refused": why, "status": "QEX_BAD_PARAM"}
