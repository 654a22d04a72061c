"""A tool that is killed between two changes: each setting is old or new, and applied again."""

import json
import signal
import subprocess
import sys
from pathlib import Path
from typing import Any, Dict

import simhost
from conftest import LAB
from test_faults import CHANGE
from vswitch import _table

TOOL = Path(__file__).with_name("killed_tool.py")
EVERYTHING = 10**6


def settings(described: Dict[str, Any]) -> Dict[str, Any]:
    """What is set, by its path; a thing that is there is None."""
    found: Dict[str, Any] = {"mac_learning": described["mac_learning"]}
    for name, value in described["runtime_options"].items():
        found[f"options/{name}"] = value
    for switch in described["switches"]:
        path = switch["alias"]
        found[path] = None
        things = [(path, switch, _table.SWITCH)]
        things += [(f"{path}/{one['id']}", one, _table.PORT) for one in switch["ports"]]
        things += [
            (f"{path}/{one['id']}", one, _table.UPLINK_PORT) for one in switch["uplink_ports"]
        ]
        for where, thing, known in things:
            found[where] = thing.get("uplink") if known is _table.UPLINK_PORT else None
            for name in known:
                if name in thing:
                    found[f"{where}/{name}"] = thing[name]
            for name, value in thing["properties"].items():
                found[f"{where}/{name}"] = value
            for entry in thing.get("addresses", ()):
                found[f"{where}/{entry['mac']}"] = entry["type"]
    return found


def test_a_tool_that_is_killed(shared_host: simhost.SharedHost, tmp_path: Path) -> None:
    document = tmp_path / "wanted.json"
    document.write_text(json.dumps(CHANGE))

    def fresh() -> None:
        shared_host.reset()
        shared_host.clock.stop()
        shared_host.apply(LAB)

    def apply(most: int) -> "subprocess.CompletedProcess[str]":
        return shared_host.run([sys.executable, str(TOOL), str(document), str(most)])

    fresh()
    before = settings(shared_host.describe())
    done = apply(EVERYTHING)
    assert (done.returncode, done.stderr) == (0, "")
    wanted = settings(shared_host.describe())
    changes = int(done.stdout)
    assert changes > 12 and wanted != before
    between = 0
    for most in range(changes):
        fresh()
        assert apply(most).returncode == -signal.SIGKILL
        now = settings(shared_host.describe())
        for path in {*before, *now, *wanted}:
            missing = object()
            old, new = before.get(path, missing), wanted.get(path, missing)
            # What is added is there first, and has what is set of it later.
            assert now.get(path, missing) in (old, new), path
        between += now not in (before, wanted)
        again = apply(EVERYTHING)
        assert (again.returncode, again.stderr) == (0, "")
        assert settings(shared_host.describe()) == wanted
    assert between > 10
