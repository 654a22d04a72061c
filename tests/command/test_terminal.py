"""What people see at a terminal: colours, a line while something takes long, narrow windows."""

import re
from pathlib import Path
from typing import List

import pytest
from command_line import SIMULATED, on_terminal
from simhost import SharedHost

MARKUP = "[red]a[/x] :smile:"


@pytest.fixture
def marked(lab: SharedHost) -> SharedHost:
    """A host whose names look like the markup of the library that writes to terminals."""
    ports = [{"id": f"{MARKUP}1"}, {"id": f"{MARKUP}2"}]
    lab.apply({"switches": [{"alias": MARKUP, "uplinks": ["nic2"], "ports": ports}]})
    lab.link("nic2").up()
    return lab


@pytest.mark.parametrize(
    "words",
    [
        ["list"],
        ["show", f"{MARKUP}/{MARKUP}1"],
        ["mirror", f"{MARKUP}/{MARKUP}1", "--to", f"{MARKUP}/{MARKUP}2", "--for", "0"],
        ["drill", MARKUP],
    ],
    ids=["list", "show", "mirror", "drill"],
)
def test_names_are_no_markup(marked: SharedHost, words: List[str]) -> None:
    status, seen = on_terminal(marked, *words, columns=200)
    # Nobody carries the ports during the drill.
    assert status == (1 if words[0] == "drill" else 0), seen
    assert MARKUP in seen


def test_a_line_tells_how_far_it_is(lab: SharedHost, tmp_path: Path) -> None:
    mirror = ("mirror", "lab/web-1", "--to", "lab/web-2", "--for", "0")
    assert "mirroring lab/web-1: 0 s left" in on_terminal(lab, *mirror)[1]
    assert "drill of lab: nic1, 2 of 2" in on_terminal(lab, "drill", "lab")[1]
    document = tmp_path / "document"
    document.write_text("switches: [{alias: lab, mtu: 1500}]")
    assert "reading the host" in on_terminal(lab, "backup")[1]
    assert "reading the host" in on_terminal(lab, "snapshot")[1]
    status, seen = on_terminal(lab, "apply", str(document), columns=200)
    assert status == 0 and f"reading {document}" in seen and "changing the host" in seen


@pytest.mark.parametrize("columns", [1, 40])
def test_a_narrow_window(lab: SharedHost, columns: int) -> None:
    status, seen = on_terminal(lab, "list", columns=columns)
    assert status == 0 and seen.startswith(SIMULATED)
    plain = re.sub("\x1b[^m]*m", "", seen.replace(SIMULATED, ""))
    assert max(map(len, plain.splitlines())) <= columns
    if columns == 40:
        assert all(word in plain for word in ("lab", "9000", "2 of 64", "nic0"))


def test_colours_are_for_terminals_that_want_them(lab: SharedHost) -> None:
    cyan = "\x1b[36m"
    assert cyan in on_terminal(lab, "show", "lab")[1]
    assert cyan not in on_terminal(lab, "show", "lab", NO_COLOR="1")[1]
    assert "\x1b" not in on_terminal(lab, "show", "lab", TERM="dumb")[1]
