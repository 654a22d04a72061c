"""The description of scenario documents: its examples are documents, and it leaves out no key."""

import json
import re
from pathlib import Path
from typing import Any, Iterator

import pytest

from simulated_host import Host

SIMHOST = Path(__file__).parents[3] / "simhost"
TEXT = (SIMHOST / "SCENARIOS.md").read_text(encoding="utf-8")
EXAMPLES = re.findall(r"^```json\n(.*?)^```", TEXT, re.MULTILINE | re.DOTALL)
SOURCES = [
    SIMHOST / "scenario" / name
    for name in ("scenario.cpp", "scenario_switches.cpp", "policy_documents.cpp")
]


def keys_read() -> Iterator[str]:
    """The keys that the reader accepts, as its own lists of them say."""
    for source in SOURCES:
        for keys in re.findall(
            r"\.only\(\{(.*?)\}\)", source.read_text(encoding="utf-8"), re.DOTALL
        ):
            yield from re.findall(r'"(\w+)"', keys)


def keys_of(value: Any) -> Iterator[str]:
    if isinstance(value, dict):
        for key, inner in value.items():
            yield key
            yield from keys_of(inner)
    elif isinstance(value, list):
        for inner in value:
            yield from keys_of(inner)


def test_there_is_an_example_for_every_key() -> None:
    shown = {key for example in EXAMPLES for key in keys_of(json.loads(example))}
    read = set(keys_read())
    assert {"alias", "received_by", "limit_policy", "nth"} <= read
    assert read - shown == {"observed"}


def test_every_key_is_in_a_table() -> None:
    rows = "\n".join(re.findall(r"^\|.*", TEXT, re.MULTILINE))
    sections = set(re.findall(r"^##+ (\w+)", TEXT, re.MULTILINE))
    in_tables = set(re.findall(r"`(\w+)`", rows))
    assert set(keys_read()) - in_tables - sections == {"observed"}


def test_every_runtime_option_is_in_a_table_with_its_first_value(host: Host) -> None:
    for option, value in host.described()["runtime_options"].items():
        (row,) = re.findall(rf"^\|[^|]*`{option}`.*$", TEXT, re.MULTILINE)
        assert row.split("|")[-2].strip().strip("`") == str(value), option


@pytest.mark.parametrize("example", EXAMPLES, ids=[f"example{n}" for n in range(len(EXAMPLES))])
def test_every_example_is_a_document(host: Host, example: str) -> None:
    host.ctl("apply", "-", given=example)
    wanted = json.loads(example)
    assert set(wanted) <= set(host.described())


def test_the_default_host_is_a_document_like_any_other(host: Host, tmp_path: Path) -> None:
    other = Host(tmp_path / "other")
    (tmp_path / "other").mkdir()
    other.environment["SIMHOST_SCENARIO"] = str(SIMHOST / "scenario" / "default_host.json")
    fresh, again = host.described(), other.described()
    assert fresh["uplinks"] == again["uplinks"]
    for shown in (fresh, again):
        for port in shown["switches"][0]["ports"]:
            for group in port["groups"]:
                del group["observed"]
    assert fresh["switches"] == again["switches"]
