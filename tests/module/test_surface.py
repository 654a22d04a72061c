"""The surface of the module, both ways: everything that must be there is, and nothing else."""

import json
import os
import subprocess
import sys
from typing import Any, Dict, List, Set, Tuple

import _libvswitch as vs
import functions
import pointer_types
import records

IMPORT_ATTRIBUTES = {"__name__", "__doc__", "__package__", "__loader__", "__spec__", "__file__"}
NAMES: List[str] = [name for name in vars(vs) if name not in IMPORT_ATTRIBUTES]
IMPLEMENTED: Set[str] = {name for name in NAMES if callable(getattr(vs, name))}


def expected_constants() -> List[Tuple[str, Any]]:
    """The constants in their order, with `cvar` where the table marks it."""
    text = (records.TABLE.parent / "constants.txt").read_text(encoding="ascii")
    rows: List[Tuple[str, Any]] = []
    for line in text.splitlines():
        if line == "@cvar":
            rows.append(("cvar", vs.cvar))
        elif line and not line.startswith("#"):
            name, value = line.split(" = ")
            rows.append((name, value[1:-1] if value.startswith('"') else int(value)))
    return rows


def test_constants_in_order() -> None:
    found = [(name, getattr(vs, name)) for name in NAMES if name not in IMPLEMENTED]
    assert found == expected_constants()


def test_constants_are_plain_integers_and_texts() -> None:
    values = [value for name, value in expected_constants() if name != "cvar"]
    installed = [getattr(vs, name) for name, _ in expected_constants() if name != "cvar"]
    assert [type(value) for value in installed] == [type(value) for value in values]
    assert sum(type(value) is int for value in installed) == 847
    assert sum(type(value) is str for value in installed) == 72


def test_functions() -> None:
    assert IMPLEMENTED == {function.name for function in functions.read()}


def test_counts_of_functions() -> None:
    kinds: Dict[str, Set[str]] = {}
    for function in functions.read():
        kinds.setdefault(function.kind, set()).add(function.name)
    assert {kind: len(names & IMPLEMENTED) for kind, names in kinds.items()} == {
        "reader": 461,
        "writer": 449,
        "constructor": 91,
        "destructor": 91,
        "registration": 89,
        "call": 146,
        "method": 44,
        "helper": 3,
        "runtime": 1,
    }


def test_types() -> None:
    """In a process of its own: other modules of the runtime bring types of their own."""
    program = (
        "import json, sys; sys.path.insert(0, sys.argv[1])\n"
        "import native\n"
        "print(json.dumps(native.type_tables()))"
    )
    folder = os.path.dirname(__file__)
    done = subprocess.run(
        [sys.executable, "-c", program, folder], check=True, capture_output=True, text=True
    )
    (table,) = json.loads(done.stdout)
    assert {frozenset(spellings) for spellings in table.values()} == set(pointer_types.read())
    assert len(table) == 158


def test_variables() -> None:
    assert sorted(str(vs.cvar)[1:-1].split(", ")) == ["qex_ModuleCurrentID", "runtimeOptionNames"]
