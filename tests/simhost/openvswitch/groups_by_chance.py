#!/usr/bin/env python3
"""Groups whose members come and go by chance, and real frames for them through a data path.

    groups_by_chance.py [--seconds N] [--seed N]

Holds where each frame comes out to what the hosts want, for as long as it is told; prints the
history and the frame that they and the data path do not agree about, and at the end how many frames
there were.
"""

import sys
from pathlib import Path
from typing import Any, Callable, Dict, List, Optional, Tuple

sys.path.insert(0, str(Path(__file__).parents[2] / "support"))

import seeds  # noqa: E402  (after the path is set)
from hypothesis import given, seed  # noqa: E402
from hypothesis import strategies as st  # noqa: E402

import member_rules as rules  # noqa: E402
from drawn_switches import MACS, PORTS  # noqa: E402
from frames_by_chance import Count, wires_of_its_own  # noqa: E402
from group_frames import mac_of  # noqa: E402
from group_traffic import (  # noqa: E402
    GROUPS,
    HEARS,
    OF_THE_LINK,
    SOURCES,
    UPLINK,
    VLAN,
    family,
    frame,
)
from wires import Wires  # noqa: E402

OF_A_SEED = 10
# Those that members name, and one more.
FROM = {4: [*SOURCES[4], "10.0.0.3"], 6: [*SOURCES[6], "fd00::3"]}
MEMBERS = PORTS[1:]
PAUSES = [1, 900, 1100, 1900, 2100, 3100, 4900, 5100, 15100, 20000, 60000, 130000, 259000, 261000]


@st.composite
def switches(draw: Any) -> Any:
    """One that listens, some of whose ports ask for more."""
    ports: List[Dict[str, Any]] = [{"id": port, "vlan": VLAN} for port in PORTS]
    for port in ports:
        asked = draw(st.sampled_from([[]] * 6 + [[mac_of(GROUPS[0])]]))
        frames = draw(st.sampled_from([[]] * 6 + [["promiscuous"]]))
        port["ethernet_filter"] = {
            "frames": frames + ["multicast"] * bool(asked),
            "addresses": asked,
        }
    mode = draw(st.sampled_from(["snooping", *sorted(HEARS)]))
    return {"uplinks": [UPLINK], "multicast": mode, "ports": ports}


def hosts() -> "st.SearchStrategy[rules.Host]":
    return st.builds(
        rules.Host, st.sampled_from(MEMBERS), st.sampled_from(GROUPS), st.integers(0, 1)
    )


@st.composite
def sayings(draw: Any) -> rules.Says:
    host = draw(hosts())
    sources = frozenset(draw(st.sets(st.sampled_from(SOURCES[family(host.group)]))))
    return rules.Says(host, rules.Wants(sources, draw(st.booleans())))


EVENTS = st.one_of(
    sayings(),
    sayings(),
    st.builds(rules.Passes, st.sampled_from(PAUSES)),
    st.builds(rules.Dies, hosts()),
    st.builds(rules.Asks, st.sampled_from(MEMBERS), st.sampled_from([2, 30])),
)
TIMINGS = st.builds(rules.Timing, st.sampled_from([2, 1, 3]), st.sampled_from([125, 10]))


@st.composite
def versions(draw: Any) -> Any:
    """What all speak that are at one port with one group."""
    spoken = {4: [3, 3, 2, 1], 6: [3, 3, 2]}
    return {
        (port, group): draw(st.sampled_from(spoken[family(group)]))
        for port in MEMBERS
        for group in GROUPS
    }


def gets(switch: Any, members: rules.Members, port: str, group: str, source: str) -> Optional[bool]:
    """Whether a port gets a frame of a group; nothing if it may."""
    if family(group) not in HEARS[switch["multicast"]] or group in OF_THE_LINK:
        return True
    (taken,) = (one["ethernet_filter"] for one in switch["ports"] if one["id"] == port)
    if "promiscuous" in taken["frames"] or mac_of(group) in taken.get("addresses", []):
        return True
    return members.gets(port, group, source)


def disagreement(
    wires: Wires, switch: Any, members: rules.Members, sent: Tuple[str, str, str]
) -> str:
    """How what comes out of a frame differs from what is to; empty if it does not."""
    at, group, source = sent
    data = frame(group, source, at)
    tags = {UPLINK: ((VLAN, 0),)}
    out = wires.transmit(at, data.to_bytes())
    for place in [*PORTS, UPLINK]:
        came = out.pop((place, data.with_tags(tags.get(place, ()))), 0)
        wanted = place != at and (place == UPLINK or gets(switch, members, place, group, source))
        if came > 1 or came != (came if wanted is None else wanted):
            return f"{group} from {source} at {at}: {came} at {place}, where {wanted} was wanted"
    return f"{group} from {source} at {at}: also {out}" if out else ""


def run(
    wires: Wires,
    number: int,
    examples: int,
    shrink: bool = True,
    change: Callable[[str], Optional[str]] = str,
) -> Tuple[Count, List[str]]:
    """So many histories, which the number chooses, with each flow changed: how many frames were
    sent, of how many nobody but the network had to get one, and what is wrong."""
    count = Count()

    @seed(number)
    @seeds.options(examples, shrink)
    @given(
        switch=switches(),
        timing=TIMINGS,
        spoken=versions(),
        events=st.lists(EVENTS, min_size=2, max_size=12),
    )
    def each(switch: Any, timing: Any, spoken: Any, events: Any) -> None:
        members = rules.Members(timing, spoken, MACS)
        members.follow(events)
        clients = [{"port": port, "mac": MACS[port]} for port in PORTS]
        wires.load(switch, clients, change, heard=members.heard(PORTS))
        for group in [*GROUPS, *OF_THE_LINK]:
            for source in FROM[family(group)]:
                for at in (PORTS[0], UPLINK):
                    wires.forget()
                    wrong = disagreement(wires, switch, members, (at, group, source))
                    assert not wrong, f"{wrong}; {members.now} ms"
                    count.sent += 1
                    wanted = [gets(switch, members, port, group, source) for port in MEMBERS]
                    count.passed += any(wanted) and not all(wanted)

    try:
        each()
    except AssertionError as error:
        return count, ["\n".join([*getattr(error, "__notes__", []), str(error)])]
    return count, []


def main() -> int:
    """Make histories of one seed after the other."""
    with wires_of_its_own() as wires:

        def of_seed(number: int) -> seeds.Outcome:
            count, wrong = run(wires, number, OF_A_SEED)
            return count.sent, wrong

        return seeds.main(of_seed)


if __name__ == "__main__":
    sys.exit(main())
