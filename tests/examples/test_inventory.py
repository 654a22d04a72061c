"""examples/inventory.py: a table, JSON that is a document, and queries that are refused."""

import json
import sys
from pathlib import Path
from typing import Any, Callable

import pytest
from simhost import SharedHost

LAB = {
    "uplinks": [{"name": "nic0", "link": "down"}, {"name": "nic1"}],
    "switches": [
        {"alias": "zoo", "id": "z-1", "mtu": 9000, "max_ports": 8, "uplinks": ["nic0", "nic1"]},
        {"alias": "lab", "id": "l-1", "ports": [{"id": "b"}, {"id": "a"}]},
    ],
}
TABLE = """\
SWITCH      MTU   PORTS       UPLINKS
lab         1500  2 of 128    none
zoo         9000  0 of 8      nic0 down, nic1 up
"""


@pytest.mark.scenario(LAB)
def test_a_table(example: Callable[..., Any]) -> None:
    assert example("inventory") == (0, TABLE.splitlines(), "")


@pytest.mark.scenario(LAB)
def test_json(shared_host: SharedHost, example: Callable[..., Any], tmp_path: Path) -> None:
    status, lines, errors = example("inventory", "--json")
    assert (status, errors) == (0, "")
    lab, zoo = switches = json.loads("\n".join(lines))
    known = ("alias", "id", "mtu", "max_ports", "running", "uplinks")
    assert [lab[key] for key in known] == ["lab", "l-1", 1500, 128, True, []]
    assert [zoo[key] for key in known] == ["zoo", "z-1", 9000, 8, True, ["nic0", "nic1"]]
    assert [port["id"] for port in lab["ports"]] == ["b", "a"]

    # It is a document that brings back what was changed.
    before = shared_host.describe()["switches"]
    shared_host.apply({"switches": [{"alias": "zoo", "mtu": 1600}]})
    assert shared_host.describe()["switches"] != before
    (tmp_path / "state.json").write_text(json.dumps({"switches": switches}))
    said = ["zoo/mtu: 1600 -> 9000"]
    assert example("apply", str(tmp_path / "state.json")) == (0, said, "")
    assert shared_host.describe()["switches"] == before


@pytest.mark.scenario(LAB)
def test_chosen_switches(example: Callable[..., Any]) -> None:
    status, lines, errors = example("inventory", "zoo")
    assert (status, errors) == (0, "")
    assert [line.split()[0] for line in lines] == ["SWITCH", "zoo"]


@pytest.mark.scenario({})
def test_a_host_without_switches(example: Callable[..., Any]) -> None:
    assert example("inventory") == (0, TABLE.splitlines()[:1], "")
    assert example("inventory", "--json") == (0, ["[]"], "")


def test_a_switch_that_does_not_run(shared_host: SharedHost, example: Callable[..., Any]) -> None:
    add = "import _libvswitch as vs; print(vs.DVSQEX_SwitchAdd('s-1', 'still', 16, 200))"
    assert shared_host.run([sys.executable, "-c", add]).stdout == "0\n"
    status, lines, errors = example("inventory", "still")
    assert (status, errors) == (0, "")
    assert lines[1] == "still       1500  0 of 16     does not run"


def test_an_unknown_switch(example: Callable[..., Any]) -> None:
    errors = "inventory: no switch 'nope' (there are vswitch0)\n"
    assert example("inventory", "vswitch0", "nope") == (1, [], errors)


def test_a_query_that_is_refused(shared_host: SharedHost, example: Callable[..., Any]) -> None:
    shared_host.fault("VSQEX_GetUplinkLinkState", nth=2, status="QEX_BUSY")
    errors = (
        "inventory: VSQEX_GetUplinkLinkState(switchName='vswitch0', uplink='nic5'):"
        " QEX_BUSY, Busy\n"
    )
    assert example("inventory") == (1, [], errors)


def test_a_call_that_traps(shared_host: SharedHost, example: Callable[..., Any]) -> None:
    shared_host.fault("VSQEX_GetUplinks", panic=(OSError, "the device is gone"))
    why = "VSQEX_GetUplinks(switchName='vswitch0'): the call trapped: the device is gone"
    assert example("inventory") == (1, [], f"inventory: {why}\n")
