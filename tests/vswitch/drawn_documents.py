#!/usr/bin/env python3
"""Scenario documents that chance describes: every setting, by the forms that the build tells.

    drawn_documents.py [--seconds N] [--seed N]

Makes hosts of them for as long as it is told, and a clone of each from its snapshot; prints the
document whose clone is another host, and at the end how many documents there were.
"""

import json
import os
import sys
from pathlib import Path
from typing import Any, Callable, Dict, List, Optional, Tuple

import seeds
import simhost
from hypothesis import given, seed
from hypothesis import strategies as st
from vswitch import Host

Document = Dict[str, Any]
Form = Dict[str, Any]

BUILD = Path(os.environ.get("BUILD_DIR", Path(__file__).parents[2] / "build"))
REFERENCE = json.loads((BUILD / "simhost" / "properties.json").read_text(encoding="utf-8"))
STOPPED = {"stopped": True, "now": 1_000_000}
UPLINKS = ["nic0", "nic1", "nic2", "nic3", "nic4"]
UPLINK_PORTS = ["left", "right", "spare"]
NAMES = [*UPLINK_PORTS, "Left", "lag1", "uplink1", "nic0", "é"]
PORTS = ["web-1", "web-2", "wéb"]

texts = st.lists(st.sampled_from("abé- 0"), max_size=8).map("".join)
bytes_ = st.binary(max_size=12).map(bytes.hex)
types = st.sampled_from(["config", "runtime", "volatile", "policy"])
ips = st.one_of(st.ip_addresses(v=4), st.ip_addresses(v=6)).map(str)
multicast = st.integers(0, 9).map(lambda n: f"01:00:5e:00:00:0{n}")
private_vlans = st.sampled_from(
    [
        [],
        [{"primary": 100, "secondary": 100, "type": "promiscuous"}],
        [
            {"primary": 100, "secondary": 101, "type": "isolated"},
            {"primary": 100, "secondary": 102, "type": "community"},
        ],
    ]
)


def some(members: Dict[str, st.SearchStrategy[Any]], *needed: str) -> st.SearchStrategy[Document]:
    """Objects with some of the members, and those that they need."""
    return st.fixed_dictionaries(
        {name: members[name] for name in needed},
        optional={name: one for name, one in members.items() if name not in needed},
    )


def of_form(form: Form) -> st.SearchStrategy[Any]:
    kind = form["form"]
    if kind == "number":
        least, greatest = form["least"], form["greatest"]
        return st.sampled_from([least, greatest]) | st.integers(least, greatest)
    if kind == "boolean":
        return st.booleans()
    if kind == "choice":
        return st.sampled_from(sorted(form["choices"]))
    if kind == "bits":
        return st.lists(st.sampled_from(sorted(form["choices"])), unique=True)
    if kind == "text":
        return texts.filter(lambda text: len(text.encode()) <= form["most_bytes"])
    if kind == "mac":
        return multicast
    if kind == "ip":
        return ips
    if kind == "list" and form["element"]["form"] == "range":
        return st.lists(st.integers(0, 4000), unique=True, max_size=3).map(_rising)
    if kind == "list":
        return st.lists(of_form(form["element"]), max_size=3)
    members = {one["name"]: of_form(one) for one in form["members"]}
    if kind == "one_of":
        return st.one_of([some({name: one}, name) for name, one in members.items()])
    return some(members, *(one["name"] for one in form["members"] if one.get("required")))


def _rising(numbers: List[int]) -> List[Any]:
    """VLANs and ranges of a few, that do not meet."""
    starts = sorted({number // 10 * 10 for number in numbers})
    return [at if at % 20 else f"{at}-{at + 3}" for at in starts]


def _teaming(form: Form) -> st.SearchStrategy[Any]:
    """Each uplink is named once."""
    names = st.lists(st.sampled_from(NAMES), unique=True)
    split = st.tuples(of_form(form), names, st.integers(0, len(NAMES)))
    return split.map(
        lambda one: {**one[0], "active": one[1][: one[2]], "standby": one[1][one[2] :]}
    )


def _vlan(form: Form) -> st.SearchStrategy[Any]:
    plain = of_form(form).map(lambda vlan: {**vlan, "private": False})
    return plain | st.just({"id": 101, "private": True}) | st.integers(0, 4094)


def _sessions(form: Form) -> st.SearchStrategy[Any]:
    def named(sessions: List[Document]) -> List[Document]:
        return [{**one, "sid": f"session {at}"} for at, one in enumerate(sessions)]

    return of_form(form).map(named)


_OWN: Dict[str, Callable[[Form], st.SearchStrategy[Any]]] = {
    "teaming": _teaming,
    "vlan": _vlan,
    "mirror_sessions": _sessions,
    "uplink_mirror_sessions": _sessions,
    "private_vlans": lambda form: private_vlans,
}


def settings_of(scope: str, under: str = "name") -> Dict[str, st.SearchStrategy[Any]]:
    known = [one for one in REFERENCE["properties"] if one["scope"] == scope and under in one]
    return {one[under]: _OWN.get(one["name"], of_form)(one["value"]) for one in known}


def properties(scope: str) -> st.SearchStrategy[Document]:
    """Others, by their bytes: of keys that nobody knows, of some that take any, and numbers."""
    drawn: Dict[str, st.SearchStrategy[Any]] = {
        f"com.example.{name}": st.fixed_dictionaries({"type": types, "hex": bytes_})
        for name in ("a", "é")
    }
    for known in REFERENCE["properties"]:
        if known["scope"] == scope and not known["computed"]:
            if known["value"]["form"] == "none":
                drawn[known["key"]] = st.fixed_dictionaries({"type": types, "hex": bytes_})
            elif known["bytes"] in ("1 byte", "4 bytes"):
                size = int(known["bytes"][0])
                number = st.sampled_from([_bytes(0, size), _bytes(1, size)])
                drawn[known["key"]] = st.fixed_dictionaries({"type": types, "hex": number})
    # Some that are texts, whatever characters they have.
    if scope == "port":
        alias = st.sampled_from(["616200", "ff00", "00", b"absent\0".hex()])
        made = st.fixed_dictionaries({"type": types, "hex": alias})
        drawn["com.quorix.common.port.alias"] = made
    return st.lists(st.sampled_from(sorted(drawn)), unique=True, max_size=3).flatmap(
        lambda keys: st.fixed_dictionaries({key: drawn[key] for key in keys})
    )


def _bytes(number: int, size: int) -> str:
    return number.to_bytes(size, sys.byteorder).hex()


def addresses(place: int) -> st.SearchStrategy[Any]:
    """Those of one place: no two places of a switch have the same."""
    members: Dict[str, st.SearchStrategy[Any]] = {
        "mac": st.integers(1, 4).map(lambda n: f"02:00:00:00:0{place}:0{n}"),
        "vlan": st.sampled_from([0, 10, 4094]),
        "vni": st.sampled_from([0, 2**24 - 1]),
        "type": st.sampled_from(["static", "user", "learned"]),
        "ages": st.booleans(),
        "age": st.integers(0, 20),
    }
    entry = some(members, "mac", "vlan", "vni", "type")
    return st.lists(entry, max_size=3, unique_by=lambda one: (one["mac"], one["vlan"], one["vni"]))


def _groups() -> st.SearchStrategy[Any]:
    last = st.integers(1, 250)
    modes = st.sampled_from(["none", "include", "exclude"])
    sources = st.lists(st.ip_addresses(v=4).map(str), max_size=2, unique=True)
    of_ip = st.fixed_dictionaries(
        {
            "address": last.map(lambda n: f"239.1.1.{n}"),
            "version": st.integers(0, 3),
            "source_mode": modes,
            "sources": sources,
            "vni": st.integers(0, 9),
        }
    )
    of_ip6 = st.fixed_dictionaries(
        {"address": last.map(lambda n: f"ff02::{n:x}"), "version": st.integers(0, 2)}
    )
    of_ethernet = st.fixed_dictionaries({"address": multicast})
    return st.lists(of_ip | of_ip6 | of_ethernet, max_size=3)


def _counters(names: Tuple[str, ...]) -> st.SearchStrategy[Any]:
    return st.dictionaries(st.sampled_from(names), st.integers(1, 2**31), max_size=2)


def ports(place: int) -> st.SearchStrategy[Document]:
    members = {
        **settings_of("port"),
        "external_id": st.just(f"external {place}"),
        "addresses": addresses(place),
        "groups": _groups(),
        "counters": _counters(("numMACsMoved", "pktsInUnicast", "noLearningDroppedPkts")),
        "properties": properties("port"),
    }
    return some(members).map(lambda one: {"id": PORTS[place - 1], **one})


def _uplink_ports() -> st.SearchStrategy[Any]:
    named = some(settings_of("port", "uplink_port_name"))

    def unique(drawn: List[Document]) -> List[Document]:
        made = []
        for id_, one in zip(UPLINK_PORTS, drawn):
            if "name" in one:
                one = {**one, "name": f"{id_} {one['name']}"}
            made.append({"id": id_, **one})
        return made

    return st.lists(named, max_size=len(UPLINK_PORTS)).map(unique)


def switches(at: int) -> st.SearchStrategy[Document]:
    members = {
        **settings_of("switch"),
        "persistent": st.booleans(),
        "running": st.just(True) | st.booleans(),
        "version": st.sampled_from([100, 200]),
        "properties": properties("switch"),
        "host_properties": properties("host"),
        "addresses": addresses(0),
        "counters": _counters(("txErrors", "rarpPktsSent")),
        "mirror_counters": st.dictionaries(
            st.sampled_from(["session 0", "session 1"]), _counters(("mirroredPkts",)), max_size=2
        ),
    }
    parts = st.tuples(
        some(members),
        _uplink_ports(),
        st.lists(st.sampled_from(UPLINKS[2 * at : 2 * at + 2]), unique=True),
        st.tuples(*(st.none() | ports(place) for place in (1, 2, 3))),
        st.booleans(),
    )
    return parts.map(lambda drawn: _switch(at, *drawn))


def _switch(
    at: int,
    members: Document,
    uplink_ports: List[Document],
    uplinks: List[str],
    ports: Tuple[Optional[Document], ...],
    grouped: bool,
) -> Document:
    if uplink_ports and uplinks:
        uplink_ports[-1]["uplink"] = uplinks[-1]
    lags = [{"name": "lag1", "uplinks": uplinks}] if grouped and uplinks else []
    there = [one for one in ports if one is not None]
    if "private_vlans" not in members or len(members["private_vlans"]) < 2:
        members["private_vlans"] = [{"primary": 100, "secondary": 101, "type": "isolated"}]
    return {
        "alias": f"swïtch {at}",
        **members,
        "uplink_ports": uplink_ports,
        "uplinks": uplinks,
        "lags": lags,
        "ports": there,
    }


def _links() -> st.SearchStrategy[Any]:
    members = {name: st.sampled_from(["up", "down"]) for name in ("link", "admin", "lacp")}
    return st.tuples(*(some(members) for _ in UPLINKS)).map(
        lambda drawn: [{"name": name, **one} for name, one in zip(UPLINKS, drawn)]
    )


def _options() -> st.SearchStrategy[Any]:
    drawn: Dict[str, st.SearchStrategy[Any]] = {}
    for option in REFERENCE["runtime_options"]:
        if "least" in option:
            # So that each may have the sources that are drawn.
            least = max(option["least"], 2) if option["name"].endswith("IPNum") else option["least"]
            drawn[option["name"]] = st.integers(least, option["greatest"])
    drawn["IGMPRouterIP"] = st.ip_addresses(v=4).map(str)
    drawn["MLDRouterIP"] = st.ip_addresses(v=6).map(str)
    return some(drawn)


def documents() -> st.SearchStrategy[Document]:
    learning = {"aging_time": st.integers(30, 1000), "limit": st.integers(0, 9)}
    return st.fixed_dictionaries(
        {
            "clock": st.just(STOPPED),
            "uplinks": _links(),
            "switches": st.tuples(*(st.none() | switches(at) for at in (0, 1))).map(
                lambda drawn: [one for one in drawn if one is not None]
            ),
        },
        optional={"runtime_options": _options(), "mac_learning": some(learning)},
    )


# Clones

# What no call tells; of mirror sessions they tell what those have counted that run.
_UNTOLD = {"persistent", "external_id", "rate", "mirror_counters", "observed"}


def told(value: Any) -> Any:
    if isinstance(value, list):
        return [told(one) for one in value]
    if isinstance(value, dict):
        return {key: told(one) for key, one in value.items() if key not in _UNTOLD}
    return value


def host_of(document: Document) -> simhost.Host:
    return simhost.Host(document, Path())


def check(document: Document) -> bool:
    """Whether the host takes the document; its clone must be the same host then."""
    try:
        host = host_of(document)
    except simhost.HostRefused:
        return False
    objects = Host(simulated=True)
    snapshot, described = objects.snapshot(), host.describe()
    assert snapshot["observed"]["left_out"] == []
    # The host may be told to tell no such counters.
    assert {one["what"] for one in snapshot["observed"]["refused"]} <= {"mirror_counters"}
    clone = host_of({**json.loads(json.dumps(snapshot)), "clock": STOPPED})
    assert objects.snapshot() == snapshot
    if all(one["running"] for one in described["switches"]):
        for key in ("switches", "runtime_options", "mac_learning"):
            assert told(clone.describe()[key]) == told(described[key])
    return True


class Count:
    made = taken = 0


def run(number: int, examples: int, shrink: bool = True) -> Tuple[Count, List[str]]:
    """So many documents, which the number chooses: how many there were, and what is wrong."""
    count = Count()

    @seed(number)
    @seeds.options(examples, shrink)
    @given(documents())
    def each(document: Document) -> None:
        count.made += 1
        count.taken += check(document)

    try:
        each()
    except Exception as error:
        return count, ["\n".join([*getattr(error, "__notes__", []), f"{error!r}"])]
    return count, []


def main() -> int:
    """Make documents of one seed after the other."""

    def of_seed(number: int) -> seeds.Outcome:
        count, wrong = run(number, 50)
        return count.made, wrong

    return seeds.main(of_seed)


if __name__ == "__main__":
    sys.exit(main())
