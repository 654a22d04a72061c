"""Values of the settings that frames obey, each with frames that go another way for it: of a switch
with two uplinks, and with two ports in VLAN 7."""

from typing import Any, Dict, List, NamedTuple, Tuple

from frames import Frame
from group_traffic import GROUPS, SOURCES
from group_traffic import frame as to_group

BROADCAST = "ff:ff:ff:ff:ff:ff"
GROUP = "01:00:5e:02:02:02"
P1, P2, OTHER, STRANGER = (f"02:00:00:00:00:{number}" for number in ("01", "02", "98", "99"))
CLIENTS = [{"port": "p1", "mac": P1}, {"port": "p2", "mac": P2}]
# The first one has another address than it was given.
CHANGED = [{**CLIENTS[0], "seen": OTHER}, CLIENTS[1]]
TEAM = {"balance": "explicit", "active": ["u2"], "standby": ["u1"]}
MAP = [
    {"primary": 70, "secondary": 70, "type": "promiscuous"},
    {"primary": 70, "secondary": 7, "type": "isolated"},
]
SESSION = {"sid": "s", "to": [{"port": "p2"}]}
# Where a frame comes in, and its bytes.
Sent = Tuple[str, bytes]


class Shown(NamedTuple):
    """A value by frames, or by the test that takes the time in which it shows; with other settings
    of the same thing beside it, and clients."""

    value: Any
    frames: List[Sent]
    beside: Dict[str, Any] = {}
    clients: List[Dict[str, str]] = CLIENTS
    test: str = ""


def sent(at: str, destination: str, source: str, *tags: Tuple[int, int], length: int = 60) -> Sent:
    return at, Frame(destination, source, tags, length).to_bytes()


def outside(destination: str, at: str = "u1") -> Sent:
    """From beyond an uplink, in the VLAN of the ports."""
    return sent(at, destination, STRANGER, (7, 0))


FOR_ALL = sent("p1", BROADCAST, P1)
FROM_BOTH = [FOR_ALL, sent("p2", BROADCAST, P2)]
FROM_OUTSIDE = [outside(to, at) for to in (BROADCAST, GROUP, OTHER) for at in ("u1", "u2")]
TO_P2 = sent("p1", P2, P1)
FORGED = sent("p1", BROADCAST, STRANGER)
# After the first one its source is known to be at p1.
AFTER_ONE = [FORGED, sent("p2", STRANGER, P2)]
AFTER_TWO = [sent("p1", BROADCAST, OTHER), *AFTER_ONE]
FROM_MANY = [sent("p1", BROADCAST, f"02:00:00:00:01:{number:02x}") for number in range(16)]
LARGE = sent("p1", P2, P1, length=1400)
GIANT = sent("p1", P2, P1, length=2000)
TAGGED = sent("p1", BROADCAST, P1, (9, 0))
IPV4, IPV6 = (
    ("p2", to_group(GROUPS[at], SOURCES[of][0], "p2").to_bytes()) for at, of in ((0, 4), (2, 6))
)
_HEADER = bytes.fromhex("0800" "450000280000000040060000" "0a000001")
FLOWS: List[Sent] = [
    ("p1", Frame(STRANGER, P1, content=_HEADER + bytes([10, 0, 1, n]) + bytes(30)).to_bytes())
    for n in range(16)
]
LEARNS = {"learning": True}

OBEYED: Dict[Tuple[str, str], List[Shown]] = {
    ("switch", "mtu"): [Shown(1280, [LARGE]), Shown(9000, [GIANT])],
    ("switch", "disabled"): [Shown(True, [TO_P2, outside(P1)])],
    ("switch", "teaming"): [
        Shown(TEAM, FROM_BOTH),
        Shown({"balance": "explicit"}, FROM_BOTH),
        Shown({"balance": "mac"}, FROM_MANY),
        Shown({"balance": "ip"}, FLOWS),
    ],
    ("switch", "private_vlans"): [Shown(MAP, [TO_P2])],
    ("switch", "mac_learning"): [
        Shown({"aging_time": 60}, [], test="simhost/openvswitch/test_memory.py::test_it_ages"),
        Shown({"limit": 0}, AFTER_ONE, {"ports": [{"id": "p1", "mac_learning": LEARNS}]}),
    ],
    ("switch", "multicast"): [
        Shown("snooping", [IPV4, IPV6]),
        Shown("igmp", [IPV4]),
        Shown("mld", [IPV6]),
    ],
    ("switch", "uplink_mirror_sessions"): [
        Shown([{**SESSION, "received_by": [{"uplink": "u1"}]}], [outside(P1)]),
    ],
    # By its number, the first port uses the second uplink.
    ("port", "teaming"): [
        Shown({"balance": "explicit", "active": ["u1"], "standby": ["u2"]}, [FOR_ALL]),
    ],
    ("port", "uplink"): [Shown("u1", [FOR_ALL])],
    ("port", "transmit_uplink"): [Shown(True, [TO_P2])],
    ("port", "vlan"): [
        Shown(8, [TO_P2]),
        Shown({"trunk": [7]}, [TO_P2]),
        Shown({"guest_tagging": True}, [TO_P2]),
        Shown({"id": 7, "priority": 3}, [FOR_ALL]),
    ],
    ("port", "nested_tag"): [Shown(True, [TAGGED])],
    ("port", "forbids"): [
        Shown(["forged_transmits"], [FORGED]),
        Shown(["mac_changes"], FROM_OUTSIDE, {"mac_learning": {"mac_change": True}}, CHANGED),
        Shown(["promiscuous"], FROM_OUTSIDE, {"ethernet_filter": {"frames": ["promiscuous"]}}),
    ],
    ("port", "mac_learning"): [
        Shown({"learning": True, "mac_change": True}, AFTER_ONE),
        Shown({"flooding": True, "mac_change": True}, FROM_OUTSIDE),
        Shown({"mac_change": False}, FROM_OUTSIDE, {}, CHANGED),
        Shown({**LEARNS, "limit": 1}, AFTER_TWO, {"mac_learning": LEARNS}),
        Shown(
            {**LEARNS, "limit": 0, "limit_policy": "drop"},
            [FORGED],
            {"mac_learning": {**LEARNS, "limit": 0}},
        ),
    ],
    ("port", "ethernet_filter"): [
        Shown({"frames": ["promiscuous"]}, FROM_OUTSIDE),
        Shown({"frames": ["sink"]}, FROM_OUTSIDE),
        Shown({"frames": ["multicast"], "addresses": ["01:00:5e:01:01:01"]}, FROM_OUTSIDE),
    ],
    ("port", "mirror_sessions"): [Shown([{**SESSION, "sent_by": [{"port": "p1"}]}], [FOR_ALL])],
    ("port", "blocked"): [Shown(True, [TO_P2])],
}


def with_settings(scope: str, settings: Dict[str, Any]) -> Dict[str, Any]:
    """The switch that has them, or whose first port does."""
    switch: Dict[str, Any] = {
        "uplinks": ["u1", "u2"],
        "ports": [{"id": "p1", "vlan": 7}, {"id": "p2", "vlan": 7}],
    }
    if scope == "port":
        switch["ports"][0].update(settings)
        return switch
    for port, more in zip(switch["ports"], settings.get("ports", [])):
        port.update(more)
    return {**switch, **{name: value for name, value in settings.items() if name != "ports"}}
