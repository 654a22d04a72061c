"""What the README shows is what its commands write."""

import doctest
import json
import os
import re
import subprocess
import sys
from pathlib import Path
from typing import Any, Dict, Iterator, List, Tuple

import pytest

SIMHOST = Path(__file__).parents[3] / "simhost"
BUILD = Path(os.environ["BUILD_DIR"])
TEXT = (SIMHOST / "README.md").read_text(encoding="utf-8")

MARK = "\x1e"
#: What is another in every run: times, and how long ago something was seen.
VOLATILE = re.compile(r"\b\d{10}\.\d{3}\b|\b\d{13}\b|(?<=seen )\d+(?= s ago)")


def blocks(language: str) -> List[str]:
    return re.findall(rf"^```{language}\n(.*?)^```", TEXT, re.MULTILINE | re.DOTALL)


def commands(block: str) -> Iterator[Tuple[str, List[str]]]:
    """Each command of a block, which may go over several lines, and the lines below it."""
    for part in re.split(r"^\$ ", block, flags=re.MULTILINE)[1:]:
        lines = part.splitlines()
        more = next((n for n, line in enumerate(lines[1:], 1) if line[:2] != "> "), len(lines))
        yield "\n".join([lines[0], *(line[2:] for line in lines[1:more])]), lines[more:]


def plain(lines: List[str]) -> List[str]:
    return [VOLATILE.sub("#", line) for line in lines]


def written(folder: Path, script: List[str]) -> List[List[str]]:
    """What each of the commands writes, one after the other in one shell."""
    (folder / "python3").symlink_to(sys.executable)
    clean = {name: value for name, value in os.environ.items() if not name.startswith("SIMHOST_")}
    clean["PATH"] = f"{folder}{os.pathsep}{BUILD / 'simhost'}{os.pathsep}{clean['PATH']}"
    marked = "exec 2>&1\n" + "".join(f"printf '{MARK}'\n{command}\n" for command in script)
    output = subprocess.run(
        ["bash", "-c", marked],
        cwd=folder,
        env=clean,
        stdout=subprocess.PIPE,
        encoding="utf-8",
        check=False,
    ).stdout
    return [part.splitlines() for part in output.split(MARK)[1:]]


def test_consoles_show_what_commands_write(tmp_path: Path) -> None:
    shown = [pair for block in blocks("console") for pair in commands(block)]
    assert len(shown) > 15
    script = [
        command.replace("/tmp/host.db", str(tmp_path / "host.db")).replace("=build/", f"={BUILD}/")
        for command, _ in shown
    ]
    for (command, expected), found in zip(shown, written(tmp_path, script)):
        assert plain(found) == plain(expected), command


def test_interpreters_show_what_expressions_are() -> None:
    (session,) = blocks("pycon")
    session = session.replace('"build/', f'"{BUILD}/')
    example = doctest.DocTestParser().get_doctest(session, {}, "README", "README.md", 0)
    assert len(example.examples) > 3
    assert doctest.DocTestRunner().run(example).failed == 0


PROPERTIES = json.loads((BUILD / "simhost" / "properties.json").read_text(encoding="utf-8"))
PREFIXES = "com.quorix.vswitch.", "com.quorix.common."
FIRST_CELLS = re.findall(r"^\|([^|\n]*`[^|\n]*)\|(.*)\|$", TEXT, re.MULTILINE)


def rows_of(key: str) -> List[str]:
    """The rows of the tables that are about a key."""
    short = [key, *(key[len(prefix) :] for prefix in PREFIXES if key.startswith(prefix))]
    return [rest for cell, rest in FIRST_CELLS if any(f"`{name}`" in cell for name in short)]


def told_of(known: Dict[str, Any]) -> List[str]:
    """What a row has to say of a property."""
    value = known["value"]
    full = value.get("greatest") == 2**32 - 1
    told = []
    if value["form"] == "number" and not full and not known["computed"]:
        told.append(f"{value['least']:,} to {value['greatest']:,}")
    if value["form"] == "text" and known["typed"]:
        told.append(f"up to {value['most_bytes']} bytes")
    if value["form"] == "number" and "default" in known:
        told.append(f"{known['default']:,}")
    return told


@pytest.mark.parametrize(
    "known",
    [known for known in PROPERTIES["properties"] if not known["any_bytes"]],
    ids=lambda known: str(known["key"]),
)
def test_a_property_has_a_row_with_its_bounds_and_its_default(known: Dict[str, Any]) -> None:
    rows = rows_of(known["key"])
    assert rows
    assert any(all(told in row for told in told_of(known)) for row in rows), told_of(known)


def test_a_wrong_line_would_be_noticed(tmp_path: Path) -> None:
    block = "$ echo one &&\n> echo two\none\nthree\n"
    ((command, expected),) = commands(block)
    (found,) = written(tmp_path, [command])
    assert (found, expected) == (["one", "two"], ["one", "three"])
