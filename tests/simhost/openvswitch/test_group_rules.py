"""Members by chance, and frames of groups: each comes out where the rules of groups say."""

from typing import Any, Dict, List, Mapping, Set

import pytest
from hypothesis import given
from hypothesis import strategies as st

from bench import Bench
from compiler import Compiler
from drawn_switches import MACS, PORTS
from group_traffic import GROUPS, HEARS, OF_THE_LINK, SOURCES, UPLINK, VLAN, family, frame
from open_vswitch import OpenVSwitch
from seeds import options


@st.composite
def members(draw: Any, group: str) -> Any:
    some = draw(st.sets(st.sampled_from(PORTS), min_size=1, max_size=3))
    said = []
    for port in sorted(some):
        sources = sorted(draw(st.sets(st.sampled_from(SOURCES[family(group)]))))
        are_named = sources and draw(st.booleans())
        said.append({"port": port, "from" if are_named else "not_from": sources})
    return {"address": group, "vlan": VLAN, "members": said}


@st.composite
def memberships(draw: Any) -> Any:
    known = draw(st.sets(st.sampled_from(GROUPS)))
    ports = st.sets(st.sampled_from(PORTS), max_size=1)
    return {
        "groups": [draw(members(group)) for group in sorted(known)],
        "routers": [
            {"port": port, "vlan": VLAN, "ipv6": version == 6}
            for version in (4, 6)
            for port in draw(ports)
        ],
        "undecided": [{"port": port, "vlan": VLAN} for port in draw(ports)],
    }


@st.composite
def switches(draw: Any) -> Any:
    ports: List[Dict[str, Any]] = [{"id": port, "vlan": VLAN} for port in PORTS]
    for port in ports:
        taken = draw(st.sampled_from([[], [], [], ["sink"], ["promiscuous"]]))
        port["ethernet_filter"] = {"frames": taken}
    mode = draw(st.sampled_from(sorted(HEARS)))
    return {"uplinks": [UPLINK], "multicast": mode, "ports": ports}


def wants(member: Mapping[str, Any], source: str) -> bool:
    if "from" in member:
        return source in member["from"]
    return source not in member["not_from"]


def receivers(
    switch: Mapping[str, Any], joined: Mapping[str, Any], group: str, source: str
) -> Set[str]:
    """The ports that get a frame, whoever sent it."""
    if family(group) not in HEARS[switch["multicast"]] or group in OF_THE_LINK:
        return set(PORTS)
    takes = {port["id"]: port["ethernet_filter"]["frames"] for port in switch["ports"]}
    found = {port for port, frames in takes.items() if "promiscuous" in frames}
    found |= {one["port"] for one in joined["undecided"]}
    found |= {one["port"] for one in joined["routers"] if one["ipv6"] == (family(group) == 6)}
    known = [one for one in joined["groups"] if one["address"] == group]
    if not known:
        found |= {port for port, frames in takes.items() if "sink" in frames}
    return found | {
        member["port"] for one in known for member in one["members"] if wants(member, source)
    }


@pytest.fixture(scope="module")
def bench(open_vswitch: OpenVSwitch, compiler: Compiler) -> Bench:
    return Bench(open_vswitch, compiler, "groups", len(PORTS) + 1)


def disagreements(
    bench: Bench, switch: Mapping[str, Any], joined: Mapping[str, Any], told: Mapping[str, Any]
) -> List[str]:
    """Of the frames for all groups, what comes out otherwise if the switch is told of others."""
    clients = [{"port": port, "mac": MACS[port]} for port in PORTS]
    bench.load(switch, clients, multicast=told)
    wrong = []
    for group in [*GROUPS, *OF_THE_LINK]:
        for source in SOURCES[family(group)]:
            for at in ("p1", UPLINK):
                found = {
                    name: n for (name, _, _), n in bench.send(at, frame(group, source, at)).items()
                }
                wanted = receivers(switch, joined, group, source) | {UPLINK}
                if found != {name: 1 for name in wanted - {at}}:
                    wrong.append(f"{group} from {source} at {at}: {found} instead of {wanted}")
    return wrong


@options(12, derandomize=True)
@given(switch=switches(), joined=memberships())
def test_frames_of_groups_come_out_where_the_rules_say(
    bench: Bench, switch: Any, joined: Any
) -> None:
    assert disagreements(bench, switch, joined, joined) == []


def with_frames(**taken: List[str]) -> Dict[str, Any]:
    """A switch that listens, some of whose ports ask for more."""
    ports = [
        {"id": port, "vlan": VLAN, "ethernet_filter": {"frames": taken.get(port, [])}}
        for port in PORTS
    ]
    return {"uplinks": [UPLINK], "multicast": "snooping", "ports": ports}


def joined(**member: Any) -> Dict[str, Any]:
    group = {"address": GROUPS[0], "vlan": VLAN, "members": [member]}
    return {"groups": [group], "routers": [], "undecided": []}


def test_a_member_that_gets_all_groups_keeps_its_group_from_sinks(bench: Bench) -> None:
    switch = with_frames(p3=["promiscuous"], p4=["sink"])
    told = joined(port="p3", not_from=[])
    assert disagreements(bench, switch, told, told) == []


def test_another_member_would_be_noticed(bench: Bench) -> None:
    switch = with_frames()
    told = joined(port="p2", not_from=[])
    assert disagreements(bench, switch, told, told) == []
    for other in (
        joined(port="p3", not_from=[]),
        joined(**{"port": "p2", "from": SOURCES[4][:1]}),
        {**told, "routers": [{"port": "p4", "vlan": VLAN, "ipv6": True}]},
        {**told, "undecided": [{"port": "p4", "vlan": VLAN}]},
        {**told, "groups": []},
    ):
        assert disagreements(bench, switch, told, other)
