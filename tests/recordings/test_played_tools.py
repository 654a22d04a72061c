"""Tools that were recorded run again without any host, and do the same."""

import os
import sys
from pathlib import Path
from typing import Dict, List

import pytest
from programs import EXAMPLES
from recordings import SIMULATED, play, record_tool

TOOLS: Dict[str, List[str]] = {
    "apply": ["document.json"],
    "compliance": ["--mtu", "9000", "--forbids", "forged_transmits", "--fix"],
    "failover_drill": ["vswitch0"],
    "find_mac": ["0200.0000.0102"],
    "first_steps": [],
    "inventory": ["--json"],
    "mirror": ["vswitch0", "web-1", "web-2", "--for", "0"],
    "records": [],
    "tour": [],
}
DOCUMENT = (
    '{"switches": [{"alias": "vswitch0", "mtu": 9000, "ports": [{"id": "new-1", "vlan": 7}]}]}'
)

# What the tour asks of the world outside does not go through calls: it says the same again.
OUTSIDE = """#!/bin/sh
count=$(cat "$SAID/count" 2>/dev/null || echo 0)
echo $((count + 1)) >"$SAID/count"
[ -z "$ASKED" ] || "$ASKED" "$@" >"$SAID/$count"
cat "$SAID/$count"
"""


def test_every_example_is_played() -> None:
    assert {one.stem for one in EXAMPLES.glob("*.py")} - {"private_host"} == set(TOOLS)


@pytest.mark.parametrize("name", TOOLS)
def test_a_tool_does_the_same_without_a_host(name: str, tmp_path: Path, alone: Path) -> None:
    (tmp_path / "document.json").write_text(DOCUMENT)
    (tmp_path / "simhostctl").write_text(OUTSIDE)
    (tmp_path / "simhostctl").chmod(0o755)
    words = [str(tmp_path / one) if one.endswith(".json") else one for one in TOOLS[name]]
    command = [sys.executable, str(EXAMPLES / f"{name}.py"), *words]
    around = {"PATH": f"{tmp_path}{os.pathsep}{os.environ['PATH']}", "SAID": str(tmp_path)}
    made = record_tool(
        command,
        tmp_path / "trace.jsonl",
        SIMULATED,
        ASKED=str(SIMULATED / "simhostctl"),
        SIMHOST_STATE=str(tmp_path / "host.db"),
        **around,
    )
    assert (made.status, made.stderr) == (0, "") and made.stdout
    (tmp_path / "count").unlink(missing_ok=True)
    done = play(command, made.trace, alone, ASKED="", **around)
    assert (done.status, done.stdout, done.stderr) == (0, made.stdout, "")
    assert (done.left, done.has_failed) == ([], False)
