"""Small switches, one feature each, and the flows that the rules ask for, written by hand; and what
Open vSwitch says that it has, once it was told.

A file has a sentence, a switch with its clients, and sections: the words that the lines of text
which are meant have in common, and those lines, all of them in any order."""

import json
import re
from pathlib import Path
from typing import Any, Dict, Iterator, List, Mapping, Tuple

import pytest

from compiler import Compiler
from open_vswitch import OpenVSwitch

GOLDENS = sorted((Path(__file__).parent / "goldens").glob("*.txt"))


def read(golden: Path) -> Tuple[Mapping[str, Any], Dict[str, List[str]]]:
    said, *sections = golden.read_text(encoding="utf-8").split("\n-- ")
    _, _, document = said.partition("\n")
    lines = (section.splitlines() for section in sections)
    return json.loads(document), {first: sorted(rest) for first, *rest in lines}


def has(line: str, words: str) -> bool:
    """Whether it is one of a section's: has each content, or some content of each field."""
    match = line.split(" actions=")[0] if " actions=" in line else line.split(",bucket=")[0]
    contents = re.split("[ ,]+", match)
    if "group_id" not in match and "table=" not in match:
        contents.append("table=0")  # which ovs-ofctl leaves out
    return all(
        any(content == word or content.startswith(f"{word}=") for content in contents)
        for word in words.split()
    )


@pytest.fixture(params=GOLDENS, ids=[golden.stem for golden in GOLDENS])
def golden(request: pytest.FixtureRequest) -> Iterator[Path]:
    yield request.param


def test_it_is_compiled_to_that(golden: Path, compiler: Compiler) -> None:
    document, sections = read(golden)
    made = compiler.compile(**document)
    lines = [*made["flows"], *made["groups"]]
    assert any(sections.values())
    for words, wanted in sections.items():
        assert sorted(line for line in lines if has(line, words)) == wanted, words


def test_open_vswitch_has_what_it_was_told(
    golden: Path, compiler: Compiler, open_vswitch: OpenVSwitch
) -> None:
    document, _ = read(golden)
    made = compiler.compile(**document)
    open_vswitch.have_bridge("goldens")
    open_vswitch.load("goldens", made["flows"], made["groups"])
    assert open_vswitch.flows("goldens") == sorted(made["flows"])
    assert open_vswitch.groups("goldens") == sorted(made["groups"])
