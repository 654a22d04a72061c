"""An operator of a fabric, and one that has something in it though no host is there."""

import contextlib
import io
import json
import signal
import subprocess
from typing import Any, Dict, NamedTuple, Sequence

from fabric_lab import Databases, FabricLab
from frame_lab import TOOLS
from vswitch.command.fabric import program
from vswitch.fabric import Fabric

PROGRAM = TOOLS.parent / "bin" / "vswitch"
SWITCH = {"alias": "lab", "id": "lab-1", "hosts": ["one"], "ports": [{"id": "a", "vlan": 7}]}


class Done(NamedTuple):
    status: int
    stdout: str
    stderr: str


class Operator:
    """The command, by somebody who has no host: mostly without a process for each, which takes
    longer than the rest."""

    def __init__(self, lab: FabricLab) -> None:
        self._lab = lab

    def __call__(self, *words: str, given: Any = None) -> Done:
        file = self._lab.folder / "given.json"
        file.write_text(json.dumps(given), encoding="utf-8")
        words = tuple(str(file) if word == "-" else word for word in words)
        handlers = {
            one: signal.getsignal(one) for one in (signal.SIGINT, signal.SIGTERM, signal.SIGHUP)
        }
        said, wrong, status = io.StringIO(), io.StringIO(), 0
        try:
            with contextlib.redirect_stdout(said), contextlib.redirect_stderr(wrong):
                program.main(["--fabric", self._lab.databases.local_addresses, *words])
        except SystemExit as end:
            status = int(end.code or 0)
        finally:
            for number, handler in handlers.items():
                signal.signal(number, handler)
        return Done(status, said.getvalue(), wrong.getvalue().replace(f"{file}: ", "-: "))

    def process(self, *words: str, before: Sequence[str] = ()) -> Done:
        """In one of its own, at a machine that reaches the servers."""
        process = self.start(*words, before=before)
        said, wrong = process.communicate()
        return Done(process.returncode, said, wrong)

    def start(self, *words: str, before: Sequence[str] = ()) -> "subprocess.Popen[str]":
        """Likewise, and goes on."""
        # No library of a host is found from here.
        own = ["env", "-u", "LD_LIBRARY_PATH", "-u", "SIMHOST_STATE"]
        servers = ["--fabric", self._lab.databases.addresses]
        return subprocess.Popen(
            [*self._lab.hub.words(), *own, str(PROGRAM), *before, *servers, *words],
            stdout=subprocess.PIPE,
            stderr=subprocess.PIPE,
            text=True,
        )

    def told(self, *words: str, given: Any = None) -> str:
        done = self(*words, given=given)
        assert done.status == 0, done
        return done.stdout

    def json(self, *words: str, given: Any = None) -> Any:
        return json.loads(self.told(*words, "--json", given=given))


def of_lab(**members: Any) -> Dict[str, Any]:
    return {"switches": [{"alias": "lab", **members}]}


def populate(databases: Databases) -> None:
    """As a host does that comes first, and an operator after it."""
    host = {"name": "one", "state": "s", "session": "s", "links": ["map", [["nic0", "up"]]]}
    databases.insert(Fabric={}, Host=host)
    with Fabric(databases.local_addresses) as fabric:
        assert fabric.plan({"switches": [SWITCH]}).apply() == 1
