"""The description of scenario documents: its examples are documents, and it leaves out no key."""

import json
import os
import re
from pathlib import Path
from typing import Any, Dict, Iterator, List, Tuple

import pytest

from simulated_host import Host

SIMHOST = Path(__file__).parents[3] / "simhost"
TEXT = (SIMHOST / "SCENARIOS.md").read_text(encoding="utf-8")
EXAMPLES = re.findall(r"^```json\n(.*?)^```", TEXT, re.MULTILINE | re.DOTALL)
REFERENCE = json.loads(
    (Path(os.environ["BUILD_DIR"]) / "simhost" / "properties.json").read_text(encoding="utf-8")
)
OBJECTS: Dict[str, List[Dict[str, Any]]] = REFERENCE["objects"]
NAMED: List[Dict[str, Any]] = [known for known in REFERENCE["properties"] if "name" in known]
IDS = [f"{known['scope']}.{known['name']}" for known in NAMED]


def keys_of_structure() -> Iterator[str]:
    """The keys that are no settings."""
    for keys in REFERENCE["keys"].values():
        yield from keys
    for members in OBJECTS.values():
        yield from (member["name"] for member in members)


def forms_in(form: Dict[str, Any]) -> Iterator[Tuple[str, Dict[str, Any]]]:
    """The members that a form has, and theirs."""
    for member in form.get("members", []):
        yield member["name"], member
        yield from forms_in(member)
    if "element" in form:
        yield from forms_in(form["element"])


def keys_of_settings() -> Iterator[str]:
    for known in NAMED:
        yield known["name"]
        yield from (name for name, _ in forms_in(known["value"]))


def keys_read() -> Iterator[str]:
    yield from keys_of_structure()
    yield from keys_of_settings()


def keys_of(value: Any) -> Iterator[str]:
    if isinstance(value, dict):
        for key, inner in value.items():
            yield key
            yield from keys_of(inner)
    elif isinstance(value, list):
        for inner in value:
            yield from keys_of(inner)


def section(title: str) -> str:
    """What stands below a heading, up to the next one."""
    (found,) = re.findall(rf"^##+ {title}\n(.*?)(?=^##|\Z)", TEXT, re.MULTILINE | re.DOTALL)
    return str(found)


def row_of(where: str, key: str) -> str:
    """The row of a key in a section, which may be that of several."""
    (row,) = [line for line in where.splitlines() if re.match(rf"\|[^|]*`{key}`[^|]*\|", line)] or [
        ""
    ]
    return row


def section_of(known: Dict[str, Any]) -> str:
    """Where the members of a setting are told."""
    if known["name"] == "mac_learning":
        return section("mac_learning of ports" if known["scope"] == "port" else "mac_learning")
    return section(known["name"].replace("uplink_mirror", "mirror"))


def numbers_in(form: Dict[str, Any]) -> List[str]:
    """What a row has to say of the bounds and words of a form."""
    if form["form"] in ("number", "range"):
        return [f"{form['least']:,} to {form['greatest']:,}"]
    if form["form"] in ("choice", "bits"):
        return [f"`{word}`" for word in form["choices"]]
    if form["form"] == "text" and "most_bytes" in form:
        return [f"up to {form['most_bytes']} bytes"]
    return []


ALL_32_BITS = f"{0xFFFFFFFF:,}"


def bounds_in(member: Dict[str, Any]) -> List[str]:
    """Likewise, for a member of an object: all that 32 bits hold is no bound."""
    if member["form"] == "list":
        return [f"up to {member['most']}"] if "most" in member else []
    return [bound for bound in numbers_in(member) if not bound.endswith(ALL_32_BITS)]


def told_default(row: str) -> str:
    return row.split("|")[-2].strip().strip("`")


def default_of(value: Any) -> List[str]:
    """How a row may tell of a default."""
    if value in ([], ""):
        return ["none"]
    return [value] if isinstance(value, str) else [json.dumps(value)]


def test_there_is_an_example_for_every_key() -> None:
    shown = {key for example in EXAMPLES for key in keys_of(json.loads(example))}
    read = set(keys_read())
    assert {"alias", "received_by", "limit_policy", "nth", "granularity"} <= read
    assert read - shown == {"observed"}


def test_every_key_is_in_a_table() -> None:
    rows = "\n".join(re.findall(r"^\|.*", TEXT, re.MULTILINE))
    sections = set(re.findall(r"^##+ (\w+)", TEXT, re.MULTILINE))
    in_tables = set(re.findall(r"`(\w+)`", rows))
    assert set(keys_read()) - in_tables - sections == {"observed"}


@pytest.mark.parametrize("known", NAMED, ids=IDS)
def test_a_setting_has_a_row_with_its_bounds_and_its_default(known: Dict[str, Any]) -> None:
    row = row_of(section({"switch": "switches", "port": "ports"}[known["scope"]]), known["name"])
    assert row
    form = known["value"]
    assert [number for number in numbers_in(form) if number not in row] == []
    if "members" not in form and "element" not in form:
        assert told_default(row) in default_of(known["default"])


@pytest.mark.parametrize("known", NAMED, ids=IDS)
def test_a_member_has_a_row_with_its_bounds_and_its_default(known: Dict[str, Any]) -> None:
    form = known["value"].get("element", known["value"])
    for member in form.get("members", []):
        row = row_of(section_of(known), member["name"])
        assert row, member["name"]
        if known["name"] != "mac_learning" or known["scope"] == "port":
            missing = [number for number in numbers_in(member) if number not in row]
            assert missing == [], member["name"]
        if "default" in member:
            assert told_default(row) in default_of(member["default"]), member["name"]


@pytest.mark.parametrize("name", OBJECTS)
def test_a_member_of_an_object_has_a_row_with_its_bounds_and_its_default(name: str) -> None:
    assert OBJECTS[name]
    for member in OBJECTS[name]:
        row = row_of(section(name), member["name"])
        assert row, member["name"]
        assert [bound for bound in bounds_in(member) if bound not in row] == [], member["name"]
        if "default" in member:
            assert told_default(row) in default_of(member["default"]), member["name"]


def test_a_setting_of_uplink_ports_has_a_row() -> None:
    names = [
        known["uplink_port_name"]
        for known in REFERENCE["properties"]
        if "uplink_port_name" in known
    ]
    assert {"name", "blocked"} <= set(names)
    assert [name for name in names if not row_of(section("uplink_ports"), name)] == []


def test_a_wrong_bound_or_default_would_be_noticed() -> None:
    row = "| `mtu` | 1,280 to 9,000 | 1501 |"
    (bounds,) = numbers_in({"form": "number", "least": 1280, "greatest": 9190})
    assert bounds not in row
    assert told_default(row) not in default_of(1500)


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
