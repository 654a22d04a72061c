"""What is recorded to be replayed elsewhere: the examples and the tour."""

import os
import sys
from pathlib import Path
from typing import Dict, List

from programs import EXAMPLES
from recordings import SIMULATED, record

__all__ = ["EXAMPLE", "NO_EXAMPLE", "record_example", "record_tour"]

_DOCUMENT = EXAMPLES.parent / "tests" / "examples" / "document.json"
EXAMPLE: Dict[str, List[str]] = {
    "apply": [str(_DOCUMENT)],
    "compliance": ["--mtu", "9000", "--forbids", "forged_transmits", "--fix"],
    "failover_drill": ["vswitch0"],
    "find_mac": ["02:00:00:00:01:02"],
    "first_steps": [],
    "inventory": [],
    "mirror": ["vswitch0", "web-1", "web-2", "--for", "0"],
}
NO_EXAMPLE = {"private_host", "records", "tour"}
"""What asks nothing of the host, and what is recorded in a way of its own."""

_RUN = """
import runpy, sys
sys.argv = {words!r}
sys.path.insert(0, {folder!r})
runpy.run_path({words!r}[0], run_name="__main__")
"""

# In place of simhostctl: the trace says what it does.
_SAYING = """#!{python}
import os, sys
from saying import say
say("simhostctl", *sys.argv[1:])
os.execv({simhostctl!r}, ["simhostctl", *sys.argv[1:]])
"""


def record_example(name: str, trace: Path) -> None:
    _record(name, EXAMPLE[name], trace)


def record_tour(trace: Path) -> None:
    """What it has simhostctl do is said in the trace."""
    shown = trace.parent / "bin" / "simhostctl"
    shown.parent.mkdir()
    simhostctl = str(SIMULATED / "simhostctl")
    shown.write_text(_SAYING.format(python=sys.executable, simhostctl=simhostctl))
    shown.chmod(0o755)
    here = os.pathsep.join([os.environ["PYTHONPATH"], str(Path(__file__).parent)])
    path = os.pathsep.join([str(shown.parent), os.environ["PATH"]])
    _record("tour", [], trace, PATH=path, PYTHONPATH=here)


def _record(name: str, options: List[str], trace: Path, **variables: str) -> None:
    words = [str(EXAMPLES / f"{name}.py"), *options]
    made = record(_RUN.format(words=words, folder=str(EXAMPLES)), trace, SIMULATED, **variables)
    assert made.status == 0, made.stderr
