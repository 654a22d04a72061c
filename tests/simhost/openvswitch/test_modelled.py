"""What the table of the settings says of frames is what they do: a setting that frames obey changes
what Open vSwitch is told, and one that is kept does not."""

import json
import os
from pathlib import Path
from typing import Any, Dict, List, Mapping, Tuple

import pytest

from compiler import Compiler

PROPERTIES = json.loads(
    Path(os.environ["BUILD_DIR"], "simhost", "properties.json").read_text(encoding="utf-8")
)["properties"]
SETTINGS = [known for known in PROPERTIES if not known["computed"]]
CLIENTS = [
    {"port": "p1", "mac": "02:00:00:00:00:01"},
    {"port": "p2"},
]
TEAM = {"balance": "explicit", "active": ["u2"], "standby": ["u1"]}
MAP = [
    {"primary": 70, "secondary": 70, "type": "promiscuous"},
    {"primary": 70, "secondary": 7, "type": "isolated"},
]
SESSION = {"sid": "s", "to": [{"port": "p2"}]}

# Values of the settings that frames obey, each of which changes something.
OBEYED: Dict[Tuple[str, str], List[Any]] = {
    ("switch", "mtu"): [1280, 9000],
    ("switch", "disabled"): [True],
    ("switch", "teaming"): [TEAM, {"balance": "mac"}, {"balance": "ip"}, {"balance": "explicit"}],
    ("switch", "private_vlans"): [MAP],
    ("switch", "mac_learning"): [{"aging_time": 60}, {"limit": 0}],
    ("switch", "multicast"): ["snooping", "igmp", "mld"],
    ("switch", "uplink_mirror_sessions"): [[{**SESSION, "received_by": [{"uplink": "u1"}]}]],
    ("port", "teaming"): [TEAM],
    ("port", "uplink"): ["u2"],
    ("port", "transmit_uplink"): [True],
    ("port", "vlan"): [7, {"trunk": [7]}, {"guest_tagging": True}, {"priority": 3}],
    ("port", "nested_tag"): [True],
    ("port", "forbids"): [["forged_transmits"]],
    ("port", "mac_learning"): [{"learning": True}, {"flooding": True}],
    ("port", "ethernet_filter"): [
        {"frames": ["promiscuous"]},
        {"frames": ["sink"]},
        {"frames": ["multicast"], "addresses": ["01:00:5e:01:01:01"]},
    ],
    ("port", "mirror_sessions"): [[{**SESSION, "sent_by": [{"port": "p1"}]}]],
    ("port", "blocked"): [True],
}
# Values of those that documents name and no frame looks at.
KEPT: Dict[Tuple[str, str], List[Any]] = {
    ("port", "alias"): ["somebody"],
    ("port", "connection"): [77],
}


def named(known: Mapping[str, Any]) -> Tuple[str, str]:
    return known["scope"], known["name"]


def in_words(known: Mapping[str, Any]) -> str:
    return "_".join(named(known))


def told(compiler: Compiler, scope: str, settings: Mapping[str, Any]) -> Any:
    """What Open vSwitch is told of a switch that has them, or whose first port has."""
    switch: Dict[str, Any] = {
        "uplinks": ["u1", "u2"],
        "ports": [{"id": "p1", "vlan": 7}, {"id": "p2", "vlan": 7}],
    }
    if scope == "port":
        switch["ports"][0].update(settings)
    else:
        switch.update(settings)
    made = compiler.compile(switch, CLIENTS)
    return sorted(made["flows"]), sorted(made["groups"])


def test_there_are_values_for_each_setting_that_documents_name() -> None:
    assert {named(known) for known in SETTINGS if "name" in known} == {*OBEYED, *KEPT}


@pytest.mark.parametrize("known", [one for one in SETTINGS if "name" in one], ids=in_words)
def test_the_table_is_true(compiler: Compiler, known: Mapping[str, Any]) -> None:
    scope, name = named(known)
    plain = told(compiler, scope, {"vlan": 5} if name == "vlan" else {})
    for value in [*OBEYED.get((scope, name), []), *KEPT.get((scope, name), [])]:
        changes = told(compiler, scope, {name: value}) != plain
        assert known["frames"] == ("obey" if changes else "kept"), value


def raw(known: Mapping[str, Any]) -> Dict[str, Any]:
    """The setting as bytes that it takes."""
    value = known["value"]
    size = {"1 byte": 1, "2 bytes": 2, "4 bytes": 4}.get(known["bytes"], 4)
    number = value["greatest"] if value["form"] == "number" else 1
    return {known["key"]: {"type": "config", "hex": number.to_bytes(size, "little").hex()}}


@pytest.mark.parametrize(
    "known",
    [one for one in SETTINGS if "name" not in one],
    ids=[one["key"] for one in SETTINGS if "name" not in one],
)
def test_the_table_is_true_of_what_documents_do_not_name(
    compiler: Compiler, known: Mapping[str, Any]
) -> None:
    scope = known["scope"]
    where = "host_properties" if scope == "host" else "properties"
    changes = told(compiler, scope, {where: raw(known)}) != told(compiler, scope, {})
    assert known["frames"] == ("obey" if changes else "kept")


@pytest.mark.parametrize(
    "setting, member, value",
    [
        ("mirror_sessions", "sampling_rate", 10),
        ("uplink_mirror_sessions", "sampling_rate", 10),
    ],
)
def test_what_frames_cannot_obey_is_named(
    compiler: Compiler, setting: str, member: str, value: Any
) -> None:
    (known,) = (one for one in SETTINGS if one.get("name") == setting)
    assert known["beyond_frames"].startswith(f"`{member}`: ")
    scope = known["scope"]
    session = OBEYED[(scope, setting)][0][0]
    assert told(compiler, scope, {setting: [{**session, member: value}]}) == told(
        compiler, scope, {setting: [session]}
    )


def test_nothing_else_is_beyond_them() -> None:
    beyond = {known.get("name") for known in PROPERTIES if "beyond_frames" in known}
    assert beyond == {"mirror_sessions", "uplink_mirror_sessions"}


def test_nothing_that_frames_obey_is_said_to_be_without_effect() -> None:
    obeyed = [known for known in PROPERTIES if known["frames"] == "obey"]
    assert obeyed
    assert [known["key"] for known in obeyed if "kept without effect" in known["words"]] == []


def test_the_table_for_people_says_it() -> None:
    text = Path(os.environ["BUILD_DIR"], "simhost", "properties.md").read_text(encoding="utf-8")
    for known in PROPERTIES:
        (row,) = (line for line in text.splitlines() if line.startswith(f"| `{known['key']}` |"))
        said = row.split(" | ")[-2]
        assert said.startswith("obeyed" if known["frames"] == "obey" else "kept, without effect")
        assert known.get("beyond_frames", "") in said
