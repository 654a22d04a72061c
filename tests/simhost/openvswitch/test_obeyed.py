"""Frames obey what the table of the settings says that they do: for each value some go another way,
through a data path."""

import ast
from pathlib import Path
from typing import Any, Dict, Iterator, List, Tuple

import pytest

from compiler import Compiler
from obeyed import OBEYED, Shown, with_settings
from open_vswitch import OpenVSwitch
from wires import Arrived, Wires

TESTS = Path(__file__).parents[2]
SHOWN = [
    (scope, name, one) for (scope, name), values in OBEYED.items() for one in values if not one.test
]


@pytest.fixture(scope="module")
def wires(
    open_vswitch: OpenVSwitch, compiler: Compiler, tmp_path_factory: pytest.TempPathFactory
) -> Iterator[Wires]:
    yield Wires(open_vswitch, compiler, tmp_path_factory.mktemp("obeyed"), 4, "obeyed")


def ways(wires: Wires, scope: str, settings: Dict[str, Any], shown: Shown) -> List[List[Arrived]]:
    """Where the frames come out of a switch that has these settings, and of another one before."""
    wires.load(with_settings(scope, {**shown.beside, **settings}), shown.clients)
    wires.forget()
    return [sorted(wires.transmit(at, data).elements()) for at, data in shown.frames]


@pytest.mark.parametrize(
    "scope, name, shown", SHOWN, ids=[f"{scope}_{name}" for scope, name, _ in SHOWN]
)
def test_frames_go_another_way(wires: Wires, scope: str, name: str, shown: Shown) -> None:
    without = ways(wires, scope, {}, shown)
    obeyed = ways(wires, scope, {name: shown.value}, shown)
    assert obeyed != without
    # Not by chance.
    assert ways(wires, scope, {}, shown) == without


@pytest.mark.parametrize(
    "scope, name, value",
    [
        ("port", "alias", "somebody"),
        ("port", "connection", 77),
        ("switch", "teaming", {"flags": ["all_available", "reverse", "block_output"]}),
        ("port", "ethernet_filter", {"frames": ["unicast", "broadcast"]}),
    ],
)
def test_they_do_not_for_what_is_kept_without_effect(
    wires: Wires, scope: str, name: str, value: Any
) -> None:
    frames = [frame for _, _, shown in SHOWN for frame in shown.frames]
    all_of_them = Shown(value, sorted(set(frames)))
    without = ways(wires, scope, {}, all_of_them)
    assert any(without)
    assert ways(wires, scope, {name: value}, all_of_them) == without


def names_in(file: str) -> List[str]:
    tree = ast.parse((TESTS / file).read_text(encoding="utf-8"))
    return [one.name for one in tree.body if isinstance(one, ast.FunctionDef)]


def test_what_takes_time_has_a_test_of_its_own() -> None:
    named: List[Tuple[str, ...]] = [
        tuple(one.test.split("::")) for values in OBEYED.values() for one in values if one.test
    ]
    assert named
    assert [(file, test) for file, test in named if test not in names_in(file)] == []
