"""What the table of the settings says of frames is what they do: a setting that frames obey changes
what Open vSwitch is told, and one that is kept does not."""

import json
import os
from pathlib import Path
from typing import Any, Dict, List, Mapping, Optional, Sequence, Tuple

import pytest

from compiler import Compiler
from obeyed import CLIENTS, OBEYED, Shown, with_settings

PROPERTIES = json.loads(
    Path(os.environ["BUILD_DIR"], "simhost", "properties.json").read_text(encoding="utf-8")
)["properties"]
TESTS = Path(__file__).parents[2]
SETTINGS = [known for known in PROPERTIES if not known["computed"]]
# Values of those that documents name and no frame looks at.
KEPT = {
    ("port", "alias"): [Shown("somebody", [])],
    ("port", "connection"): [Shown(77, [])],
}
ERSPAN: Dict[str, Any] = {"type": "erspan3", "id": 7}
WRAPS: Dict[str, Any] = {
    "sid": "s",
    "type": "encapsulated",
    "sent_by": [{"port": "p1"}],
    "to": [{"ip": "192.0.2.7"}],
    "encapsulation": ERSPAN,
}


def named(known: Mapping[str, Any]) -> Tuple[str, str]:
    return known["scope"], known["name"]


def in_words(known: Mapping[str, Any]) -> str:
    return "_".join(named(known))


def told(
    compiler: Compiler,
    scope: str,
    settings: Mapping[str, Any],
    clients: Sequence[Mapping[str, Any]] = CLIENTS,
    host: Optional[Mapping[str, Any]] = None,
) -> Any:
    """What Open vSwitch is told of a switch that has them, or whose first port has."""
    made = compiler.compile(with_settings(scope, dict(settings)), clients, host=host)
    return sorted(made["flows"]), sorted(made["groups"])


def test_there_are_values_for_each_setting_that_documents_name() -> None:
    assert {named(known) for known in SETTINGS if "name" in known} == {*OBEYED, *KEPT}


@pytest.mark.parametrize("known", [one for one in SETTINGS if "name" in one], ids=in_words)
def test_the_table_is_true(compiler: Compiler, known: Mapping[str, Any]) -> None:
    scope, name = named(known)
    for one in OBEYED.get((scope, name), []) + KEPT.get((scope, name), []):
        plain = told(compiler, scope, one.beside, one.clients)
        changes = told(compiler, scope, {**one.beside, name: one.value}, one.clients) != plain
        assert known["frames"] == ("obey" if changes else "kept"), one.value


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


SESSION = OBEYED[("port", "mirror_sessions")][0].value[0]


@pytest.mark.parametrize(
    "setting, member, value, other",
    [
        ("mirror_sessions", "sampling_rate", [SESSION], [{**SESSION, "sampling_rate": 10}]),
        ("uplink_mirror_sessions", "sampling_rate", [SESSION], [{**SESSION, "sampling_rate": 10}]),
        # The clients here are those whose devices nobody sees.
        ("forbids", "mac_changes", [], ["mac_changes"]),
        ("mac_learning", "mac_change", {"mac_change": True}, {"mac_change": False}),
    ],
)
def test_what_frames_cannot_obey_is_named(
    compiler: Compiler, setting: str, member: str, value: Any, other: Any
) -> None:
    (known,) = (one for one in SETTINGS if one.get("name") == setting and "beyond_frames" in one)
    assert known["beyond_frames"].startswith(f"`{member}`: ")
    scope = known["scope"]
    assert told(compiler, scope, {setting: value}) == told(compiler, scope, {setting: other})


KEPT_OF_WRAPPING: List[Dict[str, Any]] = [{}, {"vlan": 7}, {"cos": 3}, {"granularity": 2}]
KEPT_FLAGS = ["all_available", "reverse", "best_effort", "shotgun", "block_output"]


@pytest.mark.parametrize(
    "scope, name, values",
    [
        ("switch", "teaming", [{"flags": [flag] * few} for flag in KEPT_FLAGS for few in (0, 1)]),
        ("port", "ethernet_filter", [{"frames": few} for few in ([], ["unicast"], ["broadcast"])]),
        (
            "port",
            "mirror_sessions",
            [[{**WRAPS, "encapsulation": {**ERSPAN, **more}}] for more in KEPT_OF_WRAPPING],
        ),
    ],
)
def test_what_is_kept_of_a_setting_changes_nothing(
    compiler: Compiler, scope: str, name: str, values: List[Any]
) -> None:
    host = {"underlay": {"device": "eth9", "address": "192.0.2.1/24"}}
    first, *others = (told(compiler, scope, {name: value}, host=host) for value in values)
    assert others == [first] * len(others)


@pytest.mark.parametrize(
    "option", ["ReversePathFwdCheck", "ReversePathFwdCheckPromisc", "AllowFastPath"]
)
def test_options_that_are_kept_change_nothing(compiler: Compiler, option: str) -> None:
    said = (TESTS.parent / "simhost" / "SCENARIOS.md").read_text(encoding="utf-8")
    (row,) = (line for line in said.splitlines() if line.startswith("| ") and f"`{option}`" in line)
    assert "kept without effect" in row or "likewise" in row
    hosts = ({"runtime_options": {option: value}} for value in (0, 1))
    off, on = (told(compiler, "port", {}, host=host) for host in hosts)
    assert off == on


def test_nothing_else_is_beyond_them() -> None:
    beyond = {known.get("name") for known in PROPERTIES if "beyond_frames" in known}
    assert beyond == {"mirror_sessions", "uplink_mirror_sessions", "forbids", "mac_learning"}


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
