"""Hosts that share switches: each in a network namespace, beside one with the servers of their
database, and a wire from each host to it."""

import json
import shutil
import signal
import sqlite3
import subprocess
import sys
import uuid
from contextlib import ExitStack, closing
from pathlib import Path
from typing import Any, Dict, List, Mapping, Optional, Sequence

from simhost._namespaces import PATIENCE, Namespace, own_user_needed

from certificates import Authority, Certificate
from fabric_history import Transaction, history
from frame_lab import Lab, comes_true
from relays import Relay

SCHEMA = Path(__file__).resolve().parents[2] / "simhost/fabric/fabric.ovsschema"
_NETWORK = "192.0.2"
_HUB = f"{_NETWORK}.1"
_EMPTY: Dict[str, Any] = {}


class Trust:
    """Who vouches for the servers, and who for the hosts."""

    def __init__(self, folder: Path) -> None:
        self.of_servers = Authority(folder, "servers")
        self.of_hosts = Authority(folder, "hosts")
        self.server = self.of_servers.issue("database")

    def options_of_server(self, number: int) -> List[str]:
        listens = f"--remote=pssl:{6640 + number}:{_HUB}"
        return [listens, *self.server.options(self.of_hosts.certificate)]

    def options_of_host(self, certificate: Certificate) -> List[str]:
        return certificate.options(self.of_servers.certificate)


class Databases:
    """A cluster of servers of one database, encrypted if it is said whom to trust."""

    def __init__(
        self,
        namespace: Namespace,
        folder: Path,
        servers: int,
        schema: Path,
        trust: Optional[Trust] = None,
    ) -> None:
        self._namespace = namespace
        self._folder = folder
        self._trust = trust
        self._running: Dict[int, "subprocess.Popen[str]"] = {}
        self._servers = range(servers)
        for server in self._servers:
            if server == 0:
                words = ["--election-timer=300", "create-cluster", self._file(0), str(schema)]
                namespace.run("ovsdb-tool", *words, self._peer(0))
            else:
                words = ["join-cluster", self._file(server), "fabric", self._peer(server)]
                namespace.run("ovsdb-tool", *words, self._peer(0))
            self.start(server)

    @property
    def addresses(self) -> str:
        protocol = "ssl" if self._trust else "tcp"
        return ",".join(f"{protocol}:{_HUB}:{6640 + server}" for server in self._servers)

    @property
    def local_addresses(self) -> str:
        """For programs that are in no namespace."""
        return ",".join(f"unix:{self._socket(server)}" for server in self._servers)

    def start(self, server: int) -> None:
        control = self._folder / f"{server}.ctl"
        self._running[server] = self._namespace.start(
            *("ovsdb-server", self._file(server), *self._listens(server)),
            *(f"--remote=punix:{self._socket(server)}", f"--unixctl={control}"),
            *("-vconsole:off", "-vsyslog:off", f"--log-file={self._folder}/{server}.log"),
            stderr=subprocess.DEVNULL,
        )
        assert comes_true(lambda: Path(self._socket(server)).exists())
        words = ["wait", f"unix:{self._socket(server)}", "fabric", "connected"]
        if len(self._running) > len(self._servers) // 2:
            self._namespace.run("ovsdb-client", f"--timeout={PATIENCE:.0f}", *words)

    def kill(self, server: int) -> None:
        process = self._running.pop(server)
        process.kill()
        process.communicate(timeout=PATIENCE)
        Path(self._socket(server)).unlink()

    def running(self) -> List[int]:
        return sorted(self._running)

    def processes(self) -> List[int]:
        return [process.pid for process in self._running.values()]

    def pause(self, *servers: int) -> None:
        """These, or all of them. They go on listening."""
        self._signal(signal.SIGSTOP, servers)

    def resume(self, *servers: int) -> None:
        self._signal(signal.SIGCONT, servers)

    def _signal(self, number: signal.Signals, servers: Sequence[int]) -> None:
        for server in servers or self.running():
            self._running[server].send_signal(number)

    def pause_first(self) -> None:
        """The others have a leader when this returns."""
        self.pause(0)
        others = self.running()[1:]
        assert comes_true(lambda: any(self.tells("leader", one) for one in others))

    def leader(self) -> int:
        """The one that says so."""
        found: List[int] = []

        def find() -> bool:
            found[:] = [one for one in self._running if self.tells("leader", one)]
            return len(found) == 1

        assert comes_true(find)
        return found[0]

    def tells(self, column: str, server: int) -> bool:
        """What a server says of itself."""
        select = {"op": "select", "table": "Database", "where": [["name", "==", "fabric"]]}
        rows = self._transact("_Server", server, select)[0]["rows"]
        return bool(rows[0][column])

    def transact(self, *operations: Mapping[str, Any]) -> Any:
        """Through any of the servers."""
        return self._transact("fabric", min(self._running), *operations)

    def insert(self, **rows: Mapping[str, Any]) -> None:
        """A row into each table. A server that does not hear from its leader for a moment tries
        again what may be there already, and then is refused."""
        ids = {table: str(uuid.uuid4()) for table in rows}
        results = self._tried(
            "fabric",
            min(self._running),
            *(
                {"op": "insert", "table": table, "row": row, "uuid": ids[table]}
                for table, row in rows.items()
            ),
        )
        there = {table: self.rows(table, _uuid=["uuid", one]) for table, one in ids.items()}
        assert all(there.values()), results

    def _transact(self, database: str, server: int, *operations: Mapping[str, Any]) -> Any:
        results = self._tried(database, server, *operations)
        assert not any("error" in result for result in results if result), results
        return results

    def _tried(self, database: str, server: int, *operations: Mapping[str, Any]) -> Any:
        words = ["transact", f"unix:{self._socket(server)}", json.dumps([database, *operations])]
        return json.loads(self._namespace.run("ovsdb-client", f"--timeout={PATIENCE:.0f}", *words))

    def rows(self, table: str, **equal: Any) -> List[Dict[str, Any]]:
        where = [[column, "==", value] for column, value in equal.items()]
        found: List[Dict[str, Any]] = self.transact(
            {"op": "select", "table": table, "where": where}
        )[0]["rows"]
        return found

    def settings(self, table: str, **equal: str) -> Dict[str, Any]:
        """Of the one row that there is."""
        (row,) = self.rows(table, **equal)
        return {name: json.loads(text) for name, text in row["settings"][1]}

    def set(self, table: str, member: str, value: Any, **equal: str) -> None:
        """As an operator would."""
        where = [[column, "==", name] for column, name in equal.items()]
        old = {"op": "mutate", "table": table, "where": where}
        keys, entries = ["set", [member]], ["map", [[member, json.dumps(value)]]]
        self.transact(
            {**old, "mutations": [["settings", "delete", keys]]},
            {**old, "mutations": [["settings", "insert", entries]]},
        )

    def history(self) -> List[Transaction]:
        """All changes so far."""
        (fabric,) = self.rows("Fabric")
        made = history(Path(self._file(min(self._running))))
        # A leader may have begun what is yet to be decided.
        return [one for one in made if one.revision <= fabric["revision"]]

    def close(self) -> None:
        for server in list(self._running):
            self.kill(server)

    def _listens(self, server: int) -> List[str]:
        if self._trust:
            return self._trust.options_of_server(server)
        return [f"--remote=ptcp:{6640 + server}:{_HUB}"]

    def _file(self, server: int) -> str:
        return str(self._folder / f"{server}.db")

    def _socket(self, server: int) -> str:
        return str(self._folder / f"{server}.sock")

    def _peer(self, server: int) -> str:
        return f"tcp:{_HUB}:{6740 + server}"


class Host(Lab):
    """One of the hosts."""

    def __init__(self, fabric: "FabricLab", name: str, document: Mapping[str, Any]) -> None:
        folder = fabric.folder / name
        folder.mkdir()
        super().__init__(folder, document, outer=fabric.hub)
        self.name = name
        self.relay: Optional[Relay] = None
        self.options = ["--fabric", fabric.databases.addresses, "--host", name]
        if fabric.trust:
            certificate = fabric.trust.of_hosts.issue(name)
            self.options += fabric.trust.options_of_host(certificate)

    def __enter__(self) -> "Host":
        return self

    def setting(self, switch: str, member: str) -> Any:
        """What the document of the host says."""
        for one in json.loads(self.ctl("show", "--json"))["switches"]:
            if one["alias"] == switch:
                return one.get(member)
        return None

    def ports(self, switch: str) -> Dict[str, Any]:
        return {port["id"]: port for port in self.setting(switch, "ports") or []}

    def call(self, *words: Any) -> int:
        """The status of a call of the flat module, in a process of its own."""
        name, *arguments = words
        said = self.python(f"import _libvswitch as vs; print(vs.{name}(*{tuple(arguments)!r}))")
        return int(said)

    def refusal(self, document: Mapping[str, Any]) -> str:
        """What stands in the way of a document."""
        done = self.try_ctl("apply", "-", given=json.dumps(document))
        assert done.returncode == 1, done.stdout
        return done.stdout


class FabricLab:
    """The databases and hosts; gone when it is left."""

    def __init__(
        self, folder: Path, servers: int = 1, schema: Path = SCHEMA, trust: Optional[Trust] = None
    ) -> None:
        self.folder = folder
        self.trust = trust
        self._left = ExitStack()
        self.hub = Namespace(own_user=own_user_needed())
        self._left.callback(self.hub.close)
        run = self.hub.run
        run("ip", "link", "add", "bridge", "type", "bridge", "forward_delay", "0")
        run("ip", "link", "set", "bridge", "up")
        run("ip", "address", "add", f"{_HUB}/24", "dev", "bridge")
        (folder / "db").mkdir()
        self.databases = Databases(self.hub, folder / "db", servers, schema, trust)
        self._left.callback(self.databases.close)
        self.hosts: List[Host] = []

    def __enter__(self) -> "FabricLab":
        return self

    def __exit__(self, *unused: object) -> None:
        self._left.close()

    def host(self, name: str, document: Optional[Mapping[str, Any]] = None) -> Host:
        """A host of that name, whose daemon is yet to be started."""
        host = self._left.enter_context(Host(self, name, document or _EMPTY))
        self.hosts.append(host)
        number = len(self.hosts)
        run = self.hub.run
        run(
            *("ip", "link", "add", f"h{number}", "index", str(3000 + number), "type", "veth"),
            *("peer", "name", "fabric", "index", "2000", "netns", str(host.host.pid)),
        )
        run("ip", "link", "set", f"h{number}", "up", "master", "bridge")
        host.host.run("ip", "link", "set", "fabric", "up")
        host.host.run("ip", "address", "add", f"{_NETWORK}.{10 + number}/24", "dev", "fabric")
        return host

    def relayed(self, host: Host) -> Host:
        """A host that reaches the databases by a relay of its own."""
        assert not self.trust
        first = 7000 + 100 * self.hosts.index(host)
        servers = len(self.databases.addresses.split(","))
        host.relay = Relay(self.hub, (_HUB, first), (_HUB, 6640), servers)
        self._left.callback(host.relay.close)
        host.options = ["--fabric", host.relay.addresses, "--host", host.name]
        return host

    def namespace(self) -> Namespace:
        """One that goes with this."""
        made = Namespace(self.hub)
        self._left.callback(made.close)
        return made

    def cut(self, host: Host, up: bool = False) -> None:
        """The wire between a host and the databases."""
        state = "up" if up else "down"
        self.hub.run("ip", "link", "set", f"h{self.hosts.index(host) + 1}", state)


def started(host: Host) -> Host:
    """With a daemon that is a member of the fabric."""
    host.start()
    assert comes_true(lambda: "in the fabric at" in host.ctl("fabric")), host.log()
    return host


def relay_of(host: Host) -> Relay:
    assert host.relay is not None
    return host.relay


def revision(lab: FabricLab) -> int:
    (row,) = lab.databases.rows("Fabric")
    return int(row["revision"])


def are_reported(lab: FabricLab) -> bool:
    """Whether all hosts have told that the last change is in force."""
    now = revision(lab)
    return all(row["in_force"] == now for row in lab.databases.rows("Host"))


def restored(host: Host, name: str) -> None:
    """Puts a copy of the state that was kept under a name in its place."""
    assert host.daemon is None
    for beside in ("-wal", "-shm"):
        # Of another state, if it was left by who was killed.
        Path(f"{host.state}{beside}").unlink(missing_ok=True)
    shutil.copy(host.folder / name, host.state)


def kept(host: Host, name: str) -> None:
    """Keeps a copy of the state, whoever uses it."""
    with closing(sqlite3.connect(host.state)) as state:
        with closing(sqlite3.connect(host.folder / name)) as copy:
            state.backup(copy)


def killed(host: Host) -> None:
    host.stop(signal.SIGKILL)


def in_background(host: Host, call: str) -> "subprocess.Popen[str]":
    """A call in a process of its own, which prints its status."""
    words = [sys.executable, "-c", f"import _libvswitch as vs; print({call})"]
    return subprocess.Popen(words, env=host.environment, stdout=subprocess.PIPE, text=True)


def is_locked(host: Host) -> bool:
    """Whether somebody changes its state."""
    program = (
        "import sqlite3, sys\n"
        "state = sqlite3.connect(sys.argv[1], timeout=0)\n"
        "try:\n    state.execute('BEGIN IMMEDIATE')\nexcept sqlite3.OperationalError:\n    print(1)"
    )
    words = [sys.executable, "-c", program, str(host.state)]
    return subprocess.run(words, stdout=subprocess.PIPE, check=True).stdout == b"1\n"
