"""Hosts that share one switch of many ports, some of which are connected."""

import json
import socket
import subprocess
import sys
import time
from contextlib import ExitStack, closing
from pathlib import Path
from typing import Any, Callable, Dict, Iterator, List, NamedTuple, Tuple

from fabric_lab import FabricLab, Host, started
from many_ports import SWITCH, lay_wires
from simhost._namespaces import Namespace

_PATIENCE = 120.0
# Of the ports in one document: a call that asks for more may last longer than a fabric waits.
_BATCH = 250
_SERVERS = 3


class Change(NamedTuple):
    """How long one took, in milliseconds."""

    caller: float
    """Until the call returned: it was in force on the host of the call."""
    everywhere: float
    """Until it was in force on the last host."""


def wait_for(condition: Callable[[], bool], what: str) -> None:
    """Raises TimeoutError if it does not come true."""
    deadline = time.monotonic() + _PATIENCE
    while not condition():
        if time.monotonic() > deadline:
            raise TimeoutError(f"{what}: not within {_PATIENCE:.0f} s")
        time.sleep(0.1)


class ManyHosts:
    """A fabric with one switch, to which each host that is added belongs; gone when it is left.
    So many ports of it at most are for each host to connect."""

    def __init__(self, folder: Path, ports: int, ports_of_host: int) -> None:
        self._left = ExitStack()
        self._switch = {"alias": SWITCH, "max_ports": max(ports, 8)}
        self._ports_of_host = ports_of_host
        self._far: Dict[str, Namespace] = {}
        self.lab = self._left.enter_context(FabricLab(folder, servers=_SERVERS))
        self._vlan = 8
        self.configured = 0
        self.connected: Dict[str, int] = {}

    def __enter__(self) -> "ManyHosts":
        return self

    def __exit__(self, *unused: object) -> None:
        self._left.close()

    @property
    def hosts(self) -> List[Host]:
        return self.lab.hosts

    # What is there.

    def add_host(self) -> None:
        is_first = not self.hosts
        document = {"switches": [self._switch] if is_first else []}
        # No name begins with another one: processes are found by the folder of their host.
        host = started(self.lab.host(f"host-{len(self.hosts) + 1:03}", document))
        host.ctl("share" if is_first else "join", SWITCH)
        self.settle()

    def configure(self, ports: int) -> Iterator[int]:
        """Adds ports until there are so many; says from time to time how many there are."""
        while self.configured < ports:
            numbers = range(self.configured, min(ports, self.configured + _BATCH))
            self._apply(self.hosts[0], [{"id": _port(number), "vlan": 7} for number in numbers])
            self.configured = numbers.stop
            yield self.configured
        self.settle()

    def connect(self, number: int, ports: int) -> Iterator[int]:
        """Connects ports at a host until there are so many; says likewise how many there are."""
        host = self.hosts[number]
        if host.name not in self._far:
            self._far[host.name] = self._left.enter_context(closing(Namespace(self.lab.hub)))
            for namespace in host.host, self._far[host.name]:
                namespace.run("sh", "-c", _QUIET)
        while self.connected.get(host.name, 0) < ports:
            first = self.connected.get(host.name, 0)
            wires = range(first, min(ports, first + _BATCH))
            lay_wires(host.host, self._far[host.name], wires)
            first_port = number * self._ports_of_host
            self._apply(
                host, [{"id": _port(first_port + wire), "device": f"n{wire}"} for wire in wires]
            )
            self.connected[host.name] = wires.stop
            yield wires.stop
        wait_for(host.is_in_force, f"the ports of {host.name} in force")
        self.settle()

    def programs(self) -> Dict[str, Dict[str, List[int]]]:
        """The processes of each program, for each host and for the databases."""
        found: Dict[str, Dict[str, List[int]]] = {}
        for host in self.hosts:
            ours = {name: [process] for name, process in host.processes().items()}
            if host.daemon is not None:
                ours["simhostd"] = [host.daemon.pid]
            found[host.name] = ours
        found[DATABASES] = {"ovsdb-server": self.lab.databases.processes()}
        return found

    def disk(self) -> float:
        """MB of the databases' files."""
        files = (self.lab.folder / "db").glob("*.db")
        return sum(file.stat().st_size for file in files) / 2**20

    # What happens.

    def settle(self) -> None:
        """Returns when every host that runs says that all that is shared is in force there."""
        databases = self.lab.databases

        def is_settled() -> bool:
            fabric, hosts = databases.transact(
                *({"op": "select", "table": table, "where": []} for table in ("Fabric", "Host"))
            )
            revision = fabric["rows"][0]["revision"]
            reports = {row["name"]: row["in_force"] for row in hosts["rows"]}
            running = [host.name for host in self.hosts if host.daemon is not None]
            return all(reports.get(name) == revision for name in running)

        wait_for(is_settled, "all hosts in force")

    def changes(self, count: int) -> List[Change]:
        """Sets the VLAN of the first port, again and again, by calls on the first host."""
        changes = []
        with _Caller(self.hosts[0]) as caller:
            for _ in range(count):
                # What is set to what it was is no change, and nobody hears of it.
                self._vlan = 17 - self._vlan
                with ExitStack() as left:
                    others = [
                        left.enter_context(closing(_next_in_force(host)))
                        for host in self.hosts[1:]
                        if host.daemon is not None
                    ]
                    began, returned = caller.set_vlan(_port(0), self._vlan)
                    for other in others:
                        _reply(other)
                    everywhere = time.monotonic() if others else returned
                changes.append(Change((returned - began) * 1e3, (everywhere - began) * 1e3))
        self.settle()
        return changes

    def catch_up(self, changed: int) -> float:
        """Seconds that a host which was away takes, from its start until all is in force there that
        was changed meanwhile."""
        host = self.hosts[-1]
        host.stop()
        ports = range(min(changed, self.configured))
        for first in ports[::_BATCH]:
            some = ports[first : first + _BATCH]
            self._apply(self.hosts[0], [{"id": _port(number), "vlan": 9} for number in some])
        self.settle()
        began = time.monotonic()
        host.start()
        self.settle()
        return time.monotonic() - began

    def _apply(self, host: Host, ports: List[Dict[str, Any]]) -> None:
        host.apply({"switches": [{"alias": SWITCH, "ports": ports}]})


# Devices that are new look for neighbours and routers of IPv6, which is not idleness.
_QUIET = "echo 1 > /proc/sys/net/ipv6/conf/default/disable_ipv6"
DATABASES = "databases"
"""The name of what is no host in programs()."""


def _port(number: int) -> str:
    return f"port-{number}"


def _next_in_force(host: Host) -> socket.socket:
    """Asks the daemon of a host when its next change is in force."""
    change = int(host.plane()["change"]) + 1
    question = {"ask": "in force", "change": change}
    asking = socket.socket(socket.AF_UNIX)
    asking.settimeout(_PATIENCE)
    asking.connect(f"{host.state}-simhostd")
    asking.sendall(json.dumps(question).encode() + b"\n")
    return asking


def _reply(asking: socket.socket) -> None:
    """Returns when it has come."""
    with asking.makefile() as lines:
        if not lines.readline():
            raise ConnectionError("a daemon closed the line")


class _Caller:
    """A process that makes calls on a host."""

    def __init__(self, host: Host) -> None:
        self._process = subprocess.Popen(
            [sys.executable, "-c", _CALLS],
            env=host.environment,
            stdin=subprocess.PIPE,
            stdout=subprocess.PIPE,
            text=True,
        )

    def set_vlan(self, port: str, vlan: int) -> Tuple[float, float]:
        """When the call began, and when it returned."""
        assert self._process.stdin is not None and self._process.stdout is not None
        print(port, vlan, file=self._process.stdin, flush=True)
        refusal, began, returned = json.loads(self._process.stdout.readline())
        if refusal:
            raise RuntimeError(f"a change was refused: {refusal}")
        return began, returned

    def __enter__(self) -> "_Caller":
        return self

    def __exit__(self, *unused: object) -> None:
        self._process.kill()
        self._process.communicate()


_CALLS = f"""
import json, sys, time
from libvswitch import checked
from libvswitch.errors import HostError
for line in sys.stdin:
    port, vlan = line.split()
    refusal = ""
    began = time.monotonic()
    try:
        checked.VSDVS_SetPortVLANPolicy({SWITCH!r}, port, int(vlan), 0, False, False)
    except HostError as why:
        refusal = str(why)
    print(json.dumps([refusal, began, time.monotonic()]), flush=True)
"""
