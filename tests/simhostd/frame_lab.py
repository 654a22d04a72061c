"""A host whose frames are real: simhostd with an Open vSwitch of its own in a network namespace,
clients in others, and wires between them."""

import itertools
import json
import os
import signal
import subprocess
import sys
import time
from pathlib import Path
from types import TracebackType
from typing import Any, Callable, Dict, Iterator, List, Mapping, Optional, Type

from namespaces import PATIENCE, Namespace, own_user_needed

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
# Both ends of a wire must have another index: a lost carrier is told late otherwise.
_INDEXES = itertools.count(1000)


def comes_true(condition: Callable[[], bool]) -> bool:
    """Whether it is true at some time."""
    deadline = time.monotonic() + PATIENCE
    while time.monotonic() < deadline:
        if condition():
            return True
    return False


class Client:
    """A machine with one device, eth0."""

    def __init__(self, namespace: Namespace, address: str) -> None:
        self.namespace = namespace
        self.address = address

    def set_address(self) -> None:
        run = self.namespace.run
        run("ip", "address", "add", f"{self.address}/24", "dev", "eth0")
        # Nobody puts right the checksums that a device would.
        run("ethtool", "--offload", "eth0", "tx", "off")

    def pull(self, wire: str) -> None:
        self.namespace.run("ip", "link", "set", wire, "down")

    def plug(self, wire: str) -> None:
        self.namespace.run("ip", "link", "set", wire, "up")

    def reaches(self, other: "Client", attempts: int = 1) -> bool:
        """Whether a ping is replied to, each waited for a while."""
        words = ["ping", "-c", "1", "-W", "1" if attempts > 1 else "0.3", other.address]
        return any(self.namespace.try_run(*words).returncode == 0 for _ in range(attempts))

    def comes_to_reach(self, other: "Client") -> bool:
        """Likewise, at some time."""
        return comes_true(lambda: self.reaches(other))


class Lab:
    """The host with its state, and everything around it; gone when it is left."""

    def __init__(self, folder: Path, document: Mapping[str, Any], own_user: bool = False) -> None:
        self.folder = folder
        self.state = folder / "host.db"
        self.environment = {**os.environ, "SIMHOST_STATE": str(self.state)}
        self.environment.pop("SIMHOST_SCENARIO", None)
        scenario = folder / "scenario.json"
        scenario.write_text(json.dumps(document), encoding="utf-8")
        self._namespaces: List[Namespace] = []
        self._own_user = own_user or own_user_needed()
        self.host = self._keep(Namespace(own_user=self._own_user))
        self._clients = itertools.count(1)
        self._scenario = str(scenario)
        self.daemon: Optional["subprocess.Popen[str]"] = None
        self.ctl("show")

    def __enter__(self) -> "Lab":
        return self

    def __exit__(
        self,
        kind: Optional[Type[BaseException]],
        error: Optional[BaseException],
        trace: Optional[TracebackType],
    ) -> None:
        self.stop()
        for namespace in reversed(self._namespaces):
            namespace.close()

    def _keep(self, namespace: Namespace) -> Namespace:
        self._namespaces.append(namespace)
        return namespace

    def namespace(self) -> Namespace:
        return self._keep(Namespace(self.host if self._own_user else None))

    # The host.

    def try_ctl(self, *words: str, given: str = "") -> "subprocess.CompletedProcess[str]":
        return subprocess.run(
            [TOOLS / "simhostctl", *words],
            env={**self.environment, "SIMHOST_SCENARIO": self._scenario},
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
        words = [str(TOOLS / "simhostd"), "--state", str(self.state), "--openvswitch", where]
        return self.host.start(*words, stdout=subprocess.PIPE, **options)

    def start(self, where: str = "") -> None:
        """Returns when it says that it is ready."""
        with open(self.folder / "simhostd.log", "a", encoding="utf-8") as log:
            self.daemon = self.simhostd(where or f"private:{self.folder}/ovs", stderr=log)
        assert self.daemon.stdout is not None
        assert self.daemon.stdout.readline() == "ready\n", self.log()

    def stop(self, number: int = signal.SIGTERM) -> None:
        if self.daemon is not None:
            self.daemon.send_signal(number)
            self.daemon.communicate(timeout=PATIENCE)
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

    # What is around it.

    def wire(self, near: str, far: Namespace, name: str) -> None:
        """A wire from a device of the host to one in a namespace, both switched on."""
        one, other = next(_INDEXES), next(_INDEXES)
        self.host.run(
            *("ip", "link", "add", near, "index", str(one), "type", "veth"),
            *("peer", "name", name, "index", str(other), "netns", str(far.pid)),
        )
        self.host.run("ip", "link", "set", near, "up")
        far.run("ip", "link", "set", name, "up")

    def client(self, switch: str, port: str) -> Client:
        """A client at a port."""
        number = next(self._clients)
        client = Client(self.namespace(), f"10.9.0.{number}")
        self.wire(f"c{number}", client.namespace, "eth0")
        client.set_address()
        self.ctl("connect", switch, port, f"c{number}")
        return client

    def far_client(self, *uplinks: str) -> Client:
        """A client that all of these uplinks lead to, over a bridge with the ports w0, w1, ..."""
        far = self.namespace()
        far.run("ip", "link", "add", "eth0", "type", "bridge")
        for number, uplink in enumerate(uplinks):
            self.wire(f"u{number}", far, f"w{number}")
            far.run("ip", "link", "set", f"w{number}", "master", "eth0")
            self.ctl("uplink", uplink, "--device", f"u{number}")
        far.run("ip", "link", "set", "eth0", "up")
        client = Client(far, "10.9.0.200")
        client.set_address()
        return client


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
