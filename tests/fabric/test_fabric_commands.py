"""The commands of an operator that are a short document each, and those that a fabric has not."""

import itertools
import json
import re
import select
import signal
import subprocess
from pathlib import Path
from typing import Iterator

import pytest

from fabric_lab import SCHEMA, FabricLab
from frame_lab import comes_true
from operating import Operator, of_lab, populate
from vswitch import _table
from vswitch.fabric import Fabric, View


@pytest.fixture
def lab(tmp_path: Path) -> Iterator[FabricLab]:
    with FabricLab(tmp_path) as lab:
        populate(lab.databases)
        yield lab


@pytest.fixture
def operator(lab: FabricLab) -> Operator:
    return Operator(lab)


def test_settings_are_set_and_cleared(operator: Operator) -> None:
    assert operator.told("set", "lab", "mtu=9000") == "lab/mtu: absent -> 9000\n"
    said = operator.told("set", "lab/a", "trunk=10-12,20", "forbids=forged_transmits")
    assert said.splitlines() == [
        "lab/a/vlan: 7 -> id=7 trunk=10-12,20",
        "lab/a/forbids: absent -> forged_transmits",
    ]
    # A member leaves the others as they are.
    operator.told("set", "lab/a", "vlan.priority=3")
    vlan = {"id": 7, "priority": 3, "trunk": ["10-12", 20]}
    assert operator.json("show", "lab/a")["vlan"] == vlan
    assert operator.told("set", "lab", "mtu=9000") == "no changes\n"
    assert operator.told("unset", "lab/a", "vlan") == (
        "lab/a/vlan: id=7 trunk=10-12,20 priority=3 -> absent\n"
    )
    assert "vlan" not in operator.json("show", "lab/a")
    for words, status, said in (
        (("set", "lab", "mtu=1"), 2, "mtu: 1 is below 1280"),
        (("set", "lab/x", "vlan=7"), 1, "no port 'x' of switch 'lab' in the fabric (there are a)"),
        (("set", "lab", "mtu"), 2, "'mtu' is not NAME=VALUE"),
        (("unset", "lab", "x"), 2, "no setting 'x'"),
    ):
        done = operator(*words)
        assert (done.status, said in done.stderr) == (status, True), done
    assert operator.json("show", "lab")["mtu"] == 9000


def test_of_a_member_that_somebody_else_sets_meanwhile_nothing_is_lost(
    operator: Operator, monkeypatch: pytest.MonkeyPatch
) -> None:
    really = Fabric.view

    def view(fabric: Fabric) -> View:
        before = really(fabric)
        monkeypatch.setattr(Fabric, "view", really)
        # In a process of its own, whose change is not this one's.
        assert operator.process("set", "lab/a", "vlan.trunk=10").status == 0
        return before

    monkeypatch.setattr(Fabric, "view", view)
    done = operator("set", "lab/a", "vlan.priority=3")
    assert done.status == 1 and "somebody else changed the same meanwhile" in done.stderr
    assert operator.json("show", "lab/a")["vlan"] == {"id": 7, "trunk": [10]}


def test_a_member_of_what_is_set_byte_by_byte_is_refused(operator: Operator) -> None:
    key = _table.PORT["vlan"].keys[0]
    raw = {key: {"type": "config", "hex": "00ff"}}
    operator.told("apply", "-", given=of_lab(ports=[{"id": "a", "properties": raw}]))
    done = operator("set", "lab/a", "vlan.priority=3")
    assert done.status == 1
    assert f"vlan of lab/a is set byte by byte, as {key}: set it as a whole" in done.stderr
    assert operator.json("show", "lab/a")["properties"] == raw
    assert f"{key}: config 00ff" in operator.told("show", "lab/a")
    operator.told("set", "lab/a", "vlan=8", "vlan.priority=3")
    now = operator.json("show", "lab/a")
    assert now["vlan"] == {"id": 8, "priority": 3} and "properties" not in now


def test_what_no_program_wrote_is_shown_as_it_is(lab: FabricLab, operator: Operator) -> None:
    for written, shown in (("none", "properties: none"), ('{"x.y": 7}', "properties: x.y=7")):
        row = {"settings": ["map", [["properties", written]]]}
        lab.databases.transact({"op": "update", "table": "Port", "where": [], "row": row})
        assert shown in operator.told("show", "lab/a")


def test_wrong_words_are_told_with_where_to_look(operator: Operator) -> None:
    for words, helped in (
        (("set", "lab", "mtu=1"), "vswitch --fabric SERVERS set"),
        (("uplink", "lab"), "vswitch --fabric SERVERS"),
        (("set", "lab"), "vswitch --fabric SERVERS set"),
        (("shew",), "vswitch --fabric SERVERS"),
    ):
        done = operator(*words)
        assert done.status == 2
        assert done.stderr.endswith(f"vswitch: see {helped} --help\n"), done.stderr
    assert operator("set", "--help").stdout.startswith("Usage: vswitch --fabric SERVERS set ")


def test_things_come_and_go(operator: Operator) -> None:
    said = operator.told("add", "new", "--host", "one", "--identifier", "n", "mtu=1600")
    assert said.splitlines() == ["new: absent -> id=n hosts=one", "new/mtu: absent -> 1600"]
    operator.told("add", "new/x", "--external-id", "far", "vlan.priority=2")
    assert operator.json("show", "new/x")["external_id"] == "far"
    there = {one["alias"]: one for one in operator.json("list")}
    assert there["new"]["ports"] == {"x": None}
    for words, said in (
        (("add", "third"), "--host is missing"),
        (("add", "new/y", "--host", "one"), "--host is for a switch"),
        (("add", "other", "--external-id", "x"), "--external-id is for a port"),
    ):
        done = operator(*words)
        assert (done.status, said in done.stderr) == (2, True), done
    done = operator("add", "new/x")
    assert done.status == 1 and "is there already" in done.stderr
    assert operator.told("remove", "new/x") == "new/x: id=x -> absent\n"
    operator.told("remove", "new")
    assert [one["alias"] for one in operator.json("list")] == ["lab"]


def test_a_backup_is_a_document_that_has_it_back(operator: Operator) -> None:
    operator.told("set", "lab/a", "trunk=10-12")
    backup = operator.json("backup")
    assert operator.told("diff", "-", given=backup) == "no changes\n"
    operator.told("remove", "lab")
    operator.told("apply", "-", given=backup)
    assert operator.json("backup") == backup
    assert "alias: lab" in operator.told("backup")


_MTUS = itertools.count(1600)


def is_told_of_a_change(watch: "subprocess.Popen[str]", operator: Operator) -> bool:
    """What is set before it watches it does not tell."""
    operator.told("set", "lab", f"mtu={next(_MTUS)}")
    return bool(select.select([watch.stdout], [], [], 0.2)[0])


def test_what_changes_is_told_until_somebody_interrupts(operator: Operator) -> None:
    watch = operator.start("watch", "--kind", "setting")
    assert watch.stdout is not None
    try:
        assert comes_true(lambda: is_told_of_a_change(watch, operator))
        line = watch.stdout.readline()
    finally:
        watch.send_signal(signal.SIGINT)
        _, wrong = watch.communicate(timeout=30)
    told = r"\d\d:\d\d:\d\d setting lab/mtu: (absent|16\d\d) -> 16\d\d\n"
    assert re.fullmatch(told, line), wrong
    assert watch.returncode == 0, wrong


def test_a_watch_says_once_that_all_servers_are_lost(lab: FabricLab, operator: Operator) -> None:
    watch = operator.start("watch", "--kind", "setting", "--for", "120")
    assert watch.stdout is not None and watch.stderr is not None
    try:
        assert comes_true(lambda: is_told_of_a_change(watch, operator))
        lab.databases.kill(0)
        lost = watch.stderr.readline()
        lab.databases.start(0)
        found = watch.stderr.readline()
        operator.told("set", "lab", "mtu=9000")
        told = watch.stdout.readline()
        while told and not told.endswith(" -> 9000\n"):
            told = watch.stdout.readline()
    finally:
        watch.send_signal(signal.SIGINT)
        _, more = watch.communicate(timeout=30)
    assert told.endswith(" -> 9000\n")
    assert lost.startswith("vswitch: the fabric is lost: tcp:192.0.2.1:6640: ")
    assert found == "vswitch: the fabric can be reached again\n"
    assert (watch.returncode, more) == (0, "")


def test_a_fabric_of_another_version_is_told(tmp_path: Path) -> None:
    schema = tmp_path / "other.ovsschema"
    text = SCHEMA.read_text(encoding="utf-8")
    schema.write_text(json.dumps({**json.loads(text), "version": "2.0.0"}), encoding="utf-8")
    with FabricLab(tmp_path, schema=schema) as lab:
        done = Operator(lab)("list")
        assert done.status == 1
        assert "has a schema of version 2.0.0, which is none of 1.x" in done.stderr


def test_what_is_for_one_host_says_so(operator: Operator) -> None:
    for command in ("uplink", "stats", "confirm", "restore", "mirror"):
        done = operator(command, "lab")
        assert done.status == 2
        assert f"{command!r} is for one host: it goes there, without --fabric" in done.stderr
        assert done.stderr.endswith("\nvswitch: see vswitch --fabric SERVERS --help\n")
    done = operator("apply", "-", "--confirm-within", "5", given=of_lab(mtu=1600))
    assert done.status == 2 and "'--confirm-within' is for one host" in done.stderr
    assert "mtu" not in operator.json("show", "lab")
