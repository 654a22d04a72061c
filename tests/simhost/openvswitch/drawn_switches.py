"""Switches made by chance, their clients, and frames for them."""

import random
from typing import Any, Dict, List, Tuple

from hypothesis import strategies as st

from frames import TAG_TYPES, Frame
from links import LinkChange, Links

UPLINKS = ["nic0", "nic1", "nic2"]
PORTS = ["p1", "p2", "p3", "p4"]
MACS = {port: f"02:00:00:00:00:0{port[1]}" for port in PORTS}
STRANGER = "02:00:00:00:00:99"
# Of a client that changed its address; and some that stay where they are put.
OTHER = "02:00:00:00:00:98"
FIXED = [f"02:00:00:00:00:a{number}" for number in (1, 2, 3)]
BROADCAST = "ff:ff:ff:ff:ff:ff"
SOME_GROUP = "01:00:5e:00:00:05"
# Such that nobody gets who does not ask for them.
GROUPS = ["01:00:5e:01:01:01", "33:33:00:01:00:03"]
# What ports take beside what is for their clients.
TAKEN = [
    *[[]] * 5,
    ["promiscuous"],
    ["sink"],
    ["broadcast"],
    ["multicast"],
    ["hashed_multicast"],
    ["multicast", "all_multicast"],
]
COLLECTORS = ["198.18.0.7", "198.18.0.8"]
PRIVATE = [
    {"primary": 100, "secondary": 100, "type": "promiscuous"},
    {"primary": 100, "secondary": 101, "type": "isolated"},
    {"primary": 100, "secondary": 102, "type": "community"},
    {"primary": 100, "secondary": 103, "type": "community"},
]
# Few, so that ports have them in common.
VLANS = [7, 0, 8, 4094]
IN_MAP = [100, 101, 102, 103]
# Of ranges.
ENDS = [7, 0, 1, 6, 8, 99, 101, 103, 4094]


# What is drawn more often than not is the least one.
RARELY = st.integers(0, 7).map(lambda number: number == 7)


def optional(strategy: "st.SearchStrategy[Any]") -> "st.SearchStrategy[List[Any]]":
    return st.lists(strategy, max_size=1)


@st.composite
def port_vlans(draw: Any, private: bool) -> Any:
    kind = draw(st.sampled_from(["access", "trunk", "guest", "private" if private else "access"]))
    some = VLANS + (IN_MAP if private else [])
    said: Dict[str, Any] = {"id": draw(st.sampled_from(some))}
    if kind == "private":
        said = {"id": draw(st.sampled_from(IN_MAP)), "private": True}
    if kind == "guest":
        said = {"id": draw(st.sampled_from([0, 0, 7])), "guest_tagging": True}
    if kind == "trunk":
        ends = sorted(draw(st.sets(st.sampled_from(ENDS), min_size=1)))
        pairs = zip(ends[::2], ends[1::2])
        said["trunk"] = [f"{first}-{last}" for first, last in pairs]
        if len(ends) % 2:
            said["trunk"].append(ends[-1])
        said["id"] = draw(st.sampled_from([0, 0, *some]))
    for priority in draw(optional(st.integers(0, 7))):
        said["priority"] = priority
    return said


@st.composite
def teamings(draw: Any, uplinks: List[str]) -> Any:
    order = draw(st.permutations(uplinks))
    active = draw(st.integers(0, len(order)))
    return {
        "balance": draw(st.sampled_from(["explicit", "port", "mac", "ip"])),
        "active": order[:active],
        "standby": order[active:] if active else [],
        "flags": draw(st.sampled_from([[], ["rolling"]])),
    }


ENTITIES: Dict[str, List[Dict[str, Any]]] = {
    "received_by": [*({"uplink": uplink} for uplink in UPLINKS), {"vlan": 7}, {"port": "p1"}],
    "sent_by": [*({"uplink": uplink} for uplink in UPLINKS), {"vlan": 101}, {"port": "p2"}],
}


@st.composite
def wrapping_sessions(draw: Any, said: Dict[str, Any]) -> Any:
    """A session whose copies go to collectors."""
    addresses = draw(st.lists(st.sampled_from(COLLECTORS), min_size=1, max_size=2, unique=True))
    kind = draw(st.sampled_from(["gre", "erspan2", "erspan3"]))
    wraps = {**said["encapsulation"], "type": kind, "key": 2**32 - 1, "id": 1023}
    to = [{"ip": address} for address in addresses]
    return {**said, "type": "encapsulated", "to": to, "encapsulation": wraps}


@st.composite
def sessions(draw: Any, name: str, uplinks: List[str], collectors: bool) -> Any:
    """A mirror session of a port's table."""
    takes = bool(uplinks) and draw(st.booleans())
    places = [{"port": "p3"}, {"port": "p4"}]
    if not takes:
        places += [{"uplink": uplink} for uplink in uplinks]
    said: Dict[str, Any] = {
        "sid": name,
        "to": draw(st.lists(st.sampled_from(places), max_size=2, unique_by=str)),
        "snap_length": draw(st.sampled_from([0, 0, 14, 16, 18, 64, 2**32 - 1])),
        "keeps_vlan": draw(st.booleans()),
        "disabled": draw(RARELY),
        "no_output": draw(RARELY),
        "no_input": draw(RARELY),
        "encapsulation": {"vlan": draw(st.sampled_from([0, 7, 50]))},
    }
    if takes:
        vlans = draw(st.sets(st.sampled_from([7, 50]), max_size=2))
        return {**said, "type": "remote_destination", "received_by": [{"vlan": v} for v in vlans]}
    for direction, named in ENTITIES.items():
        there = [one for one in named if "uplink" not in one or one["uplink"] in uplinks]
        said[direction] = draw(st.lists(st.sampled_from(there), max_size=2, unique_by=str))
    return draw(wrapping_sessions(said)) if collectors and draw(st.booleans()) else said


@st.composite
def fixed_addresses(draw: Any) -> Any:
    """Where each of some addresses stays: at a port, or beyond the uplinks."""
    places: Dict[str, List[Any]] = {}
    for mac in draw(st.sets(st.sampled_from(FIXED))):
        entry = {"mac": mac, "type": draw(st.sampled_from(["static", "user"]))}
        entry["vlan"] = draw(st.sampled_from([0, 7, 101]))
        places.setdefault(draw(st.sampled_from(["", *PORTS])), []).append(entry)
    return places


@st.composite
def ports(draw: Any, name: str, private: bool, uplinks: List[str], collectors: bool) -> Any:
    said: Dict[str, Any] = {"id": name, "vlan": draw(port_vlans(private))}
    said["blocked"] = draw(RARELY)
    said["nested_tag"] = draw(RARELY)
    said["transmit_uplink"] = draw(RARELY)
    forbidden = st.sampled_from(["promiscuous", "forged_transmits", "mac_changes"])
    said["forbids"] = draw(optional(forbidden))
    asked = draw(st.sets(st.sampled_from(GROUPS)))
    said["ethernet_filter"] = {"frames": draw(st.sampled_from(TAKEN)), "addresses": sorted(asked)}
    management = {
        "flooding": draw(RARELY),
        "learning": draw(RARELY),
        "mac_change": not draw(RARELY),
    }
    if draw(st.booleans()):
        said["mac_learning"] = management
    if draw(RARELY):
        sids = ["a", "b"][: draw(st.integers(1, 2))]
        said["mirror_sessions"] = [draw(sessions(sid, uplinks, collectors)) for sid in sids]
    if uplinks and draw(RARELY):
        said["teaming"] = draw(teamings(uplinks))
    return said


@st.composite
def switches(draw: Any, collectors: bool) -> Any:
    private = draw(st.booleans())
    uplinks = UPLINKS[: draw(st.integers(0, 3))]
    said: Dict[str, Any] = {
        "uplinks": uplinks,
        "ports": [draw(ports(name, private, uplinks, collectors)) for name in PORTS],
    }
    # In their order, which is that of a team that names none.
    said["uplink_ports"] = [
        {"id": f"at-{uplink}", "uplink": uplink, "blocked": draw(RARELY)} for uplink in uplinks
    ]
    if private:
        said["private_vlans"] = PRIVATE
    fixed = draw(fixed_addresses())
    said["addresses"] = fixed.get("", [])
    for port in said["ports"]:
        port["addresses"] = fixed.get(port["id"], [])
    if draw(st.booleans()):
        said["mac_learning"] = {"learn_static": draw(st.booleans())}
    if uplinks and draw(st.booleans()):
        said["teaming"] = draw(teamings(uplinks))
    return said


# Milliseconds, some of which are as long as the delay.
PAUSES = [0, 1, 999, 1000, 5000]


def histories(uplinks: List[str]) -> "st.SearchStrategy[Links]":
    change = st.builds(LinkChange, st.sampled_from(PAUSES), st.sampled_from(uplinks), st.booleans())
    return st.builds(
        Links,
        st.lists(change, min_size=1, max_size=6).map(tuple),
        st.sampled_from(PAUSES),
        st.sampled_from([0, 1000]),
    )


@st.composite
def switches_with_links(draw: Any, collectors: bool = False) -> Any:
    """Likewise, and what became of the links of its uplinks. Some mirror to collectors if there are
    any."""
    switch = draw(switches(collectors))
    changed = switch["uplinks"] and (draw(RARELY) or draw(RARELY))
    return switch, draw(histories(switch["uplinks"])) if changed else Links()


@st.composite
def mirroring_switches(draw: Any) -> Any:
    """Likewise such as mirror to collectors what most frames are: of their VLANs."""
    switch, links = draw(switches_with_links())
    said: Dict[str, Any] = {
        "sid": "collected",
        "snap_length": draw(st.sampled_from([0, 64])),
        "keeps_vlan": draw(st.booleans()),
        "encapsulation": {"vlan": draw(st.sampled_from([0, 7]))},
        "sent_by": [{"port": port} for port in PORTS],
        "received_by": draw(st.lists(st.sampled_from([{"port": port} for port in PORTS]))),
    }
    switch["ports"][0]["mirror_sessions"] = [draw(wrapping_sessions(said))]
    return switch, links


@st.composite
def choosy_switches(draw: Any) -> Any:
    """Likewise such as have ports that ask for groups."""
    switch, links = draw(switches_with_links())
    for port in switch["ports"]:
        asked = sorted(draw(st.sets(st.sampled_from(GROUPS))))
        port["ethernet_filter"] = {"frames": ["multicast"], "addresses": asked}
    return switch, links


@st.composite
def all_clients(draw: Any) -> Any:
    """The clients of a switch, of which some are not there, and some have no address yet."""
    clients: List[Dict[str, Any]] = []
    for port in PORTS:
        kind = draw(st.sampled_from(["known"] * 5 + ["first", "seen", "changed", "none"]))
        client: Dict[str, Any] = {"port": port}
        if kind in ("known", "changed"):
            client["mac"] = MACS[port]
        if kind in ("seen", "changed"):
            client["seen"] = OTHER
        if kind != "none":
            clients.append(client)
    return clients


CLIENTS = all_clients()
ADDRESSES = [*MACS.values(), *FIXED, OTHER, STRANGER]
VIDS = [*VLANS, *IN_MAP, 7, 7, 50, 4095]
PLACES = [*PORTS, *UPLINKS]


@st.composite
def sources(draw: Any, at: str) -> Any:
    """The address that a frame is from: mostly one that is there."""
    if not draw(RARELY):
        return MACS.get(at, STRANGER)
    return draw(st.sampled_from([*ADDRESSES, SOME_GROUP, "00:00:00:00:00:00"]))


RESERVED = ["01:80:c2:00:00:01", "01:80:c2:00:00:0e"]
DESTINATIONS = [*[BROADCAST, SOME_GROUP, *GROUPS] * 2, *ADDRESSES * 2, *RESERVED]


@st.composite
def frames(draw: Any) -> Tuple[str, Frame]:
    """A place and a frame that comes in there."""
    at = draw(st.sampled_from(PLACES))
    tags = draw(st.lists(st.tuples(st.sampled_from(VIDS), st.integers(0, 7)), max_size=2))
    length = draw(st.sampled_from([60, 60, 60, 60, 1514, 1515]))
    return at, Frame(draw(st.sampled_from(DESTINATIONS)), draw(sources(at)), (*tags,), length)


# From its type on: what a data path looks into, and what it cannot.
TYPES = [0x0800, 0x86DD, 0x0806, 0x88CC, 0x8808, 0x8847, 0x894F, 0x88B5, 0x05DC, 3, 0x8100]
LLC = [bytes.fromhex(said) for said in ("424203", "aaaa030000000800", "aaaa030000008100", "aaaa03")]
HEADERS = [
    bytes.fromhex(said) for said in ("45000028", "46ff", "6000000000140640", "0001080006040001")
]
LEAST = 14
SIZES = [60, 60, 64, 128, 1513, 1514, 1515, 1518, 1519, 1522, 1523, 9018]


def to_bytes(address: str) -> bytes:
    return bytes.fromhex(address.replace(":", ""))


def some_bytes(chance: random.Random, count: int) -> bytes:
    return bytes(chance.randrange(256) for _ in range(count))


def frame_of_bytes(chance: random.Random) -> Tuple[str, bytes]:
    """Likewise what a device may receive: more tags than anybody has, ends that come too soon,
    giants."""

    def rarely() -> bool:
        return chance.random() < 0.12

    at = chance.choice(PLACES)
    others = [*ADDRESSES, SOME_GROUP]
    source = chance.choice(others) if at in UPLINKS or rarely() else MACS[at]
    data = to_bytes(chance.choice(DESTINATIONS)) + to_bytes(source)
    if rarely():
        data = some_bytes(chance, 6) + data[6:]
    few, many = ([0, 0, 0, 1], [2, 3, 4]) if at in PORTS else ([1, 1, 1, 0], [2, 2, 3, 4])
    for _ in range(chance.choice(many if rarely() else few)):
        data += chance.choice(TAG_TYPES).to_bytes(2, "big")
        vid = chance.randrange(4096) if rarely() else chance.choice(VIDS)
        data += (chance.randrange(16) << 12 | vid).to_bytes(2, "big")
    data += (chance.randrange(65536) if rarely() else chance.choice(TYPES)).to_bytes(2, "big")
    data += chance.choice([b"", *LLC, *HEADERS]) + some_bytes(chance, chance.randrange(60))
    if not rarely():
        data = data.ljust(chance.choice(SIZES), b"\0")
    if rarely():
        data = data[: chance.randrange(LEAST, max(LEAST, min(len(data), 80)) + 1)]
    return at, data.ljust(LEAST, b"\0")
