"""A host whose frames are real, with a daemon of its own that tests may end: simhostd with an Open
vSwitch in a network namespace, and what the plug-in puts around it."""

import json
import os
import signal
import subprocess
import sys
import time
from pathlib import Path
from typing import Any, Callable, Dict, Iterator, List, Mapping, Optional, Sequence

from simhost import Client, Frames, Network, SharedHost
from simhost._daemon import Daemon, start_simhostd
from simhost._frames import Cabling
from simhost._namespaces import PATIENCE, Namespace, own_user_needed

TOOLS = Path(os.environ["BUILD_DIR"]) / "simhost"
# A switch with three ports for clients and two uplinks.
ONE_SWITCH: Dict[str, Any] = {
    "uplinks": [{"name": "nic0"}, {"name": "nic1"}],
    "switches": [
        {
            "alias": "lab",
            "uplinks": ["nic0", "nic1"],
            "teaming": {"balance": "explicit", "active": ["nic0"], "standby": ["nic1"]},
            "ports": [{"id": "a"}, {"id": "b"}, {"id": "c"}],
        }
    ],
}


def comes_true(condition: Callable[[], Any]) -> bool:
    """Whether it is true at some time. Most of what is looked at takes a process to see it, so that
    what comes late is not looked for all the time."""
    deadline = time.monotonic() + PATIENCE
    pause = 0.01
    while time.monotonic() < deadline:
        if condition():
            return True
        time.sleep(pause)
        pause = min(2 * pause, 0.2)
    return False


def comes_sooner_or_later(
    one: Client, other: Client, sent: bytes, received: Optional[bytes] = None
) -> bool:
    """Whether a frame that is sent again and again comes at some time: as it was sent, unless it is
    said how."""

    def comes() -> bool:
        one.send(sent)
        try:
            other.expect(received or sent, timeout=0.1)
        except AssertionError:
            return False
        return True

    return comes_true(comes)


def learned_ages(lab: "Lab", port: str) -> Dict[str, int]:
    """Of the addresses that the one switch learned at a port of it and beyond the uplinks."""
    (switch,) = json.loads(lab.ctl("show", "--json"))["switches"]
    (at,) = (one for one in switch["ports"] if one["id"] == port)
    learned = [*at.get("addresses", []), *switch.get("addresses", [])]
    return {one["mac"]: one["age"] for one in learned}


class Lab:
    """The host with its state, and everything around it; gone when it is left."""

    # Further options of simhostd.
    options: Sequence[str] = ()

    def __init__(
        self,
        folder: Path,
        document: Mapping[str, Any],
        own_user: bool = False,
        outer: Optional[Namespace] = None,
    ) -> None:
        self.folder = folder
        self.state = folder / "host.db"
        shared = SharedHost(self.state, document, folder)
        self.environment = shared.environment
        own_user = own_user or own_user_needed()
        self.host = Namespace(outer, own_user=own_user and outer is None)
        self._cabling = Cabling(self.host)
        self.frames = Frames(shared, self._cabling, own_user)
        self.daemon: Optional[Daemon] = None

    def __enter__(self) -> "Lab":
        return self

    def __exit__(self, *unused: object) -> None:
        self.stop()
        self.frames.close()
        self.host.close()

    # The host.

    def try_ctl(self, *words: str, given: str = "") -> "subprocess.CompletedProcess[str]":
        return subprocess.run(
            [TOOLS / "simhostctl", *words],
            env=self.environment,
            input=given,
            stdout=subprocess.PIPE,
            stderr=subprocess.STDOUT,
            text=True,
            timeout=PATIENCE,
            check=False,
        )

    def ctl(self, *words: str, given: str = "") -> str:
        done = self.try_ctl(*words, given=given)
        assert done.returncode == 0, done.stdout
        return done.stdout

    def apply(self, document: Mapping[str, Any]) -> None:
        self.ctl("apply", "-", given=json.dumps(document))

    def set_port(self, switch: str, port: str, **settings: Any) -> None:
        self.apply({"switches": [{"alias": switch, "ports": [{"id": port, **settings}]}]})

    def python(self, program: str) -> str:
        """Runs a program in a process of its own, as any tool is one."""
        done = subprocess.run(
            [sys.executable, "-c", program],
            env=self.environment,
            stdout=subprocess.PIPE,
            stderr=subprocess.STDOUT,
            text=True,
            timeout=PATIENCE,
            check=False,
        )
        assert done.returncode == 0, done.stdout
        return done.stdout

    def plane(self) -> Dict[str, Any]:
        said: Dict[str, Any] = json.loads(self.ctl("plane", "--json"))
        return said

    def is_in_force(self) -> bool:
        plane = self.plane()
        return bool(plane["change"] == plane["in_force"])

    # The daemon.

    def simhostd(self, where: str, **options: Any) -> "subprocess.Popen[str]":
        return start_simhostd(self.host, self.state, where, stdout=subprocess.PIPE, **options)

    def start(self, where: str = "") -> None:
        """Returns when it says that it is ready."""
        where = where or f"private:{self.folder}/ovs"
        log = self.folder / "simhostd.log"
        self.daemon = Daemon(self.host, self.state, where, log, self.options)

    def stop(self, number: int = signal.SIGTERM) -> None:
        if self.daemon is not None:
            self.daemon.stop(number)
            self.daemon = None

    def log(self) -> str:
        return (self.folder / "simhostd.log").read_text(encoding="utf-8")

    def run_folder(self) -> Path:
        return self.folder / "ovs"

    def processes(self) -> Dict[str, int]:
        """Those of the Open vSwitch in run_folder(), by their programs."""
        found = {}
        for entry in Path("/proc").iterdir():
            if entry.name.isdigit():
                for name in _command_of(entry):
                    if name in ("ovsdb-server", "ovs-vswitchd") and _is_in(entry, self.folder):
                        found[name] = int(entry.name)
        return found

    def flows(self) -> List[str]:
        """Of the one bridge that there is, with what they counted; their age left out."""
        (socket,) = self.run_folder().glob("vs*.mgmt")
        dump = ["ovs-ofctl", "-OOpenFlow15", "dump-flows", f"unix:{socket}"]
        lines = self.host.run(*dump).splitlines()[1:]
        return [", ".join(p for p in line.split(", ") if not _is_time(p)) for line in lines]

    def control(self, command: str) -> str:
        """What the switch says to a command of its own."""
        return self.host.run("ovs-appctl", "-t", f"{self.run_folder()}/ovs-vswitchd.ctl", command)

    def have_counted(self) -> None:
        """All frames so far are counted: until then each of them may teach Open vSwitch once more
        what it was made to forget."""
        self.control("revalidator/wait")

    # What is around it.

    def wire(self, near: str, far: Namespace, name: str) -> None:
        """A wire from a device of the host to one in a namespace, both switched on."""
        self._cabling.lay(near, far, name)

    def client(self, switch: str, port: str) -> Client:
        """A client at a port, whose devices at the host are c1, c2, ..."""
        return self.frames.client(switch, port)

    def network(self, *uplinks: str) -> Network:
        """What these uplinks lead to, whose devices at the host are u0, u1, ..."""
        return self.frames.network(*uplinks)


def _command_of(process: Path) -> Iterator[str]:
    try:
        yield Path((process / "cmdline").read_text(encoding="utf-8").split("\0")[0]).name
    except OSError:
        return


def _is_in(process: Path, folder: Path) -> bool:
    try:
        return str(folder) in (process / "cmdline").read_text(encoding="utf-8")
    except OSError:
        return False


def _is_time(part: str) -> bool:
    return part.strip().startswith(("duration=", "idle_age=", "hard_age="))
